#include "host/routes/static_routes.h"

#include "host/network/topology_steps.h"
#include "host/routes/rule_store.h"
#include "host/utility/log.h"

#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <map>
#include <set>
#include <tuple>

namespace vornhost {

namespace {

using RouteKey = std::tuple<std::string, std::string, int, uint32_t>;

RouteKey KeyOf(const Route &route) {
  return {route.destination, route.gateway, route.index, route.metric};
}

// Those that are ours, or may be: the kernel shows all hops of an IPv6 route under the first one's protocol, and yet
// deletes a hop for the protocol only that it was added with.
std::vector<Route> OwnOf(const std::vector<Route> &all) {
  std::vector<Route> own;
  for (const Route &route : all) {
    if (route.protocol == kStaticRouteProtocol || (route.family == AF_INET6 && route.isOneOfMany)) {
      own.push_back(route);
      own.back().protocol = kStaticRouteProtocol;
    }
  }
  return own;
}

bool SharePlace(const Route &one, const Route &other) {
  return one.destination == other.destination && one.metric == other.metric;
}

void LogFault(Json::ArrayIndex at, const RouteFault &fault) {
  LogError("static route %u: %s: %s: the list is refused", at + 1, fault.field.c_str(), fault.reason.c_str());
}

// A rule's whole way from JSON. @return the fault, or nothing when `rule` was filled
std::optional<RouteFault> ToRule(const Json::Value &object, int family, RouteRule &rule) {
  RuleTexts texts;
  if (auto fault = ReadRuleTexts(object, family, texts)) {
    return fault;
  }
  return ParseRule(texts, family, rule);
}

std::vector<RouteRule> GoodRules(const Json::Value &rules, int family) {
  std::vector<RouteRule> out;
  for (const Json::Value &object : rules) {
    RouteRule rule;
    if (!ToRule(object, family, rule)) {
      out.push_back(rule);
    }
  }
  return out;
}

const RouteFault kDuplicate = {"ip", "duplicate of another rule's network"};

} // namespace

Json::Value StaticRoutes::List() {
  Json::Value rules = ReadRules(family_);
  const RouteSurroundings surroundings(netlink_);
  std::set<RouteKey> present;
  for (const Route &route : OwnOf(netlink_.RoutesOf(family_, RT_TABLE_MAIN))) {
    present.insert(KeyOf(route));
  }
  for (Json::Value &object : rules) {
    RouteRule rule;
    std::optional<RouteFault> fault = ToRule(object, family_, rule);
    if (!fault && !rule.enabled) {
      fault = {"enable", "switched off"};
    }
    const Link *link = fault ? nullptr : surroundings.Find(rule.ifname);
    const bool installed = link != nullptr && present.contains(KeyOf(RouteOfRule(rule, *link)));
    if (!installed && !fault) {
      fault = surroundings.FaultOf(rule).value_or(RouteFault{"ip", "the kernel does not have the route"});
    }
    if (object.isObject()) {
      object["installed"] = installed;
      object.removeMember("reason");
      if (!installed) {
        object["reason"] = fault->field + ": " + fault->reason;
      }
    }
  }
  return rules;
}

bool StaticRoutes::Accept(const Json::Value &rules, const Json::Value &stored, const RouteSurroundings &surroundings,
                          Json::Value &fresh) const {
  if (!rules.isArray() || rules.size() > kRuleLimit) {
    LogError("static routes: no list, or one of more than %zu rules", kRuleLimit);
    return false;
  }
  std::map<std::string, RouteRule> known;
  for (const RouteRule &rule : GoodRules(stored, family_)) {
    if (rule.enabled) {
      known.insert_or_assign(rule.destination, rule);
    }
  }
  std::set<std::string> taken;
  fresh = Json::Value(Json::arrayValue);
  for (const Json::Value &object : rules) {
    RouteRule rule;
    std::optional<RouteFault> fault = ToRule(object, family_, rule);
    if (!fault && rule.enabled) {
      // A rule that stands already may wait for its interface; a new one is looked at where it is to go.
      const auto old = known.find(rule.destination);
      if (old == known.end() || old->second != rule) {
        fault = surroundings.FaultOf(rule);
      }
      if (!taken.insert(rule.destination).second) {
        fault = kDuplicate;
      }
    }
    if (fault) {
      LogFault(fresh.size(), *fault);
      return false;
    }
    Json::Value &kept = fresh.append(object);
    kept.removeMember("installed");
    kept.removeMember("reason");
  }
  return true;
}

std::vector<Route> StaticRoutes::Wanted(const Json::Value &rules, const RouteSurroundings &surroundings) const {
  std::vector<Route> wanted;
  for (const RouteRule &rule : GoodRules(rules, family_)) {
    if (rule.enabled && !surroundings.FaultOf(rule)) {
      wanted.push_back(RouteOfRule(rule, *surroundings.Find(rule.ifname)));
    }
  }
  return wanted;
}

// A replacement takes the first IPv4 route of its place, whosoever, and all hops of the IPv6 one.
bool StaticRoutes::IsReplaceable(const std::vector<Route> &all, const Route &old) const {
  const auto isThere = [&old](const Route &route) { return SharePlace(route, old); };
  const auto first = std::find_if(all.begin(), all.end(), isThere);
  return KeyOf(*first) == KeyOf(old) && (family_ == AF_INET || std::none_of(first + 1, all.end(), isThere));
}

// What is new or other comes before what goes, so that no network is without a route in between. Others may have put a
// route of theirs beside one of ours: each of ours counts for itself.
std::vector<StaticRoutes::Step> StaticRoutes::Difference(const std::vector<Route> &wanted) {
  const std::vector<Route> all = netlink_.RoutesOf(family_, RT_TABLE_MAIN);
  std::multimap<std::string, Route> left;
  for (const Route &route : OwnOf(all)) {
    left.emplace(route.destination, route);
  }
  std::vector<Step> steps;
  for (const Route &route : wanted) {
    const auto [begin, end] = left.equal_range(route.destination);
    const auto same = std::find_if(begin, end, [&](const auto &own) { return KeyOf(own.second) == KeyOf(route); });
    if (same != end) {
      left.erase(same);
      continue;
    }
    const auto old = std::find_if(begin, end, [&](const auto &own) { return SharePlace(own.second, route); });
    if (old == end) {
      steps.push_back({std::nullopt, route});
      continue;
    }
    steps.push_back({old->second, route, IsReplaceable(all, old->second)});
    left.erase(old);
  }
  for (const auto &[destination, route] : left) {
    steps.push_back({route, std::nullopt});
  }
  return steps;
}

void StaticRoutes::Do(const Step &step) {
  if (step.isInPlace) {
    netlink_.ReplaceRoute(*step.fresh);
  } else if (!step.old) {
    netlink_.InsertRoute(*step.fresh);
  } else {
    if (step.fresh) {
      netlink_.AppendRoute(*step.fresh);
    }
    netlink_.DeleteRoute(*step.old);
  }
}

void StaticRoutes::Undo(const Step &step) {
  if (step.isInPlace) {
    netlink_.ReplaceRoute(*step.old);
    return;
  }
  if (step.old) {
    netlink_.AppendRoute(*step.old);
  }
  if (step.fresh) {
    netlink_.DeleteRoute(*step.fresh);
  }
}

bool StaticRoutes::Replace(const Json::Value &rules) {
  const RouteSurroundings surroundings(netlink_);
  Json::Value fresh;
  if (!Accept(rules, ReadRules(family_), surroundings, fresh)) {
    return false;
  }
  const std::vector<Step> steps = Difference(Wanted(fresh, surroundings));
  StepSequence sequence;
  for (const Step &step : steps) {
    sequence.Add(
        "route to " + step.Destination(), [this, &step] { Do(step); }, [this, &step] { Undo(step); });
  }
  sequence.Add(
      "file of the rules", [&] { WriteRules(family_, fresh); }, [] { /* whole or not at all */ });
  return sequence.Run() == StepSequence::Outcome::kDone;
}

std::optional<RouteFault> StaticRoutes::FaultOf(const RuleTexts &texts) {
  RouteRule rule;
  if (auto fault = ParseRule(texts, family_, rule)) {
    return fault;
  }
  if (!rule.enabled) {
    return std::nullopt;
  }
  for (const RouteRule &other : GoodRules(ReadRules(family_), family_)) {
    if (other.enabled && other.destination == rule.destination) {
      return other == rule ? std::nullopt : std::optional(kDuplicate);
    }
  }
  return RouteSurroundings(netlink_).FaultOf(rule);
}

std::vector<std::string> StaticRoutes::Install() {
  std::vector<std::string> refused;
  for (const Step &step : Difference(Wanted(ReadRules(family_), RouteSurroundings(netlink_)))) {
    try {
      Do(step);
    } catch (const NetlinkError &error) {
      refused.emplace_back(error.what());
    }
  }
  return refused;
}

} // namespace vornhost
