// The stations of a platform whose wireless daemon's client lists none yet: there is no adapter.
#include "platform/wifi.h"

namespace vornwireless::dbus {

int WifiClient::GetAdapterList(Json::Value & /*adapters*/) {
  return -1;
}

int WifiClient::GetAdapterConfig(const std::string & /*adapter*/, Json::Value & /*config*/) {
  return -1;
}

int WifiClient::GetConnectionList(const std::string & /*network*/, Json::Value & /*stations*/) {
  return -1;
}

} // namespace vornwireless::dbus
