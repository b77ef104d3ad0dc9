// The static-route service of the contract.
#include "host/export.h"

namespace vornnetwork::network {
class VORN_EXPORT StaticRoute;
}

#include "platform/network.h"

#include "host/routes/answer.h"
#include "host/routes/route_tables.h"
#include "host/routes/rule_store.h"
#include "host/routes/static_routes.h"
#include "host/utility/log.h"

#include <sys/socket.h>

namespace vornnetwork::network {

namespace {

using vornhost::Netlink;
using vornhost::StaticRoutes;

int FamilyOf(IP_TYPE type) {
  return type == IP_TYPE_V6 ? AF_INET6 : AF_INET;
}

} // namespace

StaticRoute::StaticRoute() = default;

StaticRoute::~StaticRoute() = default;

int StaticRoute::GetRules(IP_TYPE type, Json::Value &list) {
  return vornhost::AnswerFor("static routes cannot be read", [&] {
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn(); // the file and the kernel of one moment
    Netlink netlink;
    list = StaticRoutes(netlink, FamilyOf(type)).List();
    return true;
  });
}

int StaticRoute::SetRules(IP_TYPE type, const Json::Value &list) {
  return vornhost::AnswerFor("static routes cannot be changed", [&] {
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn();
    Netlink netlink;
    return StaticRoutes(netlink, FamilyOf(type)).Replace(list);
  });
}

int StaticRoute::TestRuleVaild(const StaticRouteRule &rule, Json::Value &result) {
  return vornhost::AnswerFor("a static route cannot be tested", [&] {
    const bool isV4 = rule.ipType == IP_TYPE_V4;
    const vornhost::RuleTexts texts = {rule.destination.GetText(), isV4 ? rule.netmask.GetText() : rule.prefixLength,
                                       rule.gateway.GetText(), rule.ifname, rule.enabled};
    Netlink netlink;
    const auto fault = StaticRoutes(netlink, FamilyOf(rule.ipType)).FaultOf(texts);
    result = Json::Value(Json::objectValue);
    result["valid"] = !fault;
    if (fault) {
      result["field"] = fault->field;
      result["reason"] = fault->reason;
      vornhost::LogInfo("static route tested: %s: %s", fault->field.c_str(), fault->reason.c_str());
    }
    return !fault;
  });
}

int StaticRoute::GetRouteTables(IP_TYPE, Json::Value &list) {
  return vornhost::AnswerFor("routing tables cannot be read", [&] {
    list = Json::Value(Json::arrayValue);
    for (const auto &[id, name] : vornhost::ReadRouteTables()) {
      Json::Value table;
      table["id"] = id;
      table["name"] = name;
      list.append(table);
    }
    return true;
  });
}

} // namespace vornnetwork::network
