// Keeping the kernel's routes what the files say while the network changes.
//
// Every change of a link, an address or a route is a reason to look again; what is so already is left alone, so that
// the follower's own changes end in silence. A link that comes back counts as settling for some seconds: the gateways
// move away from a lost link at once, and back only to one that stays.
#ifndef HOST_ROUTES_ROUTE_FOLLOWER_H
#define HOST_ROUTES_ROUTE_FOLLOWER_H

#include "host/network/netlink.h"

#include <chrono>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

struct nl_sock;

namespace vornhost {

/// Makes static routes and default routes of both families follow their files, once. A link that a follower lets settle
/// goes on settling.
/// @return what could not be done, a text for each
std::vector<std::string> RestoreRoutes();

class RouteFollower {
public:
  /// Listens from now on. Throws std::runtime_error when it cannot.
  RouteFollower();

  /// Restores now, at each change, and some seconds after something could not be done, for ever. What cannot be done is
  /// logged once, until something else cannot. Throws std::runtime_error when the kernel cannot be listened to any
  /// more.
  [[noreturn]] void Follow();

private:
  using Clock = std::chrono::steady_clock;

  struct SocketDeleter {
    void operator()(nl_sock *socket) const;
  };

  void NoteLinks(const std::vector<Link> &links);
  std::set<std::string> NamesSettling();
  void Wait(bool isWhole);
  void Drain();

  std::unique_ptr<nl_sock, SocketDeleter> socket_;
  std::set<std::string> running_;                    // links that ran when they were last looked at
  std::set<std::string> lost_;                       // links that ran once and then did not
  std::map<std::string, Clock::time_point> settled_; // when a link that came back will count as settled
};

} // namespace vornhost

#endif
