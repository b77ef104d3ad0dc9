#include "host/network/neighbours.h"

#include "host/network/mac_address.h"
#include "host/network/netlink.h"

#include <arpa/inet.h>
#include <linux/neighbour.h>
#include <netlink/addr.h>
#include <netlink/cache.h>
#include <netlink/errno.h>
#include <netlink/netlink.h>
#include <netlink/route/neighbour.h>
#include <netlink/socket.h>

#include <cerrno>
#include <memory>
#include <optional>

namespace vornhost {

namespace {

struct SocketDeleter {
  void operator()(nl_sock *socket) const { nl_socket_free(socket); }
};
struct CacheDeleter {
  void operator()(nl_cache *cache) const { nl_cache_free(cache); }
};

std::string AddressText(const nl_addr *address) {
  char text[INET6_ADDRSTRLEN] = "";
  const int family = nl_addr_get_family(address);
  const unsigned wanted = family == AF_INET ? 4 : 16;
  if ((family != AF_INET && family != AF_INET6) || nl_addr_get_len(address) != wanted) {
    return "";
  }
  return inet_ntop(family, nl_addr_get_binary_addr(address), text, sizeof(text)) == nullptr ? "" : text;
}

std::optional<Neighbour> ReadOne(rtnl_neigh *entry) {
  constexpr int kUnanswered = NUD_INCOMPLETE | NUD_FAILED | NUD_NOARP;
  const nl_addr *ip = rtnl_neigh_get_dst(entry);
  const nl_addr *link = rtnl_neigh_get_lladdr(entry);
  const int state = rtnl_neigh_get_state(entry);
  if (ip == nullptr || link == nullptr || state == NUD_NONE || (state & kUnanswered) != 0) {
    return std::nullopt;
  }
  char text[64];
  const auto mac = ParseMac(nl_addr2str(link, text, sizeof(text)));
  std::string address = AddressText(ip);
  if (!mac || address.empty()) {
    return std::nullopt;
  }
  return Neighbour{rtnl_neigh_get_ifindex(entry), nl_addr_get_family(ip), std::move(address), *mac, state};
}

} // namespace

std::vector<Neighbour> ReadNeighbours() {
  const std::unique_ptr<nl_sock, SocketDeleter> socket(nl_socket_alloc());
  if (socket == nullptr || nl_connect(socket.get(), NETLINK_ROUTE) < 0) {
    throw NetlinkError("netlink socket", ENOBUFS);
  }
  nl_cache *filled = nullptr;
  if (const int code = rtnl_neigh_alloc_cache(socket.get(), &filled); code < 0) {
    throw NetlinkError(std::string("neighbours: ") + nl_geterror(code), EIO);
  }
  const std::unique_ptr<nl_cache, CacheDeleter> cache(filled);
  std::vector<Neighbour> neighbours;
  for (nl_object *object = nl_cache_get_first(cache.get()); object != nullptr; object = nl_cache_get_next(object)) {
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): how libnl's objects are made
    if (auto one = ReadOne(reinterpret_cast<rtnl_neigh *>(object))) {
      neighbours.push_back(std::move(*one));
    }
  }
  return neighbours;
}

} // namespace vornhost
