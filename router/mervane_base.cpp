#include "router/mervane_base.h"

#include "platform/interface.h"
#include "platform/network.h"
#include "platform/packageserver.h"
#include "platform/utility.h"
#include "router/clhandler.h"
#include "router/connectionlist.h"
#include "router/gatewaylist.h"
#include "router/log.h"
#include "router/macfilter.h"
#include "router/parameters.h"
#include "router/parental.h"
#include "router/portforward.h"
#include "router/topology.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

using router::kErrorFailed;
using router::kErrorParameter;
using router::kErrorSwitching;
using VORN::APIRequest;
using VORN::APIResponse;
using vornnetwork::network::IP_TYPE;
using vornnetwork::network::StaticRoute;
using vornnetwork::network::StaticRouteRule;

// clang-format off
VORN::APIEntry gTable[] = {
    {"VORN.Core.Network.Router.ConnectionList",  1, "get",       GetConnectionList},
    {"VORN.Core.Network.Router.ConnectionList",  1, "set",       SetConnectionListData},
    {"VORN.Core.Network.Router.ConnectionList",  1, "delete",    DelConnectionListData},
    {"VORN.Core.Network.Router.ConnectionList",  1, "getcount",  GetConnectionListCount},
    {"VORN.Core.Network.Router.PortForward",     1, "get",       GetPortForward},
    {"VORN.Core.Network.Router.PortForward",     1, "set",       SetPortForward},
    {"VORN.Core.Network.Router.DMZ",             1, "get",       GetDMZ},
    {"VORN.Core.Network.Router.DMZ",             1, "set",       SetDMZ},
    {"VORN.Core.Network.Router.ParentalControl", 1, "get",       GetParentalControl},
    {"VORN.Core.Network.Router.ParentalControl", 1, "set",       SetParentalControl},
    {"VORN.Core.Network.Router.MacFilter",       1, "get",       GetMacFilter},
    {"VORN.Core.Network.Router.MacFilter",       1, "set",       SetMacFilter},
    {"VORN.Core.Network.Router.LocalLan",        1, "get",       GetLocalLan},
    {"VORN.Core.Network.Router.Topology",        1, "get",       GetTopology_V1},
    {"VORN.Core.Network.Router.Topology",        1, "set",       SetTopology},
    {"VORN.Core.Network.Router.Topology",        2, "get",       GetTopology_V2},
    {"VORN.Core.Network.Router.Gateway.List",    1, "get",       GetGatewayList},
    {"VORN.Core.Network.Router.Gateway.List",    1, "set",       SetGatewayList},
    {"VORN.Core.Network.Router.PkgList",         1, "get",       GetRecommandPkgList},
    {"VORN.Core.Network.Router.Static.Route",    1, "get",       GetStaticRouteRules},
    {"VORN.Core.Network.Router.Static.Route",    1, "set",       SetStaticRouteRules},
    {"VORN.Core.Network.Router.Static.Route",    1, "test",      TestStaticRouteRule},
    {"VORN.Core.Network.Router.Static.Route",    1, "tablesget", GetRouteTables},
    {nullptr,                                    0, nullptr,     nullptr},
};
// clang-format on

VORN::APIEntry *GetAPITable() {
  return gTable;
}

namespace {

constexpr char kUnit[] = "mervane_base";
constexpr char kAllDevices[] = "all"; // a scanner type and a net range
constexpr char kTopologyLock[] = "/tmp/topology.lock";

void AnswerTopology(APIResponse *response, int version) {
  Json::Value result;
  Topology topology;
  if (topology.GetTopology(result, version)) {
    response->SetSuccess(result);
  } else {
    response->SetError(kErrorFailed, Json::Value());
  }
}

// A failure carries what there is of the result.
void AnswerResult(APIResponse *response, bool done, const Json::Value &result) {
  if (done) {
    response->SetSuccess(result);
  } else {
    response->SetError(kErrorFailed, result);
  }
}

void AnswerChange(APIResponse *response, bool done, const Json::Value &failure = Json::Value()) {
  if (done) {
    response->SetSuccess(Json::Value());
  } else {
    response->SetError(kErrorFailed, failure);
  }
}

void AnswerPortForward(APIResponse *response, bool (PortForward::*get)(Json::Value &)) {
  Json::Value result;
  PortForward portForward;
  AnswerResult(response, (portForward.*get)(result), result);
}

// Reads the array that the text parameter "rules" holds, when there is one, into the member of that name.
// @return false when it cannot be read; the request is answered then
bool ReadRules(const APIRequest *request, APIResponse *response, Json::Value &parameters) {
  if (!request->HasParam("rules")) {
    return true; // the working object says what is missing
  }
  Json::Value &rules = parameters["rules"];
  std::string errors;
  if (!router::ParseJsonText(request->GetParam("rules", Json::Value()), rules, errors)) {
    ROUTER_LOG("%s:%d Error when parsing array, msg: %s", errors.c_str());
    response->SetError(kErrorFailed, Json::Value());
    return false;
  }
  if (!rules.isArray()) {
    ROUTER_LOG("%s:%d Data rules from req is not an json array");
    response->SetError(kErrorFailed, rules);
    return false;
  }
  return true;
}

} // namespace

