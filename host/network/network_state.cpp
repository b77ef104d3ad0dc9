#include "host/network/network_state.h"

#include "host/network/ipv4.h"
#include "host/network/kernel_setting.h"
#include "host/utility/log.h"

#include <linux/if_link.h>
#include <linux/rtnetlink.h>
#include <netinet/in.h>

#include <algorithm>
#include <cerrno>

namespace vornhost {

namespace {

bool IsSame(const Address &left, const Address &right) {
  return left.family == right.family && left.text == right.text;
}

template <typename List> bool Has(const List &list, const Address &wanted) {
  return std::any_of(list.begin(), list.end(), [&wanted](const Address &address) { return IsSame(address, wanted); });
}

std::string BroadcastOf(const std::string &address) {
  const size_t slash = address.find('/');
  const int prefix = std::stoi(address.substr(slash + 1));
  const uint32_t host = ParseIpv4(address.substr(0, slash).c_str()).value_or(0);
  return prefix < 31 ? Ipv4Text(host | ~NetmaskOfPrefix(prefix)) : "";
}

} // namespace

Link NetworkState::Get(const std::string &name) {
  std::optional<Link> link = netlink_.FindLink(name);
  if (!link) {
    throw NetlinkError(name, ENODEV);
  }
  return *link;
}

std::vector<std::string> NetworkState::PortsOf(const std::string &bridge) {
  std::vector<std::string> out;
  const std::optional<Link> master = netlink_.FindLink(bridge);
  if (!master) {
    return out;
  }
  for (const Link &link : netlink_.Links()) {
    if (link.master == master->index) {
      out.push_back(link.name);
    }
  }
  return out;
}

void NetworkState::EnsureBridge(const std::string &name, const std::string &mac) {
  const std::optional<Link> link = netlink_.FindLink(name);
  if (link && link->kind != "bridge") {
    throw NetlinkError(name + " is no bridge", EEXIST);
  }
  if (!link) {
    netlink_.CreateBridge(name, mac);
  } else {
    netlink_.ForwardAtOnce(link->index);
    if (!mac.empty() && link->mac != mac) {
      netlink_.SetMac(link->index, mac);
    }
  }
  // An answer to a probe makes an entry in the neighbour table, also where there is none: without it an idle device
  // whose entry is taken away to be asked for anew would be missing from then on (kernel: ip-sysctl, arp_accept).
  WriteSetting("/proc/sys/net/ipv4/conf/" + name + "/arp_accept", "1");
}

void NetworkState::RemoveBridge(const std::string &name) {
  const std::optional<Link> link = netlink_.FindLink(name);
  if (link && link->kind == "bridge") {
    netlink_.DeleteLink(link->index);
  }
}

// The mode takes effect when the link comes up.
void NetworkState::SetMode(const Link &now, uint8_t mode) {
  if (!now.addrGenMode || *now.addrGenMode == mode) {
    return;
  }
  netlink_.SetUp(now.index, false);
  netlink_.SetAddrGenMode(now.index, mode);
  if (now.up) {
    netlink_.SetUp(now.index, true);
  }
}

void NetworkState::Attach(const std::string &port, const std::string &bridge) {
  const Link link = Get(port);
  const int master = Get(bridge).index;
  if (link.addrGenMode.value_or(IN6_ADDR_GEN_MODE_NONE) != IN6_ADDR_GEN_MODE_NONE) {
    netlink_.SetAddrGenMode(link.index, IN6_ADDR_GEN_MODE_NONE);
    Clear(port); // the link-local address that it has already
  }
  if (link.master != master) {
    netlink_.SetMaster(link.index, master);
  }
  if (!link.up) {
    netlink_.SetUp(link.index, true);
  }
}

void NetworkState::Detach(const std::string &port) {
  const Link link = Get(port);
  if (link.master != 0) {
    netlink_.SetMaster(link.index, 0);
    SetMode(link, IN6_ADDR_GEN_MODE_EUI64);
  }
  SetUp(port);
}

void NetworkState::SetUp(const std::string &name) {
  const Link link = Get(name);
  if (!link.up) {
    netlink_.SetUp(link.index, true);
  }
}

void NetworkState::SetDown(const std::string &name) {
  netlink_.SetUp(Get(name).index, false);
}

void NetworkState::Clear(const std::string &name) {
  const int index = Get(name).index;
  for (const Route &route : netlink_.Routes()) {
    if (route.index == index) {
      netlink_.DeleteRoute(route);
    }
  }
  for (const Address &address : netlink_.Addresses()) {
    if (address.index == index) {
      netlink_.DeleteAddress(address);
    }
  }
}

void NetworkState::AddAddress(const std::string &name, const std::string &address) {
  Address wanted;
  wanted.index = Get(name).index;
  wanted.family = AF_INET;
  wanted.text = address;
  wanted.broadcast = BroadcastOf(address);
  netlink_.AddAddress(wanted);
}

void NetworkState::AddDefaultRoute(const std::string &name, const std::string &gateway) {
  Route route;
  route.index = Get(name).index;
  route.family = AF_INET;
  route.gateway = gateway;
  route.table = RT_TABLE_MAIN;
  route.protocol = RTPROT_STATIC;
  route.scope = RT_SCOPE_UNIVERSE;
  netlink_.AddRoute(route);
}

void NetworkState::Restore(const LinkState &state) {
  const bool bridge = state.link.kind == "bridge";
  if (bridge) {
    EnsureBridge(state.link.name, state.link.mac);
  } else if (!netlink_.FindLink(state.link.name)) {
    LogError("%s is gone and cannot be brought back", state.link.name.c_str());
    return;
  }
  const Link now = Get(state.link.name);
  RestoreMaster(now, state);
  RestoreMode(now, state);
  netlink_.SetUp(now.index, state.link.up);
  RestoreAddresses(now.index, state);
  RestoreRoutes(now.index, state);
}

void NetworkState::RestoreMaster(const Link &now, const LinkState &state) {
  int master = 0;
  if (!state.master.empty()) {
    EnsureBridge(state.master, ""); // a bridge's own state is restored on its own turn
    master = Get(state.master).index;
  }
  if (now.master != master) {
    netlink_.SetMaster(now.index, master);
  }
}

void NetworkState::RestoreMode(const Link &now, const LinkState &state) {
  if (state.link.addrGenMode) {
    SetMode(now, *state.link.addrGenMode);
  }
}

// The link-local address that the kernel makes by itself stays in any case.
void NetworkState::RestoreAddresses(int index, const LinkState &state) {
  std::vector<Address> present;
  for (const Address &address : netlink_.Addresses()) {
    if (address.index == index) {
      present.push_back(address);
    }
  }
  const bool isPort = !state.master.empty();
  for (const Address &address : present) {
    if (!Has(state.addresses, address) && (isPort || !address.IsLinkLocal6())) {
      netlink_.DeleteAddress(address);
    }
  }
  for (Address address : state.addresses) {
    if (!Has(present, address)) {
      address.index = index;
      netlink_.AddAddress(address);
    }
  }
}

// Routes on the link first: they are what a gateway is reached over.
void NetworkState::RestoreRoutes(int index, const LinkState &state) {
  const std::vector<Route> present = netlink_.Routes();
  const auto isWanted = [&state](const Route &route) {
    return std::any_of(state.routes.begin(), state.routes.end(), [&route](const Route &wanted) {
      return wanted.family == route.family && wanted.destination == route.destination &&
             wanted.gateway == route.gateway && wanted.metric == route.metric && wanted.table == route.table;
    });
  };
  for (const Route &route : present) {
    if (route.index == index && !isWanted(route)) {
      netlink_.DeleteRoute(route);
    }
  }
  for (const bool viaGateway : {false, true}) {
    for (Route route : state.routes) {
      if (route.gateway.empty() != viaGateway) {
        route.index = index;
        netlink_.AddRoute(route);
      }
    }
  }
}

} // namespace vornhost
