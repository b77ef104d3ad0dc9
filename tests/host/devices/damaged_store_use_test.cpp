// A store that is damaged while it is in use, and found so by several at once.
#include "tests/host/devices/damaged_store_scene.h"

#include "host/devices/database.h"
#include "host/devices/device_store.h"
#include "tests/host/files.h"
#include "tests/host/traced_child.h"

#include <sys/wait.h>

#include <filesystem>
#include <unistd.h>

namespace hosttest {

namespace {

using vornhost::DeviceStore;
using vornhost::kDeviceStore;

TEST_F(DamagedStore, AReaderThatHasItOpenSeesTheNewOne) {
  ASSERT_EQ(Name(kMac, "old"), 0);
  ASSERT_EQ(List().size(), 1U); // by a connection that stays
  WriteText("/var/lib/garbage", std::string(2 * kPageSize, 'x'));
  std::filesystem::rename("/var/lib/garbage", kDeviceStore);
  EXPECT_EQ(Name(MacOf(1), "new"), 0);
  EXPECT_EQ(List()[0]["macAddr"], MacOf(1));
}

TEST_F(DamagedStore, DamageThatComesWhileItIsOpenIsPutAside) {
  FullStore();
  ASSERT_EQ(List().size(), 400U);
  const size_t root = RootOf("finding");
  vornhost::Database(kDeviceStore).Execute("PRAGMA wal_checkpoint(TRUNCATE)");
  {
    std::fstream file(kDeviceStore, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(static_cast<std::streamoff>(root * kPageSize));
    file << std::string(kPageSize, '\xaa');
  }
  ASSERT_EQ(Name(kMac, "new"), 0);
  const Json::Value list = List();
  EXPECT_EQ(list.size(), 401U);
  EXPECT_TRUE(std::filesystem::exists(kAside));
  EXPECT_EQ(list[400]["userdef_displayName"], "new");
}

// An edit that was acknowledged is in the store that the next one reads, whoever puts the old one aside meanwhile.
TEST_F(DamagedStore, AnEditByAConnectionToTheOldStoreIsKept) {
  DeviceStore old;
  WriteText("/var/lib/garbage", "garbage");
  std::filesystem::rename("/var/lib/garbage", kDeviceStore);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_TRUE(old.SetOwner(kMac, {"kept", "nas"}));
  EXPECT_EQ(List()[0]["userdef_displayName"], "kept");
  EXPECT_TRUE(old.Forget(kMac));
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
}

TEST_F(DamagedStore, ManyThatFindItDamagedPutItAsideOnce) {
  FullStore();
  const size_t root = RootOf("finding");
  Settle();
  const std::string damaged = Overwritten(ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  for (int round = 0; round < 10; ++round) {
    FreshFolder("/var/lib/vorn");
    WriteText(kDeviceStore, damaged);
    int gate[2];
    ASSERT_EQ(pipe(gate), 0);
    std::vector<pid_t> children;
    for (int number = 0; number < 4; ++number) {
      children.push_back(fork());
      if (children.back() == 0) {
        close(gate[1]);
        char byte = 0;
        const bool isOpen = read(gate[0], &byte, 1) == 0; // all are there
        _exit(!isOpen || Name("d4:3d:7e:ff:00:0" + std::to_string(number), "by " + std::to_string(number)) != 0);
      }
    }
    close(gate[1]);
    close(gate[0]);
    for (const pid_t child : children) {
      int status = -1;
      waitpid(child, &status, 0);
      EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(DeviceStore().OwnerEntries().size(), 404U);
    EXPECT_FALSE(std::filesystem::exists(std::string(kAside) + ".1"));
    ExpectKept(damaged);
  }
}

// ---- death in the middle

int OpenAndName() {
  return Name(kMac, "new");
}

// Wherever it dies, the next one has the names, and the damaged file is kept.
TEST_F(DamagedStore, WhoeverDiesWhilePuttingItAsideLosesNothing) {
  FullStore(20);
  const size_t root = RootOf("finding");
  Settle();
  const std::string damaged = Overwritten(ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  bool ended = false;
  for (int stop = 1; !ended; ++stop) {
    FreshFolder("/var/lib/vorn");
    WriteText(kDeviceStore, damaged);
    TracedChild child(OpenAndName);
    for (int step = 0; step < stop && !ended; ++step) {
      ended = !child.Step();
    }
    if (!ended) {
      child.Kill();
    }
    const bool acknowledged = child.WasAcknowledged();
    const std::map<std::string, vornhost::OwnerEntry> names = DeviceStore().OwnerEntries();
    ASSERT_GE(names.size(), 20U) << "stop " << stop;
    ASSERT_TRUE(!acknowledged || names.contains(kMac)) << "stop " << stop;
    ASSERT_EQ(DeviceStore().Devices().size(), 20U) << "stop " << stop;
    ASSERT_EQ(ReadText(kAside), damaged) << "stop " << stop;
    ASSERT_FALSE(std::filesystem::exists(std::string(kAside) + ".1")) << "stop " << stop;
  }
}

} // namespace

} // namespace hosttest
