// The switch, seen in the kernel.
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <functional>
#include <iostream>

namespace {

using hosttest::Eventually;
using hosttest::Home;
using hosttest::kLock;
using hosttest::kWanFile;
using hosttest::Picture;
using hosttest::ReadFile;
using hosttest::Shell;
using hosttest::Status;
using hosttest::WriteFile;
using testing::HasSubstr;
using testing::Not;

class Switch : public Home {};

long MillisecondsOf(const std::function<void()> &work) {
  const auto begin = std::chrono::steady_clock::now();
  work();
  return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - begin).count();
}

TEST_F(Switch, StartedNetworkIsARouter) {
  const std::string picture = Picture();
  EXPECT_THAT(picture, HasSubstr("address lbr0 192.168.1.1/24 broadcast=192.168.1.255"));
  EXPECT_THAT(picture, HasSubstr("address gbr0 192.168.2.1/24 broadcast=192.168.2.255"));
  EXPECT_THAT(picture, HasSubstr("address eth0 203.0.113."));
  EXPECT_THAT(picture, HasSubstr("route default gateway=203.0.113.1 dev=eth0 protocol=dhcp"));
  EXPECT_THAT(picture, HasSubstr("DHCP client on eth0\n"));
  for (const char *port : {"lan1", "lan2", "lan3"}) {
    EXPECT_THAT(Shell(std::string("ip link show ") + port), HasSubstr("master lbr0"));
  }
  EXPECT_THAT(Shell("ip link show guest1"), HasSubstr("master gbr0"));
  EXPECT_EQ(ReadFile("/proc/sys/net/ipv4/ip_forward"), "1\n");
  EXPECT_THAT(ReadFile("/etc/resolv.conf"), HasSubstr("nameserver 203.0.113.1\n"));
}

TEST_F(Switch, RouterToBridgePutsEveryPortInOneBridge) {
  ASSERT_EQ(Run("switch bridge"), 0);
  for (const char *port : {"eth0", "lan1", "lan2", "lan3"}) {
    EXPECT_THAT(Shell(std::string("ip link show ") + port), HasSubstr("master br0")) << port;
    EXPECT_EQ(Shell(std::string("ip address show scope global dev ") + port + " | grep -c inet || true"), "0\n");
  }
  EXPECT_NE(Status("ip link show lbr0 >/dev/null 2>&1"), 0);
  const std::string bridge = Shell("ip -d link show br0");
  EXPECT_THAT(bridge, HasSubstr("02:00:5e:10:00:01")); // the WAN port's
  EXPECT_THAT(bridge, HasSubstr("stp_state 0"));
  EXPECT_THAT(bridge, HasSubstr("forward_delay 0"));
  const std::string picture = Picture();
  EXPECT_THAT(picture, HasSubstr("address br0 203.0.113."));
  EXPECT_THAT(picture, HasSubstr("route default gateway=203.0.113.1 dev=br0 protocol=dhcp"));
  EXPECT_THAT(picture, HasSubstr("DHCP client on br0\n"));
  EXPECT_THAT(picture, Not(HasSubstr("DHCP client on eth0")));
  EXPECT_THAT(picture, HasSubstr("address gbr0 192.168.2.1/24"));
  EXPECT_THAT(picture, HasSubstr("not locked"));
  EXPECT_EQ(ReadFile(kWanFile), "# the way out\nDEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=yes\nBRIDGE=br0\n");
}

TEST_F(Switch, BridgedPortsForwardAtOnce) {
  ASSERT_EQ(Run("switch bridge"), 0);
  EXPECT_EQ(Shell("bridge link show | grep -v guest1 | grep -c 'state forwarding'"), "4\n");
}

TEST_F(Switch, ThereAndBackIsWhereItWas) {
  const std::string before = Picture();
  ASSERT_EQ(Run("switch bridge"), 0);
  ASSERT_NE(Picture(), before);
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_EQ(Picture(), before);
  EXPECT_TRUE(Eventually(3000, [] { return Status("ip -6 address show eth0 | grep -q 'inet6 fe80'") == 0; }));
}

