// Names of interfaces.
#ifndef HOST_NETWORK_INTERFACE_NAME_H
#define HOST_NETWORK_INTERFACE_NAME_H

#include <string>

namespace vornhost {

/// A name that the kernel takes for an interface, of letters, digits, '-', '_' and '.'.
bool IsInterfaceName(const std::string &name);

} // namespace vornhost

#endif
