#include "host/network/topology.h"

#include "host/network/current_topology.h"
#include "host/network/dhcp_client.h"
#include "host/network/names.h"
#include "host/network/network_state.h"
#include "host/network/topology_config.h"
#include "host/network/topology_lock.h"
#include "host/network/topology_steps.h"
#include "host/network/turn.h"
#include "host/utility/atomic_file.h"
#include "host/utility/log.h"
#include "host/wireless/access_points.h"
#include "host/wireless/supplicant.h"
#include "host/wireless/upstream.h"

#include <algorithm>
#include <stdexcept>

namespace vornhost {

namespace {

// The steps of one switch. Every undo brings a piece of the snapshot back, so it does not matter how far its step got.
class SwitchPlan {
public:
  SwitchPlan(Netlink &netlink, const Snapshot &snapshot)
      : netlink_(netlink), state_(netlink), snapshot_(snapshot), from_(LayoutOf(snapshot.from, snapshot.upstream)),
        to_(LayoutOf(snapshot.to, snapshot.upstream)) {
    AddJoin();
    AddReleaseUplink();
    AddMakeBridge();
    AddMoveAccessPoints();
    AddMovePorts();
    AddClearBridge();
    AddStartBridge();
    AddUplink();
    AddRecord();
    AddLeave();
    AddRemoveBridge();
  }
  SwitchPlan(const SwitchPlan &) = delete;
  SwitchPlan &operator=(const SwitchPlan &) = delete;

  /// They refer to the plan.
  StepSequence &Steps() { return steps_; }

private:
  void Restore(const std::string &name) {
    if (const LinkState *was = snapshot_.Find(name); was != nullptr) {
      state_.Restore(*was);
    }
  }

  // While the old way out still works: a key that is wrong costs nobody the internet.
  void AddJoin() {
    const std::string upstream = snapshot_.upstream;
    if (snapshot_.to != kClientTopology) {
      return;
    }
    steps_.Add(
        "join the network outside over " + upstream,
        [upstream] {
          Supplicant().Start(upstream);
          Supplicant::AwaitJoined(upstream);
        },
        [this, upstream] {
          Supplicant().Stop();
          Restore(upstream);
        });
  }

  // Late: until all else is done the way back is there. Where the adapter was pulled out, its supplicant still runs.
  void AddLeave() {
    const std::string upstream = snapshot_.upstream;
    if (snapshot_.from != kClientTopology) {
      return;
    }
    steps_.Add(
        "leave the network outside",
        [this, upstream] {
          Supplicant().Stop();
          if (!upstream.empty()) {
            state_.SetDown(upstream);
          }
        },
        [this, upstream] {
          if (snapshot_.joined) {
            Supplicant().Start(upstream);
          }
          Restore(upstream);
        });
  }

  void AddReleaseUplink() {
    const std::string uplink = from_.uplink;
    if (uplink.empty()) {
      return;
    }
    const auto &served = snapshot_.dhcpInterfaces;
    const bool wasServed = std::find(served.begin(), served.end(), uplink) != served.end();
    steps_.Add(
        "stop DHCP on " + uplink, [uplink] { DhcpClient(uplink).Stop(); },
        [this, uplink, wasServed] {
          if (wasServed && !DhcpClient(uplink).IsRunning()) {
            DhcpClient(uplink).Resume(snapshot_.Find(uplink)->FirstIpv4());
          }
        });
    steps_.Add(
        "clear " + uplink, [this, uplink] { state_.Clear(uplink); }, [this, uplink] { Restore(uplink); });
  }

  // The one bridge has the WAN port's MAC address, so that the network outside knows it and gives it the same lease.
  void AddMakeBridge() {
    const std::string bridge = to_.bridge;
    if (bridge == from_.bridge) {
      return;
    }
    const std::string mac = bridge == kOneBridge ? snapshot_.Find(kWanPort)->link.mac : ReadPortConfig(kLanConfig).mac;
    steps_.Add(
        "make " + bridge, [this, bridge, mac] { state_.EnsureBridge(bridge, mac); },
        [this, bridge] { snapshot_.Find(bridge) != nullptr ? Restore(bridge) : state_.RemoveBridge(bridge); });
  }

