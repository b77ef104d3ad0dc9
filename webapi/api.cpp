#include "webapi/request_state.h"

namespace VORN {

bool APIRequest::HasParam(const std::string &name) const {
  return state_->parameters.isMember(name);
}

Json::Value APIRequest::GetParam(const std::string &name, const Json::Value &fallback) const {
  if (name.empty()) {
    return state_->parameters;
  }
  const Json::Value *found = state_->parameters.find(name.data(), name.data() + name.size());
  return found == nullptr ? fallback : *found;
}

std::string APIRequest::GetUILanguage() const {
  return state_->language;
}

bool APIRequest::IsSecure() const {
  return state_->secure;
}

int APIRequest::GetServerPort() const {
  return state_->serverPort;
}

APIResponse::State::~State() = default;

void APIResponse::SetSuccess(const Json::Value &data) {
  state_->Success(data);
}

void APIResponse::SetError(int code, const Json::Value &data) {
  state_->Error(code, data);
}

void APIResponse::SetCallbackFunc(void (*function)(void *), void *data) {
  if (function != nullptr) {
    state_->Callback(function, data);
  }
}

} // namespace VORN
