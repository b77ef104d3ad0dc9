#include "webapi/gate.h"

#include <utility>

namespace vornwebapi {

Gate::Gate(size_t slots, size_t queue, size_t groups, std::function<void(std::function<void()>)> post)
    : queue_(queue), post_(std::move(post)), free_(slots), groups_(groups) {}

bool Gate::MayEnter(const Turn &turn) const {
  if (free_ == 0 || turn.group == Turn::kNoGroup) {
    return free_ > 0;
  }
  const Group &group = groups_[turn.group];
  return turn.alone ? group.inside == 0 : !group.alone;
}

void Gate::Take(const Turn &turn) {
  --free_;
  if (turn.group != Turn::kNoGroup) {
    ++groups_[turn.group].inside;
    groups_[turn.group].alone = turn.alone;
  }
}

void Gate::GiveBack(const Turn &turn) {
  if (turn.group != Turn::kNoGroup) {
    --groups_[turn.group].inside;
    groups_[turn.group].alone = false;
  }
}

void Gate::Queue(const Turn &turn, Waiter waiter) {
  waiting_.push_back({turn, std::move(waiter)});
  if (turn.group != Turn::kNoGroup) {
    ++groups_[turn.group].waiting;
  }
}

// Nobody passes someone of the same group, so that neither many readers nor many writers shut the others out.
std::vector<Gate::Waiter> Gate::TakeNext() {
  std::vector<Waiter> next;
  std::vector<bool> blocked(groups_.size());
  for (auto each = waiting_.begin(); each != waiting_.end() && free_ > 0;) {
    const Turn turn = each->turn;
    const bool grouped = turn.group != Turn::kNoGroup;
    if (grouped && (blocked[turn.group] || !MayEnter(turn))) {
      blocked[turn.group] = true;
      ++each;
      continue;
    }
    Take(turn);
    if (grouped) {
      --groups_[turn.group].waiting;
    }
    next.push_back(std::move(each->waiter));
    each = waiting_.erase(each);
  }
  return next;
}

void Gate::Post(std::vector<Waiter> waiters, bool admitted) {
  for (Waiter &waiter : waiters) {
    post_([waiter = std::move(waiter), admitted] { waiter(admitted); });
  }
}

void Gate::Leave(const Turn &turn) {
  std::unique_lock lock(mutex_);
  GiveBack(turn);
  ++free_;
  std::vector<Waiter> next = TakeNext();
  lock.unlock();
  Post(std::move(next), true);
}

void Gate::EndTurn(const Turn &turn) {
  std::unique_lock lock(mutex_);
  GiveBack(turn);
  std::vector<Waiter> next = TakeNext();
  lock.unlock();
  Post(std::move(next), true);
}

void Gate::LeaveSlot() {
  Leave({});
}

void Gate::Stop() {
  std::vector<Waiter> turnedAway;
  {
    const std::lock_guard lock(mutex_);
    stopped_ = true;
    for (Waiting &each : waiting_) {
      turnedAway.push_back(std::move(each.waiter));
    }
    waiting_.clear();
    for (Group &group : groups_) {
      group.waiting = 0;
    }
  }
  Post(std::move(turnedAway), false);
}

} // namespace vornwebapi