TEST_F(Switch, TheProviderGivesTheSameLease) {
  const std::string address = Shell("ip -4 -o address show eth0 | awk '{print $4}'");
  ASSERT_EQ(Run("switch bridge"), 0);
  EXPECT_EQ(Shell("ip -4 -o address show br0 | awk '{print $4}'"), address);
}

// The lock exists while the ports move, and holds what the network was.
TEST_F(Switch, LockHoldsTheSnapshotWhileItRuns) {
  StopDhcpServer(); // the switch waits for a lease
  const int process = hosttest::StartProgram({hosttest::kProgram, "switch", "bridge"});
  ASSERT_TRUE(Eventually(3000, [] { return std::filesystem::exists(kLock); }));
  const std::string lock = ReadFile(kLock);
  EXPECT_THAT(lock, HasSubstr("\"router\""));
  EXPECT_THAT(lock, HasSubstr("192.168.1.1/24"));
  EXPECT_THAT(lock, HasSubstr("SLAVE=no"));
  StartDhcpServer();
  EXPECT_EQ(hosttest::WaitFor(process), 0);
  EXPECT_FALSE(std::filesystem::exists(kLock));
}

TEST_F(Switch, ToTheTopologyThatStandsTouchesNothing) {
  const std::string before = Picture();
  const std::string indexes = Shell("ip -o link | cut -d: -f1,2");
  EXPECT_EQ(Run("switch router"), 0);
  EXPECT_EQ(Picture(), before);
  EXPECT_EQ(Shell("ip -o link | cut -d: -f1,2"), indexes);
}

TEST_F(Switch, UnknownTopologyIsRefused) {
  const std::string before = Picture();
  for (const char *target : {"mesh", "''", "Router", "'router '", "'bridge;reboot'", "'$(touch /tmp/ran)'", "-h"}) {
    EXPECT_EQ(Run(std::string("switch ") + target), 2) << target;
  }
  EXPECT_EQ(Run("switch"), 2);
  EXPECT_EQ(Run("switch bridge router"), 2);
  EXPECT_EQ(Run(""), 2);
  EXPECT_FALSE(std::filesystem::exists("/tmp/ran"));
  EXPECT_EQ(Picture(), before);
}

TEST_F(Switch, ClientWithoutAdapterIsRefused) {
  const std::string before = Picture();
  EXPECT_EQ(Run("switch client"), 1);
  EXPECT_EQ(Picture(), before);
}

TEST_F(Switch, PortThatHostapdAddedMovesToo) {
  Shell("ip link add wlan9 type veth peer name wlan9p && ip link set wlan9 master lbr0 up");
  ASSERT_EQ(Run("switch bridge"), 0);
  EXPECT_THAT(Shell("ip link show wlan9"), HasSubstr("master br0"));
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_THAT(Shell("ip link show wlan9"), HasSubstr("master lbr0"));
}

// hostapd started in the other topology, or again, puts its networks where its file says.
TEST_F(Switch, AccessPointsFilesFollow) {
  const std::string before = ReadFile(hosttest::kAccessPointFile);
  ASSERT_EQ(Run("switch bridge"), 0);
  EXPECT_EQ(ReadFile(hosttest::kAccessPointFile),
            "interface=wlan0\nbridge=br0\nctrl_interface=/run/hostapd\n# bridge=lbr0\nssid=home\n\n"
            "bss=gwlan0\nbridge=gbr0\nbss=xwlan0\nbridge=br0\n");
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_EQ(ReadFile(hosttest::kAccessPointFile), before);
}

