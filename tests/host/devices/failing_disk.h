// A disk that cannot be read for the moment: SQLite's own file layer, with reading and opening that fail.
#ifndef TESTS_HOST_DEVICES_FAILING_DISK_H
#define TESTS_HOST_DEVICES_FAILING_DISK_H

#include <sqlite3.h>

#include <cstring>

namespace hosttest {

constexpr int kPassingErrors[] = {SQLITE_IOERR_READ, SQLITE_IOERR_NOMEM, SQLITE_NOMEM, SQLITE_CANTOPEN,
                                  SQLITE_IOERR_CORRUPTFS};

/// As long as it lives, files that are opened cannot be read from a place on; with SQLITE_CANTOPEN they cannot be
/// opened.
class FailingDisk {
public:
  explicit FailingDisk(int error, sqlite3_int64 from = 0) : real_(sqlite3_vfs_find(nullptr)), layer_(*real_) {
    sError = error;
    sFrom = from;
    sReal = real_;
    layer_.zName = "failing";
    layer_.pNext = nullptr;
    layer_.xOpen = Open;
    sqlite3_vfs_register(&layer_, 1);
  }
  ~FailingDisk() {
    sqlite3_vfs_unregister(&layer_);
    sqlite3_vfs_register(real_, 1);
  }
  FailingDisk(const FailingDisk &) = delete;
  FailingDisk &operator=(const FailingDisk &) = delete;

private:
  static int Open(sqlite3_vfs *, const char *name, sqlite3_file *file, int flags, int *outFlags) {
    if (sError == SQLITE_CANTOPEN) {
      file->pMethods = nullptr;
      return sError;
    }
    const int result = sReal->xOpen(sReal, name, file, flags, outFlags);
    if (result == SQLITE_OK) {
      sWorking = file->pMethods;
      sMethods = *sWorking;
      sMethods.xRead = [](sqlite3_file *opened, void *buffer, int size, sqlite3_int64 place) {
        return place < sFrom ? sWorking->xRead(opened, buffer, size, place) : sError;
      };
      file->pMethods = &sMethods;
    }
    return result;
  }

  inline static int sError = 0;
  inline static sqlite3_vfs *sReal = nullptr;
  inline static sqlite3_int64 sFrom = 0;
  inline static const sqlite3_io_methods *sWorking = nullptr;
  inline static sqlite3_io_methods sMethods{};
  sqlite3_vfs *real_;
  sqlite3_vfs layer_;
};

} // namespace hosttest

#endif
