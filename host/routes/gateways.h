// The order of the interfaces that carry the default route, and the kernel's default routes by it.
//
// Each interface's default route gets a metric by its place in the order; one whose link is gone is put behind all that
// have theirs, so that traffic leaves by the first that works. A route that somebody configured (the DHCP client, a
// person) is moved to its metric. One that the kernel made of a router advertisement belongs to the kernel, which takes
// it away and brings it again as it sees fit, always with metric 1024: it stays, and a copy before it, under a protocol
// number of the project's own, does the ordering. As long as no order was ever stored, the routes are left alone.
#ifndef HOST_ROUTES_GATEWAYS_H
#define HOST_ROUTES_GATEWAYS_H

#include "host/network/netlink.h"

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace vornhost {

/// RTA_PROTOCOL of the copies of advertised default routes.
constexpr int kGatewayProtocol = 87;

/// Interfaces whose link came back a moment ago. They go behind those that have had theirs for longer; nothing: whoever
/// asks does not follow the links, and what was put behind the others stays there.
using Settling = std::optional<std::set<std::string>>;

struct Gateway {
  std::string ifname;
  std::string address; ///< empty: none is known
  std::string dns;     ///< addresses of the lease, separated by blanks; empty: none is known
  /// "ready"; "no-gateway": it has a link and nobody told of a gateway; "no-link"; "down"; "absent": no such interface
  std::string state;
  bool active = false; ///< the traffic leaves by it now
};

class Gateways {
public:
  /// @param[in] family  AF_INET or AF_INET6
  Gateways(Netlink &netlink, int family) : netlink_(netlink), family_(family) {}

  // Each of these throws std::runtime_error when files or kernel cannot be asked or changed.

  /// Those of the order, then other interfaces that have a default route.
  std::vector<Gateway> List();

  /// Puts an interface at a place of the order, wherever it was before; those from there on move back, and what is then
  /// behind the longest order leaves it. So of two who store an order at once the last to speak of an interface is
  /// right, and neither is refused for what the other said. The caller has the routes' turn.
  /// @return why it cannot have the place; nothing when it was stored
  std::optional<std::string> Place(const std::string &ifname, size_t position);

  /// Makes the kernel's default routes follow the order; when the kernel refuses one, all are put back and NetlinkError
  /// is thrown. The caller has the routes' turn.
  void Refresh();

  /// The same, each interface for itself: one whose route the kernel refuses keeps what it has and costs no other. The
  /// caller has the routes' turn.
  /// @param[in] links  those that `settling` was found in
  /// @return what the kernel refused, a text for each
  std::vector<std::string> Follow(std::vector<Link> links, const Settling &settling);

private:
  struct Scene;
  using Refused = std::function<void(const NetlinkError &error)>;

  Scene Look(std::vector<Link> links);
  std::vector<Route> Defaults();
  std::vector<Route> Wanted(const Scene &scene, const Settling &settling) const;
  void Change(const std::vector<Route> &before, const std::vector<Route> &wanted, const Refused &refused);
  void Restore(const std::vector<Route> &before);

  Netlink &netlink_;
  int family_;
};

} // namespace vornhost

#endif
