#ifndef WEBAPI_UTF8_H
#define WEBAPI_UTF8_H

#include <cstddef>
#include <string_view>

namespace vornwebapi {

/// @return length in bytes of the well-formed UTF-8 character (RFC 3629, section 4) at the front; 0 when there is none
inline size_t Utf8Length(std::string_view text) {
  const auto within = [text](size_t index, unsigned least, unsigned most) {
    const unsigned byte = index < text.size() ? static_cast<unsigned char>(text[index]) : 0;
    return byte >= least && byte <= most;
  };
  const auto tail = [within](size_t index) { return within(index, 0x80, 0xBF); };
  if (within(0, 0x01, 0x7F) || (!text.empty() && text[0] == '\0')) {
    return 1;
  }
  if (within(0, 0xC2, 0xDF)) {
    return tail(1) ? 2 : 0;
  }
  if (within(0, 0xE0, 0xEF)) {
    const bool second = text[0] == '\xE0' ? within(1, 0xA0, 0xBF) : text[0] == '\xED' ? within(1, 0x80, 0x9F) : tail(1);
    return second && tail(2) ? 3 : 0;
  }
  if (within(0, 0xF0, 0xF4)) {
    const bool second = text[0] == '\xF0' ? within(1, 0x90, 0xBF) : text[0] == '\xF4' ? within(1, 0x80, 0x8F) : tail(1);
    return second && tail(2) && tail(3) ? 4 : 0;
  }
  return 0;
}

} // namespace vornwebapi

#endif
