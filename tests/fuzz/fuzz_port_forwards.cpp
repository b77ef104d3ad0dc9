// Rule files of any content, and DMZ addresses: what is read can be written and read back, every rule is judged, and
// the table's text holds nothing but what was checked.
#include "host/network/ipv4.h"
#include "host/portforward/record_text.h"
#include "host/portforward/table_text.h"
#include "host/utility/sz_hash.h"

#include <fuzzer/FuzzedDataProvider.h>
#include <netinet/in.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>

namespace {

constexpr std::string_view kOthers = " \n{}:;@.,->!=_/\"DMZ"; // what the table may hold beside letters and digits

void Demand(bool holds) {
  if (!holds) {
    std::abort();
  }
}

bool AreSame(const VORNPFRecord *one, const VORNPFRecord *other) {
  for (; one != nullptr && other != nullptr; one = one->next, other = other->next) {
    const auto &a = one->values->Pairs();
    const auto &b = other->values->Pairs();
    const auto same = [](const auto &x, const auto &y) { return x.key == y.key && x.value == y.value; };
    if (std::string_view(one->name) != other->name || !std::equal(a.begin(), a.end(), b.begin(), b.end(), same)) {
      return false;
    }
  }
  return one == nullptr && other == nullptr;
}

// No foreign text can end a comment or begin a command: nothing but these characters, and a comment for each rule.
void CheckText(const std::string &text, size_t rules) {
  Demand(std::all_of(text.begin(), text.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || kOthers.find(c) != std::string_view::npos;
  }));
  size_t comments = 0;
  for (size_t at = text.find(" comment \""); at != std::string::npos; at = text.find(" comment \"", at + 1)) {
    ++comments;
  }
  Demand(comments == rules);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  FuzzedDataProvider input(data, size);
  const std::string dmz = input.ConsumeBool() ? "192.168.1.112" : input.ConsumeRandomLengthString(20);
  const std::string content = input.ConsumeRemainingBytesAsString();
  vornhost::RecordList records;
  if (vornhost::ParseRecords(content, records) != 0) {
    return 0;
  }
  std::string rendered;
  if (vornhost::RenderRecords(records.get(), rendered) == 0) {
    vornhost::RecordList again;
    Demand(vornhost::ParseRecords(rendered, again) == 0 && AreSame(records.get(), again.get()));
  }
  const auto address = [](const char *text) { return *vornhost::ParseIpv4(text); };
  const vornhost::Plan plan = vornhost::MakePlan(records.get(), {"yes", dmz},
                                                 {{{address("192.168.1.1"), 24}, {address("10.0.0.1"), 30}}, {8080}});
  CheckText(vornhost::RenderTable(plan), vornhost::RuleComments(plan).size());
  for (const auto &rule : plan.rules) {
    const bool isActive = rule.state == vornhost::PlannedRule::State::kActive;
    Demand(rule.why.empty() == (rule.state != vornhost::PlannedRule::State::kLeftOut));
    if (isActive) { // its ports are its own
      const auto target = plan.Find(rule.forward.tcp ? IPPROTO_TCP : IPPROTO_UDP, rule.forward.outer.last);
      Demand(target && target->address == rule.forward.target && target->port != 0);
    }
  }
  Demand(!plan.Find(IPPROTO_TCP, 8080));
  return 0;
}
