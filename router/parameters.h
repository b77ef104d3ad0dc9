// Reading a request's parameters. JsonCpp throws on a conversion that a value's type does not allow, so a parameter's
// type is looked at before it is converted, here and nowhere else.
#ifndef ROUTER_PARAMETERS_H
#define ROUTER_PARAMETERS_H

#include "platform/webapi.h"

#include <optional>
#include <string>

namespace router {

/// The error codes of the API.
enum ErrorCode {
  kErrorFailed = 4300,    ///< the operation, or a platform call, failed
  kErrorParameter = 4302, ///< a required parameter is missing or not what it should be
  kErrorSwitching = 4340  ///< a topology switch is under way
};

/// @return the value's text, untouched; nothing when it is no text
std::optional<std::string> TextOf(const Json::Value &value);

/// @return the parameter's text, untouched; nothing when the request lacks it or its value is no text
std::optional<std::string> TextParameter(const VORN::APIRequest &request, const std::string &name);

} // namespace router

#endif
