// Daemons of the ways out that die while vornwatch runs.
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <gmock/gmock.h>

#include <csignal>
#include <filesystem>

namespace {

using hosttest::Eventually;
using hosttest::Home;
using hosttest::kLock;
using hosttest::kWanFile;
using hosttest::Picture;
using hosttest::Shell;
using hosttest::TakeSystemLog;
using hosttest::WriteFile;
using testing::HasSubstr;
using testing::Not;

constexpr int kWithin = 20000; // milliseconds; what is waited for takes one or two seconds

// Process numbers, a blank after each. One that is on its way into the background has a number that goes.
std::string ClientsOn(const std::string &interface) {
  return Shell("for pid in $(pgrep -f '[u]dhcpc -i " + interface +
               "'); do [ \"$(readlink /proc/$pid/fd/1)\" != /dev/null ] || printf '%s ' \"$pid\"; done");
}

std::string Clients() {
  return ClientsOn("");
}

bool IsOneOtherThan(const std::string &old) {
  const std::string now = Clients();
  return !now.empty() && now != old && now.find(' ') + 1 == now.size() &&
         Shell("pgrep -c -f '[u]dhcpc -i' || true") == "1\n";
}

class Watch : public Home {
protected:
  void SetUp() override {
    Home::SetUp();
    StartWatch();
  }

  void TearDown() override {
    StopWatch();
    Home::TearDown();
  }

  void StartWatch() { process_ = hosttest::StartProgram({VORN_WATCH_PROGRAM}); }

  void StopWatch() {
    if (process_ > 0) {
      kill(process_, SIGKILL);
      hosttest::WaitFor(process_);
      process_ = 0;
    }
  }

  // Looked at after a daemon's death, so that the watcher has had its chance.
  static bool KillClientAndAwaitAnother() {
    const std::string old = Clients();
    Shell("kill -KILL " + old);
    return Eventually(kWithin, [&old] { return IsOneOtherThan(old); });
  }

