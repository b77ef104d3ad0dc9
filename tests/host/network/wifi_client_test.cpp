// The switch as the module asks for it.
#include "platform/utility.h"
#include "platform/wifi.h"
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <thread>

namespace {

namespace fs = std::filesystem;

using hosttest::Eventually;
using hosttest::kLock;
using hosttest::kProgram;
using hosttest::Picture;
using hosttest::Shell;
using hosttest::TakeSystemLog;
using testing::HasSubstr;
using testing::Not;
using vornwireless::dbus::WifiClient;

class WifiSwitch : public hosttest::Home {
protected:
  void SetUp() override {
    Home::SetUp();
    before_ = Picture();
    TakeSystemLog();
  }
  std::string before_;
};

TEST_F(WifiSwitch, IsMadeAndWaitedFor) {
  WifiClient client;
  EXPECT_TRUE(client.IsServerReady());
  EXPECT_GE(client.SwitchTopology("bridge"), 0);
  EXPECT_FALSE(fs::exists(kLock));
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on br0"));
  EXPECT_GE(client.SwitchTopology("router"), 0);
  EXPECT_EQ(Picture(), before_);
  EXPECT_THAT(TakeSystemLog(), Not(HasSubstr("<3>")));
}

TEST_F(WifiSwitch, UnknownTopologyIsRefusedWithALogLine) {
  EXPECT_LT(WifiClient().SwitchTopology("mesh"), 0);
  const std::string log = TakeSystemLog();
  EXPECT_THAT(log, HasSubstr("<3>"));
  EXPECT_THAT(log, HasSubstr("no such topology: \"mesh\""));
  EXPECT_EQ(Picture(), before_);
}

TEST_F(WifiSwitch, HostileTextIsRefusedAndLoggedAsOneHarmlessLine) {
  const std::string texts[] = {"",
                               "router\n<0> forged",
                               "$(touch /tmp/ran)",
                               "router;touch /tmp/ran",
                               "--help",
                               "Router",
                               "bridge ",
                               std::string("router\0", 7),
                               "%s%n",
                               std::string(65536, 'x')};
  for (const std::string &text : texts) {
    EXPECT_LT(WifiClient().SwitchTopology(text), 0);
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
    const std::string log = TakeSystemLog();
    EXPECT_EQ(std::count(log.begin(), log.end(), '\n'), 1) << log;
    EXPECT_LT(log.size(), 400U);
  }
  EXPECT_FALSE(fs::exists("/tmp/ran"));
  EXPECT_EQ(Picture(), before_);
}

TEST_F(WifiSwitch, ClientWithoutAdapterIsRefusedWithTheReason) {
  EXPECT_LT(WifiClient().SwitchTopology("client"), 0);
  EXPECT_THAT(TakeSystemLog(), HasSubstr("switch to \"client\" refused: no wireless adapter"));
  EXPECT_EQ(Picture(), before_);
}

TEST_F(WifiSwitch, DeathOfTheSwitchingProcessIsMended) {
  StopDhcpServer();
  int result = 0;
  std::thread caller([&result] { result = WifiClient().SwitchTopology("bridge"); });
  ASSERT_TRUE(Eventually(5000, [] { return hosttest::Status("pgrep -f '[u]dhcpc -i br0' >/dev/null") == 0; }));
  Shell("kill -KILL $(pgrep -f '[v]orntopology switch bridge')");
  caller.join();
  EXPECT_LT(result, 0);
  EXPECT_FALSE(fs::exists(kLock));
  EXPECT_EQ(Picture(), before_);
  EXPECT_THAT(TakeSystemLog(), HasSubstr("a switch from router to bridge died: going back to router"));
  StartDhcpServer();
}

TEST_F(WifiSwitch, OfTwoAtOnceOneIsRefused) {
  int first = 0;
  int second = 0;
  std::thread one([&first] { first = WifiClient().SwitchTopology("bridge"); });
  std::thread two([&second] { second = WifiClient().SwitchTopology("bridge"); });
  one.join();
  two.join();
  EXPECT_NE(first < 0, second < 0);
  EXPECT_THAT(TakeSystemLog(), HasSubstr("another switch is under way"));
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on br0"));
}

TEST_F(WifiSwitch, WithoutItsProgramNothingIsReady) {
  Shell(std::string("mv ") + kProgram + " /usr/vorn/sbin/away");
  EXPECT_FALSE(WifiClient().IsServerReady());
  EXPECT_LT(WifiClient().SwitchTopology("bridge"), 0);
  EXPECT_EQ(Picture(), before_);
  Shell(std::string("mv /usr/vorn/sbin/away ") + kProgram);
}

} // namespace
