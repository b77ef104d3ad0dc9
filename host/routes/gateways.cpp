#include "host/routes/gateways.h"

#include "host/network/names.h"
#include "host/network/topology_steps.h"
#include "host/routes/ip_network.h"
#include "host/routes/rule_store.h"
#include "platform/utility.h"

#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <optional>

namespace vornhost {

namespace {

// Metrics: a tier, and the place in the order. The first two are below 1024, the metric of what routers advertise. An
// advertised route is never in the last: without a link it gets no copy.
constexpr uint32_t kReadyTier = 100;
constexpr uint32_t kSettlingTier = 500;
constexpr uint32_t kDeadTier = 30000;

bool IsIn(uint32_t tier, uint32_t metric) {
  return metric >= tier && metric < tier + kGatewayLimit;
}

bool IsOurs(uint32_t metric) {
  return IsIn(kReadyTier, metric) || IsIn(kSettlingTier, metric) || IsIn(kDeadTier, metric);
}

bool IsSame(const Route &one, const Route &other) {
  return one.index == other.index && one.gateway == other.gateway && one.metric == other.metric &&
         one.protocol == other.protocol;
}

bool Contains(const std::vector<Route> &routes, const Route &route) {
  return std::any_of(routes.begin(), routes.end(), [&route](const Route &other) { return IsSame(route, other); });
}

// The kernel's own; everything else of the default routes is there to be ordered.
bool IsAdvertised(const Route &route) {
  return route.protocol == RTPROT_RA || route.protocol == RTPROT_KERNEL;
}

// The kernel takes such a deletion for one of any metric.
bool IsDeletedBluntly(const Route &route) {
  return route.family == AF_INET && route.metric == 0;
}

// What the DHCP client was told last, as its script wrote it down.
std::string LeaseValue(const std::string &ifname, const char *key) {
  const std::string path = std::string(kRunFolder) + "/lease." + ifname;
  std::array<char, 512> value{};
  if (QARDCFileExist(path.c_str()) != 1 ||
      QARDCFileGetKeyValue(path.c_str(), key, value.data(), value.size(), 0) <= 0) {
    return "";
  }
  return value.data();
}

} // namespace

struct Gateways::Scene {
  std::vector<std::string> order;
  std::vector<Link> links;
  std::vector<Address> addresses;
  std::vector<Route> defaults;

  const Link *Find(const std::string &name) const {
    const auto found =
        std::find_if(links.begin(), links.end(), [&name](const Link &link) { return link.name == name; });
    return found == links.end() ? nullptr : &*found;
  }

  // An interface that lost its route when it was set down has its lease still.
  std::optional<Route> LeasedRoute(const Link &link) const {
    const std::string address = LeaseValue(link.name, "ip");
    Route route;
    route.index = link.index;
    route.family = AF_INET;
    route.gateway = LeaseValue(link.name, "router");
    route.table = RT_TABLE_MAIN;
    route.protocol = RTPROT_DHCP;
    const auto gateway = IpNetwork::Parse(route.gateway, AF_INET);
    const bool hasIt = std::any_of(addresses.begin(), addresses.end(), [&](const Address &other) {
      return other.index == link.index && other.Host() == address;
    });
    if (!hasIt || !gateway) {
      return std::nullopt;
    }
    // Some providers' gateway is in no subnet of the lease's; the DHCP client's script takes it for on the link, too.
    const bool isInSubnet = std::any_of(addresses.begin(), addresses.end(), [&](const Address &other) {
      const auto subnet = other.index == link.index ? IpNetwork::ParseSubnet(other.text, AF_INET) : std::nullopt;
      return subnet && subnet->Contains(*gateway);
    });
    route.hopFlags = isInSubnet ? 0 : RTNH_F_ONLINK;
    return route;
  }

  // Whether the interface was put behind the others: who follows the links alone moves it to the front again.
  bool IsHeldBack(const Link &link) const {
    return std::any_of(defaults.begin(), defaults.end(), [&link](const Route &route) {
      return route.index == link.index && (IsIn(kSettlingTier, route.metric) || IsIn(kDeadTier, route.metric));
    });
  }

  // By which link the traffic leaves. The kernel passes over a route whose link has nothing at the other end.
  int ActiveIndex() const {
    const Route *best = nullptr;
    for (const Route &route : defaults) {
      const bool works = std::any_of(links.begin(), links.end(),
                                     [&route](const Link &link) { return link.index == route.index && link.running; });
      if (works && (best == nullptr || route.metric < best->metric)) {
        best = &route;
      }
    }
    return best != nullptr ? best->index : 0;
  }

