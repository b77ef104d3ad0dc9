#include "host/network/interface_name.h"

#include <net/if.h>

#include <algorithm>
#include <cctype>

namespace vornhost {

bool IsInterfaceName(const std::string &name) {
  const auto isGood = [](unsigned char byte) {
    return std::isalnum(byte) != 0 || byte == '-' || byte == '_' || byte == '.';
  };
  return !name.empty() && name.size() < IFNAMSIZ && name != "." && name != ".." &&
         std::all_of(name.begin(), name.end(), isGood);
}

} // namespace vornhost