void GetTopology_V1(APIRequest *, APIResponse *response) {
  AnswerTopology(response, 1);
}

void GetTopology_V2(APIRequest *, APIResponse *response) {
  AnswerTopology(response, 2);
}

void SetTopology(APIRequest *request, APIResponse *response) {
  Json::Value result;
  Topology topology;
  if (!request->HasParam("net_topology")) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  if (QARDCFileExist(kTopologyLock) != 0) {
    response->SetError(kErrorSwitching, Json::Value());
    return;
  }
  const auto target = router::TextOf(request->GetParam("net_topology", Json::Value()));
  if (!target) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  vorn::network::NetworkHandler::SetAPIRequest(request);
  if (!topology.SetTopology(*target, result)) {
    response->SetError(kErrorFailed, Json::Value());
    return;
  }
  response->SetCallbackFunc(Topology::APICallback, std::make_unique<std::string>(*target).release());
  response->SetSuccess(result);
}

void GetRecommandPkgList(APIRequest *request, APIResponse *response) {
  Json::Value result;
  const std::string language = request->GetUILanguage();
  if (VORNPackageServer::PMSGetRecommendPkgList(language.c_str(), "getNCRecommendPkgList.php", result) != 0) {
    response->SetSuccess(result);
  } else {
    response->SetError(kErrorFailed, Json::Value());
  }
}

void GetConnectionList(APIRequest *request, APIResponse *response) {
  Json::Value result;
  ConnectionList connections;
  ConnectionListHandler devices;
  const auto scannerType = router::TextParameter(*request, "scannertype");
  if (!scannerType) {
    connections.GetList(request, response);
    return;
  }
  const std::string netRange = router::TextParameter(*request, "netrange").value_or(kAllDevices);
  const int failed = devices.GetList(*scannerType, netRange, result);
  AnswerResult(response, failed == 0, result);
}

void SetConnectionListData(APIRequest *request, APIResponse *response) {
  ConnectionListHandler devices;
  std::vector<std::string> texts;
  for (const char *name : {"mac", "hostname", "type"}) {
    auto text = router::TextParameter(*request, name);
    if (!text) {
      response->SetError(kErrorParameter, Json::Value());
      return;
    }
    texts.push_back(*std::move(text));
  }
  AnswerChange(response, devices.SetDevice(texts[0], texts[1], texts[2]) == 0);
}

void DelConnectionListData(APIRequest *request, APIResponse *response) {
  ConnectionListHandler devices;
  const auto mac = router::TextParameter(*request, "mac");
  if (!mac) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  AnswerChange(response, devices.DelDevice(*mac) == 0);
}

void GetConnectionListCount(APIRequest *request, APIResponse *response) {
  Json::Value result;
  ConnectionListHandler devices;
  const std::string scannerType = router::TextParameter(*request, "scannertype").value_or(kAllDevices);
  const std::string netRange = router::TextParameter(*request, "netrange").value_or(kAllDevices);
  const int failed = devices.GetOnlineDeviceNumber(scannerType, netRange, result);
  AnswerResult(response, failed == 0, result);
}

void GetPortForward(APIRequest *, APIResponse *response) {
  AnswerPortForward(response, &PortForward::GetPortForward);
}

void SetPortForward(APIRequest *request, APIResponse *response) {
  Json::Value parameters(Json::objectValue);
  PortForward portForward;
  if (!ReadRules(request, response, parameters)) {
    return;
  }
  const bool done = portForward.SetPortForward(parameters); // which looks whether there are rules
  AnswerChange(response, done, parameters["rules"]);
}

void GetDMZ(APIRequest *, APIResponse *response) {
  AnswerPortForward(response, &PortForward::GetDMZ);
}