  // Before the ports: an access point that is started again in the middle goes to where the others will be.
  void AddMoveAccessPoints() {
    if (to_.bridge != from_.bridge) {
      steps_.Add(
          "move access points to " + to_.bridge, [this] { MoveAccessPoints(to_.bridge); },
          [this] { MoveAccessPoints(from_.bridge); });
    }
  }

  // A bridge takes its MAC address from its ports unless told one: told its own, it keeps that when the WAN port comes,
  // and the hosts of the LAN find the router where it was.
  void AddKeepMac() {
    const std::string bridge = to_.bridge;
    if (bridge == from_.bridge && to_.wanInBridge) {
      steps_.Add(
          "keep the address of " + bridge,
          [this, bridge] { netlink_.SetMac(state_.Get(bridge).index, snapshot_.Find(bridge)->link.mac); }, [] {});
    }
  }

  void AddMovePorts() {
    AddKeepMac();
    for (const LinkState &port : snapshot_.links) {
      const bool isWan = port.link.name == kWanPort;
      if (isWan || (port.master == from_.bridge && to_.bridge != from_.bridge)) {
        AddMovePort(port, isWan && !to_.wanInBridge ? "" : to_.bridge);
      }
    }
  }

  void AddMovePort(const LinkState &port, const std::string &bridge) {
    const std::string name = port.link.name;
    steps_.Add(
        "move " + name + (bridge.empty() ? " out of the bridge" : " to " + bridge),
        [this, name, bridge] { bridge.empty() ? state_.Detach(name) : state_.Attach(name, bridge); },
        [this, &port] { state_.Restore(port); });
  }

  // Until all else is done the old bridge is only emptied: what is bound to it finds it again when the switch is
  // undone.
  void AddClearBridge() {
    const std::string bridge = from_.bridge;
    if (bridge != to_.bridge && bridge != from_.uplink) {
      steps_.Add(
          "clear " + bridge, [this, bridge] { state_.Clear(bridge); }, [this, bridge] { Restore(bridge); });
    }
  }

  // It comes up after its ports are there: its link-local address is made of the MAC address that they give it. An undo
  // is not needed, because the bridge goes again.
  void AddStartBridge() {
    const std::string bridge = to_.bridge;
    if (bridge == from_.bridge) {
      return;
    }
    const std::string address = bridge == kLanBridge ? ReadPortConfig(kLanConfig).address : "";
    steps_.Add(
        "start " + bridge,
        [this, bridge, address] {
          state_.SetUp(bridge);
          if (!address.empty()) {
            state_.AddAddress(bridge, address);
          }
        },
        [] {});
  }

  void AddRemoveBridge() {
    const std::string bridge = from_.bridge;
    if (bridge != to_.bridge) {
      steps_.Add(
          "remove " + bridge, [this, bridge] { state_.RemoveBridge(bridge); }, [this, bridge] { Restore(bridge); });
    }
  }

  // In router topology the LAN must be reachable when the network outside is down; in the others the router itself
  // would not be.
  void AddUplink() {
    const std::string uplink = to_.uplink;
    steps_.Add(
        "address of " + uplink,
        [this] {
          ConnectUplink(netlink_, snapshot_.to, to_.uplink, snapshot_.to != kRouterTopology);
          if (snapshot_.to == kClientTopology) {
            RefuseOverlap();
          }
        },
        [this, uplink] {
          DhcpClient(uplink).Stop();
          state_.Clear(uplink); // its default route would keep the old way out's from coming back
        });
  }

  // A network outside with the addresses of the home's own, as is common, would take the home's hosts from the router.
  void RefuseOverlap() {
    const std::vector<Address> addresses = netlink_.Addresses();
    const int uplink = state_.Get(to_.uplink).index;
    for (const Address &outside : addresses) {
      for (const Address &inside : addresses) {
        if (outside.index == uplink && inside.index != uplink && outside.Overlaps(inside)) {
          throw std::runtime_error("the network outside, " + outside.text + ", has the addresses of our own, " +
                                   inside.text);
        }
      }
    }
  }

  void AddRecord() {
    steps_.Add(
        std::string("record in ") + kWanConfig, [this] { WriteWanBridge(to_.wanInBridge ? to_.bridge : ""); },
        [this] { RestoreWanFile(snapshot_.wanFile); });
  }

