// The writing half of the wireless daemon's client: files and hostapd.
#include "platform/utility.h"
#include "platform/wifi.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/utility/syslog_record.h"
#include "tests/host/wireless/hostapd_peer.h"

#include <gmock/gmock.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <thread>

namespace {

using hosttest::FakeHostapd;
using hosttest::NamesIn;
using hosttest::ReadText;
using hosttest::RealHostapd;
using hosttest::Shell;
using hosttest::StationText;
using hosttest::TakeLogLines;
using hosttest::WithStations;
using hosttest::WriteHostapdConfig;
using hosttest::WriteText;
using std::chrono::steady_clock;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornwireless::dbus::WifiClient;

constexpr char kPhone[] = "02:00:00:00:01:00";
constexpr char kLaptop[] = "02:00:00:00:02:00";
const std::string kFolder = "/etc/vorn/wireless/";
const std::string kListHead = "# Made from the adapter's configuration; changes here are lost.\n";

Json::Value Entry(const std::string &mac, bool enabled = true) {
  Json::Value entry;
  entry["mac"] = mac;
  entry["desc"] = "<b>tv</b>\n$(id)";
  entry["mac_filter_enabled"] = enabled;
  return entry;
}

Json::Value Config(const char *policy, std::initializer_list<const char *> macs) {
  Json::Value config;
  config["mac_filter_policy"] = policy;
  config["mac_filter_list"] = Json::Value(Json::arrayValue);
  for (const char *mac : macs) {
    config["mac_filter_list"].append(Entry(mac));
  }
  return config;
}

Json::Value ManyEntries(const char *policy, int count) {
  Json::Value config = Config(policy, {});
  for (int i = 0; i < count; ++i) {
    char mac[32];
    std::snprintf(mac, sizeof(mac), "02:00:00:01:%02x:%02x", i / 256, i % 256);
    config["mac_filter_list"].append(Entry(mac));
  }
  return config;
}

int Apply(const std::string &adapter, const Json::Value &config) {
  return WifiClient().ApplyAdapter(adapter, config);
}

// Every file that a change may touch, with its content.
std::string Picture() {
  return Shell("cd /etc && find hostapd vorn -type f | sort | xargs -r tail -n +1");
}

// A hostapd that takes everything and has these stations.
hosttest::Answerer Obedient(const std::vector<std::string> &stations) {
  return [stations](const std::string &request) -> std::optional<std::string> {
    auto answer = WithStations(stations)(request);
    return answer == "UNKNOWN COMMAND\n" ? "OK\n" : answer;
  };
}

class WifiApply : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder("/etc/hostapd");
    hosttest::FreshFolder(hosttest::kControlFolder);
    std::filesystem::remove_all("/etc/vorn");
    std::filesystem::remove_all("/run/vorn");
    TakeLogLines();
  }
};

TEST_F(WifiApply, WritesEveryFileAndReadsTheSameBack) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\n");
  Json::Value config = Config("deny", {kPhone});
  config["mac_filter_list"].append(Entry(kLaptop, false));
  config["enabled"] = true;
  config["colour"] = "red";
  ASSERT_GE(Apply("wlan0", config), 0);
  EXPECT_EQ(ReadText(kFolder + "wlan0.deny"), kListHead + kPhone + "\n");
  EXPECT_EQ(ReadText(kFolder + "wlan0.accept"), kListHead);
  const std::string lines = "macaddr_acl=0\naccept_mac_file=/etc/vorn/wireless/wlan0.accept\n"
                            "deny_mac_file=/etc/vorn/wireless/wlan0.deny\n";
  const std::string hostapd = ReadText("/etc/hostapd/wlan0.conf");
  EXPECT_THAT(hostapd, HasSubstr("interface=wlan0\n" + lines + "driver=none\n"));
  EXPECT_THAT(hostapd, HasSubstr("bss=gwlan0\n" + lines + "ctrl_interface"));
  EXPECT_THAT(NamesIn(kFolder), ElementsAre("wlan0.accept", "wlan0.deny", "wlan0.json"));
  Json::Value back;
  ASSERT_GE(WifiClient().GetAdapterConfig("wlan0", back), 0);
  config["enabled"] = false; // no hostapd runs
  config["guest_enabled"] = false;
  EXPECT_EQ(back, config);
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(WifiApply, HostapdsFileKeepsItsMode) {
  WriteHostapdConfig("wlan0");
  Shell("chmod 600 /etc/hostapd/wlan0.conf");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  EXPECT_EQ(hosttest::StatOf("/etc/hostapd/wlan0.conf").st_mode & 07777U, 0600U);
}

