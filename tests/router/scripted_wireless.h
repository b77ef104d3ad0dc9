// The scripted platform's wireless adapters, their configurations and stations.
#ifndef TESTS_ROUTER_SCRIPTED_WIRELESS_H
#define TESTS_ROUTER_SCRIPTED_WIRELESS_H

#include <json/value.h>

#include <map>
#include <string>

namespace scripted {

struct Wireless {
  Json::Value adapters = Json::Value(Json::arrayValue); ///< what GetAdapterList gives out
  int adapterListResult = 0;
  std::map<std::string, Json::Value> configs;  ///< by adapter; one that is not here cannot be read
  std::map<std::string, int> applyResults;     ///< by adapter; what ApplyAdapter gives back instead of success
  std::map<std::string, Json::Value> stations; ///< by network; one that is not here cannot be read
};

/// The adapters of the test that runs. Replaced by fresh ones with ResetWireless.
Wireless &GetWireless();
void ResetWireless();

} // namespace scripted

#endif
