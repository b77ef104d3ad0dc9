// The network daemon's lists and its static-route service.
#ifndef PLATFORM_NETWORK_H
#define PLATFORM_NETWORK_H

#include "platform/wifi.h"

#include <json/value.h>

#include <string>

namespace vornnetwork::network {

/// Removes from a list of gateway records those that the filter excludes. Safe from several threads.
/// @param[in]     filter  filter text; the empty text and "all" exclude nothing
/// @param[in,out] list    array of gateway records
/// @retval >=0  done
/// @retval <0   unknown filter, or `list` is no array; `list` is left as it was
int FilterList(std::string filter, Json::Value &list);

enum IP_TYPE { IP_TYPE_V4 = 0, IP_TYPE_V6 = 1 };

/// One static-route rule. The field that does not belong to the family stays empty: `netmask` for IPv6,
/// `prefixLength` (decimal text) for IPv4.
struct StaticRouteRule {
  IP_TYPE ipType;
  vornwireless::utils::IPAddress destination;
  vornwireless::utils::IPAddress netmask;
  vornwireless::utils::IPAddress gateway;
  std::string prefixLength;
  std::string ifname;
  bool enabled;
};

/// The static-route service. An object lives on the stack for one request and belongs to one thread; changes by several
/// objects at once take effect one after the other.
class StaticRoute {
public:
  StaticRoute();
  ~StaticRoute();
  StaticRoute(const StaticRoute &) = delete;
  StaticRoute &operator=(const StaticRoute &) = delete;

  /// @param[in]  type  address family
  /// @param[out] list  array of the stored rules
  /// @retval >=0  done
  /// @retval <0   the rules cannot be read
  int GetRules(IP_TYPE type, Json::Value &list);

  /// Replaces the stored rules of a family and installs them.
  /// @param[in] type  address family
  /// @param[in] list  array of rules, the complete new list
  /// @retval >=0  stored, durably, and installed
  /// @retval <0   a rule is not acceptable, the file cannot be written or the kernel refused; file and kernel are as
  ///              before
  int SetRules(IP_TYPE type, const Json::Value &list);

  /// Checks one rule; nothing is changed. (The name's spelling is part of the interface.)
  /// @param[in]  rule    the rule
  /// @param[out] result  the verdict
  /// @retval >=0  acceptable
  /// @retval <0   not acceptable, or the check failed
  int TestRuleVaild(const StaticRouteRule &rule, Json::Value &result);

  /// @param[in]  type  address family
  /// @param[out] list  array of objects, one a routing table, each with "name" (text) and "id" (number)
  /// @retval >=0  done
  /// @retval <0   the tables cannot be read
  int GetRouteTables(IP_TYPE type, Json::Value &list);
};

} // namespace vornnetwork::network

#endif
