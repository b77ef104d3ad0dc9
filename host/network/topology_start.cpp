#include "host/network/topology.h"

#include "host/network/dhcp_client.h"
#include "host/network/kernel_setting.h"
#include "host/network/names.h"
#include "host/network/network_state.h"
#include "host/network/topology_config.h"
#include "host/network/topology_steps.h"
#include "host/network/turn.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "host/wireless/access_points.h"
#include "host/wireless/supplicant.h"
#include "host/wireless/upstream.h"

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <fstream>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

bool HasIpv4(Netlink &netlink, int index) {
  const std::vector<Address> addresses = netlink.Addresses();
  return std::any_of(addresses.begin(), addresses.end(),
                     [index](const Address &address) { return address.index == index && address.family == AF_INET; });
}

void ConnectPort(Netlink &netlink, const std::string &port, const PortConfig &config, bool leaseNeeded) {
  NetworkState state(netlink);
  ListenToRouters(port);
  if (config.dhcp) {
    leaseNeeded ? DhcpClient(port).StartWithLease() : DhcpClient(port).Start();
  } else if (!config.address.empty()) {
    state.AddAddress(port, config.address);
    if (!config.gateway.empty()) {
      state.AddDefaultRoute(port, config.gateway);
    }
  }
  if (leaseNeeded && !HasIpv4(netlink, state.Get(port).index)) {
    throw std::runtime_error(port + " has no address");
  }
}

class Configurer {
public:
  Configurer(Netlink &netlink, const std::string &topology)
      : netlink_(netlink), state_(netlink), topology_(topology), layout_(LayoutOf(topology, UpstreamOf(topology))),
        other_(layout_.bridge == kLanBridge ? kOneBridge : kLanBridge) {}

  bool Run() {
    const PortConfig lan = ReadPortConfig(kLanConfig);
    const PortConfig guest = ReadPortConfig(kGuestConfig);
    MakeBridge(layout_.bridge, layout_.bridge == kOneBridge ? WanMac() : lan.mac);
    Do("move access points to", layout_.bridge, [this] { MoveAccessPoints(layout_.bridge); });
    TakePorts(lan.ports);
    PlaceWanPort();
    Do("remove", other_, [this] { state_.RemoveBridge(other_); });
    StartBridge(layout_.bridge, layout_.bridge == kLanBridge ? lan.address : "");
    if (guest.present) {
      MakeBridge(kGuestBridge, guest.mac);
      AttachAll(guest.ports, kGuestBridge);
      StartBridge(kGuestBridge, guest.address);
    }
    Connect();
    ConnectSecond();
    return whole_;
  }

private:
  static std::string UpstreamOf(const std::string &topology) {
    std::string why;
    std::string upstream = topology == kClientTopology ? FindUpstream(why) : "";
    if (!why.empty()) {
      LogError("no way out in client topology: %s", LogText(why).c_str());
    }
    return upstream;
  }

  void Do(const char *kind, const std::string &name, const Action &action) {
    whole_ = Attempt(kind, name, action) && whole_;
  }

  std::string WanMac() {
    const std::optional<Link> wan = netlink_.FindLink(kWanPort);
    return wan ? wan->mac : "";
  }

  void MakeBridge(const std::string &name, const std::string &mac) {
    Do("make", name, [&] { state_.EnsureBridge(name, mac); });
  }

  void AttachAll(const std::vector<std::string> &ports, const std::string &bridge) {
    for (const std::string &port : ports) {
      Do("attach", port, [&] { state_.Attach(port, bridge); });
    }
  }

  // Besides the configured ports those that the other topology's bridge has, such as an access point's.
  void TakePorts(std::vector<std::string> ports) {
    for (const std::string &port : state_.PortsOf(other_)) {
      if (port != kWanPort && std::find(ports.begin(), ports.end(), port) == ports.end()) {
        ports.push_back(port);
      }
    }
    AttachAll(ports, layout_.bridge);
  }

  void PlaceWanPort() {
    Do("place", kWanPort, [this] {
      if (!layout_.wanInBridge) {
        state_.Detach(kWanPort);
        return;
      }
      DhcpClient(kWanPort).Stop();
      state_.Clear(kWanPort);
      state_.Attach(kWanPort, layout_.bridge);
    });
  }

