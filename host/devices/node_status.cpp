#include "host/devices/node_status.h"

#include "host/devices/device_text.h"

namespace vornhost {

namespace {

constexpr size_t kHeader = 12;
constexpr size_t kQuestionName = 34; // a length, the wildcard in its 32 letters, an end
constexpr size_t kNameLength = 15;
constexpr size_t kEntry = 18; // name, suffix, flags
constexpr uint8_t kStatusType = 0x21;
constexpr uint8_t kGroup = 0x80;
constexpr uint8_t kActive = 0x04;

uint8_t ByteAt(std::string_view text, size_t at) {
  return static_cast<uint8_t>(text[at]);
}

} // namespace

std::string NodeStatusRequest(uint16_t id) {
  std::string message;
  message += static_cast<char>(id >> 8U);
  message += static_cast<char>(id & 0xffU);
  message += std::string("\0\0\0\1\0\0\0\0\0\0", 10);
  message += std::string(" CK") + std::string(30, 'A') + '\0'; // "*" and fifteen zeros, in the encoding of the protocol
  message += std::string("\0\x21\0\1", 4);
  return message;
}

std::string ParseNodeStatus(std::string_view message, uint16_t id) {
  // Header, name, type, class, time to live, length; then the number of names.
  constexpr size_t kNames = kHeader + kQuestionName + 10;
  if (message.size() <= kNames || ByteAt(message, 0) != id >> 8U || ByteAt(message, 1) != (id & 0xffU) ||
      (ByteAt(message, 2) & 0x80U) == 0 || ByteAt(message, kHeader) != 0x20 ||
      ByteAt(message, kHeader + kQuestionName + 1) != kStatusType) {
    return {};
  }
  const size_t count = ByteAt(message, kNames);
  std::string fileServer;
  for (size_t i = 0; i < count && message.size() - kNames - 1 >= (i + 1) * kEntry; ++i) {
    const std::string_view entry = message.substr(kNames + 1 + i * kEntry, kEntry);
    const uint8_t suffix = ByteAt(entry, kNameLength);
    const uint8_t flags = ByteAt(entry, kNameLength + 1);
    std::string name = CleanName(entry.substr(0, kNameLength));
    if ((flags & kGroup) != 0 || (flags & kActive) == 0 || name.empty()) {
      continue;
    }
    if (suffix == 0) {
      return name;
    }
    if (suffix == 0x20 && fileServer.empty()) {
      fileServer = name;
    }
  }
  return fileServer;
}

} // namespace vornhost
