// How many calls may be in the module at once.
#ifndef WEBAPI_GATE_H
#define WEBAPI_GATE_H

#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>

namespace vornwebapi {

/// A counting gate with a bounded queue before it. Every member may be called from any thread.
class Gate {
public:
  /// Run once for whoever waited: with true it holds a slot, with false the server is stopping and it holds none.
  using Waiter = std::function<void(bool admitted)>;
  enum class Entry { kAdmitted, kQueued, kFull };

  /// @param[in] post  hands a function to another thread
  Gate(size_t slots, size_t queue, std::function<void(std::function<void()>)> post);

  /// @param[in] makeWaiter  asked for a waiter when there is no slot but room to wait
  template <typename MakeWaiter> Entry Enter(MakeWaiter makeWaiter) {
    const std::lock_guard lock(mutex_);
    if (free_ > 0) {
      --free_;
      return Entry::kAdmitted;
    }
    if (stopped_ || waiting_.size() >= queue_) {
      return Entry::kFull;
    }
    waiting_.push_back(makeWaiter());
    return Entry::kQueued;
  }

  /// Gives a slot back, to the first who waits.
  void Leave();
  /// Turns away everyone who waits, now and later. Those inside stay.
  void Stop();

private:
  const size_t queue_;
  const std::function<void(std::function<void()>)> post_;
  std::mutex mutex_;
  size_t free_;
  bool stopped_ = false;
  std::deque<Waiter> waiting_;
};

} // namespace vornwebapi

#endif
