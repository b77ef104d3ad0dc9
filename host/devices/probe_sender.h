// Asks devices to show that they are there: an ARP request, or a neighbour solicitation for IPv6. The kernel takes the
// answers, and its neighbour table says so.
#ifndef HOST_DEVICES_PROBE_SENDER_H
#define HOST_DEVICES_PROBE_SENDER_H

#include "host/devices/device_table.h"
#include "host/devices/neighbours.h"
#include "host/utility/unique_fd.h"

namespace vornhost {

class ProbeSender {
public:
  /// Throws std::runtime_error when it may not (CAP_NET_RAW).
  ProbeSender();

  /// One that cannot be sent is passed over.
  void Send(const Probe &probe, const Bridge &bridge) const;

private:
  void SendArp(const Probe &probe, const Bridge &bridge) const;
  void SendSolicitation(const Probe &probe, const Bridge &bridge) const;

  UniqueFd arp_;
  UniqueFd icmp_;
};

} // namespace vornhost

#endif
