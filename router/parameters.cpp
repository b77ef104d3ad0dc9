#include "router/parameters.h"

namespace router {

std::optional<std::string> TextOf(const Json::Value &value) {
  if (!value.isString()) {
    return std::nullopt;
  }
  return value.asString();
}

std::optional<std::string> TextParameter(const VORN::APIRequest &request, const std::string &name) {
  if (!request.HasParam(name)) {
    return std::nullopt;
  }
  return TextOf(request.GetParam(name, Json::Value()));
}

} // namespace router
