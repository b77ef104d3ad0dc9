// The network as it was before a switch: enough to bring it back after the switching process died.
#ifndef HOST_NETWORK_TOPOLOGY_SNAPSHOT_H
#define HOST_NETWORK_TOPOLOGY_SNAPSHOT_H

#include "host/network/netlink.h"

#include <optional>
#include <string>
#include <vector>

namespace vornhost {

/// A link by name; indexes change when a bridge is made anew.
struct LinkState {
  Link link;          ///< without meaning: index, master
  std::string master; ///< empty when it is nobody's port
  std::vector<Address> addresses;
  std::vector<Route> routes;

  /// Without prefix length; empty when there is none.
  std::string FirstIpv4() const;
};

struct Snapshot {
  std::string from; ///< topology
  std::string to;
  std::string boot;     ///< the kernel's boot id: after a restart the interfaces say nothing any more
  std::string upstream; ///< the interface that joins a network outside before or after the switch; empty: none
  bool joined = false;  ///< wpa_supplicant ran on it
  std::vector<LinkState> links;
  std::vector<std::string> dhcpInterfaces; ///< those that a DHCP client served
  std::optional<std::string> wanFile;      ///< nothing: there was none

  /// @return null when the link was not there
  const LinkState *Find(const std::string &name) const;
};

/// Records the WAN port, the bridges lbr0 and br0 and all their ports, and the upstream's interface. Throws
/// std::runtime_error when something cannot be read.
Snapshot TakeSnapshot(Netlink &netlink, const std::string &from, const std::string &to, const std::string &upstream);

/// The kernel's id of this boot.
std::string BootId();

std::string SnapshotText(const Snapshot &snapshot);

/// @return nothing when the text is no whole snapshot
std::optional<Snapshot> ParseSnapshot(const std::string &text);

} // namespace vornhost

#endif
