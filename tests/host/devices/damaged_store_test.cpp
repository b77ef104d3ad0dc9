// A store that cannot be read any more: the owner sees devices again at once, and loses nothing that was in it.
#include "tests/host/devices/damaged_store_scene.h"

#include "host/devices/database.h"
#include "host/devices/device_store.h"
#include "platform/netclient.h"
#include "tests/host/devices/failing_disk.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <sys/stat.h>

#include <filesystem>
#include <unistd.h>

namespace hosttest {

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using vornhost::DatabaseError;
using vornhost::DeviceStore;
using vornhost::kDeviceStore;
using vornnetwork::dbus::NetClient;

TEST_F(DamagedStore, AnEmptyFileIsANewStore) {
  WriteText(kDeviceStore, "");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(Name(kMac, "name"), 0);
  EXPECT_FALSE(std::filesystem::exists(kAside));
  EXPECT_EQ(LogSoFar(), "");
}

TEST_F(DamagedStore, AFileCutToNothingIsPutAsideWithItsJournal) {
  const std::string journal = "a journal with the owner's last names" + std::string(5000, '.');
  WriteText(kDeviceStore, "");
  WriteText(std::string(kDeviceStore) + "-wal", journal);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(ReadText(kAside), "");
  EXPECT_EQ(ReadText(std::string(kAside) + "-wal"), journal);
  EXPECT_THAT(LogSoFar(), HasSubstr("was cut to nothing"));
  EXPECT_EQ(Name(kMac, "name"), 0);
}

TEST_F(DamagedStore, ATextInItsPlaceIsPutAside) {
  const std::string text = "no database, but a text that is long enough to be looked at as one" + std::string(600, '.');
  WriteText(kDeviceStore, text);
  ExpectPutAside(text);
}

TEST_F(DamagedStore, ZerosAsAfterALossOfPowerArePutAside) {
  const std::string zeros(3 * kPageSize, '\0');
  WriteText(kDeviceStore, zeros);
  ExpectPutAside(zeros);
}

TEST_F(DamagedStore, AStoreThatIsCutToAFewBytesIsPutAside) {
  FullStore();
  Settle();
  for (const size_t size : {size_t{16}, size_t{99}, size_t{100}, size_t{1000}, kPageSize}) {
    const std::string cut = ReadText(kDeviceStore).substr(0, size);
    WriteText(kDeviceStore, cut);
    ExpectPutAside(cut);
    FreshFolder("/var/lib/vorn");
    FullStore();
    Settle();
  }
}

TEST_F(DamagedStore, ADatabaseOfAnotherShapeIsPutAside) {
  WriteText(kDeviceStore, "");
  vornhost::Database(kDeviceStore).Execute("CREATE TABLE device (mac INTEGER); CREATE TABLE owner (x)");
  ExpectPutAside(ReadText(kDeviceStore));
}

TEST_F(DamagedStore, AStoreThatLacksATableIsPutAside) {
  { DeviceStore store; }
  vornhost::Database(kDeviceStore).Execute("DROP TABLE finding");
  Settle();
  ExpectPutAside(ReadText(kDeviceStore));
}

TEST_F(DamagedStore, WhatCanBeReadIsSaved) {
  FullStore();
  const size_t root = RootOf("device");
  Settle();
  const std::string damaged = Overwritten(ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  WriteText(kDeviceStore, damaged);
  const Json::Value list = List();
  ASSERT_EQ(list.size(), 400U);
  EXPECT_EQ(list[7]["macAddr"], MacOf(7));
  EXPECT_EQ(list[7]["userdef_displayName"], "owner's 7" + std::string(100, '.'));
  EXPECT_EQ(list[7]["userdef_deviceType"], "nas");
  EXPECT_FALSE(list[7].isMember("displayName")); // the device itself is found again
  EXPECT_EQ(ReadText(kAside), damaged);
  EXPECT_THAT(LogSoFar(), HasSubstr("400"));
}

// One page of names is gone: those before it and those behind it are saved.
TEST_F(DamagedStore, NamesOnBothSidesOfADamagedPageAreSaved) {
  FullStore();
  Settle();
  const std::string good = ReadText(kDeviceStore);
  const size_t page = good.find("owner's 200.") / kPageSize * kPageSize;
  WriteText(kDeviceStore, Overwritten(good, page, kPageSize, '\x7f'));
  const std::map<std::string, vornhost::OwnerEntry> names = DeviceStore().OwnerEntries();
  EXPECT_GT(names.size(), 300U);
  EXPECT_TRUE(names.contains(MacOf(0)));
  EXPECT_TRUE(names.contains(MacOf(399)));
  EXPECT_FALSE(names.contains(MacOf(200)));
  EXPECT_EQ(DeviceStore().Devices().size(), 400U);
}

TEST_F(DamagedStore, WhateverPageIsDamagedTheListIsThere) {
  FullStore(200);
  Settle();
  const std::string good = ReadText(kDeviceStore);
  for (size_t page = 0; page < good.size() / kPageSize; ++page) {
    for (const char byte : {'\0', '\x01', '\x0d', '\x7f', '\xff'}) {
      FreshFolder("/var/lib/vorn");
      WriteText(kDeviceStore, Overwritten(good, page * kPageSize, kPageSize, byte));
      Json::Value result;
      EXPECT_EQ(NetClient().GetDeviceListData("all", result), 0) << page << ' ' << int{byte};
      EXPECT_EQ(Name(kMac, "name"), 0) << page << ' ' << int{byte};
    }
  }
}

// What the check of the file's form does not see: the bytes of a text.
TEST_F(DamagedStore, ARowThatIsNoneIsPassedOver) {
  DeviceStore store;
  store.Write({DeviceOf(MacOf(1)), DeviceOf(MacOf(2)), DeviceOf(MacOf(3))}, {});
  for (const int number : {1, 2, 3}) {
    ASSERT_EQ(Name(MacOf(number), "x"), 0);
  }
  vornhost::Database(kDeviceStore)
      .Execute("UPDATE device SET mac = 'd4:3d:7e:00:00:0G' WHERE mac LIKE '%:01';"
               "UPDATE device SET netif = CAST(x'FF' AS TEXT) WHERE mac LIKE '%:02';"
               "UPDATE owner SET mac = x'00FF' WHERE mac LIKE '%:01';"
               "UPDATE owner SET name = CAST(x'41FF42' AS TEXT) WHERE mac LIKE '%:02';"
               "UPDATE finding SET name = CAST(x'41FF42' AS TEXT) WHERE mac LIKE '%:03'");
  const Json::Value list = List();
  ASSERT_EQ(list.size(), 1U);
  EXPECT_EQ(list[0]["macAddr"], MacOf(3));
  EXPECT_EQ(list[0]["userdef_displayName"], "x");
  EXPECT_FALSE(list[0].isMember("displayName"));
}

TEST_F(DamagedStore, WhatIsStillInTheJournalIsKeptToo) {
  DeviceStore reader; // holds the journal open
  ASSERT_EQ(Name(kMac, "in the journal"), 0);
  const std::string journal = ReadText(std::string(kDeviceStore) + "-wal");
  ASSERT_THAT(journal, HasSubstr("in the journal"));
  FreshFolder("/var/lib/vorn");
  WriteText(kDeviceStore, std::string(kPageSize, 'x'));
  WriteText(std::string(kDeviceStore) + "-wal", journal);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(ReadText(std::string(kAside) + "-wal"), journal);
}

// Its journal would be taken for the new store's.
TEST_F(DamagedStore, AJournalWithoutItsStoreIsNotReplayed) {
  {
    DeviceStore reader;
    ASSERT_EQ(Name(kMac, "old"), 0);
    std::filesystem::rename(std::string(kDeviceStore) + "-wal", "/var/lib/journal");
  }
  FreshFolder("/var/lib/vorn");
  std::filesystem::rename("/var/lib/journal", std::string(kDeviceStore) + "-wal");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
}

TEST_F(DamagedStore, TheLastThreeAreKept) {
  for (const char *text : {"first", "second", "third", "fourth"}) {
    WriteText(kDeviceStore, text);
    { DeviceStore store; }
    std::filesystem::remove(std::string(kDeviceStore) + "-wal");
    std::filesystem::remove(std::string(kDeviceStore) + "-shm");
  }
  EXPECT_EQ(ReadText(kAside), "fourth");
  EXPECT_EQ(ReadText(std::string(kAside) + ".1"), "third");
  EXPECT_EQ(ReadText(std::string(kAside) + ".2"), "second");
  EXPECT_THAT(NamesIn("/var/lib/vorn"), ElementsAre("devices.db", "devices.db.damaged", "devices.db.damaged.1",
                                                    "devices.db.damaged.2", "devices.lock"));
}

TEST_F(DamagedStore, ALinkInTheNameToBeUsedIsReplacedAndNotFollowed) {
  WriteText("/var/lib/elsewhere", "precious");
  std::filesystem::create_symlink("/var/lib/elsewhere", kAside);
  WriteText(kDeviceStore, "garbage");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(ReadText("/var/lib/elsewhere"), "precious");
  EXPECT_EQ(ReadText(kAside), "garbage");
}

// ---- what is no damage

TEST_F(DamagedStore, ALinkToSomethingDamagedIsRefused) {
  WriteText("/var/lib/elsewhere", "garbage");
  std::filesystem::create_symlink("/var/lib/elsewhere", kDeviceStore);
  ExpectRefused();
  EXPECT_EQ(ReadText("/var/lib/elsewhere"), "garbage");
}

TEST_F(DamagedStore, SomebodyElsesFileIsRefused) {
  WriteText(kDeviceStore, "garbage");
  ASSERT_EQ(chown(kDeviceStore, 65534, 65534), 0);
  ExpectRefused();
  EXPECT_EQ(ReadText(kDeviceStore), "garbage");
}

TEST_F(DamagedStore, AFolderOrAPipeInItsPlaceIsRefused) {
  std::filesystem::create_directory(kDeviceStore);
  ExpectRefused();
  std::filesystem::remove(kDeviceStore);
  ASSERT_EQ(mkfifo(kDeviceStore, 0600), 0);
  ExpectRefused();
}

TEST_F(DamagedStore, ADiskThatFailsForTheMomentIsNoDamage) {
  FullStore(3);
  for (const int error : kPassingErrors) {
    const FailingDisk disk(error);
    ExpectRefused();
  }
  EXPECT_EQ(List().size(), 3U);
}

TEST_F(DamagedStore, APageThatTheDiskDoesNotGiveIsNoDamage) {
  FullStore();
  Settle();
  const auto size = static_cast<sqlite3_int64>(StatOf(kDeviceStore).st_size);
  for (sqlite3_int64 page = kPageSize; page < size; page += kPageSize) {
    const FailingDisk disk(SQLITE_IOERR_READ, page);
    ExpectRefused();
  }
  EXPECT_EQ(List().size(), 400U);
}

// A new store needs room; until there is some, everything stays where it is.
TEST_F(DamagedStore, OnAFullDiskADamagedStoreStaysWhereItIs) {
  const std::string garbage(10 * kPageSize, 'x');
  Shell("mount -t tmpfs -o size=64k tmpfs /var/lib/vorn");
  WriteText("/var/lib/vorn/ballast", std::string(5 * kPageSize, 'x'));
  WriteText(kDeviceStore, garbage);
  ExpectRefused();
  EXPECT_EQ(ReadText(kDeviceStore), garbage);
  std::filesystem::remove("/var/lib/vorn/ballast");
  Shell("mount -o remount,size=4m /var/lib/vorn");
  LogSoFar();
  ExpectPutAside(garbage);
  Shell("umount -l /var/lib/vorn");
}

TEST_F(DamagedStore, AStoreThatSomebodyHoldsIsNoDamage) {
  FullStore(3);
  Settle();
  vornhost::Database other(kDeviceStore);
  other.Execute("BEGIN EXCLUSIVE");
  EXPECT_THROW(DeviceStore(), DatabaseError);
  other.Execute("ROLLBACK");
  EXPECT_EQ(List().size(), 3U);
  EXPECT_FALSE(std::filesystem::exists(kAside));
}

} // namespace

} // namespace hosttest
