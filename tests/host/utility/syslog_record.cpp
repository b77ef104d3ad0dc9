// Stands in the place of the C library's syslog for the test program that links it.
#include "tests/host/utility/syslog_record.h"

#include <cstdarg>
#include <cstdio>
#include <mutex>
#include <utility>

namespace {

std::mutex mutex;
std::vector<std::string> lines;

void Keep(int level, const char *format, va_list arguments) {
  char text[4096];
  // NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized): a false alarm of clang-tidy 14
  std::vsnprintf(text, sizeof(text), format, arguments);
  const std::lock_guard lock(mutex);
  lines.push_back(std::to_string(level) + " " + text);
}

} // namespace

extern "C" void syslog(int level, const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Keep(level, format, arguments);
  va_end(arguments);
}

// What syslog is called when the C library's own checks are compiled in.
extern "C" void __syslog_chk(int level, int /*flag*/, const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Keep(level, format, arguments);
  va_end(arguments);
}

namespace hosttest {

std::vector<std::string> TakeLogLines() {
  const std::lock_guard lock(mutex);
  return std::exchange(lines, {});
}

} // namespace hosttest