  // After its ports are there: its link-local address is made of the MAC address that they give it.
  void StartBridge(const std::string &name, const std::string &address) {
    Do("start", name, [&] {
      state_.SetUp(name);
      if (!address.empty()) {
        state_.AddAddress(name, address);
      }
    });
  }

  void Connect() {
    StopUnused();
    if (layout_.uplink.empty()) {
      whole_ = false;
      return;
    }
    if (topology_ == kClientTopology && !Supplicant().Watch(layout_.uplink).IsOpen()) {
      Do("join over", layout_.uplink, [this] { Supplicant().Start(layout_.uplink); });
    }
    Do("connect", layout_.uplink, [this] {
      if (!DhcpClient(layout_.uplink).IsRunning()) {
        ConnectUplink(netlink_, topology_, layout_.uplink, false);
      }
    });
  }

  void StopUnused() {
    for (const std::string &unused : {std::string(kWanPort), std::string(kOneBridge), Supplicant::Interface()}) {
      if (!unused.empty() && unused != layout_.uplink) {
        Do("stop DHCP on", unused, [&unused] { DhcpClient(unused).Stop(); });
      }
    }
    if (topology_ != kClientTopology) {
      Do("leave", "the network outside", [] { Supplicant().Stop(); });
    }
  }

  // A second way out beside the topology's own, where there is one and its file says so.
  void ConnectSecond() {
    const PortConfig config = ReadPortConfig(kSecondWanConfig);
    if (!config.present || !netlink_.FindLink(kSecondWanPort)) {
      return;
    }
    Do("connect", kSecondWanPort, [&] {
      state_.SetUp(kSecondWanPort);
      if (!DhcpClient(kSecondWanPort).IsRunning()) {
        ConnectPort(netlink_, kSecondWanPort, config, false);
      }
    });
  }

  Netlink &netlink_;
  NetworkState state_;
  std::string topology_;
  Layout layout_;
  std::string other_;
  bool whole_ = true;
};

void LetRouterForward() {
  const std::string ipv4 = "/proc/sys/net/ipv4/ip_forward";
  WriteSetting(ipv4, "1");
  WriteSetting("/proc/sys/net/ipv6/conf/all/forwarding", "1"); // absent where IPv6 is off
  std::string now;
  std::getline(std::ifstream(ipv4), now);
  if (now != "1") {
    throw std::runtime_error("the kernel did not take it");
  }
}

// When the machine starts, an adapter on USB may be found later than the network is brought up.
void AwaitAdapter() {
  constexpr int kRounds = 100;
  std::string ignored;
  for (int round = 0; round < kRounds && FindUpstream(ignored).empty(); ++round) {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
}

void LoadFirewall() {
  if (ProgramRunner().Run({kNftProgram, "-f", kBaseFirewall}) != 0) {
    throw std::runtime_error("nft did not take it");
  }
}

} // namespace

void LetBridgesForward() {
  for (const char *family : {"iptables", "ip6tables", "arptables"}) {
    WriteSetting(std::string("/proc/sys/net/bridge/bridge-nf-call-") + family, "0");
  }
}

void ConnectUplink(Netlink &netlink, const std::string &topology, const std::string &uplink, bool leaseNeeded) {
  ConnectPort(netlink, uplink, ReadUplinkConfig(topology), leaseNeeded);
}

bool ApplyConfiguration(Netlink &netlink) {
  return Configurer(netlink, ConfiguredTopology()).Run();
}

// The firewall stands before the first packet can be forwarded; without it none is. The home network and the router
// itself come up all the same.
Result StartNetwork() {
  const UniqueFd turn = TakeTurn();
  if (!turn.IsOpen()) {
    LogError("another process is changing the network: it is not brought up");
    return Result::kBusy;
  }
  Netlink netlink;
  RecoverStale(netlink); // a lock that is none of ours keeps nobody from having a network
  bool whole = Attempt("load", kBaseFirewall, LoadFirewall);
  LetBridgesForward();
  whole = whole && Attempt("start", "forwarding", LetRouterForward);
  if (ConfiguredTopology() == std::string(kClientTopology)) {
    AwaitAdapter();
  }
  whole = ApplyConfiguration(netlink) && whole;
  return whole ? Result::kDone : Result::kFailed;
}

} // namespace vornhost
