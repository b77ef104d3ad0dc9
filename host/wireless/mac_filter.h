// The MAC filter of a wireless adapter: which stations may connect, in its main and its guest network.
#ifndef HOST_WIRELESS_MAC_FILTER_H
#define HOST_WIRELESS_MAC_FILTER_H

#include <json/value.h>

#include <set>
#include <string>

namespace vornhost {

enum class FilterPolicy {
  kDisable, ///< everyone may connect
  kAllow,   ///< only those of the list may
  kDeny     ///< everyone may but those of the list
};

struct MacFilter {
  FilterPolicy policy = FilterPolicy::kDisable;
  std::set<std::string> macs; ///< of the entries that are on; lower case, colons

  bool Permits(const std::string &mac) const;
};

/// Reads the members "mac_filter_policy" ("disable", "allow" or "deny") and "mac_filter_list" (objects with "mac",
/// "desc" and "mac_filter_enabled") of an adapter's configuration. An entry whose "mac_filter_enabled" is missing or
/// null is on: it was put into the list to count. Throws std::runtime_error, which says what is wrong, when a policy is
/// none, an entry no object or its address not one of a station; also when the entry is off, because it can be switched
/// on later.
MacFilter ParseMacFilter(const Json::Value &config);

/// A list file as hostapd reads it (accept_mac_file, deny_mac_file): an address a line.
std::string RenderMacList(const std::set<std::string> &macs);

} // namespace vornhost

#endif
