#include "host/routes/static_routes.h"

#include "host/network/topology_steps.h"
#include "host/routes/rule_store.h"
#include "host/utility/log.h"

#include <linux/rtnetlink.h>

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

void LogFault(Json::ArrayIndex at, const RuleFault &fault) {
  LogError("static route %u: %s: %s: the list is refused", at + 1, fault.field.c_str(), fault.reason.c_str());
}

// A rule's whole way from JSON. @return the fault, or nothing when `rule` was filled
std::optional<RuleFault> ToRule(const Json::Value &object, int family, RouteRule &rule) {
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

const RuleFault kDuplicate = {"ip", "duplicate of another rule's network"};

} // namespace

std::vector<Route> StaticRoutes::Present() {
  std::vector<Route> routes = netlink_.RoutesOf(family_, RT_TABLE_MAIN);
  std::erase_if(routes, [](const Route &route) { return route.protocol != kStaticRouteProtocol; });
  return routes;
}

Json::Value StaticRoutes::List() {
  Json::Value rules = ReadRules(family_);
  const Surroundings surroundings(netlink_);
  std::set<RouteKey> present;
  for (const Route &route : Present()) {
    present.insert(KeyOf(route));
  }
  for (Json::Value &object : rules) {
    RouteRule rule;
    std::optional<RuleFault> fault = ToRule(object, family_, rule);
    if (!fault && !rule.enabled) {
      fault = {"enable", "switched off"};
    }
    const Link *link = fault ? nullptr : surroundings.Find(rule.ifname);
    const bool installed = link != nullptr && present.contains(KeyOf(RouteOfRule(rule, *link)));
    if (!installed && !fault) {
      fault = surroundings.FaultOf(rule).value_or(RuleFault{"ip", "the kernel does not have the route"});
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

bool StaticRoutes::Accept(const Json::Value &rules, const Json::Value &stored, const Surroundings &surroundings,
                          Json::Value &fresh) const {
  if (!rules.isArray() || rules.size() > kRuleLimit) {
    LogError("static routes: no list, or one of more than %zu rules", kRuleLimit);
    return false;
  }
  std::map<std::string, RouteRule> known;
  for (const RouteRule &rule : GoodRules(stored, family_)) {
    known.insert_or_assign(rule.destination, rule);
  }
  std::set<std::string> taken;
  fresh = Json::Value(Json::arrayValue);
  for (const Json::Value &object : rules) {
    RouteRule rule;
    std::optional<RuleFault> fault = ToRule(object, family_, rule);
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

std::vector<Route> StaticRoutes::Wanted(const Json::Value &rules, const Surroundings &surroundings) const {
  std::vector<Route> wanted;
  for (const RouteRule &rule : GoodRules(rules, family_)) {
    if (rule.enabled && !surroundings.FaultOf(rule)) {
      wanted.push_back(RouteOfRule(rule, *surroundings.Find(rule.ifname)));
    }
  }
  return wanted;
}

// What is new or other comes before what goes, so that no network is without a route in between.
std::vector<StaticRoutes::Step> StaticRoutes::Difference(const std::vector<Route> &wanted) {
  std::map<std::string, Route> present;
  for (const Route &route : Present()) {
    present.insert_or_assign(route.destination, route);
  }
  std::vector<Step> steps;
  for (const Route &route : wanted) {
    const auto found = present.find(route.destination);
    if (found == present.end()) {
      steps.push_back({std::nullopt, route});
      continue;
    }
    if (KeyOf(found->second) != KeyOf(route)) {
      steps.push_back({found->second, route});
    }
    present.erase(found);
  }
  for (const auto &[destination, route] : present) {
    steps.push_back({route, std::nullopt});
  }
  return steps;
}

void StaticRoutes::Do(const Step &step) {
  if (!step.fresh) {
    netlink_.DeleteRoute(*step.old);
  } else if (step.old) {
    netlink_.ReplaceRoute(*step.fresh);
  } else {
    netlink_.InsertRoute(*step.fresh);
  }
}

void StaticRoutes::Undo(const Step &step) {
  if (!step.old) {
    netlink_.DeleteRoute(*step.fresh);
  } else if (step.fresh) {
    netlink_.ReplaceRoute(*step.old);
  } else {
    netlink_.AddRoute(*step.old);
  }
}

bool StaticRoutes::Change(const std::vector<Route> &wanted) {
  const std::vector<Step> steps = Difference(wanted);
  StepSequence sequence;
  for (const Step &step : steps) {
    sequence.Add(
        "route to " + step.Destination(), [this, &step] { Do(step); }, [this, &step] { Undo(step); });
  }
  return sequence.Run() == StepSequence::Outcome::kDone;
}

bool StaticRoutes::Replace(const Json::Value &rules) {
  const Json::Value stored = ReadRules(family_);
  const Surroundings surroundings(netlink_);
  Json::Value fresh;
  if (!Accept(rules, stored, surroundings, fresh)) {
    return false;
  }
  const std::vector<Route> before = Wanted(stored, surroundings);
  if (!Change(Wanted(fresh, surroundings))) {
    return false;
  }
  try {
    WriteRules(family_, fresh);
  } catch (const std::exception &) {
    Change(before);
    throw;
  }
  return true;
}

std::optional<RuleFault> StaticRoutes::FaultOf(const RuleTexts &texts) {
  RouteRule rule;
  if (auto fault = ParseRule(texts, family_, rule)) {
    return fault;
  }
  for (const RouteRule &other : GoodRules(ReadRules(family_), family_)) {
    if (other.enabled && rule.enabled && other.destination == rule.destination) {
      return kDuplicate;
    }
  }
  return Surroundings(netlink_).FaultOf(rule);
}

std::vector<std::string> StaticRoutes::Install() {
  std::vector<std::string> refused;
  for (const Step &step : Difference(Wanted(ReadRules(family_), Surroundings(netlink_)))) {
    try {
      Do(step);
    } catch (const NetlinkError &error) {
      refused.emplace_back(error.what());
    }
  }
  return refused;
}

} // namespace vornhost
