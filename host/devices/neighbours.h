// The kernel's neighbour table, of both address families, and the bridges that the home's devices are on.
#ifndef HOST_DEVICES_NEIGHBOURS_H
#define HOST_DEVICES_NEIGHBOURS_H

#include "host/network/netlink.h"
#include "host/utility/unique_fd.h"

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

using Ipv6Address = std::array<uint8_t, 16>;

/// A bridge that is up and whose name has "br" in it, as all of the platform's have.
struct Bridge {
  int index = 0;
  std::string name;
  std::string mac;
  std::vector<std::pair<uint32_t, int>> networks; ///< its own IPv4 addresses in host order, each with its prefix length
  std::vector<std::pair<Ipv6Address, int>> networks6; ///< the same for IPv6, without those of the link alone

  bool Covers(uint32_t address) const;
  bool Covers(const Ipv6Address &address) const;
  bool operator==(const Bridge &) const = default;
};

struct DeviceNeighbour {
  std::string netif;
  int index = 0;
  int family = 0; ///< AF_INET or AF_INET6
  std::string address;
  std::string mac;
  bool linkLocal = false;
  bool reachable = false;   ///< the kernel has had an answer (NUD_REACHABLE), and it has not grown old
  int64_t confirmedAgo = 0; ///< milliseconds since the last answer
  int64_t updatedAgo = 0;   ///< milliseconds since the entry changed its state
  /// Beside an IPv6 address of the link: the one that the host would have in the bridge's network, if it made both of
  /// the same interface identifier (RFC 4862 section 5.5.3). Many do; empty: the network has no such addresses.
  std::string guess;
};

/// The home's bridges. Throws NetlinkError.
std::vector<Bridge> ReadBridges(Netlink &netlink);

/// Reads the messages of a dump. What is cut short, no device's or on no bridge is passed over.
void ParseNeighbours(std::string_view messages, const std::vector<Bridge> &bridges,
                     std::vector<DeviceNeighbour> &neighbours);

class NeighbourTable {
public:
  /// Listens for changes from now on. Throws std::runtime_error when it cannot.
  NeighbourTable();

  /// Readable when something has changed.
  int EventFd() const { return events_.Get(); }
  struct Changes {
    bool neighbours = false;
    bool links = false; ///< or their addresses
  };
  /// Takes the messages that have come. One that was lost counts as a change of everything.
  Changes TakeChanges();

  std::vector<DeviceNeighbour> Read(const std::vector<Bridge> &bridges);

private:
  UniqueFd events_;
};

} // namespace vornhost

#endif
