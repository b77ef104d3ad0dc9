#include "host/watch/watcher.h"

#include "host/network/names.h"
#include "host/network/topology_steps.h"
#include "host/network/turn.h"
#include "host/utility/log.h"
#include "host/wireless/untold.h"

#include <poll.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

// How long until another look at a network that another process changes, or at one that is not as it is to be.
constexpr std::chrono::seconds kRetryTime{1};
constexpr std::chrono::seconds kIncompleteTime{5};

// A daemon that starts writes its files one after the other.
constexpr std::chrono::milliseconds kBurst{20};

bool IsSwitchUnderWay() {
  return access(kTopologyLock, F_OK) == 0;
}

const WantedDaemon *Find(const std::vector<WantedDaemon> &daemons, const std::string &name) {
  const auto found =
      std::find_if(daemons.begin(), daemons.end(), [&name](const auto &daemon) { return daemon.name == name; });
  return found == daemons.end() ? nullptr : &*found;
}

} // namespace

Watcher::Watcher() : changes_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
  // Where the daemons' pid files come and go, so that one that somebody else has started is watched too, and where
  // networks are noted that hostapd is to be told of.
  for (const char *folder : {kRunFolder, kUntoldFolder}) {
    mkdir(folder, 0700);
    if (!changes_.IsOpen() || inotify_add_watch(changes_.Get(), folder, IN_CREATE | IN_DELETE | IN_MOVED_TO) < 0) {
      throw std::runtime_error(std::string(folder) + ": " + std::strerror(errno));
    }
  }
}

// One that does not run is started within a turn of its own, so that a switch that is asked for meanwhile waits for one
// start at most. Within the turn everything is looked at anew: who had the turn before may have changed it all.
Watcher::Clock::time_point Watcher::Revive(const std::string &name) {
  BackOff &backOff = backOffs_[name];
  const Clock::time_point now = Clock::now();
  if (now < backOff.GetNext()) {
    return backOff.GetNext();
  }
  const UniqueFd turn = TakeTurn();
  if (!turn.IsOpen() || IsSwitchUnderWay()) {
    return Clock::now() + kRetryTime;
  }
  const WantedDaemons wanted = FindWantedDaemons();
  const WantedDaemon *daemon = Find(wanted.daemons, name);
  if (daemon == nullptr || daemon->watch().IsOpen()) {
    return now;
  }
  backOff.Note(Clock::now());
  LogInfo("%s does not run: it is started", name.c_str());
  Attempt("start", name, daemon->start);
  return now;
}

// @return when to look again, if nothing happens before
Watcher::Clock::time_point Watcher::LookAtDaemons() {
  watched_.clear();
  if (IsSwitchUnderWay()) { // what it starts last is there before it ends, and its end is no news
    return Clock::now() + kRetryTime;
  }
  const WantedDaemons wanted = FindWantedDaemons();
  Clock::time_point until = wanted.isWhole ? Clock::time_point::max() : Clock::now() + kIncompleteTime;
  for (const WantedDaemon &daemon : wanted.daemons) {
    UniqueFd running = daemon.watch();
    if (running.IsOpen()) {
      watched_.push_back(std::move(running));
    } else {
      until = std::min(until, Revive(daemon.name));
    }
  }
  return until;
}

// A hostapd that fell silent says nothing when it goes on: it is asked.
Watcher::Clock::time_point Watcher::LookAtFilters() {
  if (UntoldNetworks().empty()) {
    filters_ = BackOff(kLongestSilence);
    return Clock::time_point::max();
  }
  if (Clock::now() < filters_.GetNext()) {
    return filters_.GetNext();
  }
  filters_.Note(Clock::now());
  Attempt("tell", "the MAC filters", TellUntold);
  return Clock::now();
}

// What has changed is asked for anew anyway.
void Watcher::Drain() {
  alignas(inotify_event) std::array<char, 4096> buffer{};
  for (;;) {
    const ssize_t got = read(changes_.Get(), buffer.data(), buffer.size());
    if (got < 0 && errno == EAGAIN) {
      return;
    }
    if (got < 0 && errno != EINTR) {
      throw std::runtime_error(std::string("inotify: ") + std::strerror(errno));
    }
    if (access(kUntoldFolder, F_OK) != 0) {
      throw std::runtime_error(std::string(kUntoldFolder) + " is gone");
    }
  }
}

void Watcher::Wait(Clock::time_point until) {
  using std::chrono::milliseconds;
  const auto left = std::chrono::ceil<milliseconds>(until - Clock::now());
  const int timeout =
      until == Clock::time_point::max() ? -1 : static_cast<int>(std::max<milliseconds::rep>(left.count(), 0));
  std::vector<pollfd> entries = {{changes_.Get(), POLLIN, 0}};
  for (const UniqueFd &process : watched_) {
    entries.push_back({process.Get(), POLLIN, 0});
  }
  if (poll(entries.data(), entries.size(), timeout) > 0) {
    std::this_thread::sleep_for(kBurst);
    Drain();
  }
}

void Watcher::Run() {
  for (;;) {
    Wait(std::min(LookAtDaemons(), LookAtFilters()));
  }
}

} // namespace vornhost
