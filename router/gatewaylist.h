// The order of the interfaces that carry the default route.
#ifndef ROUTER_GATEWAYLIST_H
#define ROUTER_GATEWAYLIST_H

#include "router/export.h"

#include <json/value.h>

#include <string>

class ROUTER_EXPORT GatewayList {
public:
  GatewayList();
  ~GatewayList();

  /// @param[in]  family  "ipv4" or "ipv6"; with any other text the daemon is asked without a type
  /// @param[in]  filter  a filter text of the network library
  /// @param[out] result  object: "configs", the daemon's gateway records that the filter lets through; an empty array
  ///                     on failure
  /// @return false when the daemon cannot list the gateways
  bool Get(const std::string &family, const std::string &filter, Json::Value &result);

  /// Stores a new order and makes the default routes follow it. There is no roll-back: what was stored before a failure
  /// stays stored.
  /// @param[in] family  "ipv4" or "ipv6"; with any other text the records have an empty type
  /// @param[in] names   array of interface names, the first one preferred; anything but an array is an empty one
  /// @return false when the daemon refuses a record or cannot refresh the default gateway
  bool Set(const std::string &family, const Json::Value &names);
};

#endif
