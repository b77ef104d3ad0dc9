#include "host/devices/device_store.h"

#include "host/devices/damaged_store.h"
#include "host/devices/device_text.h"
#include "host/devices/mac_address.h"
#include "host/utility/file_turn.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <initializer_list>
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

// A turn at the store lasts for a few reads and writes.
constexpr char kStoreTurn[] = "/var/lib/vorn/devices.lock";
constexpr std::chrono::seconds kTurnLimit{10};

UniqueFd TakeStoreTurn() {
  mkdir(kStateFolder, 0700);
  const UniqueFd folder(open(kStateFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW));
  if (!folder.IsOpen() || fchmod(folder.Get(), 0700) != 0) {
    throw DatabaseError(std::string(kStateFolder) + ": " + std::strerror(errno));
  }
  try {
    return TakeFileTurn(kStoreTurn, kTurnLimit);
  } catch (const std::exception &error) {
    throw DatabaseError(error.what());
  }
}

// SQLite gives the files beside the store the store's own mode. The file is made without being opened: closing it would
// take away the locks that this process's other connections have on it (POSIX record locks).
struct stat PreparedFile() {
  struct stat info {};
  if (lstat(kDeviceStore, &info) != 0 && errno == ENOENT) {
    BringStore();
    lstat(kDeviceStore, &info);
  }
  if (!S_ISREG(info.st_mode)) { // a link would let its owner choose the file
    throw DatabaseError(std::string(kDeviceStore) + " is no file");
  }
  if (info.st_uid != geteuid()) {
    throw DatabaseError(std::string(kDeviceStore) + " is somebody else's");
  }
  if (info.st_size == 0 && PutAsideCutStore()) {
    lstat(kDeviceStore, &info);
  }
  return info;
}

int64_t NumberOf(Database &database, const char *question) {
  Statement answer(database, question);
  return answer.Step() ? answer.Number(0) : 0;
}

constexpr char kReadDevices[] =
    "SELECT mac, ip, netif, connection, manufacturer, sources, last_seen FROM device ORDER BY mac";
constexpr char kReadFindings[] = "SELECT mac, source, name, type, model FROM finding";
constexpr char kReadOwner[] = "SELECT mac, name, type FROM owner";

void Prepare(Database &database) {
  constexpr char kVersion[] = "PRAGMA user_version";
  database.CheckForm(); // before anything is written: what is put aside is as it was found
  if (NumberOf(database, kVersion) == 0) {
    if (NumberOf(database, "SELECT count(*) FROM sqlite_schema") != 0) {
      throw DamagedDatabase("device store: it is another database");
    }
    Transaction transaction(database);
    database.Execute(kTables);
    transaction.Commit();
  }
  if (NumberOf(database, kVersion) != kSchema) { // of a later version of the platform, which will need it again
    throw DatabaseError(std::string(kDeviceStore) + " is of another version");
  }
  for (const char *read : {kReadDevices, kReadFindings, kReadOwner}) {
    Statement(database, read).Step();
  }
  // In this mode readers never wait, and whoever dies leaves the last whole transaction.
  database.Execute("PRAGMA journal_mode = WAL; PRAGMA wal_autocheckpoint = 256");
  NumberOf(database, kVersion); // opens the journal: by its name, so within the turn
}

bool AreClean(const Statement &row, std::initializer_list<int> columns) {
  return std::all_of(columns.begin(), columns.end(), [&row](int column) { return IsCleanText(row.Text(column)); });
}

