#include "host/routes/route_rule.h"

#include "host/network/interface_name.h"
#include "host/network/ipv4.h"

#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <charconv>

namespace vornhost {

namespace {

constexpr uint32_t kIpv6Metric = 1024; // what the kernel makes of none

// Networks that no route of a user's leads to.
std::vector<IpNetwork> ReservedOf(int family) {
  const auto make = [family](const char *text, int length) {
    return IpNetwork::Parse(text, family)->WithLength(length);
  };
  if (family == AF_INET) {
    return {make("0.0.0.0", 8), make("127.0.0.0", 8), make("169.254.0.0", 16), make("224.0.0.0", 3)};
  }
  return {make("::", 96), make("::ffff:0:0", 96), make("fe80::", 10), make("ff00::", 8)};
}

bool IsReserved(const IpNetwork &network) {
  static const std::vector<IpNetwork> kReserved4 = ReservedOf(AF_INET);
  static const std::vector<IpNetwork> kReserved6 = ReservedOf(AF_INET6);
  const auto &reserved = network.GetFamily() == AF_INET ? kReserved4 : kReserved6;
  return std::any_of(reserved.begin(), reserved.end(), [&](const IpNetwork &other) { return other.Contains(network); });
}

std::optional<int> ParseLength(const std::string &text, int family) {
  if (family == AF_INET) {
    return text.find('\0') == std::string::npos ? PrefixOfNetmask(text.c_str()) : std::nullopt;
  }
  int length = 0;
  const char *end = text.data() + text.size();
  const auto [rest, error] = std::from_chars(text.data(), end, length);
  const bool isPlain = !text.empty() && text[0] != '-' && (text[0] != '0' || text.size() == 1);
  if (error != std::errc() || rest != end || !isPlain || length > 128) {
    return std::nullopt;
  }
  return length;
}

std::optional<RouteFault> DestinationFault(const IpNetwork &destination, const char *lengthField) {
  if (destination.GetLength() == 0) {
    return RouteFault{lengthField, "the default route belongs to the gateway list"};
  }
  if (destination.HasHostBits()) {
    return RouteFault{"ip", "host bits are set"};
  }
  if (IsReserved(destination)) {
    return RouteFault{"ip", "not a network that can be routed to"};
  }
  return std::nullopt;
}

RouteFault AddressFault(const char *field, const std::string &text, int family) {
  const bool isOther = IpNetwork::Parse(text, family == AF_INET ? AF_INET6 : AF_INET).has_value();
  return {field, isOther ? "an address of the other family" : "no address"};
}

std::optional<RouteFault> TextFault(const Json::Value &object, const char *field, std::string &text) {
  const Json::Value &member = object[field];
  if (!member.isNull() && !member.isString()) {
    return RouteFault{field, "no text"};
  }
  text = member.asString();
  return std::nullopt;
}

} // namespace

bool IsRoutableName(const std::string &name) {
  return IsInterfaceName(name) && name[0] != '-' && name != "lo";
}

std::optional<RouteFault> ReadRuleTexts(const Json::Value &object, int family, RuleTexts &texts) {
  if (!object.isObject()) {
    return RouteFault{"rule", "no object"};
  }
  const char *lengthField = family == AF_INET ? "mask" : "prefix_length";
  for (const auto &[field, text] : {std::pair("ip", &texts.ip), std::pair(lengthField, &texts.length),
                                    std::pair("gateway", &texts.gateway), std::pair("ifname", &texts.ifname)}) {
    if (auto fault = TextFault(object, field, *text)) {
      return fault;
    }
  }
  const Json::Value &enabled = object["enable"];
  if (!enabled.isNull() && !enabled.isBool()) {
    return RouteFault{"enable", "neither true nor false"};
  }
  texts.enabled = enabled.asBool();
  return std::nullopt;
}

std::optional<RouteFault> ParseRule(const RuleTexts &texts, int family, RouteRule &rule) {
  const char *lengthField = family == AF_INET ? "mask" : "prefix_length";
  auto destination = IpNetwork::Parse(texts.ip, family);
  if (!destination) {
    return AddressFault("ip", texts.ip, family);
  }
  const auto length = ParseLength(texts.length, family);
  if (!length) {
    return RouteFault{lengthField, family == AF_INET ? "no netmask" : "no prefix length of 1 to 128"};
  }
  destination = destination->WithLength(*length);
  if (auto fault = DestinationFault(*destination, lengthField)) {
    return fault;
  }
  rule.gateway.clear();
  if (!texts.gateway.empty()) {
    const auto gateway = IpNetwork::Parse(texts.gateway, family);
    if (!gateway) {
      return AddressFault("gateway", texts.gateway, family);
    }
    rule.gateway = gateway->GetText();
  }
  if (!IsRoutableName(texts.ifname)) {
    return RouteFault{"ifname", "no interface name"};
  }
  rule.family = family;
  rule.destination = destination->GetText();
  rule.ifname = texts.ifname;
  rule.enabled = texts.enabled;
  return std::nullopt;
}

RouteSurroundings::RouteSurroundings(Netlink &netlink) {
  for (Link &link : netlink.Links()) {
    links_.emplace(link.name, std::move(link));
  }
  for (const Address &address : netlink.Addresses()) {
    const auto own = IpNetwork::ParseSubnet(address.text, address.family);
    const auto subnet = address.peer.empty() ? own : IpNetwork::ParseSubnet(address.peer, address.family);
    if (own && subnet) {
      neighbourhoods_.push_back({address.index, *own, *subnet});
    }
  }
}

const Link *RouteSurroundings::Find(const std::string &name) const {
  const auto found = links_.find(name);
  return found == links_.end() ? nullptr : &found->second;
}

std::optional<RouteFault> RouteSurroundings::FaultOf(const RouteRule &rule) const {
  const Link *link = Find(rule.ifname);
  if (link == nullptr) {
    return RouteFault{"ifname", "no such interface"};
  }
  if (!link->up) {
    return RouteFault{"ifname", "the interface is down"};
  }
  return GatewayFault(rule, *link);
}

std::optional<RouteFault> RouteSurroundings::GatewayFault(const RouteRule &rule, const Link &link) const {
  if (rule.gateway.empty()) {
    return std::nullopt;
  }
  static const IpNetwork kLinkLocal6 = IpNetwork::Parse("fe80::", AF_INET6)->WithLength(10);
  const IpNetwork gateway = *IpNetwork::Parse(rule.gateway, rule.family);
  bool onLink = kLinkLocal6.Contains(gateway);
  for (const auto &[index, own, subnet] : neighbourhoods_) {
    if (own.IsSameAddress(gateway)) {
      return RouteFault{"gateway", "an address of this router"};
    }
    if (index == link.index && subnet.IsEdge(gateway)) {
      return RouteFault{"gateway", "the subnet's own address or its broadcast address"};
    }
    onLink = onLink || (index == link.index && subnet.Contains(gateway));
  }
  if (!onLink) {
    return RouteFault{"gateway", "not on the interface's link"};
  }
  return std::nullopt;
}

Route RouteOfRule(const RouteRule &rule, const Link &link) {
  Route route;
  route.index = link.index;
  route.family = rule.family;
  route.destination = rule.destination;
  route.gateway = rule.gateway;
  route.metric = rule.family == AF_INET6 ? kIpv6Metric : 0;
  route.table = RT_TABLE_MAIN;
  route.protocol = kStaticRouteProtocol;
  route.scope = rule.family == AF_INET && rule.gateway.empty() ? RT_SCOPE_LINK : RT_SCOPE_UNIVERSE;
  return route;
}

} // namespace vornhost
