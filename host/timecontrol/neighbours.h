// The kernel's neighbour tables: which addresses a device has.
#ifndef HOST_TIMECONTROL_NEIGHBOURS_H
#define HOST_TIMECONTROL_NEIGHBOURS_H

#include "host/timecontrol/rules.h"

#include <string>
#include <vector>

namespace vornhost {

/// @return the IPv4 and IPv6 addresses under which the kernel knows these devices; none when it cannot be asked
std::vector<std::string> AddressesOf(const MacSet &macs);

} // namespace vornhost

#endif
