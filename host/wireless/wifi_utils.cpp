#include "platform/wifi.h"

#include "host/export.h"
#include "host/network/current_topology.h"
#include "host/network/names.h"
#include "host/utility/error.h"
#include "host/wireless/upstream.h"

#include <unistd.h>

#include <filesystem>
#include <string_view>

namespace vornwireless::wifi::utils {

namespace {

namespace fs = std::filesystem;

// Each wireless adapter is a link there, whether it has an interface or not.
constexpr char kAdapters[] = "/sys/class/ieee80211";

// @return true when an adapter satisfies the condition
template <typename Condition> bool AnyAdapter(const Condition &condition) {
  std::error_code failed;
  for (fs::directory_iterator entry(kAdapters, failed), end; !failed && entry != end; entry.increment(failed)) {
    if (condition(entry->path())) {
      return true;
    }
  }
  return false;
}

bool IsOnUsb(const fs::path &adapter) {
  std::error_code failed;
  const fs::path bus = fs::read_symlink(adapter / "device" / "subsystem", failed);
  return !failed && bus.filename() == "usb";
}

} // namespace

VORN_EXPORT int GetTopologyString(std::string &topology) {
  return vornhost::Guarded(-1, [&topology] {
    const char *current = vornhost::CurrentTopology();
    if (current == nullptr) {
      return vornhost::SetError(QARDC_ERR_NOT_FOUND);
    }
    topology = current;
    return 0;
  });
}

VORN_EXPORT int GetSupportedMode(std::string &mode) {
  return vornhost::Guarded(-1, [&mode] {
    mode = std::string(vornhost::kRouterTopology) + "," + vornhost::kBridgeTopology;
    std::string ignored;
    if (!vornhost::FindUpstream(ignored).empty()) { // what the switch would refuse is not offered
      mode += std::string(",") + vornhost::kClientTopology;
    }
    return 0;
  });
}

VORN_EXPORT bool IsSupportTopology() {
  return vornhost::HasInterface(vornhost::kWanPort) && access(vornhost::kLanConfig, F_OK) == 0;
}

VORN_EXPORT bool HasWifiDongle() {
  return vornhost::Guarded(false, [] { return AnyAdapter(IsOnUsb); });
}

} // namespace vornwireless::wifi::utils
