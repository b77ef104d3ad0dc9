#include "host/timecontrol/rules.h"

#include "host/network/mac_address.h"
#include "host/schedule/local_time.h"
#include "host/utility/atomic_file.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace vornhost {

namespace {

constexpr char kRuleFile[] = "/tmp/timectrl.conf";

struct Section {
  std::string name;
  std::string clientName;
  std::optional<std::string> schedule;
};

std::vector<Section> ParseSections(const std::string &content) {
  std::vector<Section> sections;
  LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const Line line = ParseLine(text);
    if (line.kind == Line::Kind::kSection) {
      sections.push_back({std::string(line.key), {}, {}});
    } else if (line.kind == Line::Kind::kPair && !sections.empty()) {
      if (line.key == "name") {
        sections.back().clientName = line.value;
      } else if (line.key == "tc_sched") {
        sections.back().schedule = line.value;
      }
    }
  }
  return sections;
}

std::optional<TimeRule> MakeRule(const Section &section) {
  const std::string shown = LogText(section.name);
  const auto mac = CanonicalMac(section.name);
  if (!mac) {
    LogError("time control: rule [%s] is left out: not the address of a device", shown.c_str());
    return {};
  }
  if (!section.schedule) {
    LogError("time control: rule [%s] is left out: it has no schedule", shown.c_str());
    return {};
  }
  if (section.schedule->size() != kSlots) {
    LogError("time control: rule [%s] has %zu slots, not %d: a missing one is free, what is beyond is not used",
             shown.c_str(), section.schedule->size(), kSlots);
  }
  return TimeRule{*mac, section.clientName, *section.schedule};
}

bool IsRootsFile(const char *path) {
  struct stat info {};
  return lstat(path, &info) == 0 && S_ISREG(info.st_mode) && info.st_uid == 0 &&
         (info.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

} // namespace

std::optional<std::string> CanonicalMac(std::string_view text) {
  const auto mac = ParseMac(text);
  return mac && IsStationMac(*mac) ? mac : std::nullopt;
}

bool IsMarked(const std::string &schedule, int slot) {
  return slot >= 0 && static_cast<size_t>(slot) < schedule.size() && schedule[static_cast<size_t>(slot)] == '1';
}

std::vector<TimeRule> ParseRules(const std::string &content) {
  std::vector<TimeRule> rules;
  for (const Section &section : ParseSections(content)) {
    if (auto rule = MakeRule(section)) {
      rules.push_back(std::move(*rule));
    }
  }
  return rules;
}

int ReadRules(std::vector<TimeRule> &rules) {
  std::string content;
  // Nobody can put another file in the place of root's own: the folder is sticky.
  if (!IsRootsFile(kRuleFile) || ReadWholeFile(kRuleFile, content) != 0) {
    LogError("time control: %s cannot be read, or is not root's alone", kRuleFile);
    return -1;
  }
  rules = ParseRules(content);
  return 0;
}

std::vector<TimeRule> JoinRules(const std::vector<TimeRule> &rules) {
  std::vector<TimeRule> joined;
  for (const TimeRule &rule : rules) {
    const auto known =
        std::find_if(joined.begin(), joined.end(), [&rule](const TimeRule &each) { return each.mac == rule.mac; });
    if (known == joined.end()) {
      joined.push_back(rule);
      continue;
    }
    known->schedule.resize(std::max(known->schedule.size(), rule.schedule.size()), '0');
    for (size_t slot = 0; slot < rule.schedule.size(); ++slot) {
      known->schedule[slot] = rule.schedule[slot] == '1' ? '1' : known->schedule[slot];
    }
  }
  return joined;
}

MacSet CutIn(int slot, const std::vector<TimeRule> &rules) {
  MacSet cut;
  for (const TimeRule &rule : rules) {
    if (IsMarked(rule.schedule, slot)) {
      cut.insert(rule.mac);
    }
  }
  return cut;
}

} // namespace vornhost
