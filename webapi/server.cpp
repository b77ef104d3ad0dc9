#include "webapi/server.h"

#include "webapi/log.h"

#include <malloc.h>
#include <poll.h>

#include <algorithm>
#include <boost/asio/post.hpp>
#include <functional>

namespace vornwebapi {
namespace {

constexpr Milliseconds kLongestSweepTime{250};
constexpr Milliseconds kShortestSweepTime{5};
constexpr Milliseconds kTimeAfterAbort{1'000};

/// Deadlines are kept to within this.
Milliseconds SweepTime(const Config &config) {
  const Milliseconds least = std::min({config.headerTime, config.bodyTime, config.idleTime, config.writeTime});
  return std::clamp(least / 8, kShortestSweepTime, kLongestSweepTime);
}

} // namespace

Server::Server(const Config &config, Service &service, SSL_CTX *tls)
    : config_(config), sweepTime_(SweepTime(config)), service_(service),
      connections_(config.connections, config.connectionsPerAddress, config.tlsConnections),
      gate_(config.slots, config.queue, service_.Groups(),
            [this](std::function<void()> work) { boost::asio::post(context_, std::move(work)); }),
      runners_(context_, config.slots), shared_{config, tls, service_, gate_, runners_, connections_},
      listener_(context_, shared_) {}

Server::~Server() = default;

bool Server::Run(int stop) {
  runners_.Start();
  listener_.Start();
  pollfd waited{stop, POLLIN, 0};
  while (poll(&waited, 1, static_cast<int>(sweepTime_.count())) <= 0) {
    Sweep();
  }
  return Stop();
}

void Server::Sweep() {
  // One that would reach its deadline before the next sweep is cut now: never late, a little early.
  connections_.Sweep(Connections::Clock::now() + sweepTime_);
  listener_.Resume();
  service_.Tasks().Purge();
  if (shared_.sawLargeBody.exchange(false)) {
    malloc_trim(0);
  }
}

bool Server::Stop() {
  Log(LogKind::kLifecycle, "stopping");
  const auto deadline = Connections::Clock::now() + config_.stopTime;
  shared_.stopping = true;
  listener_.Close();
  gate_.Stop();
  do {
    connections_.Stop();
    connections_.Sweep(Connections::Clock::now());
  } while (!connections_.WaitForNone(std::min(deadline, Connections::Clock::now() + sweepTime_)) &&
           Connections::Clock::now() < deadline);
  connections_.Abort();
  service_.Gate().TheTokens().SaveUse();
  const size_t tasks = service_.Tasks().Shutdown(deadline);
  const bool ended = runners_.JoinAll(std::max(deadline, Connections::Clock::now() + kTimeAfterAbort));
  if (!ended || tasks > 0) {
    Log(LogKind::kLifecycle, "stopped with %s%zu poll tasks still running", ended ? "" : "calls and ", tasks);
    return false;
  }
  Log(LogKind::kLifecycle, "stopped");
  return true;
}

} // namespace vornwebapi
