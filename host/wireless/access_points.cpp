#include "host/wireless/access_points.h"

#include "host/network/names.h"
#include "host/utility/file_turn.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/file_changes.h"
#include "host/wireless/hostapd_config.h"

#include <set>
#include <vector>

namespace vornhost {

namespace {

bool IsHomeBridge(std::string_view name) {
  return name == kLanBridge || name == kOneBridge;
}

std::vector<WirelessNetwork> NetworksToMove(const std::string &bridge) {
  std::vector<WirelessNetwork> out;
  for (const WirelessAdapter &adapter : ReadAdapters()) {
    for (const WirelessNetwork &network : adapter.networks) {
      if (IsHomeBridge(network.bridge) && network.bridge != bridge) {
        out.push_back(network);
      }
    }
  }
  return out;
}

void WriteFiles(const std::vector<WirelessNetwork> &networks, const std::string &bridge) {
  std::set<std::string> paths;
  for (const WirelessNetwork &network : networks) {
    paths.insert(network.file);
  }
  FileChanges changes;
  try {
    for (const std::string &path : paths) {
      changes.Replace(path, [&bridge](const std::string &old) { return WithBridge(old, bridge); });
    }
  } catch (...) {
    changes.Undo();
    throw;
  }
}

void Tell(const std::vector<WirelessNetwork> &networks, const std::string &bridge) {
  const Deadline deadline = std::chrono::steady_clock::now() + kAnswerLimit;
  for (const WirelessNetwork &network : networks) {
    ControlSocket control(network.control, deadline);
    if (!control.IsAbsent() && !control.Do("SET bridge " + bridge)) {
      LogError("%s: hostapd does not take the bridge %s before it is started again", network.name.c_str(),
               bridge.c_str());
    }
  }
}

} // namespace

std::string WithBridge(std::string_view content, const std::string &bridge) {
  constexpr std::string_view kKey = "bridge=";
  std::string out;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    const bool moves = line.substr(0, kKey.size()) == kKey && IsHomeBridge(line.substr(kKey.size()));
    out.append(moves ? std::string(kKey) + bridge : std::string(line)).append("\n");
  }
  return out;
}

void MoveAccessPoints(const std::string &bridge) {
  if (NetworksToMove(bridge).empty()) {
    return;
  }
  const UniqueFd turn = TakeHostapdTurn(); // the MAC filter changes the same files
  const std::vector<WirelessNetwork> networks = NetworksToMove(bridge);
  WriteFiles(networks, bridge);
  Tell(networks, bridge);
}

} // namespace vornhost
