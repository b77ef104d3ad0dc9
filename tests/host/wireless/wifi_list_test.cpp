// The reading half of the wireless daemon's client, over hostapd and over a stand-in.
#include "platform/utility.h"
#include "platform/wifi.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/utility/syslog_record.h"
#include "tests/host/wireless/hostapd_peer.h"

#include <gmock/gmock.h>
#include <json/writer.h>

#include <chrono>
#include <csignal>
#include <ctime>

namespace {

using hosttest::FakeHostapd;
using hosttest::RealHostapd;
using hosttest::Shell;
using hosttest::StationText;
using hosttest::TakeLogLines;
using hosttest::WithStations;
using hosttest::WriteHostapdConfig;
using hosttest::WriteText;
using std::chrono::steady_clock;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornwireless::dbus::WifiClient;

constexpr char kPhone[] = "02:00:00:00:01:00";
constexpr char kLaptop[] = "02:00:00:00:02:00";

std::string Text(const Json::Value &value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

class WifiList : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder("/etc/hostapd");
    hosttest::FreshFolder(hosttest::kControlFolder);
    hosttest::FreshFolder("/etc/vorn/wireless");
    hosttest::FreshFolder("/var/lib/misc");
    hosttest::RemoveLinks();
    TakeLogLines();
  }

  static std::string Adapters() {
    Json::Value adapters;
    EXPECT_GE(WifiClient().GetAdapterList(adapters), 0);
    return Text(adapters);
  }

  static std::string Config(const std::string &adapter) {
    Json::Value config;
    return WifiClient().GetAdapterConfig(adapter, config) < 0 ? "failed" : Text(config);
  }

  // The stations without their times, which are looked at here.
  static std::string Stations(const std::string &network) {
    Json::Value stations;
    const std::time_t before = std::time(nullptr);
    if (WifiClient().GetConnectionList(network, stations) < 0) {
      return "failed";
    }
    for (Json::Value &station : stations) {
      std::tm time{};
      const char *end = strptime(station["asso_time"].asCString(), "%T %Y/%m/%d", &time);
      EXPECT_TRUE(end != nullptr && *end == '\0') << station["asso_time"];
      time.tm_isdst = -1;
      const std::time_t seen = std::mktime(&time);
      EXPECT_TRUE(seen >= before && seen <= std::time(nullptr)) << station["asso_time"];
      station.removeMember("asso_time");
    }
    return Text(stations);
  }

  // How long a call took that must fail.
  template <typename Call> static std::chrono::milliseconds TimeOf(const Call &call) {
    const auto start = steady_clock::now();
    call();
    return std::chrono::duration_cast<std::chrono::milliseconds>(steady_clock::now() - start);
  }
};

constexpr std::chrono::milliseconds kPatience{2600}; // the limit of 2 s, and a busy machine

TEST_F(WifiList, WithoutAnAdapterTheListIsEmpty) {
  EXPECT_EQ(Adapters(), "[]");
  EXPECT_EQ(Config("wlan0"), "failed");
  EXPECT_EQ(Stations("wlan0"), "failed");
  std::filesystem::remove_all("/etc/hostapd");
  EXPECT_EQ(Adapters(), "[]");
}

TEST_F(WifiList, AdaptersAreHostapdsInterfacesWithoutTheGuestNetworks) {
  WriteHostapdConfig("wlan1", "bss=gwlan1\nssid=guest\n");
  WriteHostapdConfig("wlan0");
  WriteHostapdConfig("gwlan0"); // the guest network of wlan0 on a radio of its own
  WriteHostapdConfig("g");      // not one of anybody
  WriteText("/etc/hostapd/notes.txt", "interface=wlan9\n");
  WriteText("/etc/hostapd/empty.conf", "");
  WriteText("/etc/hostapd/twice.conf", "interface=wlan1\n");
  EXPECT_EQ(Adapters(), R"(["g","wlan0","wlan1"])");
}

