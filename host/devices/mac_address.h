// MAC addresses in the one form that the device store keeps: lower case, colons.
#ifndef HOST_DEVICES_MAC_ADDRESS_H
#define HOST_DEVICES_MAC_ADDRESS_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace vornhost {

constexpr size_t kMacBytes = 6;

/// @param[in] text  twelve hexadecimal digits of either case, bare or in pairs with one kind of separator (':' or '-')
/// @return nothing when it is none of that, or no single device's address (zero, or a group's)
std::optional<std::string> ParseDeviceMac(std::string_view text);

/// @param[in] bytes  kMacBytes of them
std::string MacText(const uint8_t *bytes);

/// @param[in] mac  as ParseDeviceMac gives it
void MacBytes(const std::string &mac, uint8_t *bytes);

/// Whether the address was made up by the device (locally administered, IEEE 802 section 8.4), as telephones do. It
/// says nothing of who built it.
bool IsPrivateMac(const std::string &mac);

} // namespace vornhost

#endif
