#include "host/devices/probe_sender.h"

#include "host/devices/mac_address.h"
#include "host/network/ipv4.h"

#include <arpa/inet.h>
#include <linux/if_packet.h>
#include <net/ethernet.h>
#include <net/if_arp.h>
#include <netinet/icmp6.h>
#include <netinet/if_ether.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace vornhost {

namespace {

// The router's own address in the device's network; 0.0.0.0 where it has none (RFC 5227 section 2.1.1).
uint32_t SenderFor(uint32_t target, const Bridge &bridge) {
  for (const auto &[address, prefix] : bridge.networks) {
    if (((address ^ target) & NetmaskOfPrefix(prefix)) == 0) {
      return address;
    }
  }
  return 0;
}

void PutAddress(uint8_t *bytes, uint32_t address) {
  const uint32_t wire = htonl(address);
  std::memcpy(bytes, &wire, sizeof(wire));
}

} // namespace

ProbeSender::ProbeSender()
    : arp_(socket(AF_PACKET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0)),
      icmp_(socket(AF_INET6, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, IPPROTO_ICMPV6)) {
  if (!arp_.IsOpen()) {
    throw std::runtime_error(std::string("devices cannot be probed: ") + std::strerror(errno));
  }
  if (!icmp_.IsOpen()) { // IPv6 is off
    return;
  }
  icmp6_filter none{};
  ICMP6_FILTER_SETBLOCKALL(&none); // answers are the kernel's to read
  setsockopt(icmp_.Get(), IPPROTO_ICMPV6, ICMP6_FILTER, &none, sizeof(none));
  const int hops = 255; // or nobody takes it (RFC 4861 section 7.1.1)
  setsockopt(icmp_.Get(), IPPROTO_IPV6, IPV6_UNICAST_HOPS, &hops, sizeof(hops));
}

void ProbeSender::Send(const Probe &probe, const Bridge &bridge) const {
  if (!probe.ip.empty()) {
    SendArp(probe, bridge);
  }
  if (!probe.address.empty()) {
    SendSolicitation(probe, bridge);
  }
}

void ProbeSender::SendArp(const Probe &probe, const Bridge &bridge) const {
  const std::optional<uint32_t> target = ParseIpv4(probe.ip.c_str());
  if (!target || bridge.mac.empty()) {
    return;
  }
  ether_arp request{};
  request.arp_hrd = htons(ARPHRD_ETHER);
  request.arp_pro = htons(ETHERTYPE_IP);
  request.arp_hln = ETH_ALEN;
  request.arp_pln = sizeof(uint32_t);
  request.arp_op = htons(ARPOP_REQUEST);
  MacBytes(bridge.mac, request.arp_sha);
  PutAddress(request.arp_spa, SenderFor(*target, bridge));
  PutAddress(request.arp_tpa, *target);
  sockaddr_ll address{};
  address.sll_family = AF_PACKET;
  address.sll_protocol = htons(ETHERTYPE_ARP);
  address.sll_ifindex = bridge.index;
  address.sll_halen = ETH_ALEN;
  if (probe.broadcast) {
    std::memset(address.sll_addr, 0xff, ETH_ALEN);
  } else {
    MacBytes(probe.mac, address.sll_addr);
  }
  sendto(arp_.Get(), &request, sizeof(request), 0, reinterpret_cast<sockaddr *>(&address), sizeof(address));
}

void ProbeSender::SendSolicitation(const Probe &probe, const Bridge &bridge) const {
  nd_neighbor_solicit request{};
  request.nd_ns_type = ND_NEIGHBOR_SOLICIT; // the checksum is the kernel's
  sockaddr_in6 address{};
  address.sin6_family = AF_INET6;
  address.sin6_scope_id = static_cast<uint32_t>(bridge.index);
  if (icmp_.IsOpen() && inet_pton(AF_INET6, probe.address.c_str(), &address.sin6_addr) == 1) {
    request.nd_ns_target = address.sin6_addr;
    sendto(icmp_.Get(), &request, sizeof(request), 0, reinterpret_cast<sockaddr *>(&address), sizeof(address));
  }
}

} // namespace vornhost
