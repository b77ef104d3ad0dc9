// A store that cannot be read any more: the owner sees devices again at once, and loses nothing that was in it.
#include "host/devices/device_store.h"

#include "host/devices/device_list.h"
#include "host/devices/mac_address.h"
#include "platform/netclient.h"
#include "tests/host/devices/failing_disk.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"
#include "tests/host/traced_child.h"

#include <gmock/gmock.h>
#include <sys/wait.h>
#include <syslog.h>

#include <array>
#include <unistd.h>

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using vornhost::DatabaseError;
using vornhost::Device;
using vornhost::DeviceStore;
using vornhost::kDeviceStore;
using vornnetwork::dbus::NetClient;

constexpr char kAside[] = "/var/lib/vorn/devices.db.damaged";
constexpr char kMac[] = "d4:3d:7e:11:22:33";
constexpr size_t kPageSize = 4096;

std::string MacOf(int number) {
  const std::array<uint8_t, vornhost::kMacBytes> mac = {
      0xd4, 0x3d, 0x7e, 0, static_cast<uint8_t>(number >> 8), static_cast<uint8_t>(number)};
  return vornhost::MacText(mac.data());
}

Device DeviceOf(const std::string &mac) {
  Device device;
  device.mac = mac;
  device.netif = "lbr0";
  device.connection = "ethernet";
  device.sources = 1;
  device.lastSeen = 1700000000;
  device.findings[0] = {"name of " + mac, "", ""};
  return device;
}

int Name(const std::string &mac, const std::string &name) {
  Json::Value record;
  record["macAddr"] = mac;
  record["userdef_displayName"] = name;
  record["userdef_deviceType"] = "nas";
  return NetClient().SetDeviceListData(record);
}

Json::Value List() {
  Json::Value result;
  EXPECT_EQ(NetClient().GetDeviceListData("all", result), 0);
  return result["ClientList"];
}

// As after an orderly end: everything is in one file.
void Settle() {
  vornhost::Database(kDeviceStore).Execute("PRAGMA wal_checkpoint(TRUNCATE); PRAGMA journal_mode = DELETE");
}

std::string Overwritten(std::string content, size_t from, size_t count, char byte) {
  for (size_t i = from; i < std::min(from + count, content.size()); ++i) {
    content[i] = byte;
  }
  return content;
}

// A store of many devices, each of which the owner has named.
std::string FullStore(int count = 400) {
  DeviceStore store;
  std::vector<Device> devices;
  for (int i = 0; i < count; ++i) {
    devices.push_back(DeviceOf(MacOf(i)));
  }
  store.Write(devices, {});
  vornhost::Database database(kDeviceStore);
  for (int i = 0; i < count; ++i) {
    vornhost::Statement(database, "INSERT INTO owner VALUES (?1, ?2, 'nas')")
        .Bind(1, MacOf(i))
        .Bind(2, "owner's " + std::to_string(i) + std::string(100, '.'))
        .Run();
  }
  return kDeviceStore;
}

// The root page of a table, from 0.
size_t RootOf(const std::string &table) {
  vornhost::Database database(kDeviceStore);
  vornhost::Statement root(database, "SELECT rootpage FROM sqlite_schema WHERE name = ?1");
  root.Bind(1, table);
  EXPECT_TRUE(root.Step());
  return static_cast<size_t>(root.Number(0)) - 1;
}

size_t Lines(const std::string &text) {
  return static_cast<size_t>(std::count(text.begin(), text.end(), '\n'));
}

// The log's lines since the last call: those that were sent before it, however late they are read.
std::string LogSoFar() {
  constexpr char kMark[] = "so far";
  syslog(LOG_INFO, "%s", kMark);
  std::string log;
  EXPECT_TRUE(hosttest::Eventually(20000, [&log, kMark] {
    log += hosttest::TakeSystemLog();
    return log.find(kMark) != std::string::npos;
  }));
  const size_t lineBefore = log.rfind('\n', log.find(kMark));
  return lineBefore == std::string::npos ? "" : log.substr(0, lineBefore + 1);
}

