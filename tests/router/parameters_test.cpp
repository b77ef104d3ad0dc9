// The conversions of parameters, and JSON inside a text.
#include "router/parameters.h"

#include <gtest/gtest.h>
#include <json/reader.h>

namespace {

const Json::Value kArray(Json::arrayValue);
const Json::Value kObject(Json::objectValue);

std::string Repeat(const std::string &text, int times) {
  std::string out;
  for (int i = 0; i < times; ++i) {
    out += text;
  }
  return out;
}

bool Parses(const std::string &text) {
  Json::Value value;
  std::string errors;
  const bool parsed = router::ParseJson(text, value, errors);
  EXPECT_EQ(parsed, errors.empty()) << text.substr(0, 80);
  return parsed;
}

TEST(Parameters, ConvertToBoolFollowsTheLibraryAndRefusesWhatItThrowsAt) {
  EXPECT_EQ(router::ConvertToBool(true), true);
  EXPECT_EQ(router::ConvertToBool(false), false);
  EXPECT_EQ(router::ConvertToBool(Json::Value()), false);
  EXPECT_EQ(router::ConvertToBool(0), false);
  EXPECT_EQ(router::ConvertToBool(-3), true);
  EXPECT_EQ(router::ConvertToBool(0.5), true);
  EXPECT_EQ(router::ConvertToBool("true"), std::nullopt);
  EXPECT_EQ(router::ConvertToBool(kArray), std::nullopt);
  EXPECT_EQ(router::ConvertToBool(kObject), std::nullopt);
}

TEST(Parameters, ConvertToTextFollowsTheLibraryAndRefusesWhatItThrowsAt) {
  EXPECT_EQ(router::ConvertToText("a"), "a");
  EXPECT_EQ(router::ConvertToText(5), "5");
  EXPECT_EQ(router::ConvertToText(true), "true");
  EXPECT_EQ(router::ConvertToText(Json::Value()), "");
  EXPECT_EQ(router::ConvertToText(kArray), std::nullopt);
  EXPECT_EQ(router::ConvertToText(kObject), std::nullopt);
}

TEST(Parameters, WholeTextIsNeverOneThatACFunctionWouldCut) {
  EXPECT_EQ(router::WholeTextOf(std::string("a\xff\"\n")), "a\xff\"\n");
  EXPECT_EQ(router::WholeTextOf(""), "");
  EXPECT_EQ(router::WholeTextOf(std::string("a\0b", 3)), std::nullopt);
  EXPECT_EQ(router::WholeTextOf(std::string("\0", 1)), std::nullopt);
  EXPECT_EQ(router::WholeTextOf(5), std::nullopt);
  EXPECT_EQ(router::WholeTextOf(Json::Value()), std::nullopt);
}

TEST(Parameters, MemberOfWhatIsNoObjectIsNull) {
  Json::Value object;
  object["a"] = 1;
  EXPECT_EQ(router::MemberOf(object, "a"), 1);
  EXPECT_TRUE(router::MemberOf(object, "b").isNull());
  for (const Json::Value &other : {Json::Value(), Json::Value(5), Json::Value("a"), Json::Value(true), kArray}) {
    EXPECT_TRUE(router::MemberOf(other, "a").isNull());
  }
}

TEST(ParseJson, TakesWhatTheReaderTakes) {
  EXPECT_TRUE(Parses("[]"));
  EXPECT_TRUE(Parses("{}"));
  EXPECT_TRUE(Parses(" 5 "));
  EXPECT_TRUE(Parses("null"));
  EXPECT_TRUE(Parses("[1, /* one */ 2] // two"));
  for (const char *text : {"", "[", "[1", "]", "x", "{\"a\"", "[1,,2]", "\"a", "/", "/*", "//", "\\", "[1]\r]["}) {
    Json::Value value;
    Json::Reader reader;
    EXPECT_EQ(Parses(text), reader.parse(text, value, false)) << text;
  }
}

TEST(ParseJson, NestingIsTakenTo64AndRefusedFrom65) {
  for (const auto &[open, close] : {std::pair("[", "]"), std::pair("{\"a\":", "}"), std::pair("[{\"a\":", "}]")}) {
    const int step = std::string(open)[0] == '[' && std::string(open).size() > 1 ? 2 : 1;
    const int fits = 64 / step;
    EXPECT_TRUE(Parses(Repeat(open, fits) + "1" + Repeat(close, fits))) << open;
    EXPECT_FALSE(Parses(Repeat(open, fits + 1) + "1" + Repeat(close, fits + 1))) << open;
  }
  for (const int depth : {1001, 100000}) {
    EXPECT_FALSE(Parses(Repeat("[", depth)));
    EXPECT_FALSE(Parses(Repeat("[", depth) + Repeat("]", depth)));
    EXPECT_FALSE(Parses(Repeat("{\"a\":", depth)));
  }
}

TEST(ParseJson, ManyArraysSideBySideAreNotDeep) {
  EXPECT_TRUE(Parses("[" + Repeat("[],", 5000) + "[]]"));
}

TEST(ParseJson, BracketsInStringsAndCommentsAreNotCounted) {
  EXPECT_TRUE(Parses("[\"" + Repeat("[", 2000) + "\"]"));
  EXPECT_TRUE(Parses(R"(["\"\\", ")" + Repeat("{", 2000) + "\"]"));
  EXPECT_TRUE(Parses("/*" + Repeat("[", 2000) + "*/ [] //" + Repeat("[", 2000)));
}

TEST(ParseJson, NothingHidesDepthFromTheCount) {
  const std::string deep = Repeat("[", 2000) + Repeat("]", 2000);
  for (const char *before : {R"(/* " */)", "// \"\n", "// \"\r", "[\"\\\\\", ", "[\"/*\", ", "[\"//\", ", "/*/ */"}) {
    Json::Value value;
    std::string errors;
    EXPECT_FALSE(router::ParseJson(before + deep, value, errors)) << before;
    EXPECT_EQ(errors, "nested too deeply") << before;
  }
}

TEST(ParseJson, NulInTheTextIsRefusedAndDoesNotEndIt) {
  EXPECT_FALSE(Parses(std::string("[]\0garbage", 10)));
  EXPECT_FALSE(Parses(std::string("[]\0", 3)));
}

TEST(ParseJson, ErrorTextIsBounded) {
  Json::Value value;
  std::string errors;
  EXPECT_FALSE(router::ParseJson("[" + Repeat("9e", 100000) + "]", value, errors));
  EXPECT_LE(errors.size(), 1024U);
}

TEST(ParseJsonText, ValueWithoutATextIsAnError) {
  Json::Value value;
  std::string errors;
  EXPECT_FALSE(router::ParseJsonText(kArray, value, errors));
  EXPECT_FALSE(router::ParseJsonText(kObject, value, errors));
  EXPECT_EQ(errors, "no text");
  EXPECT_TRUE(router::ParseJsonText(5, value, errors));
  EXPECT_EQ(value, 5);
}

} // namespace
