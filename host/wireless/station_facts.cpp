#include "host/wireless/station_facts.h"

#include <linux/neighbour.h>
#include <sys/socket.h>

#include <algorithm>
#include <limits>
#include <string_view>
#include <tuple>

namespace vornhost {

namespace {

auto OrderOf(const DhcpLease &lease) {
  constexpr auto kNever = std::numeric_limits<std::time_t>::max();
  return std::tuple(std::string_view(lease.mac), -(lease.expires == 0 ? kNever : lease.expires));
}

auto OrderOf(const Neighbour &entry) {
  const bool answered = (entry.state & (NUD_REACHABLE | NUD_DELAY | NUD_PROBE | NUD_PERMANENT)) != 0;
  return std::tuple(std::string_view(entry.mac), !answered);
}

template <typename Entry> void SortByMac(std::vector<Entry> &entries) {
  std::stable_sort(entries.begin(), entries.end(),
                   [](const Entry &a, const Entry &b) { return OrderOf(a) < OrderOf(b); });
}

struct ByMac {
  template <typename Entry> bool operator()(const Entry &entry, const std::string &mac) const {
    return entry.mac < mac;
  }
  template <typename Entry> bool operator()(const std::string &mac, const Entry &entry) const {
    return mac < entry.mac;
  }
};

} // namespace

StationFacts::StationFacts(const std::vector<DhcpLease> &leases, const std::vector<Neighbour> &neighbours)
    : leases_(leases) {
  std::copy_if(neighbours.begin(), neighbours.end(), std::back_inserter(neighbours_),
               [](const Neighbour &entry) { return entry.family == AF_INET; });
  SortByMac(leases_);
  SortByMac(neighbours_);
}

StationFacts::Facts StationFacts::Find(const std::string &mac) const {
  const auto leases = std::equal_range(leases_.begin(), leases_.end(), mac, ByMac());
  const auto neighbours = std::equal_range(neighbours_.begin(), neighbours_.end(), mac, ByMac());
  const auto isUsed = [&neighbours](const DhcpLease &lease) {
    return std::any_of(neighbours.first, neighbours.second,
                       [&lease](const Neighbour &entry) { return entry.ip == lease.ip; });
  };
  auto lease = std::find_if(leases.first, leases.second, isUsed);
  lease = lease == leases.second ? leases.first : lease;
  if (lease != leases.second) {
    return {lease->ip, lease->hostname};
  }
  return {neighbours.first == neighbours.second ? "" : neighbours.first->ip, ""};
}

} // namespace vornhost
