#include "tests/host/devices/damaged_store_scene.h"

#include "host/devices/database.h"
#include "host/devices/device_store.h"
#include "host/devices/mac_address.h"
#include "platform/netclient.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <syslog.h>

#include <algorithm>
#include <array>

namespace hosttest {

using testing::Contains;
using testing::HasSubstr;
using testing::Not;
using vornhost::DatabaseError;
using vornhost::Device;
using vornhost::DeviceStore;
using vornhost::kDeviceStore;
using vornnetwork::dbus::NetClient;

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

void Settle() {
  vornhost::Database(kDeviceStore).Execute("PRAGMA wal_checkpoint(TRUNCATE); PRAGMA journal_mode = DELETE");
}

std::string Overwritten(std::string content, size_t from, size_t count, char byte) {
  for (size_t i = from; i < std::min(from + count, content.size()); ++i) {
    content[i] = byte;
  }
  return content;
}

std::string FullStore(int count) {
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

std::string LogSoFar() {
  constexpr char kMark[] = "so far";
  syslog(LOG_INFO, "%s", kMark);
  std::string log;
  EXPECT_TRUE(Eventually(20000, [&log, kMark] {
    log += TakeSystemLog();
    return log.find(kMark) != std::string::npos;
  }));
  const size_t lineBefore = log.rfind('\n', log.find(kMark));
  return lineBefore == std::string::npos ? "" : log.substr(0, lineBefore + 1);
}

void DamagedStore::SetUpTestSuite() {
  OpenSystemLog();
}

DamagedStore::DamagedStore() {
  FreshFolder("/var/lib/vorn");
  std::filesystem::remove_all("/run/vorn");
  LogSoFar();
}

void DamagedStore::ExpectPutAside(const std::string &content) {
  EXPECT_EQ(List(), Json::Value(Json::arrayValue));
  ExpectKept(content);
  ASSERT_EQ(Name(kMac, "new"), 0);
  EXPECT_EQ(List()[0]["userdef_displayName"], "new");
  EXPECT_EQ(ReadText(kAside), content);
}

void DamagedStore::ExpectKept(const std::string &content) {
  EXPECT_EQ(ReadText(kAside), content);
  const std::string log = LogSoFar();
  EXPECT_EQ(Lines(log), 1U) << log;
  EXPECT_THAT(log, HasSubstr(kAside));
  EXPECT_THAT(log, HasSubstr("<4>"));
}

void DamagedStore::ExpectRefused() {
  const std::vector<std::string> names = NamesIn("/var/lib/vorn");
  EXPECT_THROW(DeviceStore(), DatabaseError);
  Json::Value result = "as it was";
  EXPECT_NE(NetClient().GetDeviceListData("all", result), 0);
  EXPECT_NE(Name(kMac, "name"), 0);
  EXPECT_THAT(NamesIn("/var/lib/vorn"), Not(Contains(HasSubstr("damaged"))));
}

} // namespace hosttest
