// The file tests of the contract, and removing.
#include "host/export.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"

#include <sys/stat.h>

VORN_EXPORT int QARDCFileExist(const char *path) {
  struct stat info {};
  // Not followed: a link that points nowhere is something of that name.
  return path != nullptr && lstat(path, &info) == 0 ? 1 : 0;
}

VORN_EXPORT int QARDCFileCheckDir(const char *path) {
  struct stat info {};
  return path != nullptr && stat(path, &info) == 0 && S_ISDIR(info.st_mode) ? 1 : 0;
}

VORN_EXPORT int QARDCSysUnlink(const char *path) {
  return vornhost::Guarded(-1, [&path] {
    if (path == nullptr || *path == '\0') {
      return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    return vornhost::RemoveFile(path);
  });
}
