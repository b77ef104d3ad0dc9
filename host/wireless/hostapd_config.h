// What hostapd's configuration says about the wireless adapters: each file /etc/hostapd/*.conf has one, "interface=",
// with its main network, and may have more networks, each after a line "bss=".
//
// The guest network of an adapter is the network named "g" + adapter, be it a bss of the same file or, with a radio of
// its own, the interface of another.
#ifndef HOST_WIRELESS_HOSTAPD_CONFIG_H
#define HOST_WIRELESS_HOSTAPD_CONFIG_H

#include "host/utility/unique_fd.h"

#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

constexpr char kHostapdFolder[] = "/etc/hostapd";

/// A network that an adapter makes.
struct WirelessNetwork {
  std::string name;    ///< of its interface
  std::string control; ///< path of its control socket; empty when its part of the file has no ctrl_interface
  std::string file;    ///< the configuration file that it is in
  std::string bridge;  ///< that it is a port of; empty when its part of the file names none
};

struct WirelessAdapter {
  std::string name;
  std::vector<WirelessNetwork> networks; ///< the first is the main one
};

/// Waits for the turn at changing hostapd's files; it ends with the descriptor. Throws std::runtime_error when it
/// cannot be had in time.
UniqueFd TakeHostapdTurn();

std::string GuestNetworkOf(const std::string &adapter);

/// The networks of one file, in its order; none when it begins with no interface.
std::vector<WirelessNetwork> ParseHostapdConfig(std::string_view content, const std::string &file);

/// The adapters by name. A file that cannot be read is passed over with a log line.
std::vector<WirelessAdapter> ReadAdapters();

/// @return the adapter of that name; null when there is none
const WirelessAdapter *FindAdapter(const std::vector<WirelessAdapter> &adapters, const std::string &name);

/// @return the network of that name; null when no adapter has it
const WirelessNetwork *FindNetwork(const std::vector<WirelessAdapter> &adapters, const std::string &name);

} // namespace vornhost

#endif
