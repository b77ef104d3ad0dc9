// The files of the routes, and whose turn it is to change them.
//
// /etc/iproute2/config/static-route and static-route-v6 hold a JSON array each, a rule a line; they are what is wanted,
// and the kernel is made to follow them. /etc/iproute2/config/gateway-order and gateway-order-v6 hold the names of the
// interfaces that may carry the default route, one a line, the preferred one first.
#ifndef HOST_ROUTES_RULE_STORE_H
#define HOST_ROUTES_RULE_STORE_H

#include "host/utility/unique_fd.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace vornhost {

/// Waits for the turn to change routes and their files, across threads and processes. It ends with the descriptor, also
/// when its owner dies. Throws std::runtime_error when it cannot be had within half a minute.
UniqueFd TakeRouteTurn();

/// @return the rules as they were stored, an array; empty when there is no file. Throws std::runtime_error when the
/// file cannot be read or is none of ours.
Json::Value ReadRules(int family);

/// Stores the rules durably. Throws std::runtime_error when that fails; the file is as it was then.
void WriteRules(int family, const Json::Value &rules);

/// No order is longer.
constexpr size_t kGatewayLimit = 64;

/// Throws std::runtime_error when the file cannot be read. What could not have been stored is passed over: a line that
/// is no name of an interface for routes, one that was there before, and what is behind the longest order.
std::vector<std::string> ReadGatewayOrder(int family);

/// As WriteRules.
void WriteGatewayOrder(int family, const std::vector<std::string> &names);

} // namespace vornhost

#endif
