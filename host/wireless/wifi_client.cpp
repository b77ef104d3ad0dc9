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

#include <unistd.h>

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

} // namespace

WifiClient::WifiClient() = default;

WifiClient::~WifiClient() = default;

bool WifiClient::IsServerReady() {
  return access(vornhost::kTopologyProgram, X_OK) == 0;
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