TEST_F(WifiList, RealHostapdIsReadAndHasNoStations) {
  ASSERT_TRUE(hosttest::HasHostapd());
  WriteHostapdConfig("none0");
  WriteHostapdConfig("gnone0");
  const RealHostapd hostapd({"none0", "gnone0"});
  EXPECT_EQ(Config("none0"),
            R"({"enabled":true,"guest_enabled":true,"mac_filter_list":[],"mac_filter_policy":"disable"})");
  EXPECT_EQ(Stations("none0"), "[]");
  EXPECT_EQ(Stations("gnone0"), "[]");
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(WifiList, RealHostapdsUnauthorizedStationsAreNotListed) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  for (const char *mac : {kPhone, kLaptop, "02:00:00:00:03:00"}) {
    ASSERT_EQ(RealHostapd::Ask("none0", std::string("NEW_STA ") + mac), "OK\n");
  }
  EXPECT_EQ(Stations("none0"), "[]");
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(WifiList, DisabledNetworkIsNotOn) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  ASSERT_EQ(RealHostapd::Ask("none0", "DISABLE"), "OK\n");
  EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":false,"guest_enabled":false)"));
  ASSERT_EQ(RealHostapd::Ask("none0", "ENABLE"), "OK\n");
  EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":true)"));
}

TEST_F(WifiList, DeadHostapdsNetworkIsNotOn) {
  WriteHostapdConfig("none0");
  { const RealHostapd killed({"none0"}); }
  ASSERT_TRUE(std::filesystem::exists("/run/hostapd/none0")); // it left its socket
  EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":false)"));
  EXPECT_EQ(Stations("none0"), "failed");
  const RealHostapd again({"none0"});
  EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":true)"));
}

TEST_F(WifiList, StoppedHostapdHoldsNoCallLongerThanItsLimit) {
  WriteHostapdConfig("none0");
  WriteHostapdConfig("gnone0");
  const RealHostapd hostapd({"none0", "gnone0"});
  hostapd.Signal(SIGSTOP);
  EXPECT_LT(TimeOf([] { EXPECT_EQ(Stations("none0"), "failed"); }), kPatience);
  EXPECT_LT(TimeOf([] { EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":false,"guest_enabled":false)")); }),
            kPatience);
  hostapd.Signal(SIGCONT);
  EXPECT_EQ(Stations("none0"), "[]"); // and its late answers are nobody's
  EXPECT_THAT(Config("none0"), HasSubstr(R"("enabled":true,"guest_enabled":true)"));
}

TEST_F(WifiList, FullQueueOfAStoppedHostapdHoldsNoCallEither) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  hostapd.Signal(SIGSTOP);
  Shell("for i in $(seq 30); do busybox timeout 0.05 hostapd_cli -p /run/hostapd -i none0 ping & done; wait; true");
  EXPECT_LT(TimeOf([] { EXPECT_EQ(Stations("none0"), "failed"); }), kPatience);
}

