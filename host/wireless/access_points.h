// The access points' places in the home's bridges.
//
// hostapd puts each of its networks into the bridge that its configuration names, and makes that bridge when there is
// none: started again in another topology it would take its stations out of the home network. So its configuration
// follows a switch, in the files for its next start and in the memory of one that runs. The running one's interface is
// moved as every port is; stations keep their links.
#ifndef HOST_WIRELESS_ACCESS_POINTS_H
#define HOST_WIRELESS_ACCESS_POINTS_H

#include <string>
#include <string_view>

namespace vornhost {

/// Every network that is in one of the home's bridges, lbr0 and br0, is to be in `bridge`; networks elsewhere, such as
/// the guests', stay. A hostapd that does not take it is logged: its files are right for its next start. Throws
/// std::runtime_error when a file cannot be written; all are as they were then.
void MoveAccessPoints(const std::string &bridge);

/// hostapd's configuration with lbr0 and br0 replaced by `bridge` as the bridge of its networks.
std::string WithBridge(std::string_view content, const std::string &bridge);

} // namespace vornhost

#endif
