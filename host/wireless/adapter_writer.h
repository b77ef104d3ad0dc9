// Writing a wireless adapter's configuration.
//
// What is written, all beside each other in /etc/vorn/wireless: <adapter>.json, the configuration; <adapter>.accept and
// <adapter>.deny, the MAC filter's addresses as hostapd reads them. hostapd's own configuration file gets the lines
// macaddr_acl, accept_mac_file and deny_mac_file in every network, so that hostapd has the filter from its first
// moment, whoever starts it. Then the running hostapd is told over its control sockets.
// The list that a policy has no use for is empty.
#ifndef HOST_WIRELESS_ADAPTER_WRITER_H
#define HOST_WIRELESS_ADAPTER_WRITER_H

#include "host/wireless/hostapd_config.h"

#include <json/value.h>

namespace vornhost {

/// Stores a configuration and applies it to all networks of the adapter. A hostapd that does not run will read it when
/// it starts. Stations that the filter forbids are thrown out at once. "enabled" and "guest_enabled" say what is on the
/// air and are not stored. Throws std::runtime_error with the reason: a value that is not acceptable, or a hostapd that
/// does not answer (nothing is written then), a file that cannot be written, a hostapd that refuses or falls silent;
/// the files are as they were then, and hostapd too if it lets itself be told. It is waited for at most 4 seconds: 2
/// for the change, and 2 to take one back that failed.
void WriteAdapter(const WirelessAdapter &adapter, const Json::Value &config);

} // namespace vornhost

#endif
