// The own writer against JsonCpp's: the same bytes.
#include "webapi/json_writer.h"

#include <gtest/gtest.h>
#include <json/writer.h>

#include <array>
#include <cmath>
#include <cstring>
#include <limits>
#include <random>

namespace {

std::string Own(const Json::Value &value) {
  std::string out;
  vornwebapi::WriteJson(value, out);
  return out;
}

std::string Reference(const Json::Value &value) {
  static const Json::StreamWriterBuilder kBuilder = [] {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["commentStyle"] = "None";
    return builder;
  }();
  return Json::writeString(kBuilder, value);
}

class RandomJson {
public:
  explicit RandomJson(unsigned seed) : random_(seed) {}

  Json::Value Value(int depth) {
    switch (Below(depth > 0 ? 9 : 7)) {
    case 0:
      return Json::Value();
    case 1:
      return Below(2) == 0;
    case 2:
      return static_cast<Json::Int64>(random_() >> Below(64));
    case 3:
      return static_cast<Json::UInt64>(random_() >> Below(64));
    case 4:
      return Double();
    case 5:
    case 6:
      return Text();
    case 7:
      return Array(depth - 1);
    default:
      return Object(depth - 1);
    }
  }

private:
  std::uint64_t Below(std::uint64_t end) { return random_() % end; }

  double Double() {
    const std::uint64_t bits = random_();
    double number = 0;
    std::memcpy(&number, &bits, sizeof number); // NaN and infinities among them
    switch (Below(4)) {
    case 0:
      return number;
    case 1:
      return static_cast<double>(Below(1'000'000)) / 100;
    case 2:
      return static_cast<double>(static_cast<std::int64_t>(bits));
    default:
      return std::ldexp(1.0, static_cast<int>(Below(2'000)) - 1'000);
    }
  }

  std::string Text() {
    std::string text;
    for (std::uint64_t left = Below(20); left > 0; --left) {
      switch (Below(4)) {
      case 0:
        text += static_cast<char>(Below(256));
        break;
      case 1:
        text += static_cast<char>(Below(32));
        break;
      case 2:
        text += std::array{"ä", "€", "\U0001F600", "\"", "\\", "/", "\x7f"}[Below(7)];
        break;
      default:
        text += static_cast<char>(' ' + Below(95));
      }
    }
    return text;
  }

  Json::Value Array(int depth) {
    Json::Value array(Json::arrayValue);
    for (std::uint64_t left = Below(6); left > 0; --left) {
      array.append(Value(depth));
    }
    return array;
  }

  Json::Value Object(int depth) {
    Json::Value object(Json::objectValue);
    for (std::uint64_t left = Below(6); left > 0; --left) {
      object[Text()] = Value(depth);
    }
    return object;
  }

  std::mt19937_64 random_;
};

TEST(JsonWriter, WritesTheSameBytesForRandomTrees) {
  for (unsigned seed = 0; seed < 30'000; ++seed) {
    const Json::Value value = RandomJson(seed).Value(4);
    ASSERT_EQ(Own(value), Reference(value)) << "seed " << seed;
  }
}

TEST(JsonWriter, WritesTheSameBytesForEveryPairOfBytes) {
  for (int first = 0; first < 256; ++first) {
    for (int second = 0; second < 256; ++second) {
      const std::string text = {static_cast<char>(first), static_cast<char>(second)};
      ASSERT_EQ(Own(text), Reference(text)) << first << " " << second;
      ASSERT_EQ(Own(text + "\x80\x80"), Reference(text + "\x80\x80")) << first << " " << second;
    }
  }
}

TEST(JsonWriter, WritesTheSameBytesAtTheLimits) {
  const std::vector<Json::Value> values = {Json::Value(Json::Int64{std::numeric_limits<Json::Int64>::min()}),
                                           Json::Value(Json::Int64{std::numeric_limits<Json::Int64>::max()}),
                                           Json::Value(Json::UInt64{std::numeric_limits<Json::UInt64>::max()}),
                                           0.0,
                                           -0.0,
                                           0.1,
                                           1e15,
                                           1e16,
                                           1e17,
                                           123456789012345678.0,
                                           1e-5,
                                           5e-324,
                                           std::numeric_limits<double>::max(),
                                           std::numeric_limits<double>::infinity(),
                                           -std::numeric_limits<double>::infinity(),
                                           std::nan(""),
                                           Json::Value(Json::arrayValue),
                                           Json::Value(Json::objectValue),
                                           Json::Value("")};
  for (const Json::Value &value : values) {
    EXPECT_EQ(Own(value), Reference(value));
  }
}

TEST(JsonWriter, ElementsThatWereNeverSetAreNull) {
  Json::Value gaps(Json::arrayValue);
  gaps[2] = "third";
  EXPECT_EQ(Own(gaps), R"([null,null,"third"])");
  gaps[5] = Json::Value(Json::arrayValue);
  EXPECT_EQ(Own(gaps), Reference(gaps));
  gaps.resize(9);
  EXPECT_EQ(Own(gaps), Reference(gaps));
}

TEST(JsonWriter, AppendsAndStaysAscii) {
  std::string out = "x";
  Json::Value value;
  value["\xC3\xA4"] = std::string("\0\x1f\xff", 3);
  vornwebapi::WriteJson(value, out);
  EXPECT_EQ(out, "x{\"\\u00e4\":\"\\u0000\\u001f\\ufffd\"}");
}

} // namespace
