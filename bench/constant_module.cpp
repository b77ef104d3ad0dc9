// A module of one row that answers a constant of the size of Topology v2's answer: what is left is the server's own
// cost, with nothing asked of the platform.
#include "platform/webapi.h"

#define BENCH_EXPORT __attribute__((visibility("default")))

namespace {

void GetConstant(VORN::APIRequest * /*request*/, VORN::APIResponse *response) {
  Json::Value data(Json::objectValue);
  data["switching"] = false;
  data["net_topology"] = "router";
  data["support_net_topology"] = true;
  data["has_wifi_dongle"] = false;
  data["supported_mode"] = "router,client,bridge";
  data["bridge_mode_forbidden"] = false;
  response->SetSuccess(data);
}

VORN::APIEntry rows[] = {{"VORN.Bench.Constant", 1, "get", GetConstant}, {nullptr, 0, nullptr, nullptr}};

} // namespace

extern "C" BENCH_EXPORT VORN::APIEntry *GetAPITable() {
  return rows;
}