  int process_ = 0;
};

TEST_F(Watch, DeadClientRunsAgainAndItsAddressHasStayed) {
  const std::string before = Picture();
  Shell("(ip -4 monitor address dev eth0 >/tmp/addresses & echo $! >/tmp/monitor); sleep 0.2");
  ASSERT_TRUE(KillClientAndAwaitAnother());
  EXPECT_TRUE(Eventually(kWithin, [&before] { return Picture() == before; })) << Picture() << TakeSystemLog();
  Shell("kill $(cat /tmp/monitor)");
  EXPECT_THAT(hosttest::ReadFile("/tmp/addresses"), Not(HasSubstr("Deleted")));
  EXPECT_THAT(TakeSystemLog(), HasSubstr("udhcpc on eth0 does not run: it is started"));
}

TEST_F(Watch, LeaseComesBackWithAServerThatCameLater) {
  StopDhcpServer();
  Shell("ip -4 address flush dev eth0");
  ASSERT_TRUE(KillClientAndAwaitAnother());
  EXPECT_THAT(Picture(), Not(HasSubstr("address eth0 203.0.113.")));
  StartDhcpServer();
  EXPECT_TRUE(Eventually(kWithin, [] { return Picture().find("address eth0 203.0.113.") != std::string::npos; }));
}

TEST_F(Watch, ClientOfTheOneBridgeIsKeptToo) {
  ASSERT_EQ(Run("switch bridge"), 0);
  const std::string before = Picture();
  ASSERT_TRUE(KillClientAndAwaitAnother());
  EXPECT_TRUE(Eventually(kWithin, [&before] { return Picture() == before; })) << Picture() << TakeSystemLog();
}

TEST_F(Watch, ClientThatDiesAgainWaitsLongerEachTime) {
  ASSERT_TRUE(KillClientAndAwaitAnother());
  for (const int pause : {1, 2}) {
    const auto begin = std::chrono::steady_clock::now();
    ASSERT_TRUE(KillClientAndAwaitAnother());
    // Counted from the start before, which was seen some moments after it was.
    EXPECT_GT(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(pause * 1000 - 900)) << pause;
  }
}

TEST_F(Watch, SecondWayOutsClientIsKept) {
  Shell("ip link add eth1 type veth peer name isp1");
  WriteFile("/etc/sysconfig/network-scripts/ifcfg-eth1", "DEVICE=eth1\nBOOTPROTO=dhcp\n");
  EXPECT_EQ(Run("start"), 0);
  const std::string old = ClientsOn("eth1");
  ASSERT_NE(old, "");
  Shell("kill -KILL " + old);
  EXPECT_TRUE(Eventually(kWithin, [&] { return ClientsOn("eth1") != old && !ClientsOn("eth1").empty(); }));
  std::filesystem::remove("/etc/sysconfig/network-scripts/ifcfg-eth1");
  StopWatch();
  Shell("ip link delete eth1; kill -KILL " + ClientsOn("eth1"));
}

TEST_F(Watch, StaticWayOutHasNoClient) {
  StopWatch();
  Shell("kill -KILL " + Clients());
  WriteFile(kWanFile, "DEVICE=eth0\nIPADDR=203.0.113.9\nNETMASK=255.255.255.0\nSLAVE=no\n");
  StartWatch();
  hosttest::Sleep(1500);
  EXPECT_EQ(Clients(), "");
}

TEST_F(Watch, WhatDiesInASwitchIsLeftToTheSwitch) {
  const std::string router = Picture();
  StopDhcpServer(); // so that it waits for a lease, ten seconds long, with nobody to serve the way out meanwhile
  const int change = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  ASSERT_TRUE(Eventually(kWithin, [] { return std::filesystem::exists(kLock); }));
  ASSERT_TRUE(Eventually(kWithin, [] { return Shell("ip link show eth0").find("master br0") != std::string::npos; }));
  kill(change, SIGKILL);
  EXPECT_EQ(hosttest::WaitFor(change), -SIGKILL);
  Shell("kill -KILL $(pgrep -f '[u]dhcpc -i') 2>/dev/null || true");
  hosttest::Sleep(2500);
  EXPECT_EQ(Clients(), "");
  EXPECT_THAT(TakeSystemLog(), Not(HasSubstr("does not run: it is started")));
  StartDhcpServer();
  EXPECT_EQ(Run("recover"), 0);
  EXPECT_EQ(Picture(), router);
  ASSERT_TRUE(KillClientAndAwaitAnother()); // from now on it is kept again
}

TEST_F(Watch, NothingIsStartedBesideALock) {
  WriteFile(kLock, "of a switch that has not changed anything yet");
  Shell("kill -KILL " + Clients());
  hosttest::Sleep(2500);
  EXPECT_EQ(Clients(), "");
  std::filesystem::remove(kLock);
  EXPECT_TRUE(Eventually(kWithin, [] { return IsOneOtherThan(""); }));
}

TEST_F(Watch, SwitchesAndDeathsAtTheSameTimeLeaveOneClient) {
  for (const char *target : {"bridge", "router", "bridge", "router"}) {
    const int killer = hosttest::StartProgram(
        {"/bin/sh", "-c",
         "for n in 1 2 3 4 5 6; do sleep 0.1; kill -KILL $(pgrep -f '[u]dhcpc -i' | head -n 1); done"});
    const int result = Run(std::string("switch ") + target);
    hosttest::WaitFor(killer);
    if (result != 0) { // its client was killed while it waited for the lease
      ASSERT_EQ(Run(std::string("switch ") + target), 0) << TakeSystemLog();
    }
    EXPECT_TRUE(Eventually(kWithin, [] { return IsOneOtherThan(""); })) << Clients();
  }
  EXPECT_THAT(Picture(), HasSubstr("not locked"));
  EXPECT_TRUE(Eventually(kWithin, [] { return Picture().find("address eth0 203.0.113.") != std::string::npos; }));
}

TEST_F(Watch, WhatWasNeverStartedIsStarted) {
  StopWatch();
  Shell("kill -KILL " + Clients());
  EXPECT_EQ(Clients(), "");
  StartWatch();
  EXPECT_TRUE(Eventually(kWithin, [] { return IsOneOtherThan(""); }));
}

} // namespace
