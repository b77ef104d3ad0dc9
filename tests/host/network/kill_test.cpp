// The switching process is killed at many points of its way; afterwards the network is whole, as it was or as it was to
// become.
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <gmock/gmock.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <iostream>

namespace {

using hosttest::Home;
using hosttest::kLock;
using hosttest::Picture;
using hosttest::WaitFor;
using testing::AnyOf;
using testing::HasSubstr;

constexpr int kPoints = 50; // of each way, spread over it evenly

int StartTraced(const std::string &command, const std::string &argument) {
  const pid_t process = fork();
  if (process == 0) {
    ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
    const char *last = argument.empty() ? nullptr : argument.c_str();
    execl(hosttest::kProgram, hosttest::kProgram, command.c_str(), last, nullptr);
    _exit(127);
  }
  int status = 0;
  waitpid(process, &status, 0); // stopped at the exec
  ptrace(PTRACE_SETOPTIONS, process, nullptr, PTRACE_O_TRACESYSGOOD | PTRACE_O_EXITKILL);
  return process;
}

// Lets the program go on until it has made `calls` system calls (each stops it twice), then kills it.
// @return how many stops there were; it ended by itself when they are fewer than asked for
int KillAfter(long calls, const std::string &command, const std::string &argument = "") {
  const pid_t process = StartTraced(command, argument);
  int stops = 0;
  for (int status = 0; stops < calls; ++stops) {
    ptrace(PTRACE_SYSCALL, process, nullptr, nullptr);
    waitpid(process, &status, 0);
    if (!WIFSTOPPED(status)) {
      return stops;
    }
  }
  kill(process, SIGKILL);
  WaitFor(process);
  return stops;
}

constexpr long kToTheEnd = 10000000;

class Kill : public Home {
protected:
  void SetUp() override {
    Home::SetUp();
    router_ = Picture();
    ASSERT_EQ(Run("switch bridge"), 0);
    bridge_ = Picture();
    ASSERT_EQ(Run("switch router"), 0);
    ASSERT_EQ(Picture(), router_);
  }

  // A switch to `target` from the other topology, killed at every point; then whatever `mend` does.
  template <typename Mend> void KillEverywhere(const std::string &target, const Mend &mend) {
    const std::string from = target == "bridge" ? "router" : "bridge";
    ASSERT_EQ(Run("switch " + from), 0);
    const int all = KillAfter(kToTheEnd, "switch", target);
    ASSERT_GT(all, kPoints);
    int locked = 0;
    for (int point = 0; point <= kPoints; ++point) {
      ASSERT_EQ(Run("switch " + from), 0);
      hosttest::ReapDaemons(); // the dead ones in /proc would make the way longer each time
      KillAfter(static_cast<long>(all) * point / kPoints, "switch", target);
      hosttest::TakeSystemLog();
      locked += std::filesystem::exists(kLock) ? 1 : 0;
      mend(point);
      ASSERT_THAT(Picture(), AnyOf(router_, bridge_))
          << "killed after stop " << all * point / kPoints << " of " << all << "\n"
          << hosttest::TakeSystemLog();
    }
    std::cout << all << " stops; " << locked << " of " << kPoints << " kills left a lock\n";
    EXPECT_GT(locked, kPoints / 4);
  }

  // A switch to "bridge" that died with the ports moved in part.
  void KillHalfWay() {
    const long all = KillAfter(kToTheEnd, "switch", "bridge");
    ASSERT_EQ(Run("switch router"), 0);
    hosttest::ReapDaemons();
    KillAfter(all * 3 / 4, "switch", "bridge");
    ASSERT_TRUE(std::filesystem::exists(kLock));
    ASSERT_NE(Picture(), router_);
  }

