#include "router/portforward.h"

#include "platform/netif.h"
#include "platform/utility.h"
#include "router/log.h"
#include "router/parameters.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>
#include <string>

namespace {

constexpr char kUnit[] = "portforward";
constexpr char kFolder[] = "/etc/portforward/routerpf";
constexpr char kRuleFile[] = "/etc/portforward/routerpf/rule.conf";
constexpr char kDmzFile[] = "/etc/portforward/routerpf/dmz.conf";
constexpr char kDmzLine[] = "%s=\"%s\"\n";
constexpr size_t kHashRoom = 1024;
constexpr size_t kDmzTextSize = 1024;
constexpr int kLanCapacity = 32;

// A rule's texts: the record's key, and the API's, which is another one on purpose.
struct RuleText {
  const char *record;
  const char *api;
};
constexpr RuleText kStoredTexts[] = {
    {"s_port", "targetPort"},      {"s_ip", "targetIP"},   {"r_port", "sourcePort"},
    {"protocol name", "protocol"}, {"service", "service"},
};
constexpr RuleText kListedTexts[] = {
    {"service", "service"}, {"r_port", "sourcePort"}, {"protocol name", "protocol"},
    {"s_ip", "targetIP"},   {"s_port", "targetPort"},
};

struct RecordDeleter {
  void operator()(VORNPFRecord *head) const { VORNPFConfFree(head); }
};
using RecordList = std::unique_ptr<VORNPFRecord, RecordDeleter>;

bool SetText(QARDCSzHash *values, const char *key, const std::optional<std::string> &text) {
  return text && QARDCSzHashSetValue(values, key, text->c_str()) >= 0;
}

bool FillRecord(QARDCSzHash *values, const Json::Value &rule) {
  const auto enabled = router::ConvertToBool(router::MemberOf(rule, "enabled"));
  if (!enabled || QARDCSzHashSetValue(values, "enabled", *enabled ? "1" : "0") < 0) {
    return false;
  }
  return std::all_of(std::begin(kStoredTexts), std::end(kStoredTexts), [&values, &rule](const RuleText &text) {
    return SetText(values, text.record, router::WholeTextOf(router::MemberOf(rule, text.api)));
  });
}

std::optional<RecordList> CreateRecords(const Json::Value &rules) {
  RecordList head;
  VORNPFRecord *last = nullptr;
  for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
    VORNPFRecord *record = CreateRuleRecord(rules[i], static_cast<int>(i));
    if (record == nullptr) {
      ROUTER_LOG("%s:%d Failed to create rule record");
      return std::nullopt;
    }
    if (last == nullptr) {
      head.reset(record);
    } else {
      last->next = record;
    }
    last = record;
  }
  return head;
}

Json::Value ReadRecord(const VORNPFRecord &record) {
  Json::Value rule;
  rule["id"] = record.name;
  if (const char *enabled = QARDCSzHashGetValue(record.values, "enabled"); enabled != nullptr) {
    rule["enabled"] = std::strcmp(enabled, "1") == 0;
  }
  for (const RuleText &text : kListedTexts) {
    if (const char *value = QARDCSzHashGetValue(record.values, text.record); value != nullptr) {
      rule[text.api] = value;
    }
  }
  return rule;
}

bool MakeFolder() {
  if (QARDCFileCheckDir(kFolder) == 0 && QARDCExec("/bin/mkdir", "-p", kFolder, nullptr, nullptr) != 0) {
    ROUTER_LOG("%s:%d Failed to mkdir [%s]", kFolder);
    return false;
  }
  return true;
}

bool RestartDnat() {
  if (QARDCExec("/etc/rc.network", "start-dnat", nullptr, nullptr, nullptr) != 0) {
    ROUTER_LOG("%s:%d Failed to execute rc network start-dnat");
    return false;
  }
  return true;
}

bool WriteDmz(const char *ip) {
  return QARDCFileSetKeyValue(kDmzFile, "enabled", "yes", kDmzLine) >= 0 &&
         QARDCFileSetKeyValue(kDmzFile, "dmz_ip", ip, kDmzLine) >= 0;
}

bool RemoveDmz() {
  if (QARDCFileExist(kDmzFile) == 0) {
    return true;
  }
  return QARDCSysUnlink(kDmzFile) >= 0 && RestartDnat();
}

using LanEntries = std::array<QARDNetInterface, kLanCapacity>;

int EnumerateLan(LanEntries &entries) {
  return std::min(QARDNetInterfaceEnum(entries.data(), kLanCapacity, QARD_NETIF_LAN), kLanCapacity);
}

bool ReadLan(const char *name, VORNNetIFInfo &info) {
  if (VORNNetIFGetInfo(name, 0, &info) < 0) {
    ROUTER_LOG("%s:%d VORNNetIFGetInfo(%s) fail![0x%04X %s:%d]", name, static_cast<unsigned>(QARDCErrGet()),
               QARDCErrorGetFile(), QARDCErrorGetLine());
    return false;
  }
  return true;
}

} // namespace

