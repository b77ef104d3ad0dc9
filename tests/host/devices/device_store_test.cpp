// The store on disk, and the contract's calls over it: who may write what, and what survives whose death.
#include "host/devices/device_store.h"

#include "host/devices/device_list.h"
#include "platform/netclient.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>
#include <sys/wait.h>

#include <csignal>
#include <set>
#include <thread>
#include <unistd.h>

namespace {

using testing::IsEmpty;
using testing::SizeIs;
using vornhost::Device;
using vornhost::DeviceStore;
using vornnetwork::dbus::NetClient;

constexpr char kMac[] = "d4:3d:7e:11:22:33";

Device Laptop(const std::string &name = "laptop") {
  Device device;
  device.mac = kMac;
  device.ip = "192.168.1.110";
  device.netif = "lbr0";
  device.connection = "ethernet";
  device.manufacturer = "Maker";
  device.sources = 3;
  device.lastSeen = 1700000000;
  device.findings[1] = {name, "computer", "model"};
  return device;
}

Json::Value Edit(const std::string &mac, const std::string &name, const std::string &type = "nas") {
  Json::Value record;
  record["macAddr"] = mac;
  record["userdef_displayName"] = name;
  record["userdef_deviceType"] = type;
  return record;
}

int Set(const Json::Value &record) {
  return NetClient().SetDeviceListData(record);
}

Json::Value List(const std::string &type = "all") {
  Json::Value result;
  EXPECT_EQ(NetClient().GetDeviceListData(type, result), 0);
  return result["ClientList"];
}

class DeviceStoreTest : public testing::Test {
protected:
  DeviceStoreTest() {
    hosttest::FreshFolder("/var/lib/vorn");
    std::filesystem::remove_all("/run/vorn");
  }
};

TEST_F(DeviceStoreTest, ComesBackAsItWasWritten) {
  Device other = Laptop();
  other.mac = "3c:2a:f4:11:22:44";
  other.ip.clear();
  other.findings = {};
  DeviceStore().Write({Laptop(), other}, {});
  EXPECT_THAT(DeviceStore().Devices(), testing::ElementsAre(other, Laptop()));
}

TEST_F(DeviceStoreTest, ChangedFactsReplaceTheOldOnes) {
  DeviceStore store;
  store.Write({Laptop("old")}, {});
  store.Write({Laptop("new")}, {});
  EXPECT_THAT(store.Devices(), testing::ElementsAre(Laptop("new")));
  store.Write({}, {kMac});
  EXPECT_THAT(store.Devices(), IsEmpty());
}

TEST_F(DeviceStoreTest, IsItsOwnersAlone) {
  std::filesystem::remove_all("/var/lib/vorn");
  DeviceStore store;
  store.Write({Laptop()}, {});
  EXPECT_EQ(hosttest::StatOf("/var/lib/vorn").st_mode & 07777, 0700U);
  for (const std::string &name : hosttest::NamesIn("/var/lib/vorn")) {
    EXPECT_EQ(hosttest::StatOf("/var/lib/vorn/" + name).st_mode & 07777, 0600U) << name;
  }
}

TEST_F(DeviceStoreTest, ALinkInItsPlaceIsRefused) {
  hosttest::WriteText("/var/lib/elsewhere", "");
  std::filesystem::create_symlink("/var/lib/elsewhere", vornhost::kDeviceStore);
  EXPECT_THROW(DeviceStore(), vornhost::DatabaseError);
  EXPECT_EQ(hosttest::ReadText("/var/lib/elsewhere"), "");
  Json::Value result = "as it was";
  EXPECT_NE(NetClient().GetDeviceListData("all", result), 0);
  EXPECT_EQ(result, Json::Value("as it was"));
}

TEST_F(DeviceStoreTest, TimesFollowTheTimeZone) {
  DeviceStore().Write({Laptop()}, {});
  for (const auto &[zone, time] :
       {std::pair("Asia/Tokyo", "07:13:20 2023/11/15"), std::pair("Asia/Kolkata", "03:43:20 2023/11/15"),
        std::pair("UTC", "22:13:20 2023/11/14")}) {
    hosttest::PutTimeZone(zone);
    EXPECT_EQ(List()[0]["asso_time"], time) << zone;
  }
}

TEST_F(DeviceStoreTest, AnotherVersionIsRefused) {
  { DeviceStore store; }
  vornhost::Database(vornhost::kDeviceStore).Execute("PRAGMA user_version = 2");
  EXPECT_THROW(DeviceStore(), vornhost::DatabaseError);
}

// ---- the contract's calls

TEST_F(DeviceStoreTest, WithoutAStoreTheListIsEmpty) {
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
}

TEST_F(DeviceStoreTest, AnUnknownScannerTypeIsRefused) {
  Json::Value result = "as it was";
  EXPECT_NE(NetClient().GetDeviceListData("bluetooth", result), 0);
  EXPECT_EQ(result, Json::Value("as it was"));
}

TEST_F(DeviceStoreTest, TheOwnersWordIsKeptWhateverIsFound) {
  DeviceStore().Write({Laptop()}, {});
  ASSERT_EQ(Set(Edit("D4-3D-7E-11-22-33", "<b>Anna's</b>", "tablet")), 0);
  DeviceStore().Write({Laptop("renamed")}, {});
  DeviceStore().Write({}, {kMac});
  DeviceStore().Write({Laptop("again")}, {});
  const Json::Value list = List();
  ASSERT_EQ(list.size(), 1U);
  EXPECT_EQ(list[0]["userdef_displayName"], "<b>Anna's</b>");
  EXPECT_EQ(list[0]["userdef_deviceType"], "tablet");
  EXPECT_EQ(list[0]["displayName"], "again");
}

TEST_F(DeviceStoreTest, ASecondEditReplacesTheFirst) {
  ASSERT_EQ(Set(Edit(kMac, "one")), 0);
  ASSERT_EQ(Set(Edit(kMac, "")), 0);
  ASSERT_EQ(Set(Edit(kMac, "")), 0);
  ASSERT_EQ(List().size(), 1U);
  EXPECT_EQ(List()[0]["userdef_displayName"], "");
}

TEST_F(DeviceStoreTest, EditsThatCannotBeKeptChangeNothing) {
  ASSERT_EQ(Set(Edit(kMac, "good")), 0);
  EXPECT_NE(Set(Edit("d4:3d:7e:11:22", "bad")), 0);
  EXPECT_NE(Set(Edit("", "bad")), 0);
  EXPECT_NE(Set(Edit("ff:ff:ff:ff:ff:ff", "bad")), 0);
  EXPECT_NE(Set(Edit(kMac, "a\nb")), 0);
  EXPECT_NE(Set(Edit(kMac, "\xff")), 0);
  EXPECT_NE(Set(Edit(kMac, std::string(256, 'a'))), 0);
  EXPECT_NE(Set(Edit(kMac, "name", std::string("a\0b", 3))), 0);
  EXPECT_NE(Set(Json::Value("no record")), 0);
  Json::Value number = Edit(kMac, "name");
  number["userdef_displayName"] = 5;
  EXPECT_NE(Set(number), 0);
  number.removeMember("userdef_displayName");
  EXPECT_NE(Set(number), 0);
  EXPECT_EQ(List()[0]["userdef_displayName"], "good");
}

TEST_F(DeviceStoreTest, AForgottenDeviceTakesTheOwnersWordWithIt) {
  DeviceStore().Write({Laptop()}, {});
  ASSERT_EQ(Set(Edit(kMac, "name")), 0);
  EXPECT_EQ(NetClient().DelDeviceListData("D43D7E112233"), 0);
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  EXPECT_THAT(DeviceStore().OwnerEntries(), IsEmpty());
  EXPECT_NE(NetClient().DelDeviceListData(kMac), 0);
  EXPECT_NE(NetClient().DelDeviceListData("no address"), 0);
}

TEST_F(DeviceStoreTest, TheOwnerCanNameAsManyAsThereCanBe) {
  DeviceStore store;
  vornhost::Database(vornhost::kDeviceStore)
      .Execute("WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < 4095) "
               "INSERT INTO owner SELECT printf('d4:3d:7e:00:%02x:%02x', i / 256, i % 256), 'x', '' FROM n");
  EXPECT_FALSE(store.SetOwner(kMac, {"one too many", ""}));
  EXPECT_TRUE(store.SetOwner("d4:3d:7e:00:00:00", {"renamed", ""}));
  EXPECT_THAT(store.OwnerEntries(), SizeIs(4096));
}

TEST_F(DeviceStoreTest, AReaderSeesWhatAnotherProcessWrites) {
  EXPECT_EQ(List().size(), 0U);
  const pid_t child = fork();
  if (child == 0) {
    DeviceStore().Write({Laptop()}, {});
    _exit(Set(Edit(kMac, "from afar")));
  }
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  ASSERT_EQ(List().size(), 1U);
  EXPECT_EQ(List()[0]["userdef_displayName"], "from afar");
}

TEST_F(DeviceStoreTest, AStoreThatIsReplacedIsReadAnew) {
  ASSERT_EQ(Set(Edit(kMac, "old")), 0);
  EXPECT_EQ(List().size(), 1U);
  hosttest::FreshFolder("/var/lib/vorn");
  EXPECT_EQ(List().size(), 0U);
}

TEST_F(DeviceStoreTest, PresenceComesFromMemory) {
  DeviceStore().Write({Laptop()}, {});
  ASSERT_TRUE(vornhost::WritePresence({{kMac, {vornhost::BootMillis(), vornhost::RadioFigures{-50, 1, 2}}}}));
  EXPECT_EQ(hosttest::StatOf(vornhost::kPresenceFile).st_mode & 07777, 0600U);
  EXPECT_EQ(List()[0]["signalstrength"], -50);
  ASSERT_TRUE(vornhost::WritePresence({{kMac, {vornhost::BootMillis(), vornhost::RadioFigures{-70, 1, 2}}}}));
  EXPECT_EQ(List()[0]["signalstrength"], -70);
  hosttest::WriteText(vornhost::kPresenceFile, "rubbish\n");
  EXPECT_FALSE(List()[0].isMember("signalstrength"));
}

// The two clocks that it is told by do not turn their seconds together.
TEST_F(DeviceStoreTest, ASightHasOneTimeWheneverItIsListed) {
  DeviceStore().Write({Laptop()}, {});
  const int64_t seen = vornhost::BootMillis() - 30000;
  std::set<std::string> times;
  for (int i = 0; i < 24; ++i) {
    ASSERT_TRUE(vornhost::WritePresence({{kMac, {seen, {}}}, {"d4:3d:7e:00:00:01", {seen + i, {}}}}));
    times.insert(List()[0]["asso_time"].asString());
    usleep(50000);
  }
  EXPECT_THAT(times, SizeIs(1));
}

TEST_F(DeviceStoreTest, ANewSightShowsInTheNextList) {
  DeviceStore().Write({Laptop()}, {});
  const int64_t now = vornhost::BootMillis();
  ASSERT_TRUE(vornhost::WritePresence({{kMac, {now - 30000, {}}}}));
  const std::string before = List()[0]["asso_time"].asString();
  EXPECT_EQ(List()[0]["asso_time"].asString(), before);
  ASSERT_TRUE(vornhost::WritePresence({{kMac, {now - 20000, {}}}}));
  const std::string after = List()[0]["asso_time"].asString();
  EXPECT_NE(after, before);
  ASSERT_EQ(Set(Edit(kMac, "named", "nas")), 0);
  EXPECT_EQ(List()[0]["userdef_displayName"], "named");
  EXPECT_EQ(List("arp")[0]["asso_time"].asString(), after);
}

TEST_F(DeviceStoreTest, WhatACallerDoesWithAListIsItsOwnAffair) {
  DeviceStore().Write({Laptop()}, {});
  Json::Value result;
  ASSERT_EQ(NetClient().GetDeviceListData("all", result), 0);
  const Json::Value before = result["ClientList"];
  result["ClientList"][0].clear();
  EXPECT_EQ(List(), before);
}

TEST_F(DeviceStoreTest, TheTimeZoneOfTheListIsTheOneThatIsSetNow) {
  DeviceStore().Write({Laptop()}, {});
  ASSERT_TRUE(vornhost::WritePresence({{kMac, {vornhost::BootMillis(), {}}}}));
  const auto hourIn = [](const char *zone) {
    std::filesystem::remove("/etc/localtime");
    std::filesystem::create_symlink(std::string("/usr/share/zoneinfo/") + zone, "/etc/localtime");
    return List()[0]["asso_time"].asString().substr(0, 2);
  };
  EXPECT_NE(hourIn("Etc/GMT-3"), hourIn("Etc/GMT+4"));
}

// ---- death in the middle

// A process that writes names one after the other, and says which are stored; it is killed at some moment.
TEST_F(DeviceStoreTest, WhateverWasStoredSurvivesAKill) {
  int last = 0;
  for (int round = 0; round < 20; ++round) {
    int told[2];
    ASSERT_EQ(pipe(told), 0);
    const pid_t child = fork();
    if (child == 0) {
      for (int number = last + 1;; ++number) {
        DeviceStore().Write({Laptop(std::to_string(number))}, {});
        if (Set(Edit(kMac, std::to_string(number))) != 0 || write(told[1], &number, sizeof(number)) < 0) {
          _exit(1);
        }
      }
    }
    close(told[1]);
    int stored = 0;
    for (int i = 0; i <= round % 5; ++i) {
      ASSERT_EQ(read(told[0], &stored, sizeof(stored)), static_cast<ssize_t>(sizeof(stored)));
    }
    usleep(static_cast<useconds_t>(round) * 150);
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    while (read(told[0], &stored, sizeof(stored)) > 0) {
    }
    close(told[0]);
    ASSERT_THAT(List(), SizeIs(1));
    const int name = std::stoi(List()[0]["userdef_displayName"].asString());
    EXPECT_TRUE(name == stored || name == stored + 1) << name << " after " << stored;
    const int found = std::stoi(List()[0]["displayName"].asString());
    EXPECT_TRUE(found == name || found == name + 1) << found << " beside " << name;
    last = name;
  }
}

TEST_F(DeviceStoreTest, ManyMayReadAndWriteAtOnce) {
  DeviceStore().Write({Laptop()}, {});
  std::vector<std::thread> threads;
  threads.reserve(6);
  for (int thread = 0; thread < 6; ++thread) {
    threads.emplace_back([thread] {
      for (int i = 0; i < 20; ++i) {
        const std::string mac = "d4:3d:7e:00:00:0" + std::to_string(thread);
        if (thread < 2) {
          EXPECT_EQ(Set(Edit(mac, std::to_string(i))), 0);
        } else {
          EXPECT_GE(List().size(), 1U);
          vornhost::WritePresence({});
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  const Json::Value list = List();
  ASSERT_EQ(list.size(), 3U);
  EXPECT_EQ(list[0]["userdef_displayName"], "19");
  EXPECT_EQ(list[1]["userdef_displayName"], "19");
}

} // namespace
