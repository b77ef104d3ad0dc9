// MAC addresses of Ethernet and Wi-Fi in their text form.
#ifndef HOST_NETWORK_MAC_ADDRESS_H
#define HOST_NETWORK_MAC_ADDRESS_H

#include <optional>
#include <string>
#include <string_view>

namespace vornhost {

/// @param[in] text  six pairs of hexadecimal digits, in any case, all separated by ':' or all by '-'
/// @return the address in lower case with colons, as the kernel and hostapd write it; nothing when the text is none
std::optional<std::string> ParseMac(std::string_view text);

/// Whether the address is one that a station can have: not a group's (IEEE 802, the first byte's lowest bit) and not
/// all zeros.
/// @param[in] mac  as ParseMac gives it
bool IsStationMac(const std::string &mac);

} // namespace vornhost

#endif
