// Trees of any shape and content: the same bytes as JsonCpp's own writer.
#include "webapi/json_writer.h"

#include <fuzzer/FuzzedDataProvider.h>
#include <json/writer.h>

#include <cstdint>
#include <cstdlib>

namespace {

std::string Text(FuzzedDataProvider &input) {
  return input.ConsumeRandomLengthString(40);
}

Json::Value Tree(FuzzedDataProvider &input, int depth) {
  switch (input.ConsumeIntegralInRange(0, depth > 0 ? 7 : 5)) {
  case 0:
    return Json::Value();
  case 1:
    return input.ConsumeBool();
  case 2:
    return Json::Value(Json::Int64{input.ConsumeIntegral<std::int64_t>()});
  case 3:
    return Json::Value(Json::UInt64{input.ConsumeIntegral<std::uint64_t>()});
  case 4:
    return input.ConsumeFloatingPoint<double>();
  case 5:
    return Text(input);
  case 6: {
    Json::Value array(Json::arrayValue);
    while (input.remaining_bytes() > 0 && input.ConsumeBool()) {
      array.append(Tree(input, depth - 1));
    }
    return array;
  }
  default: {
    Json::Value object(Json::objectValue);
    while (input.remaining_bytes() > 0 && input.ConsumeBool()) {
      const std::string key = Text(input);
      object[key] = Tree(input, depth - 1);
    }
    return object;
  }
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  FuzzedDataProvider input(data, size);
  const Json::Value tree = Tree(input, 12);
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["commentStyle"] = "None";
  std::string own;
  vornwebapi::WriteJson(tree, own);
  if (own != Json::writeString(builder, tree)) {
    std::abort();
  }
  return 0;
}
