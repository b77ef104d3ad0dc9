// Every code that a row can answer with is described in router/api.json, and every one that is described is answered.
// The rows are called with right, missing and wrong parameters, over a platform of which one part after the other
// fails.
#include "router/mervane_base.h"
#include "tests/router/scripted_platform.h"

#include <gtest/gtest.h>
#include <json/reader.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <string>
#include <vector>

using scripted::Exchange;
using scripted::Get;
using scripted::Parse;

namespace {

Json::Value Described() {
  std::ifstream file(ROUTER_DESCRIPTION);
  Json::Value value;
  EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), file, &value, nullptr));
  return value["rows"];
}

/// Rows ignore what they do not know, so that one object has the parameters of them all.
Json::Value GoodParameters() {
  return Parse(R"({"scannertype": "all", "netrange": "all", "mac": "00:11:22:33:44:55", "hostname": "a", "type": "ipv4",
                   "iptype": "ipv4", "ifnames": ["eth0"], "net_topology": "bridge", "enable": true,
                   "ip": "192.168.1.5", "mac_filter_policy": "accept", "mac_filter_list": "[]",
                   "rule": {"ip": "10.0.0.0", "mask": "255.0.0.0"},
                   "rules": "[{\"mac\": \"00:11:22:33:44:55\", \"clientname\": \"c\", \"schedule\": \"1\",
                     \"tcenable\": true, \"enabled\": true, \"service\": \"s\", \"sourcePort\": \"1\",
                     \"protocol\": \"tcp\", \"targetIP\": \"192.168.1.5\", \"targetPort\": \"1\"}]"})");
}

std::vector<Json::Value> ParameterSets() {
  const Json::Value good = GoodParameters();
  Json::Value withList = good; // the static routes' rules are no text
  withList["rules"] = Parse(R"([{"ip": "10.0.0.0", "mask": "255.0.0.0"}])");
  std::vector<Json::Value> sets = {Json::Value(Json::objectValue), good, withList};
  for (const std::string &name : good.getMemberNames()) {
    for (const char *wrong : {"[[]]", "{}", "null", "\"no json\"", "7"}) {
      sets.push_back(good);
      sets.back()[name] = Parse(std::string("[") + wrong + "]")[0];
    }
    sets.push_back(good);
    sets.back().removeMember(name);
    sets.push_back(withList);
    sets.back().removeMember(name);
  }
  return sets;
}

void SetUpHome() {
  scripted::Reset();
  std::filesystem::remove_all("/etc/parental"); // the test has an /etc of its own
  Get().lans = {{"lbr0", "192.168.1.1", "255.255.255.0"}};
  Get().subnets["192.168.1.1"] = {"192.168.1.5"};
  Get().adapters.append("wlan0");
  Get().adapterConfigs["wlan0"] = Json::Value(Json::objectValue);
}

std::vector<std::function<void()>> Failures() {
  return {[] {},
          [] { Get().existingFiles = {"/tmp/topology.lock"}; },
          [] { Get().topologyResult = -1; },
          [] { Get().supportedModeResult = -1; },
          [] { Get().serverReady = false; },
          [] { Get().packageResult = 0; },
          [] { Get().lans.clear(); },
          [] { Get().gatewayListResult = -1; },
          [] { Get().refreshResult = -1; },
          [] { Get().routeResult = -1; },
          [] { Get().adapters = Json::Value(Json::arrayValue); },
          [] { Get().deviceList["ClientList"] = "no list"; },
          [] { Get().tasks["admin"].append(""); },
          [] {
            std::filesystem::create_directories("/etc/parental");
            std::ofstream("/etc/parental/timectrl.ui.conf") << "no section\n";
          }};
}

/// Notes the answer: 0 for a success, else its code.
void Note(const std::string &answer, std::set<int> &codes) {
  constexpr const char *kError = "SetError(";
  const bool failed = answer.rfind(kError, 0) == 0;
  codes.insert(failed ? std::atoi(answer.c_str() + 9) : 0); // NOLINT(cert-err34-c): our own text
}

std::set<int> Answered(VORN::APIHandler handler) {
  std::set<int> codes;
  for (const Json::Value &parameters : ParameterSets()) {
    for (const auto &fail : Failures()) {
      SetUpHome();
      fail();
      Exchange exchange(parameters);
      exchange.Run(handler);
      Note(exchange.Answer(), codes);
      exchange.RunCallbacks();
    }
  }
  // Each call of the platform that a good request makes fails in its turn.
  SetUpHome();
  Exchange good(GoodParameters());
  good.Run(handler);
  const std::vector<std::string> calls = Get().calls;
  for (const std::string &call : calls) {
    SetUpHome();
    Get().results[call] = -1;
    Exchange exchange(GoodParameters());
    exchange.Run(handler);
    Note(exchange.Answer(), codes);
  }
  return codes;
}

TEST(DescribedCodes, AreThoseThatTheRowsAnswer) {
  const Json::Value described = Described();
  // The framework's own, of a poll task that cannot be started or asked; the tests of the poll task have them.
  const std::set<std::string> framework = {"113", "115", "116", "117", "118"};
  for (const VORN::APIEntry *row = GetAPITable(); row->api != nullptr; ++row) {
    const std::string name = std::string(row->api) + '/' + std::to_string(row->version) + '/' + row->method;
    std::set<int> expected = {0};
    for (const std::string &code : described[name]["errors"].getMemberNames()) {
      if (framework.count(code) == 0) {
        expected.insert(std::stoi(code));
      }
    }
    EXPECT_EQ(Answered(row->handler), expected) << name;
  }
}

} // namespace
