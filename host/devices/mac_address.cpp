#include "host/devices/mac_address.h"

#include <algorithm>
#include <array>

namespace vornhost {

namespace {

constexpr char kDigits[] = "0123456789abcdef";

int DigitValue(char digit) {
  if (digit >= '0' && digit <= '9') {
    return digit - '0';
  }
  if (digit >= 'a' && digit <= 'f') {
    return digit - 'a' + 10;
  }
  return digit >= 'A' && digit <= 'F' ? digit - 'A' + 10 : -1;
}

// The twelve digits without their separators; empty when the separators are not in their places.
std::string BareDigits(std::string_view text) {
  if (text.size() == 2 * kMacBytes) {
    return std::string(text);
  }
  std::string bare;
  if (text.size() != 3 * kMacBytes - 1 || (text[2] != ':' && text[2] != '-')) {
    return bare;
  }
  for (size_t i = 0; i < text.size(); ++i) {
    if (i % 3 != 2) {
      bare += text[i];
    } else if (text[i] != text[2]) {
      return {};
    }
  }
  return bare;
}

} // namespace

std::optional<std::string> ParseMac(std::string_view text) {
  const std::string digits = BareDigits(text);
  if (digits.empty() || std::any_of(digits.begin(), digits.end(), [](char c) { return DigitValue(c) < 0; })) {
    return std::nullopt;
  }
  std::array<uint8_t, kMacBytes> bytes{};
  for (size_t i = 0; i < kMacBytes; ++i) {
    bytes[i] = static_cast<uint8_t>(DigitValue(digits[2 * i]) * 16 + DigitValue(digits[2 * i + 1]));
  }
  const bool isGroup = (bytes[0] & 1U) != 0;
  const bool isZero = std::all_of(bytes.begin(), bytes.end(), [](uint8_t byte) { return byte == 0; });
  if (isGroup || isZero) {
    return std::nullopt;
  }
  return MacText(bytes.data());
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
    bytes[i] = static_cast<uint8_t>(DigitValue(mac[3 * i]) * 16 + DigitValue(mac[3 * i + 1]));
  }
}

bool IsPrivateMac(const std::string &mac) {
  return (DigitValue(mac[1]) & 2) != 0;
}

} // namespace vornhost
