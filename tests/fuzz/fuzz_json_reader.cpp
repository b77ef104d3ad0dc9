// A body's bytes: whatever they are, they are refused or read, and what was read can be written and read again.
#include "webapi/json_writer.h"
#include "webapi/parameters.h"

#include <cstdint>
#include <cstdlib>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  const std::string body(reinterpret_cast<const char *>(data), size);
  const vornwebapi::JsonLimits limits;
  Json::Value parameters;
  if (vornwebapi::ReadParameters(body, limits, parameters) != nullptr) {
    return 0;
  }
  std::string text;
  vornwebapi::WriteJson(parameters, text);
  Json::Value again;
  if (!parameters.isObject() || vornwebapi::ReadParameters(text, limits, again) != nullptr || again != parameters) {
    std::abort();
  }
  return 0;
}
