#include "tests/router/scripted_wireless.h"

#include "platform/wifi.h"
#include "tests/router/scripted_platform.h"

namespace scripted {
namespace {

Wireless current;

int Find(const std::map<std::string, Json::Value> &values, const std::string &name, Json::Value &out) {
  const auto found = values.find(name);
  if (found == values.end()) {
    return -1;
  }
  out = found->second;
  return 0;
}

} // namespace

Wireless &GetWireless() {
  return current;
}

void ResetWireless() {
  current = Wireless();
}

} // namespace scripted

using scripted::Call;
using scripted::GetWireless;
using scripted::Text;

namespace vornwireless::dbus {

int WifiClient::GetAdapterList(Json::Value &adapters) {
  Call("GetAdapterList()");
  adapters = GetWireless().adapters;
  return GetWireless().adapterListResult;
}

int WifiClient::GetAdapterConfig(const std::string &adapter, Json::Value &config) {
  Call("GetAdapterConfig(" + adapter + ", " + Text(config) + ")");
  return scripted::Find(GetWireless().configs, adapter, config);
}

int WifiClient::ApplyAdapter(const std::string &adapter, const Json::Value &config) {
  Call("ApplyAdapter(" + adapter + ", " + Text(config) + ")");
  const auto &results = GetWireless().applyResults;
  const auto found = results.find(adapter);
  return found == results.end() ? 0 : found->second;
}

int WifiClient::GetConnectionList(const std::string &network, Json::Value &stations) {
  Call("GetConnectionList(" + network + ", " + Text(stations) + ")");
  return scripted::Find(GetWireless().stations, network, stations);
}

} // namespace vornwireless::dbus
