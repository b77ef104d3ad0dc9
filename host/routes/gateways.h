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

#include <set>
#include <string>
#include <vector>

namespace vornhost {

/// RTA_PROTOCOL of the copies of advertised default routes.
constexpr int kGatewayProtocol = 87;

/// No order is longer.
constexpr size_t kGatewayLimit = 64;

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

  /// Puts an interface at a place of the order; those from there on move back. The caller has the routes' turn.
  /// @return false for what cannot be an order: a place behind the end, or an interface that has a place before it
  bool Place(const std::string &ifname, size_t position);

  /// Makes the kernel's default routes follow the order; when the kernel refuses one, all are put back and NetlinkError
  /// is thrown. The caller has the routes' turn.
  /// @param[in] settling  interfaces whose link has just come back: behind those that have had theirs for longer
  void Refresh(const std::set<std::string> &settling = {});

private:
  struct Scene;

  Scene Look();
  std::vector<Route> Defaults();
  std::vector<Route> Wanted(const Scene &scene, const std::set<std::string> &settling) const;
  void Restore(const std::vector<Route> &before);

  Netlink &netlink_;
  int family_;
};

} // namespace vornhost

#endif
