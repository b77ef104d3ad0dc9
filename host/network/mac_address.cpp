#include "host/network/mac_address.h"

namespace vornhost {

namespace {

constexpr size_t kLength = 17;

int HexDigit(char c) {
  if (c >= '0' && c <= '9') {
    return c - '0';
  }
  const char lower = static_cast<char>(c | 0x20);
  return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

} // namespace

std::optional<std::string> ParseMac(std::string_view text) {
  if (text.size() != kLength || (text[2] != ':' && text[2] != '-')) {
    return std::nullopt;
  }
  std::string mac(text);
  for (size_t i = 0; i < kLength; ++i) {
    if (i % 3 == 2) {
      if (text[i] != text[2]) {
        return std::nullopt;
      }
      mac[i] = ':';
      continue;
    }
    const int digit = HexDigit(text[i]);
    if (digit < 0) {
      return std::nullopt;
    }
    mac[i] = "0123456789abcdef"[digit];
  }
  return mac;
}

bool IsStationMac(const std::string &mac) {
  const bool group = (HexDigit(mac[1]) & 1) != 0;
  return !group && mac != "00:00:00:00:00:00";
}

} // namespace vornhost