class DamagedStore : public testing::Test {
protected:
  static void SetUpTestSuite() { hosttest::OpenSystemLog(); }

  DamagedStore() {
    hosttest::FreshFolder("/var/lib/vorn");
    std::filesystem::remove_all("/run/vorn");
    LogSoFar();
  }

  // The store works, what was in its place is kept as it was, and the log says so once.
  static void ExpectPutAside(const std::string &content) {
    EXPECT_EQ(List(), Json::Value(Json::arrayValue));
    ExpectKept(content);
    ASSERT_EQ(Name(kMac, "new"), 0);
    EXPECT_EQ(List()[0]["userdef_displayName"], "new");
    EXPECT_EQ(hosttest::ReadText(kAside), content);
  }

  static void ExpectKept(const std::string &content) {
    EXPECT_EQ(hosttest::ReadText(kAside), content);
    const std::string log = LogSoFar();
    EXPECT_EQ(Lines(log), 1U) << log;
    EXPECT_THAT(log, HasSubstr(kAside));
    EXPECT_THAT(log, HasSubstr("<4>"));
  }

  // Neither read nor moved.
  static void ExpectRefused() {
    const std::vector<std::string> names = hosttest::NamesIn("/var/lib/vorn");
    EXPECT_THROW(DeviceStore(), DatabaseError);
    Json::Value result = "as it was";
    EXPECT_NE(NetClient().GetDeviceListData("all", result), 0);
    EXPECT_NE(Name(kMac, "name"), 0);
    EXPECT_THAT(hosttest::NamesIn("/var/lib/vorn"), Not(Contains(HasSubstr("damaged"))));
  }
};

TEST_F(DamagedStore, AnEmptyFileIsANewStore) {
  hosttest::WriteText(kDeviceStore, "");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(Name(kMac, "name"), 0);
  EXPECT_FALSE(std::filesystem::exists(kAside));
  EXPECT_EQ(LogSoFar(), "");
}

TEST_F(DamagedStore, AFileCutToNothingIsPutAsideWithItsJournal) {
  const std::string journal = "a journal with the owner's last names" + std::string(5000, '.');
  hosttest::WriteText(kDeviceStore, "");
  hosttest::WriteText(std::string(kDeviceStore) + "-wal", journal);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(hosttest::ReadText(kAside), "");
  EXPECT_EQ(hosttest::ReadText(std::string(kAside) + "-wal"), journal);
  EXPECT_THAT(LogSoFar(), HasSubstr("was cut to nothing"));
  EXPECT_EQ(Name(kMac, "name"), 0);
}

TEST_F(DamagedStore, ATextInItsPlaceIsPutAside) {
  const std::string text = "no database, but a text that is long enough to be looked at as one" + std::string(600, '.');
  hosttest::WriteText(kDeviceStore, text);
  ExpectPutAside(text);
}

TEST_F(DamagedStore, ZerosAsAfterALossOfPowerArePutAside) {
  const std::string zeros(3 * kPageSize, '\0');
  hosttest::WriteText(kDeviceStore, zeros);
  ExpectPutAside(zeros);
}

TEST_F(DamagedStore, AStoreThatIsCutToAFewBytesIsPutAside) {
  FullStore();
  Settle();
  for (const size_t size : {size_t{16}, size_t{99}, size_t{100}, size_t{1000}, kPageSize}) {
    const std::string cut = hosttest::ReadText(kDeviceStore).substr(0, size);
    hosttest::WriteText(kDeviceStore, cut);
    ExpectPutAside(cut);
    hosttest::FreshFolder("/var/lib/vorn");
    FullStore();
    Settle();
  }
}

TEST_F(DamagedStore, ADatabaseOfAnotherShapeIsPutAside) {
  hosttest::WriteText(kDeviceStore, "");
  vornhost::Database(kDeviceStore).Execute("CREATE TABLE device (mac INTEGER); CREATE TABLE owner (x)");
  ExpectPutAside(hosttest::ReadText(kDeviceStore));
}

