#include "webapi/runners.h"

#include "webapi/log.h"

#include <algorithm>
#include <exception>

namespace vornwebapi {
namespace {

using std::chrono::milliseconds;

constexpr size_t kBeyondProcessors = 2;
constexpr milliseconds kBetweenLooks{2};
constexpr milliseconds kSpareStays{50}; // then a spare thread looks whether it is still needed
constexpr int kQuietLooks = 50;         // without a call inside; then the watcher sleeps until there is one

thread_local std::atomic<std::uint64_t> *insideSince = nullptr; // the record of this thread

size_t BaseCount(size_t spare) {
  const size_t processors = std::max(1U, std::thread::hardware_concurrency());
  return std::min(processors, spare) + kBeyondProcessors;
}

} // namespace

// With `spare` calls inside, two threads are left.
Runners::Runners(boost::asio::io_context &context, size_t spare)
    : context_(context), base_(BaseCount(spare)), spare_(spare + kBeyondProcessors - base_), records_(base_ + spare_) {}

Runners::~Runners() = default;

void Runners::Start() {
  work_.emplace(context_.get_executor());
  running_ = base_ + spare_ + 1;
  threads_.reserve(running_);
  for (size_t index = 0; index < base_; ++index) {
    threads_.emplace_back([this, index] { RunBase(records_[index]); });
  }
  for (size_t index = 0; index < spare_; ++index) {
    threads_.emplace_back([this, index] { RunSpare(records_[base_ + index], index); });
  }
  threads_.emplace_back([this] { Watch(); });
}

void Runners::RunContext(bool forAWhile) {
  try {
    if (forAWhile) {
      context_.run_for(kSpareStays);
    } else {
      context_.run();
    }
  } catch (const std::exception &error) { // no memory: the connection that asked for it is gone
    Log(LogKind::kModuleFault, "a connection was given up: %s", Printable(error.what()).c_str());
  }
}

void Runners::RunBase(Record &record) {
  insideSince = &record.since;
  while (!context_.stopped()) { // it stops by itself when its work is done
    RunContext(false);
  }
  const std::lock_guard lock(mutex_);
  ending_ = true; // the others have nothing to do either
  --running_;
  changed_.notify_all();
}

void Runners::RunSpare(Record &record, size_t number) {
  insideSince = &record.since;
  std::unique_lock lock(mutex_);
  for (;;) {
    changed_.wait(lock, [this, number] { return ending_ || letIn_ > number; });
    if (ending_) {
      break;
    }
    lock.unlock();
    while (letIn_ > number && !context_.stopped()) {
      RunContext(true);
    }
    lock.lock();
    ending_ = ending_ || context_.stopped();
  }
  --running_;
  changed_.notify_all();
}

void Runners::Watch() {
  std::unique_lock lock(mutex_);
  int quiet = 0;
  while (!ending_) {
    if (quiet >= kQuietLooks) {
      watching_ = false;
      if (!AnyInside()) { // one that goes in from now on sees that nobody watches
        changed_.wait(lock, [this] { return ending_ || watching_; });
      }
      watching_ = true;
      quiet = 0;
    }
    changed_.wait_for(lock, kBetweenLooks, [this] { return ending_; });
    ++looks_;
    quiet = AnyInside() ? 0 : quiet + 1;
    const size_t stuck = std::min(Stuck(), spare_);
    const bool more = stuck > letIn_;
    letIn_ = stuck;
    if (more) {
      changed_.notify_all();
    }
  }
  --running_;
  changed_.notify_all();
}

// Inside since before the last look but one: between one and two looks' time at least.
size_t Runners::Stuck() const {
  const std::uint64_t now = looks_;
  return static_cast<size_t>(std::count_if(records_.begin(), records_.end(), [now](const Record &record) {
    const std::uint64_t since = record.since;
    return since != 0 && since + 1 < now;
  }));
}

bool Runners::AnyInside() const {
  return std::any_of(records_.begin(), records_.end(), [](const Record &record) { return record.since != 0; });
}

Runners::Inside::Inside(Runners &runners) {
  *insideSince = runners.looks_.load();
  if (!runners.watching_) {
    const std::lock_guard lock(runners.mutex_);
    runners.watching_ = true;
    runners.changed_.notify_all();
  }
}

Runners::Inside::~Inside() {
  *insideSince = 0;
}

bool Runners::JoinAll(Clock::time_point deadline) {
  work_.reset();
  bool ended = false;
  {
    std::unique_lock lock(mutex_);
    ended = changed_.wait_until(lock, deadline, [this] { return running_ == 0; });
  }
  for (std::thread &thread : threads_) {
    if (ended) {
      thread.join();
    } else {
      thread.detach();
    }
  }
  threads_.clear();
  return ended;
}

} // namespace vornwebapi
