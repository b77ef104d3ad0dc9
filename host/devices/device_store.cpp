#include "host/devices/device_store.h"

#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <unordered_map>

namespace vornhost {

namespace {

constexpr int kSchema = 1;

constexpr char kTables[] = R"(
CREATE TABLE IF NOT EXISTS device (mac TEXT PRIMARY KEY, ip TEXT NOT NULL, netif TEXT NOT NULL,
  connection TEXT NOT NULL, manufacturer TEXT NOT NULL, sources INTEGER NOT NULL, last_seen INTEGER NOT NULL) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS finding (mac TEXT, source INTEGER, name TEXT NOT NULL, type TEXT NOT NULL, model TEXT NOT NULL,
  PRIMARY KEY (mac, source)) WITHOUT ROWID;
CREATE TABLE IF NOT EXISTS owner (mac TEXT PRIMARY KEY, name TEXT NOT NULL, type TEXT NOT NULL) WITHOUT ROWID;
PRAGMA user_version = 1;
)";

// SQLite gives the files beside the store the store's own mode. The file is made without being opened: closing it would
// take away the locks that this process's other connections have on it (POSIX record locks).
std::string PreparedFile() {
  mkdir(kStateFolder, 0700);
  const UniqueFd folder(open(kStateFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW));
  if (!folder.IsOpen() || fchmod(folder.Get(), 0700) != 0) {
    throw DatabaseError(std::string(kStateFolder) + ": " + std::strerror(errno));
  }
  mknod(kDeviceStore, S_IFREG | 0600, 0);
  struct stat info {};
  if (lstat(kDeviceStore, &info) != 0 || !S_ISREG(info.st_mode)) { // a link would let its owner choose the file
    throw DatabaseError(std::string(kDeviceStore) + " is no file");
  }
  return kDeviceStore;
}

Device DeviceOf(const Statement &row) {
  Device device;
  device.mac = row.Text(0);
  device.ip = row.Text(1);
  device.netif = row.Text(2);
  device.connection = row.Text(3);
  device.manufacturer = row.Text(4);
  device.sources = static_cast<unsigned>(row.Number(5));
  device.lastSeen = row.Number(6);
  return device;
}

class DeviceWriter {
public:
  explicit DeviceWriter(Database &database)
      : device_(database, "INSERT OR REPLACE INTO device VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)"),
        finding_(database,
                 "INSERT INTO finding VALUES (?1, ?2, ?3, ?4, ?5) ON CONFLICT DO UPDATE SET name = excluded.name, "
                 "type = excluded.type, model = excluded.model WHERE (name, type, model) IS NOT "
                 "(excluded.name, excluded.type, excluded.model)") {}

  void Write(const Device &device) {
    device_.Bind(1, device.mac).Bind(2, device.ip).Bind(3, device.netif).Bind(4, device.connection);
    device_.Bind(5, device.manufacturer).Bind(6, static_cast<int64_t>(device.sources)).Bind(7, device.lastSeen).Run();
    for (size_t source = 0; source < kSourceCount; ++source) {
      const Finding &finding = device.findings[source];
      if (!finding.IsEmpty()) {
        finding_.Bind(1, device.mac).Bind(2, static_cast<int64_t>(source)).Bind(3, finding.name);
        finding_.Bind(4, finding.type).Bind(5, finding.model).Run();
      }
    }
  }

private:
  Statement device_;
  Statement finding_;
};

} // namespace

DeviceStore::DeviceStore() : database_(PreparedFile()) {
  Prepare();
}

void DeviceStore::Prepare() {
  // In this mode readers never wait, and whoever dies leaves the last whole transaction.
  database_.Execute("PRAGMA journal_mode = WAL; PRAGMA wal_autocheckpoint = 256");
  const auto schema = [this] {
    Statement version(database_, "PRAGMA user_version");
    return version.Step() ? version.Number(0) : 0;
  };
  if (schema() == 0) {
    Transaction transaction(database_);
    database_.Execute(kTables);
    transaction.Commit();
  }
  if (schema() != kSchema) {
    throw DatabaseError(std::string(kDeviceStore) + " is of another version");
  }
}

std::vector<Device> DeviceStore::Devices() {
  std::vector<Device> devices;
  std::unordered_map<std::string, size_t> places;
  Statement rows(database_,
                 "SELECT mac, ip, netif, connection, manufacturer, sources, last_seen FROM device ORDER BY mac");
  while (rows.Step()) {
    devices.push_back(DeviceOf(rows));
    places[devices.back().mac] = devices.size() - 1;
  }
  Statement findings(database_, "SELECT mac, source, name, type, model FROM finding");
  while (findings.Step()) {
    const auto place = places.find(findings.Text(0));
    const auto source = static_cast<size_t>(findings.Number(1));
    if (place != places.end() && source < kSourceCount) {
      devices[place->second].findings[source] = {findings.Text(2), findings.Text(3), findings.Text(4)};
    }
  }
  return devices;
}

std::map<std::string, OwnerEntry> DeviceStore::OwnerEntries() {
  std::map<std::string, OwnerEntry> entries;
  Statement rows(database_, "SELECT mac, name, type FROM owner");
  while (rows.Step()) {
    entries[rows.Text(0)] = {rows.Text(1), rows.Text(2)};
  }
  return entries;
}

void DeviceStore::Write(const std::vector<Device> &changed, const std::vector<std::string> &forgotten) {
  database_.Execute("PRAGMA synchronous = NORMAL"); // what is lost with the power is found again
  Transaction transaction(database_);
  DeviceWriter writer(database_);
  for (const Device &device : changed) {
    writer.Write(device);
  }
  for (const std::string &mac : forgotten) {
    Statement(database_, "DELETE FROM device WHERE mac = ?1").Bind(1, mac).Run();
    Statement(database_, "DELETE FROM finding WHERE mac = ?1").Bind(1, mac).Run();
  }
  transaction.Commit();
}

bool DeviceStore::SetOwner(const std::string &mac, const OwnerEntry &entry) {
  database_.Execute("PRAGMA synchronous = FULL");
  Transaction transaction(database_);
  Statement write(database_, "INSERT OR REPLACE INTO owner VALUES (?1, ?2, ?3)");
  write.Bind(1, mac).Bind(2, entry.name).Bind(3, entry.type).Run();
  Statement count(database_, "SELECT count(*) FROM owner");
  if (!count.Step() || count.Number(0) > static_cast<int64_t>(kDeviceLimit)) {
    return false;
  }
  count.Run();
  transaction.Commit();
  return true;
}

bool DeviceStore::Forget(const std::string &mac) {
  database_.Execute("PRAGMA synchronous = FULL");
  Transaction transaction(database_);
  int removed = 0;
  for (const char *sql : {"DELETE FROM device WHERE mac = ?1", "DELETE FROM finding WHERE mac = ?1",
                          "DELETE FROM owner WHERE mac = ?1"}) {
    Statement(database_, sql).Bind(1, mac).Run();
    removed += database_.Changes();
  }
  transaction.Commit();
  return removed > 0;
}

} // namespace vornhost