TEST_F(Switch, StaticWanAddressGoesAlong) {
  ASSERT_EQ(Run("switch bridge"), 0);
  WriteFile(kWanFile, "DEVICE=eth0\nBOOTPROTO=static\nIPADDR=203.0.113.7\nNETMASK=255.255.255.0\n"
                      "GATEWAY=203.0.113.1\nSLAVE=yes\nBRIDGE=br0\n");
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_THAT(Picture(), HasSubstr("address eth0 203.0.113.7/24"));
  EXPECT_THAT(Picture(), HasSubstr("route default gateway=203.0.113.1 dev=eth0"));
  const std::string before = Picture();
  StopDhcpServer(); // nobody is asked for a lease
  ASSERT_EQ(Run("switch bridge"), 0);
  EXPECT_THAT(Picture(), HasSubstr("address br0 203.0.113.7/24"));
  EXPECT_THAT(Picture(), HasSubstr("route default gateway=203.0.113.1 dev=br0"));
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_EQ(Picture(), before);
}

// What else there was on the links comes back when a switch is undone.
class UndoneSwitch : public Home {
protected:
  void SetUp() override {
    Home::SetUp();
    Shell("ip address add 192.168.7.1/24 dev lbr0 && ip address add 2001:db8:7::1/64 dev lbr0 nodad &&"
          "ip route add 10.7.0.0/16 via 192.168.1.20 metric 7 && ip route add 10.8.0.0/16 dev lbr0 table 77 &&"
          "ip -6 route add 2001:db8:9::/48 via 2001:db8:7::9 && ip address add 203.0.113.200/24 dev eth0");
    before_ = Picture();
  }
  void TearDown() override {
    EXPECT_EQ(Picture(), before_);
    Home::TearDown();
  }
  std::string before_;
};

TEST_F(UndoneSwitch, NoLease) {
  StopDhcpServer();
  const long took = MillisecondsOf([] { EXPECT_EQ(Run("switch bridge"), 1); });
  EXPECT_GT(took, 8000);
  EXPECT_LT(took, 20000);
  StartDhcpServer();
}

TEST_F(UndoneSwitch, FailedSwitchLeavesTheLanBridgeItself) {
  StopDhcpServer();
  const std::string index = ReadFile("/sys/class/net/lbr0/ifindex");
  EXPECT_EQ(Run("switch bridge"), 1);
  EXPECT_EQ(ReadFile("/sys/class/net/lbr0/ifindex"), index);
  StartDhcpServer();
}

TEST_F(UndoneSwitch, OneBridgeIsAnotherKindOfLink) {
  Shell("ip link add br0 type veth peer name br0p");
  before_ = Picture();
  EXPECT_EQ(Run("switch bridge"), 1);
}

TEST_F(UndoneSwitch, ConfigurationCannotBeWritten) {
  Shell("mount --bind /etc/sysconfig/network-scripts /etc/sysconfig/network-scripts &&"
        "mount -o remount,bind,ro /etc/sysconfig/network-scripts");
  EXPECT_EQ(Run("switch bridge"), 1);
  Shell("umount /etc/sysconfig/network-scripts");
}

TEST_F(UndoneSwitch, ConfigurationIsALink) {
  Shell(std::string("mv ") + kWanFile + " /etc/wan && ln -s /etc/wan " + kWanFile);
  EXPECT_EQ(Run("switch bridge"), 1);
  EXPECT_EQ(ReadFile("/etc/wan"), "# the way out\nDEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n");
  Shell(std::string("rm ") + kWanFile + " && mv /etc/wan " + kWanFile);
}

TEST_F(UndoneSwitch, AccessPointsFileIsALink) {
  const std::string file = hosttest::kAccessPointFile;
  const std::string content = ReadFile(file);
  Shell("mv " + file + " /etc/wlan0 && ln -s /etc/wlan0 " + file);
  EXPECT_EQ(Run("switch bridge"), 1);
  EXPECT_EQ(ReadFile("/etc/wlan0"), content);
  Shell("rm " + file + " && mv /etc/wlan0 " + file);
}

TEST_F(UndoneSwitch, LockCannotBeMade) {
  Shell("mount --bind /tmp /tmp && mount -o remount,bind,ro /tmp");
  EXPECT_EQ(Run("switch bridge"), 1);
  Shell("umount /tmp");
}

