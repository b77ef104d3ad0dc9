// A hostapd that fell silent in the middle of a change, or whose teller died, has the filter of its files when it
// answers again: vornwatch tells it.
#include "tests/host/wireless/apply_fixture.h"

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>

namespace {

using hosttest::Apply;
using hosttest::Config;
using hosttest::Eventually;
using hosttest::FakeHostapd;
using hosttest::kLaptop;
using hosttest::kPhone;
using hosttest::ListsOf;
using hosttest::NamesIn;
using hosttest::Obedient;
using hosttest::Picture;
using hosttest::Telling;
using hosttest::WriteHostapdConfig;
using testing::ElementsAre;
using testing::IsEmpty;
using Requests = std::vector<std::string>;

constexpr char kNotes[] = "/run/vorn/untold";
constexpr int kWithin = 20000; // milliseconds

std::vector<std::string> Notes() {
  return std::filesystem::exists(kNotes) ? NamesIn(kNotes) : std::vector<std::string>();
}

bool EndsWith(const Requests &requests, const Requests &end) {
  return requests.size() >= end.size() && std::equal(end.rbegin(), end.rend(), requests.rbegin());
}

// One that has no answer from a request on, until it is woken.
class Sleeper {
public:
  Sleeper(const std::string &network, std::string lastWord)
      : lastWord_(std::move(lastWord)),
        hostapd_(network, [this](const std::string &request) { return Answer(request); }) {}

  void Wake() { state_ = kWoken; }
  bool Sleeps() const { return state_ == kAsleep; }
  Requests Asked() { return hostapd_.Requests(); }

private:
  enum State { kAwake, kAsleep, kWoken };

  std::optional<std::string> Answer(const std::string &request) {
    State awake = kAwake;
    if (request == lastWord_) {
      state_.compare_exchange_strong(awake, kAsleep);
    }
    return state_ == kAsleep ? std::nullopt : Obedient({})(request);
  }

  std::string lastWord_;
  std::atomic<State> state_ = kAwake;
  FakeHostapd hostapd_;
};

class Untold : public hosttest::WifiApply {
protected:
  void SetUp() override {
    WifiApply::SetUp();
    WriteHostapdConfig("wlan0");
    ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  }

  void TearDown() override {
    if (watch_ > 0) {
      kill(watch_, SIGKILL);
      waitpid(watch_, nullptr, 0);
    }
  }

  void StartWatch() {
    watch_ = fork();
    if (watch_ == 0) {
      prctl(PR_SET_PDEATHSIG, SIGKILL);
      execl(VORN_WATCH_PROGRAM, VORN_WATCH_PROGRAM, nullptr);
      _exit(127);
    }
  }

