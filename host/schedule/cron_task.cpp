#include "host/schedule/cron_task.h"

#include "host/export.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/log.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>

namespace vornhost {

namespace {

constexpr char kFolder[] = "/etc/cron.d/";
constexpr char kHeader[] = "# Written by the router's scheduler; changes are lost.\n";
constexpr char kRunner[] = "/usr/vorn/sbin/vornrun "; // runs only what is root's: a command may lie in /tmp
constexpr size_t kCommandLimit = 960;                 // cron's MAX_COMMAND is 1000
constexpr size_t kNameLimit = 100;
constexpr int kEveryDay = 127;

// Not for secrets: it keeps two commands apart whose names would be the same (FNV-1a).
std::string HashOf(const std::string &text) {
  uint64_t hash = 0xcbf29ce484222325U;
  for (const char byte : text) {
    hash = (hash ^ static_cast<unsigned char>(byte)) * 0x100000001b3U;
  }
  char out[17];
  std::snprintf(out, sizeof(out), "%016llx", static_cast<unsigned long long>(hash));
  return out;
}

bool IsAlphanumeric(char byte) {
  return (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') || (byte >= 'a' && byte <= 'z');
}

std::string HoursOf(const VORNScheduleRecord &record) {
  if (record.startHour == 0 && record.lastHour == 23 && record.intervalHours == 1) {
    return "*"; // to cron this is more than 0-23: such a task also runs in hours that come again when a clock is set
                // back
  }
  std::string hours = std::to_string(record.startHour);
  if (record.lastHour > record.startHour) {
    hours.append("-").append(std::to_string(record.lastHour));
    hours.append("/").append(std::to_string(record.intervalHours));
  }
  return hours;
}

std::string DaysOf(int32_t weekdays) {
  if (weekdays == kEveryDay) {
    return "*";
  }
  std::string days;
  for (int day = 0; day < 7; ++day) {
    if ((weekdays >> day & 1) != 0) {
      days.append(days.empty() ? "" : ",").append(std::to_string(day));
    }
  }
  return days;
}

bool IsInRange(const VORNScheduleRecord &record) {
  return record.weekdays > 0 && record.weekdays <= kEveryDay && record.startHour >= 0 &&
         record.lastHour >= record.startHour && record.lastHour <= 23 && record.intervalHours >= 1 &&
         record.intervalHours <= 24 && record.reserved[0] == 0 && record.reserved[1] == 0;
}

// An empty file is nobody's.
bool MayReplace(const std::string &content) {
  return content.empty() || content.compare(0, sizeof(kHeader) - 1, kHeader) == 0;
}

// Cron reads a file only when it is root's and nobody else may write it; one of ours that it would pass over is made
// anew.
int RemoveUnreadable(const std::string &path) {
  struct stat info {};
  std::string content;
  if (lstat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode) ||
      (info.st_uid == 0 && (info.st_mode & 07777U) == 0644U) || ReadWholeFile(path.c_str(), content) != 0 ||
      !MayReplace(content)) {
    return 0;
  }
  return RemoveFile(path.c_str());
}

int Set(const VORNScheduleRecord &record) {
  const auto content = RenderTask(record);
  if (!content) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const std::string path = CronFileOf(record.command);
  if (RemoveUnreadable(path) != 0) {
    return -1;
  }
  return ChangeFile(path.c_str(), [&content](const std::string &old, std::string &fresh) {
    fresh = *content;
    return MayReplace(old) ? 0 : SetError(QARDC_ERR_ACCESS);
  });
}

int Remove(const std::string &command) {
  const std::string path = CronFileOf(command);
  std::string content;
  if (ReadWholeFile(path.c_str(), content) != 0) {
    return QARDCErrGet() == QARDC_ERR_NOT_FOUND ? 0 : -1;
  }
  return MayReplace(content) ? RemoveFile(path.c_str()) : SetError(QARDC_ERR_ACCESS);
}

} // namespace

bool IsPlainCommand(const std::string &command) {
  const bool plain = std::all_of(command.begin(), command.end(), [](char byte) {
    return IsAlphanumeric(byte) || std::strchr(" /._-+=,:@", byte) != nullptr;
  });
  return plain && !command.empty() && command.front() == '/' && command.size() <= kCommandLimit;
}

std::string CronFileOf(const std::string &command) {
  std::string name = command.substr(0, kNameLimit);
  std::replace_if(
      name.begin(), name.end(), [](char byte) { return !IsAlphanumeric(byte); }, '_');
  std::string path = kFolder;
  return path.append("vorn").append(name).append("_").append(HashOf(command));
}

std::optional<std::string> RenderTask(const VORNScheduleRecord &record) {
  const size_t length = strnlen(record.command, sizeof(record.command));
  const std::string command(record.command, length);
  if (length == sizeof(record.command) || !IsPlainCommand(command) || !IsInRange(record)) {
    return {};
  }
  std::string content = kHeader;
  content.append("0 ").append(HoursOf(record)).append(" * * ").append(DaysOf(record.weekdays));
  return content.append(" root ").append(kRunner).append(command).append("\n");
}

} // namespace vornhost

VORN_EXPORT int VORNScheduleSet(const VORNScheduleRecord *record, int flags) {
  return vornhost::Guarded(-1, [&record, &flags] {
    if (record == nullptr || flags != 0) {
      return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    return vornhost::Set(*record);
  });
}

VORN_EXPORT int VORNScheduleRemove(const char *command) {
  return vornhost::Guarded(-1, [&command] {
    return command == nullptr ? vornhost::SetError(QARDC_ERR_BAD_ARGUMENT) : vornhost::Remove(command);
  });
}
