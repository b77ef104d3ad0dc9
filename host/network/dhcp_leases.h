// The addresses that dnsmasq has given out.
#ifndef HOST_NETWORK_DHCP_LEASES_H
#define HOST_NETWORK_DHCP_LEASES_H

#include <ctime>
#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

constexpr char kLeaseFile[] = "/var/lib/misc/dnsmasq.leases";

/// An IPv4 lease.
struct DhcpLease {
  std::string mac;      ///< lower case, colons
  std::string ip;       ///< a checked address
  std::string hostname; ///< letters, digits, '-', '_' and '.'; empty: none, or one that is not of these
  std::time_t expires;  ///< 0: never
};

/// Reads dnsmasq's lease file (one lease a line: expiry, MAC address, address, name or "*", client id). A line that is
/// not whole, whose address is none, or whose time is over is passed over, and so are the lines of DHCPv6, which name
/// no MAC address. One MAC address may have several leases.
/// @param[in] now  the time to which a lease must last; on a router without a clock, before its time is set, nearly
///                 every lease seems to last long
std::vector<DhcpLease> ParseLeases(std::string_view content, std::time_t now);

/// The leases of kLeaseFile; none when it cannot be read.
std::vector<DhcpLease> ReadLeases();

} // namespace vornhost

#endif
