// wpa_supplicant, which makes the router a station of another wireless network. There is one at most.
#ifndef HOST_WIRELESS_SUPPLICANT_H
#define HOST_WIRELESS_SUPPLICANT_H

#include "host/network/daemon_process.h"

#include <chrono>
#include <string>

namespace vornhost {

class Supplicant {
public:
  /// A station looks for the network on every channel and tries a key for some seconds before it gives up.
  static constexpr std::chrono::seconds kJoinLimit{20};

  Supplicant();

  /// @return the interface that a supplicant of ours is at, or was when it was killed, and that is there; empty: none
  static std::string Interface();

  bool IsRunning() const { return process_.IsRunning(); }

  /// As DaemonProcess's, of the one at that interface: of two adapters one may have taken the other's place.
  UniqueFd Watch(const std::string &interface) const { return process_.Watch("-i", interface); }

  /// Starts it with the interface's configuration; from then on it joins the network whenever that is there. Throws
  /// std::runtime_error when it cannot be started.
  void Start(const std::string &interface) const;

  /// Waits until the network outside has let us in. Throws std::runtime_error, which says how far it came, when it has
  /// not within kJoinLimit.
  static void AwaitJoined(const std::string &interface);

  /// Ends it. Throws std::runtime_error when it lives on.
  void Stop() const;

private:
  DaemonProcess process_;
};

} // namespace vornhost

#endif
