// The other end of a control socket: hostapd itself, or a stand-in that speaks its protocol on a real socket.
#ifndef TESTS_HOST_WIRELESS_HOSTAPD_PEER_H
#define TESTS_HOST_WIRELESS_HOSTAPD_PEER_H

#include "host/utility/unique_fd.h"

#include <sys/types.h>

#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

namespace hosttest {

constexpr char kControlFolder[] = "/run/hostapd";

/// What a RealHostapd was asked, and more.
constexpr char kHostapdLog[] = "/tmp/hostapd.log";

/// Writes /etc/hostapd/<name>.conf: one network of its own, with a control socket and no radio.
void WriteHostapdConfig(const std::string &name, const std::string &more = "");

/// As an answer: the stand-in dies, its socket's file stays.
constexpr char kDeath[] = "death";

/// An answer for a request; nothing: none is sent.
using Answerer = std::function<std::optional<std::string>(const std::string &request)>;

/// A stand-in, on a thread of its own, at kControlFolder/<name>.
class FakeHostapd {
public:
  FakeHostapd(const std::string &name, Answerer answer);
  ~FakeHostapd();
  FakeHostapd(const FakeHostapd &) = delete;
  FakeHostapd &operator=(const FakeHostapd &) = delete;

  std::vector<std::string> Requests();

private:
  void Serve();

  std::string path_;
  Answerer answer_;
  vornhost::UniqueFd socket_;
  vornhost::UniqueFd stopRead_;
  vornhost::UniqueFd stopWrite_;
  std::mutex mutex_;
  std::vector<std::string> requests_;
  std::thread thread_;
};

/// Answers as hostapd does with these stations, each the whole text of its record.
Answerer WithStations(std::vector<std::string> records);

/// What hostapd says of a station; as it looks over a radio when it is authorized, otherwise as it does before.
std::string StationText(const std::string &mac, bool authorized);

/// Debian's hostapd, with the files that WriteHostapdConfig made. It ends with the object.
class RealHostapd {
public:
  explicit RealHostapd(const std::vector<std::string> &names);
  ~RealHostapd();
  RealHostapd(const RealHostapd &) = delete;
  RealHostapd &operator=(const RealHostapd &) = delete;

  void Signal(int number) const;
  /// What it answers, as hostapd_cli would show it.
  static std::string Ask(const std::string &name, const std::string &request);

private:
  pid_t pid_ = -1;
};

/// Whether a hostapd is installed here.
bool HasHostapd();

} // namespace hosttest

#endif
