#include "webapi/gate.h"

#include <utility>

namespace vornwebapi {

Gate::Gate(size_t slots, size_t queue, std::function<void(std::function<void()>)> post)
    : queue_(queue), post_(std::move(post)), free_(slots) {}

void Gate::Leave() {
  Waiter next;
  {
    const std::lock_guard lock(mutex_);
    if (waiting_.empty()) {
      ++free_;
      return;
    }
    next = std::move(waiting_.front());
    waiting_.pop_front();
  }
  post_([next = std::move(next)] { next(true); });
}

void Gate::Stop() {
  std::deque<Waiter> turnedAway;
  {
    const std::lock_guard lock(mutex_);
    stopped_ = true;
    turnedAway.swap(waiting_);
  }
  for (Waiter &waiter : turnedAway) {
    post_([waiter = std::move(waiter)] { waiter(false); });
  }
}

} // namespace vornwebapi
