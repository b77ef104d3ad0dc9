// The DHCP client of one interface: udhcpc, as a daemon that keeps its lease renewed.
#ifndef HOST_NETWORK_DHCP_CLIENT_H
#define HOST_NETWORK_DHCP_CLIENT_H

#include "host/network/daemon_process.h"

#include <string>
#include <vector>

namespace vornhost {

class DhcpClient {
public:
  explicit DhcpClient(const std::string &interface);

  bool IsRunning() const { return process_.IsRunning(); }

  /// As DaemonProcess's.
  UniqueFd Watch() const { return process_.Watch(); }

  /// Starts the client and waits for its first lease, about 10 seconds. Throws std::runtime_error when none came; the
  /// client does not run then.
  void StartWithLease() const;

  /// Starts the client and waits a second for its first lease; without one it goes on asking. Throws std::runtime_error
  /// when it cannot be started.
  void Start() const;

  /// The same for an interface that still has the address of a lease: the client asks for that address again and leaves
  /// it in place until the server has answered.
  /// @param[in] address  IPv4; empty: it has none
  void Resume(const std::string &address) const;

  /// Starts the client again after it died: as Resume when the interface still has the address of its lease, else as
  /// Start.
  void ResumeLease() const;

  /// Ends the client; what it configured stays. Throws std::runtime_error when it lives on.
  void Stop() const { process_.Stop(); }

private:
  std::string KeepFile() const;
  void Run(const std::vector<std::string> &options) const;

  std::string interface_;
  DaemonProcess process_;
};

} // namespace vornhost

#endif
