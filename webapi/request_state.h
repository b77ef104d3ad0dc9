// The framework's own records behind the contract's classes. Modules never include this.
#ifndef WEBAPI_REQUEST_STATE_H
#define WEBAPI_REQUEST_STATE_H

#include "webapi/export.h" // first: it marks the classes

#include "platform/webapi.h"

#include <string>

namespace vornwebapi {
class TaskRegistry;
}

namespace VORN {

struct APIRequest::State {
  Json::Value parameters{Json::objectValue};
  std::string user;
  std::string language = "enu";
  bool secure = false;
  int serverPort = 0;
  /// Of a call, gone when its task runs: whether it only asked for a task's status.
  bool *polled = nullptr;
  vornwebapi::TaskRegistry *tasks = nullptr; ///< outlives the request

  static const State &Of(const APIRequest &request) { return *request.state_; }
};

/// Where the answers of one response go: into the text of an HTTP answer, or into the state of a poll task.
struct VORN_WEBAPI_EXPORT APIResponse::State {
  State() = default;
  State(const State &) = delete;
  State &operator=(const State &) = delete;
  virtual ~State();

  virtual void Success(const Json::Value &data) = 0;
  virtual void Error(int code, const Json::Value &data) = 0;
  virtual void Callback(void (*function)(void *), void *data) = 0;
};

} // namespace VORN

#endif
