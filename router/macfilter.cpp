#include "router/macfilter.h"

#include "platform/wifi.h"
#include "router/log.h"
#include "router/parameters.h"

#include <string>

using vornwireless::dbus::WifiClient;

namespace {

constexpr char kUnit[] = "macfilter";
constexpr char kPolicy[] = "mac_filter_policy";
constexpr char kList[] = "mac_filter_list";

bool ListAdapters(WifiClient &client, Json::Value &adapters) {
  if (!client.IsServerReady()) {
    ROUTER_LOG("%s:%d Cannot get connecton list when vornwifid is not ready");
    return false;
  }
  if (client.GetAdapterList(adapters) < 0) {
    ROUTER_LOG("%s:%d Error on getting Adapter list");
    return false;
  }
  if (!adapters.isArray() || adapters.empty()) {
    ROUTER_LOG("%s:%d Error on Adapter list is empty");
    return false;
  }
  return true;
}

// An element that is no text names no adapter, which the daemon will say.
std::string NameOf(const Json::Value &adapter) {
  return router::ConvertToText(adapter).value_or("");
}

// Appends a list's entries with the members that an entry has, null where one lacks it. What is no array has no
// entries: the members of an object, which JsonCpp would go through too, are none. REQUIRES: `out` is an array or null;
// it is an array afterwards.
void AppendEntries(const Json::Value &list, Json::Value &out) {
  if (list.isArray()) {
    for (const Json::Value &element : list) {
      Json::Value entry;
      for (const char *member : {"mac_filter_enabled", "desc", "mac"}) {
        entry[member] = router::MemberOf(element, member);
      }
      out.append(entry);
    }
  }
  if (out.isNull()) {
    out = Json::Value(Json::arrayValue);
  }
}

} // namespace

MacFilterHandler::MacFilterHandler() = default;

MacFilterHandler::~MacFilterHandler() = default;

bool MacFilterHandler::GetRules(Json::Value &out) {
  Json::Value config;
  const bool read = GetAdapterConfig(config);
  if (read) {
    out[kPolicy] = router::MemberOf(config, kPolicy);
  } else {
    ROUTER_LOG("%s:%d Failed to get Adapter config");
  }
  AppendEntries(read ? router::MemberOf(config, kList) : Json::Value::nullSingleton(), out[kList]);
  return read;
}

bool MacFilterHandler::GetAdapterConfig(Json::Value &config) {
  WifiClient client;
  Json::Value adapters;
  if (!ListAdapters(client, adapters)) {
    return false;
  }
  if (client.GetAdapterConfig(NameOf(adapters[0]), config) < 0) {
    ROUTER_LOG("%s:%d Error on getting first Adapter config");
    return false;
  }
  return true;
}

bool MacFilterHandler::SetRules(Json::Value &data) {
  if (!SetAdapterConfig(data)) {
    ROUTER_LOG("%s:%d Failed on writeback Adapter config");
    return false;
  }
  return true;
}

bool MacFilterHandler::SetAdapterConfig(const Json::Value &data) {
  WifiClient client;
  Json::Value adapters;
  if (!ListAdapters(client, adapters)) {
    return false;
  }
  Json::Value list;
  AppendEntries(router::MemberOf(data, kList), list);
  for (const Json::Value &adapter : adapters) {
    const std::string name = NameOf(adapter);
    Json::Value config;
    // A configuration that is no object cannot be given a filter: it is one that was not read.
    if (client.GetAdapterConfig(name, config) < 0 || !(config.isObject() || config.isNull())) {
      ROUTER_LOG("%s:%d Error on getting Adapter config from [%s], skip it", name.c_str());
      continue;
    }
    config[kPolicy] = router::MemberOf(data, kPolicy);
    config[kList] = list;
    if (client.ApplyAdapter(name, config) < 0) {
      ROUTER_LOG("%s:%d Error on getting first Adapter config"); // the message's own words
      return false;
    }
  }
  return true;
}
