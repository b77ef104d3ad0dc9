// Who built a device: the registries of the IEEE, as Debian's package ieee-data has them.
#ifndef HOST_DEVICES_VENDORS_H
#define HOST_DEVICES_VENDORS_H

#include <map>
#include <string>
#include <vector>

namespace vornhost {

constexpr char kRegistryFolder[] = "/usr/share/ieee-data";

/// The builders of devices, one reading of the files for all (some 20 ms). A device that is not there, or that made up
/// its address, has none. The longest assigned prefix counts.
/// @param[in] macs  as ParseDeviceMac gives them
std::map<std::string, std::string> VendorsOf(const std::vector<std::string> &macs);

} // namespace vornhost

#endif
