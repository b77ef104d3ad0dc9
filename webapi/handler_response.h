// The response that a handler answers: it becomes the body of an HTTP answer.
#ifndef WEBAPI_HANDLER_RESPONSE_H
#define WEBAPI_HANDLER_RESPONSE_H

#include "webapi/callbacks.h"
#include "webapi/request_state.h"

#include <string>
#include <utility>

namespace vornwebapi {

/// Turns each answer into text at once, which spares the copy of the tree.
class VORN_WEBAPI_EXPORT HandlerResponse final : public VORN::APIResponse::State {
public:
  HandlerResponse() = default;
  HandlerResponse(const HandlerResponse &) = delete;
  HandlerResponse &operator=(const HandlerResponse &) = delete;
  ~HandlerResponse() override;

  void Success(const Json::Value &data) override;
  void Error(int code, const Json::Value &data) override;
  void Callback(void (*function)(void *), void *data) override { callbacks_.Add(function, data); }

  bool IsAnswered() const { return !text_.empty(); }
  /// The body of the last answer, which takes the place of those before it; empty when there was none.
  std::string TakeText() { return std::move(text_); }
  Callbacks TakeCallbacks() { return std::move(callbacks_); }

private:
  std::string text_;
  Callbacks callbacks_;
};

} // namespace vornwebapi

#endif
