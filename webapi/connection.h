// One client's connection: its session on its transport, with a deadline on every phase.
#ifndef WEBAPI_CONNECTION_H
#define WEBAPI_CONNECTION_H

#include "webapi/config.h"
#include "webapi/connections.h"
#include "webapi/gate.h"
#include "webapi/runners.h"
#include "webapi/session.h"
#include "webapi/transport.h"

#include <atomic>
#include <memory>
#include <string>

namespace vornwebapi {

/// What all connections share; outlives them.
struct Shared {
  const Config &config;
  SSL_CTX *tls; ///< null: plain HTTP
  Service &service;
  Gate &gate;
  Runners &runners;
  Connections &connections;
  std::atomic<bool> stopping{false};
  std::atomic<bool> sawLargeBody{false}; ///< freed memory is to be given back
};

/// Owned by the one handler that it waits in: when nothing waits any more, it is gone and its descriptor closed.
/// Its own work is one thread's at a time, whichever; the members under "from any thread" may be called meanwhile.
class Connection : public std::enable_shared_from_this<Connection>, public ListHook {
public:
  /// @param[in] client  admitted already; given back when the connection ends
  Connection(Shared &shared, Socket socket, const ClientKey &client, HostRule hosts, Peer peer);
  Connection(const Connection &) = delete;
  Connection &operator=(const Connection &) = delete;
  ~Connection();

  void Start();

  // From any thread.
  void ExpireBefore(Connections::Clock::time_point time);
  /// When its client is too slow; the end of time while it is not the client that is waited for.
  Connections::Clock::rep WaitsUntil() const;
  void Cut(); ///< as at its deadline
  void Stop();
  void Abort() { transport_.Abort(); }

private:
  enum class Phase { kIdle, kHeader, kBody, kCall, kWrite, kDrain };

  void WaitForBytes();
  void OnReadable();
  void OnExpired();
  void Proceed();
  void AwaitBytes();
  bool SendContinue();
  void EnterGate();
  void OnSlot(bool admitted);
  void Call();
  void Send(const Answer &answer);
  void Write();
  void OnWritten(bool delivered);
  void RunCallbacks();
  void Drain();
  void Enter(Phase phase, Milliseconds time);

  Shared &shared_;
  Transport transport_;
  const ClientKey client_;
  Session session_;
  std::atomic<Phase> phase_{Phase::kIdle};
  std::atomic<Connections::Clock::rep> deadline_{0}; // of the running phase, in the clock's ticks since its epoch
  std::atomic<bool> expired_{false};
  std::string out_;         // the answer being written
  std::string_view unsent_; // of out_, then of the file
  std::string_view file_;   // of the page, to be sent behind out_; not copied for each who asks
  bool closeAfter_ = false; // the answer ends the connection
  Turn turn_;               // of the call that waits or is inside
  Callbacks callbacks_;     // of the answer being written; with any, a slot is held for them
  size_t drained_ = 0;
  int inARow_ = 0; // answers since the last wait, when requests are pipelined
};

} // namespace vornwebapi

#endif
