#include "webapi/random.h"

#include <sys/random.h>

#include <string_view>
#include <vector>

namespace vornwebapi {

std::string HexDigits(const unsigned char *bytes, size_t count) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  std::string out;
  out.reserve(2 * count);
  for (size_t at = 0; at < count; ++at) {
    out += kDigits[bytes[at] >> 4];
    out += kDigits[bytes[at] & 0xF];
  }
  return out;
}

std::string RandomDigits(size_t bytes) {
  std::vector<unsigned char> drawn(bytes);
  if (getrandom(drawn.data(), drawn.size(), 0) != static_cast<ssize_t>(bytes)) {
    return {};
  }
  return HexDigits(drawn.data(), drawn.size());
}

} // namespace vornwebapi
