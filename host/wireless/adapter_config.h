// The configuration of a wireless adapter, as it is stored: one file an adapter, /etc/vorn/wireless/<adapter>.json, a
// JSON object. Members that are not this program's are kept as they are.
#ifndef HOST_WIRELESS_ADAPTER_CONFIG_H
#define HOST_WIRELESS_ADAPTER_CONFIG_H

#include <json/value.h>

#include <string>

namespace vornhost {

constexpr char kPolicyMember[] = "mac_filter_policy";
constexpr char kListMember[] = "mac_filter_list";
constexpr char kEnabledMember[] = "enabled";
constexpr char kGuestEnabledMember[] = "guest_enabled";

constexpr char kPolicyDisable[] = "disable"; // everyone may connect
constexpr char kPolicyAllow[] = "allow";     // only the entries may
constexpr char kPolicyDeny[] = "deny";       // all but the entries may

/// @return the stored object, with "mac_filter_policy" and "mac_filter_list" put in where there are none yet. Throws
///         std::runtime_error when there is a file that cannot be read or holds no object.
Json::Value ReadAdapterConfig(const std::string &adapter);

/// @return a configuration as it is stored, without the members that say what is on the air. Throws std::runtime_error
/// when reading it would not give it back: a text that is no UTF-8, a nesting that is too deep, more than a file holds.
std::string RenderAdapterConfig(Json::Value config);

/// The path of an adapter's file.
std::string AdapterFileOf(const std::string &adapter);

} // namespace vornhost

#endif
