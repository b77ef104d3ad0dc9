#include "router/parental.h"

#include "platform/schedule.h"
#include "platform/utility.h"
#include "router/log.h"
#include "router/parameters.h"

#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>
#include <string>

namespace {

constexpr char kUnit[] = "parental";
constexpr char kFolder[] = "/etc/parental";
constexpr char kUserRules[] = "/etc/parental/timectrl.ui.conf";
constexpr char kEnforcedRules[] = "/etc/parental/timectrl.conf";
constexpr char kEnforcedCopy[] = "/tmp/timectrl.conf";
constexpr char kProgram[] = "/usr/vorn/sbin/vorntimecontrol";
constexpr char kProgramCopy[] = "/tmp/vorntimecontrol"; // there: enforcement is running
constexpr char kScheduledCommand[] = "/tmp/vorntimecontrol --schedule";
constexpr char kModuleTool[] = "/usr/vorn/bin/iptablestool";
constexpr int kExecFlags = 0xBB;
constexpr char kLineFormat[] = "\t%s=%s\n";
constexpr size_t kRoom = 1024;

using ModuleList = std::array<const char *, 5>;
constexpr ModuleList kLoadOrder = {"x_tables.ko", "ip_tables.ko", "iptable_filter.ko", "xt_mac.ko", "xt_tcpudp.ko"};
constexpr ModuleList kUnloadOrder = {"xt_tcpudp.ko", "xt_mac.ko", "iptable_filter.ko", "ip_tables.ko", "x_tables.ko"};

struct HashFree {
  void operator()(QARDCSzHash *hash) const { QARDCSzHashFree(hash); }
};
struct ListFree {
  void operator()(QARDCSzList *list) const { QARDCSzListFree(list); }
};
using Hash = std::unique_ptr<QARDCSzHash, HashFree>;
using List = std::unique_ptr<QARDCSzList, ListFree>;

std::string TextMember(const Json::Value &rule, const char *name) {
  return router::WholeTextOf(router::MemberOf(rule, name)).value_or("");
}

// Whether the text reaches a line of the rule file as it is.
bool IsOneLine(const std::optional<std::string> &text) {
  return text && text->find_first_of("\r\n") == std::string::npos;
}

bool FillHash(QARDCSzHash *hash, const Json::Value &rule) {
  const char *enabled = router::ConvertToBool(router::MemberOf(rule, "tcenable")).value_or(false) ? "yes" : "no";
  return QARDCSzHashSetValue(hash, "tcenable", enabled) >= 0 &&
         QARDCSzHashSetValue(hash, "name", TextMember(rule, "clientname").c_str()) >= 0 &&
         QARDCSzHashSetValue(hash, "tc_sched", TextMember(rule, "schedule").c_str()) >= 0;
}

bool AddSection(const char *path, const char *section, QARDCSzHash *hash) {
  if (QARDCFileAddSection(path, section, hash, kLineFormat) < 0) {
    // Names the enforcing file also when the rule file is written: log readers know the text so.
    ROUTER_LOG("%s:%d Failed to add section: %s from %s, errno=0x%X", section, kEnforcedRules,
               static_cast<unsigned>(QARDCErrGet()));
    return false;
  }
  return true;
}

Json::Value TextValue(QARDCSzHash *hash, const char *key) {
  const char *text = QARDCSzHashGetValue(hash, key);
  return text == nullptr ? "" : text;
}

bool RunModuleTool(const char *action, const ModuleList &modules) {
  const int result = QARDCExecl(kModuleTool, kExecFlags, action, "timectrl", modules[0], modules[1], modules[2],
                                modules[3], modules[4], static_cast<const char *>(nullptr));
  if (result >= 0) {
    return true;
  }
  std::string list;
  for (const char *module : modules) {
    list.append(list.empty() ? "" : " ").append(module);
  }
  ROUTER_LOG("%s:%d Can't execute %s %s %s %s", kModuleTool, action, "timectrl", list.c_str());
  return false;
}

bool Schedule() {
  VORNScheduleRecord record{};
  record.weekdays = 127;
  record.startHour = 0;
  record.intervalHours = 1;
  record.lastHour = 23;
  std::snprintf(record.command, sizeof(record.command), "%s", kScheduledCommand);
  return VORNScheduleSet(&record, 0) >= 0;
}

bool Unschedule() {
  char command[32] = {};
  std::snprintf(command, sizeof(command), "%s", kScheduledCommand);
  return VORNScheduleRemove(command) >= 0;
}

// Copies one rule of the user's to the enforcing file, when it is switched on. The hash goes from section to section
// with what it holds.
bool EnforceSection(const char *section, QARDCSzHash *hash) {
  if (QARDCFileGetSection(kUserRules, section, hash) <= 0) {
    ROUTER_LOG("%s:%d Failed to get section [%s], skip it", section);
    return true;
  }
  const char *enabled = QARDCSzHashRemoveKey(hash, "tcenable");
  if (enabled == nullptr || std::strcmp(enabled, "yes") != 0) {
    return true;
  }
  return AddSection(kEnforcedRules, section, hash);
}

} // namespace

