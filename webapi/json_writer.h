// JSON text of a tree, compact.
#ifndef WEBAPI_JSON_WRITER_H
#define WEBAPI_JSON_WRITER_H

#include "webapi/export.h"

#include <json/value.h>

#include <string>

namespace vornwebapi {

/// Appends `value` to `out`: the same bytes as JsonCpp's StreamWriterBuilder with no indentation and without comments,
/// in about a third of its time. The text is ASCII whatever the strings hold: other characters are \uXXXX, a byte
/// sequence that is no UTF-8 becomes U+FFFD, a number that is not finite null or 1e+9999.
VORN_WEBAPI_EXPORT void WriteJson(const Json::Value &value, std::string &out);

} // namespace vornwebapi

#endif