// Without its program the DHCP client that ran cannot run again either: the lock stays until someone recovers.
TEST_F(UndoneSwitch, WhatCannotBeUndoneIsLeftForRecovery) {
  Shell("mv /usr/sbin/udhcpc /usr/sbin/udhcpc.away");
  EXPECT_EQ(Run("switch bridge"), 1);
  EXPECT_TRUE(std::filesystem::exists(kLock));
  EXPECT_EQ(Run("recover"), 1);
  EXPECT_TRUE(std::filesystem::exists(kLock));
  Shell("mv /usr/sbin/udhcpc.away /usr/sbin/udhcpc");
  EXPECT_EQ(Run("recover"), 0);
}

// The kernel refuses the messages of these numbers, counted from 1: "3", or "3+" for all from there on. (No program can
// look for leaks while strace holds it.)
int SwitchWithRefusal(const std::string &target, const std::string &when) {
  return Status(
      "LSAN_OPTIONS=detect_leaks=0 strace -qq -o /dev/null -e trace=sendmsg -e inject=sendmsg:error=ENOBUFS:when=" +
      when + " " + hosttest::kProgram + " switch " + target + " 2>/dev/null");
}

// Each message to the kernel fails in turn: whatever the step, the network is as it was.
TEST_F(UndoneSwitch, EachKernelMessageFailsInTurn) {
  int failed = 0;
  for (int message = 1; message < 400; ++message) {
    const int code = SwitchWithRefusal("bridge", std::to_string(message));
    if (code == 0) {
      break;
    }
    ++failed;
    ASSERT_EQ(code, 1) << message;
    ASSERT_EQ(Picture(), before_) << "message " << message;
  }
  EXPECT_GT(failed, 30);
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on br0"));
  Shell(std::string(hosttest::kProgram) + " switch router"); // extra addresses and routes are gone for good
  before_ = Picture();
}

TEST_F(Switch, EachKernelMessageOfTheWayBackFailsInTurn) {
  ASSERT_EQ(Run("switch bridge"), 0);
  const std::string before = Picture();
  int failed = 0;
  int code = 1;
  for (int message = 1; message < 400 && code != 0; ++message) {
    code = SwitchWithRefusal("router", std::to_string(message));
    if (code != 0) {
      ++failed;
      ASSERT_EQ(code, 1) << message;
      ASSERT_EQ(Picture(), before) << "message " << message;
    }
  }
  EXPECT_GT(failed, 30);
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on eth0"));
}

// From one message on the kernel refuses everything, the undos too.
TEST_F(UndoneSwitch, KernelRefusesFromOneMessageOn) {
  for (const int message : {3, 8, 12, 20, 27, 31, 36}) {
    const int code = SwitchWithRefusal("bridge", std::to_string(message) + "+");
    ASSERT_EQ(code, 1) << message;
    ASSERT_EQ(Run("recover"), 0) << message;
    ASSERT_EQ(Picture(), before_) << message;
  }
}

TEST_F(Switch, BackToRouterDoesNotNeedTheProvider) {
  ASSERT_EQ(Run("switch bridge"), 0);
  StopDhcpServer();
  const long took = MillisecondsOf([] { EXPECT_EQ(Run("switch router"), 0); });
  EXPECT_LT(took, 4000);
  EXPECT_THAT(Picture(), HasSubstr("address lbr0 192.168.1.1/24"));
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on eth0"));
  StartDhcpServer();
  EXPECT_TRUE(Eventually(15000, [] { return Picture().find("address eth0 203.0.113.") != std::string::npos; }));
}

TEST_F(Switch, LanBridgeIsAnotherKindOfLink) {
  ASSERT_EQ(Run("switch bridge"), 0);
  Shell("ip link add lbr0 type veth peer name lbr0p");
  const std::string before = Picture();
  EXPECT_EQ(Run("switch router"), 1);
  EXPECT_EQ(Picture(), before);
}

TEST_F(Switch, DurationEachWay) {
  for (const char *target : {"bridge", "router", "bridge", "router"}) {
    const long took = MillisecondsOf([target] { EXPECT_EQ(Run(std::string("switch ") + target), 0); });
    std::cout << "switch to " << target << ": " << took << " ms\n";
    EXPECT_LT(took, 5000);
  }
}

} // namespace
