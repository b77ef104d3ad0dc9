// The topology as the kernel's links tell it, and the device's abilities.
#include "host/wireless/upstream.h"
#include "platform/wifi.h"
#include "tests/host/network/shell.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <iostream>
#include <thread>

namespace {

namespace fs = std::filesystem;
namespace wifi = vornwireless::wifi::utils;

using hosttest::RemoveLinks;
using hosttest::Shell;

std::string Topology() {
  std::string text = "as before";
  const int result = wifi::GetTopologyString(text);
  return result < 0 ? "failed, " + text : text;
}

// Why the router cannot be a client; empty when it can.
std::string WhyNoClient() {
  std::string why;
  EXPECT_EQ(vornhost::FindUpstream(why), "");
  return why;
}

class TopologyText : public testing::Test {
protected:
  void SetUp() override {
    RemoveLinks();
    fs::create_directories("/etc/sysconfig/network-scripts");
  }
  void TearDown() override { RemoveLinks(); }

  static void MakePorts() { Shell("ip link add eth0 type veth peer name w0 && ip link add lbr0 type bridge"); }
};

// /sys/class as a machine with these adapters has it, until the object goes.
class FakeSysfs {
public:
  FakeSysfs() {
    Shell("mkdir -p /mnt/class/net /mnt/usb /mnt/pci && cp -a /sys/class/net/. /mnt/class/net/ &&"
          "mount --bind /mnt/class /sys/class");
  }
  FakeSysfs(const FakeSysfs &) = delete;
  FakeSysfs &operator=(const FakeSysfs &) = delete;
  ~FakeSysfs() { Shell("umount /sys/class && rm -r /mnt/class"); }