TEST_F(WifiApply, PoliciesFollowOneAnother) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  ASSERT_GE(Apply("wlan0", Config("allow", {kLaptop})), 0);
  EXPECT_EQ(ReadText(kFolder + "wlan0.deny"), kListHead);
  EXPECT_EQ(ReadText(kFolder + "wlan0.accept"), kListHead + kLaptop + "\n");
  EXPECT_THAT(ReadText("/etc/hostapd/wlan0.conf"), HasSubstr("\nmacaddr_acl=1\n"));
  ASSERT_GE(Apply("wlan0", Config("disable", {kLaptop})), 0);
  EXPECT_EQ(ReadText(kFolder + "wlan0.deny"), kListHead);
  EXPECT_EQ(ReadText(kFolder + "wlan0.accept"), kListHead);
  EXPECT_THAT(ReadText("/etc/hostapd/wlan0.conf"), HasSubstr("\nmacaddr_acl=0\n"));
  Json::Value back;
  ASSERT_GE(WifiClient().GetAdapterConfig("wlan0", back), 0);
  EXPECT_EQ(back["mac_filter_list"][0]["mac"], kLaptop); // switching the filter off costs nobody the list
}

TEST_F(WifiApply, RealHostapdHasTheListsAtOnceAndAfterEveryKindOfRestart) {
  WriteHostapdConfig("none0");
  WriteHostapdConfig("gnone0");
  const std::string shown = std::string(kPhone) + " VLAN_ID=0\n";
  {
    const RealHostapd hostapd({"none0", "gnone0"});
    ASSERT_GE(Apply("none0", Config("allow", {kPhone})), 0);
    for (const char *network : {"none0", "gnone0"}) {
      EXPECT_EQ(RealHostapd::Ask(network, "ACCEPT_ACL SHOW"), shown);
      EXPECT_EQ(RealHostapd::Ask(network, "DENY_ACL SHOW"), "");
    }
    ASSERT_EQ(RealHostapd::Ask("none0", "RELOAD"), "OK\n");
    EXPECT_EQ(RealHostapd::Ask("none0", "ACCEPT_ACL SHOW"), shown);
    ASSERT_GE(Apply("none0", Config("deny", {kPhone, kLaptop})), 0);
    ASSERT_GE(Apply("none0", Config("deny", {kPhone})), 0);
    EXPECT_EQ(RealHostapd::Ask("none0", "DENY_ACL SHOW"), shown);
    EXPECT_EQ(RealHostapd::Ask("none0", "ACCEPT_ACL SHOW"), "");
    hostapd.Signal(SIGHUP);
    EXPECT_TRUE(hosttest::Eventually(5000, [&shown] { return RealHostapd::Ask("none0", "DENY_ACL SHOW") == shown; }));
  }
  const RealHostapd again({"none0", "gnone0"});
  EXPECT_EQ(RealHostapd::Ask("none0", "DENY_ACL SHOW"), shown);
  EXPECT_EQ(RealHostapd::Ask("gnone0", "DENY_ACL SHOW"), shown);
}

