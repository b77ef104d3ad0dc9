#include "host/timecontrol/restore.h"

#include "host/utility/atomic_file.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "platform/schedule.h"
#include "platform/utility.h"

#include <cstdio>

namespace vornhost {

namespace {

constexpr char kUserRules[] = "/etc/parental/timectrl.ui.conf";
constexpr char kEnforcedRules[] = "/etc/parental/timectrl.conf";
constexpr char kEnforcedCopy[] = "/tmp/timectrl.conf";
constexpr char kProgram[] = "/usr/vorn/sbin/vorntimecontrol";
constexpr char kProgramCopy[] = "/tmp/vorntimecontrol";
constexpr char kCommand[] = "/tmp/vorntimecontrol --schedule";

int Write(const char *path, const std::string &content) {
  return ChangeFile(path, [&content](const std::string &, std::string &fresh) {
    fresh = content;
    return 0;
  });
}

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

int MakeFiles(const std::string &enforced) {
  if (Check(Write(kEnforcedRules, enforced), kEnforcedRules) < 0 ||
      Check(Write(kEnforcedCopy, enforced), kEnforcedCopy) < 0 ||
      Check(ProgramRunner().Run({"/bin/cp", "-f", kProgram, kProgramCopy}), kProgramCopy) < 0) {
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

std::string EnabledSections(const std::string &content) {
  std::string enabled;
  std::string section;
  bool isEnabled = false;
  const auto finish = [&enabled, &section, &isEnabled] {
    enabled += isEnabled ? section : "";
    section.clear();
    isEnabled = false;
  };
  LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const Line line = ParseLine(text);
    if (line.kind == Line::Kind::kSection) {
      finish();
    }
    if (line.kind == Line::Kind::kPair && line.key == "tcenable") {
      isEnabled = line.value == "yes";
    } else if (line.kind == Line::Kind::kSection || !section.empty()) {
      section.append(text).append("\n");
    }
  }
  finish();
  return enabled;
}

int RestoreFiles(bool &enforce) {
  std::string content;
  if (QARDCFileExist(kUserRules) == 1 && Check(ReadWholeFile(kUserRules, content), kUserRules) < 0) {
    return -1;
  }
  const std::string enforced = EnabledSections(content);
  enforce = !enforced.empty();
  return enforce ? MakeFiles(enforced) : RemoveFiles();
}

} // namespace vornhost
