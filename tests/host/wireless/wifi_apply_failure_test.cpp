// Changes of a wireless adapter's configuration that fail: what the files and hostapd have then.
#include "tests/host/wireless/apply_fixture.h"

#include <algorithm>
#include <iterator>
#include <sstream>

namespace {

using hosttest::Answerer;
using hosttest::Apply;
using hosttest::Config;
using hosttest::FakeHostapd;
using hosttest::kFolder;
using hosttest::kLaptop;
using hosttest::kPhone;
using hosttest::ListsOf;
using hosttest::NamesIn;
using hosttest::Obedient;
using hosttest::Picture;
using hosttest::ReadText;
using hosttest::RealHostapd;
using hosttest::StationText;
using hosttest::TakeLogLines;
using hosttest::Telling;
using hosttest::WriteHostapdConfig;
using hosttest::WriteText;
using std::chrono::milliseconds;
using std::chrono::steady_clock;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using WifiApplyFailure = hosttest::WifiApply;
using Requests = std::vector<std::string>;

// A call's own limit, and what a busy machine may add.
constexpr milliseconds kSilentFromTheBegin{2800};
constexpr milliseconds kSilentInTheMiddle{4800};

Requests Join(std::initializer_list<Requests> parts) {
  Requests all;
  for (const Requests &part : parts) {
    all.insert(all.end(), part.begin(), part.end());
  }
  return all;
}

// Those that set the policy, in order.
Requests Policies(const Requests &requests) {
  Requests policies;
  std::copy_if(requests.begin(), requests.end(), std::back_inserter(policies),
               [](const std::string &request) { return request.rfind("SET macaddr_acl ", 0) == 0; });
  return policies;
}

// One that has no answer to requests that begin so.
Answerer SilentAt(const std::string &begin) {
  return [begin](const std::string &request) -> std::optional<std::string> {
    return request.rfind(begin, 0) == 0 ? std::nullopt : Obedient({})(request);
  };
}

Answerer RefusingAt(const std::string &refused) {
  return [refused](const std::string &request) -> std::optional<std::string> {
    return request == refused ? "FAIL\n" : Obedient({})(request);
  };
}

// A change that is to fail. @return how long it took
milliseconds TimeOfFailure(const Json::Value &config) {
  const auto start = steady_clock::now();
  EXPECT_LT(Apply("wlan0", config), 0);
  return std::chrono::duration_cast<milliseconds>(steady_clock::now() - start);
}

TEST_F(WifiApplyFailure, HangingHostapdNeverOpensAnAllowedOnlyNetwork) {
  WriteHostapdConfig("none0");
  const RealHostapd hostapd({"none0"});
  ASSERT_GE(Apply("none0", Config("allow", {kPhone})), 0);
  const auto lines = [] {
    Requests found;
    std::istringstream log(ReadText(hosttest::kHostapdLog));
    for (std::string line; std::getline(log, line);) {
      const size_t at = line.find("CTRL_IFACE SET 'macaddr_acl'");
      if (at != std::string::npos) {
        found.push_back(line.substr(at));
      }
    }
    return found;
  };
  const Requests before = lines();
  ASSERT_THAT(before, ElementsAre("CTRL_IFACE SET 'macaddr_acl'='2'", "CTRL_IFACE SET 'macaddr_acl'='1'"));
  hostapd.Signal(SIGSTOP);
  for (const char *policy : {"disable", "deny", "allow"}) {
    EXPECT_LT(Apply("none0", Config(policy, {kLaptop})), 0);
  }
  hostapd.Signal(SIGCONT);
  EXPECT_EQ(RealHostapd::Ask("none0", "ACCEPT_ACL SHOW"), std::string(kPhone) + " VLAN_ID=0\n"); // after the others
  EXPECT_EQ(lines(), before);
}

TEST_F(WifiApplyFailure, HostapdThatDoesNotAnswerIsAskedForNoChangeNorIsItsNeighbour) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\n");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  const std::string before = Picture();
  FakeHostapd home("wlan0", Obedient({}));
  FakeHostapd guests("gwlan0", SilentAt(""));
  EXPECT_LT(TimeOfFailure(Config("disable", {})), kSilentFromTheBegin);
  EXPECT_THAT(home.Requests(), ElementsAre("PING"));
  EXPECT_THAT(guests.Requests(), ElementsAre("PING"));
  EXPECT_EQ(Picture(), before);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: gwlan0: hostapd does not answer"));
}

