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
#include <functional>
#include <optional>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

// How long a link that came back must stay before the traffic moves back to it.
constexpr auto kSettleTime = std::chrono::seconds(5);

// What could not be done may be possible a moment later, and no news may tell of it.
constexpr auto kRetryTime = std::chrono::seconds(5);

// Changes come in bursts: a link that comes up brings addresses, and they bring routes.
constexpr auto kBurst = std::chrono::milliseconds(20);

// Links that were lost and are not there any more. One that is plugged in again soon settles all the same.
constexpr size_t kGoneLimit = 64;

// What settles and how the links stand are of one moment: a link that came back in between would count as settled.
using FindSettling = std::function<Settling(const std::vector<Link> &links)>;

std::vector<std::string> Restore(const FindSettling &findSettling) {
  std::vector<std::string> failures;
  const auto attempt = [&failures](const auto &action) {
    try {
      const std::vector<std::string> refused = action();
      failures.insert(failures.end(), refused.begin(), refused.end());
    } catch (const std::exception &error) {
      failures.emplace_back(error.what());
    }
  };
  attempt([&]() -> std::vector<std::string> {
    const UniqueFd turn = TakeRouteTurn();
    Netlink netlink;
    const std::vector<Link> links = netlink.Links();
    const Settling settling = findSettling(links);
    for (const int family : {AF_INET, AF_INET6}) {
      attempt([&] { return StaticRoutes(netlink, family).Install(); });
      attempt([&] { return Gateways(netlink, family).Follow(links, settling); });
    }
    return {};
  });
  return failures;
}

} // namespace

std::vector<std::string> RestoreRoutes() {
  return Restore([](const std::vector<Link> &) { return std::nullopt; });
}

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
  if (lost_.size() > kGoneLimit) {
    std::erase_if(lost_, [&links](const std::string &name) {
      return std::none_of(links.begin(), links.end(), [&name](const Link &link) { return link.name == name; });
    });
  }
}

std::set<std::string> RouteFollower::NamesSettling() {
  const auto now = Clock::now();
  std::erase_if(settled_, [now](const auto &entry) { return entry.second <= now; });
  std::set<std::string> names;
  for (const auto &[name, when] : settled_) {
    names.insert(name);
  }
  return names;
}

// What the messages say is asked for anew anyway; one that was lost (ENOBUFS) counts as one that came.
void RouteFollower::Drain() {
  std::array<char, 16384> buffer{};
  while (recv(nl_socket_get_fd(socket_.get()), buffer.data(), buffer.size(), MSG_DONTWAIT) >= 0 || errno == ENOBUFS ||
         errno == EINTR) {
  }
  if (errno != EAGAIN) {
    throw std::runtime_error(std::string("rtnetlink: ") + std::strerror(errno));
  }
}

void RouteFollower::Wait(bool isWhole) {
  using std::chrono::milliseconds;
  const auto now = Clock::now();
  auto until = isWhole ? Clock::time_point::max() : now + kRetryTime;
  for (const auto &[name, when] : settled_) {
    until = std::min(until, std::max(when, now));
  }
  const bool isEndless = until == Clock::time_point::max();
  const int timeout = isEndless ? -1 : static_cast<int>(std::chrono::ceil<milliseconds>(until - now).count());
  pollfd entry{nl_socket_get_fd(socket_.get()), POLLIN, 0};
  if (poll(&entry, 1, timeout) > 0) {
    std::this_thread::sleep_for(kBurst);
    Drain();
  }
}

void RouteFollower::Follow() {
  std::vector<std::string> told;
  for (;;) {
    const std::vector<std::string> failures = Restore([this](const std::vector<Link> &links) {
      NoteLinks(links);
      return NamesSettling();
    });
    if (failures != told) {
      for (const std::string &failure : failures) {
        LogError("routes: %s", LogText(failure).c_str());
      }
      told = failures;
    }
    Wait(failures.empty());
  }
}

} // namespace vornhost
