// Lists of the port-forward library as the tests write them down.
#ifndef TESTS_HOST_PORTFORWARD_RECORDS_H
#define TESTS_HOST_PORTFORWARD_RECORDS_H

#include "host/portforward/record_text.h"

#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

namespace hosttest {

using Pairs = std::vector<std::pair<std::string, std::string>>;
using Records = std::vector<std::pair<std::string, Pairs>>;

using List = vornhost::RecordList;

inline List MakeList(const Records &records) {
  List head;
  for (auto it = records.rbegin(); it != records.rend(); ++it) {
    auto *record = static_cast<VORNPFRecord *>(std::calloc(1, sizeof(VORNPFRecord)));
    it->first.copy(record->name, sizeof(record->name)); // one that is too long stays without its NUL
    record->values = QARDCSzHashAlloc(1024);
    for (const auto &[key, value] : it->second) {
      QARDCSzHashSetValue(record->values, key.c_str(), value.c_str());
    }
    record->next = head.release();
    head.reset(record);
  }
  return head;
}

/// A whole rule: enabled, service, outer ports, protocol, target, inner ports.
inline Pairs Rule(const char *ports, const char *protocol, const char *target, const char *inner,
                  const char *enabled = "1", const char *service = "s") {
  return {{"enabled", enabled}, {"s_port", inner},           {"s_ip", target},
          {"r_port", ports},    {"protocol name", protocol}, {"service", service}};
}

} // namespace hosttest

#endif
