// FilterList of the contract. "" and "all" let everything through, "active" the one by which the traffic leaves, and
// each state ("ready", "no-gateway", "no-link", "down", "absent") those that are in it.
#include "host/export.h"
#include "host/utility/log.h"
#include "platform/network.h"

#include <algorithm>
#include <array>

namespace vornnetwork::network {

// NOLINTNEXTLINE(performance-unnecessary-value-param): the contract's own signature
VORN_EXPORT int FilterList(std::string filter, Json::Value &list) {
  static constexpr std::array<const char *, 5> kStates = {"ready", "no-gateway", "no-link", "down", "absent"};
  if (!list.isArray()) {
    vornhost::LogError("gateways not filtered: no list");
    return -1;
  }
  if (filter.empty() || filter == "all") {
    return 0;
  }
  if (filter != "active" && std::find(kStates.begin(), kStates.end(), filter) == kStates.end()) {
    vornhost::LogError("gateways not filtered: no filter \"%s\"", vornhost::LogText(filter).c_str());
    return -1;
  }
  Json::Value kept(Json::arrayValue);
  for (const Json::Value &record : list) {
    if (record.isObject() &&
        (filter == "active" ? record["active"] == Json::Value(true) : record["state"] == Json::Value(filter))) {
      kept.append(record);
    }
  }
  list = kept;
  return 0;
}

} // namespace vornnetwork::network
