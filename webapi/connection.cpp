#include "webapi/connection.h"

#include "webapi/log.h"

#include <boost/asio/post.hpp>

#include <array>
#include <limits>
#include <utility>

namespace vornwebapi {
namespace {

constexpr size_t kReadAtOnce = 32768;
constexpr size_t kLargeBody = 65536;
constexpr int kMostInARow = 8;              // then other connections have their turn
constexpr size_t kMostDrained = 16'777'216; // bytes
constexpr Milliseconds kDrainTime{2'000};

/// Bytes are read here and copied on, so that a connection that waits holds no buffer.
std::array<char, kReadAtOnce> &Scratch() {
  thread_local std::array<char, kReadAtOnce> scratch;
  return scratch;
}

} // namespace

Connection::Connection(Shared &shared, Socket socket, const ClientKey &client, HostRule hosts, Peer peer)
    : shared_(shared), transport_(std::move(socket), shared.tls), client_(client),
      session_(shared.service, std::move(hosts), std::move(peer)) {
  Enter(Phase::kIdle, shared_.tls != nullptr ? shared_.config.handshakeTime : shared_.config.idleTime);
  shared_.service.Counts().AddConnection();
  shared_.connections.Add(*this); // from here on it may be swept
}

Connection::~Connection() {
  if (!callbacks_.Empty()) {
    RunCallbacks(); // the client went before its answer
  }
  transport_.Close();
  shared_.service.Counts().RemoveConnection();
  shared_.connections.Remove(*this, client_);
}

void Connection::Start() {
  WaitForBytes();
}

void Connection::Enter(Phase phase, Milliseconds time) {
  deadline_ = (Connections::Clock::now() + time).time_since_epoch().count();
  phase_ = phase;
}

void Connection::ExpireBefore(Connections::Clock::time_point time) {
  if (WaitsUntil() <= time.time_since_epoch().count()) {
    Cut();
  }
}

Connections::Clock::rep Connection::WaitsUntil() const {
  return phase_ == Phase::kCall ? std::numeric_limits<Connections::Clock::rep>::max() : deadline_.load();
}

void Connection::Cut() {
  expired_ = true;
  if (phase_ == Phase::kWrite) {
    transport_.Abort();
  } else {
    transport_.Interrupt();
  }
}

void Connection::Stop() {
  const Phase phase = phase_;
  if (phase != Phase::kCall && phase != Phase::kWrite && phase != Phase::kDrain) {
    transport_.Interrupt();
  }
}

void Connection::WaitForBytes() {
  transport_.WaitReadable([self = shared_from_this()](boost::system::error_code fault) {
    if (!fault) {
      self->OnReadable();
    }
  });
}

void Connection::OnReadable() {
  if (phase_ == Phase::kDrain) {
    Drain();
    return;
  }
  if (expired_ || shared_.stopping) {
    OnExpired();
    return;
  }
  if (transport_.StartTls()) {
    shared_.connections.HoldTls(*this);
  }
  size_t count = 0;
  switch (transport_.Read(Scratch().data(), Scratch().size(), count)) {
  case Transport::Result::kDone:
    session_.Feed({Scratch().data(), count});
    Proceed();
    break;
  case Transport::Result::kWouldBlock:
    WaitForBytes();
    break;
  case Transport::Result::kClosed:
    break;
  }
}

// The deadline of a phase was reached, or the server stops: half a request gets an answer, silence none.
void Connection::OnExpired() {
  if (phase_ == Phase::kIdle) {
    return;
  }
  if (shared_.stopping) {
    Send(Stopping());
    return;
  }
  Log(LogKind::kSlowClient, "a request took too long and was cut");
  Send(RequestTimeout());
}

void Connection::Proceed() {
  switch (session_.Step()) {
  case Session::Wants::kBytes:
    AwaitBytes();
    break;
  case Session::Wants::kContinue:
    if (SendContinue()) {
      Proceed();
    }
    break;
  case Session::Wants::kCall:
    EnterGate();
    break;
  case Session::Wants::kAnswer:
    Send(session_.Refusal());
    break;
  }
}

// A deadline runs from the first byte of its phase and is not moved by further ones.
void Connection::AwaitBytes() {
  inARow_ = 0;
  if (session_.InBody()) {
    if (phase_ != Phase::kBody) {
      Enter(Phase::kBody, shared_.config.bodyTime);
    }
  } else if (!session_.Idle()) {
    if (phase_ != Phase::kHeader) {
      Enter(Phase::kHeader, shared_.config.headerTime);
    }
  } else if (phase_ != Phase::kIdle) {
    Enter(Phase::kIdle, shared_.config.idleTime);
  }
  WaitForBytes();
}

/// @return false when the connection is over
bool Connection::SendContinue() {
  std::string_view text = Session::ContinueText();
  return transport_.Write(text) == Transport::Result::kDone;
}

void Connection::EnterGate() {
  phase_ = Phase::kCall;
  const auto waiter = [this] { return [self = shared_from_this()](bool admitted) { self->OnSlot(admitted); }; };
  turn_ = session_.TurnOfCall();
  switch (shared_.gate.Enter(turn_, waiter)) {
  case Gate::Entry::kAdmitted:
    Call();
    break;
  case Gate::Entry::kQueued:
    break;
  case Gate::Entry::kFull:
    if (shared_.stopping) {
      Send(Stopping());
    } else {
      Log(LogKind::kBusy, "a call was refused: every waiting place is taken");
      Send(Busy());
    }
    break;
  }
}

void Connection::OnSlot(bool admitted) {
  if (admitted) {
    Call();
  } else {
    Send(Stopping());
  }
}

// REQUIRES: a slot and the turn are held. The turn is given back after the call; the slot too, or with callbacks after
// them: they may take long, and calls that ask how far they have come must get in.
void Connection::Call() {
  Outcome outcome = [this] {
    const Runners::Inside inside(shared_.runners);
    try {
      return session_.Call();
    } catch (...) { // no memory to say what is wrong: a turn that is not given back would shut the API for ever
      shared_.gate.Leave(turn_);
      throw;
    }
  }();
  if (session_.BodySize() > kLargeBody) {
    shared_.sawLargeBody = true;
  }
  callbacks_ = std::move(outcome.callbacks);
  if (callbacks_.Empty()) {
    shared_.gate.Leave(turn_);
  } else {
    shared_.gate.EndTurn(turn_);
  }
  Send(outcome.answer);
}

void Connection::Send(const Answer &answer) {
  file_ = session_.HeadOnly() ? std::string_view() : answer.file;
  out_ = session_.Finish(answer, shared_.stopping, closeAfter_);
  unsent_ = out_;
  Enter(Phase::kWrite, shared_.config.writeTime);
  Write();
}

void Connection::Write() {
  switch (transport_.Write(unsent_)) {
  case Transport::Result::kDone:
    if (!file_.empty()) {
      unsent_ = std::exchange(file_, {});
      Write();
    } else {
      OnWritten(true);
    }
    break;
  case Transport::Result::kWouldBlock:
    transport_.WaitWritable([self = shared_from_this()](boost::system::error_code fault) {
      if (!fault) {
        self->Write();
      }
    });
    break;
  case Transport::Result::kClosed:
    OnWritten(false);
    break;
  }
}

void Connection::OnWritten(bool delivered) {
  if (expired_ && !delivered) {
    Log(LogKind::kSlowClient, "a client did not take its answer and was cut");
  }
  std::string().swap(out_);
  if (!callbacks_.Empty()) {
    RunCallbacks();
  }
  if (!delivered) {
    return;
  }
  if (closeAfter_) {
    transport_.CloseWriting();
    expired_ = false;
    Enter(Phase::kDrain, kDrainTime);
    Drain();
    return;
  }
  if (++inARow_ < kMostInARow) {
    Proceed();
    return;
  }
  inARow_ = 0;
  boost::asio::post(transport_.GetExecutor(), [self = shared_from_this()] { self->Proceed(); });
}

// On a thread and a slot of their own: they may wait while this connection goes on.
void Connection::RunCallbacks() {
  boost::asio::post(transport_.GetExecutor(), [callbacks = std::move(callbacks_), &shared = shared_]() mutable {
    const Runners::Inside inside(shared.runners);
    callbacks.Run();
    shared.gate.LeaveSlot();
  });
}

// The client is given time to read the answer: closing at once with bytes unread would reset the connection.
void Connection::Drain() {
  for (;;) {
    size_t count = 0;
    switch (transport_.Read(Scratch().data(), Scratch().size(), count)) {
    case Transport::Result::kDone:
      drained_ += count;
      if (expired_ || drained_ > kMostDrained) {
        return;
      }
      break;
    case Transport::Result::kWouldBlock:
      if (!expired_) {
        WaitForBytes();
      }
      return;
    case Transport::Result::kClosed:
      return;
    }
  }
}

} // namespace vornwebapi
