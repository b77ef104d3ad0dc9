#include "router/topology.h"

#include "platform/interface.h"
#include "platform/utility.h"
#include "platform/wifi.h"
#include "router/log.h"

#include <memory>

using vorn::network::BridgeInterface;
using vorn::network::EthernetInterface;
using vornwireless::dbus::WifiClient;
namespace wifi = vornwireless::wifi::utils;

namespace {

constexpr char kUnit[] = "topology";
constexpr char kLockFile[] = "/tmp/topology.lock";
constexpr char kEth0Config[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";

bool ReadTopology(std::string &topology) {
  if (wifi::GetTopologyString(topology) < 0) {
    ROUTER_LOG("%s:%d Failed to get Topology String");
    return false;
  }
  return true;
}

// Between "router" and "client" the LAN side, and with it the router's address there, stays what it is.
bool KeepsAddress(const std::string &current, const std::string &target) {
  return (current == "router" && target == "client") || (current == "client" && target == "router");
}

void FillNoRedirect(Json::Value &result) {
  result["redirect"] = false;
  result["secure"] = false;
  result["port"] = "";
  result["auth_key"] = "";
  result["ip_list"] = Json::Value(Json::arrayValue);
}

std::unique_ptr<EthernetInterface> MakeCurrentInterface(const std::string &current, const char *name) {
  if (current == "bridge") {
    return std::make_unique<BridgeInterface>(name);
  }
  return std::make_unique<EthernetInterface>(name);
}

} // namespace

Topology::Topology() = default;

Topology::~Topology() = default;

// The text comes by value: that is the interface, on which others were built.
// NOLINTNEXTLINE(performance-unnecessary-value-param)
bool Topology::SetTopology(std::string target, Json::Value &result) {
  std::string current;
  if (!ReadTopology(current)) {
    return false;
  }
  if (KeepsAddress(current, target)) {
    FillNoRedirect(result);
    return true;
  }
  const char *name = current == "bridge" ? "br0" : "eth0";
  const auto interface = MakeCurrentInterface(current, name);
  if (interface->LoadData() < 0) {
    ROUTER_LOG("%s:%d Failed to LoadData() for [%s]", name);
  }
  interface->GetRedirectNetInfo(result);
  return true;
}

bool Topology::GetTopology(Json::Value &result, int version) {
  std::string topology;
  if (!ReadTopology(topology)) {
    return false;
  }
  result["switching"] = QARDCFileExist(kLockFile) != 0;
  result["net_topology"] = topology;
  result["support_net_topology"] = wifi::IsSupportTopology();
  result["has_wifi_dongle"] = wifi::HasWifiDongle();
  if (version <= 1) {
    return true;
  }
  std::string mode;
  if (wifi::GetSupportedMode(mode) < 0) {
    ROUTER_LOG("%s:%d Failed to get supported mode");
    return false;
  }
  result["supported_mode"] = mode;
  // A file that cannot be read forbids bridge mode too: what is not known to be free is taken as enslaved.
  result["bridge_mode_forbidden"] = QARDCFileCheckKeyValue(kEth0Config, "SLAVE", "yes", 0) != 0;
  return true;
}

void Topology::APICallback(void *data) {
  if (data == nullptr) {
    ROUTER_LOG("%s:%d passed object is null");
    return;
  }
  const std::unique_ptr<std::string> target(static_cast<std::string *>(data));
  WifiClient client;
  if (!client.IsServerReady()) {
    ROUTER_LOG("%s:%d The vornwifid is not ready");
  } else if (client.SwitchTopology(*target) < 0) {
    ROUTER_LOG("%s:%d Failed to SwitchTopology");
  }
}
