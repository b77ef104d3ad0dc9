// Trees of any shape and content: the same bytes as JsonCpp's own writer.
#include "tests/fuzz/json_tree.h"
#include "webapi/json_writer.h"

#include <json/writer.h>

#include <cstdint>
#include <cstdlib>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  FuzzedDataProvider input(data, size);
  const Json::Value tree = vornfuzz::MakeTree(input, 12);
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
