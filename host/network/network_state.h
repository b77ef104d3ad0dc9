// Bringing links into a state, by name. Every operation may be repeated: what is so already is left alone.
#ifndef HOST_NETWORK_NETWORK_STATE_H
#define HOST_NETWORK_NETWORK_STATE_H

#include "host/network/netlink.h"
#include "host/network/topology_snapshot.h"

#include <string>
#include <vector>

namespace vornhost {

/// Every operation throws std::runtime_error when it fails.
class NetworkState {
public:
  explicit NetworkState(Netlink &netlink) : netlink_(netlink) {}

  /// Makes the bridge, or takes the one that is there; another kind of link of that name is a failure.
  /// @param[in] mac  empty: as the kernel chooses
  void EnsureBridge(const std::string &name, const std::string &mac);
  /// Other kinds of link of that name are left alone.
  void RemoveBridge(const std::string &name);

  /// Makes a link a bridge's port, up and without addresses of its own.
  void Attach(const std::string &port, const std::string &bridge);
  /// Releases a port: up, with a link-local address again.
  void Detach(const std::string &port);
  void SetUp(const std::string &name);
  void SetDown(const std::string &name);

  /// Takes every address and every route away from a link.
  void Clear(const std::string &name);
  /// @param[in] address  IPv4, with prefix length
  void AddAddress(const std::string &name, const std::string &address);
  void AddDefaultRoute(const std::string &name, const std::string &gateway);

  /// Brings a link back to what it was, its bridge included. A bridge is made when it is missing; a missing link of
  /// another kind was unplugged and is passed over.
  void Restore(const LinkState &state);

  Link Get(const std::string &name);
  std::vector<std::string> PortsOf(const std::string &bridge);

private:
  void RestoreMaster(const Link &now, const LinkState &state);
  void RestoreMode(const Link &now, const LinkState &state);
  void RestoreAddresses(int index, const LinkState &state);
  void RestoreRoutes(int index, const LinkState &state);
  void SetMode(const Link &now, uint8_t mode);

  Netlink &netlink_;
};

} // namespace vornhost

#endif
