#include "tests/host/devices/crowd.h"

#include <arpa/inet.h>
#include <linux/if_packet.h>
#include <net/ethernet.h>
#include <net/if.h>
#include <net/if_arp.h>
#include <netinet/if_ether.h>
#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <chrono>
#include <cstring>
#include <stdexcept>

namespace hosttest {

namespace {

constexpr uint32_t kFirst = 0xc0a80101;  // 192.168.1.1
constexpr uint32_t kRouter = 0xc0a80001; // 192.168.0.1

void PutMac(uint8_t *mac, int device) {
  const std::array<uint8_t, 6> bytes = {
      0xd4, 0x3d, 0x7e, 1, static_cast<uint8_t>(device >> 8), static_cast<uint8_t>(device)};
  std::memcpy(mac, bytes.data(), bytes.size());
}

void PutIp(uint8_t *ip, uint32_t address) {
  const uint32_t wire = htonl(address);
  std::memcpy(ip, &wire, sizeof(wire));
}

} // namespace

Crowd::Crowd(const std::string &port)
    : index_(static_cast<int>(if_nametoindex(port.c_str()))),
      socket_(socket(AF_PACKET, SOCK_RAW | SOCK_CLOEXEC, htons(ETH_P_ALL))) {
  sockaddr_ll address{};
  address.sll_family = AF_PACKET;
  address.sll_protocol = htons(ETH_P_ALL);
  address.sll_ifindex = index_;
  if (bind(socket_.Get(), reinterpret_cast<sockaddr *>(&address), sizeof(address)) != 0) {
    throw std::runtime_error("crowd");
  }
  thread_ = std::thread([this] { Serve(); });
}

Crowd::~Crowd() {
  ends_ = true;
  thread_.join();
}

void Crowd::Grow(int count) {
  constexpr std::array<uint8_t, 6> kNobody = {};
  for (int device = count_.exchange(count); device < count; ++device) {
    Send(device, ARPOP_REQUEST, kNobody.data(), kRouter);
  }
}

void Crowd::Send(int device, uint16_t operation, const uint8_t *targetMac, uint32_t targetIp) {
  struct {
    ether_header ethernet;
    ether_arp arp;
  } frame{};
  PutMac(frame.ethernet.ether_shost, device);
  std::memset(frame.ethernet.ether_dhost, 0xff, ETH_ALEN);
  frame.ethernet.ether_type = htons(ETHERTYPE_ARP);
  frame.arp.arp_hrd = htons(ARPHRD_ETHER);
  frame.arp.arp_pro = htons(ETHERTYPE_IP);
  frame.arp.arp_hln = ETH_ALEN;
  frame.arp.arp_pln = 4;
  frame.arp.arp_op = htons(operation);
  PutMac(frame.arp.arp_sha, device);
  PutIp(frame.arp.arp_spa, kFirst + static_cast<uint32_t>(device));
  std::memcpy(frame.arp.arp_tha, targetMac, ETH_ALEN);
  if (operation == ARPOP_REPLY) {
    std::memcpy(frame.ethernet.ether_dhost, targetMac, ETH_ALEN);
  }
  PutIp(frame.arp.arp_tpa, targetIp);
  send(socket_.Get(), &frame, sizeof(frame), 0);
}

void Crowd::Serve() {
  std::array<uint8_t, 2048> buffer{};
  while (!ends_) {
    pollfd entry{socket_.Get(), POLLIN, 0};
    sockaddr_ll from{};
    socklen_t length = sizeof(from);
    if (poll(&entry, 1, 100) <= 0) {
      continue;
    }
    const ssize_t size =
        recvfrom(socket_.Get(), buffer.data(), buffer.size(), 0, reinterpret_cast<sockaddr *>(&from), &length);
    if (from.sll_pkttype == PACKET_OUTGOING) {
      continue;
    }
    ++received_;
    ether_arp arp{};
    if (ntohs(from.sll_protocol) != ETHERTYPE_ARP || size < static_cast<ssize_t>(ETH_HLEN + sizeof(arp))) {
      continue;
    }
    std::memcpy(&arp, buffer.data() + ETH_HLEN, sizeof(arp));
    uint32_t target = 0;
    uint32_t sender = 0;
    std::memcpy(&target, arp.arp_tpa, sizeof(target));
    std::memcpy(&sender, arp.arp_spa, sizeof(sender));
    const int device = static_cast<int>(ntohl(target) - kFirst);
    if (arp.arp_op == htons(ARPOP_REQUEST) && device >= 0 && device < count_) {
      Send(device, ARPOP_REPLY, arp.arp_sha, ntohl(sender));
    }
  }
}

} // namespace hosttest
