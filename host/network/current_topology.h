// Which topology the network is in, asked of the kernel.
#ifndef HOST_NETWORK_CURRENT_TOPOLOGY_H
#define HOST_NETWORK_CURRENT_TOPOLOGY_H

#include <string>
#include <vector>

namespace vornhost {

/// One question to the kernel about the WAN port over a socket that each thread keeps, and one look-up of a name: a few
/// microseconds, because every "get" asks it. The socket belongs to the network namespace in which the thread first
/// asked.
/// @return one of the topology texts; null when the network is in none
const char *CurrentTopology();

/// @return whether there is an interface of that name
bool HasInterface(const char *name);

/// @return the names of the wireless interfaces, in no order
std::vector<std::string> WirelessInterfaces();

} // namespace vornhost

#endif
