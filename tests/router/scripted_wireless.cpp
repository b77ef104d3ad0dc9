// The scripted platform's wireless daemon: adapters and stations.
#include "platform/wifi.h"
#include "tests/router/scripted_platform.h"

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
  if (result >= 0) {
    config = Get().adapterConfigs[adapter];
  }
  return result;
}

int WifiClient::GetConnectionList(const std::string &network, Json::Value &stations) {
  const int result = Call("GetConnectionList(" + network + ", " + Text(stations) + ")");
  if (result >= 0) {
    stations = Get().wifiStations[network];
  }
  return result;
}

} // namespace vornwireless::dbus
