// The user's static routes: rules in a file, routes in the kernel's main table under a protocol number of their own.
//
// The file is what is wanted. A change of it is checked whole, then made in the kernel as the difference alone, undone
// when the kernel refuses a part, and stored last; so whoever is killed on the way leaves a file that says the old or
// the new, and the next Install makes the kernel say the same. The caller has the routes' turn.
#ifndef HOST_ROUTES_STATIC_ROUTES_H
#define HOST_ROUTES_STATIC_ROUTES_H

#include "host/routes/route_rule.h"

#include <json/value.h>

namespace vornhost {

/// No family has more rules.
constexpr size_t kRuleLimit = 1024;

class StaticRoutes {
public:
  /// @param[in] family  AF_INET or AF_INET6
  StaticRoutes(Netlink &netlink, int family) : netlink_(netlink), family_(family) {}

  // Each of these throws std::runtime_error when files or kernel cannot be asked or changed.

  /// The stored rules, each with "installed" and, when that is false, "reason".
  Json::Value List();

  /// @return false when a rule is not acceptable or the kernel refused one; the log says which and why, and nothing is
  /// changed
  bool Replace(const Json::Value &rules);

  /// Looks whether a list of the stored rules and this one would be taken. One that is stored already may be.
  std::optional<RouteFault> FaultOf(const RuleTexts &texts);

  /// Makes the kernel's routes follow the file: those rules that can be in the kernel now, each for itself.
  /// @return what the kernel refused, a text for each
  std::vector<std::string> Install();

private:
  // From one route to another, of the same destination with the same metric.
  struct Step {
    std::optional<Route> old;   // nothing: there was none
    std::optional<Route> fresh; // nothing: there will be none
    bool isInPlace = false;     // the kernel's replacement of the old one touches nobody else's
    const std::string &Destination() const { return (fresh ? fresh : old)->destination; }
  };

  bool IsReplaceable(const std::vector<Route> &all, const Route &old) const;
  bool Accept(const Json::Value &rules, const Json::Value &stored, const RouteSurroundings &surroundings,
              Json::Value &fresh) const;
  std::vector<Route> Wanted(const Json::Value &rules, const RouteSurroundings &surroundings) const;
  std::vector<Step> Difference(const std::vector<Route> &wanted);
  void Do(const Step &step);
  void Undo(const Step &step);

  Netlink &netlink_;
  int family_;
};

} // namespace vornhost

#endif
