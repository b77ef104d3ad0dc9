#include "host/devices/mac_address.h"

#include "host/network/mac_address.h"

#include <charconv>

namespace vornhost {

namespace {

constexpr char kDigits[] = "0123456789abcdef";

uint8_t ByteAt(const std::string &mac, size_t index) {
  uint8_t byte = 0;
  std::from_chars(mac.data() + 3 * index, mac.data() + 3 * index + 2, byte, 16);
  return byte;
}

} // namespace

std::optional<std::string> ParseDeviceMac(std::string_view text) {
  std::string mac(text);
  if (mac.size() == 2 * kMacBytes) {
    for (size_t at = 2; at < 3 * kMacBytes - 1; at += 3) {
      mac.insert(at, 1, ':');
    }
  }
  auto parsed = ParseMac(mac);
  return parsed && IsStationMac(*parsed) ? parsed : std::nullopt;
}

std::string MacText(const uint8_t *bytes) {
  std::string text;
  for (size_t i = 0; i < kMacBytes; ++i) {
    text += i == 0 ? "" : ":";
    text += kDigits[bytes[i] >> 4U];
    text += kDigits[bytes[i] & 0xfU];
  }
  return text;
}

void MacBytes(const std::string &mac, uint8_t *bytes) {
  for (size_t i = 0; i < kMacBytes; ++i) {
    bytes[i] = ByteAt(mac, i);
  }
}

bool IsPrivateMac(const std::string &mac) {
  return (ByteAt(mac, 0) & 2U) != 0;
}

} // namespace vornhost
