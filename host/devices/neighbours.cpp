#include "host/devices/neighbours.h"

#include "host/devices/mac_address.h"
#include "host/network/ipv4.h"

#include <arpa/inet.h>
#include <linux/neighbour.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <unistd.h>

namespace vornhost {

namespace {

constexpr int64_t kTickMillis = 10; // the kernel tells times in hundredths of a second (USER_HZ)
constexpr size_t kBufferSize = 65536;

UniqueFd OpenNetlink(uint32_t groups) {
  UniqueFd fd(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE));
  sockaddr_nl address{};
  address.nl_family = AF_NETLINK;
  address.nl_groups = groups;
  if (!fd.IsOpen() || bind(fd.Get(), reinterpret_cast<sockaddr *>(&address), sizeof(address)) != 0) {
    throw std::runtime_error(std::string("rtnetlink: ") + std::strerror(errno));
  }
  return fd;
}

template <typename Value> bool Take(std::string_view bytes, Value &value) {
  if (bytes.size() < sizeof(value)) {
    return false;
  }
  std::memcpy(&value, bytes.data(), sizeof(value));
  return true;
}

// Messages and attributes begin with their length, and are padded to four bytes.
template <typename Visit> void ForEachMessage(std::string_view bytes, const Visit &visit) {
  nlmsghdr header{};
  while (Take(bytes, header) && header.nlmsg_len >= sizeof(header) && header.nlmsg_len <= bytes.size()) {
    visit(header.nlmsg_type, bytes.substr(sizeof(header), header.nlmsg_len - sizeof(header)));
    bytes.remove_prefix(std::min<size_t>(NLMSG_ALIGN(header.nlmsg_len), bytes.size()));
  }
}

template <typename Visit> void ForEachAttribute(std::string_view bytes, const Visit &visit) {
  rtattr header{};
  while (Take(bytes, header) && header.rta_len >= sizeof(header) && header.rta_len <= bytes.size()) {
    visit(header.rta_type, bytes.substr(sizeof(header), header.rta_len - sizeof(header)));
    bytes.remove_prefix(std::min<size_t>(RTA_ALIGN(header.rta_len), bytes.size()));
  }
}

// The interface identifier is the second half (RFC 4291 section 2.5.1).
std::string GuessOf(std::string_view linkLocal, const Bridge &bridge) {
  const auto network = std::find_if(bridge.networks6.begin(), bridge.networks6.end(),
                                    [](const auto &each) { return each.second == 64; });
  if (network == bridge.networks6.end()) {
    return "";
  }
  Ipv6Address guess = network->first;
  std::memcpy(guess.data() + guess.size() / 2, linkLocal.data() + guess.size() / 2, guess.size() / 2);
  std::array<char, INET6_ADDRSTRLEN> text{};
  return inet_ntop(AF_INET6, guess.data(), text.data(), text.size());
}

void TakeAddress(std::string_view bytes, const Bridge &bridge, DeviceNeighbour &neighbour) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  const size_t wanted = neighbour.family == AF_INET ? 4 : 16;
  if (bytes.size() == wanted && inet_ntop(neighbour.family, bytes.data(), text.data(), text.size()) != nullptr) {
    neighbour.address = text.data();
    const auto first = static_cast<uint8_t>(bytes[0]);
    const auto second = static_cast<uint8_t>(bytes[1]);
    neighbour.linkLocal =
        neighbour.family == AF_INET ? first == 169 && second == 254 : first == 0xfe && (second & 0xc0U) == 0x80;
    if (neighbour.family == AF_INET6 && neighbour.linkLocal) {
      neighbour.guess = GuessOf(bytes, bridge);
    }
  }
}

void TakeMac(std::string_view bytes, DeviceNeighbour &neighbour) {
  if (bytes.size() == kMacBytes) {
    neighbour.mac = ParseDeviceMac(MacText(reinterpret_cast<const uint8_t *>(bytes.data()))).value_or("");
  }
}

void TakeNeighbour(std::string_view body, const std::vector<Bridge> &bridges,
                   std::vector<DeviceNeighbour> &neighbours) {
  ndmsg header{};
  if (!Take(body, header) || (header.ndm_family != AF_INET && header.ndm_family != AF_INET6) ||
      (header.ndm_state & (NUD_REACHABLE | NUD_STALE | NUD_DELAY | NUD_PROBE)) == 0) {
    return;
  }
  const auto bridge = std::find_if(bridges.begin(), bridges.end(),
                                   [&header](const Bridge &each) { return each.index == header.ndm_ifindex; });
  if (bridge == bridges.end()) {
    return;
  }
  DeviceNeighbour neighbour;
  neighbour.netif = bridge->name;
  neighbour.index = bridge->index;
  neighbour.family = header.ndm_family;
  neighbour.reachable = (header.ndm_state & NUD_REACHABLE) != 0;
  bool hasAge = false;
  body.remove_prefix(std::min<size_t>(NLMSG_ALIGN(sizeof(header)), body.size()));
  ForEachAttribute(body, [&](unsigned short type, std::string_view value) {
    nda_cacheinfo age{};
    if (type == NDA_DST) {
      TakeAddress(value, *bridge, neighbour);
    } else if (type == NDA_LLADDR) {
      TakeMac(value, neighbour);
    } else if (type == NDA_CACHEINFO && Take(value, age)) {
      neighbour.confirmedAgo = int64_t{age.ndm_confirmed} * kTickMillis;
      neighbour.updatedAgo = int64_t{age.ndm_updated} * kTickMillis;
      hasAge = true;
    }
  });
  const bool isOwn = neighbour.mac == bridge->mac; // the router hears its own advertisements
  if (hasAge && !isOwn && !neighbour.mac.empty() && !neighbour.address.empty()) {
    neighbours.push_back(std::move(neighbour));
  }
}

