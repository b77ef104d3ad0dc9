#include "host/wireless/hostapd_config.h"

#include "host/network/interface_name.h"
#include "host/network/names.h"
#include "host/utility/atomic_file.h"
#include "host/utility/file_turn.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <iterator>
#include <utility>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

// A turn is held for some fsyncs and for the time that hostapd may take to answer.
constexpr std::chrono::milliseconds kTurnLimit{10000};

// "/run/hostapd", or "DIR=/run/hostapd GROUP=netdev".
std::string ControlFolder(std::string_view value) {
  constexpr std::string_view kFolder = "DIR=";
  if (value.substr(0, kFolder.size()) != kFolder) {
    return std::string(value);
  }
  value.remove_prefix(kFolder.size());
  return std::string(value.substr(0, value.find(' ')));
}

std::vector<WirelessNetwork> ReadNetworks(const std::string &file) {
  std::string content;
  if (ReadWholeFile(file.c_str(), content) != 0) {
    LogError("%s cannot be read", LogText(file).c_str());
    return {};
  }
  return ParseHostapdConfig(content, file);
}

std::vector<std::string> ConfigFiles() {
  std::vector<std::string> files;
  std::error_code failed;
  for (fs::directory_iterator entry(kHostapdFolder, failed), end; !failed && entry != end; entry.increment(failed)) {
    if (entry->path().extension() == ".conf") {
      files.push_back(entry->path().string());
    }
  }
  std::sort(files.begin(), files.end());
  return files;
}

// An adapter that is another's guest network goes to that one.
void MoveGuests(std::vector<WirelessAdapter> &adapters) {
  for (WirelessAdapter &adapter : adapters) {
    const std::string guest = GuestNetworkOf(adapter.name);
    for (WirelessAdapter &other : adapters) {
      if (other.name == guest) {
        std::move(other.networks.begin(), other.networks.end(), std::back_inserter(adapter.networks));
        other.networks.clear();
      }
    }
  }
  adapters.erase(std::remove_if(adapters.begin(), adapters.end(),
                                [](const WirelessAdapter &adapter) { return adapter.networks.empty(); }),
                 adapters.end());
}

} // namespace

UniqueFd TakeHostapdTurn() {
  mkdir(kRunFolder, 0700); // whoever could open it could hold every change up
  return TakeFileTurn(std::string(kRunFolder) + "/wireless.lock", kTurnLimit);
}

std::string GuestNetworkOf(const std::string &adapter) {
  return "g" + adapter;
}

std::vector<WirelessNetwork> ParseHostapdConfig(std::string_view content, const std::string &file) {
  std::vector<WirelessNetwork> networks;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    const size_t equals = line.find('=');
    if (line.empty() || line[0] == '#' || equals == std::string_view::npos) {
      continue;
    }
    const std::string_view key = line.substr(0, equals);
    const std::string value(line.substr(equals + 1));
    if (key == "interface" ? networks.empty() : key == "bss" && !networks.empty()) {
      if (!IsInterfaceName(value)) {
        LogError("%s: \"%s\" is no interface name", LogText(file).c_str(), LogText(value).c_str());
        return {};
      }
      networks.push_back({value, "", file, ""});
    } else if (key == "ctrl_interface" && !networks.empty()) {
      networks.back().control = ControlFolder(value) + "/" + networks.back().name;
    } else if (key == "bridge" && !networks.empty()) {
      networks.back().bridge = value;
    }
  }
  return networks;
}

std::vector<WirelessAdapter> ReadAdapters() {
  std::vector<WirelessAdapter> adapters;
  for (const std::string &file : ConfigFiles()) {
    std::vector<WirelessNetwork> networks = ReadNetworks(file);
    if (networks.empty()) {
      continue;
    }
    const std::string name = networks.front().name;
    if (FindAdapter(adapters, name) != nullptr) {
      LogError("%s: %s has a file already", LogText(file).c_str(), name.c_str());
      continue;
    }
    adapters.push_back({name, std::move(networks)});
  }
  MoveGuests(adapters);
  std::sort(adapters.begin(), adapters.end(), [](const auto &a, const auto &b) { return a.name < b.name; });
  return adapters;
}

const WirelessAdapter *FindAdapter(const std::vector<WirelessAdapter> &adapters, const std::string &name) {
  const auto found =
      std::find_if(adapters.begin(), adapters.end(), [&name](const auto &adapter) { return adapter.name == name; });
  return found == adapters.end() ? nullptr : &*found;
}

const WirelessNetwork *FindNetwork(const std::vector<WirelessAdapter> &adapters, const std::string &name) {
  for (const WirelessAdapter &adapter : adapters) {
    for (const WirelessNetwork &network : adapter.networks) {
      if (network.name == name) {
        return &network;
      }
    }
  }
  return nullptr;
}

} // namespace vornhost
