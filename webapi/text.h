// Texts of protocols: ASCII only, whatever the locale.
#ifndef WEBAPI_TEXT_H
#define WEBAPI_TEXT_H

#include <algorithm>
#include <string>
#include <string_view>

namespace vornwebapi {

/// Without the blanks at both ends.
inline std::string_view Trim(std::string_view text, std::string_view blanks = " \t") {
  const size_t begin = text.find_first_not_of(blanks);
  return begin == std::string_view::npos ? "" : text.substr(begin, text.find_last_not_of(blanks) - begin + 1);
}

inline std::string Lower(std::string_view text) {
  std::string out(text);
  std::transform(out.begin(), out.end(), out.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + ('a' - 'A')) : c; });
  return out;
}

inline bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

inline bool IsAlphanumeric(char c) {
  return IsDigit(c) || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}

} // namespace vornwebapi

#endif