TEST_F(WifiApply, ForbiddenStationsAreThrownOutAndNoOthers) {
  WriteHostapdConfig("wlan0");
  FakeHostapd hostapd("wlan0", Obedient({StationText(kPhone, true), StationText(kLaptop, true),
                                         StationText("02:00:00:00:03:00", false)}));
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  const std::vector<std::string> begin = {"ACCEPT_ACL CLEAR", "DENY_ACL CLEAR",
                                          "SET accept_mac_file /etc/vorn/wireless/wlan0.accept",
                                          "SET deny_mac_file /etc/vorn/wireless/wlan0.deny"};
  EXPECT_THAT(hostapd.Requests(), ElementsAre("SET macaddr_acl 0", begin[0], begin[1], begin[2], begin[3],
                                              "SET macaddr_acl 0", "DENY_ACL DEL_MAC 00:00:00:00:00:00", "STA-FIRST",
                                              "STA-NEXT 02:00:00:00:01:00", "STA-NEXT 02:00:00:00:02:00",
                                              "STA-NEXT 02:00:00:00:03:00", "DEAUTHENTICATE 02:00:00:00:01:00"));
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  EXPECT_THAT(hostapd.Requests(), Contains("SET macaddr_acl 1"));
  EXPECT_THAT(hostapd.Requests(), Contains("DEAUTHENTICATE 02:00:00:00:02:00"));
  EXPECT_THAT(hostapd.Requests(), Contains("DEAUTHENTICATE 02:00:00:00:03:00"));
  ASSERT_GE(Apply("wlan0", Config("disable", {kPhone})), 0);
  const auto requests = hostapd.Requests();
  EXPECT_EQ(std::count_if(requests.begin(), requests.end(),
                          [](const std::string &request) { return request.rfind("DEAUTHENTICATE", 0) == 0; }),
            3);
}

TEST_F(WifiApply, WhatIsNotAcceptableChangesNothingAndAsksNobody) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  FakeHostapd hostapd("wlan0", Obedient({}));
  const std::string before = Picture();
  Json::Value notUtf8 = Config("deny", {kLaptop});
  notUtf8["mac_filter_list"][0]["desc"] = "\xff";
  Json::Value noList = Config("deny", {});
  noList["mac_filter_list"] = Json::Value();
  Json::Value large = Config("deny", {kLaptop});
  large["note"] = std::string(2UL * 1024 * 1024, 'x');
  for (const Json::Value &config :
       {Config("reject", {kLaptop}), Config("deny", {"01:00:5e:00:00:01"}), Config("deny", {kLaptop, "phone"}),
        Json::Value(), Json::Value("text"), Json::Value(Json::arrayValue), notUtf8, noList}) {
    EXPECT_LT(Apply("wlan0", config), 0);
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
    EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("3 wlan0: ")));
  }
  EXPECT_THAT(hostapd.Requests(), IsEmpty());
  EXPECT_LT(Apply("wlan0", large), 0);
  EXPECT_EQ(Picture(), before);
}

TEST_F(WifiApply, UnknownAdapterIsRefused) {
  WriteHostapdConfig("wlan0");
  const std::string before = Picture();
  for (const char *name : {"", "wlan1", "gwlan0", "../hostapd/wlan0", "wlan0\n"}) {
    EXPECT_LT(Apply(name, Config("deny", {kPhone})), 0);
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  }
  EXPECT_EQ(Picture(), before);
}

TEST_F(WifiApply, NetworkWithoutAControlSocketIsRefused) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nssid=guest\n");
  const std::string before = Picture();
  EXPECT_LT(Apply("wlan0", Config("deny", {kPhone})), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("the network gwlan0 has no ctrl_interface")));
  EXPECT_EQ(Picture(), before);
}

