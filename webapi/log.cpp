#include "webapi/log.h"

#include <syslog.h>

#include <array>
#include <chrono>
#include <cstdarg>
#include <cstdio>
#include <mutex>

namespace vornwebapi {
namespace {

using Clock = std::chrono::steady_clock;

constexpr int kLinesPerWindow = 10;
constexpr std::chrono::seconds kWindow{10};
constexpr size_t kKinds = static_cast<size_t>(LogKind::kCount);

struct Kind {
  int priority;
  const char *name;
};

constexpr std::array<Kind, kKinds> kKindTable = {{{LOG_INFO, "lifecycle"},
                                                  {LOG_ERR, "module fault"},
                                                  {LOG_WARNING, "connection limit"},
                                                  {LOG_ERR, "descriptor limit"},
                                                  {LOG_WARNING, "slow client"},
                                                  {LOG_WARNING, "refused request"},
                                                  {LOG_WARNING, "busy"},
                                                  {LOG_WARNING, "task limit"},
                                                  {LOG_NOTICE, "login"},
                                                  {LOG_WARNING, "refused login"},
                                                  {LOG_WARNING, "login limit"},
                                                  {LOG_NOTICE, "change"}}};

/// One kind's allowance in the running window.
struct Allowance {
  Clock::time_point since{};
  int written = 0;
  unsigned long leftOut = 0;
};

std::mutex allowanceMutex;
std::array<Allowance, kKinds> allowances; // guarded by allowanceMutex

/// @param[out] leftOut  lines of earlier windows that were held back and are to be told now
bool MayWrite(LogKind kind, unsigned long &leftOut) {
  if (kind == LogKind::kLifecycle) {
    return true;
  }
  const std::lock_guard lock(allowanceMutex);
  Allowance &allowance = allowances[static_cast<size_t>(kind)];
  const Clock::time_point now = Clock::now();
  if (now - allowance.since >= kWindow) {
    leftOut = allowance.leftOut;
    allowance = {now, 0, 0};
  }
  if (allowance.written == kLinesPerWindow) {
    ++allowance.leftOut;
    return false;
  }
  ++allowance.written;
  return true;
}

} // namespace

void OpenLog(bool toStandardError) {
  openlog("vornwebd", LOG_PID | LOG_NDELAY | (toStandardError ? LOG_PERROR : 0), LOG_DAEMON);
}

void Log(LogKind kind, const char *format, ...) {
  unsigned long leftOut = 0;
  if (!MayWrite(kind, leftOut)) {
    return;
  }
  const Kind &entry = kKindTable[static_cast<size_t>(kind)];
  if (leftOut > 0) {
    syslog(entry.priority, "%s: %lu lines left out", entry.name, leftOut);
  }
  std::va_list arguments;
  va_start(arguments, format);
  vsyslog(entry.priority, format, arguments);
  va_end(arguments);
}

std::string Printable(std::string_view text, size_t longest) {
  std::string out;
  for (const char c : text.substr(0, longest)) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte < 0x7f && c != '\\') {
      out += c;
      continue;
    }
    std::array<char, 5> escaped{};
    std::snprintf(escaped.data(), escaped.size(), "\\x%02x", byte);
    out += escaped.data();
  }
  if (text.size() > longest) {
    out += "...";
  }
  return out;
}

} // namespace vornwebapi
