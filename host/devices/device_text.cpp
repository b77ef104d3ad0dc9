#include "host/devices/device_text.h"

#include <algorithm>
#include <cstdint>

namespace vornhost {

namespace {

// What stands in a name's place when there is none; "wpad" is what a machine that wants to be everybody's proxy is
// called.
constexpr std::string_view kPlaceholders[] = {"?", "*", "<unknown>", "(none)", "unknown", "localhost", "wpad"};

constexpr std::string_view kDomains[] = {".local", ".lan", ".localdomain"};

struct Character {
  uint32_t code = 0;
  size_t length = 0; // in bytes; 0: no UTF-8
};

// How many bytes a character that begins so has; 0 when none does. Overlong forms are caught by what they stand for.
size_t LengthOf(uint8_t first) {
  if (first < 0x80) {
    return 1;
  }
  if (first < 0xc2 || first > 0xf4) {
    return 0;
  }
  return first < 0xe0 ? 2 : first < 0xf0 ? 3 : 4;
}

Character FirstCharacter(std::string_view text) {
  const auto first = static_cast<uint8_t>(text.front());
  const size_t length = LengthOf(first);
  if (length <= 1 || length > text.size()) {
    return {first, length == 1 ? size_t{1} : size_t{0}};
  }
  uint32_t code = first & (0xffU >> (length + 1));
  for (size_t i = 1; i < length; ++i) {
    const auto byte = static_cast<uint8_t>(text[i]);
    if ((byte & 0xc0U) != 0x80) {
      return {};
    }
    code = (code << 6U) | (byte & 0x3fU);
  }
  const bool isOverlong = (length == 3 && code < 0x800) || (length == 4 && code < 0x10000);
  const bool isSurrogate = code >= 0xd800 && code <= 0xdfff;
  return isOverlong || isSurrogate || code > 0x10ffff ? Character{} : Character{code, length};
}

bool IsControl(uint32_t code) {
  return code < 0x20 || (code >= 0x7f && code < 0xa0);
}

// Marks that turn the direction of the text around them can make a name look like another one.
bool IsDirection(uint32_t code) {
  return code == 0x200e || code == 0x200f || (code >= 0x202a && code <= 0x202e) || (code >= 0x2066 && code <= 0x2069);
}

std::string_view Trimmed(std::string_view text) {
  const size_t begin = text.find_first_not_of(' ');
  return begin == std::string_view::npos ? std::string_view()
                                         : text.substr(begin, text.find_last_not_of(' ') + 1 - begin);
}

std::string LowerCase(std::string_view text) {
  std::string lower(text);
  for (char &c : lower) {
    c = c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  }
  return lower;
}

} // namespace

bool IsCleanText(std::string_view text) {
  if (text.size() > kTextLimit) {
    return false;
  }
  while (!text.empty()) {
    const Character next = FirstCharacter(text);
    if (next.length == 0 || IsControl(next.code)) {
      return false;
    }
    text.remove_prefix(next.length);
  }
  return true;
}

std::string CleanText(std::string_view text) {
  std::string clean;
  while (!text.empty()) {
    const Character next = FirstCharacter(text);
    const size_t length = std::max<size_t>(next.length, 1);
    if (next.length != 0 && !IsControl(next.code) && !IsDirection(next.code)) {
      if (clean.size() + length > kTextLimit) {
        break;
      }
      clean += text.substr(0, length);
    }
    text.remove_prefix(length);
  }
  return std::string(Trimmed(clean));
}

std::string CleanName(std::string_view text) {
  std::string name = CleanText(text);
  if (!name.empty() && name.back() == '.') {
    name.pop_back();
  }
  const std::string lower = LowerCase(name);
  for (const std::string_view domain : kDomains) {
    if (lower.ends_with(domain)) {
      name.resize(name.size() - domain.size());
      break;
    }
  }
  const std::string bare = LowerCase(name);
  const bool isNone = std::find(std::begin(kPlaceholders), std::end(kPlaceholders), bare) != std::end(kPlaceholders);
  return isNone ? std::string() : name;
}

} // namespace vornhost
