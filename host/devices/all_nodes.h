// Finds hosts that have no IPv4 address and keep quiet, by an ICMPv6 echo request to all nodes of a link (ff02::1).
//
// It comes from the bridge's global address, so that hosts answer from one of theirs (RFC 6724 section 5), which is
// what can be evidence later: an answer names an address to be asked, no more. Not everybody answers (RFC 4443
// section 4.2 says SHOULD, and some firewalls do not let them); those that made their addresses of one interface
// identifier are found by the kernel's neighbours of the link (DeviceNeighbour::guess). A multicast listener query,
// which everybody must answer, is not used: whoever sends one becomes the link's querier, and switches that snoop would
// go by its seldom questions and cut hosts off.
#ifndef HOST_DEVICES_ALL_NODES_H
#define HOST_DEVICES_ALL_NODES_H

#include "host/devices/neighbours.h"
#include "host/utility/unique_fd.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

class AllNodesEcho {
public:
  AllNodesEcho();

  /// Asks on every bridge that has an address for it, and listens for a while.
  /// @param[in] now  BootMillis
  void Ask(const std::vector<Bridge> &bridges, int64_t now);

  /// Takes what has come: neighbours that are no evidence. So many at most that nobody can keep the scanner busy.
  std::vector<DeviceNeighbour> Receive(const std::vector<Bridge> &bridges, int64_t now);

private:
  void Send(const Bridge &bridge) const;

  UniqueFd icmp_;
  UniqueFd ear_; // open while answers may come: it sees every IPv6 packet
  int64_t asked_ = 0;
  uint16_t id_; // who did not hear the question cannot answer it
};

/// The sender of an answer.
/// @param[in] packet  from its IPv6 header on
/// @return empty when it is none, or does not come from a network of the bridge
std::string EchoSender(std::string_view packet, uint16_t id, const Bridge &bridge);

} // namespace vornhost

#endif
