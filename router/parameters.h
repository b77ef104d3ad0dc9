// Reading a request's parameters. JsonCpp throws on a conversion that a value's type does not allow, so a parameter's
// type is looked at before it is converted, here and nowhere else.
#ifndef ROUTER_PARAMETERS_H
#define ROUTER_PARAMETERS_H

#include "platform/webapi.h"

#include <optional>
#include <string>
#include <string_view>

namespace router {

/// The error codes of the API.
enum ErrorCode {
  kErrorFailed = 4300,    ///< the operation, or a platform call, failed
  kErrorParameter = 4302, ///< a required parameter is missing or not what it should be
  kErrorSwitching = 4340  ///< a topology switch is under way
};

/// @return the value's text, untouched; nothing when it is no text
std::optional<std::string> TextOf(const Json::Value &value);

/// The same without a copy: what the value holds, as long as it holds it.
std::optional<std::string_view> ViewOf(const Json::Value &value);

/// @return whether a C function would read the text to its end: a NUL in it would cut it
bool IsWhole(const std::string &text);

/// For a text that goes into a C function.
/// @return the value's text; nothing when it is no text, or holds a NUL, at which it would be cut
std::optional<std::string> WholeTextOf(const Json::Value &value);

/// JsonCpp's conversion to a text: numbers, booleans and null have one too.
/// @return nothing for an array or an object
std::optional<std::string> ConvertToText(const Json::Value &value);

/// JsonCpp's conversion to a truth value: numbers and null have one too.
/// @return nothing for a text, an array or an object
std::optional<bool> ConvertToBool(const Json::Value &value);

/// @return the member of that name; null when there is none or the value is no object
const Json::Value &MemberOf(const Json::Value &value, const char *name);

/// @return the member of that name, converted to a text; empty when there is none or it has no text
std::string MemberText(const Json::Value &value, const char *name);

/// @return the text of a request's parameter; nothing when it has none of that name or that is no text
std::optional<std::string> TextParameter(const VORN::APIRequest &request, const char *name);

/// @return whether the value is an array of texts that a C function would read to their end, no two of them the same
bool IsTextSet(const Json::Value &value);

/// Reads JSON that came inside a text. Arrays and objects may be nested 64 deep, as in a request's body: the reader
/// recurses and takes no limit that would fit a small stack.
/// @param[out] value   what the text says
/// @param[out] errors  what the reader says is wrong with it, at most 1 KiB of it
/// @return false when the text is no JSON
bool ParseJson(const std::string &text, Json::Value &value, std::string &errors);

/// The same for a parameter that holds an array as text; a number, boolean or null is taken for its text.
/// @return false when the value has no text, or the text is no JSON; any JSON value makes it true
bool ParseJsonText(const Json::Value &parameter, Json::Value &value, std::string &errors);

} // namespace router

#endif
