#include "webapi/json_scanner.h"
#include "webapi/parameters.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

using vornwebapi::JsonFault;
using vornwebapi::JsonLimits;
using vornwebapi::ReadParameters;
using vornwebapi::ScanJson;

namespace {

/// In a buffer of exactly its size, so that a look past its end is seen by the address sanitizer.
JsonFault Scan(const std::string &text, const JsonLimits &limits = {}) {
  const std::unique_ptr<char[]> exact(new char[text.size()]);
  text.copy(exact.get(), text.size());
  return ScanJson({exact.get(), text.size()}, limits);
}

TEST(JsonScanner, TakesEveryKindOfValue) {
  for (const char *text :
       {"null", "true", "false", "0", "-0", "10", "-1.5e+10", "0.0", "1E9", "\"\"", "[]", "{}", "[[]]", "[1,2]",
        " \t\r\n[ ] ", R"({"a":{"b":[1,"c",null]},"":0})", R"("\"\\\/\b\f\n\r\t\u00e4")", R"("\ud83d\uDE00")",
        "\"\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80\x7f\""}) {
    EXPECT_EQ(Scan(text), JsonFault::kNone) << text;
  }
}

TEST(JsonScanner, RefusesWhatTheGrammarDoesNotHave) {
  for (const char *text : {"",
                           " ",
                           "nul",
                           "nulll",
                           "tru",
                           "True",
                           "-",
                           "+1",
                           "01",
                           "1.",
                           ".1",
                           "1e",
                           "1e+",
                           "--1",
                           "0x1",
                           "NaN",
                           "\"",
                           "\"\\",
                           "[",
                           "]",
                           "[1",
                           "[1,",
                           "[,]",
                           "[1,]",
                           "{",
                           "}",
                           "{1:2}",
                           "{\"a",
                           "{\"a\"",
                           "{\"a\":",
                           "{\"a\":1,}",
                           "{\"a\":1]",
                           "[1}",
                           "{}{}",
                           "[] []",
                           "1 2",
                           "'a'",
                           "//",
                           "/**/1",
                           "[/]",
                           "\"\t\"",
                           "\"\\a\"",
                           "\"\\u\"",
                           "\"\\u123g\"",
                           "\"\\ud800\"",
                           "\"\\ud800x\"",
                           "\"\\ud800\\n\"",
                           "\"\\ud800\\u0041\"",
                           "\"\\udc00\"",
                           "\xEF\xBB\xBF{}"}) {
    EXPECT_EQ(Scan(text), JsonFault::kSyntax) << text;
  }
}

TEST(JsonScanner, RefusesTextsThatAreNotUtf8) {
  for (const char *bytes :
       {"\x80", "\xBF", "\xC0\x80", "\xC1\xBF", "\xC3", "\xC3(", "\xE0\x80\x80", "\xE2\x82", "\xED\xA0\x80", "\xEF\xBF",
        "\xF0\x80\x80\x80", "\xF0\x9F\x98", "\xF4\x90\x80\x80", "\xF5\x80\x80\x80", "\xFE", "\xFF"}) {
    EXPECT_EQ(Scan(std::string("\"") + bytes + "\""), JsonFault::kNoUtf8) << bytes;
    EXPECT_EQ(Scan(std::string("\"") + bytes), JsonFault::kNoUtf8) << bytes;
  }
}

TEST(JsonScanner, CountsNestingButNotBracketsInTexts) {
  const std::string open(64, '[');
  const std::string close(64, ']');
  EXPECT_EQ(Scan(open + close), JsonFault::kNone);
  EXPECT_EQ(Scan(open + "\"[[{{\"" + close), JsonFault::kNone);
  EXPECT_EQ(Scan(open + "[]" + close), JsonFault::kTooDeep);
  EXPECT_EQ(Scan(open + "{}" + close), JsonFault::kTooDeep);
  EXPECT_EQ(Scan(open + "[],[],[]"), JsonFault::kTooDeep);
  EXPECT_EQ(Scan("[[],[],[]]", {.depth = 2}), JsonFault::kNone);
  EXPECT_EQ(Scan("[[],[[]]]", {.depth = 2}), JsonFault::kTooDeep);
  EXPECT_EQ(Scan(std::string(1'000'000, '['), {.depth = 1'000'000}), JsonFault::kTooDeep); // never above 64
}

TEST(JsonScanner, CountsValues) {
  EXPECT_EQ(Scan("[1,2]", {.values = 3}), JsonFault::kNone);
  EXPECT_EQ(Scan("[1,2,3]", {.values = 3}), JsonFault::kTooManyValues);
  EXPECT_EQ(Scan(R"({"a":1,"b":{}})", {.values = 2}), JsonFault::kTooManyValues);
}

TEST(JsonScanner, EveryPrefixOfADocumentIsRefused) {
  const std::string text = R"({"a":[1.5e3,true,null,"\ud83d\ude00ä"],"b":{"c":-0}})";
  for (size_t length = 0; length < text.size(); ++length) {
    EXPECT_NE(Scan(text.substr(0, length)), JsonFault::kNone) << length;
  }
  EXPECT_EQ(Scan(text), JsonFault::kNone);
}

TEST(Parameters, AreAnObjectOrNothing) {
  Json::Value parameters;
  EXPECT_EQ(ReadParameters("", {}, parameters), nullptr);
  EXPECT_EQ(parameters, Json::Value(Json::objectValue));
  EXPECT_EQ(ReadParameters(" {\"a\":[1]}\r", {}, parameters), nullptr);
  EXPECT_EQ(parameters["a"][0], 1);
  EXPECT_STREQ(ReadParameters("[]", {}, parameters), "body is not a JSON object");
  EXPECT_STREQ(ReadParameters("{", {}, parameters), "body is not JSON");
  EXPECT_STREQ(ReadParameters("{\"a\":\"\xff\"}", {}, parameters), "body is not UTF-8");
  EXPECT_STREQ(ReadParameters("{\"a\":[[]]}", {.depth = 2}, parameters), "body is nested too deeply");
  EXPECT_STREQ(ReadParameters("{\"a\":1}", {.values = 1}, parameters), "body has too many values");
  EXPECT_STREQ(ReadParameters("{\"a\":1,\"a\":1}", {}, parameters), "body has a key twice or a number out of range");
  EXPECT_STREQ(ReadParameters("{\"a\":1e400}", {}, parameters), "body has a key twice or a number out of range");
  EXPECT_STREQ(ReadParameters("{\"a\":" + std::string(1'000, '9') + "}", {}, parameters),
               "body has a key twice or a number out of range");
}

} // namespace