TEST_F(WifiApply, HostapdThatRefusesHasTheOldFilesAndTheOldFilterAgain) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  const std::string before = Picture();
  bool refused = false;
  FakeHostapd hostapd("wlan0", [&refused](const std::string &request) -> std::optional<std::string> {
    if (request == "SET macaddr_acl 1") {
      refused = true;
      return "FAIL\n";
    }
    return Obedient({StationText(kPhone, true)})(request);
  });
  EXPECT_LT(Apply("wlan0", Config("allow", {kLaptop})), 0);
  EXPECT_TRUE(refused);
  EXPECT_EQ(Picture(), before);
  EXPECT_EQ(hostapd.Requests().back(), "DEAUTHENTICATE 02:00:00:00:01:00"); // by the old filter, which denies it
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: wlan0: hostapd does not take the MAC filter"));
}

TEST_F(WifiApply, FirstFilterThatIsRefusedLeavesNoFile) {
  WriteHostapdConfig("wlan0");
  const std::string before = Picture();
  FakeHostapd hostapd("wlan0", [](const std::string &) { return "FAIL\n"; });
  EXPECT_LT(Apply("wlan0", Config("allow", {kLaptop})), 0);
  EXPECT_EQ(Picture(), before);
  EXPECT_THAT(NamesIn(kFolder), IsEmpty());
}

TEST_F(WifiApply, HangingHostapdHoldsTheCallNoLongerThanItsLimitAndChangesNothing) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  ASSERT_GE(Apply("none0", Config("deny", {kPhone})), 0);
  const std::string before = Picture();
  hostapd.Signal(SIGSTOP);
  const auto start = steady_clock::now();
  EXPECT_LT(Apply("none0", Config("allow", {kLaptop})), 0);
  EXPECT_LT(steady_clock::now() - start, std::chrono::milliseconds(2800));
  EXPECT_EQ(Picture(), before);
  hostapd.Signal(SIGCONT);
  EXPECT_GE(Apply("none0", Config("allow", {kLaptop})), 0);
  EXPECT_EQ(RealHostapd::Ask("none0", "ACCEPT_ACL SHOW"), std::string(kLaptop) + " VLAN_ID=0\n");
}

TEST_F(WifiApply, GarbageAndSilenceInTheMiddleAreRefusals) {
  WriteHostapdConfig("wlan0");
  const std::string before = Picture();
  for (const char *answer : {"OK", "\xff\n", "UNKNOWN COMMAND\n", ""}) {
    FakeHostapd hostapd("wlan0", [&answer](const std::string &request) -> std::optional<std::string> {
      return request == "DENY_ACL CLEAR" ? answer : Obedient({})(request);
    });
    EXPECT_LT(Apply("wlan0", Config("deny", {kPhone})), 0) << answer;
    EXPECT_EQ(Picture(), before);
  }
}

// What is asked of it next finds nobody: neither an answer nor a way to put the old filter back. The files are back.
TEST_F(WifiApply, HostapdThatDiesInTheMiddleIsARefusalAndTheFilesAreAsTheyWere) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  const std::string before = Picture();
  for (const char *last : {"SET macaddr_acl 0", "DENY_ACL CLEAR", "SET macaddr_acl 1", "STA-FIRST"}) {
    FakeHostapd hostapd("wlan0", [&last](const std::string &request) -> std::optional<std::string> {
      return request == last ? hosttest::kDeath : Obedient({StationText(kPhone, true)})(request);
    });
    const auto start = steady_clock::now();
    EXPECT_LT(Apply("wlan0", Config("allow", {kLaptop})), 0) << last;
    EXPECT_LT(steady_clock::now() - start, std::chrono::milliseconds(2800)) << last;
    EXPECT_EQ(Picture(), before) << last;
  }
  EXPECT_GE(Apply("wlan0", Config("allow", {kLaptop})), 0); // dead, it is read when it starts
}

