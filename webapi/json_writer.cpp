#include "webapi/json_writer.h"

#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <string_view>

namespace vornwebapi {
namespace {

constexpr unsigned kReplacement = 0xFFFD;

void AppendHex(unsigned unit, std::string &out) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  out += "\\u";
  for (int shift = 12; shift >= 0; shift -= 4) {
    out += kDigits[(unit >> shift) & 0xF];
  }
}

void AppendCodePoint(unsigned code, std::string &out) {
  if (code < 0x10000) {
    AppendHex(code, out);
    return;
  }
  code -= 0x10000;
  AppendHex(0xD800 + ((code >> 10) & 0x3FF), out);
  AppendHex(0xDC00 + (code & 0x3FF), out);
}

/// Takes one multi-byte character from the front of `text`. A sequence that is cut off costs its first byte only, one
/// that is too long for its value all of its bytes; what follows a leading byte is not looked at more closely.
unsigned TakeCodePoint(std::string_view &text) {
  const auto byte = [&text](size_t index) { return static_cast<unsigned>(static_cast<unsigned char>(text[index])); };
  struct Form {
    unsigned end;  // leading bytes below this
    size_t length; // in bytes
    unsigned mask; // of the leading byte's part
    unsigned least;
  };
  constexpr std::array<Form, 3> kForms = {{{0xE0, 2, 0x1F, 0x80}, {0xF0, 3, 0x0F, 0x800}, {0xF8, 4, 0x07, 0x10000}}};
  const unsigned first = byte(0);
  for (const Form &form : kForms) {
    if (first >= form.end) {
      continue;
    }
    if (text.size() < form.length) {
      break;
    }
    unsigned code = first & form.mask;
    for (size_t index = 1; index < form.length; ++index) {
      code = (code << 6) | (byte(index) & 0x3F);
    }
    text.remove_prefix(form.length);
    const bool surrogate = form.length == 3 && code >= 0xD800 && code <= 0xDFFF;
    return code < form.least || surrogate ? kReplacement : code;
  }
  text.remove_prefix(1);
  return kReplacement;
}

void AppendSpecial(char c, std::string &out) {
  switch (c) {
  case '"':
    out += "\\\"";
    break;
  case '\\':
    out += "\\\\";
    break;
  case '\b':
    out += "\\b";
    break;
  case '\f':
    out += "\\f";
    break;
  case '\n':
    out += "\\n";
    break;
  case '\r':
    out += "\\r";
    break;
  case '\t':
    out += "\\t";
    break;
  default:
    AppendHex(static_cast<unsigned char>(c), out);
  }
}

bool IsPlain(char c) {
  const auto byte = static_cast<unsigned char>(c);
  return byte >= 0x20 && byte < 0x80 && c != '"' && c != '\\';
}

void AppendText(std::string_view text, std::string &out) {
  out += '"';
  while (!text.empty()) {
    size_t plain = 0;
    while (plain < text.size() && IsPlain(text[plain])) {
      ++plain;
    }
    out.append(text.data(), plain);
    text.remove_prefix(plain);
    if (text.empty()) {
      break;
    }
    if (static_cast<unsigned char>(text.front()) < 0x80) {
      AppendSpecial(text.front(), out);
      text.remove_prefix(1);
    } else {
      AppendCodePoint(TakeCodePoint(text), out);
    }
  }
  out += '"';
}

void AppendDouble(double number, std::string &out) {
  if (std::isnan(number)) {
    out += "null";
    return;
  }
  if (std::isinf(number)) {
    out += number < 0 ? "-1e+9999" : "1e+9999";
    return;
  }
  std::array<char, 32> digits{}; // 17 significant digits, sign, point, exponent
  const auto length = static_cast<size_t>(std::snprintf(digits.data(), digits.size(), "%.17g", number));
  const std::string_view text(digits.data(), length);
  out += text;
  if (text.find_first_of(".e") == std::string_view::npos) {
    out += ".0";
  }
}

template <typename Integer> void AppendInteger(Integer number, std::string &out) {
  std::array<char, 24> digits{};
  const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr;
  out.append(digits.data(), end);
}

std::string_view TextOf(const Json::Value &value) {
  const char *begin = nullptr;
  const char *end = nullptr;
  return value.getString(&begin, &end) ? std::string_view(begin, static_cast<size_t>(end - begin)) : "";
}

// Goes from element to element, as each that is looked up by its index is searched from the top of a tree. One that was
// never set is not there, and null.
void AppendArray(const Json::Value &array, std::string &out) {
  out += '[';
  Json::ArrayIndex next = 0;
  for (auto element = array.begin(); element != array.end(); ++element, ++next) {
    for (; next < element.index(); ++next) {
      out += "null,";
    }
    WriteJson(*element, out);
    out += ',';
  }
  if (next > 0) {
    out.pop_back();
  }
  out += ']';
}

void AppendObject(const Json::Value &object, std::string &out) {
  out += '{';
  bool first = true;
  for (auto member = object.begin(); member != object.end(); ++member) {
    if (!first) {
      out += ',';
    }
    first = false;
    const char *end = nullptr;
    const char *begin = member.memberName(&end);
    AppendText({begin, static_cast<size_t>(end - begin)}, out);
    out += ':';
    WriteJson(*member, out);
  }
  out += '}';
}

} // namespace

// The depth is that of the trees that a module built: copying one in JsonCpp takes more of the stack than writing it.
void WriteJson(const Json::Value &value, std::string &out) {
  switch (value.type()) {
  case Json::nullValue:
    out += "null";
    break;
  case Json::intValue:
    AppendInteger(value.asLargestInt(), out);
    break;
  case Json::uintValue:
    AppendInteger(value.asLargestUInt(), out);
    break;
  case Json::realValue:
    AppendDouble(value.asDouble(), out);
    break;
  case Json::stringValue:
    AppendText(TextOf(value), out);
    break;
  case Json::booleanValue:
    out += value.asBool() ? "true" : "false";
    break;
  case Json::arrayValue:
    AppendArray(value, out);
    break;
  case Json::objectValue:
    AppendObject(value, out);
    break;
  }
}

} // namespace vornwebapi
