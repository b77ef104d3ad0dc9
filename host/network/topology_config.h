// What the files under /etc/sysconfig/network-scripts say about the network.
#ifndef HOST_NETWORK_TOPOLOGY_CONFIG_H
#define HOST_NETWORK_TOPOLOGY_CONFIG_H

#include <optional>
#include <string>
#include <vector>

namespace vornhost {

/// One ifcfg file. Texts that are not well formed are left empty, with a log line.
struct PortConfig {
  bool present = false;
  bool dhcp = false;              ///< BOOTPROTO=dhcp, or neither BOOTPROTO nor IPADDR
  std::string address;            ///< IPADDR and NETMASK (without one: 255.255.255.0), as "192.168.1.1/24"
  std::string gateway;            ///< GATEWAY
  std::string mac;                ///< MACADDR
  std::string bridge;             ///< BRIDGE
  bool slave = false;             ///< SLAVE=yes
  std::vector<std::string> ports; ///< PORTS, separated by blanks
};

/// @param[in] path  an ifcfg file; one that is absent gives an empty configuration
PortConfig ReadPortConfig(const char *path);

/// @return the topology that the WAN port's file says
const char *ConfiguredTopology();

/// How the way out of a topology gets its address.
PortConfig ReadUplinkConfig(const std::string &topology);

/// Writes into the WAN port's file whose port it is.
/// @param[in] bridge  empty: nobody's
/// Throws std::runtime_error when the file cannot be written; it may then hold one of the two keys.
void WriteWanBridge(const std::string &bridge);

/// The WAN port's file as it stands; nothing when there is none. Throws std::runtime_error when it cannot be read.
std::optional<std::string> ReadWanFile();

/// Puts back what ReadWanFile gave. Throws std::runtime_error when that cannot be done.
void RestoreWanFile(const std::optional<std::string> &content);

} // namespace vornhost

#endif
