// Decides whether a text is JSON that may be given to the parser.
#ifndef WEBAPI_JSON_SCANNER_H
#define WEBAPI_JSON_SCANNER_H

#include <cstddef>
#include <string_view>

namespace vornwebapi {

enum class JsonFault { kNone, kSyntax, kTooDeep, kTooManyValues, kNoUtf8 };

struct JsonLimits {
  size_t depth = 64; ///< at most 64
  size_t values = 50000;
};

/// Checks a whole document against RFC 8259, exactly: one value, no byte order mark, no comments, no NaN, numbers and
/// escapes as the grammar has them (surrogates in pairs), strings in well-formed UTF-8 (RFC 3629). Takes constant
/// memory and linear time whatever the text is, so that the parser behind it meets neither deep nesting nor doubtful
/// syntax.
JsonFault ScanJson(std::string_view text, const JsonLimits &limits);

} // namespace vornwebapi

#endif
