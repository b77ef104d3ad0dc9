#include "host/devices/all_nodes.h"

#include "host/devices/mac_address.h"

#include <arpa/inet.h>
#include <linux/filter.h>
#include <linux/if_packet.h>
#include <net/ethernet.h>
#include <netinet/icmp6.h>
#include <netinet/ip6.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <random>

namespace vornhost {

namespace {

constexpr char kAllNodes[] = "ff02::1";
constexpr int64_t kListen = 5000; // milliseconds; a host that has to find the router first takes up to three seconds
constexpr int kAnswersAtOnce = 512;

void SetOption(const UniqueFd &fd, int level, int option, int value) {
  setsockopt(fd.Get(), level, option, &value, sizeof(value));
}

// Everything but answers to this question is dropped by the kernel.
UniqueFd OpenEar(uint16_t id) {
  UniqueFd fd(socket(AF_PACKET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  std::array<sock_filter, 8> answers = {{
      BPF_STMT(BPF_LD | BPF_B | BPF_ABS, offsetof(ip6_hdr, ip6_nxt)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, IPPROTO_ICMPV6, 0, 5),
      BPF_STMT(BPF_LD | BPF_B | BPF_ABS, sizeof(ip6_hdr) + offsetof(icmp6_hdr, icmp6_type)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, ICMP6_ECHO_REPLY, 0, 3),
      BPF_STMT(BPF_LD | BPF_H | BPF_ABS, sizeof(ip6_hdr) + offsetof(icmp6_hdr, icmp6_id)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, id, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, 0xffff),
      BPF_STMT(BPF_RET | BPF_K, 0),
  }};
  const sock_fprog program{answers.size(), answers.data()};
  sockaddr_ll address{};
  address.sll_family = AF_PACKET;
  address.sll_protocol = htons(ETH_P_IPV6);
  const bool isOpen = fd.IsOpen() &&
                      setsockopt(fd.Get(), SOL_SOCKET, SO_ATTACH_FILTER, &program, sizeof(program)) == 0 &&
                      bind(fd.Get(), reinterpret_cast<sockaddr *>(&address), sizeof(address)) == 0;
  return isOpen ? std::move(fd) : UniqueFd();
}

} // namespace

AllNodesEcho::AllNodesEcho()
    : icmp_(socket(AF_INET6, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, IPPROTO_ICMPV6)),
      id_(static_cast<uint16_t>(std::random_device()())) {
  if (!icmp_.IsOpen()) { // IPv6 is off
    return;
  }
  icmp6_filter none{};
  ICMP6_FILTER_SETBLOCKALL(&none); // the ear hears what the firewall keeps from this one
  setsockopt(icmp_.Get(), IPPROTO_ICMPV6, ICMP6_FILTER, &none, sizeof(none));
  SetOption(icmp_, IPPROTO_IPV6, IPV6_MULTICAST_LOOP, 0);
}

void AllNodesEcho::Ask(const std::vector<Bridge> &bridges, int64_t now) {
  const bool isAsked =
      std::any_of(bridges.begin(), bridges.end(), [](const Bridge &bridge) { return !bridge.networks6.empty(); });
  if (!icmp_.IsOpen() || !isAsked) {
    return;
  }
  asked_ = now;
  ear_ = OpenEar(id_);
  for (const Bridge &bridge : bridges) {
    Send(bridge);
  }
}

void AllNodesEcho::Send(const Bridge &bridge) const {
  if (bridge.networks6.empty()) {
    return;
  }
  icmp6_hdr request{};
  request.icmp6_type = ICMP6_ECHO_REQUEST; // the checksum is the kernel's
  request.icmp6_id = htons(id_);
  sockaddr_in6 to{};
  to.sin6_family = AF_INET6;
  inet_pton(AF_INET6, kAllNodes, &to.sin6_addr);
  in6_pktinfo from{};
  from.ipi6_ifindex = static_cast<unsigned>(bridge.index);
  std::memcpy(&from.ipi6_addr, bridge.networks6.front().first.data(), sizeof(from.ipi6_addr));
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(from))> control{};
  iovec body{&request, sizeof(request)};
  msghdr message{};
  message.msg_name = &to;
  message.msg_namelen = sizeof(to);
  message.msg_iov = &body;
  message.msg_iovlen = 1;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  cmsghdr *header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = IPPROTO_IPV6;
  header->cmsg_type = IPV6_PKTINFO;
  header->cmsg_len = CMSG_LEN(sizeof(from));
  std::memcpy(CMSG_DATA(header), &from, sizeof(from));
  sendmsg(icmp_.Get(), &message, 0);
}

std::vector<DeviceNeighbour> AllNodesEcho::Receive(const std::vector<Bridge> &bridges, int64_t now) {
  std::vector<DeviceNeighbour> neighbours;
  std::array<char, 128> buffer{};
  for (int i = 0; ear_.IsOpen() && i < kAnswersAtOnce; ++i) {
    sockaddr_ll from{};
    socklen_t length = sizeof(from);
    const ssize_t size =
        recvfrom(ear_.Get(), buffer.data(), buffer.size(), 0, reinterpret_cast<sockaddr *>(&from), &length);
    if (size < 0) {
      break;
    }
    const auto bridge = std::find_if(bridges.begin(), bridges.end(),
                                     [&from](const Bridge &each) { return each.index == from.sll_ifindex; });
    if (bridge == bridges.end() || from.sll_pkttype != PACKET_HOST || from.sll_halen != kMacBytes) {
      continue;
    }
    DeviceNeighbour neighbour;
    neighbour.netif = bridge->name;
    neighbour.index = bridge->index;
    neighbour.family = AF_INET6;
    neighbour.mac = ParseDeviceMac(MacText(from.sll_addr)).value_or("");
    neighbour.address = EchoSender({buffer.data(), static_cast<size_t>(size)}, id_, *bridge);
    if (!neighbour.mac.empty() && !neighbour.address.empty()) {
      neighbours.push_back(std::move(neighbour));
    }
  }
  if (now - asked_ > kListen) {
    ear_.Reset();
  }
  return neighbours;
}

std::string EchoSender(std::string_view packet, uint16_t id, const Bridge &bridge) {
  ip6_hdr ip{};
  icmp6_hdr icmp{};
  if (packet.size() < sizeof(ip) + sizeof(icmp)) {
    return "";
  }
  std::memcpy(&ip, packet.data(), sizeof(ip));
  std::memcpy(&icmp, packet.data() + sizeof(ip), sizeof(icmp));
  Ipv6Address sender{};
  std::memcpy(sender.data(), &ip.ip6_src, sender.size());
  const bool isAnswer = ip.ip6_nxt == IPPROTO_ICMPV6 && icmp.icmp6_type == ICMP6_ECHO_REPLY &&
                        icmp.icmp6_id == htons(id) && bridge.Covers(sender);
  std::array<char, INET6_ADDRSTRLEN> text{};
  return isAnswer ? inet_ntop(AF_INET6, sender.data(), text.data(), text.size()) : "";
}

} // namespace vornhost
