#include "host/utility/log.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>

namespace vornhost {

namespace {

void Write(int level, const char *format, va_list arguments) {
  char line[1024];
  // NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized): a false alarm of clang-tidy 14
  if (vsnprintf(line, sizeof(line), format, arguments) >= 0) {
    syslog(level, "%s", line);
  }
}

} // namespace

void LogError(const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Write(LOG_ERR, format, arguments);
  va_end(arguments);
}

void LogWarning(const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Write(LOG_WARNING, format, arguments);
  va_end(arguments);
}

void LogInfo(const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Write(LOG_INFO, format, arguments);
  va_end(arguments);
}

std::string LogText(std::string_view text, size_t limit) {
  std::string out(text.substr(0, limit));
  for (char &byte : out) {
    if (byte < 0x20 || byte > 0x7e) {
      byte = '?';
    }
  }
  return out;
}

} // namespace vornhost