bool CanKeepTimeRule(const Json::Value &rule) {
  const auto mac = router::WholeTextOf(router::MemberOf(rule, "mac"));
  return IsOneLine(mac) && !mac->empty() && mac->find_first_of("[] \t") == std::string::npos &&
         IsOneLine(router::WholeTextOf(router::MemberOf(rule, "clientname"))) &&
         IsOneLine(router::WholeTextOf(router::MemberOf(rule, "schedule")));
}

ParentalHandler::ParentalHandler() : timeCtrlDataValid_(0) {}

ParentalHandler::~ParentalHandler() = default;

bool ParentalHandler::CheckTimeCtrlData(const Json::Value &parameters) {
  if (!parameters.isObject() || !parameters.isMember("rules")) {
    ROUTER_LOG("%s:%d missing member from input json data");
    return false;
  }
  timeCtrlData_ = parameters;
  timeCtrlDataValid_ = 1;
  return true;
}

bool ParentalHandler::SetTimeCtrlConfig() const {
  if (QARDCFileCheckDir(kFolder) != 1 && mkdir(kFolder, 0755) != 0) {
    ROUTER_LOG("%s:%d Failed to mkdir %s", kFolder);
    return false;
  }
  if (QARDCSysUnlink(kUserRules) < 0 && QARDCFileExist(kUserRules) != 0) {
    ROUTER_LOG("%s:%d Failed to delete %s", kUserRules);
    return false;
  }
  const Json::Value &rules = router::MemberOf(timeCtrlData_, "rules");
  if (rules.empty()) {
    return true;
  }
  const Hash hash(QARDCSzHashAlloc(kRoom));
  if (!hash) {
    ROUTER_LOG("%s:%d Failed to alloc memory");
    return false;
  }
  for (const Json::Value &rule : rules) {
    if (!FillHash(hash.get(), rule)) {
      ROUTER_LOG("%s:%d Failed to alloc memory");
      return false;
    }
    if (!AddSection(kUserRules, TextMember(rule, "mac").c_str(), hash.get())) {
      return false;
    }
  }
  return true;
}

bool ParentalHandler::LoadTimeControlData(Json::Value &out) const {
  Json::Value &rules = out["rules"] = Json::Value(Json::arrayValue);
  if (access(kUserRules, R_OK) != 0) {
    return true;
  }
  const List sections(QARDCSzListAlloc(kRoom));
  if (!sections) {
    ROUTER_LOG("%s:%d Failed to QARDCSzListAlloc");
    return false;
  }
  const int count = QARDCFileEnumSection(kUserRules, sections.get());
  if (count <= 0) {
    return false;
  }
  const Hash hash(QARDCSzHashAlloc(kRoom));
  if (!hash) {
    return false;
  }
  for (int i = 0; i < count; ++i) {
    const char *section = QARDCSzListGet(sections.get(), i);
    if (QARDCFileGetSection(kUserRules, section, hash.get()) <= 0) {
      return false;
    }
    const char *schedule = QARDCSzHashGetValue(hash.get(), "tc_sched");
    Json::Value rule;
    rule["clientname"] = TextValue(hash.get(), "name");
    rule["mac"] = section;
    rule["schedule"] = schedule == nullptr ? "" : schedule;
    rule["status"] = GetScheduleNowStatus(schedule) ? 1 : 0;
    rule["tcenable"] = TextValue(hash.get(), "tcenable") == "yes";
    rules.append(std::move(rule));
  }
  return true;
}