void SetDMZ(APIRequest *request, APIResponse *response) {
  Json::Value parameters(Json::objectValue);
  PortForward portForward;
  for (const char *name : {"enable", "ip"}) {
    if (request->HasParam(name)) {
      parameters[name] = request->GetParam(name, Json::Value());
    }
  }
  AnswerChange(response, portForward.SetDMZ(parameters), parameters);
}

void GetParentalControl(APIRequest *, APIResponse *response) {
  Json::Value result;
  const ParentalHandler parental;
  AnswerResult(response, parental.LoadTimeControlData(result), result);
}

void SetParentalControl(APIRequest *request, APIResponse *response) {
  Json::Value parameters;
  ParentalHandler parental;
  if (!ReadRules(request, response, parameters)) {
    return;
  }
  if (!parental.CheckTimeCtrlData(parameters)) {
    response->SetError(kErrorFailed, parameters);
    return;
  }
  const Json::Value &rules = parameters["rules"];
  const auto refused = std::find_if_not(rules.begin(), rules.end(), CanKeepTimeRule);
  if (refused != rules.end()) {
    ROUTER_LOG("%s:%d Rule %u is refused, not all of its texts can be kept", refused.index());
    response->SetError(kErrorFailed, Json::Value());
    return;
  }
  AnswerChange(response, parental.StopTimeCtrlRules() && parental.SetTimeCtrlConfig() && parental.StartTimeCtrlRules());
}

void GetMacFilter(APIRequest *, APIResponse *response) {
  Json::Value result;
  MacFilterHandler filter;
  AnswerResult(response, filter.GetRules(result), result);
}

void SetMacFilter(APIRequest *request, APIResponse *response) {
  Json::Value parameters;
  MacFilterHandler filter;
  if (request->HasParam("mac_filter_policy")) {
    const auto policy = router::ConvertToText(request->GetParam("mac_filter_policy", Json::Value()));
    if (!policy) { // an array or an object, of which JsonCpp makes no text: no policy of any daemon
      response->SetError(kErrorFailed, parameters);
      return;
    }
    parameters["mac_filter_policy"] = *policy;
  }
  if (request->HasParam("mac_filter_list")) {
    Json::Value &list = parameters["mac_filter_list"];
    std::string errors;
    if (!router::ParseJsonText(request->GetParam("mac_filter_list", Json::Value()), list, errors)) {
      ROUTER_LOG("%s:%d Error when parsing array, msg: %s", errors.c_str());
      response->SetError(kErrorFailed, Json::Value());
      return;
    }
    if (!list.isArray()) {
      ROUTER_LOG("%s:%d Data mac filter list from req is not an json array");
      response->SetError(kErrorFailed, list);
      return;
    }
  }
  AnswerChange(response, filter.SetRules(parameters), parameters);
}

void GetLocalLan(APIRequest *, APIResponse *response) {
  AnswerPortForward(response, &PortForward::GetLocalLan);
}

void GetGatewayList(APIRequest *request, APIResponse *response) {
  Json::Value result;
  GatewayList gateways;
  if (!request->HasParam("iptype") || !request->HasParam("type")) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  const auto family = router::WholeTextOf(request->GetParam("iptype", Json::Value()));
  const auto filter = router::WholeTextOf(request->GetParam("type", Json::Value()));
  if (!family || !filter) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  if (gateways.Get(*family, *filter, result)) {
    response->SetSuccess(result);
  } else {
    response->SetError(kErrorFailed, Json::Value());
  }
}

void SetGatewayList(APIRequest *request, APIResponse *response) {
  GatewayList gateways;
  if (!request->HasParam("iptype")) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  Json::Value names;
  if (request->HasParam("ifnames")) {
    names = request->GetParam("ifnames", Json::Value());
  }
  const auto family = router::WholeTextOf(request->GetParam("iptype", Json::Value()));
  // A name given twice has no one place in the order; found by the daemon it would be found half-way.
  if (!family || !(names.isNull() || router::IsTextSet(names))) {
    response->SetError(kErrorParameter, Json::Value());
    return;
  }
  AnswerChange(response, gateways.Set(*family, names), names);
}

// The static routes. Their parameters are read all at once, and a fault in them is told in words.