bool IsDevices(const Statement &row) {
  return ParseDeviceMac(row.Text(0)) == row.Text(0);
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

DeviceStore::DeviceStore() : opened_(Open()) {}

DeviceStore::Opened DeviceStore::Open() {
  const UniqueFd turn = TakeStoreTurn();
  return OpenInTurn();
}

DeviceStore::Opened DeviceStore::OpenInTurn() {
  for (bool again = false;; again = true) {
    const struct stat file = PreparedFile();
    Opened opened{Database(kDeviceStore), file.st_dev, file.st_ino};
    try {
      Prepare(opened.database);
      return opened;
    } catch (const DamagedDatabase &damage) {
      if (again) {
        throw;
      }
      ReplaceDamagedStore(opened.database, kTables, damage.what());
    }
  }
}

bool DeviceStore::IsCurrent() const {
  struct stat info {};
  return lstat(kDeviceStore, &info) == 0 && info.st_dev == opened_.device && info.st_ino == opened_.node;
}

UniqueFd DeviceStore::TakeTurnForEdit() {
  UniqueFd turn = TakeStoreTurn();
  if (!IsCurrent()) {
    opened_ = OpenInTurn();
  }
  return turn;
}

std::vector<Device> DeviceStore::Devices() {
  std::vector<Device> devices;
  std::unordered_map<std::string, size_t> places;
  Statement rows(opened_.database, kReadDevices);
  while (rows.Step()) {
    if (IsDevices(rows) && AreClean(rows, {1, 2, 3, 4})) {
      devices.push_back(DeviceOf(rows));
      places[devices.back().mac] = devices.size() - 1;
    }
  }
  Statement findings(opened_.database, kReadFindings);
  while (findings.Step()) {
    const auto place = places.find(findings.Text(0));
    const auto source = static_cast<size_t>(findings.Number(1));
    if (place != places.end() && source < kSourceCount && AreClean(findings, {2, 3, 4})) {
      devices[place->second].findings[source] = {findings.Text(2), findings.Text(3), findings.Text(4)};
    }
  }
  return devices;
}

std::map<std::string, OwnerEntry> DeviceStore::OwnerEntries() {
  std::map<std::string, OwnerEntry> entries;
  Statement rows(opened_.database, kReadOwner);
  while (rows.Step()) {
    if (IsDevices(rows) && AreClean(rows, {1, 2})) {
      entries[rows.Text(0)] = {rows.Text(1), rows.Text(2)};
    }
  }
  return entries;
}

void DeviceStore::Write(const std::vector<Device> &changed, const std::vector<std::string> &forgotten) {
  opened_.database.Execute("PRAGMA synchronous = NORMAL"); // what is lost with the power is found again
  Transaction transaction(opened_.database);
  DeviceWriter writer(opened_.database);
  for (const Device &device : changed) {
    writer.Write(device);
  }
  for (const std::string &mac : forgotten) {
    Statement(opened_.database, "DELETE FROM device WHERE mac = ?1").Bind(1, mac).Run();
    Statement(opened_.database, "DELETE FROM finding WHERE mac = ?1").Bind(1, mac).Run();
  }
  transaction.Commit();
}

bool DeviceStore::SetOwner(const std::string &mac, const OwnerEntry &entry) {
  const UniqueFd turn = TakeTurnForEdit();
  opened_.database.Execute("PRAGMA synchronous = FULL");
  Transaction transaction(opened_.database);
  Statement write(opened_.database, "INSERT OR REPLACE INTO owner VALUES (?1, ?2, ?3)");
  write.Bind(1, mac).Bind(2, entry.name).Bind(3, entry.type).Run();
  Statement count(opened_.database, "SELECT count(*) FROM owner");
  if (!count.Step() || count.Number(0) > static_cast<int64_t>(kDeviceLimit)) {
    return false;
  }
  count.Run();
  transaction.Commit();
  return true;
}

bool DeviceStore::Forget(const std::string &mac) {
  const UniqueFd turn = TakeTurnForEdit();
  opened_.database.Execute("PRAGMA synchronous = FULL");
  Transaction transaction(opened_.database);
  int removed = 0;
  for (const char *sql : {"DELETE FROM device WHERE mac = ?1", "DELETE FROM finding WHERE mac = ?1",
                          "DELETE FROM owner WHERE mac = ?1"}) {
    Statement(opened_.database, sql).Bind(1, mac).Run();
    removed += opened_.database.Changes();
  }
  transaction.Commit();
  return removed > 0;
}

} // namespace vornhost