TEST_F(WifiApplyFailure, SilenceInTheMiddleLeavesTheOldPolicyInForce) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  const std::string before = Picture();
  for (const char *policy : {"disable", "deny", "allow"}) {
    FakeHostapd hostapd("wlan0", SilentAt("SET accept_mac_file"));
    EXPECT_LT(TimeOfFailure(Config(policy, {kLaptop})), kSilentInTheMiddle);
    EXPECT_THAT(Policies(hostapd.Requests()),
                ElementsAre("SET macaddr_acl 2", "SET macaddr_acl 2", "SET macaddr_acl 1"))
        << policy;
    EXPECT_EQ(Picture(), before);
    EXPECT_THAT(TakeLogLines(),
                ElementsAre("3 wlan0: hostapd has the old policy without its lists until it answers and is told "
                            "again",
                            "3 wlan0: wlan0: hostapd does not take the MAC filter"));
  }
}

TEST_F(WifiApplyFailure, HostapdThatFallsSilentForGoodIsLeftShut) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  bool silent = false;
  FakeHostapd hostapd("wlan0", [&silent](const std::string &request) -> std::optional<std::string> {
    silent = silent || request == "DENY_ACL CLEAR";
    return silent ? std::nullopt : Obedient({})(request);
  });
  EXPECT_LT(TimeOfFailure(Config("deny", {kLaptop})), kSilentInTheMiddle);
  EXPECT_EQ(hostapd.Requests(),
            Requests({"PING", "SET macaddr_acl 2", "ACCEPT_ACL CLEAR", "DENY_ACL CLEAR", "PING", "PING"}));
  EXPECT_THAT(TakeLogLines(), Contains(HasSubstr("wlan0: hostapd has a part of a MAC filter until")));
}

TEST_F(WifiApplyFailure, NoChangeFromOrToAnAllowedOnlyNetworkEverOpensIt) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  FakeHostapd hostapd("wlan0", Obedient({}));
  ASSERT_GE(Apply("wlan0", Config("allow", {kLaptop})), 0);
  EXPECT_THAT(Policies(hostapd.Requests()), ElementsAre("SET macaddr_acl 2", "SET macaddr_acl 1"));
}

TEST_F(WifiApplyFailure, NetworkThatTookTheNewFilterHasTheOldOneAgainWhenItsNeighbourRefuses) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\n");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  const std::string before = Picture();
  FakeHostapd home("wlan0", Obedient({}));
  FakeHostapd guests("gwlan0", RefusingAt("SET macaddr_acl 0"));
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_EQ(home.Requests(),
            Join({{"PING"}, Telling(ListsOf("wlan0"), "0"), {"STA-FIRST", "PING"}, Telling(ListsOf("wlan0"), "1")}));
  EXPECT_EQ(Policies(guests.Requests()).back(), "SET macaddr_acl 1");
  EXPECT_EQ(Picture(), before);
}

TEST_F(WifiApplyFailure, DamagedStoreNeverOpensTheNetwork) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  WriteText(kFolder + "wlan0.json", "{\"mac_filter_pol");
  const std::string before = Picture();
  {
    FakeHostapd hostapd("wlan0", RefusingAt("SET macaddr_acl 0"));
    EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
    const auto requests = hostapd.Requests();
    EXPECT_EQ(Policies(requests).back(), "SET macaddr_acl 1");
    EXPECT_THAT(Requests(requests.end() - 8, requests.end()),
                testing::ElementsAreArray(Join({{"PING"}, Telling(ListsOf("wlan0"), "1")})));
    EXPECT_EQ(Picture(), before);
  }
  WriteText(kFolder + "wlan0.json", std::string("\0", 1)); // one that cannot even be replaced
  FakeHostapd hostapd("wlan0", Obedient({}));
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(hostapd.Requests(), ElementsAre("PING"));
}

