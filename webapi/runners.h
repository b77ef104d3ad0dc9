// The threads that serve.
#ifndef WEBAPI_RUNNERS_H
#define WEBAPI_RUNNERS_H

#include <atomic>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace vornwebapi {

/// Threads that run one io_context, module code included. Two more than there are processors serve as long as no call
/// waits: each further one that is ready to run makes the slowest answers slower. A watcher looks at the calls every
/// few milliseconds; for each that has been inside the module longer than that, it lets in one of the spare threads.
class Runners {
public:
  using Clock = std::chrono::steady_clock;

  /// @param[in] spare  how many calls may wait inside the module at once
  Runners(boost::asio::io_context &context, size_t spare);
  Runners(const Runners &) = delete;
  Runners &operator=(const Runners &) = delete;
  ~Runners(); ///< REQUIRES: JoinAll returned true, or Start was not called

  void Start();
  /// Lets the threads end when there is nothing left to do, and waits for that.
  /// @return false when some still run at the deadline: they are left to themselves
  bool JoinAll(Clock::time_point deadline);

  /// Lives as long as its thread is inside the module.
  class Inside {
  public:
    explicit Inside(Runners &runners);
    Inside(const Inside &) = delete;
    Inside &operator=(const Inside &) = delete;
    ~Inside();
  };

private:
  /// When its thread went into the module, as a number of the watcher's looks; 0: it is not inside.
  struct alignas(64) Record {
    std::atomic<std::uint64_t> since{0};
  };

  void RunBase(Record &record);
  void RunSpare(Record &record, size_t number);
  void RunContext(bool forAWhile);
  void Watch();
  size_t Stuck() const;
  bool AnyInside() const;

  boost::asio::io_context &context_;
  const size_t base_;
  const size_t spare_;
  std::vector<Record> records_; // one a thread
  std::optional<boost::asio::executor_work_guard<boost::asio::io_context::executor_type>> work_;
  std::vector<std::thread> threads_;
  std::atomic<std::uint64_t> looks_{1};
  std::atomic<bool> watching_{false};
  std::atomic<size_t> letIn_{0}; // spare threads that may run
  std::mutex mutex_;             // guards what follows, and is held when letIn_ or watching_ grows
  std::condition_variable changed_;
  size_t running_ = 0; // threads that have not ended, the watcher among them
  bool ending_ = false;
};

} // namespace vornwebapi

#endif