VORNPFRecord *CreateRuleRecord(const Json::Value &rule, int index) {
  struct Freer {
    void operator()(VORNPFRecord *record) const {
      QARDCSzHashFree(record->values);
      std::free(record);
    }
  };
  auto *memory = static_cast<VORNPFRecord *>(std::calloc(1, sizeof(VORNPFRecord)));
  if (memory == nullptr) {
    ROUTER_LOG("%s:%d malloc failed");
    return nullptr;
  }
  QARDCSzHash *values = QARDCSzHashAlloc(kHashRoom);
  if (values == nullptr) {
    ROUTER_LOG("%s:%d hash malloc failed");
    std::free(memory);
    return nullptr;
  }
  std::unique_ptr<VORNPFRecord, Freer> record(memory);
  record->values = values;
  std::snprintf(record->name, sizeof(record->name), "%d", index);
  return FillRecord(values, rule) ? record.release() : nullptr;
}

PortForward::PortForward() = default;

PortForward::~PortForward() = default;

bool PortForward::GetPortForward(Json::Value &out) {
  return LoadData(out);
}

bool PortForward::LoadData(Json::Value &out) {
  return LoadRules(out["rules"]);
}

bool PortForward::LoadRules(Json::Value &rules) {
  rules = Json::Value(Json::arrayValue);
  VORNPFRecord *head = nullptr;
  if (access(kRuleFile, R_OK) != 0 || VORNPFConfGet(&head, kRuleFile, 0, 0, 0) < 0) {
    return true;
  }
  const RecordList records(head);
  for (const VORNPFRecord *record = head; record != nullptr; record = record->next) {
    rules.append(ReadRecord(*record));
  }
  return true;
}

bool PortForward::SetPortForward(Json::Value &data) {
  return ApplyRules(data);
}

bool PortForward::ApplyRules(const Json::Value &data) {
  if (!data.isMember("rules")) {
    ROUTER_LOG("%s:%d Cannot find rules in data member");
    return false;
  }
  const auto records = CreateRecords(data["rules"]);
  if (!records || !MakeFolder()) {
    return false;
  }
  if (VORNPFConfSet(records->get(), kRuleFile) != 0) {
    ROUTER_LOG("%s:%d Failed to set pfconf");
    return false;
  }
  return RestartDnat();
}

bool PortForward::GetDMZ(Json::Value &out) {
  return LoadDmz(out);
}

bool PortForward::LoadDmz(Json::Value &out) {
  Json::Value result;
  std::array<char, kDmzTextSize> text{};
  if (QARDCFileGetKeyValue(kDmzFile, "dmz_ip", text.data(), text.size(), 0) > 0 && IsValidDmzIp(text.data())) {
    result["ip"] = text.data();
  }
  if (QARDCFileGetKeyValue(kDmzFile, "enabled", text.data(), text.size(), 0) > 0) {
    result["enable"] = std::strcmp(text.data(), "yes") == 0;
  }
  out = result;
  return true;
}

bool PortForward::SetDMZ(Json::Value &data) {
  return ApplyDmz(data);
}

bool PortForward::ApplyDmz(const Json::Value &data) {
  if (!data.isMember("enable")) {
    ROUTER_LOG("%s:%d enable member required");
    return false;
  }
  const auto enable = router::ConvertToBool(data["enable"]);
  if (!enable) {
    return false;
  }
  if (!*enable) {
    return RemoveDmz();
  }
  if (!data.isMember("ip")) {
    ROUTER_LOG("%s:%d ip member required");
    return false;
  }
  const auto ip = router::WholeTextOf(data["ip"]);
  if (!ip || !IsValidDmzIp(ip->c_str())) {
    ROUTER_LOG("%s:%d ip format isnt correct");
    return false;
  }
  if (!MakeFolder()) {
    return false;
  }
  if (!WriteDmz(ip->c_str())) {
    QARDCSysUnlink(kDmzFile); // half a DMZ is none
    ROUTER_LOG("%s:%d Failed to set value on file [%s]", kDmzFile);
    return false;
  }
  return RestartDnat();
}

bool PortForward::IsValidDmzIp(const char *ip) {
  LanEntries entries{};
  const int count = EnumerateLan(entries);
  for (int i = 0; i < count; ++i) {
    VORNNetIFInfo info{};
    if (ReadLan(entries[static_cast<size_t>(i)].name, info) && VORNNetIsSameSubnet(ip, info.ip, info.mask) > 0) {
      return true;
    }
  }
  return false;
}

bool PortForward::GetLocalLan(Json::Value &out) {
  LanEntries entries{};
  const int count = EnumerateLan(entries);
  Json::Value &list = out["local_lan"];
  list = Json::Value(Json::arrayValue);
  for (int i = 0; i < count; ++i) {
    const QARDNetInterface &entry = entries[static_cast<size_t>(i)];
    VORNNetIFInfo info{};
    if (ReadLan(entry.name, info)) {
      Json::Value lan;
      lan["netif"] = entry.name;
      lan["ip"] = info.ip;
      lan["mask"] = info.mask;
      list.append(lan);
    }
  }
  return count > 0;
}
