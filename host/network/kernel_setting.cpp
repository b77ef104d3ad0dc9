#include "host/network/kernel_setting.h"

#include <fstream>

namespace vornhost {

void WriteSetting(const std::string &path, const std::string &value) {
  std::string now;
  std::getline(std::ifstream(path), now);
  if (!now.empty() && now != value) {
    std::ofstream(path) << value;
  }
}

} // namespace vornhost
