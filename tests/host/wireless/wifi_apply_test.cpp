// The writing half of the wireless daemon's client: files and hostapd.
#include "tests/host/wireless/apply_fixture.h"

#include <atomic>

namespace {

using hosttest::Apply;
using hosttest::Config;
using hosttest::Entry;
using hosttest::FakeHostapd;
using hosttest::kFolder;
using hosttest::kLaptop;
using hosttest::kListHead;
using hosttest::kPhone;
using hosttest::NamesIn;
using hosttest::Obedient;
using hosttest::Picture;
using hosttest::ReadText;
using hosttest::RealHostapd;
using hosttest::Shell;
using hosttest::StationText;
using hosttest::TakeLogLines;
using hosttest::WifiApply;
using hosttest::WithStations;
using hosttest::WriteHostapdConfig;
using hosttest::WriteText;
using std::chrono::steady_clock;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornwireless::dbus::WifiClient;

Json::Value ManyEntries(const char *policy, int count) {
  Json::Value config = Config(policy, {});
  for (int i = 0; i < count; ++i) {
    char mac[32];
    std::snprintf(mac, sizeof(mac), "02:00:00:01:%02x:%02x", i / 256, i % 256);
    config["mac_filter_list"].append(Entry(mac));
  }
  return config;
}

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
  std::vector<std::string> requests = {"PING"};
  for (const auto &more : {hosttest::Telling(hosttest::ListsOf("wlan0"), "0"),
                           {"STA-FIRST", "STA-NEXT 02:00:00:00:01:00", "STA-NEXT 02:00:00:00:02:00",
                            "STA-NEXT 02:00:00:00:03:00", "DEAUTHENTICATE 02:00:00:00:01:00"}}) {
    requests.insert(requests.end(), more.begin(), more.end());
  }
  EXPECT_EQ(hostapd.Requests(), requests);
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  EXPECT_THAT(hostapd.Requests(), Contains("SET macaddr_acl 1"));
  EXPECT_THAT(hostapd.Requests(), Contains("DEAUTHENTICATE 02:00:00:00:02:00"));
  EXPECT_THAT(hostapd.Requests(), Contains("DEAUTHENTICATE 02:00:00:00:03:00"));
  ASSERT_GE(Apply("wlan0", Config("disable", {kPhone})), 0);
  requests = hostapd.Requests();
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
        Json::Value(), Json::Value("text"), Json::Value(Json::arrayValue), notUtf8, noList, large}) {
    EXPECT_LT(Apply("wlan0", config), 0);
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
    EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("3 wlan0: ")));
  }
  EXPECT_THAT(hostapd.Requests(), IsEmpty());
  EXPECT_EQ(Picture(), before);
  EXPECT_LT(Apply("wlan0", large), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: a configuration that is too large"));
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
  std::vector<std::string> undo = hosttest::Telling(hosttest::ListsOf("wlan0"), "0"); // hostapd throws the phone out
  undo.insert(undo.begin(), "PING");
  const auto requests = hostapd.Requests();
  ASSERT_GT(requests.size(), undo.size());
  EXPECT_EQ(std::vector<std::string>(requests.end() - static_cast<std::ptrdiff_t>(undo.size()), requests.end()), undo);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: wlan0: hostapd does not take the MAC filter"));
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
  FakeHostapd silent("wlan0", [](const std::string &request) -> std::optional<std::string> {
    return request == "DENY_ACL CLEAR" ? std::nullopt : Obedient({})(request);
  });
  const auto start = steady_clock::now();
  EXPECT_LT(Apply("wlan0", Config("deny", {kPhone})), 0);
  EXPECT_LT(steady_clock::now() - start, std::chrono::milliseconds(4800));
  EXPECT_EQ(Picture(), before);
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
