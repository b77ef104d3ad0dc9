#include "host/devices/damaged_store.h"

#include "host/devices/device.h"
#include "host/devices/device_store.h"
#include "host/devices/mac_address.h"
#include "host/utility/log.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>

namespace vornhost {

namespace {

constexpr char kNewStore[] = "/var/lib/vorn/devices.db.new";
constexpr char kJournal[] = "-wal";
constexpr int kKept = 3;

// The youngest first.
std::string AsideName(int age) {
  return std::string(kDeviceStore) + ".damaged" + (age == 0 ? "" : "." + std::to_string(age));
}

bool IsThere(const std::string &path) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0;
}

void Move(const std::string &from, const std::string &to) {
  if (std::rename(from.c_str(), to.c_str()) != 0 && errno != ENOENT) {
    throw DatabaseError(from + " to " + to + ": " + std::strerror(errno));
  }
}

// Those that are there move up until one fills a gap or falls out.
void MakeRoom() {
  int gap = 0;
  while (gap < kKept - 1 && IsThere(AsideName(gap))) {
    ++gap;
  }
  for (int age = gap; age > 0; --age) {
    std::remove((AsideName(age) + kJournal).c_str());
    Move(AsideName(age - 1), AsideName(age));
    Move(AsideName(age - 1) + kJournal, AsideName(age) + kJournal);
  }
  std::remove((AsideName(0) + kJournal).c_str());
}

struct Table {
  const char *name;
  const char *read;
  const char *key;
  const char *write;
  int columns;
  int64_t limit; // of rows: a damaged tree may lead in circles
};

constexpr int64_t kRows = kDeviceLimit;
constexpr Table kRescued[] = {
    {"owner", "SELECT mac, name, type FROM owner", "mac", "INSERT OR IGNORE INTO owner VALUES (?1, ?2, ?3)", 3, kRows},
    {"device", "SELECT mac, ip, netif, connection, manufacturer, sources, last_seen FROM device", "mac",
     "INSERT OR IGNORE INTO device VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)", 7, kRows},
    {"finding", "SELECT mac, source, name, type, model FROM finding", "mac, source",
     "INSERT OR IGNORE INTO finding VALUES (?1, ?2, ?3, ?4, ?5)", 5, kRows *kSourceCount},
};

// Up to the first page that cannot be read.
int CopyRows(Database &from, const Table &table, const char *order, Statement &write, Database &to) {
  int copied = 0;
  try {
    Statement rows(from, (std::string(table.read) + " ORDER BY " + order).c_str());
    for (int64_t row = 0; row < table.limit && rows.Step(); ++row) {
      if (ParseDeviceMac(rows.Text(0)) != rows.Text(0)) {
        continue;
      }
      for (int column = 0; column < table.columns; ++column) {
        write.Bind(column + 1, rows.Text(column));
      }
      write.Run();
      copied += to.Changes();
    }
  } catch (const DamagedDatabase &) { // NOLINT(bugprone-empty-catch): the rows behind it come from the other end
  }
  return copied;
}

// From both ends, so that one page does not hide those behind it.
int CopyTable(Database &from, const Table &table, Database &to) {
  Statement write(to, table.write);
  std::string backwards = table.key;
  for (size_t comma = 0; (comma = backwards.find(',', comma)) != std::string::npos; comma += sizeof(" DESC,") - 1) {
    backwards.insert(comma, " DESC");
  }
  const int copied = CopyRows(from, table, table.key, write, to);
  return copied + CopyRows(from, table, (backwards + " DESC").c_str(), write, to);
}

// @return how many of the owner's entries are in it
int BuildNewStore(Database &damaged, const char *tables) {
  std::remove(kNewStore); // of a try that failed
  mknod(kNewStore, S_IFREG | 0600, 0);
  Database fresh(kNewStore);
  fresh.Execute("PRAGMA journal_mode = MEMORY; PRAGMA synchronous = FULL"); // nobody uses it before it is whole
  Transaction transaction(fresh);
  fresh.Execute(tables);
  int names = 0;
  for (const Table &table : kRescued) {
    const int copied = CopyTable(damaged, table, fresh);
    names += &table == kRescued ? copied : 0;
  }
  transaction.Commit();
  return names;
}

} // namespace

void ReplaceDamagedStore(Database &damaged, const char *tables, const std::string &reason) {
  const int names = BuildNewStore(damaged, tables);
  MakeRoom();
  Move(kDeviceStore, AsideName(0));
  BringStore();
  LogWarning("the device store was damaged (%s): it is kept as %s, a new one has %d of the owner's names",
             LogText(reason).c_str(), AsideName(0).c_str(), names);
}

bool PutAsideCutStore() {
  std::error_code absent;
  const auto size = std::filesystem::file_size(std::string(kDeviceStore) + kJournal, absent);
  if (absent || size == 0) {
    return false;
  }
  MakeRoom();
  Move(kDeviceStore, AsideName(0));
  BringStore();
  LogWarning("the device store was cut to nothing: its journal is kept as %s%s", AsideName(0).c_str(), kJournal);
  return true;
}

void BringStore() {
  Move(std::string(kDeviceStore) + kJournal, AsideName(0) + kJournal);
  for (const char *companion : {"-shm", "-journal"}) { // a new store makes its own
    std::remove((std::string(kDeviceStore) + companion).c_str());
  }
  Move(kNewStore, kDeviceStore);
  if (!IsThere(kDeviceStore)) {
    mknod(kDeviceStore, S_IFREG | 0600, 0);
  }
  const UniqueFd folder(open(kStateFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  fsync(folder.Get());
}

} // namespace vornhost
