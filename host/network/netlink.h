// The kernel's links, addresses and routes, by rtnetlink.
//
// Reading goes through libnl's caches; changing is one acknowledged message each, so that the kernel's errno is known.
#ifndef HOST_NETWORK_NETLINK_H
#define HOST_NETWORK_NETLINK_H

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

struct nl_cache;
struct nl_msg;
struct nl_sock;
struct rtnl_addr;
struct rtnl_route;

namespace vornhost {

struct Link {
  int index = 0;
  std::string name;
  std::string kind;                   ///< "bridge", "veth", ...; empty for hardware
  std::string mac;                    ///< lower case, colons; empty when there is none
  bool up = false;                    ///< administratively
  bool running = false;               ///< up, and something is at the other end
  int master = 0;                     ///< index of the bridge that it is a port of; 0 when it is none
  std::optional<uint8_t> addrGenMode; ///< IN6_ADDR_GEN_MODE_*; nothing when IPv6 is off for it
};

struct Address {
  int index = 0; ///< of its link
  int family = 0;
  std::string text; ///< with prefix length, as "192.168.1.1/24"; without one it is a host's
  std::string broadcast;
  std::string peer; ///< with prefix length: what is on the link instead of the address's own subnet; empty: none
  int scope = 0;
  uint32_t flags = 0;
  uint32_t validSeconds = UINT32_MAX; ///< UINT32_MAX: for ever
  uint32_t preferredSeconds = UINT32_MAX;

  bool IsLinkLocal6() const;
  /// Without the prefix length.
  std::string Host() const;
  /// Whether both are IPv4 and one's subnet has addresses of the other's.
  bool Overlaps(const Address &other) const;
};

/// A unicast route over one next hop, or one hop of a route that has several.
struct Route {
  int index = 0; ///< of the link that it goes out of
  int family = 0;
  std::string destination; ///< with prefix length; empty: the default route
  std::string gateway;     ///< empty: on the link
  std::string source;      ///< preferred source address; empty: none
  uint32_t metric = 0;
  uint32_t table = 0;
  int protocol = 0;
  int scope = 0;
  uint32_t hopFlags = 0;    ///< RTNH_F_ONLINK
  bool isOneOfMany = false; ///< there are other hops; all are listed under the first one's protocol
};

/// The kernel refused or could not be asked.
class NetlinkError : public std::runtime_error {
public:
  /// @param[in] code  a positive errno
  NetlinkError(const std::string &what, int code);
  int GetCode() const { return code_; }

private:
  int code_;
};

/// Every operation throws NetlinkError when it fails. An object belongs to one thread.
class Netlink {
public:
  using RouteFilter = std::function<bool(rtnl_route *)>;

  Netlink();

  std::vector<Link> Links();
  std::optional<Link> FindLink(const std::string &name);
  /// In the kernel's order, IPv4 before IPv6.
  std::vector<Address> Addresses();
  /// Those of every table but the local one; without those that the kernel itself makes or that a router advertises.
  std::vector<Route> Routes();
  /// Those of one table and family, whoever made them, in the kernel's order; those of several hops hop by hop.
  std::vector<Route> RoutesOf(int family, uint32_t table);

  /// Makes a bridge that forwards at once (no spanning tree, no delay), still down.
  /// @param[in] mac  empty: the kernel chooses
  void CreateBridge(const std::string &name, const std::string &mac);
  void DeleteLink(int index);
  /// @param[in] master  index of a bridge; 0 releases the link
  void SetMaster(int index, int master);
  void SetUp(int index, bool up);
  void SetMac(int index, const std::string &mac);
  void SetAddrGenMode(int index, uint8_t mode);
  void ForwardAtOnce(int bridge);

  /// One that is there already is no error.
  void AddAddress(const Address &address);
  void DeleteAddress(const Address &address);
  void AddRoute(const Route &route);
  /// One that is there already, be it another's, is EEXIST.
  void InsertRoute(const Route &route);
  /// Behind those to the same destination with the same metric. One that is there already is no error.
  void AppendRoute(const Route &route);
  /// Takes the place of the route to the same destination with the same metric, in one step.
  void ReplaceRoute(const Route &route);
  /// One that is not there any more is no error.
  void DeleteRoute(const Route &route);

private:
  struct SocketDeleter {
    void operator()(nl_sock *socket) const;
  };
  using Socket = std::unique_ptr<nl_sock, SocketDeleter>;
  struct CacheDeleter {
    void operator()(nl_cache *cache) const;
  };
  using Cache = std::unique_ptr<nl_cache, CacheDeleter>;
  struct Message;

  static Socket Connect();
  Cache Dump(const char *kind, int type, int family);
  int TryDump(nl_cache *cache, int type, int family);
  /// After a failure on the way libnl waits for the answer that did not come, for ever.
  [[noreturn]] void Fail(const std::string &what, int code);

  std::vector<Route> DumpRoutes(int family, const RouteFilter &isWanted);
  void Send(Message &message, const std::string &what);
  void ChangeAddress(const Address &address, int type, int flags);
  void ChangeRoute(const Route &route, int type, int flags);

  Socket socket_;
};

} // namespace vornhost

#endif
