// Parameters of any shape into every row of the module, over the scripted platform: each call answers once, lets no
// exception out, refuses with one of the module's codes and frees what it took. Runs under private_view: rows write to
// /etc and /tmp.
#include "router/mervane_base.h"
#include "tests/fuzz/demand.h"
#include "tests/fuzz/json_tree.h"
#include "tests/router/scripted_platform.h"

#include <json/writer.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <string_view>

using scripted::Get;
using vornfuzz::Demand;

// The linker puts this in the place of the module's popen: no shell a call.
// NOLINTNEXTLINE(readability-identifier-naming)
extern "C" std::FILE *__wrap_popen(const char * /*command*/, const char * /*mode*/) {
  return nullptr;
}

namespace {

constexpr size_t kRows = 23;
constexpr std::array<std::string_view, 5> kRefusals = {"SetError(4300, ", "SetError(4302, ", "SetError(4340, ",
                                                       "SetError(114, ", "SetError(117, "};

const vornfuzz::Vocabulary &TheWords() {
  static const vornfuzz::Vocabulary kWords = {
      {"rules",
       "enabled",
       "id",
       "protocol",
       "service",
       "sourcePort",
       "targetIP",
       "targetPort",
       "net_topology",
       "ifnames",
       "iptype",
       "type",
       "mac_filter_list",
       "mac_filter_policy",
       "netif",
       "local_lan",
       "mask",
       "ip",
       "desc",
       "enable",
       "name",
       "auth_key",
       "clientname",
       "mac",
       "schedule",
       "status",
       "tcenable",
       "dns",
       "gateway",
       "ifname",
       "ip_list",
       "priority",
       "dest",
       "destination",
       "netmask",
       "prefix",
       "prefix_length",
       "filter",
       "config",
       "wifi_list",
       "taskid",
       "task_id",
       "alias",
       "hostname",
       "configs",
       "rule",
       "bridge_mode_forbidden"},
      {"router",
       "bridge",
       "client",
       "0.0.0.0",
       "192.168.1.110",
       "192.168.1.1",
       "255.255.255.0",
       "::1",
       "fe80::1%lbr0",
       "tcp",
       "udp",
       "both",
       "80",
       "5000-5010",
       "0",
       "65536",
       "yes",
       "no",
       "ipv4",
       "ipv6",
       "lbr0",
       "eth0",
       "eth0;id",
       "../x",
       "-x",
       "00:11:32:aa:bb:cc",
       "deny",
       "allow",
       "all",
       "get",
       "true",
       std::string("a\0b", 3),
       "[",
       "[]",
       "[{}]",
       "111111111111111111111111111111111111111111111111111111111111111111111111111111111111"}};
  return kWords;
}

/// What the platform says: a working one, with what it knows taken from the input.
void SetPlatform(FuzzedDataProvider &input) {
  scripted::Reset();
  scripted::Platform &platform = Get();
  platform.topology = input.PickValueInArray({"router", "bridge", "client", ""});
  platform.supportsTopology = input.ConsumeBool();
  platform.serverReady = input.ConsumeBool();
  platform.lans = {{"lbr0", "192.168.1.1", "255.255.255.0"}};
  platform.subnets = {{"192.168.1.1", {"192.168.1.110", "192.168.1.112"}}};
  platform.switchResult = input.ConsumeIntegralInRange(-1, 1);
  platform.routeResult = input.ConsumeIntegralInRange(-1, 1);
  platform.setKeyValueResult = input.ConsumeIntegralInRange(-1, 1);
  platform.ruleFile = {{"0", {{"enabled", "1"}, {"s_port", "80"}, {"service", vornfuzz::MakeText(input)}}}};
}

Json::Value MakeParameters(FuzzedDataProvider &input) {
  Json::Value parameters(Json::objectValue);
  while (input.remaining_bytes() > 0) {
    const std::string key = vornfuzz::MakeText(input, TheWords().keys);
    const Json::Value value = vornfuzz::MakeTree(input, 6, TheWords());
    // Some parameters hold JSON as a text.
    parameters[key] = input.ConsumeBool() ? Json::Value(scripted::Text(value)) : value;
  }
  return parameters;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  FuzzedDataProvider input(data, size);
  const VORN::APIEntry &row = GetAPITable()[input.ConsumeIntegralInRange<size_t>(0, kRows - 1)];
  SetPlatform(input);
  {
    scripted::Exchange exchange(MakeParameters(input));
    exchange.Run(row.handler);
    Demand(exchange.AnswerCount() >= 1);
    const std::string &answer = exchange.Answer();
    Demand(answer.starts_with("SetSuccess(") ||
           std::any_of(kRefusals.begin(), kRefusals.end(),
                       [&answer](std::string_view refusal) { return answer.starts_with(refusal); }));
  }
  Demand(Get().liveHashes == 0 && Get().liveLists == 0);
  return 0;
}
