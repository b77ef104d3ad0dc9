// The framework's poll tasks: who runs what, and what came of it.
#ifndef WEBAPI_TASK_REGISTRY_H
#define WEBAPI_TASK_REGISTRY_H

#include "webapi/export.h"

#include "platform/webapi.h"

#include <chrono>
#include <memory>
#include <string>
#include <vector>

namespace vornwebapi {

/// Error codes of poll tasks, as a handle's GetError gives them and Start answers them (webapi/README.md).
enum TaskError {
  kTaskBadArgument = 110,   ///< no request, groups that are no array of texts
  kTaskUnknown = 111,       ///< this user has no such task
  kTaskStillRuns = 112,     ///< stopping it needs force
  kTaskKindRuns = 113,      ///< this user runs a task of this kind already
  kTaskTooMany = 115,       ///< as many tasks run as may
  kTaskCannotStart = 116,   ///< the system gives no thread
  kTaskServerStopping = 118 ///< the server is about to end
};

/// Every member may be called from any thread at any time.
class VORN_WEBAPI_EXPORT TaskRegistry {
public:
  using Clock = std::chrono::steady_clock;
  using Function = void (*)(VORN::APIRequest *, VORN::APIResponse *, void *);

  struct Limits {
    size_t tasks = 8;                        ///< running and kept ones together
    std::chrono::milliseconds keep{300'000}; ///< a finished task that nobody asks for is dropped after this
  };

  struct Kind {
    std::string user;
    std::string group;
    std::string prefix;
    bool remove = true; ///< dropped as soon as it ends
  };

  explicit TaskRegistry(const Limits &limits);
  TaskRegistry(const TaskRegistry &) = delete;
  TaskRegistry &operator=(const TaskRegistry &) = delete;
  ~TaskRegistry(); ///< leaves what still runs to itself

  /// Starts a task on a thread of its own. A finished task of the same user and kind gives way to it, and when there
  /// are as many as may be, the finished one that was asked for longest ago.
  /// @param[in]  request  copied
  /// @param[out] id       "<prefix>_" and 32 hexadecimal digits that cannot be guessed
  /// @return 0 or a TaskError
  int Start(const Kind &kind, const VORN::APIRequest::State &request, Function function, void *context,
            std::string &id);

  /// @return ids of the user's tasks of that kind in that group, oldest first
  std::vector<std::string> List(const std::string &user, const std::string &group, const std::string &prefix);

  /// @return 0 or a TaskError
  int Status(const std::string &user, const std::string &id, Json::Value &data);
  int Stop(const std::string &user, const std::string &id, bool force);

  /// Those that run, stopped ones too, and those that are kept.
  size_t Count();

  /// Drops finished tasks whose time is over.
  void Purge();

  /// Refuses new tasks from now on and waits for those that run.
  /// @return how many still run at the deadline
  size_t Shutdown(Clock::time_point deadline);

private:
  struct Inner;
  std::shared_ptr<Inner> inner_; // shared with the threads, which may outlive the registry
};

} // namespace vornwebapi

#endif