  Netlink &netlink_;
  NetworkState state_;
  const Snapshot &snapshot_;
  Layout from_;
  Layout to_;
  StepSequence steps_;
};

Result Refuse(const std::string &target, const char *reason) {
  LogError("switch to \"%s\" refused: %s", LogText(target).c_str(), reason);
  return Result::kFailed;
}

// The interface that joins the network outside, before or after the switch.
// @param[out] why  the device cannot be in that topology; empty when it can
std::string UpstreamFor(const std::string &current, const std::string &target, std::string &why) {
  if (target == kClientTopology) {
    return FindUpstream(why);
  }
  return current == kClientTopology ? JoinedUpstream() : "";
}

// What a switch that is killed leaves behind is put back from its snapshot, so that one which could not be read back
// must not be the ground of a switch.
// @return why the snapshot cannot be relied on; null when it can
const char *WhyNotKept(const Snapshot &snapshot) {
  if (snapshot.Find(kWanPort) == nullptr || snapshot.Find(LayoutOf(snapshot.from, "").bridge) == nullptr) {
    return "an interface has just gone";
  }
  const std::string text = SnapshotText(snapshot);
  const auto back = ParseSnapshot(text);
  return text.size() <= kFileLimit && back && SnapshotText(*back) == text ? nullptr
                                                                          : "the network's state cannot be kept";
}

Result CarryOut(Netlink &netlink, const Snapshot &snapshot, TopologyLock &lock) {
  LetBridgesForward();
  SwitchPlan plan(netlink, snapshot);
  StepSequence &steps = plan.Steps();
  steps.Add(
      "remove the lock", [&lock] { lock.Remove(); }, [] {});
  switch (steps.Run()) {
  case StepSequence::Outcome::kDone:
    LogInfo("switched from %s to %s", snapshot.from.c_str(), snapshot.to.c_str());
    return Result::kDone;
  case StepSequence::Outcome::kUndone:
    lock.Remove();
    break;
  case StepSequence::Outcome::kHalfDone: // what one undo could not do, all of them in another order may
    if (RestoreSnapshot(netlink, snapshot)) {
      lock.Remove();
    }
    break;
  }
  LogError("switch from %s to %s failed", snapshot.from.c_str(), snapshot.to.c_str());
  return Result::kFailed;
}

} // namespace

Layout LayoutOf(const std::string &topology, const std::string &upstream) {
  if (topology == kBridgeTopology) {
    return {kOneBridge, true, kOneBridge};
  }
  if (topology == kClientTopology) { // the WAN port is one more for the home
    return {kLanBridge, true, upstream};
  }
  return {kLanBridge, false, kWanPort};
}

Result SwitchTopology(const std::string &target) {
  if (target != kRouterTopology && target != kBridgeTopology && target != kClientTopology) {
    Refuse(target, "no such topology");
    return Result::kUsage;
  }
  const UniqueFd turn = TakeTurn();
  if (!turn.IsOpen()) {
    Refuse(target, "another switch is under way");
    return Result::kBusy;
  }
  Netlink netlink;
  const Result recovered = RecoverStale(netlink);
  if (recovered != Result::kDone) {
    return recovered;
  }
  const char *current = CurrentTopology();
  if (current == nullptr) {
    return Refuse(target, "the network is in no topology that could be left");
  }
  if (target == current) {
    if (target != ConfiguredTopology()) { // else the next start would leave it
      const Layout layout = LayoutOf(target, "");
      WriteWanBridge(layout.wanInBridge ? layout.bridge : "");
    }
    return Result::kDone;
  }
  std::string why;
  const std::string upstream = UpstreamFor(current, target, why);
  if (!why.empty()) {
    return Refuse(target, LogText(why).c_str());
  }
  const Snapshot snapshot = TakeSnapshot(netlink, current, target, upstream);
  if (const char *reason = WhyNotKept(snapshot); reason != nullptr) {
    return Refuse(target, reason);
  }
  TopologyLock lock;
  if (!lock.Make(SnapshotText(snapshot))) {
    Refuse(target, "the lock file has come into being");
    return Result::kBusy;
  }
  return CarryOut(netlink, snapshot, lock);
}

} // namespace vornhost
