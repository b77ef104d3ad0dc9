#include "host/devices/name_search.h"

#include "host/devices/dns_message.h"
#include "host/devices/node_status.h"
#include "host/devices/ssdp.h"
#include "host/network/ipv4.h"
#include "host/network/names.h"
#include "host/utility/log.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <random>

namespace vornhost {

namespace {

constexpr uint32_t kDnsGroup = 0xe00000fb; // 224.0.0.251
constexpr uint16_t kDnsPort = 5353;
constexpr uint32_t kSsdpGroup = 0xeffffffa; // 239.255.255.250
constexpr uint16_t kSsdpPort = 1900;
constexpr uint16_t kNetbiosPort = 137;
constexpr size_t kMessageLimit = 9000; // RFC 6762 section 17
constexpr int kMessagesAtOnce = 64;

sockaddr_in AddressOf(uint32_t ip, uint16_t port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(ip);
  address.sin_port = htons(port);
  return address;
}

void SetOption(const UniqueFd &fd, int level, int option, int value) {
  setsockopt(fd.Get(), level, option, &value, sizeof(value));
}

UniqueFd OpenSocket(const Bridge &bridge, uint32_t ip, uint16_t port) {
  UniqueFd fd(socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  SetOption(fd, SOL_SOCKET, SO_REUSEADDR, 1); // another program may listen to the same announcements
  SetOption(fd, SOL_SOCKET, SO_REUSEPORT, 1);
  const sockaddr_in address = AddressOf(ip, port);
  const bool isBound = fd.IsOpen() &&
                       setsockopt(fd.Get(), SOL_SOCKET, SO_BINDTODEVICE, bridge.name.c_str(),
                                  static_cast<socklen_t>(bridge.name.size())) == 0 &&
                       bind(fd.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)) == 0;
  if (!isBound) {
    LogError("names on %s, port %u: %s", bridge.name.c_str(), port, std::strerror(errno));
    fd.Reset();
  }
  return fd;
}

void Join(const UniqueFd &fd, const Bridge &bridge, uint32_t group) {
  ip_mreqn request{};
  request.imr_multiaddr.s_addr = htonl(group);
  request.imr_ifindex = bridge.index;
  if (fd.IsOpen()) {
    setsockopt(fd.Get(), IPPROTO_IP, IP_ADD_MEMBERSHIP, &request, sizeof(request));
  }
}

void SendTo(const UniqueFd &fd, const std::string &message, uint32_t ip, uint16_t port) {
  const sockaddr_in address = AddressOf(ip, port);
  if (fd.IsOpen()) {
    sendto(fd.Get(), message.data(), message.size(), 0, reinterpret_cast<const sockaddr *>(&address), sizeof(address));
  }
}

} // namespace

NameSearch::NameSearch(Handlers handlers)
    : handlers_(std::move(handlers)), id_(static_cast<uint16_t>(std::random_device()())) {}

NameSearch::Ears NameSearch::Open(const Bridge &bridge) {
  Ears ears{bridge, OpenSocket(bridge, bridge.networks.front().first, 0), OpenSocket(bridge, INADDR_ANY, kDnsPort),
            OpenSocket(bridge, INADDR_ANY, kSsdpPort)};
  ip_mreqn way{};
  way.imr_ifindex = bridge.index;
  setsockopt(ears.ask.Get(), IPPROTO_IP, IP_MULTICAST_IF, &way, sizeof(way));
  SetOption(ears.ask, IPPROTO_IP, IP_MULTICAST_LOOP, 0);
  SetOption(ears.ask, IPPROTO_IP, IP_MULTICAST_TTL, 4); // UPnP 1.1 says 2 by default; nothing here leaves the link
  Join(ears.dns, bridge, kDnsGroup);
  Join(ears.announce, bridge, kSsdpGroup);
  return ears;
}

void NameSearch::Follow(const std::vector<Bridge> &bridges) {
  std::erase_if(ears_, [&bridges](const Ears &ears) {
    return std::find(bridges.begin(), bridges.end(), ears.bridge) == bridges.end();
  });
  for (const Bridge &bridge : bridges) {
    const bool isOpen =
        std::any_of(ears_.begin(), ears_.end(), [&bridge](const Ears &ears) { return ears.bridge == bridge; });
    if (!isOpen && !bridge.networks.empty()) {
      ears_.push_back(Open(bridge));
    }
  }
}

void NameSearch::AskAll() const {
  const std::string services = ServiceQuestion();
  const std::string search = SearchMessage();
  for (const Ears &ears : ears_) {
    if (ears.IsGuests()) {
      continue;
    }
    SendTo(ears.ask, services, kDnsGroup, kDnsPort);
    SendTo(ears.ask, search, kSsdpGroup, kSsdpPort);
  }
}

// Each by itself, and by unicast (RFC 6762 section 5.5): the firewall lets in what answers that, and nothing that
// guests say unasked. No guest is told another one's address.
void NameSearch::AskGuest(const Ears &ears, uint32_t ip) {
  SendTo(ears.ask, ReverseQuestion({ip}), ip, kDnsPort);
  SendTo(ears.ask, ServiceQuestion(), ip, kDnsPort);
}

void NameSearch::Ask(const std::vector<Inquiry> &inquiries) const {
  const std::string status = NodeStatusRequest(id_);
  for (const Ears &ears : ears_) {
    std::vector<uint32_t> addresses;
    for (const Inquiry &inquiry : inquiries) {
      if (inquiry.netif != ears.bridge.name || !ears.bridge.Covers(inquiry.ip)) {
        continue;
      }
      SendTo(ears.ask, status, inquiry.ip, kNetbiosPort);
      if (ears.IsGuests()) {
        AskGuest(ears, inquiry.ip);
      } else {
        addresses.push_back(inquiry.ip);
      }
    }
    if (!addresses.empty()) {
      SendTo(ears.ask, ReverseQuestion(addresses), kDnsGroup, kDnsPort);
    }
  }
}

bool NameSearch::Ears::IsGuests() const {
  return bridge.name == kGuestBridge;
}

std::vector<int> NameSearch::Fds() const {
  std::vector<int> fds;
  for (const Ears &ears : ears_) {
    for (const UniqueFd *fd : {&ears.ask, &ears.dns, &ears.announce}) {
      if (fd->IsOpen()) {
        fds.push_back(fd->Get());
      }
    }
  }
  return fds;
}

void NameSearch::Receive() const {
  for (const Ears &ears : ears_) {
    for (const UniqueFd *fd : {&ears.ask, &ears.dns, &ears.announce}) {
      ReceiveFrom(ears, *fd);
    }
  }
}

void NameSearch::ReceiveFrom(const Ears &ears, const UniqueFd &fd) const {
  std::vector<char> buffer(kMessageLimit);
  for (int i = 0; fd.IsOpen() && i < kMessagesAtOnce; ++i) {
    sockaddr_in from{};
    socklen_t length = sizeof(from);
    const ssize_t size =
        recvfrom(fd.Get(), buffer.data(), buffer.size(), 0, reinterpret_cast<sockaddr *>(&from), &length);
    if (size < 0) {
      if (errno == EAGAIN) {
        return;
      }
      continue; // such as a port that nobody listens at, told by ICMP
    }
    Take(ears, &fd == &ears.ask, {buffer.data(), static_cast<size_t>(size)}, ntohl(from.sin_addr.s_addr),
         ntohs(from.sin_port));
  }
}

void NameSearch::Take(const Ears &ears, bool isAnswer, std::string_view message, uint32_t ip, uint16_t port) const {
  const std::string &netif = ears.bridge.name;
  if (port == kDnsPort) {
    handlers_.finding(Source::kMdns, netif, ip, ParseAnswer(message, ip));
  } else if (isAnswer && port == kNetbiosPort) {
    handlers_.finding(Source::kNetbios, netif, ip, {ParseNodeStatus(message, id_), "", ""});
  } else if (const std::optional<std::string> url = ParseLocation(message, Ipv4Text(ip))) {
    handlers_.location(netif, ip, *url);
  }
}

} // namespace vornhost
