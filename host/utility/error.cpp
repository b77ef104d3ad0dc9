#include "host/utility/error.h"

#include "host/export.h"

#include <cerrno>
#include <cstring>

namespace vornhost {

namespace {

struct LastError {
  int code = QARDC_ERR_NONE;
  const char *file = "";
  int line = 0;
};

thread_local LastError lastError;

const char *BaseName(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash == nullptr ? path : slash + 1;
}

} // namespace

int SetError(int code, const char *file, int line) {
  lastError = {code, BaseName(file), line};
  return -1;
}

int CodeOfErrno(int number) {
  switch (number) {
  case ENOENT:
  case ENOTDIR:
    return QARDC_ERR_NOT_FOUND;
  case EACCES:
  case EPERM:
  case EROFS:
  case ELOOP:
    return QARDC_ERR_ACCESS;
  case ENOMEM:
    return QARDC_ERR_NO_MEMORY;
  case ENAMETOOLONG:
    return QARDC_ERR_BAD_ARGUMENT;
  default:
    return QARDC_ERR_IO;
  }
}

int SetErrno(int number, const char *file, int line) {
  return SetError(CodeOfErrno(number), file, line);
}

} // namespace vornhost

using vornhost::lastError;

VORN_EXPORT int QARDCErrGet(void) {
  return lastError.code;
}

VORN_EXPORT const char *QARDCErrorGetFile(void) {
  return lastError.file;
}

VORN_EXPORT int QARDCErrorGetLine(void) {
  return lastError.line;
}