  std::string router_;
  std::string bridge_;
};

TEST_F(Kill, OnTheWayToBridge) {
  KillEverywhere("bridge", [](int) { ASSERT_EQ(Run("recover"), 0); });
}

TEST_F(Kill, OnTheWayToRouter) {
  KillEverywhere("router", [](int) { ASSERT_EQ(Run("recover"), 0); });
}

// The recovering process is killed too, at a point of its own.
TEST_F(Kill, RecoveryIsKilledToo) {
  KillEverywhere("bridge", [](int point) {
    KillAfter(40L * ((point * 7) % 61), "recover");
    KillAfter(40L * ((point * 13) % 59), "recover");
    ASSERT_EQ(Run("recover"), 0);
  });
}

TEST_F(Kill, NextSwitchRecoversFirst) {
  KillEverywhere("bridge", [this](int point) {
    ASSERT_EQ(Run(point % 2 == 0 ? "switch bridge" : "switch router"), 0);
    ASSERT_EQ(Picture(), point % 2 == 0 ? bridge_ : router_);
  });
}

TEST_F(Kill, StartRecoversFirst) {
  KillEverywhere("router", [](int) { ASSERT_EQ(Run("start"), 0); });
}

// Killed while it waits for a lease, everything moved already and the DHCP client left alone in the world.
TEST_F(Kill, WhileItWaitsForALease) {
  StopDhcpServer();
  const int process = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  ASSERT_TRUE(
      hosttest::Eventually(5000, [] { return hosttest::Status("pgrep -f '[u]dhcpc -i br0' >/dev/null") == 0; }));
  kill(process, SIGKILL);
  ASSERT_EQ(WaitFor(process), -SIGKILL);
  EXPECT_THAT(Picture(), HasSubstr("\nlocked\n"));
  EXPECT_EQ(Run("recover"), 0);
  EXPECT_EQ(Picture(), router_);
  StartDhcpServer();
}

TEST_F(Kill, TerminationDoesNotStopASwitch) {
  StopDhcpServer();
  const int process = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  ASSERT_TRUE(hosttest::Eventually(5000, [] { return std::filesystem::exists(kLock); }));
  for (const int signal : {SIGTERM, SIGINT, SIGHUP, SIGPIPE}) {
    kill(process, signal);
  }
  StartDhcpServer();
  EXPECT_EQ(WaitFor(process), 0);
  EXPECT_EQ(Picture(), bridge_);
}

TEST_F(Kill, RecoveryLeavesARunningSwitchAlone) {
  StopDhcpServer();
  const int process = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  ASSERT_TRUE(hosttest::Eventually(5000, [] { return std::filesystem::exists(kLock); }));
  EXPECT_EQ(Run("recover"), 3);
  EXPECT_EQ(Run("switch bridge"), 3);
  EXPECT_EQ(Run("switch router"), 3);
  EXPECT_EQ(Run("start"), 3);
  EXPECT_TRUE(std::filesystem::exists(kLock));
  StartDhcpServer();
  EXPECT_EQ(WaitFor(process), 0);
  EXPECT_EQ(Picture(), bridge_);
}

TEST_F(Kill, OfTwoRacingSwitchesOneIsMade) {
  for (int round = 0; round < 10; ++round) {
    const std::string target = round % 2 == 0 ? "bridge" : "router";
    const int first = hosttest::StartProgram({hosttest::kProgram, "switch", target});
    const int second = hosttest::StartProgram({hosttest::kProgram, "switch", target});
    EXPECT_THAT((std::vector<int>{WaitFor(first), WaitFor(second)}), testing::UnorderedElementsAre(0, 3));
    ASSERT_EQ(Picture(), round % 2 == 0 ? bridge_ : router_);
  }
}

TEST_F(Kill, OfTwoRacingRecoveriesBothEndWell) {
  ASSERT_NO_FATAL_FAILURE(KillHalfWay());
  const int first = hosttest::StartProgram({hosttest::kProgram, "recover"});
  const int second = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  WaitFor(first);
  WaitFor(second);
  EXPECT_THAT(Picture(), AnyOf(router_, bridge_));
}

TEST_F(Kill, UnpluggedPortDoesNotKeepTheRestFromComingBack) {
  ASSERT_NO_FATAL_FAILURE(KillHalfWay());
  hosttest::Shell("ip link delete lan2");
  EXPECT_EQ(Run("recover"), 0);
  EXPECT_THAT(Picture(), testing::Not(HasSubstr("link lan2")));
  EXPECT_THAT(Picture(), HasSubstr("address lbr0 192.168.1.1/24"));
  EXPECT_THAT(hosttest::Shell("ip link show lan3"), HasSubstr("master lbr0"));
}

} // namespace
