#include "webapi/request_state.h"
#include "webapi/task_registry.h"

#include <algorithm>

namespace VORN {
namespace {

const APIRequest::State *Caller(const APIRequest *request) {
  return request == nullptr ? nullptr : &APIRequest::State::Of(*request);
}

bool IsArrayOfTexts(const Json::Value &groups) {
  return groups.isArray() &&
         std::all_of(groups.begin(), groups.end(), [](const Json::Value &group) { return group.isString(); });
}

} // namespace

void APIPolling::Start(APIResponse *response, void (*task)(APIRequest *, APIResponse *, void *), void *context) {
  const APIRequest::State *caller = Caller(request_);
  std::string id;
  error_ = vornwebapi::kTaskBadArgument;
  if (caller != nullptr && caller->tasks != nullptr) {
    error_ = caller->tasks->Start({caller->user, group_, prefix_, remove_}, *caller, task, context, id);
  }
  if (error_ != 0) {
    response->SetError(error_, Json::Value());
    return;
  }
  Json::Value started(Json::objectValue);
  started["id"] = id;
  started["finish"] = false;
  response->SetSuccess(started);
}

bool APIPolling::List(const std::string &prefix, const Json::Value &groups, Json::Value &out) {
  const APIRequest::State *caller = Caller(request_);
  if (caller == nullptr || caller->tasks == nullptr || !IsArrayOfTexts(groups)) {
    error_ = vornwebapi::kTaskBadArgument;
    return false;
  }
  out = Json::Value(Json::objectValue);
  for (const Json::Value &group : groups) {
    Json::Value ids(Json::arrayValue);
    for (const std::string &id : caller->tasks->List(caller->user, group.asString(), prefix)) {
      ids.append(id);
    }
    out[group.asString()] = std::move(ids);
  }
  return true;
}

bool APIPolling::Status(const std::string &id, Json::Value &data) {
  const APIRequest::State *caller = Caller(request_);
  if (caller == nullptr || caller->tasks == nullptr) {
    error_ = vornwebapi::kTaskBadArgument;
    return false;
  }
  if (caller->polled != nullptr) {
    *caller->polled = true;
  }
  const int failed = caller->tasks->Status(caller->user, id, data);
  error_ = failed != 0 ? failed : error_;
  return failed == 0;
}

bool APIPolling::Stop(const std::string &id, bool force) {
  const APIRequest::State *caller = Caller(request_);
  if (caller == nullptr || caller->tasks == nullptr) {
    error_ = vornwebapi::kTaskBadArgument;
    return false;
  }
  const int failed = caller->tasks->Stop(caller->user, id, force);
  error_ = failed != 0 ? failed : error_;
  return failed == 0;
}

} // namespace VORN
