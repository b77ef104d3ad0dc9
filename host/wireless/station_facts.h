// What the network knows of a station beside hostapd: its address and its name.
#ifndef HOST_WIRELESS_STATION_FACTS_H
#define HOST_WIRELESS_STATION_FACTS_H

#include "host/network/dhcp_leases.h"
#include "host/network/neighbours.h"

#include <string>
#include <vector>

namespace vornhost {

/// Looks stations up in one reading of the DHCP leases and the neighbour table.
class StationFacts {
public:
  StationFacts(const std::vector<DhcpLease> &leases, const std::vector<Neighbour> &neighbours);

  struct Facts {
    std::string ip;       ///< a checked IPv4 address, dotted decimal; empty: not known
    std::string hostname; ///< empty: not known
  };
  /// A device may have several leases (one in each network that it was in): the one whose address it uses counts, else
  /// the one that lasts longest. Without a lease it is an IPv4 address of the neighbour table, one that answered
  /// last before the others. A device that uses IPv6 alone has no address here.
  Facts Find(const std::string &mac) const;

private:
  std::vector<DhcpLease> leases_;     // by MAC address; in it, the one that lasts longest first
  std::vector<Neighbour> neighbours_; // IPv4, by MAC address; in it, the best first
};

} // namespace vornhost

#endif
