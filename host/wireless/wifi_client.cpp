#include "host/export.h"

namespace vornwireless::dbus {
class VORN_EXPORT WifiClient;
}

#include "platform/wifi.h"

#include "host/network/names.h"
#include "host/utility/error.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"

#include <unistd.h>

namespace vornwireless::dbus {

namespace {

bool IsTopology(const std::string &text) {
  return text == vornhost::kRouterTopology || text == vornhost::kBridgeTopology || text == vornhost::kClientTopology;
}

// The switch is a program of its own, so that it is carried through, or undone, also when this process dies. When the
// program itself died, what it left is set right; when it ended in order, there is nothing for "recover" to do.
int RunSwitch(const std::string &target) {
  const vornhost::ProgramRunner runner;
  if (runner.Run({vornhost::kTopologyProgram, "switch", target}) == 0) {
    return 0;
  }
  if (runner.Run({vornhost::kTopologyProgram, "recover"}) != 0) {
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
