// JSON trees of any shape, made of a fuzz input.
#ifndef TESTS_FUZZ_JSON_TREE_H
#define TESTS_FUZZ_JSON_TREE_H

#include <fuzzer/FuzzedDataProvider.h>
#include <json/value.h>

#include <cstdint>
#include <string>
#include <vector>

namespace vornfuzz {

/// Texts that mean something to what is fuzzed: mutation alone would not find them.
struct Vocabulary {
  std::vector<std::string> keys;
  std::vector<std::string> texts;
};

/// One of the words, or any text.
inline std::string MakeText(FuzzedDataProvider &input, const std::vector<std::string> &words = {}) {
  if (!words.empty() && input.ConsumeBool()) {
    return words[input.ConsumeIntegralInRange<size_t>(0, words.size() - 1)];
  }
  return input.ConsumeRandomLengthString(40);
}

inline Json::Value MakeTree(FuzzedDataProvider &input, int depth, const Vocabulary &words = {}) {
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
    return MakeText(input, words.texts);
  case 6: {
    Json::Value array(Json::arrayValue);
    while (input.remaining_bytes() > 0 && input.ConsumeBool()) {
      array.append(MakeTree(input, depth - 1, words));
    }
    return array;
  }
  default: {
    Json::Value object(Json::objectValue);
    while (input.remaining_bytes() > 0 && input.ConsumeBool()) {
      const std::string key = MakeText(input, words.keys);
      object[key] = MakeTree(input, depth - 1, words);
    }
    return object;
  }
  }
}

} // namespace vornfuzz

#endif