TEST_F(WifiList, AuthorizedStationsAreListedWithAllThatIsKnown) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\n");
  FakeHostapd home("wlan0", WithStations({StationText("02:00:00:00:04:00", false), StationText(kPhone, true),
                                          StationText(kLaptop, true)}));
  FakeHostapd guest("gwlan0", WithStations({StationText("02:00:00:00:03:00", true)}));
  const std::string soon = std::to_string(std::time(nullptr) + 60);
  WriteText("/var/lib/misc/dnsmasq.leases",
            soon + " " + kPhone + " 192.168.1.100 phone *\n" + soon + " 02:00:00:00:03:00 192.168.2.7;id x *\n");
  Shell("ip link add lbr0 type bridge && ip link set lbr0 up && ip addr add 192.168.1.1/24 dev lbr0 && ip neigh add "
        "192.168.1.7 lladdr 02:00:00:00:02:00 nud reachable dev lbr0");
  EXPECT_EQ(Stations("wlan0"),
            R"([{"hostname":"phone","ip":"192.168.1.100","mac":"02:00:00:00:01:00","signalstrength":-52,)"
            R"("transferRX":1406,"transferTX":6000000123},)"
            R"({"ip":"192.168.1.7","mac":"02:00:00:00:02:00","signalstrength":-52,)"
            R"("transferRX":1406,"transferTX":6000000123}])");
  EXPECT_EQ(Stations("gwlan0"),
            R"([{"mac":"02:00:00:00:03:00","signalstrength":-52,"transferRX":1406,"transferTX":6000000123}])");
  EXPECT_THAT(home.Requests(), ElementsAre("STA-FIRST", "STA-NEXT 02:00:00:00:04:00", "STA-NEXT 02:00:00:00:01:00",
                                           "STA-NEXT 02:00:00:00:02:00"));
  EXPECT_THAT(Config("wlan0"), HasSubstr(R"("enabled":true,"guest_enabled":true)"));
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(WifiList, FailedNeighboursAreNoAddresses) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd home("wlan0", WithStations({StationText(kPhone, true)}));
  Shell("ip link add lbr0 type bridge && ip link set lbr0 up && ip addr add 192.168.1.1/24 dev lbr0 && ip neigh add "
        "192.168.1.7 lladdr 02:00:00:00:01:00 nud failed dev lbr0");
  EXPECT_EQ(Stations("wlan0").find("\"ip\""), std::string::npos);
}

TEST_F(WifiList, Ipv6NeighboursAreNoAddresses) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd home("wlan0", WithStations({StationText(kPhone, true)}));
  Shell("ip link add lbr0 type bridge && ip link set lbr0 up && ip addr add fd00::1/64 dev lbr0 && ip neigh add "
        "fd00::7 lladdr 02:00:00:00:01:00 nud reachable dev lbr0");
  EXPECT_EQ(Stations("wlan0").find("\"ip\""), std::string::npos);
}

TEST_F(WifiList, TimesFollowTheTimeZone) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd home("wlan0", WithStations({StationText(kPhone, true)}));
  for (const auto &[zone, east] : {std::pair("Asia/Tokyo", 540), std::pair("Asia/Kolkata", 330), std::pair("UTC", 0)}) {
    hosttest::PutTimeZone(zone);
    Json::Value stations;
    const std::time_t before = std::time(nullptr);
    ASSERT_GE(WifiClient().GetConnectionList("wlan0", stations), 0);
    std::tm shown{};
    strptime(stations[0]["asso_time"].asCString(), "%T %Y/%m/%d", &shown);
    const std::time_t seen = timegm(&shown) - std::time_t{east} * 60;
    EXPECT_TRUE(seen >= before && seen <= std::time(nullptr)) << zone << stations;
  }
}

TEST_F(WifiList, UnknownCommandIsNoList) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd old("wlan0", [](const std::string &) { return "UNKNOWN COMMAND\n"; });
  EXPECT_EQ(Stations("wlan0"), "failed");
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_IO);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: hostapd gives no list of stations"));
  EXPECT_THAT(Config("wlan0"), HasSubstr(R"("enabled":false)"));
}

TEST_F(WifiList, GarbageAndCutAnswersAreNoList) {
  WriteHostapdConfig("wlan0");
  const std::string whole = StationText(kPhone, true);
  for (const std::string &answer : {std::string("\xff\0\n", 3), std::string(20000, 'x'), whole.substr(0, 30),
                                    whole.substr(0, 4000 / 10), std::string("\n")}) {
    const FakeHostapd bad("wlan0", [&answer](const std::string &) { return answer; });
    EXPECT_EQ(Stations("wlan0"), "failed") << answer;
  }
}

TEST_F(WifiList, TheSameStationForEverEndsTheWalk) {
  WriteHostapdConfig("wlan0");
  FakeHostapd loop("wlan0", [](const std::string &) { return StationText(kPhone, true); });
  EXPECT_EQ(Stations("wlan0"), "failed");
  EXPECT_EQ(loop.Requests().size(), 2U);
}

