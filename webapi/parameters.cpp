#include "webapi/parameters.h"

#include <json/reader.h>

#include <exception>
#include <memory>

namespace vornwebapi {
namespace {

const char *Describe(JsonFault fault) {
  switch (fault) {
  case JsonFault::kTooDeep:
    return "body is nested too deeply";
  case JsonFault::kTooManyValues:
    return "body has too many values";
  case JsonFault::kNoUtf8:
    return "body is not UTF-8";
  default:
    return "body is not JSON";
  }
}

std::unique_ptr<Json::CharReader> MakeReader() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

} // namespace

const char *ReadParameters(const std::string &body, const JsonLimits &limits, Json::Value &parameters) {
  parameters = Json::Value(Json::objectValue);
  if (body.empty()) {
    return nullptr;
  }
  const JsonFault fault = ScanJson(body, limits);
  if (fault != JsonFault::kNone) {
    return Describe(fault);
  }
  if (body[body.find_first_not_of(" \t\r\n")] != '{') {
    return "body is not a JSON object";
  }
  thread_local const std::unique_ptr<Json::CharReader> reader = MakeReader();
  try {
    // JsonCpp 1.9.5 looks one byte past a document that ends in a carriage return: a std::string has a NUL there.
    // What the scanner took and the parser does not: a key twice in one object, a number beyond the range of a double.
    if (!reader->parse(body.c_str(), body.c_str() + body.size(), &parameters, nullptr)) {
      return "body has a key twice or a number out of range";
    }
  } catch (const std::exception &) {
    return Describe(JsonFault::kSyntax);
  }
  return nullptr;
}

} // namespace vornwebapi
