// The wireless radios of this machine.
#ifndef HOST_WIRELESS_RADIO_H
#define HOST_WIRELESS_RADIO_H

#include <optional>
#include <string>

namespace vornhost {

/// @return the number of the radio that a wireless interface belongs to; nothing when there is no such interface or it
///         is not wireless
std::optional<int> RadioOf(const std::string &interface);

/// Asks the kernel (nl80211, "managed" among the supported modes of the interface's radio).
/// @return whether the interface's radio can be a station of another network; false too when that cannot be told
bool CanBeStation(const std::string &interface);

} // namespace vornhost

#endif