TEST_F(WifiList, StationsWithoutEndAreAskedForABoundedNumberOfTimes) {
  WriteHostapdConfig("wlan0");
  int count = 0;
  FakeHostapd endless("wlan0", [&count](const std::string &) {
    char mac[32];
    std::snprintf(mac, sizeof(mac), "02:00:00:00:%02x:%02x", (count / 256) % 256, count % 256);
    ++count;
    return StationText(mac, true);
  });
  EXPECT_LT(TimeOf([] { EXPECT_EQ(Stations("wlan0"), "failed"); }), kPatience);
  EXPECT_LE(endless.Requests().size(), 2008U);
}

TEST_F(WifiList, StationThatLeavesDuringTheWalkCostsNobodyElse) {
  WriteHostapdConfig("wlan0");
  int asked = 0;
  FakeHostapd home("wlan0", [&asked](const std::string &request) -> std::optional<std::string> {
    if (request == std::string("STA-NEXT ") + kPhone && asked++ == 0) {
      return "FAIL\n";
    }
    return WithStations({StationText(kPhone, true), StationText(kLaptop, true)})(request);
  });
  const std::string stations = Stations("wlan0");
  EXPECT_THAT(stations, HasSubstr(kPhone));
  EXPECT_THAT(stations, HasSubstr(kLaptop));
  EXPECT_THAT(home.Requests(), ElementsAre("STA-FIRST", "STA-NEXT 02:00:00:00:01:00", "STA-FIRST",
                                           "STA-NEXT 02:00:00:00:01:00", "STA-NEXT 02:00:00:00:02:00"));
}

TEST_F(WifiList, SilenceInTheMiddleOfTheWalkIsNoList) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd half("wlan0", [](const std::string &request) -> std::optional<std::string> {
    return request == "STA-FIRST" ? std::optional(StationText(kPhone, true)) : std::nullopt;
  });
  EXPECT_LT(TimeOf([] { EXPECT_EQ(Stations("wlan0"), "failed"); }), kPatience);
}

TEST_F(WifiList, HostapdThatDiesInTheMiddleOfTheWalkGivesNoList) {
  WriteHostapdConfig("wlan0");
  const FakeHostapd dying("wlan0", [](const std::string &request) -> std::optional<std::string> {
    return request == "STA-FIRST" ? StationText(kPhone, true) : hosttest::kDeath;
  });
  EXPECT_LT(TimeOf([] { EXPECT_EQ(Stations("wlan0"), "failed"); }), kPatience);
}

TEST_F(WifiList, StoredFilterIsPartOfTheConfiguration) {
  WriteHostapdConfig("wlan0");
  WriteText("/etc/vorn/wireless/wlan0.json",
            R"({"mac_filter_policy":"deny","mac_filter_list":[{"mac":"02:00:00:00:01:00"}],"colour":"red"})");
  EXPECT_EQ(Config("wlan0"), R"({"colour":"red","enabled":false,"guest_enabled":false,)"
                             R"("mac_filter_list":[{"mac":"02:00:00:00:01:00"}],"mac_filter_policy":"deny"})");
}

TEST_F(WifiList, DamagedStoreIsAFailureWithItsReason) {
  WriteHostapdConfig("wlan0");
  for (const std::string &content : {std::string("[]"), std::string("{\"mac_filter_policy\":"), std::string(),
                                     std::string(100000, '['), std::string(2 * 1024 * 1024, ' ')}) {
    WriteText("/etc/vorn/wireless/wlan0.json", content);
    EXPECT_EQ(Config("wlan0"), "failed");
    EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("/etc/vorn/wireless/wlan0.json")));
  }
}

TEST_F(WifiList, NamesOfNoAdapterAreRefused) {
  WriteHostapdConfig("wlan0");
  WriteText("/etc/vorn/wireless/other.json", "{}");
  for (const char *name : {"", "wlan", "gwlan0", "../wireless/wlan0", "wlan0\n", "other"}) {
    EXPECT_EQ(Config(name), "failed") << name;
    EXPECT_EQ(Stations(name), "failed") << name;
  }
}

} // namespace