TEST_F(DamagedStore, AStoreThatLacksATableIsPutAside) {
  { DeviceStore store; }
  vornhost::Database(kDeviceStore).Execute("DROP TABLE finding");
  Settle();
  ExpectPutAside(hosttest::ReadText(kDeviceStore));
}

TEST_F(DamagedStore, WhatCanBeReadIsSaved) {
  FullStore();
  const size_t root = RootOf("device");
  Settle();
  const std::string damaged = Overwritten(hosttest::ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  hosttest::WriteText(kDeviceStore, damaged);
  const Json::Value list = List();
  ASSERT_EQ(list.size(), 400U);
  EXPECT_EQ(list[7]["macAddr"], MacOf(7));
  EXPECT_EQ(list[7]["userdef_displayName"], "owner's 7" + std::string(100, '.'));
  EXPECT_EQ(list[7]["userdef_deviceType"], "nas");
  EXPECT_FALSE(list[7].isMember("displayName")); // the device itself is found again
  EXPECT_EQ(hosttest::ReadText(kAside), damaged);
  EXPECT_THAT(LogSoFar(), HasSubstr("400"));
}

// One page of names is gone: those before it and those behind it are saved.
TEST_F(DamagedStore, NamesOnBothSidesOfADamagedPageAreSaved) {
  FullStore();
  Settle();
  const std::string good = hosttest::ReadText(kDeviceStore);
  const size_t page = good.find("owner's 200.") / kPageSize * kPageSize;
  hosttest::WriteText(kDeviceStore, Overwritten(good, page, kPageSize, '\x7f'));
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
  const std::string good = hosttest::ReadText(kDeviceStore);
  for (size_t page = 0; page < good.size() / kPageSize; ++page) {
    for (const char byte : {'\0', '\x01', '\x0d', '\x7f', '\xff'}) {
      hosttest::FreshFolder("/var/lib/vorn");
      hosttest::WriteText(kDeviceStore, Overwritten(good, page * kPageSize, kPageSize, byte));
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
  const std::string journal = hosttest::ReadText(std::string(kDeviceStore) + "-wal");
  ASSERT_THAT(journal, HasSubstr("in the journal"));
  hosttest::FreshFolder("/var/lib/vorn");
  hosttest::WriteText(kDeviceStore, std::string(kPageSize, 'x'));
  hosttest::WriteText(std::string(kDeviceStore) + "-wal", journal);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(hosttest::ReadText(std::string(kAside) + "-wal"), journal);
}

// Its journal would be taken for the new store's.
TEST_F(DamagedStore, AJournalWithoutItsStoreIsNotReplayed) {
  {
    DeviceStore reader;
    ASSERT_EQ(Name(kMac, "old"), 0);
    std::filesystem::rename(std::string(kDeviceStore) + "-wal", "/var/lib/journal");
  }
  hosttest::FreshFolder("/var/lib/vorn");
  std::filesystem::rename("/var/lib/journal", std::string(kDeviceStore) + "-wal");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
}

TEST_F(DamagedStore, TheLastThreeAreKept) {
  for (const char *text : {"first", "second", "third", "fourth"}) {
    hosttest::WriteText(kDeviceStore, text);
    { DeviceStore store; }
    std::filesystem::remove(std::string(kDeviceStore) + "-wal");
    std::filesystem::remove(std::string(kDeviceStore) + "-shm");
  }
  EXPECT_EQ(hosttest::ReadText(kAside), "fourth");
  EXPECT_EQ(hosttest::ReadText(std::string(kAside) + ".1"), "third");
  EXPECT_EQ(hosttest::ReadText(std::string(kAside) + ".2"), "second");
  EXPECT_THAT(
      hosttest::NamesIn("/var/lib/vorn"),
      ElementsAre("devices.db", "devices.db.damaged", "devices.db.damaged.1", "devices.db.damaged.2", "devices.lock"));
}

TEST_F(DamagedStore, ALinkInTheNameToBeUsedIsReplacedAndNotFollowed) {
  hosttest::WriteText("/var/lib/elsewhere", "precious");
  std::filesystem::create_symlink("/var/lib/elsewhere", kAside);
  hosttest::WriteText(kDeviceStore, "garbage");
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_EQ(hosttest::ReadText("/var/lib/elsewhere"), "precious");
  EXPECT_EQ(hosttest::ReadText(kAside), "garbage");
}

// ---- what is no damage

TEST_F(DamagedStore, ALinkToSomethingDamagedIsRefused) {
  hosttest::WriteText("/var/lib/elsewhere", "garbage");
  std::filesystem::create_symlink("/var/lib/elsewhere", kDeviceStore);
  ExpectRefused();
  EXPECT_EQ(hosttest::ReadText("/var/lib/elsewhere"), "garbage");
}

TEST_F(DamagedStore, SomebodyElsesFileIsRefused) {
  hosttest::WriteText(kDeviceStore, "garbage");
  ASSERT_EQ(chown(kDeviceStore, 65534, 65534), 0);
  ExpectRefused();
  EXPECT_EQ(hosttest::ReadText(kDeviceStore), "garbage");
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
  for (const int error : hosttest::kPassingErrors) {
    const hosttest::FailingDisk disk(error);
    ExpectRefused();
  }
  EXPECT_EQ(List().size(), 3U);
}

TEST_F(DamagedStore, APageThatTheDiskDoesNotGiveIsNoDamage) {
  FullStore();
  Settle();
  const auto size = static_cast<sqlite3_int64>(hosttest::StatOf(kDeviceStore).st_size);
  for (sqlite3_int64 page = kPageSize; page < size; page += kPageSize) {
    const hosttest::FailingDisk disk(SQLITE_IOERR_READ, page);
    ExpectRefused();
  }
  EXPECT_EQ(List().size(), 400U);
}

// A new store needs room; until there is some, everything stays where it is.
TEST_F(DamagedStore, OnAFullDiskADamagedStoreStaysWhereItIs) {
  const std::string garbage(10 * kPageSize, 'x');
  hosttest::Shell("mount -t tmpfs -o size=64k tmpfs /var/lib/vorn");
  hosttest::WriteText("/var/lib/vorn/ballast", std::string(5 * kPageSize, 'x'));
  hosttest::WriteText(kDeviceStore, garbage);
  ExpectRefused();
  EXPECT_EQ(hosttest::ReadText(kDeviceStore), garbage);
  std::filesystem::remove("/var/lib/vorn/ballast");
  hosttest::Shell("mount -o remount,size=4m /var/lib/vorn");
  LogSoFar();
  ExpectPutAside(garbage);
  hosttest::Shell("umount -l /var/lib/vorn");
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

// ---- in use, and by several

TEST_F(DamagedStore, AReaderThatHasItOpenSeesTheNewOne) {
  ASSERT_EQ(Name(kMac, "old"), 0);
  ASSERT_EQ(List().size(), 1U); // by a connection that stays
  hosttest::WriteText("/var/lib/garbage", std::string(2 * kPageSize, 'x'));
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
  hosttest::WriteText("/var/lib/garbage", "garbage");
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
  const std::string damaged = Overwritten(hosttest::ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  for (int round = 0; round < 10; ++round) {
    hosttest::FreshFolder("/var/lib/vorn");
    hosttest::WriteText(kDeviceStore, damaged);
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
  const std::string damaged = Overwritten(hosttest::ReadText(kDeviceStore), root * kPageSize, kPageSize, '\xaa');
  bool ended = false;
  for (int stop = 1; !ended; ++stop) {
    hosttest::FreshFolder("/var/lib/vorn");
    hosttest::WriteText(kDeviceStore, damaged);
    hosttest::TracedChild child(OpenAndName);
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
    ASSERT_EQ(hosttest::ReadText(kAside), damaged) << "stop " << stop;
    ASSERT_FALSE(std::filesystem::exists(std::string(kAside) + ".1")) << "stop " << stop;
  }
}

} // namespace
