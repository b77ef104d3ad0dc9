#include "router/mervane_base.h"

#include "platform/interface.h"
#include "platform/packageserver.h"
#include "platform/utility.h"
#include "router/log.h"
#include "router/parameters.h"
#include "router/portforward.h"
#include "router/topology.h"

#include <memory>

using router::kErrorFailed;
using router::kErrorParameter;
using router::kErrorSwitching;
using VORN::APIRequest;
using VORN::APIResponse;

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

// The getters that answer a failure with what they have so far.
void AnswerPortForward(APIResponse *response, bool (PortForward::*get)(Json::Value &)) {
  Json::Value result;
  PortForward portForward;
  if ((portForward.*get)(result)) {
    response->SetSuccess(result);
  } else {
    response->SetError(kErrorFailed, result);
  }
}

// For the rows whose subject this version does not have yet.
void AnswerNotBuilt(APIResponse *response) {
  response->SetError(kErrorFailed, Json::Value());
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

void GetConnectionList(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void SetConnectionListData(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void DelConnectionListData(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetConnectionListCount(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetPortForward(APIRequest *, APIResponse *response) {
  AnswerPortForward(response, &PortForward::GetPortForward);
}

void SetPortForward(APIRequest *request, APIResponse *response) {
  Json::Value parameters(Json::objectValue);
  PortForward portForward;
  if (request->HasParam("rules")) {
    Json::Value &rules = parameters["rules"];
    std::string errors;
    if (!router::ParseJsonText(request->GetParam("rules", Json::Value()), rules, errors)) {
      ROUTER_LOG("%s:%d Error when parsing array, msg: %s", errors.c_str());
      response->SetError(kErrorFailed, Json::Value());
      return;
    }
    if (!rules.isArray()) {
      ROUTER_LOG("%s:%d Data rules from req is not an json array");
      response->SetError(kErrorFailed, rules);
      return;
    }
  }
  if (portForward.SetPortForward(parameters)) {
    response->SetSuccess(Json::Value());
  } else {
    response->SetError(kErrorFailed, parameters["rules"]);
  }
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
  if (portForward.SetDMZ(parameters)) {
    response->SetSuccess(Json::Value());
  } else {
    response->SetError(kErrorFailed, parameters);
  }
}

void GetParentalControl(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void SetParentalControl(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetMacFilter(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void SetMacFilter(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetLocalLan(APIRequest *, APIResponse *response) {
  AnswerPortForward(response, &PortForward::GetLocalLan);
}

void GetGatewayList(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void SetGatewayList(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetStaticRouteRules(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void SetStaticRouteRules(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void TestStaticRouteRule(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}

void GetRouteTables(APIRequest *, APIResponse *response) {
  AnswerNotBuilt(response);
}
