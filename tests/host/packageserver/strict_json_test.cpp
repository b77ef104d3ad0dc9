#include "host/packageserver/strict_json.h"

#include <gtest/gtest.h>

#include <memory>

namespace {

using vornhost::ParseStrictJson;

// The text is in memory of exactly its size, so that a read past its end is seen by the address sanitizer.
bool Takes(const std::string &text, Json::Value *out = nullptr) {
  Json::Value value = "untouched";
  const bool taken = ParseStrictJson(text, value);
  if (!taken) {
    EXPECT_EQ(value, Json::Value("untouched")) << text.substr(0, 60);
  }
  if (out != nullptr) {
    *out = value;
  }
  return taken;
}

std::string Nested(int depth, const std::string &open, const std::string &close) {
  std::string text;
  for (int level = 0; level < depth; ++level) {
    text += open;
  }
  text += "1";
  for (int level = 0; level < depth; ++level) {
    text += close;
  }
  return text;
}

TEST(StrictJson, ReadsEveryKindOfValue) {
  Json::Value value;
  ASSERT_TRUE(Takes(" {\"a\": [1, -2.5e+3, 0, -0.1, true, false, null, \"\\u00e4\\\"\\\\/ [{\"]}\r\n", &value));
  EXPECT_EQ(value["a"].size(), 8U);
  EXPECT_EQ(value["a"][1].asDouble(), -2500.0);
  EXPECT_EQ(value["a"][7].asString(), "\xc3\xa4\"\\/ [{");
  for (const char *text :
       {"[]", "{}", "null", "7", "-0", "1E5", "\"x\"", "\"// no comment /* */\"", "\"\xf0\x9f\x98\x80\""}) {
    EXPECT_TRUE(Takes(text)) << text;
  }
}

TEST(StrictJson, RefusesWhatIsNoDocument) {
  for (const char *text : {"",
                           " ",
                           "[",
                           "]",
                           "[1",
                           "{\"a\"",
                           "{\"a\":}",
                           "[1,]",
                           "[,1]",
                           "{\"a\":1,}",
                           "{a:1}",
                           "{'a':1}",
                           "[1] [2]",
                           "{}x",
                           "nul",
                           "NaN",
                           "Infinity",
                           "-Infinity",
                           "01",
                           "-01",
                           "1.",
                           ".5",
                           "+1",
                           "-",
                           "1e",
                           "1e+",
                           "0x10",
                           "1e999",
                           "\"open",
                           "\"a\nb\"",
                           "\"\\x\"",
                           "\"\\u12\"",
                           "[1}",
                           "{]",
                           "{\"a\":1,\"a\":2}",
                           "<html></html>",
                           "\xef\xbb\xbf{}"}) {
    EXPECT_FALSE(Takes(text)) << text;
  }
}

TEST(StrictJson, RefusesComments) {
  for (const char *text :
       {"// x\n[]", "[] // x", "[/* x */]", "[1 /* x */, 2]", "{/**/\"a\":1}", "[1,2/*x*/]", "/", "[]/"}) {
    EXPECT_FALSE(Takes(text)) << text;
  }
}

TEST(StrictJson, RefusesBytesThatAreNotUtf8) {
  for (const char *text : {"\"\xff\"", "\"\xc3\"", "\"\xc0\xaf\"", "\"\xe0\x80\xaf\"", "\"\xed\xa0\x80\"",
                           "\"\xf4\x90\x80\x80\"", "\"\xf0\x80\x80\x80\"", "\"\x80\"", "\"\xe2\x82", "[\xc3\xa4]"}) {
    EXPECT_FALSE(Takes(text)) << text;
  }
  EXPECT_FALSE(Takes(std::string("[1]\0", 4)));
  EXPECT_FALSE(Takes(std::string("\"a\0b\"", 5)));
}

TEST(StrictJson, TakesADepthOf64AndNotOf65) {
  EXPECT_TRUE(Takes(Nested(64, "[", "]")));
  EXPECT_TRUE(Takes(Nested(64, "{\"a\":", "}")));
  for (const int depth : {65, 1001, 100000}) {
    EXPECT_FALSE(Takes(Nested(depth, "[", "]")));
    EXPECT_FALSE(Takes(Nested(depth, "{\"a\":", "}")));
    EXPECT_FALSE(Takes(Nested(depth / 2 + 1, "[{\"a\":", "}]")));
  }
  EXPECT_TRUE(Takes("[[[]],[[]],[[]]]"));
}

TEST(StrictJson, AWrongDocumentThatEndsInACarriageReturn) {
  for (const char *text : {"{\"a\":\r", "[1,\r", "\r", "x\r"}) {
    EXPECT_FALSE(Takes(text));
  }
}

} // namespace
