// Which calls may be in the module at once.
#ifndef WEBAPI_GATE_H
#define WEBAPI_GATE_H

#include <cstddef>
#include <deque>
#include <functional>
#include <limits>
#include <mutex>
#include <vector>

namespace vornwebapi {

/// Whom a call may meet inside. Modules take no locks: two changes of one thing at once would mix, and who reads
/// meanwhile would see half of one.
struct Turn {
  static constexpr size_t kNoGroup = std::numeric_limits<size_t>::max();
  size_t group = kNoGroup; ///< calls of no group meet anyone
  bool alone = false;      ///< meets nobody of its group
};

/// A counting gate with a bounded queue before it. Calls of one group go in in their order; nobody else waits for them.
/// Every member may be called from any thread.
class Gate {
public:
  /// Run once for whoever waited: with true it holds a slot and its turn, with false the server is stopping and it
  /// holds none.
  using Waiter = std::function<void(bool admitted)>;
  enum class Entry { kAdmitted, kQueued, kFull };

  /// @param[in] groups  how many there are, numbered from 0
  /// @param[in] post    hands a function to another thread
  Gate(size_t slots, size_t queue, size_t groups, std::function<void(std::function<void()>)> post);

  /// @param[in] makeWaiter  asked for a waiter when it cannot go in now but there is room to wait
  template <typename MakeWaiter> Entry Enter(const Turn &turn, MakeWaiter makeWaiter) {
    const std::lock_guard lock(mutex_);
    if (MayEnter(turn) && !IsAwaited(turn)) {
      Take(turn);
      return Entry::kAdmitted;
    }
    if (stopped_ || waiting_.size() >= queue_) {
      return Entry::kFull;
    }
    Queue(turn, makeWaiter());
    return Entry::kQueued;
  }

  /// Gives turn and slot back, to those who wait.
  void Leave(const Turn &turn);
  /// Gives the turn back and keeps the slot, which LeaveSlot gives back.
  void EndTurn(const Turn &turn);
  void LeaveSlot();
  /// Turns away everyone who waits, now and later. Those inside stay.
  void Stop();

private:
  struct Group {
    size_t inside = 0;
    size_t waiting = 0;
    bool alone = false; // the one inside
  };
  struct Waiting {
    Turn turn;
    Waiter waiter;
  };

  // REQUIRES, of all of them: the lock is held.
  bool MayEnter(const Turn &turn) const;
  bool IsAwaited(const Turn &turn) const { return turn.group != Turn::kNoGroup && groups_[turn.group].waiting > 0; }
  void Take(const Turn &turn);
  void GiveBack(const Turn &turn);
  void Queue(const Turn &turn, Waiter waiter);
  std::vector<Waiter> TakeNext();

  void Post(std::vector<Waiter> waiters, bool admitted);

  const size_t queue_;
  const std::function<void(std::function<void()>)> post_;
  std::mutex mutex_;
  size_t free_;
  bool stopped_ = false;
  std::vector<Group> groups_;
  std::deque<Waiting> waiting_;
};

} // namespace vornwebapi

#endif
