// The module's entry: the API table and the handlers that it refers to.
#ifndef ROUTER_MERVANE_BASE_H
#define ROUTER_MERVANE_BASE_H

#include "platform/webapi.h"
#include "router/export.h"

/// 23 rows and an all-zero one.
extern ROUTER_EXPORT VORN::APIEntry gTable[24];

/// @return the first row of gTable; does no work and may be called any number of times, from any thread
extern "C" ROUTER_EXPORT VORN::APIEntry *GetAPITable();

// Handlers: each answers `response` from `request`; of several answers the last counts. None lets an exception out.
ROUTER_EXPORT void GetConnectionList(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetConnectionListData(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void DelConnectionListData(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetConnectionListCount(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetPortForward(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetPortForward(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetDMZ(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetDMZ(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetParentalControl(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetParentalControl(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetMacFilter(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetMacFilter(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetLocalLan(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetTopology_V1(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetTopology(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetTopology_V2(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetGatewayList(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetGatewayList(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetRecommandPkgList(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetStaticRouteRules(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void SetStaticRouteRules(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void TestStaticRouteRule(VORN::APIRequest *request, VORN::APIResponse *response);
ROUTER_EXPORT void GetRouteTables(VORN::APIRequest *request, VORN::APIResponse *response);

#endif
