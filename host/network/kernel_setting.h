// The kernel's settings below /proc/sys.
#ifndef HOST_NETWORK_KERNEL_SETTING_H
#define HOST_NETWORK_KERNEL_SETTING_H

#include <string>

namespace vornhost {

/// A setting that this kernel does not have, or that may not be changed here, stays as it is.
void WriteSetting(const std::string &path, const std::string &value);

/// An interface takes router advertisements. A host that forwards does not, unless told so (kernel: ip-sysctl,
/// accept_ra).
void ListenToRouters(const std::string &interface);

} // namespace vornhost

#endif
