// Writing a wireless adapter's configuration.
//
// What is written, all beside each other in /etc/vorn/wireless: <adapter>.json, the configuration; <adapter>.accept and
// <adapter>.deny, the MAC filter's addresses as hostapd reads them. hostapd's own configuration file gets the lines
// macaddr_acl, accept_mac_file and deny_mac_file in every network, so that hostapd has the filter from its first
// moment, whoever starts it. Then the running hostapd is told over its control sockets.
//
// hostapd's rules: who is in the accept list may connect, else who is in the deny list may not, else macaddr_acl
// decides (0: may, 1: may not). The list that a policy has no use for is empty.
#ifndef HOST_WIRELESS_ADAPTER_WRITER_H
#define HOST_WIRELESS_ADAPTER_WRITER_H

#include "host/wireless/hostapd_config.h"

#include <json/value.h>

#include <string>
#include <string_view>

namespace vornhost {

/// Stores a configuration and applies it to all networks of the adapter. A hostapd that does not run will read it when
/// it starts. Stations that the filter forbids are thrown out at once. "enabled" and "guest_enabled" say what is on the
/// air and are not stored. Throws std::runtime_error with the reason: a value that is not acceptable (nothing is
/// written then), a file that cannot be written, a hostapd that does not answer or refuses; the files are as they were
/// then, and hostapd too if it lets itself be told.
void WriteAdapter(const WirelessAdapter &adapter, const Json::Value &config);

/// hostapd's configuration with the three lines of the filter in every network, in the place of any that were there.
/// @param[in] macaddrAcl  0 or 1
std::string WithFilterLines(std::string_view content, const std::string &acceptFile, const std::string &denyFile,
                            int macaddrAcl);

} // namespace vornhost

#endif
