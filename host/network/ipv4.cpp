#include "host/network/ipv4.h"

#include <arpa/inet.h>

#include <bit>

namespace vornhost {

std::optional<uint32_t> ParseIpv4(const char *text) {
  in_addr address{};
  if (inet_pton(AF_INET, text, &address) != 1) {
    return std::nullopt;
  }
  return ntohl(address.s_addr);
}

std::optional<int> PrefixOfNetmask(const char *text) {
  const std::optional<uint32_t> mask = ParseIpv4(text);
  if (!mask) {
    return std::nullopt;
  }
  const int ones = std::countl_one(*mask);
  if (*mask != NetmaskOfPrefix(ones)) {
    return std::nullopt;
  }
  return ones;
}

uint32_t NetmaskOfPrefix(int prefix) {
  return prefix == 0 ? 0 : ~uint32_t{0} << (32 - prefix);
}

std::string Ipv4Text(uint32_t address) {
  const in_addr raw{htonl(address)};
  char text[INET_ADDRSTRLEN] = "";
  inet_ntop(AF_INET, &raw, text, sizeof(text));
  return text;
}

} // namespace vornhost