  static void AddAdapter(const std::string &name, const std::string &bus) {
    const std::string folder = "/sys/class/ieee80211/" + name + "/device";
    fs::create_directories(folder);
    fs::create_symlink("../../../../bus/" + bus, folder + "/subsystem");
  }
  static void AddWireless(const std::string &name) {
    const std::string radio = "/sys/class/net/" + name + "/phy80211";
    fs::create_directories(radio);
    hosttest::WriteFile(radio + "/index", "7\n");
  }
};

TEST_F(TopologyText, FreeWanPortBesideALanBridgeIsRouter) {
  MakePorts();
  EXPECT_EQ(Topology(), "router");
}

TEST_F(TopologyText, WanPortInTheOneBridgeIsBridge) {
  MakePorts();
  Shell("ip link add br0 type bridge && ip link set eth0 master br0");
  EXPECT_EQ(Topology(), "bridge");
  Shell("ip link delete lbr0");
  EXPECT_EQ(Topology(), "bridge");
}

TEST_F(TopologyText, FollowsTheKernelAtOnce) {
  MakePorts();
  Shell("ip link add br0 type bridge");
  EXPECT_EQ(Topology(), "router");
  Shell("ip link set eth0 master br0");
  EXPECT_EQ(Topology(), "bridge");
  Shell("ip link set eth0 nomaster");
  EXPECT_EQ(Topology(), "router");
}

TEST_F(TopologyText, WithoutAWanPortThereIsNone) {
  Shell("ip link add lbr0 type bridge");
  EXPECT_EQ(Topology(), "failed, as before");
}

TEST_F(TopologyText, WithoutALanBridgeThereIsNone) {
  Shell("ip link add eth0 type veth peer name w0");
  EXPECT_EQ(Topology(), "failed, as before");
}

TEST_F(TopologyText, WanPortInAnotherBridgeIsNone) {
  MakePorts();
  Shell("ip link add xbr0 type bridge && ip link set eth0 master xbr0");
  EXPECT_EQ(Topology(), "failed, as before");
}

// Also without a radio: what could not be told could not be left.
TEST_F(TopologyText, WanPortInTheLanBridgeIsClient) {
  MakePorts();
  Shell("ip link set eth0 master lbr0");
  EXPECT_EQ(Topology(), "client");
}

TEST_F(TopologyText, ThreadsAskAtOnce) {
  MakePorts();
  constexpr int kThreads = 8;
  std::vector<std::thread> threads;
  threads.reserve(kThreads);
  for (int number = 0; number < kThreads; ++number) {
    threads.emplace_back([] {
      for (int round = 0; round < 2000; ++round) {
        ASSERT_EQ(Topology(), "router");
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

TEST_F(TopologyText, SocketIsKeptAndClosedWithItsThread) {
  MakePorts();
  const auto count = [] { return std::distance(fs::directory_iterator("/proc/self/fd"), fs::directory_iterator()); };
  Topology();
  const auto before = count();
  for (int round = 0; round < 100; ++round) {
    Topology();
    std::thread([] { Topology(); }).join();
  }
  EXPECT_EQ(count(), before);
}

// "get" asks it each time. The limit is far above what is measured, for machines that are busy.
TEST_F(TopologyText, CostsMicroseconds) {
  MakePorts();
  constexpr int kRounds = 100000;
  for (const char *topology : {"router", "bridge"}) {
    std::string text;
    const auto begin = std::chrono::steady_clock::now();
    for (int round = 0; round < kRounds; ++round) {
      ASSERT_EQ(wifi::GetTopologyString(text), 0);
    }
    const std::chrono::duration<double, std::micro> took = std::chrono::steady_clock::now() - begin;
    std::cout << topology << ": " << took.count() / kRounds << " us each\n";
    EXPECT_EQ(text, topology);
    EXPECT_LT(took.count() / kRounds, 100);
    Shell("ip link add br0 type bridge; ip link set eth0 master br0");
  }
}

TEST_F(TopologyText, SupportNeedsWanPortAndLanConfiguration) {
  const std::string config = "/etc/sysconfig/network-scripts/ifcfg-lbr0";
  hosttest::WriteFile(config, "DEVICE=lbr0\n");
  EXPECT_FALSE(wifi::IsSupportTopology());
  MakePorts();
  EXPECT_TRUE(wifi::IsSupportTopology());
  fs::remove(config);
  EXPECT_FALSE(wifi::IsSupportTopology());
}

TEST_F(TopologyText, WithoutAdaptersTheModesAreTwo) {
  std::string mode;
  EXPECT_EQ(wifi::GetSupportedMode(mode), 0);
  EXPECT_EQ(mode, "router,bridge");
  EXPECT_FALSE(wifi::HasWifiDongle());
}

TEST_F(TopologyText, BuiltInAdapterIsNoDongle) {
  const FakeSysfs sysfs;
  FakeSysfs::AddAdapter("phy0", "pci");
  EXPECT_FALSE(wifi::HasWifiDongle());
  std::string mode;
  EXPECT_EQ(wifi::GetSupportedMode(mode), 0);
  EXPECT_EQ(mode, "router,bridge"); // not what the switch would refuse
}

// Over radios that can, and for the switch itself: tests/wifi.
TEST_F(TopologyText, ConfiguredUpstreamWithoutAUsableRadioIsNoMode) {
  const FakeSysfs sysfs;
  FakeSysfs::AddWireless("wlan1");
  fs::create_directories("/etc/vorn/wireless");
  const std::string file = "/etc/vorn/wireless/wlan1.upstream";
  hosttest::WriteFile(file, "network={\n}\n");
  fs::permissions(file, fs::perms{0644});
  EXPECT_EQ(WhyNoClient(),
            file + ": its configuration must be a file that root owns and nobody else can read or write");
  fs::permissions(file, fs::perms{0600});
  EXPECT_EQ(WhyNoClient(), file + ": its radio cannot be a station"); // the kernel here knows no such radio
  fs::create_directories("/etc/hostapd");
  hosttest::WriteFile("/etc/hostapd/wlan1.conf", "interface=wlan1\n");
  EXPECT_EQ(WhyNoClient(), file + ": its radio is an access point's");
  fs::remove("/etc/hostapd/wlan1.conf");
  fs::create_directories("/sys/class/net/wlan1/master");
  EXPECT_EQ(WhyNoClient(), file + ": it is a port of a bridge");
  fs::remove(file);
  fs::create_symlink("/dev/null", file);
  EXPECT_EQ(WhyNoClient(),
            file + ": its configuration must be a file that root owns and nobody else can read or write");
  fs::rename(file, "/etc/vorn/wireless/wlan7.upstream");
  EXPECT_EQ(WhyNoClient(), "/etc/vorn/wireless/wlan7.upstream: no wireless interface of that name");
  FakeSysfs::AddWireless("radio1");
  fs::rename("/etc/vorn/wireless/wlan7.upstream", "/etc/vorn/wireless/radio1.upstream");
  EXPECT_THAT(WhyNoClient(), testing::HasSubstr("names begin with \"wl\""));
  fs::remove("/etc/vorn/wireless/radio1.upstream");
  EXPECT_EQ(WhyNoClient(), "no upstream network is configured");
  std::string mode;
  EXPECT_EQ(wifi::GetSupportedMode(mode), 0);
  EXPECT_EQ(mode, "router,bridge");
}

TEST_F(TopologyText, UsbAdapterIsADongle) {
  const FakeSysfs sysfs;
  FakeSysfs::AddAdapter("phy0", "pci");
  FakeSysfs::AddAdapter("phy1", "usb");
  EXPECT_TRUE(wifi::HasWifiDongle());
}

} // namespace
