#include "host/export.h"

namespace vornwireless::dbus {
class VORN_EXPORT WifiClient;
}

#include "platform/utility.h"
#include "platform/wifi.h"

#include "host/network/names.h"
#include "host/network/topology.h"
#include "host/utility/error.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "host/wireless/adapter_config.h"
#include "host/wireless/adapter_writer.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/hostapd_config.h"
#include "host/wireless/station_facts.h"
#include "host/wireless/stations.h"

#include <unistd.h>

#include <chrono>
#include <ctime>
#include <exception>
#include <stdexcept>
#include <vector>

namespace vornwireless::dbus {

namespace {

bool IsTopology(const std::string &text) {
  return text == vornhost::kRouterTopology || text == vornhost::kBridgeTopology || text == vornhost::kClientTopology;
}

// A switch that was refused has left nothing, and one that is under way is not ours to disturb. What is set right is
// what a switch that died, or that could not be undone, has left with its lock.
bool NeedsRecovery(int status) {
  return status != static_cast<int>(vornhost::Result::kBusy) && QARDCFileExist(vornhost::kTopologyLock) != 0;
}

// The switch is a program of its own, so that it is carried through, or undone, also when this process dies.
int RunSwitch(const std::string &target) {
  const vornhost::ProgramRunner runner;
  int status = -1;
  if (runner.Run({vornhost::kTopologyProgram, "switch", target}, &status) == 0) {
    return 0;
  }
  if (NeedsRecovery(status) && runner.Run({vornhost::kTopologyProgram, "recover"}) != 0) {
    vornhost::LogError("the network may be half switched: \"%s recover\" failed", vornhost::kTopologyProgram);
  }
  return vornhost::SetError(QARDC_ERR_EXEC);
}

vornhost::Deadline AnswerDeadline() {
  return std::chrono::steady_clock::now() + vornhost::kAnswerLimit;
}

// Whether a network is on the air. One whose hostapd is dead, or hangs, is not known to be.
bool IsOn(const vornhost::WirelessNetwork *network, vornhost::Deadline deadline) {
  if (network == nullptr) {
    return false;
  }
  vornhost::ControlSocket control(network->control, deadline);
  const auto status = control.Ask("STATUS");
  if (!status && !control.IsAbsent()) {
    vornhost::LogError("%s: hostapd does not answer", network->name.c_str());
  }
  return status && status->find("state=ENABLED\n") != std::string::npos;
}

// Neighbours are a help: without them the leases say what they know.
std::vector<vornhost::Neighbour> NeighboursOrNone() {
  try {
    return vornhost::ReadNeighbours();
  } catch (const std::exception &error) {
    vornhost::LogError("%s", error.what());
    return {};
  }
}

// A station that is listed is associated now, so that this is the time when it was last seen so.
std::string TimeText() {
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  char text[32];
  tzset(); // localtime_r alone would keep the zone of the first call, also when the owner has chosen another since
  localtime_r(&now, &local);
  return std::string(text, std::strftime(text, sizeof(text), "%T %Y/%m/%d", &local));
}

Json::Value RecordOf(const vornhost::Station &station, const vornhost::StationFacts &facts, const std::string &time) {
  Json::Value record;
  record["mac"] = station.mac;
  record["asso_time"] = time;
  const auto known = facts.Find(station.mac);
  if (!known.ip.empty()) {
    record["ip"] = known.ip;
  }
  if (!known.hostname.empty()) {
    record["hostname"] = known.hostname;
  }
  if (station.signal) {
    record["signalstrength"] = *station.signal;
  }
  // Seen from the station: what it received is what the access point sent.
  if (station.sent) {
    record["transferRX"] = Json::UInt64(*station.sent);
  }
  if (station.received) {
    record["transferTX"] = Json::UInt64(*station.received);
  }
  return record;
}

Json::Value RecordsOf(const std::vector<vornhost::Station> &stations) {
  Json::Value records(Json::arrayValue);
  if (stations.empty()) {
    return records;
  }
  const vornhost::StationFacts facts(vornhost::ReadLeases(), NeighboursOrNone());
  const std::string time = TimeText();
  for (const vornhost::Station &station : stations) {
    if (station.authorized) {
      records.append(RecordOf(station, facts, time));
    }
  }
  return records;
}

// @return negative, with the reason in the log
int Refuse(int code, const std::string &name, const char *why) {
  vornhost::LogError("%s: %s", vornhost::LogText(name).c_str(), why);
  return vornhost::SetError(code);
}

using Adapters = std::vector<vornhost::WirelessAdapter>;

// Runs what is to be done with an adapter; a std::runtime_error says what is wrong with its configuration.
template <typename Body> int ForAdapter(const std::string &name, const Body &body) {
  return vornhost::Guarded(-1, [&name, &body] {
    const Adapters adapters = vornhost::ReadAdapters();
    const vornhost::WirelessAdapter *found = vornhost::FindAdapter(adapters, name);
    if (found == nullptr) {
      return Refuse(QARDC_ERR_NOT_FOUND, name, "no such adapter");
    }
    try {
      body(adapters, *found);
    } catch (const std::runtime_error &error) {
      return Refuse(QARDC_ERR_BAD_ARGUMENT, name, vornhost::LogText(error.what()).c_str());
    }
    return 0;
  });
}

} // namespace

WifiClient::WifiClient() = default;

WifiClient::~WifiClient() = default;

bool WifiClient::IsServerReady() {
  return access(vornhost::kTopologyProgram, X_OK) == 0;
}

int WifiClient::GetAdapterList(Json::Value &adapters) {
  return vornhost::Guarded(-1, [&adapters] {
    adapters = Json::Value(Json::arrayValue);
    for (const vornhost::WirelessAdapter &adapter : vornhost::ReadAdapters()) {
      adapters.append(adapter.name);
    }
    return 0;
  });
}

int WifiClient::GetAdapterConfig(const std::string &adapter, Json::Value &config) {
  return ForAdapter(adapter, [&config](const Adapters &adapters, const vornhost::WirelessAdapter &found) {
    config = vornhost::ReadAdapterConfig(found.name);
    const vornhost::Deadline deadline = AnswerDeadline();
    config[vornhost::kEnabledMember] = IsOn(&found.networks.front(), deadline);
    config[vornhost::kGuestEnabledMember] =
        IsOn(vornhost::FindNetwork(adapters, vornhost::GuestNetworkOf(found.name)), deadline);
  });
}

int WifiClient::ApplyAdapter(const std::string &adapter, const Json::Value &config) {
  return ForAdapter(adapter, [&config](const Adapters &, const vornhost::WirelessAdapter &found) {
    vornhost::WriteAdapter(found, config);
  });
}

int WifiClient::GetConnectionList(const std::string &network, Json::Value &stations) {
  return vornhost::Guarded(-1, [&network, &stations] {
    const auto adapters = vornhost::ReadAdapters();
    const vornhost::WirelessNetwork *found = vornhost::FindNetwork(adapters, network);
    if (found == nullptr) {
      return Refuse(QARDC_ERR_NOT_FOUND, network, "no such wireless network");
    }
    vornhost::ControlSocket control(found->control, AnswerDeadline());
    const auto listed = vornhost::ListStations(control);
    if (!listed) {
      return Refuse(QARDC_ERR_IO, network, "hostapd gives no list of stations");
    }
    stations = RecordsOf(*listed);
    return 0;
  });
}

int WifiClient::SwitchTopology(const std::string &target) {
  return vornhost::Guarded(-1, [&target] {
    if (!IsTopology(target)) {
      vornhost::LogError("no such topology: \"%s\"", vornhost::LogText(target).c_str());
      return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    return RunSwitch(target);
  });
}

} // namespace vornwireless::dbus