TEST_F(WifiApplyFailure, FirstFilterThatIsRefusedLeavesNoFileAndAnOwnersOwnLists) {
  WriteHostapdConfig("wlan0", "macaddr_acl=1\naccept_mac_file=/etc/hostapd/mine\naccept_mac_file=/etc/hostapd/more\n"
                              "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\ndeny_mac_file=/etc/hostapd/not\n");
  const std::string before = Picture();
  FakeHostapd home("wlan0", Obedient({}));
  FakeHostapd guests("gwlan0", RefusingAt("SET deny_mac_file /etc/vorn/wireless/wlan0.deny"));
  EXPECT_LT(Apply("wlan0", Config("allow", {kLaptop})), 0);
  EXPECT_EQ(Picture(), before);
  EXPECT_THAT(NamesIn(kFolder), IsEmpty());
  EXPECT_EQ(home.Requests(),
            Join({{"PING"},
                  Telling(ListsOf("wlan0"), "1"),
                  {"STA-FIRST", "PING"},
                  Telling({"SET accept_mac_file /etc/hostapd/mine", "SET accept_mac_file /etc/hostapd/more"}, "1")}));
  EXPECT_EQ(guests.Requests(), Join({{"PING", "SET macaddr_acl 2", "ACCEPT_ACL CLEAR", "DENY_ACL CLEAR"},
                                     ListsOf("wlan0"),
                                     {"PING"},
                                     Telling({"SET deny_mac_file /etc/hostapd/not"}, "0")}));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: gwlan0: hostapd does not take the MAC filter"));
}

TEST_F(WifiApplyFailure, HostapdKilledInTheMiddleLeavesTheOldFiles) {
  WriteHostapdConfig("none0");
  RealHostapd hostapd({"none0"});
  ASSERT_GE(Apply("none0", Config("allow", {kPhone})), 0);
  const std::string before = Picture();
  hostapd.Signal(SIGSTOP);
  int result = 0;
  const auto start = steady_clock::now();
  std::thread change([&result] { result = Apply("none0", Config("deny", {kLaptop})); });
  // The conversation's own end has an abstract address; nobody else in this network namespace has one.
  const auto hasCome = [] { return ReadText("/proc/net/unix").find(" @") != std::string::npos; };
  EXPECT_TRUE(hosttest::Eventually(1500, hasCome));
  hostapd.Signal(SIGKILL);
  change.join();
  EXPECT_LT(result, 0);
  EXPECT_LT(steady_clock::now() - start, kSilentFromTheBegin);
  EXPECT_EQ(Picture(), before);
  EXPECT_GE(Apply("none0", Config("deny", {kLaptop})), 0); // the next one finds nobody, and the files are all there is
}

TEST_F(WifiApplyFailure, SymbolicLinkInAFilesPlaceIsRefused) {
  for (const std::string &name : {kFolder + "wlan0.json", kFolder + "wlan0.accept", kFolder + "wlan0.deny",
                                  std::string("/etc/hostapd/wlan0.conf")}) {
    SetUp();
    WriteHostapdConfig("wlan0");
    FakeHostapd hostapd("wlan0", Obedient({}));
    std::filesystem::create_directories(kFolder);
    const std::string content = ReadText("/etc/hostapd/wlan0.conf"); // of use in its own place
    WriteText("/tmp/elsewhere", content);
    std::filesystem::remove(name);
    std::filesystem::create_symlink("/tmp/elsewhere", name);
    const auto names = NamesIn(kFolder);
    EXPECT_LT(Apply("wlan0", Config("deny", {kPhone})), 0) << name;
    EXPECT_EQ(ReadText("/tmp/elsewhere"), content) << name;
    EXPECT_EQ(ReadText("/etc/hostapd/wlan0.conf"), content) << name;
    EXPECT_TRUE(std::filesystem::is_symlink(name));
    EXPECT_EQ(NamesIn(kFolder), names);
    EXPECT_THAT(hostapd.Requests(), ElementsAre("PING"));
    EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: " + name + ": cannot be written"));
  }
}

// What is asked of it next finds nobody: neither an answer nor a way to put the old filter back. The files are back.
TEST_F(WifiApplyFailure, HostapdThatDiesInTheMiddleIsARefusalAndTheFilesAreAsTheyWere) {
  WriteHostapdConfig("wlan0");
  ASSERT_GE(Apply("wlan0", Config("deny", {kPhone})), 0);
  const std::string before = Picture();
  for (const char *last : {"SET macaddr_acl 2", "DENY_ACL CLEAR", "SET macaddr_acl 1", "STA-FIRST"}) {
    FakeHostapd hostapd("wlan0", [&last](const std::string &request) -> std::optional<std::string> {
      return request == last ? hosttest::kDeath : Obedient({StationText(kPhone, true)})(request);
    });
    const auto start = steady_clock::now();
    EXPECT_LT(Apply("wlan0", Config("allow", {kLaptop})), 0) << last;
    EXPECT_LT(steady_clock::now() - start, kSilentInTheMiddle) << last;
    EXPECT_EQ(Picture(), before) << last;
  }
  EXPECT_GE(Apply("wlan0", Config("allow", {kLaptop})), 0); // dead, it is read when it starts
}

} // namespace