  // The default route that an interface has from others. What was put there last is what was not ordered yet.
  std::optional<Route> SourceOf(const Link &link, int family) const {
    std::optional<Route> best;
    const auto rank = [](const Route &route) {
      return std::tuple(IsAdvertised(route), IsOurs(route.metric), route.metric);
    };
    for (const Route &route : defaults) {
      if (route.index == link.index && route.protocol != kGatewayProtocol && (!best || rank(route) < rank(*best))) {
        best = route;
      }
    }
    return best || family != AF_INET ? best : LeasedRoute(link);
  }
};

// One over several hops is its maker's own balance between them, and no order's.
std::vector<Route> Gateways::Defaults() {
  std::vector<Route> routes = netlink_.RoutesOf(family_, RT_TABLE_MAIN);
  std::erase_if(routes, [](const Route &route) { return !route.destination.empty() || route.isOneOfMany; });
  return routes;
}

Gateways::Scene Gateways::Look(std::vector<Link> links) {
  Scene scene{ReadGatewayOrder(family_), std::move(links), netlink_.Addresses(), Defaults()};
  for (const Link &link : scene.links) {
    const bool hasDefault = std::any_of(scene.defaults.begin(), scene.defaults.end(),
                                        [&link](const Route &route) { return route.index == link.index; });
    const bool isListed = std::find(scene.order.begin(), scene.order.end(), link.name) != scene.order.end();
    if (hasDefault && !isListed && scene.order.size() < kGatewayLimit) {
      scene.order.push_back(link.name);
    }
  }
  return scene;
}

std::vector<Gateway> Gateways::List() {
  const Scene scene = Look(netlink_.Links());
  const int active = scene.ActiveIndex();
  std::vector<Gateway> out;
  for (const std::string &name : scene.order) {
    Gateway gateway{name, "", "", "absent"};
    if (const Link *link = scene.Find(name)) {
      const auto source = scene.SourceOf(*link, family_);
      gateway.address = source ? source->gateway : "";
      gateway.dns = family_ == AF_INET ? LeaseValue(name, "dns") : "";
      gateway.active = link->index == active;
      if (link->running) {
        gateway.state = source ? "ready" : "no-gateway"; // over a point-to-point link nobody needs an address
      } else {
        gateway.state = link->up ? "no-link" : "down";
      }
    }
    out.push_back(gateway);
  }
  return out;
}

std::optional<std::string> Gateways::Place(const std::string &ifname, size_t position) {
  if (position >= kGatewayLimit) {
    return "no order is longer than " + std::to_string(kGatewayLimit);
  }
  std::vector<std::string> order = ReadGatewayOrder(family_);
  std::erase(order, ifname);
  if (position > order.size()) {
    return "its place " + std::to_string(position) + " is behind the end";
  }
  order.insert(order.begin() + static_cast<ptrdiff_t>(position), ifname);
  order.resize(std::min(order.size(), kGatewayLimit));
  WriteGatewayOrder(family_, order);
  return std::nullopt;
}

std::vector<Route> Gateways::Wanted(const Scene &scene, const Settling &settling) const {
  std::vector<Route> wanted;
  for (size_t place = 0; place < scene.order.size(); ++place) {
    const Link *link = scene.Find(scene.order[place]);
    std::optional<Route> route = link != nullptr ? scene.SourceOf(*link, family_) : std::nullopt;
    if (!route || !link->up || (!link->running && IsAdvertised(*route))) {
      continue;
    }
    const bool settles = settling ? settling->contains(link->name) : scene.IsHeldBack(*link);
    const uint32_t tier = !link->running ? kDeadTier : settles ? kSettlingTier : kReadyTier;
    route->metric = tier + static_cast<uint32_t>(place);
    route->protocol = IsAdvertised(*route) ? kGatewayProtocol : route->protocol;
    wanted.push_back(*route);
  }
  return wanted;
}

// New ones first: there is a default route at every moment.
void Gateways::Change(const std::vector<Route> &before, const std::vector<Route> &wanted, const Refused &refused) {
  std::set<int> left; // links that keep what they have
  const auto attempt = [&](const Route &route, auto change) {
    if (left.contains(route.index)) {
      return;
    }
    try {
      (netlink_.*change)(route);
    } catch (const NetlinkError &error) {
      left.insert(route.index);
      refused(error);
    }
  };
  const auto bring = [&](const std::vector<Route> &present) {
    for (const Route &route : wanted) {
      if (!Contains(present, route)) {
        attempt(route, &Netlink::ReplaceRoute);
      }
    }
  };
  bring(before);
  bool isBlunt = false;
  for (const Route &route : before) {
    if (!IsAdvertised(route) && !Contains(wanted, route)) {
      attempt(route, &Netlink::DeleteRoute);
      isBlunt = isBlunt || IsDeletedBluntly(route);
    }
  }
  if (isBlunt) {
    bring(Defaults()); // somebody else's deletion of the same route may have turned ours on a wanted one
  }
}

void Gateways::Refresh() {
  if (ReadGatewayOrder(family_).empty()) {
    return;
  }
  const Scene scene = Look(netlink_.Links());
  try {
    Change(scene.defaults, Wanted(scene, std::nullopt), [](const NetlinkError &error) { throw error; });
  } catch (const NetlinkError &) {
    Restore(scene.defaults);
    throw;
  }
}

std::vector<std::string> Gateways::Follow(std::vector<Link> links, const Settling &settling) {
  std::vector<std::string> failures;
  if (!ReadGatewayOrder(family_).empty()) {
    const Scene scene = Look(std::move(links));
    Change(scene.defaults, Wanted(scene, settling),
           [&failures](const NetlinkError &error) { failures.emplace_back(error.what()); });
  }
  return failures;
}

void Gateways::Restore(const std::vector<Route> &before) {
  const std::vector<Route> now = Defaults();
  for (const Route &route : before) {
    if (!IsAdvertised(route) && !Contains(now, route)) {
      Attempt("default route by", route.gateway, [&] { netlink_.ReplaceRoute(route); });
    }
  }
  for (const Route &route : now) {
    if (!IsAdvertised(route) && !Contains(before, route)) {
      Attempt("end of default route by", route.gateway, [&] { netlink_.DeleteRoute(route); });
    }
  }
}

} // namespace vornhost
