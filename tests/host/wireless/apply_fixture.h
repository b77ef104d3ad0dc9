// What the tests of the wireless daemon's client's writing half share.
#ifndef TESTS_HOST_WIRELESS_APPLY_FIXTURE_H
#define TESTS_HOST_WIRELESS_APPLY_FIXTURE_H

#include "platform/utility.h"
#include "platform/wifi.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/utility/syslog_record.h"
#include "tests/host/wireless/hostapd_peer.h"

#include <gmock/gmock.h>

#include <chrono>
#include <csignal>
#include <initializer_list>
#include <string>
#include <thread>
#include <vector>

namespace hosttest {

constexpr char kPhone[] = "02:00:00:00:01:00";
constexpr char kLaptop[] = "02:00:00:00:02:00";
inline const std::string kFolder = "/etc/vorn/wireless/";
inline const std::string kListHead = "# Made from the adapter's configuration; changes here are lost.\n";

inline Json::Value Entry(const std::string &mac, bool enabled = true) {
  Json::Value entry;
  entry["mac"] = mac;
  entry["desc"] = "<b>tv</b>\n$(id)";
  entry["mac_filter_enabled"] = enabled;
  return entry;
}

inline Json::Value Config(const char *policy, std::initializer_list<const char *> macs) {
  Json::Value config;
  config["mac_filter_policy"] = policy;
  config["mac_filter_list"] = Json::Value(Json::arrayValue);
  for (const char *mac : macs) {
    config["mac_filter_list"].append(Entry(mac));
  }
  return config;
}

inline int Apply(const std::string &adapter, const Json::Value &config) {
  return vornwireless::dbus::WifiClient().ApplyAdapter(adapter, config);
}

/// Every file that a change may touch, with its content.
inline std::string Picture() {
  return Shell("cd /etc && find hostapd vorn -type f | sort | xargs -r tail -n +1");
}

/// A hostapd that takes everything and has these stations.
inline Answerer Obedient(const std::vector<std::string> &stations) {
  return [stations](const std::string &request) -> std::optional<std::string> {
    auto answer = WithStations(stations)(request);
    return answer == "UNKNOWN COMMAND\n" ? "OK\n" : answer;
  };
}

/// The requests that give hostapd these lists and this policy, in order.
inline std::vector<std::string> Telling(const std::vector<std::string> &lists, const std::string &macaddrAcl) {
  std::vector<std::string> requests = {"SET macaddr_acl 2", "ACCEPT_ACL CLEAR", "DENY_ACL CLEAR"};
  requests.insert(requests.end(), lists.begin(), lists.end());
  requests.push_back("SET macaddr_acl " + macaddrAcl);
  requests.emplace_back("ACCEPT_ACL DEL_MAC 00:00:00:00:00:00");
  return requests;
}

/// The two requests that give hostapd an adapter's lists.
inline std::vector<std::string> ListsOf(const std::string &adapter) {
  return {"SET accept_mac_file " + kFolder + adapter + ".accept", "SET deny_mac_file " + kFolder + adapter + ".deny"};
}

class WifiApply : public testing::Test {
protected:
  void SetUp() override {
    FreshFolder("/etc/hostapd");
    FreshFolder(kControlFolder);
    std::filesystem::remove_all("/etc/vorn");
    std::filesystem::remove_all("/run/vorn");
    TakeLogLines();
  }
};

} // namespace hosttest

#endif
