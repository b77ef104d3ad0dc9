#include "host/timecontrol/neighbours.h"

#include "host/network/neighbours.h"
#include "host/network/netlink.h"
#include "host/utility/log.h"

namespace vornhost {

std::vector<std::string> AddressesOf(const MacSet &macs) {
  std::vector<std::string> addresses;
  try {
    for (const Neighbour &neighbour : ReadNeighbours()) {
      if (macs.count(neighbour.mac) != 0) {
        addresses.push_back(neighbour.ip);
      }
    }
  } catch (const NetlinkError &error) {
    LogError("time control: the kernel does not tell its neighbours: %s", error.what());
  }
  return addresses;
}

} // namespace vornhost
