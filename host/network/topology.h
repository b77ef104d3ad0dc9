// What vorntopology does: switching, recovering, bringing up and showing the network.
#ifndef HOST_NETWORK_TOPOLOGY_H
#define HOST_NETWORK_TOPOLOGY_H

#include "host/network/netlink.h"
#include "host/network/topology_snapshot.h"

#include <iosfwd>
#include <string>

namespace vornhost {

enum class Result {
  kDone = 0,
  kFailed = 1, ///< the network is as it was, as far as the log does not say otherwise
  kUsage = 2,
  kBusy = 3, ///< another process is at it; nothing was done
};

// The commands. Each waits for its end and writes what went wrong to the system log. They may throw std::exception
// before the first change.

/// Brings the network into a topology.
Result SwitchTopology(const std::string &target);
/// Brings back what a switch that died has left.
Result Recover();
/// Brings the network up as its configuration files say; what is up already stays.
Result StartNetwork();
/// Describes the network for people.
Result ShowStatus(std::ostream &out);

// What the commands share.

/// Where the ports are in a topology, and which link is the way out.
struct Layout {
  std::string bridge; ///< of the LAN ports
  bool wanInBridge;
  std::string uplink; ///< empty in client topology without an upstream
};
/// @param[in] upstream  the interface that joins a network outside in client topology; empty: there is none
Layout LayoutOf(const std::string &topology, const std::string &upstream);

/// Looks for the lock of a switch that died and brings back what it held. The caller has its turn.
Result RecoverStale(Netlink &netlink);
/// Brings back the whole snapshot, all of it that can be. @return whether nothing failed; what did is logged
bool RestoreSnapshot(Netlink &netlink, const Snapshot &snapshot);
/// Makes links, ports and addresses what the files say. @return as above
bool ApplyConfiguration(Netlink &netlink);
/// Gives the way out its address: by DHCP or as configured.
/// @param[in] uplink       of the topology's layout
/// @param[in] leaseNeeded  a DHCP server that does not answer is a failure
/// Throws std::runtime_error when it fails.
void ConnectUplink(Netlink &netlink, const std::string &topology, const std::string &uplink, bool leaseNeeded);
/// Bridged frames do not pass the firewall of routed ones. What is not permitted stays as it is.
void LetBridgesForward();

} // namespace vornhost

#endif
