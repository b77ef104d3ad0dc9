#include "host/routes/gateways.h"

#include "host/network/names.h"
#include "host/network/topology_steps.h"
#include "host/routes/rule_store.h"
#include "platform/utility.h"

#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <optional>

namespace vornhost {

namespace {

// Metrics: a tier, and the place in the order. All are below 1024, the metric of what routers advertise, but the last,
// which is used for IPv4 alone.
constexpr uint32_t kReadyTier = 100;
constexpr uint32_t kSettlingTier = 500;
constexpr uint32_t kDeadTier = 30000;

bool IsOurs(uint32_t metric) {
  const auto isIn = [metric](uint32_t tier) { return metric >= tier && metric < tier + kGatewayLimit; };
  return isIn(kReadyTier) || isIn(kSettlingTier) || isIn(kDeadTier);
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
    const bool hasIt = std::any_of(addresses.begin(), addresses.end(), [&](const Address &other) {
      return other.index == link.index && other.Host() == address;
    });
    return hasIt && !route.gateway.empty() ? std::optional(route) : std::nullopt;
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

std::vector<Route> Gateways::Defaults() {
  std::vector<Route> routes = netlink_.RoutesOf(family_, RT_TABLE_MAIN);
  std::erase_if(routes, [](const Route &route) { return !route.destination.empty(); });
  return routes;
}

Gateways::Scene Gateways::Look() {
  Scene scene{ReadGatewayOrder(family_), netlink_.Links(), netlink_.Addresses(), Defaults()};
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
  const Scene scene = Look();
  const auto first = std::min_element(scene.defaults.begin(), scene.defaults.end(),
                                      [](const Route &one, const Route &other) { return one.metric < other.metric; });
  std::vector<Gateway> out;
  for (const std::string &name : scene.order) {
    Gateway gateway{name, "", "", "absent"};
    if (const Link *link = scene.Find(name)) {
      if (const auto source = scene.SourceOf(*link, family_)) {
        gateway.address = source->gateway;
      }
      gateway.dns = family_ == AF_INET ? LeaseValue(name, "dns") : "";
      gateway.active = first != scene.defaults.end() && first->index == link->index;
      if (link->running) {
        gateway.state = gateway.address.empty() ? "no-gateway" : "ready";
      } else {
        gateway.state = link->up ? "no-link" : "down";
      }
    }
    out.push_back(gateway);
  }
  return out;
}

bool Gateways::Place(const std::string &ifname, size_t position) {
  std::vector<std::string> order = ReadGatewayOrder(family_);
  const auto found = std::find(order.begin(), order.end(), ifname);
  if (found != order.end()) {
    if (static_cast<size_t>(found - order.begin()) < position) {
      return false;
    }
    order.erase(found);
  }
  if (position > order.size() || order.size() >= kGatewayLimit) {
    return false;
  }
  order.insert(order.begin() + static_cast<ptrdiff_t>(position), ifname);
  WriteGatewayOrder(family_, order);
  return true;
}

std::vector<Route> Gateways::Wanted(const Scene &scene, const std::set<std::string> &settling) const {
  std::vector<Route> wanted;
  for (size_t place = 0; place < scene.order.size(); ++place) {
    const Link *link = scene.Find(scene.order[place]);
    std::optional<Route> route = link != nullptr ? scene.SourceOf(*link, family_) : std::nullopt;
    if (!route || !link->up || (!link->running && IsAdvertised(*route))) {
      continue;
    }
    const uint32_t tier = !link->running ? kDeadTier : settling.contains(link->name) ? kSettlingTier : kReadyTier;
    route->metric = tier + static_cast<uint32_t>(place);
    route->protocol = IsAdvertised(*route) ? kGatewayProtocol : route->protocol;
    wanted.push_back(*route);
  }
  return wanted;
}

void Gateways::Refresh(const std::set<std::string> &settling) {
  if (ReadGatewayOrder(family_).empty()) {
    return;
  }
  const Scene scene = Look();
  const std::vector<Route> wanted = Wanted(scene, settling);
  try {
    // New ones first: there is a default route at every moment.
    for (const Route &route : wanted) {
      if (!Contains(scene.defaults, route)) {
        netlink_.ReplaceRoute(route);
      }
    }
    for (const Route &route : scene.defaults) {
      if (!IsAdvertised(route) && !Contains(wanted, route)) {
        netlink_.DeleteRoute(route);
      }
    }
  } catch (const NetlinkError &) {
    Restore(scene.defaults);
    throw;
  }
}

void Gateways::Restore(const std::vector<Route> &before) {
  const std::vector<Route> now = Defaults();
  for (const Route &route : before) {
    if (!Contains(now, route)) {
      Attempt("default route by", route.gateway, [&] { netlink_.ReplaceRoute(route); });
    }
  }
  for (const Route &route : now) {
    if (!Contains(before, route)) {
      Attempt("end of default route by", route.gateway, [&] { netlink_.DeleteRoute(route); });
    }
  }
}

} // namespace vornhost
