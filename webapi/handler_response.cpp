#include "webapi/handler_response.h"

#include "webapi/json_writer.h"

namespace vornwebapi {

HandlerResponse::~HandlerResponse() = default;

void HandlerResponse::Success(const Json::Value &data) {
  text_ = R"({"success":true,"data":)";
  WriteJson(data, text_);
  text_ += '}';
}

void HandlerResponse::Error(int code, const Json::Value &data) {
  text_ = R"({"success":false,"error":{"code":)" + std::to_string(code) + R"(,"data":)";
  WriteJson(data, text_);
  text_ += "}}";
}

} // namespace vornwebapi
