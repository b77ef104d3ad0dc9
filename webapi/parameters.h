// Parameters of a call out of a request's body.
#ifndef WEBAPI_PARAMETERS_H
#define WEBAPI_PARAMETERS_H

#include "webapi/json_scanner.h"

#include <json/value.h>

#include <string>

namespace vornwebapi {

/// @param[in]  body        empty: no parameters
/// @param[out] parameters  an object; undefined when the body was refused
/// @return what is wrong with the body, a static text; null when it was taken
const char *ReadParameters(const std::string &body, const JsonLimits &limits, Json::Value &parameters);

} // namespace vornwebapi

#endif
