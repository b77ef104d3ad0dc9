// The scripted platform's wireless daemon: adapters, their configurations and stations.
#include "platform/wifi.h"
#include "tests/router/scripted_platform.h"

namespace scripted {
namespace {

// @return `result`; negative, too, when there is no such value
int Find(int result, const std::map<std::string, Json::Value> &values, const std::string &name, Json::Value &out) {
  const auto found = values.find(name);
  if (result < 0 || found == values.end()) {
    return -1;
  }
  out = found->second;
  return result;
}

} // namespace
} // namespace scripted

using scripted::Call;
using scripted::Get;
using scripted::Text;

namespace vornwireless::dbus {

int WifiClient::GetAdapterList(Json::Value &adapters) {
  const int result = Call("GetAdapterList(" + Text(adapters) + ")");
  if (result >= 0) {
    adapters = Get().adapters;
  }
  return result;
}

int WifiClient::GetAdapterConfig(const std::string &adapter, Json::Value &config) {
  const int result = Call("GetAdapterConfig(" + adapter + ", " + Text(config) + ")");
  return scripted::Find(result, Get().adapterConfigs, adapter, config);
}

int WifiClient::ApplyAdapter(const std::string &adapter, const Json::Value &config) {
  Call("ApplyAdapter(" + adapter + ", " + Text(config) + ")");
  const auto &results = Get().applyResults;
  const auto found = results.find(adapter);
  return found == results.end() ? 0 : found->second;
}

int WifiClient::GetConnectionList(const std::string &network, Json::Value &stations) {
  const int result = Call("GetConnectionList(" + network + ", " + Text(stations) + ")");
  return scripted::Find(result, Get().wifiStations, network, stations);
}

} // namespace vornwireless::dbus
