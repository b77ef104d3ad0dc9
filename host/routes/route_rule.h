// One static route as the user writes it, and what makes it acceptable.
//
// A rule is an object of texts and a truth value: "ip" (destination network), "mask" (IPv4: netmask) or "prefix_length"
// (IPv6: decimal), "gateway" (empty: the network is on the link itself), "ifname", "enable". What else a rule has is
// kept and not looked at, except "installed" and "reason", which belong to the answer and are never stored.
#ifndef HOST_ROUTES_ROUTE_RULE_H
#define HOST_ROUTES_ROUTE_RULE_H

#include "host/network/netlink.h"
#include "host/routes/ip_network.h"

#include <json/value.h>

#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

namespace vornhost {

/// RTA_PROTOCOL of the routes that come from the rules: nobody else's, and not in rt_protos.
constexpr int kStaticRouteProtocol = 86;

/// What is wrong with a rule.
struct RouteFault {
  std::string field; ///< the member's name
  std::string reason;
};

/// A rule's members as texts.
struct RuleTexts {
  std::string ip;
  std::string length; ///< netmask or prefix length
  std::string gateway;
  std::string ifname;
  bool enabled = false;
};

/// A rule whose fields are well formed. The texts are in the kernel's own form.
struct RouteRule {
  int family = 0;
  std::string destination; ///< with prefix length, which is left out when it is a single address's
  std::string gateway;     ///< empty: on the link
  std::string ifname;
  bool enabled = false;

  bool operator==(const RouteRule &) const = default;
};

/// Whether routes may name such an interface: what the kernel takes, but no option of a program's and not the loopback.
bool IsRoutableName(const std::string &name);

/// @return the fault, or nothing when `texts` was filled
std::optional<RouteFault> ReadRuleTexts(const Json::Value &object, int family, RuleTexts &texts);

/// Looks at the rule alone. @return the fault, or nothing when `rule` was filled
std::optional<RouteFault> ParseRule(const RuleTexts &texts, int family, RouteRule &rule);

/// The links and addresses of one moment.
class RouteSurroundings {
public:
  explicit RouteSurroundings(Netlink &netlink);

  /// @return why the rule's route cannot be in the kernel now; nothing when it can
  std::optional<RouteFault> FaultOf(const RouteRule &rule) const;
  /// @return null when there is none
  const Link *Find(const std::string &name) const;

private:
  std::optional<RouteFault> GatewayFault(const RouteRule &rule, const Link &link) const;

  std::unordered_map<std::string, Link> links_;
  struct Neighbourhood {
    int index = 0; // of the link
    IpNetwork own;
    IpNetwork subnet; // what is on the link: the address's own subnet, or the other end of a point-to-point link
  };
  std::vector<Neighbourhood> neighbourhoods_;
};

/// The kernel's route of a rule. REQUIRES: the rule's interface is `link`.
Route RouteOfRule(const RouteRule &rule, const Link &link);

} // namespace vornhost

#endif
