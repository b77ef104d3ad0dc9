#include "host/packageserver/strict_json.h"

#include <json/reader.h>

#include <cstdint>
#include <exception>
#include <memory>

namespace vornhost {

namespace {

using Byte = unsigned char;

// How many bytes the UTF-8 character at `at` has (RFC 3629, section 4: no overlong forms, no surrogates); 0 when it is
// none.
size_t CharacterLength(const std::string &text, size_t at) {
  const auto byte = [&text, &at](size_t offset) {
    return at + offset < text.size() ? static_cast<Byte>(text[at + offset]) : Byte{0};
  };
  const Byte first = byte(0);
  if (first < 0x80) {
    return 1;
  }
  size_t length = 0;
  Byte low = 0x80;
  Byte high = 0xbf;
  if (first >= 0xc2 && first <= 0xdf) {
    length = 2;
  } else if (first >= 0xe0 && first <= 0xef) {
    length = 3;
    low = first == 0xe0 ? 0xa0 : low;
    high = first == 0xed ? 0x9f : high;
  } else if (first >= 0xf0 && first <= 0xf4) {
    length = 4;
    low = first == 0xf0 ? 0x90 : low;
    high = first == 0xf4 ? 0x8f : high;
  }
  if (length == 0 || byte(1) < low || byte(1) > high) {
    return 0;
  }
  for (size_t offset = 2; offset < length; ++offset) {
    if ((byte(offset) & 0xc0) != 0x80) {
      return 0;
    }
  }
  return length;
}

size_t SkipDigits(const std::string &text, size_t at) {
  const size_t end = text.find_first_not_of("0123456789", at);
  return end == std::string::npos ? text.size() : end;
}

char CharacterAt(const std::string &text, size_t at) {
  return at < text.size() ? text[at] : '\0';
}

// @return where the number that begins at `at` ends (RFC 8259, section 6); `at` itself when it is none
size_t SkipNumber(const std::string &text, size_t at) {
  const size_t whole = at + (text[at] == '-' ? 1 : 0);
  size_t end = SkipDigits(text, whole);
  if (end == whole || (text[whole] == '0' && end > whole + 1)) {
    return at;
  }
  if (CharacterAt(text, end) == '.') {
    const size_t fraction = end + 1;
    end = SkipDigits(text, fraction);
    if (end == fraction) {
      return at;
    }
  }
  if (CharacterAt(text, end) == 'e' || CharacterAt(text, end) == 'E') {
    const char sign = CharacterAt(text, end + 1);
    const size_t exponent = end + (sign == '+' || sign == '-' ? 2 : 1);
    end = SkipDigits(text, exponent);
    if (end == exponent || exponent > text.size()) {
      return at;
    }
  }
  return end;
}

bool BeginsNumber(char byte) {
  return byte == '-' || byte == '+' || byte == '.' || (byte >= '0' && byte <= '9');
}

// What has to be known before JsonCpp sees the text: it recurses once a level, throws at 1000, and takes comments and
// numbers such as 01 and 1. in its strict mode too.
bool IsFitForReader(const std::string &text) {
  int depth = 0;
  bool inString = false;
  for (size_t at = 0; at < text.size();) {
    const size_t length = CharacterLength(text, at);
    const char byte = text[at];
    if (length == 0 || (inString && static_cast<Byte>(byte) < 0x20)) {
      return false;
    }
    if (!inString && BeginsNumber(byte)) {
      const size_t end = SkipNumber(text, at);
      if (end == at) {
        return false;
      }
      at = end;
      continue;
    }
    at += length;
    if (inString) {
      if (byte == '\\') {
        ++at; // the escaped character, an ASCII one in every valid text
      }
      inString = byte != '"';
    } else if (byte == '"') {
      inString = true;
    } else if (byte == '[' || byte == '{') {
      if (++depth > kJsonDepthLimit) {
        return false;
      }
    } else if (byte == ']' || byte == '}') {
      --depth;
    } else if (byte == '/' || byte == '\0') {
      return false;
    }
  }
  return depth == 0 && !inString;
}

} // namespace

bool ParseStrictJson(const std::string &text, Json::Value &value) {
  if (!IsFitForReader(text)) {
    return false;
  }
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["strictRoot"] = false; // RFC 8259, section 2: any value
  builder["skipBom"] = false;
  try {
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value parsed;
    // c_str: JsonCpp reads one byte past the end of a wrong document that ends in a carriage return.
    const char *begin = text.c_str();
    if (!reader->parse(begin, begin + text.size(), &parsed, nullptr)) {
      return false;
    }
    value = std::move(parsed);
    return true;
  } catch (const std::exception &) {
    return false;
  }
}

} // namespace vornhost
