#include "host/timecontrol/restore.h"

#include "host/utility/atomic_file.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "platform/schedule.h"
#include "platform/utility.h"

#include <cstdio>
#include <cstring>
#include <memory>

namespace vornhost {

namespace {

constexpr char kUserRules[] = "/etc/parental/timectrl.ui.conf";
constexpr char kEnforcedRules[] = "/etc/parental/timectrl.conf";
constexpr char kEnforcedCopy[] = "/tmp/timectrl.conf";
constexpr char kProgram[] = "/usr/vorn/sbin/vorntimecontrol";
constexpr char kProgramCopy[] = "/tmp/vorntimecontrol";
constexpr size_t kRoom = 1024;
constexpr char kCommand[] = "/tmp/vorntimecontrol --schedule";

struct HashFree {
  void operator()(QARDCSzHash *hash) const { QARDCSzHashFree(hash); }
};
struct ListFree {
  void operator()(QARDCSzList *list) const { QARDCSzListFree(list); }
};

int ScheduleEveryHour() {
  VORNScheduleRecord record{};
  record.weekdays = 127;
  record.intervalHours = 1;
  record.lastHour = 23;
  std::snprintf(record.command, sizeof(record.command), "%s", kCommand);
  return VORNScheduleSet(&record, 0);
}

int Check(int result, const char *what) {
  if (result < 0) {
    LogError("time control: %s: error 0x%04X", what, static_cast<unsigned>(QARDCErrGet()));
  }
  return result;
}

// The rules that are on, exactly as a set over the web API makes them: of two sections with one name the first is read
// twice, and a key that a section lacks keeps the value of the section before.
int MakeRules() {
  const std::unique_ptr<QARDCSzList, ListFree> sections(QARDCSzListAlloc(kRoom));
  const std::unique_ptr<QARDCSzHash, HashFree> pairs(QARDCSzHashAlloc(kRoom));
  if (!sections || !pairs) {
    return -1;
  }
  const int count = QARDCFileExist(kUserRules) == 1 ? QARDCFileEnumSection(kUserRules, sections.get()) : 0;
  for (int i = 0; i < count; ++i) {
    const char *section = QARDCSzListGet(sections.get(), i);
    if (QARDCFileGetSection(kUserRules, section, pairs.get()) <= 0) {
      LogError("time control: rule [%s] cannot be read, it is left out", LogText(section).c_str());
      continue;
    }
    const char *enabled = QARDCSzHashRemoveKey(pairs.get(), "tcenable");
    if (enabled != nullptr && std::strcmp(enabled, "yes") == 0 &&
        QARDCFileAddSection(kEnforcedRules, section, pairs.get(), "\t%s=%s\n") < 0) {
      return -1;
    }
  }
  return count;
}

int StartFiles() {
  const ProgramRunner runner;
  if (Check(runner.Run({"/bin/cp", "-f", kEnforcedRules, kEnforcedCopy}), kEnforcedCopy) < 0 ||
      Check(runner.Run({"/bin/cp", "-f", kProgram, kProgramCopy}), kProgramCopy) < 0) {
    return -1;
  }
  return Check(ScheduleEveryHour(), kCommand);
}

int RemoveFiles() {
  int result = Check(VORNScheduleRemove(kCommand), kCommand);
  for (const char *path : {kEnforcedRules, kEnforcedCopy, kProgramCopy}) {
    result = Check(RemoveFile(path), path) < 0 ? -1 : result;
  }
  return result;
}

} // namespace

int RestoreFiles(bool &enforce) {
  // What lies there is from before the restart, or somebody else's: it must neither be used nor be run by the
  // scheduler.
  const int removed = RemoveFiles();
  if (removed < 0 || Check(MakeRules(), kUserRules) < 0) {
    return -1;
  }
  enforce = QARDCFileExist(kEnforcedRules) == 1;
  return enforce ? StartFiles() : 0;
}

} // namespace vornhost
