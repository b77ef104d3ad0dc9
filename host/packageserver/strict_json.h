// JSON from a foreign server: one document of RFC 8259, nothing else.
#ifndef HOST_PACKAGESERVER_STRICT_JSON_H
#define HOST_PACKAGESERVER_STRICT_JSON_H

#include <json/value.h>

#include <string>

namespace vornhost {

/// Arrays and objects inside one another, the outermost counted.
constexpr int kJsonDepthLimit = 64;

/// Reads a text that is exactly one JSON document. What JsonCpp takes beyond the standard, in its strict mode too
/// (comments, bytes that are not UTF-8), is refused, and so is a repeated member or a deeper nesting.
/// @param[out] value  the document; left as it was when there is none
bool ParseStrictJson(const std::string &text, Json::Value &value);

} // namespace vornhost

#endif
