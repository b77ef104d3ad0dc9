#include "host/devices/wifi_stations.h"

#include "platform/wifi.h"

#include "host/devices/device_text.h"
#include "host/devices/mac_address.h"
#include "host/network/ipv4.h"

namespace vornhost {

namespace {

std::string TextOf(const Json::Value &station, const char *key) {
  return station[key].isString() ? station[key].asString() : std::string();
}

int64_t NumberOf(const Json::Value &station, const char *key) {
  return station[key].isInt64() ? station[key].asInt64() : 0;
}

bool IsTrue(const Json::Value &config, const char *key) {
  return config.isObject() && config[key].isBool() && config[key].asBool();
}

} // namespace

void AppendStations(const Json::Value &list, const std::string &network, std::vector<WifiStation> &stations) {
  for (Json::ArrayIndex i = 0; list.isArray() && i < list.size() && stations.size() < kDeviceLimit; ++i) {
    const Json::Value &entry = list[i];
    const std::optional<std::string> mac = entry.isObject() ? ParseDeviceMac(TextOf(entry, "mac")) : std::nullopt;
    if (mac) {
      const std::optional<uint32_t> ip = ParseIpv4(TextOf(entry, "ip").c_str());
      stations.push_back(
          {*mac,
           network,
           ip ? Ipv4Text(*ip) : "",
           CleanName(TextOf(entry, "hostname")),
           {NumberOf(entry, "signalstrength"), NumberOf(entry, "transferRX"), NumberOf(entry, "transferTX")}});
    }
  }
}

std::optional<std::vector<WifiStation>> ReadStations() {
  vornwireless::dbus::WifiClient client;
  Json::Value adapters;
  if (!client.IsServerReady() || client.GetAdapterList(adapters) < 0 || !adapters.isArray()) {
    return std::nullopt;
  }
  std::vector<WifiStation> stations;
  for (const Json::Value &adapter : adapters) {
    const std::string name = adapter.isString() ? adapter.asString() : std::string();
    Json::Value config;
    if (name.empty() || client.GetAdapterConfig(name, config) < 0) {
      continue;
    }
    for (const auto &[isOn, network] :
         {std::pair(IsTrue(config, "enabled"), name), std::pair(IsTrue(config, "guest_enabled"), "g" + name)}) {
      Json::Value list;
      if (isOn && client.GetConnectionList(network, list) >= 0) {
        AppendStations(list, network, stations);
      }
    }
  }
  return stations;
}

} // namespace vornhost
