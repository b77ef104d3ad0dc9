#include "host/routes/route_follower.h"

#include "host/routes/gateways.h"
#include "host/routes/rule_store.h"
#include "host/routes/static_routes.h"
#include "host/utility/log.h"

#include <linux/rtnetlink.h>
#include <netlink/netlink.h>
#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

// How long a link that came back must stay before the traffic moves back to it.
constexpr auto kSettleTime = std::chrono::seconds(5);

// Changes come in bursts: a link that comes up brings addresses, and they bring routes.
constexpr auto kBurst = std::chrono::milliseconds(20);

} // namespace

void RouteFollower::SocketDeleter::operator()(nl_sock *socket) const {
  nl_socket_free(socket);
}

RouteFollower::RouteFollower() : socket_(nl_socket_alloc()) {
  if (!socket_ || nl_connect(socket_.get(), NETLINK_ROUTE) != 0 || nl_socket_set_nonblocking(socket_.get()) != 0 ||
      nl_socket_add_memberships(socket_.get(), RTNLGRP_LINK, RTNLGRP_IPV4_IFADDR, RTNLGRP_IPV6_IFADDR,
                                RTNLGRP_IPV4_ROUTE, RTNLGRP_IPV6_ROUTE, 0) != 0) {
    throw std::runtime_error("rtnetlink cannot be listened to");
  }
}

void RouteFollower::NoteLinks(const std::vector<Link> &links) {
  std::set<std::string> running;
  for (const Link &link : links) {
    if (link.running) {
      running.insert(link.name);
    }
  }
  for (const std::string &name : running_) {
    if (!running.contains(name)) {
      lost_.insert(name);
      settled_.erase(name);
    }
  }
  for (const std::string &name : running) {
    if (lost_.erase(name) != 0) {
      settled_[name] = Clock::now() + kSettleTime;
    }
  }
  running_ = std::move(running);
}

std::set<std::string> RouteFollower::Settling() {
  const auto now = Clock::now();
  std::erase_if(settled_, [now](const auto &entry) { return entry.second <= now; });
  std::set<std::string> names;
  for (const auto &[name, when] : settled_) {
    names.insert(name);
  }
  return names;
}

std::vector<std::string> RouteFollower::Apply() {
  std::vector<std::string> failures;
  const auto attempt = [&failures](const auto &action) {
    try {
      action();
    } catch (const std::exception &error) {
      failures.emplace_back(error.what());
    }
  };
  attempt([&] {
    const UniqueFd turn = TakeRouteTurn();
    Netlink netlink;
    NoteLinks(netlink.Links());
    const std::set<std::string> settling = Settling();
    for (const int family : {AF_INET, AF_INET6}) {
      attempt([&] {
        const std::vector<std::string> refused = StaticRoutes(netlink, family).Install();
        failures.insert(failures.end(), refused.begin(), refused.end());
      });
      attempt([&] { Gateways(netlink, family).Refresh(settling); });
    }
  });
  return failures;
}

// What the messages say is asked for anew anyway; one that was lost counts as one that came.
void RouteFollower::Drain() {
  std::array<char, 16384> buffer{};
  while (recv(nl_socket_get_fd(socket_.get()), buffer.data(), buffer.size(), MSG_DONTWAIT) >= 0 || errno == ENOBUFS ||
         errno == EINTR) {
  }
}

void RouteFollower::Wait() {
  int timeout = -1;
  for (const auto &[name, when] : settled_) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(when - Clock::now()).count();
    const int wait = static_cast<int>(std::max<decltype(left)>(left, 0));
    timeout = timeout < 0 ? wait : std::min(timeout, wait);
  }
  pollfd entry{nl_socket_get_fd(socket_.get()), POLLIN, 0};
  if (poll(&entry, 1, timeout) > 0) {
    std::this_thread::sleep_for(kBurst);
    Drain();
  }
}

void RouteFollower::Follow() {
  std::vector<std::string> told;
  for (;;) {
    const std::vector<std::string> failures = Apply();
    if (failures != told) {
      for (const std::string &failure : failures) {
        LogError("routes: %s", LogText(failure).c_str());
      }
      told = failures;
    }
    Wait();
  }
}

} // namespace vornhost
