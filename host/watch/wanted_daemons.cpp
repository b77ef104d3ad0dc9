#include "host/watch/wanted_daemons.h"

#include "host/network/current_topology.h"
#include "host/network/dhcp_client.h"
#include "host/network/kernel_setting.h"
#include "host/network/names.h"
#include "host/network/topology.h"
#include "host/network/topology_config.h"
#include "host/wireless/supplicant.h"
#include "host/wireless/upstream.h"

namespace vornhost {

namespace {

// Without the interface there is nothing to serve, until it is plugged in; with it gone, its client stays and waits for
// it. One that is plugged in again has forgotten what it was told of router advertisements.
void AddClient(const std::string &interface, const PortConfig &config, WantedDaemons &wanted) {
  if (!config.dhcp) {
    return;
  }
  if (!HasInterface(interface.c_str())) {
    wanted.isWhole = false;
    return;
  }
  const DhcpClient client(interface);
  wanted.daemons.push_back({"udhcpc on " + interface, [client] { return client.Watch(); },
                            [client, interface] {
                              ListenToRouters(interface);
                              client.ResumeLease();
                            }});
}

} // namespace

WantedDaemons FindWantedDaemons() {
  WantedDaemons wanted;
  const char *current = CurrentTopology();
  const std::string topology = ConfiguredTopology();
  if (current == nullptr || current != topology) {
    wanted.isWhole = false;
    return wanted;
  }
  const std::string upstream = topology == kClientTopology ? JoinedUpstream() : "";
  if (!upstream.empty()) {
    wanted.daemons.push_back({"wpa_supplicant on " + upstream, [upstream] { return Supplicant().Watch(upstream); },
                              [upstream] { Supplicant().Start(upstream); }});
  }
  const std::string uplink = LayoutOf(topology, upstream).uplink;
  if (uplink.empty()) {
    wanted.isWhole = false; // its adapter may be plugged in
  } else {
    AddClient(uplink, ReadUplinkConfig(topology), wanted);
  }
  const PortConfig second = ReadPortConfig(kSecondWanConfig);
  if (second.present) {
    AddClient(kSecondWanPort, second, wanted);
  }
  return wanted;
}

} // namespace vornhost
