// The scanner as a process, in a home of one cable: what it does when its store is taken from under it.
#include "host/devices/device_store.h"
#include "platform/netclient.h"
#include "tests/host/devices/crowd.h"
#include "tests/host/devices/scanner_process.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <gmock/gmock.h>

namespace {

using hosttest::Eventually;
using vornhost::kDeviceStore;
using vornnetwork::dbus::NetClient;

Json::Value List() {
  Json::Value result;
  EXPECT_EQ(NetClient().GetDeviceListData("arp", result), 0);
  return result["ClientList"];
}

class ScannerTest : public testing::Test {
protected:
  void SetUp() override {
    hosttest::MakeCable();
    hosttest::FreshFolder("/var/lib/vorn");
  }
  void TearDown() override { hosttest::RemoveLinks(); }
};

TEST_F(ScannerTest, WritesEverythingAgainWhenItsStoreIsDamaged) {
  hosttest::Crowd crowd("far1");
  const hosttest::ScannerProcess scanner;
  crowd.Grow(3);
  ASSERT_TRUE(Eventually(20000, [] { return List().size() == 3; }));
  hosttest::WriteText("/var/lib/garbage", std::string(8192, 'x'));
  std::filesystem::rename("/var/lib/garbage", kDeviceStore);
  EXPECT_TRUE(Eventually(10000, [] { return List().size() == 3; }));
  EXPECT_EQ(hosttest::ReadText(std::string(kDeviceStore) + ".damaged"), std::string(8192, 'x'));
}

TEST_F(ScannerTest, PutsAsideWhatWasDamagedUnderItsHands) {
  hosttest::Crowd crowd("far1");
  const hosttest::ScannerProcess scanner;
  crowd.Grow(3);
  ASSERT_TRUE(Eventually(20000, [] { return List().size() == 3; }));
  vornhost::Database(kDeviceStore).Execute("PRAGMA wal_checkpoint(TRUNCATE)");
  const auto size = hosttest::StatOf(kDeviceStore).st_size;
  {
    std::fstream file(kDeviceStore, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(4096);
    file << std::string(static_cast<size_t>(size) - 4096, '\xaa');
  }
  vornhost::Database(kDeviceStore).Execute("PRAGMA user_version = 1"); // a change: everybody reads anew
  crowd.Grow(4);
  EXPECT_TRUE(Eventually(20000, [] { return std::filesystem::exists(std::string(kDeviceStore) + ".damaged"); }));
  EXPECT_TRUE(Eventually(10000, [] { return List().size() == 4; }));
}

TEST_F(ScannerTest, StartsOverADamagedStore) {
  hosttest::WriteText(kDeviceStore, "garbage");
  hosttest::Crowd crowd("far1");
  const hosttest::ScannerProcess scanner;
  crowd.Grow(2);
  EXPECT_TRUE(Eventually(20000, [] { return List().size() == 2; }));
}

// ---- hosts of IPv6 alone that say nothing by themselves

class QuietHosts : public ScannerTest {
protected:
  static constexpr char kSensor[] = "00:17:88:11:22:66";

  void SetUp() override {
    ScannerTest::SetUp();
    hosttest::Shell("sysctl -qw net.ipv6.conf.all.forwarding=1; ip addr add 2001:db8:2::1/64 dev lbr0 nodad");
  }

  static bool Has(const std::string &mac) {
    const Json::Value list = List();
    return std::any_of(list.begin(), list.end(), [&mac](const Json::Value &entry) { return entry["macAddr"] == mac; });
  }
};

TEST_F(QuietHosts, OneThatAnswersAllNodesIsFoundWhateverItsAddress) {
  const hosttest::FarHost sensor("lbr0", "lan2", kSensor);
  sensor.Run("sysctl -qw net.ipv6.conf.eth0.router_solicitations=0; ip link set eth0 up;"
             "ip addr add 2001:db8:2::f00d/64 dev eth0 nodad");
  hosttest::Sleep(2500); // its own beginnings are over
  hosttest::Shell("ip -6 neigh flush dev lbr0");
  const hosttest::ScannerProcess scanner;
  EXPECT_TRUE(Eventually(15000, [] { return Has(kSensor); }));
  EXPECT_EQ(List()[0]["netif"], "lbr0");
}

TEST_F(QuietHosts, OneThatAnswersNoEchoIsFoundByItsInterfaceIdentifier) {
  const hosttest::FarHost sensor("lbr0", "lan2", kSensor);
  const hosttest::ScannerProcess scanner;
  hosttest::Sleep(1500);
  EXPECT_FALSE(Has(kSensor));
  sensor.Run("sysctl -qw net.ipv6.icmp.echo_ignore_all=1; ip link set eth0 up;" // its solicitation of a router is heard
             "ip addr add 2001:db8:2::217:88ff:fe11:2266/64 dev eth0 nodad");
  EXPECT_TRUE(Eventually(20000, [] { return Has(kSensor); }));
}

// An address of the link is no evidence, and an answer is none either.
TEST_F(QuietHosts, WhoHasNoAddressOfTheHomeIsNotThere) {
  const hosttest::FarHost sensor("lbr0", "lan2", kSensor);
  const hosttest::ScannerProcess scanner;
  sensor.Run("ip link set eth0 up");
  hosttest::Sleep(8000);
  EXPECT_FALSE(Has(kSensor));
  EXPECT_NE(hosttest::Shell("ip -6 neigh show dev lbr0").find(kSensor), std::string::npos);
}

} // namespace
