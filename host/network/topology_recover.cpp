#include "host/network/topology.h"

#include "host/network/dhcp_client.h"
#include "host/network/names.h"
#include "host/network/network_state.h"
#include "host/network/topology_config.h"
#include "host/network/topology_lock.h"
#include "host/network/topology_steps.h"
#include "host/network/turn.h"
#include "host/utility/log.h"
#include "host/wireless/access_points.h"
#include "host/wireless/supplicant.h"

#include <algorithm>
#include <array>

namespace vornhost {

namespace {

constexpr std::array<const char *, 2> kBridges = {kLanBridge, kOneBridge};

bool WasServed(const Snapshot &snapshot, const std::string &name) {
  const auto &served = snapshot.dhcpInterfaces;
  return std::find(served.begin(), served.end(), name) != served.end();
}

void ResumeDhcp(const Snapshot &snapshot, const std::string &name) {
  const DhcpClient client(name);
  const LinkState *link = snapshot.Find(name);
  if (!client.IsRunning() && link != nullptr) {
    client.Resume(link->FirstIpv4());
  }
}

// One that was not running is ended before its interface is put back, one that was is started last, as DHCP clients
// are.
bool RestoreJoined(const Snapshot &snapshot) {
  const Supplicant supplicant;
  if (!snapshot.joined || supplicant.IsRunning()) {
    return true;
  }
  return Attempt("join over", snapshot.upstream, [&] { supplicant.Start(snapshot.upstream); });
}

bool StopClients(const Snapshot &snapshot) {
  bool whole = true;
  for (const std::string &name : {std::string(kWanPort), std::string(kOneBridge), snapshot.upstream}) {
    if (!name.empty() && !WasServed(snapshot, name)) {
      whole = Attempt("stop DHCP on", name, [&name] { DhcpClient(name).Stop(); }) && whole;
    }
  }
  if (!snapshot.upstream.empty() && !snapshot.joined) {
    whole = Attempt("leave over", snapshot.upstream, [] { Supplicant().Stop(); }) && whole;
  }
  return whole;
}

// What became a way out only with the switch has a default route that would keep the old one's from coming back.
bool ClearNewUplinks(Netlink &netlink, const Snapshot &snapshot) {
  NetworkState state(netlink);
  bool whole = true;
  for (const LinkState &link : snapshot.links) {
    const std::string &name = link.link.name;
    if ((name == kWanPort || name == snapshot.upstream) && link.FirstIpv4().empty() && netlink.FindLink(name)) {
      whole = Attempt("clear", name, [&state, &name] { state.Clear(name); }) && whole;
    }
  }
  return whole;
}

bool RestoreFromLock(Netlink &netlink, const TopologyLock &lock) {
  const std::optional<Snapshot> snapshot = ParseSnapshot(lock.Read());
  if (!snapshot) {
    LogError("%s holds no snapshot: the network is made what its configuration says", kTopologyLock);
    return ApplyConfiguration(netlink);
  }
  if (snapshot->boot != BootId()) {
    LogError("a switch from %s to %s was cut off by a restart", snapshot->from.c_str(), snapshot->to.c_str());
    return Attempt("restore", kWanConfig, [&snapshot] { RestoreWanFile(snapshot->wanFile); });
  }
  LogError("a switch from %s to %s died: going back to %s", snapshot->from.c_str(), snapshot->to.c_str(),
           snapshot->from.c_str());
  return RestoreSnapshot(netlink, *snapshot);
}

} // namespace

// A client of a way out that was none comes first, so that it configures nothing any more; the clients that ran come
// last, on links that are as they left them.
bool RestoreSnapshot(Netlink &netlink, const Snapshot &snapshot) {
  NetworkState state(netlink);
  bool whole = StopClients(snapshot);
  whole = ClearNewUplinks(netlink, snapshot) && whole;
  const std::string bridge = LayoutOf(snapshot.from, "").bridge;
  whole = Attempt("move access points to", bridge, [&bridge] { MoveAccessPoints(bridge); }) && whole;
  for (const std::string name : kBridges) {
    if (snapshot.Find(name) == nullptr) {
      whole = Attempt("remove", name, [&state, &name] { state.RemoveBridge(name); }) && whole;
    }
  }
  for (const LinkState &link : snapshot.links) {
    whole = Attempt("restore", link.link.name, [&state, &link] { state.Restore(link); }) && whole;
  }
  whole = Attempt("restore", kWanConfig, [&snapshot] { RestoreWanFile(snapshot.wanFile); }) && whole;
  whole = RestoreJoined(snapshot) && whole;
  for (const std::string &name : snapshot.dhcpInterfaces) {
    whole = Attempt("resume DHCP on", name, [&snapshot, &name] { ResumeDhcp(snapshot, name); }) && whole;
  }
  return whole;
}

Result RecoverStale(Netlink &netlink) {
  TopologyLock lock;
  switch (lock.TakeOver()) {
  case TopologyLock::State::kAbsent:
    return Result::kDone;
  case TopologyLock::State::kHeld:
    LogError("%s is held by a running switch: nothing is done", kTopologyLock);
    return Result::kBusy;
  case TopologyLock::State::kForeign:
    LogError("%s is none of ours: it is neither followed nor removed, and no switch can be made", kTopologyLock);
    return Result::kFailed;
  case TopologyLock::State::kStale:
    break;
  }
  if (!RestoreFromLock(netlink, lock)) {
    LogError("the network could not be brought back whole: %s stays", kTopologyLock);
    return Result::kFailed;
  }
  lock.Remove();
  LogInfo("the network is brought back");
  return Result::kDone;
}

Result Recover() {
  const UniqueFd turn = TakeTurn();
  if (!turn.IsOpen()) {
    LogError("another process is changing the network: nothing is done");
    return Result::kBusy;
  }
  Netlink netlink;
  return RecoverStale(netlink);
}

} // namespace vornhost
