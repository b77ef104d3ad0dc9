#include "host/timecontrol/neighbours.h"

#include "host/utility/log.h"

#include <netlink/cache.h>
#include <netlink/route/neighbour.h>
#include <netlink/socket.h>

#include <array>
#include <memory>

namespace vornhost {

namespace {

struct SocketFree {
  void operator()(nl_sock *socket) const { nl_socket_free(socket); }
};
struct CacheFree {
  void operator()(nl_cache *cache) const { nl_cache_free(cache); }
};

std::string TextOf(nl_addr *address) {
  std::array<char, 64> text{};
  return address == nullptr ? "" : nl_addr2str(address, text.data(), text.size());
}

} // namespace

std::vector<std::string> AddressesOf(const MacSet &macs) {
  std::vector<std::string> addresses;
  const std::unique_ptr<nl_sock, SocketFree> socket(nl_socket_alloc());
  nl_cache *filled = nullptr;
  if (!socket || nl_connect(socket.get(), NETLINK_ROUTE) != 0 || rtnl_neigh_alloc_cache(socket.get(), &filled) != 0) {
    LogError("time control: the kernel does not tell its neighbours");
    return addresses;
  }
  const std::unique_ptr<nl_cache, CacheFree> cache(filled);
  for (nl_object *each = nl_cache_get_first(cache.get()); each != nullptr; each = nl_cache_get_next(each)) {
    auto *neighbour = reinterpret_cast<rtnl_neigh *>(each);
    const int family = rtnl_neigh_get_family(neighbour);
    if ((family == AF_INET || family == AF_INET6) && macs.count(TextOf(rtnl_neigh_get_lladdr(neighbour))) != 0) {
      addresses.push_back(TextOf(rtnl_neigh_get_dst(neighbour)));
    }
  }
  return addresses;
}

} // namespace vornhost
