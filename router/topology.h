// The operating topology: what it is, what the device can do, and the switch to another one.
#ifndef ROUTER_TOPOLOGY_H
#define ROUTER_TOPOLOGY_H

#include "router/export.h"

#include <json/value.h>

#include <string>

class ROUTER_EXPORT Topology {
public:
  Topology();
  ~Topology();

  /// Builds the description by which the caller finds the router after a switch; switches nothing.
  /// @param[in]  target  the topology that will be switched to
  /// @param[out] result  object: "redirect", "secure", "port", "auth_key", "ip_list"
  /// @return false when the present topology cannot be read
  bool SetTopology(std::string target, Json::Value &result);

  /// @param[out] result   object: "switching", "net_topology", "support_net_topology", "has_wifi_dongle"; from version
  /// 2 on
  ///                      "supported_mode" and "bridge_mode_forbidden" too
  /// @param[in]  version  version of the API
  /// @return false when the topology or the supported modes cannot be read; `result` may be partly filled
  bool GetTopology(Json::Value &result, int version);

  /// Asks the wireless daemon for the switch; run by the framework after the answer.
  /// @param[in] data  the target, a std::string from the heap, which is freed here
  static void APICallback(void *data);
};

#endif