  pid_t watch_ = 0;
};

TEST_F(Untold, ChangeThatSucceedsOrIsRefusedOwesNothing) {
  FakeHostapd hostapd("wlan0", Obedient({}));
  ASSERT_GE(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(Notes(), IsEmpty());
  EXPECT_LT(Apply("wlan0", Config("reject", {kLaptop})), 0);
  EXPECT_THAT(Notes(), IsEmpty());
}

TEST_F(Untold, ChangeThatIsTakenBackOwesNothing) {
  FakeHostapd hostapd("wlan0", [](const std::string &request) -> std::optional<std::string> {
    return request == "SET macaddr_acl 0" ? "FAIL\n" : Obedient({})(request);
  });
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(Notes(), IsEmpty());
}

TEST_F(Untold, SilentHostapdHasItsFilesFilterWhenItAnswersAgain) {
  const std::string before = Picture();
  Sleeper hostapd("wlan0", "DENY_ACL CLEAR");
  StartWatch();
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(Notes(), ElementsAre("wlan0"));
  const size_t asked = hostapd.Asked().size();
  hosttest::Sleep(2500);
  const Requests meanwhile = hostapd.Asked();
  EXPECT_GT(meanwhile.size(), asked);
  EXPECT_LE(meanwhile.size(), asked + 4); // ever more seldom
  EXPECT_THAT(Requests(meanwhile.begin() + static_cast<long>(asked), meanwhile.end()), testing::Each("PING"));
  hostapd.Wake();
  EXPECT_TRUE(Eventually(kWithin, [] { return Notes().empty(); }));
  EXPECT_TRUE(EndsWith(hostapd.Asked(), Telling(ListsOf("wlan0"), "1")));
  EXPECT_EQ(Picture(), before);
}

TEST_F(Untold, OnlyTheNetworkThatFellSilentIsTold) {
  WriteHostapdConfig("wlan0", "bss=gwlan0\nctrl_interface=/run/hostapd\nssid=guest\n");
  ASSERT_GE(Apply("wlan0", Config("allow", {kPhone})), 0);
  Sleeper guests("gwlan0", "ACCEPT_ACL CLEAR");
  FakeHostapd home("wlan0", Obedient({}));
  EXPECT_LT(Apply("wlan0", Config("disable", {})), 0);
  EXPECT_THAT(Notes(), ElementsAre("gwlan0"));
  const Requests asked = home.Requests();
  guests.Wake();
  StartWatch();
  EXPECT_TRUE(Eventually(kWithin, [] { return Notes().empty(); }));
  EXPECT_TRUE(EndsWith(guests.Asked(), Telling(ListsOf("wlan0"), "1")));
  EXPECT_EQ(home.Requests(), asked);
}

TEST_F(Untold, TellerThatIsKilledInTheMiddleLeavesItsNoteAndTheWatcherTellsTheFiles) {
  Sleeper hostapd("wlan0", "SET accept_mac_file /etc/vorn/wireless/wlan0.accept");
  const pid_t teller = fork();
  if (teller == 0) {
    Apply("wlan0", Config("deny", {kLaptop}));
    _exit(0);
  }
  ASSERT_TRUE(Eventually(kWithin, [&hostapd] { return hostapd.Sleeps(); }));
  kill(teller, SIGKILL);
  int status = 0;
  waitpid(teller, &status, 0);
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_THAT(Notes(), ElementsAre("wlan0"));
  EXPECT_THAT(Picture(), testing::HasSubstr("macaddr_acl=0")); // the new policy: the files were written before
  hostapd.Wake();
  StartWatch();
  EXPECT_TRUE(Eventually(kWithin, [] { return Notes().empty(); }));
  EXPECT_TRUE(EndsWith(hostapd.Asked(), Telling(ListsOf("wlan0"), "0")));
}

TEST_F(Untold, NextChangeThatSucceedsPaysTheDebt) {
  Sleeper hostapd("wlan0", "DENY_ACL CLEAR");
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  hostapd.Wake();
  EXPECT_GE(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(Notes(), IsEmpty());
}

TEST_F(Untold, NextChangeThatCannotBeWrittenDoesNotPayIt) {
  Sleeper hostapd("wlan0", "DENY_ACL CLEAR");
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  hostapd.Wake();
  std::filesystem::remove(hosttest::kFolder + "wlan0.deny");
  std::filesystem::create_symlink("/tmp/elsewhere", hosttest::kFolder + "wlan0.deny");
  EXPECT_LT(Apply("wlan0", Config("deny", {kLaptop})), 0);
  EXPECT_THAT(Notes(), ElementsAre("wlan0"));
}

TEST_F(Untold, NothingIsOwedToADeadHostapdNorToANetworkThatIsGone) {
  std::filesystem::create_directories(kNotes);
  hosttest::WriteText(std::string(kNotes) + "/wlan0", "");
  hosttest::WriteText(std::string(kNotes) + "/wlan9", "");
  StartWatch();
  EXPECT_TRUE(Eventually(kWithin, [] { return Notes().empty(); }));
}

} // namespace