bool ParentalHandler::GetScheduleNowStatus(const char *schedule) const {
  if (schedule == nullptr) {
    ROUTER_LOG("%s:%d Wrong parameter to GetScheduleNowStatus");
    return true;
  }
  const int slot = VORNSchedGetNowIndex();
  return slot >= 0 && static_cast<size_t>(slot) < std::strlen(schedule) && schedule[slot] == '1';
}

bool ParentalHandler::SetTimeCtrlRules() const {
  QARDCSysUnlink(kEnforcedRules);
  QARDCSysUnlink(kEnforcedCopy);
  const List sections(QARDCSzListAlloc(kRoom));
  if (!sections) {
    ROUTER_LOG("%s:%d Failed to QARDCSzListAlloc");
    return false;
  }
  const Hash hash(QARDCSzHashAlloc(kRoom));
  if (!hash) {
    ROUTER_LOG("%s:%d Failed to alloc memory");
    return false;
  }
  const int count = QARDCFileEnumSection(kUserRules, sections.get());
  if (count < 0) {
    ROUTER_LOG("%s:%d Failed to QARDCFileEnumSection");
    return false;
  }
  for (int i = 0; i < count; ++i) {
    if (!EnforceSection(QARDCSzListGet(sections.get(), i), hash.get())) {
      return false;
    }
  }
  if (QARDCFileExist(kEnforcedRules) == 1 && QARDCExec("/bin/cp", "-f", kEnforcedRules, kEnforcedCopy, nullptr) < 0) {
    ROUTER_LOG("%s:%d Failed to copy %s to /tmp/", kEnforcedRules);
    return false;
  }
  return true;
}

bool ParentalHandler::StartTimeCtrlRules() const {
  if (QARDCFileExist(kUserRules) != 1) {
    return true;
  }
  if (!SetTimeCtrlRules()) {
    ROUTER_LOG("%s:%d Failed to setup [%s] in /tmp/", kEnforcedRules);
    return false;
  }
  if (QARDCFileExist(kEnforcedCopy) != 1) {
    return true;
  }
  if (QARDCExec("/bin/cp", "-f", kProgram, kProgramCopy, nullptr) < 0) {
    ROUTER_LOG("%s:%d Failed to copy %s to /tmp/", kProgram);
    return false;
  }
  if (!RunModuleTool("--insmod", kLoadOrder)) {
    return false;
  }
  if (QARDCExec(kProgramCopy, "--apply", nullptr, nullptr, nullptr) < 0) {
    ROUTER_LOG("%s:%d Failed to execute %s %s", kProgramCopy, "--apply");
    return false;
  }
  if (!Schedule()) {
    ROUTER_LOG("%s:%d Failed to set time control scheduler\n");
    return false;
  }
  if (QARDCExec(kScheduledCommand, nullptr, nullptr, nullptr, nullptr) < 0) {
    ROUTER_LOG("%s:%d Failed to execute %s", kScheduledCommand);
    return false;
  }
  return true;
}

bool ParentalHandler::StopTimeCtrlRules() const {
  if (QARDCFileExist(kProgramCopy) != 1) {
    return true;
  }
  if (QARDCExec(kProgramCopy, "--disable", nullptr, nullptr, nullptr) < 0) {
    ROUTER_LOG("%s:%d Can't execute %s %s", kProgramCopy, "--disable");
    return false;
  }
  if (!Unschedule()) {
    ROUTER_LOG("%s:%d Can't remove time control scheduler\n");
    return false;
  }
  QARDCSysUnlink(kEnforcedCopy);
  QARDCSysUnlink(kProgramCopy);
  return RunModuleTool("--rmmod", kUnloadOrder);
}