namespace {

constexpr char kNoType[] = "no type parameter";
constexpr char kNoRules[] = "no rules parameter"; // for "rule" too
constexpr char kWrongType[] = "wrong type parameter";

struct RouteRequest {
  Json::Value parameters;
  IP_TYPE type = vornnetwork::network::IP_TYPE_V4;
};

void AnswerRouteFault(APIResponse *response, const char *description) {
  Json::Value payload;
  payload["desc"] = description;
  response->SetError(kErrorParameter, payload);
}

// @param[in] list      the member that must be there beside "type"; null: none
// @param[in] listType  what it must be
// @return false when a fault was answered
bool ReadRouteRequest(APIRequest *request, APIResponse *response, const char *list, Json::ValueType listType,
                      RouteRequest &out) {
  out.parameters = request->GetParam("", Json::Value());
  const Json::Value &parameters = out.parameters;
  if (!parameters.isObject() || !parameters.isMember("type")) {
    AnswerRouteFault(response, kNoType);
    return false;
  }
  // One of another JSON type is no list: refused as a missing one is.
  if (list != nullptr && parameters[list].type() != listType) {
    AnswerRouteFault(response, kNoRules);
    return false;
  }
  const auto type = router::TextOf(parameters["type"]);
  if (type != "ipv4" && type != "ipv6") {
    AnswerRouteFault(response, kWrongType);
    return false;
  }
  out.type = type == "ipv4" ? vornnetwork::network::IP_TYPE_V4 : vornnetwork::network::IP_TYPE_V6;
  return true;
}

// @param[in] object  a rule; a member that it lacks reads as an empty text, or false
// @return false when a member is of a type that cannot be read so
bool ReadRule(const Json::Value &object, IP_TYPE type, StaticRouteRule &rule) {
  const bool isV4 = type == vornnetwork::network::IP_TYPE_V4;
  const auto length = router::ConvertToText(object[isV4 ? "mask" : "prefix_length"]);
  const auto destination = router::ConvertToText(object["ip"]);
  const auto gateway = router::ConvertToText(object["gateway"]);
  const auto ifname = router::ConvertToText(object["ifname"]);
  const auto enabled = router::ConvertToBool(object["enable"]);
  if (!length || !destination || !gateway || !ifname || !enabled) {
    return false;
  }
  rule.ipType = type;
  if (isV4) {
    rule.netmask = *length;
  } else {
    rule.prefixLength = *length;
  }
  rule.destination = *destination;
  rule.gateway = *gateway;
  rule.ifname = *ifname;
  rule.enabled = *enabled;
  return true;
}

} // namespace

void GetStaticRouteRules(APIRequest *request, APIResponse *response) {
  Json::Value result;
  StaticRoute service;
  RouteRequest route;
  if (!ReadRouteRequest(request, response, nullptr, Json::nullValue, route)) {
    return;
  }
  Json::Value rules(Json::arrayValue);
  if (service.GetRules(route.type, rules) < 0) {
    ROUTER_LOG("%s:%d Failed to get rules for static route.");
    response->SetError(kErrorFailed, Json::Value());
    return;
  }
  result["rules"] = rules;
  response->SetSuccess(result);
}

void SetStaticRouteRules(APIRequest *request, APIResponse *response) {
  StaticRoute service;
  RouteRequest route;
  if (!ReadRouteRequest(request, response, "rules", Json::arrayValue, route)) {
    return;
  }
  if (service.SetRules(route.type, route.parameters["rules"]) < 0) {
    ROUTER_LOG("%s:%d Failed to set rules for static route.");
    response->SetError(kErrorFailed, Json::Value());
    return;
  }
  response->SetSuccess(Json::Value());
}

void TestStaticRouteRule(APIRequest *request, APIResponse *response) {
  Json::Value result;
  StaticRoute service;
  RouteRequest route;
  if (!ReadRouteRequest(request, response, "rule", Json::objectValue, route)) {
    return;
  }
  StaticRouteRule rule{};
  if (!ReadRule(route.parameters["rule"], route.type, rule)) {
    AnswerRouteFault(response, kWrongType);
    return;
  }
  if (service.TestRuleVaild(rule, result) < 0) {
    response->SetError(kErrorFailed, Json::Value());
  } else {
    response->SetSuccess(result);
  }
}

void GetRouteTables(APIRequest *request, APIResponse *response) {
  Json::Value result;
  StaticRoute service;
  RouteRequest route;
  if (!ReadRouteRequest(request, response, nullptr, Json::nullValue, route)) {
    return;
  }
  Json::Value &tables = result["tables"] = Json::Value(Json::arrayValue);
  if (service.GetRouteTables(route.type, tables) < 0) {
    ROUTER_LOG("%s:%d Failed to get route tables.");
    response->SetError(kErrorFailed, Json::Value());
    return;
  }
  for (Json::Value &table : tables) {
    if (table.isObject() && router::TextOf(std::as_const(table)["name"]) == "main") {
      table["name"] = "main-table";
    }
  }
  response->SetSuccess(result);
}
