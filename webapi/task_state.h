// One poll task's response: what the task's thread sets and requests read.
#ifndef WEBAPI_TASK_STATE_H
#define WEBAPI_TASK_STATE_H

#include "webapi/callbacks.h"
#include "webapi/request_state.h"

#include <memory>
#include <mutex>

namespace vornwebapi {

class TaskState final : public VORN::APIResponse::State {
public:
  TaskState() = default;
  TaskState(const TaskState &) = delete;
  TaskState &operator=(const TaskState &) = delete;
  ~TaskState() override = default;

  void Success(const Json::Value &data) override;
  /// Kept beside the data, as the member "error".
  void Error(int code, const Json::Value &data) override;
  void Callback(void (*function)(void *), void *data) override;

  void RunCallbacks(); ///< when the function has returned
  void MarkFinished();
  bool Finished() const;
  /// The data last set, always an object, with "finish".
  Json::Value Read() const;

private:
  mutable std::mutex mutex_;
  std::shared_ptr<const Json::Value> data_; // replaced whole, so that a copy is made outside the lock
  std::shared_ptr<const Json::Value> error_;
  Callbacks callbacks_;
  bool finished_ = false;
};

} // namespace vornwebapi

#endif
