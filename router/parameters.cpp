#include "router/parameters.h"

#include <json/reader.h>

#include <algorithm>
#include <set>

namespace router {

namespace {

constexpr int kDepthLimit = 64;
constexpr size_t kErrorLimit = 1024;

// The last character of a comment or a string that begins at `at`; `at` itself for anything else. As Json::Reader finds
// it, so that brackets are counted exactly where it sees them.
size_t SkipOpaque(const std::string &text, size_t at) {
  const auto last = [&text](size_t found) { return std::min(found, text.size() - 1); };
  if (text[at] == '"') {
    for (++at; at < text.size() && text[at] != '"'; ++at) {
      at += text[at] == '\\' ? 1 : 0;
    }
    return last(at);
  }
  if (text.compare(at, 2, "//") == 0) {
    return last(text.find_first_of("\r\n", at));
  }
  if (text.compare(at, 2, "/*") == 0) {
    const size_t end = text.find("*/", at + 2);
    return last(end == std::string::npos ? end : end + 1);
  }
  return at;
}

bool IsTooDeep(const std::string &text) {
  int depth = 0;
  for (size_t at = 0; at < text.size(); ++at) {
    at = SkipOpaque(text, at);
    if (text[at] == '[' || text[at] == '{') {
      if (++depth > kDepthLimit) {
        return true;
      }
    } else if (text[at] == ']' || text[at] == '}') {
      depth = std::max(depth - 1, 0);
    }
  }
  return false;
}

} // namespace

std::optional<std::string> TextOf(const Json::Value &value) {
  if (!value.isString()) {
    return std::nullopt;
  }
  return value.asString();
}

std::optional<std::string_view> ViewOf(const Json::Value &value) {
  const char *begin = nullptr;
  const char *end = nullptr;
  if (!value.getString(&begin, &end)) {
    return std::nullopt;
  }
  return std::string_view(begin, static_cast<size_t>(end - begin));
}

bool IsWhole(const std::string &text) {
  return text.find('\0') == std::string::npos;
}

std::optional<std::string> WholeTextOf(const Json::Value &value) {
  auto text = TextOf(value);
  return text && IsWhole(*text) ? text : std::nullopt;
}

std::optional<std::string> ConvertToText(const Json::Value &value) {
  if (value.isArray() || value.isObject()) {
    return std::nullopt;
  }
  return value.asString();
}

std::optional<bool> ConvertToBool(const Json::Value &value) {
  if (value.isString() || value.isArray() || value.isObject()) {
    return std::nullopt;
  }
  return value.asBool();
}

const Json::Value &MemberOf(const Json::Value &value, const char *name) {
  return value.isObject() ? value[name] : Json::Value::nullSingleton();
}

std::string MemberText(const Json::Value &value, const char *name) {
  return ConvertToText(MemberOf(value, name)).value_or("");
}

std::optional<std::string> TextParameter(const VORN::APIRequest &request, const char *name) {
  return request.HasParam(name) ? TextOf(request.GetParam(name, Json::Value())) : std::nullopt;
}

bool ParseJson(const std::string &text, Json::Value &value, std::string &errors) {
  if (!IsWhole(text)) { // the reader takes it for the end
    errors = "a NUL in the text";
    return false;
  }
  if (IsTooDeep(text)) {
    errors = "nested too deeply";
    return false;
  }
  Json::Reader reader;
  if (!reader.parse(text, value, false)) {
    errors = reader.getFormattedErrorMessages().substr(0, kErrorLimit);
    return false;
  }
  return true;
}

bool ParseJsonText(const Json::Value &parameter, Json::Value &value, std::string &errors) {
  const auto text = ConvertToText(parameter);
  if (!text) {
    errors = "no text";
    return false;
  }
  return ParseJson(*text, value, errors);
}

bool IsTextSet(const Json::Value &value) {
  std::set<std::string> known;
  const auto isNewText = [&known](const Json::Value &element) {
    const auto text = WholeTextOf(element);
    return text && known.insert(*text).second;
  };
  return value.isArray() && std::all_of(value.begin(), value.end(), isNewText);
}

} // namespace router
