#include "host/network/netlink.h"

#include "host/network/ipv4.h"

#include <linux/if_link.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <netinet/in.h>
#include <netlink/cache.h>
#include <netlink/msg.h>
#include <netlink/netlink.h>
#include <netlink/route/addr.h>
#include <netlink/route/link.h>
#include <netlink/route/link/inet6.h>
#include <netlink/route/nexthop.h>
#include <netlink/route/route.h>
#include <netlink/socket.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <initializer_list>

namespace vornhost {

namespace {

struct AddrDeleter {
  void operator()(nl_addr *address) const { nl_addr_put(address); }
};
using Addr = std::unique_ptr<nl_addr, AddrDeleter>;

// Of an IPv4 address in a message of the kernel.
int PrefixOf(const std::string &address) {
  const size_t slash = address.find('/');
  return slash == std::string::npos ? 32 : std::clamp(std::stoi(address.substr(slash + 1)), 0, 32);
}

std::string Text(nl_addr *address) {
  if (address == nullptr || nl_addr_get_len(address) == 0) {
    return "";
  }
  std::array<char, 128> text{};
  return nl_addr2str(address, text.data(), text.size());
}

Addr ParseAddr(const std::string &text, int family) {
  nl_addr *address = nullptr;
  if (nl_addr_parse(text.c_str(), family, &address) != 0) {
    throw NetlinkError("address " + text, EINVAL);
  }
  return Addr(address);
}

template <typename Cache, typename Visit> void ForEach(const Cache &cache, const Visit &visit) {
  for (nl_object *object = nl_cache_get_first(cache.get()); object != nullptr; object = nl_cache_get_next(object)) {
    visit(object);
  }
}

void Check(int result, const char *what) {
  if (result < 0) {
    throw NetlinkError(std::string(what) + ": " + nl_geterror(result), EIO);
  }
}

Link LinkOf(rtnl_link *link) {
  Link out;
  out.index = rtnl_link_get_ifindex(link);
  out.name = rtnl_link_get_name(link);
  const char *kind = rtnl_link_get_type(link);
  out.kind = kind != nullptr ? kind : "";
  out.mac = Text(rtnl_link_get_addr(link));
  const unsigned flags = rtnl_link_get_flags(link);
  out.up = (flags & IFF_UP) != 0;
  out.running = out.up && (flags & IFF_RUNNING) != 0;
  out.master = rtnl_link_get_master(link);
  uint8_t mode = 0;
  if (rtnl_link_inet6_get_addr_gen_mode(link, &mode) == 0) {
    out.addrGenMode = mode;
  }
  return out;
}

Address AddressOf(rtnl_addr *address) {
  Address out;
  out.index = rtnl_addr_get_ifindex(address);
  out.family = rtnl_addr_get_family(address);
  out.text = Text(rtnl_addr_get_local(address));
  out.broadcast = Text(rtnl_addr_get_broadcast(address));
  out.peer = Text(rtnl_addr_get_peer(address));
  out.scope = rtnl_addr_get_scope(address);
  out.flags = rtnl_addr_get_flags(address);
  if ((out.flags & IFA_F_PERMANENT) == 0) {
    out.validSeconds = rtnl_addr_get_valid_lifetime(address);
    out.preferredSeconds = rtnl_addr_get_preferred_lifetime(address);
  }
  return out;
}

bool IsUnicast(rtnl_route *route) {
  return rtnl_route_get_type(route) == RTN_UNICAST;
}

bool IsKept(rtnl_route *route) {
  const uint8_t protocol = rtnl_route_get_protocol(route);
  return rtnl_route_get_table(route) != RT_TABLE_LOCAL && IsUnicast(route) && rtnl_route_get_nnexthops(route) == 1 &&
         protocol != RTPROT_KERNEL && protocol != RTPROT_RA;
}

Route RouteOf(rtnl_route *route, rtnl_nexthop *hop) {
  Route out;
  out.index = rtnl_route_nh_get_ifindex(hop);
  out.family = rtnl_route_get_family(route);
  out.destination = Text(rtnl_route_get_dst(route));
  out.gateway = Text(rtnl_route_nh_get_gateway(hop));
  out.source = Text(rtnl_route_get_pref_src(route));
  out.metric = rtnl_route_get_priority(route);
  out.table = rtnl_route_get_table(route);
  out.protocol = rtnl_route_get_protocol(route);
  out.scope = rtnl_route_get_scope(route);
  out.hopFlags = rtnl_route_nh_get_flags(hop) & RTNH_F_ONLINK;
  out.isOneOfMany = rtnl_route_get_nnexthops(route) > 1;
  return out;
}

struct RouteCollector {
  const Netlink::RouteFilter &isWanted;
  std::vector<Route> routes;
};

int CollectRoute(nl_msg *message, void *context) {
  auto *collector = static_cast<RouteCollector *>(context);
  rtnl_route *raw = nullptr;
  if (rtnl_route_parse(nlmsg_hdr(message), &raw) == 0) {
    const std::unique_ptr<rtnl_route, void (*)(rtnl_route *)> route(raw, rtnl_route_put);
    const int hops = collector->isWanted(raw) ? rtnl_route_get_nnexthops(raw) : 0;
    for (int at = 0; at < hops; ++at) {
      collector->routes.push_back(RouteOf(raw, rtnl_route_nexthop_n(raw, at)));
    }
  }
  return NL_OK;
}

// @param[in] code  an errno that says that there is nothing to do
template <typename Change> void Tolerate(int code, const Change &change) {
  try {
    change();
  } catch (const NetlinkError &error) {
    if (error.GetCode() != code) {
      throw;
    }
  }
}

int KeepErrno(sockaddr_nl *, nlmsgerr *error, void *code) {
  *static_cast<int *>(code) = -error->error;
  return NL_STOP;
}

} // namespace

NetlinkError::NetlinkError(const std::string &what, int code)
    : std::runtime_error(what + ": " + std::strerror(code)), code_(code) {}

bool Address::IsLinkLocal6() const {
  return family == AF_INET6 && scope == RT_SCOPE_LINK;
}

std::string Address::Host() const {
  return text.substr(0, text.find('/'));
}

bool Address::Overlaps(const Address &other) const {
  const auto mine = ParseIpv4(Host().c_str());
  const auto others = ParseIpv4(other.Host().c_str());
  const uint32_t mask = NetmaskOfPrefix(std::min(PrefixOf(text), PrefixOf(other.text)));
  return mine && others && (*mine & mask) == (*others & mask);
}

void Netlink::SocketDeleter::operator()(nl_sock *socket) const {
  nl_socket_free(socket);
}

void Netlink::CacheDeleter::operator()(nl_cache *cache) const {
  nl_cache_free(cache);
}

// A message under construction. The put functions fail only when it is full, which none here can be.
struct Netlink::Message {
  explicit Message(nl_msg *ready) : raw(ready) {
    if (raw == nullptr) {
      throw std::bad_alloc();
    }
  }
  Message(int type, int flags, int index) : Message(nlmsg_alloc_simple(type, flags)) {
    ifinfomsg header{};
    header.ifi_index = index;
    nlmsg_append(raw, &header, sizeof(header), NLMSG_ALIGNTO);
  }
  Message(const Message &) = delete;
  Message &operator=(const Message &) = delete;
  ~Message() { nlmsg_free(raw); }

