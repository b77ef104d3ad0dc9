// The kernel's table of IPv4 neighbours, as text.
#ifndef ROUTER_NEIGHBOURS_H
#define ROUTER_NEIGHBOURS_H

#include <functional>
#include <string_view>

namespace router {

inline constexpr char kNeighbourFile[] = "/proc/net/arp";

/// Views into the line being read.
struct Neighbour {
  std::string_view ip;
  std::string_view mac; ///< as the kernel prints it
  std::string_view netif;
};

/// Calls `visit` for every complete entry whose interface has "br" in its name, in the order of the table.
/// @return false when the table cannot be opened
bool VisitNeighbours(const std::function<void(const Neighbour &)> &visit);

} // namespace router

#endif
