// The fixed names of the platform's network: interfaces, configuration files, programs.
#ifndef HOST_NETWORK_NAMES_H
#define HOST_NETWORK_NAMES_H

namespace vornhost {

constexpr char kWanPort[] = "eth0";
constexpr char kSecondWanPort[] = "eth1"; // where there is one; no topology has it in a bridge
constexpr char kLanBridge[] = "lbr0";     // LAN ports, in router and client topology
constexpr char kGuestBridge[] = "gbr0";   // guest network, in every topology
constexpr char kOneBridge[] = "br0";      // LAN ports and WAN port together, in bridge topology

constexpr char kRouterTopology[] = "router";
constexpr char kBridgeTopology[] = "bridge";
constexpr char kClientTopology[] = "client";

constexpr char kWanConfig[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";
constexpr char kSecondWanConfig[] = "/etc/sysconfig/network-scripts/ifcfg-eth1";
constexpr char kLanConfig[] = "/etc/sysconfig/network-scripts/ifcfg-lbr0";
constexpr char kGuestConfig[] = "/etc/sysconfig/network-scripts/ifcfg-gbr0";
constexpr char kOneBridgeConfig[] = "/etc/sysconfig/network-scripts/ifcfg-br0";

constexpr char kTopologyLock[] = "/tmp/topology.lock";
constexpr char kRunFolder[] = "/run/vorn";

constexpr char kWirelessFolder[] = "/etc/vorn/wireless";

constexpr char kTopologyProgram[] = "/usr/vorn/sbin/vorntopology";
constexpr char kDhcpClientProgram[] = "/usr/sbin/udhcpc";
constexpr char kDhcpClientScript[] = "/usr/vorn/sbin/udhcpc.script";
constexpr char kSupplicantProgram[] = "/usr/sbin/wpa_supplicant";
constexpr char kNftProgram[] = "/usr/sbin/nft";
constexpr char kBaseFirewall[] = "/usr/vorn/share/base-firewall.nft";

} // namespace vornhost

#endif
