#include "host/network/topology_config.h"

#include "host/network/interface_name.h"
#include "host/network/ipv4.h"
#include "host/network/mac_address.h"
#include "host/network/names.h"
#include "host/utility/atomic_file.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "platform/utility.h"

#include <array>
#include <stdexcept>

namespace vornhost {

namespace {

constexpr char kLineFormat[] = "%s=%s\n";

std::string ReadKey(const char *path, const char *key) {
  std::array<char, 1024> value{};
  if (QARDCFileGetKeyValue(path, key, value.data(), value.size(), 0) < 0) {
    LogError("%s: %s cannot be read", path, key);
    return "";
  }
  return value.data();
}

// @return the value when it satisfies the condition, else nothing
template <typename Condition> std::string ReadChecked(const char *path, const char *key, const Condition &isGood) {
  std::string value = ReadKey(path, key);
  if (!value.empty() && !isGood(value)) {
    LogError("%s: %s=%s is not valid and is ignored", path, key, LogText(value).c_str());
    value.clear();
  }
  return value;
}

bool IsAddress(const std::string &text) {
  return ParseIpv4(text.c_str()).has_value();
}

bool IsNetmask(const std::string &text) {
  return PrefixOfNetmask(text.c_str()).value_or(0) > 0;
}

bool IsMac(const std::string &text) {
  return ParseMac(text).has_value() && text[2] == ':';
}

std::string ReadAddress(const char *path) {
  const std::string address = ReadChecked(path, "IPADDR", IsAddress);
  const std::string netmask = ReadChecked(path, "NETMASK", IsNetmask);
  if (address.empty()) {
    return "";
  }
  return address + "/" + std::to_string(PrefixOfNetmask(netmask.c_str()).value_or(24));
}

std::vector<std::string> ReadPorts(const char *path) {
  std::vector<std::string> out;
  for (const std::string &port : SplitWords(ReadKey(path, "PORTS"))) {
    if (IsInterfaceName(port)) {
      out.push_back(port);
    } else {
      LogError("%s: PORTS: \"%s\" is no interface name and is ignored", path, LogText(port).c_str());
    }
  }
  return out;
}

void Require(int result, const char *what) {
  if (result < 0) {
    throw std::runtime_error(std::string(kWanConfig) + ": " + what + " failed");
  }
}

} // namespace

PortConfig ReadPortConfig(const char *path) {
  PortConfig out;
  out.present = QARDCFileExist(path) == 1;
  if (!out.present) {
    return out;
  }
  out.address = ReadAddress(path);
  const std::string protocol = ReadKey(path, "BOOTPROTO");
  out.dhcp = protocol == "dhcp" || (protocol.empty() && out.address.empty());
  out.gateway = ReadChecked(path, "GATEWAY", IsAddress);
  out.mac = ReadChecked(path, "MACADDR", IsMac);
  out.bridge = ReadChecked(path, "BRIDGE", IsInterfaceName);
  out.slave = ReadKey(path, "SLAVE") == "yes";
  out.ports = ReadPorts(path);
  return out;
}

const char *ConfiguredTopology() {
  const PortConfig wan = ReadPortConfig(kWanConfig);
  if (!wan.slave) {
    return kRouterTopology;
  }
  return wan.bridge == kLanBridge ? kClientTopology : kBridgeTopology;
}

// In bridge topology as ifcfg-br0 says, or without it as the WAN port would.
PortConfig ReadUplinkConfig(const std::string &topology) {
  PortConfig config;
  if (topology == kClientTopology) {
    config.dhcp = true; // a network that one joins tells who one is in it
    return config;
  }
  if (topology == kBridgeTopology) {
    config = ReadPortConfig(kOneBridgeConfig);
  }
  return config.present ? config : ReadPortConfig(kWanConfig);
}

void WriteWanBridge(const std::string &bridge) {
  Require(QARDCFileSetKeyValue(kWanConfig, "SLAVE", bridge.empty() ? "no" : "yes", kLineFormat), "writing SLAVE");
  const bool needed = !bridge.empty() || !ReadKey(kWanConfig, "BRIDGE").empty();
  if (needed) {
    Require(QARDCFileSetKeyValue(kWanConfig, "BRIDGE", bridge.c_str(), kLineFormat), "writing BRIDGE");
  }
}

std::optional<std::string> ReadWanFile() {
  if (QARDCFileExist(kWanConfig) == 0) {
    return std::nullopt;
  }
  std::string content;
  Require(ReadWholeFile(kWanConfig, content), "reading");
  return content;
}

void RestoreWanFile(const std::optional<std::string> &content) {
  if (ReadWanFile() == content) { // also where it may not be written, which is why it is as it was
    return;
  }
  if (!content) {
    Require(RemoveFile(kWanConfig), "removing");
    return;
  }
  const auto putBack = [&content](const std::string &, std::string &fresh) {
    fresh = *content;
    return 0;
  };
  Require(ChangeFile(kWanConfig, putBack), "putting back");
}

} // namespace vornhost
