// IPv4 addresses and netmasks in their dotted form.
#ifndef HOST_NETWORK_IPV4_H
#define HOST_NETWORK_IPV4_H

#include <cstdint>
#include <optional>
#include <string>

namespace vornhost {

/// @return the address in host order; nothing when the text is not four decimal parts without leading zeros
std::optional<uint32_t> ParseIpv4(const char *text);

/// @return how many leading bits the netmask has, 0 to 32; nothing when the text is no address or its ones do not all
///         stand at the front
std::optional<int> PrefixOfNetmask(const char *text);

/// @param[in] prefix  0 to 32
uint32_t NetmaskOfPrefix(int prefix);

/// @param[in] address  in host order
std::string Ipv4Text(uint32_t address);

} // namespace vornhost

#endif
