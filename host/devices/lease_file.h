// dnsmasq's lease file: a line a lease, "EXPIRY MAC IP NAME CLIENT-ID" (dnsmasq(8), --dhcp-leasefile).
#ifndef HOST_DEVICES_LEASE_FILE_H
#define HOST_DEVICES_LEASE_FILE_H

#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

constexpr char kLeaseFile[] = "/var/lib/misc/dnsmasq.leases";

struct Lease {
  std::string mac;
  std::string ip;     ///< IPv4, checked
  std::string name;   ///< clean; empty: none
  int64_t expiry = 0; ///< seconds since 1970; 0: never
};

/// The IPv4 leases, one a MAC address: of several the one that ends last. A line that is cut short or malformed is
/// passed over, a last one without its line end too, for its writer may be in the middle of it; and so is what follows
/// the line "duid", the IPv6 part.
std::vector<Lease> ParseLeases(std::string_view content);

} // namespace vornhost

#endif