  template <typename Fill> void Nest(int attribute, const Fill &fill) {
    nlattr *nest = nla_nest_start(raw, attribute);
    fill();
    nla_nest_end(raw, nest);
  }
  void PutMac(const std::string &mac) {
    const Addr address = ParseAddr(mac, AF_LLC);
    nla_put_addr(raw, IFLA_ADDRESS, address.get());
  }
  void PutBridge() {
    Nest(IFLA_LINKINFO, [this] {
      nla_put_string(raw, IFLA_INFO_KIND, "bridge");
      Nest(IFLA_INFO_DATA, [this] {
        nla_put_u32(raw, IFLA_BR_STP_STATE, 0);
        nla_put_u32(raw, IFLA_BR_FORWARD_DELAY, 0);
      });
    });
  }

  nl_msg *raw;
};

Netlink::Netlink() : socket_(Connect()) {}

Netlink::Socket Netlink::Connect() {
  Socket socket(nl_socket_alloc());
  if (!socket) {
    throw std::bad_alloc();
  }
  Check(nl_connect(socket.get(), NETLINK_ROUTE), "rtnetlink socket"); // with SOCK_CLOEXEC
  const timeval limit{5, 0};
  setsockopt(nl_socket_get_fd(socket.get()), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof(limit));
  return socket;
}

void Netlink::Fail(const std::string &what, int code) {
  socket_ = Connect();
  throw NetlinkError(what, code);
}

// libnl's own functions for this wait for an answer also when the request could not be sent.
int Netlink::TryDump(nl_cache *cache, int type, int family) {
  const int result = nl_rtgen_request(socket_.get(), type, family, NLM_F_DUMP);
  return result < 0 ? result : nl_cache_pickup(socket_.get(), cache);
}

// A list that changed while it was read is read again.
constexpr int kDumpTries = 10;

Netlink::Cache Netlink::Dump(const char *kind, int type, int family) {
  nl_cache *raw = nullptr;
  Check(nl_cache_alloc_name(kind, &raw), kind);
  Cache cache(raw);
  int result = TryDump(raw, type, family);
  for (int attempt = 1; result == -NLE_DUMP_INTR && attempt < kDumpTries; ++attempt) {
    nl_cache_clear(raw);
    result = TryDump(raw, type, family);
  }
  if (result < 0) {
    Fail(std::string(kind) + ": " + nl_geterror(result), EIO);
  }
  return cache;
}

std::vector<Link> Netlink::Links() {
  const Cache cache = Dump("route/link", RTM_GETLINK, AF_UNSPEC);
  std::vector<Link> out;
  ForEach(cache, [&out](nl_object *object) { out.push_back(LinkOf(reinterpret_cast<rtnl_link *>(object))); });
  return out;
}

std::optional<Link> Netlink::FindLink(const std::string &name) {
  for (Link &link : Links()) {
    if (link.name == name) {
      return std::move(link);
    }
  }
  return std::nullopt;
}

std::vector<Address> Netlink::Addresses() {
  const Cache cache = Dump("route/addr", RTM_GETADDR, AF_UNSPEC);
  std::vector<Address> out;
  for (const int family : {AF_INET, AF_INET6}) {
    ForEach(cache, [&out, family](nl_object *object) {
      auto *address = reinterpret_cast<rtnl_addr *>(object);
      if (rtnl_addr_get_family(address) == family && rtnl_addr_get_local(address) != nullptr) {
        out.push_back(AddressOf(address));
      }
    });
  }
  return out;
}

// libnl's caches hold one route to a destination with a metric, where IPv6 may have several: routes are read one by
// one.
std::vector<Route> Netlink::DumpRoutes(int family, const RouteFilter &isWanted) {
  RouteCollector collector{isWanted, {}};
  const std::unique_ptr<nl_cb, void (*)(nl_cb *)> callbacks(nl_cb_alloc(NL_CB_DEFAULT), nl_cb_put);
  if (!callbacks) {
    throw std::bad_alloc();
  }
  nl_cb_set(callbacks.get(), NL_CB_VALID, NL_CB_CUSTOM, CollectRoute, &collector);
  int result = -NLE_DUMP_INTR;
  for (int attempt = 0; result == -NLE_DUMP_INTR && attempt < kDumpTries; ++attempt) {
    collector.routes.clear();
    result = nl_rtgen_request(socket_.get(), RTM_GETROUTE, family, NLM_F_DUMP);
    if (result >= 0) {
      result = nl_recvmsgs(socket_.get(), callbacks.get());
    }
  }
  if (result < 0) {
    Fail(std::string("list of routes: ") + nl_geterror(result), EIO);
  }
  return std::move(collector.routes);
}

std::vector<Route> Netlink::Routes() {
  std::vector<Route> out = DumpRoutes(AF_INET, IsKept);
  const std::vector<Route> other = DumpRoutes(AF_INET6, IsKept);
  out.insert(out.end(), other.begin(), other.end());
  return out;
}

std::vector<Route> Netlink::RoutesOf(int family, uint32_t table) {
  return DumpRoutes(family,
                    [table](rtnl_route *route) { return rtnl_route_get_table(route) == table && IsUnicast(route); });
}

void Netlink::Send(Message &message, const std::string &what) {
  int code = 0;
  const std::unique_ptr<nl_cb, void (*)(nl_cb *)> callbacks(nl_cb_alloc(NL_CB_DEFAULT), nl_cb_put);
  if (!callbacks) {
    throw std::bad_alloc();
  }
  nl_cb_err(callbacks.get(), NL_CB_CUSTOM, KeepErrno, &code);
  int result = nl_send_auto(socket_.get(), message.raw);
  if (result >= 0) {
    result = nl_recvmsgs(socket_.get(), callbacks.get());
  }
  if (code != 0) {
    throw NetlinkError(what, code);
  }
  if (result < 0) {
    Fail(what + ": " + nl_geterror(result), EIO);
  }
}

void Netlink::CreateBridge(const std::string &name, const std::string &mac) {
  Message message(RTM_NEWLINK, NLM_F_CREATE | NLM_F_EXCL, 0);
  nla_put_string(message.raw, IFLA_IFNAME, name.c_str());
  if (!mac.empty()) {
    message.PutMac(mac);
  }
  message.PutBridge();
  Send(message, "create bridge " + name);
}

void Netlink::ForwardAtOnce(int bridge) {
  Message message(RTM_NEWLINK, 0, bridge);
  message.PutBridge();
  Send(message, "spanning tree off");
}

void Netlink::DeleteLink(int index) {
  Message message(RTM_DELLINK, 0, index);
  Send(message, "delete link");
}

void Netlink::SetMaster(int index, int master) {
  Message message(RTM_NEWLINK, 0, index);
  nla_put_u32(message.raw, IFLA_MASTER, static_cast<uint32_t>(master));
  Send(message, master != 0 ? "enslave" : "release");
}

void Netlink::SetUp(int index, bool up) {
  ifinfomsg header{};
  header.ifi_index = index;
  header.ifi_flags = up ? IFF_UP : 0;
  header.ifi_change = IFF_UP;
  Message message(nlmsg_alloc_simple(RTM_NEWLINK, 0));
  nlmsg_append(message.raw, &header, sizeof(header), NLMSG_ALIGNTO);
  Send(message, up ? "set up" : "set down");
}

void Netlink::SetMac(int index, const std::string &mac) {
  Message message(RTM_NEWLINK, 0, index);
  message.PutMac(mac);
  Send(message, "set MAC address " + mac);
}

void Netlink::SetAddrGenMode(int index, uint8_t mode) {
  Message message(RTM_NEWLINK, 0, index);
  message.Nest(IFLA_AF_SPEC, [&message, mode] {
    message.Nest(AF_INET6, [&message, mode] { nla_put_u8(message.raw, IFLA_INET6_ADDR_GEN_MODE, mode); });
  });
  Send(message, "set addrgenmode");
}

void Netlink::ChangeAddress(const Address &address, int type, int flags) {
  const std::unique_ptr<rtnl_addr, void (*)(rtnl_addr *)> raw(rtnl_addr_alloc(), rtnl_addr_put);
  if (!raw) {
    throw std::bad_alloc();
  }
  const Addr local = ParseAddr(address.text, address.family);
  rtnl_addr_set_ifindex(raw.get(), address.index);
  rtnl_addr_set_local(raw.get(), local.get());
  if (!address.broadcast.empty()) {
    rtnl_addr_set_broadcast(raw.get(), ParseAddr(address.broadcast, address.family).get());
  }
  rtnl_addr_set_scope(raw.get(), address.scope);
  rtnl_addr_set_flags(raw.get(), address.flags & (IFA_F_NODAD | IFA_F_NOPREFIXROUTE | IFA_F_MANAGETEMPADDR));
  if (address.validSeconds != UINT32_MAX) {
    rtnl_addr_set_valid_lifetime(raw.get(), address.validSeconds);
    rtnl_addr_set_preferred_lifetime(raw.get(), address.preferredSeconds);
  }
  nl_msg *request = nullptr;
  Check(type == RTM_NEWADDR ? rtnl_addr_build_add_request(raw.get(), flags, &request)
                            : rtnl_addr_build_delete_request(raw.get(), flags, &request),
        "address request");
  Message message(request);
  Send(message, (type == RTM_NEWADDR ? "add address " : "delete address ") + address.text);
}

void Netlink::AddAddress(const Address &address) {
  Tolerate(EEXIST, [&] { ChangeAddress(address, RTM_NEWADDR, NLM_F_CREATE | NLM_F_EXCL); });
}

void Netlink::DeleteAddress(const Address &address) {
  // Secondary addresses go with their primary one.
  Tolerate(EADDRNOTAVAIL, [&] { ChangeAddress(address, RTM_DELADDR, 0); });
}

void Netlink::ChangeRoute(const Route &route, int type, int flags) {
  const std::unique_ptr<rtnl_route, void (*)(rtnl_route *)> raw(rtnl_route_alloc(), rtnl_route_put);
  rtnl_nexthop *hop = rtnl_route_nh_alloc();
  if (!raw || hop == nullptr) {
    throw std::bad_alloc();
  }
  rtnl_route_nh_set_ifindex(hop, route.index);
  rtnl_route_nh_set_flags(hop, route.hopFlags);
  rtnl_route_add_nexthop(raw.get(), hop); // now the route's
  const auto family = static_cast<uint8_t>(route.family);
  rtnl_route_set_family(raw.get(), family);
  const Addr destination = route.destination.empty() ? Addr(nl_addr_build(route.family, nullptr, 0))
                                                     : ParseAddr(route.destination, route.family);
  rtnl_route_set_dst(raw.get(), destination.get());
  if (!route.gateway.empty()) {
    rtnl_route_nh_set_gateway(hop, ParseAddr(route.gateway, route.family).get());
  }
  if (!route.source.empty()) {
    rtnl_route_set_pref_src(raw.get(), ParseAddr(route.source, route.family).get());
  }
  rtnl_route_set_table(raw.get(), route.table);
  rtnl_route_set_priority(raw.get(), route.metric);
  rtnl_route_set_protocol(raw.get(), static_cast<uint8_t>(route.protocol));
  rtnl_route_set_scope(raw.get(), static_cast<uint8_t>(route.scope));
  nl_msg *request = nullptr;
  Check(type == RTM_NEWROUTE ? rtnl_route_build_add_request(raw.get(), flags, &request)
                             : rtnl_route_build_del_request(raw.get(), flags, &request),
        "route request");
  Message message(request);
  const std::string what = route.destination.empty() ? "default" : route.destination;
  Send(message, (type == RTM_NEWROUTE ? "add route " : "delete route ") + what);
}

void Netlink::AddRoute(const Route &route) {
  Tolerate(EEXIST, [&] { InsertRoute(route); });
}

void Netlink::InsertRoute(const Route &route) {
  ChangeRoute(route, RTM_NEWROUTE, NLM_F_CREATE | NLM_F_EXCL);
}

void Netlink::AppendRoute(const Route &route) {
  Tolerate(EEXIST, [&] { ChangeRoute(route, RTM_NEWROUTE, NLM_F_CREATE | NLM_F_APPEND); });
}

void Netlink::ReplaceRoute(const Route &route) {
  ChangeRoute(route, RTM_NEWROUTE, NLM_F_CREATE | NLM_F_REPLACE);
}

void Netlink::DeleteRoute(const Route &route) {
  Tolerate(ESRCH, [&] { ChangeRoute(route, RTM_DELROUTE, 0); });
}

} // namespace vornhost
