// Keeping at work what the network's programs have started or told, and what can be lost while none of them runs: the
// DHCP clients and wpa_supplicant, which die like any process, and the MAC filter of a hostapd that fell silent.
//
// The daemons are not the service manager's own, because a switch of the topology starts and stops them as steps that
// it can undo, and because the home must work where no systemd runs. The watcher never acts while a process has its
// turn at the network or a switch has its lock: what a switch that died has left is for "vorntopology recover".
#ifndef HOST_WATCH_WATCHER_H
#define HOST_WATCH_WATCHER_H

#include "host/utility/unique_fd.h"
#include "host/watch/back_off.h"
#include "host/watch/wanted_daemons.h"

#include <map>
#include <string>
#include <vector>

namespace vornhost {

class Watcher {
public:
  /// Listens from now on. Throws std::runtime_error when it cannot.
  Watcher();

  /// Starts what died, and what is to run and does not, and tells hostapd what it was not told, for ever. What fails is
  /// logged and tried again, each time after a longer pause. Throws std::runtime_error when changes cannot be listened
  /// to any more.
  [[noreturn]] void Run();

private:
  using Clock = BackOff::Clock;

  Clock::time_point LookAtDaemons();
  Clock::time_point LookAtFilters();
  Clock::time_point Revive(const std::string &name);
  void Wait(Clock::time_point until);
  void Drain();

  UniqueFd changes_;                        // inotify(7)
  std::vector<UniqueFd> watched_;           // of the daemons that run
  std::map<std::string, BackOff> backOffs_; // by the daemon's name
  // Asking costs nothing, and a hostapd that goes on may first do what it was last told, and be open.
  static constexpr std::chrono::seconds kLongestSilence{4};
  BackOff filters_{kLongestSilence};
};

} // namespace vornhost

#endif
