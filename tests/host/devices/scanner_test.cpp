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
  static void SetUpTestSuite() { hosttest::MakeCable(); }
  void SetUp() override {
    hosttest::FreshFolder("/var/lib/vorn");
    hosttest::Shell("ip neigh flush dev lbr0"); // nobody of the test before
  }
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

} // namespace
