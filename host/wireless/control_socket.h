// One conversation with hostapd over a control socket (hostapd.conf(5), ctrl_interface).
//
// hostapd answers each datagram with one datagram to the address that it came from. That address is an abstract one
// (unix(7), autobind): a file would have to lie where hostapd sees it too, and the server has a /tmp of its own. Both
// must be in one network namespace. Debian's libwpa-client waits ten seconds for an answer and cannot be told
// otherwise, which is why it is not used here.
#ifndef HOST_WIRELESS_CONTROL_SOCKET_H
#define HOST_WIRELESS_CONTROL_SOCKET_H

#include "host/utility/unique_fd.h"

#include <chrono>
#include <optional>
#include <string>

namespace vornhost {

using Deadline = std::chrono::steady_clock::time_point;

/// The longest that one call of the contract waits for hostapd, all its requests together. A change that failed has as
/// much time again to be taken back.
constexpr std::chrono::milliseconds kAnswerLimit{2000};

class ControlSocket {
public:
  /// @param[in] path      of hostapd's socket
  /// @param[in] deadline  no answer is waited for any longer
  ControlSocket(const std::string &path, Deadline deadline);

  /// Whether there is nobody at the other end: no socket, or one that a dead hostapd has left.
  bool IsAbsent() const { return absent_; }

  /// Sends a request and waits for its answer. After a request without an answer there is none to any later one: an
  /// answer that comes too late would be taken for another's.
  /// @return nothing when there is no whole answer before the deadline
  std::optional<std::string> Ask(const std::string &request);

  /// @return whether the answer is "OK"
  bool Do(const std::string &request);

private:
  bool Send(const std::string &request);
  std::optional<std::string> Receive();
  bool WaitFor(short events) const;

  UniqueFd socket_;
  Deadline deadline_;
  bool absent_ = false;
};

} // namespace vornhost

#endif
