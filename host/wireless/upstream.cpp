#include "host/wireless/upstream.h"

#include "host/network/current_topology.h"
#include "host/network/interface_name.h"
#include "host/network/names.h"
#include "host/utility/log.h"
#include "host/wireless/hostapd_config.h"
#include "host/wireless/radio.h"
#include "host/wireless/supplicant.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <vector>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

constexpr char kExtension[] = ".upstream";

std::vector<std::string> ConfiguredInterfaces() {
  std::vector<std::string> names;
  std::error_code failed;
  for (fs::directory_iterator entry(kWirelessFolder, failed), end; !failed && entry != end; entry.increment(failed)) {
    if (entry->path().extension() == kExtension && IsInterfaceName(entry->path().stem().string())) {
      names.push_back(entry->path().stem().string());
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

bool IsRootsAlone(const std::string &file) {
  struct stat info {};
  return lstat(file.c_str(), &info) == 0 && S_ISREG(info.st_mode) && info.st_uid == 0 &&
         (info.st_mode & (S_IRWXG | S_IRWXO)) == 0;
}

bool HasAccessPoint(int radio) {
  for (const WirelessAdapter &adapter : ReadAdapters()) {
    for (const WirelessNetwork &network : adapter.networks) {
      if (RadioOf(network.name) == radio) {
        return true;
      }
    }
  }
  return false;
}

// An access point that does not run now has no interface of its own on the radio but its adapter's.
// @return why it cannot be; null when it can
const char *WhyNot(const std::string &interface) {
  const auto radio = RadioOf(interface);
  if (!radio) {
    return "no wireless interface of that name";
  }
  if (interface.compare(0, 2, "wl") != 0) {
    return "the firewall takes only interfaces whose names begin with \"wl\" for a wireless way out";
  }
  if (!IsRootsAlone(UpstreamFileOf(interface))) {
    return "its configuration must be a file that root owns and nobody else can read or write";
  }
  if (HasAccessPoint(*radio)) {
    return "its radio is an access point's";
  }
  std::error_code ignored;
  if (fs::exists("/sys/class/net/" + interface + "/master", ignored)) {
    return "it is a port of a bridge";
  }
  if (!CanBeStation(interface)) {
    return "its radio cannot be a station";
  }
  return access(kSupplicantProgram, X_OK) == 0 ? nullptr : "wpa_supplicant is not installed";
}

} // namespace

std::string UpstreamFileOf(const std::string &interface) {
  return std::string(kWirelessFolder) + "/" + interface + kExtension;
}

std::string FindUpstream(std::string &why) {
  if (WirelessInterfaces().empty()) {
    why = "no wireless adapter";
    return "";
  }
  why = "no upstream network is configured";
  for (const std::string &name : ConfiguredInterfaces()) {
    const char *reason = WhyNot(name);
    if (reason == nullptr) {
      why.clear();
      return name;
    }
    why = UpstreamFileOf(name) + ": " + reason;
  }
  return "";
}

std::string JoinedUpstream() {
  std::string name = Supplicant::Interface();
  if (name.empty()) {
    std::string ignored;
    name = FindUpstream(ignored);
  }
  return name;
}

} // namespace vornhost
