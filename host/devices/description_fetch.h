// Fetches a UPnP device's description of itself.
#ifndef HOST_DEVICES_DESCRIPTION_FETCH_H
#define HOST_DEVICES_DESCRIPTION_FETCH_H

#include <string>

namespace vornhost {

/// Takes a second at most. Nothing but plain HTTP, through one interface, without redirects; no more than 64 KiB.
/// @return empty when it cannot be had
std::string FetchDescription(const std::string &url, const std::string &netif);

} // namespace vornhost

#endif