bool IsHomes(const Link &link) {
  return link.kind == "bridge" && link.up && link.name.find("br") != std::string::npos;
}

// @return the whole address's length where there is none
int PrefixOf(const Address &address, int whole) {
  const size_t slash = address.text.find('/');
  int prefix = whole;
  if (slash != std::string::npos) {
    std::from_chars(address.text.data() + slash + 1, address.text.data() + address.text.size(), prefix);
  }
  return prefix;
}

void AddNetwork(Bridge &bridge, const Address &address) {
  Ipv6Address ip6{};
  if (address.family == AF_INET6) {
    if (!address.IsLinkLocal6() && inet_pton(AF_INET6, address.Host().c_str(), ip6.data()) == 1) {
      bridge.networks6.emplace_back(ip6, PrefixOf(address, 128));
    }
    return;
  }
  if (const std::optional<uint32_t> ip = ParseIpv4(address.Host().c_str())) {
    bridge.networks.emplace_back(*ip, PrefixOf(address, 32));
  }
}

// @return false at the end of the dump
bool TakeDump(std::string_view messages, const std::vector<Bridge> &bridges, std::vector<DeviceNeighbour> &neighbours) {
  bool goesOn = true;
  ForEachMessage(messages, [&goesOn](uint16_t type, std::string_view) {
    goesOn = goesOn && type != NLMSG_DONE && type != NLMSG_ERROR;
  });
  ParseNeighbours(messages, bridges, neighbours);
  return goesOn;
}

} // namespace

bool Bridge::Covers(uint32_t address) const {
  return std::any_of(networks.begin(), networks.end(), [address](const auto &network) {
    return ((network.first ^ address) & NetmaskOfPrefix(network.second)) == 0;
  });
}

bool Bridge::Covers(const Ipv6Address &address) const {
  return std::any_of(networks6.begin(), networks6.end(), [&address](const auto &network) {
    const auto &[own, prefix] = network;
    const auto whole = own.begin() + prefix / 8;
    const unsigned rest = 0xffU & (0xff00U >> static_cast<unsigned>(prefix % 8));
    return std::equal(own.begin(), whole, address.begin()) &&
           (prefix == 128 || ((*whole ^ address[static_cast<size_t>(prefix / 8)]) & rest) == 0);
  });
}

std::vector<Bridge> ReadBridges(Netlink &netlink) {
  std::vector<Bridge> bridges;
  for (const Link &link : netlink.Links()) {
    if (IsHomes(link)) {
      bridges.push_back({link.index, link.name, link.mac, {}, {}});
    }
  }
  for (const Address &address : netlink.Addresses()) {
    for (Bridge &bridge : bridges) {
      if (bridge.index == address.index) {
        AddNetwork(bridge, address);
      }
    }
  }
  return bridges;
}

void ParseNeighbours(std::string_view messages, const std::vector<Bridge> &bridges,
                     std::vector<DeviceNeighbour> &neighbours) {
  ForEachMessage(messages, [&](uint16_t type, std::string_view body) {
    if (type == RTM_NEWNEIGH) {
      TakeNeighbour(body, bridges, neighbours);
    }
  });
}

NeighbourTable::NeighbourTable()
    : events_(OpenNetlink(RTMGRP_NEIGH | RTMGRP_LINK | RTMGRP_IPV4_IFADDR | RTMGRP_IPV6_IFADDR)) {}

NeighbourTable::Changes NeighbourTable::TakeChanges() {
  Changes changes;
  std::vector<char> buffer(kBufferSize);
  for (;;) {
    const ssize_t size = recv(events_.Get(), buffer.data(), buffer.size(), MSG_DONTWAIT);
    if (size < 0 && errno == EINTR) {
      continue;
    }
    if (size < 0) {
      const bool isLost = errno == ENOBUFS;
      return isLost ? Changes{true, true} : changes;
    }
    ForEachMessage({buffer.data(), static_cast<size_t>(size)}, [&changes](uint16_t type, std::string_view) {
      const bool isNeighbour = type == RTM_NEWNEIGH || type == RTM_DELNEIGH;
      changes.neighbours = changes.neighbours || isNeighbour;
      changes.links = changes.links || !isNeighbour;
    });
  }
}

std::vector<DeviceNeighbour> NeighbourTable::Read(const std::vector<Bridge> &bridges) {
  struct {
    nlmsghdr header;
    ndmsg body;
  } request{};
  request.header.nlmsg_len = sizeof(request);
  request.header.nlmsg_type = RTM_GETNEIGH;
  request.header.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
  const UniqueFd fd = OpenNetlink(0);
  std::vector<DeviceNeighbour> neighbours;
  if (send(fd.Get(), &request, sizeof(request), 0) != sizeof(request)) {
    throw std::runtime_error(std::string("neighbours: ") + std::strerror(errno));
  }
  std::vector<char> buffer(kBufferSize);
  for (bool goesOn = true; goesOn;) {
    const ssize_t size = recv(fd.Get(), buffer.data(), buffer.size(), 0);
    if (size < 0 && errno != EINTR) {
      throw std::runtime_error(std::string("neighbours: ") + std::strerror(errno));
    }
    goesOn = size < 0 || TakeDump({buffer.data(), static_cast<size_t>(size)}, bridges, neighbours);
  }
  return neighbours;
}

} // namespace vornhost