TEST_F(WifiApply, SymbolicLinkInAFilesPlaceIsRefused) {
  WriteHostapdConfig("wlan0");
  WriteText("/tmp/elsewhere", "precious\n");
  std::filesystem::create_directories(kFolder);
  std::filesystem::create_symlink("/tmp/elsewhere", kFolder + "wlan0.json");
  const std::string hostapd = ReadText("/etc/hostapd/wlan0.conf");
  EXPECT_LT(Apply("wlan0", Config("deny", {kPhone})), 0);
  EXPECT_EQ(ReadText("/tmp/elsewhere"), "precious\n");
  EXPECT_EQ(ReadText("/etc/hostapd/wlan0.conf"), hostapd);
  EXPECT_THAT(NamesIn(kFolder), ElementsAre("wlan0.json"));
}

TEST_F(WifiApply, FiveHundredEntriesOnTwoAdaptersTakeLessThanHalfASecond) {
  for (const char *name : {"none0", "gnone0", "none1", "gnone1"}) {
    WriteHostapdConfig(name);
  }
  const RealHostapd hostapd({"none0", "gnone0", "none1", "gnone1"});
  const Json::Value config = ManyEntries("deny", 500);
  const auto start = steady_clock::now();
  ASSERT_GE(Apply("none0", config), 0);
  ASSERT_GE(Apply("none1", config), 0);
  const auto took = std::chrono::duration_cast<std::chrono::milliseconds>(steady_clock::now() - start);
  RecordProperty("milliseconds", static_cast<int>(took.count()));
  EXPECT_LT(took.count(), 500);
  for (const char *name : {"none0", "gnone0", "none1", "gnone1"}) {
    // hostapd shows no more than 4 KiB, which the first 146 fill.
    EXPECT_THAT(RealHostapd::Ask(name, "DENY_ACL SHOW"), HasSubstr("02:00:00:01:00:91 VLAN_ID=0\n"));
    EXPECT_EQ(RealHostapd::Ask(name, "DENY_ACL DEL_MAC 02:00:00:01:01:f3"), "OK\n");
  }
  EXPECT_EQ(Shell("wc -l < /etc/vorn/wireless/none1.deny"), "501\n");
}

TEST_F(WifiApply, TwoThousandEntriesAreTaken) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  ASSERT_GE(Apply("none0", ManyEntries("allow", 2000)), 0);
  EXPECT_EQ(Shell("wc -l < /etc/vorn/wireless/none0.accept"), "2001\n");
  EXPECT_THAT(RealHostapd::Ask("none0", "ACCEPT_ACL SHOW"), HasSubstr("02:00:00:01:00:00 VLAN_ID=0\n"));
}

TEST_F(WifiApply, WritersTakeTurnsAndTheFilesAgreeWithOneOfThem) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  std::atomic<int> failures = 0;
  const auto write = [&failures](const char *policy, const char *mac) {
    for (int i = 0; i < 10; ++i) {
      failures += Apply("none0", Config(policy, {mac})) < 0 ? 1 : 0;
    }
  };
  std::thread one(write, "deny", kPhone);
  std::thread two(write, "allow", kLaptop);
  one.join();
  two.join();
  EXPECT_EQ(failures, 0);
  Json::Value config;
  ASSERT_GE(WifiClient().GetAdapterConfig("none0", config), 0);
  const bool deny = config["mac_filter_policy"] == "deny";
  EXPECT_EQ(ReadText(kFolder + "none0.deny"), deny ? kListHead + kPhone + "\n" : kListHead);
  EXPECT_EQ(ReadText(kFolder + "none0.accept"), deny ? kListHead : kListHead + kLaptop + "\n");
  EXPECT_EQ(RealHostapd::Ask("none0", deny ? "DENY_ACL SHOW" : "ACCEPT_ACL SHOW"),
            std::string(deny ? kPhone : kLaptop) + " VLAN_ID=0\n");
  EXPECT_EQ(RealHostapd::Ask("none0", deny ? "ACCEPT_ACL SHOW" : "DENY_ACL SHOW"), "");
}

} // namespace
