#include "webapi/task_state.h"

#include <utility>

namespace vornwebapi {

void TaskState::Success(const Json::Value &data) {
  auto copy = std::make_shared<const Json::Value>(data);
  const std::lock_guard lock(mutex_);
  data_.swap(copy);
  error_.reset();
}

void TaskState::Error(int code, const Json::Value &data) {
  Json::Value error(Json::objectValue);
  error["code"] = code;
  error["data"] = data;
  const std::lock_guard lock(mutex_);
  error_ = std::make_shared<const Json::Value>(std::move(error));
}

void TaskState::Callback(void (*function)(void *), void *data) {
  const std::lock_guard lock(mutex_);
  callbacks_.Add(function, data);
}

void TaskState::RunCallbacks() {
  Callbacks callbacks;
  {
    const std::lock_guard lock(mutex_);
    std::swap(callbacks, callbacks_);
  }
  callbacks.Run();
}

void TaskState::MarkFinished() {
  const std::lock_guard lock(mutex_);
  finished_ = true;
}

bool TaskState::Finished() const {
  const std::lock_guard lock(mutex_);
  return finished_;
}

Json::Value TaskState::Read() const {
  std::shared_ptr<const Json::Value> data;
  std::shared_ptr<const Json::Value> error;
  bool finished = false;
  {
    const std::lock_guard lock(mutex_);
    data = data_;
    error = error_;
    finished = finished_;
  }
  Json::Value out(Json::objectValue);
  if (data != nullptr && data->isObject()) {
    out = *data;
  } else if (data != nullptr && !data->isNull()) {
    out["data"] = *data;
  }
  if (error != nullptr) {
    out["error"] = *error;
  }
  out["finish"] = finished;
  return out;
}

} // namespace vornwebapi
