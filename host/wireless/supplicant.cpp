#include "host/wireless/supplicant.h"

#include "host/network/current_topology.h"
#include "host/network/names.h"
#include "host/utility/program_runner.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/upstream.h"

#include <sys/stat.h>

#include <filesystem>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

constexpr char kPidFile[] = "/run/vorn/wpa_supplicant.pid";
constexpr char kControl[] = "/run/vorn/upstream"; // of its control socket, which bears the interface's name
constexpr std::chrono::milliseconds kPause{100};

std::string Ask(const std::string &interface, const char *request) {
  ControlSocket control(std::string(kControl) + "/" + interface, std::chrono::steady_clock::now() + kAnswerLimit);
  return control.Ask(request).value_or("");
}

bool Holds(const std::string &text, const char *part) {
  return text.find(part) != std::string::npos;
}

// A network that has refused the station is left alone for a while.
bool HasRefused(const std::string &interface) {
  return Holds(Ask(interface, "LIST_NETWORKS"), "[TEMP-DISABLED]");
}

} // namespace

Supplicant::Supplicant() : process_("wpa_supplicant", "-P", kPidFile) {}

std::string Supplicant::Interface() {
  std::error_code failed;
  for (fs::directory_iterator entry(kControl, failed), end; !failed && entry != end; entry.increment(failed)) {
    std::string name = entry->path().filename();
    if (HasInterface(name.c_str())) {
      return name;
    }
  }
  return "";
}

// -C: the control socket is where we look for it, whatever the file says; -s: it speaks to the system log.
void Supplicant::Start(const std::string &interface) const {
  Stop();
  mkdir(kRunFolder, 0700);
  RunLimits limits;
  limits.time = std::chrono::seconds(5);
  const std::string file = UpstreamFileOf(interface);
  if (ProgramRunner(limits).Run({kSupplicantProgram, "-B", "-s", "-D", "nl80211", "-i", interface, "-c", file, "-C",
                                 kControl, "-P", kPidFile}) != 0) {
    Stop(); // one that was cut off at the limit may have left a child
    throw std::runtime_error("wpa_supplicant does not start with " + file);
  }
  process_.AwaitBackground();
}

void Supplicant::AwaitJoined(const std::string &interface) {
  const auto end = std::chrono::steady_clock::now() + kJoinLimit;
  bool refused = false; // at the end it may be trying once more
  while (!Holds(Ask(interface, "STATUS"), "wpa_state=COMPLETED\n")) {
    refused = refused || HasRefused(interface);
    if (std::chrono::steady_clock::now() > end) {
      throw std::runtime_error(interface + ": " +
                               (refused ? "the network outside does not let us in: is the key right?"
                                        : "the network outside is not found, or does not answer"));
    }
    std::this_thread::sleep_for(kPause);
  }
}

// A socket that a killed one has left would speak of it for ever.
void Supplicant::Stop() const {
  process_.Stop();
  std::error_code ignored;
  fs::remove_all(kControl, ignored);
}

} // namespace vornhost
