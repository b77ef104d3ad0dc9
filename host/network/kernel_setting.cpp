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

void ListenToRouters(const std::string &interface) {
  WriteSetting("/proc/sys/net/ipv6/conf/" + interface + "/accept_ra", "2");
}

} // namespace vornhost
