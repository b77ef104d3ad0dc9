// The kernel's neighbour table: which MAC address answered for which address.
#ifndef HOST_NETWORK_NEIGHBOURS_H
#define HOST_NETWORK_NEIGHBOURS_H

#include <string>
#include <vector>

namespace vornhost {

struct Neighbour {
  int index = 0;  ///< of the link
  int family = 0; ///< AF_INET or AF_INET6
  std::string ip;
  std::string mac; ///< lower case, colons
  int state = 0;   ///< NUD_* of linux/neighbour.h
};

/// The entries of both families that have a MAC address and did not fail. Throws NetlinkError when the kernel cannot be
/// asked.
std::vector<Neighbour> ReadNeighbours();

} // namespace vornhost

#endif
