// The wireless daemon's stations, as the scanner takes them.
#ifndef HOST_DEVICES_WIFI_STATIONS_H
#define HOST_DEVICES_WIFI_STATIONS_H

#include "host/devices/device_table.h"

#include <json/value.h>

#include <optional>
#include <string>
#include <vector>

namespace vornhost {

/// One network's stations. What is no object or has no MAC address is passed over, an address that is none left out.
void AppendStations(const Json::Value &list, const std::string &network, std::vector<WifiStation> &stations);

/// Those of every network of every adapter.
/// @return nothing when the daemon does not answer
std::optional<std::vector<WifiStation>> ReadStations();

} // namespace vornhost

#endif
