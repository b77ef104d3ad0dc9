#include "host/utility/line_file.h"

#include <gtest/gtest.h>

#include <random>

namespace {

using vornhost::Line;
using vornhost::LineFormat;
using vornhost::ParseLine;

struct FormatCase {
  const char *format;
  bool good;
};

class LineFormatTest : public testing::TestWithParam<FormatCase> {};

TEST_P(LineFormatTest, TakesExactlyTwoTextsAndOneLineEnd) {
  EXPECT_EQ(LineFormat::Parse(GetParam().format).has_value(), GetParam().good);
}

INSTANTIATE_TEST_SUITE_P(
    Table, LineFormatTest,
    testing::Values(FormatCase{"%s=%s\n", true}, FormatCase{"%s=\"%s\"\n", true}, FormatCase{"\t%s=%s\n", true},
                    FormatCase{"%s = %s\r\n", true}, FormatCase{"%s=%s%%\n", true}, FormatCase{"%%%s=%s\n", true},
                    FormatCase{nullptr, false}, FormatCase{"", false}, FormatCase{"\n", false},
                    FormatCase{"%s\n", false}, FormatCase{"%s=%s", false}, FormatCase{"%s=%s=%s\n", false},
                    FormatCase{"%s=%d\n", false}, FormatCase{"%s=%s%n\n", false}, FormatCase{"%1$s=%2$s\n", false},
                    FormatCase{"%10s=%s\n", false}, FormatCase{"%.*s=%s\n", false}, FormatCase{"%s=%s\n%", false},
                    FormatCase{"%s=%s%\n", false}, FormatCase{"%s=%s%", false}, FormatCase{"%s\n%s\n", false},
                    FormatCase{"%s=%s\n\n", false}, FormatCase{"%s=%s\n ", false}, FormatCase{"%%s=%%s\n", false}));

std::string Rendered(const char *format, const std::string &key, const std::string &value) {
  return LineFormat::Parse(format)->Render(key, value).value_or("<refused>");
}

TEST(LineFormat_Render, PutsTheTextsInAsTheyAre) {
  EXPECT_EQ(Rendered("%s=%s\n", "DEVICE", "eth0"), "DEVICE=eth0\n");
  EXPECT_EQ(Rendered("%s=\"%s\"\n", "dmz_ip", "192.168.1.9"), "dmz_ip=\"192.168.1.9\"\n");
  EXPECT_EQ(Rendered("\t%s=%s\n", "name", "My #1 [phone] a=b \\"), "\tname=My #1 [phone] a=b \\\n");
  EXPECT_EQ(Rendered("%s=%s\n", "key", "%s%n%d"), "key=%s%n%d\n");
  EXPECT_EQ(Rendered("%s=%s\n", "key", ""), "key=\n");
  EXPECT_EQ(Rendered("%s=\"%s\"\n", "key", ""), "key=\"\"\n");
  EXPECT_EQ(Rendered("%s=\"%s\"\n", "key", " kept "), "key=\" kept \"\n");
  EXPECT_EQ(Rendered("%s=\"%s\"\n", "key", "\"in quotes\""), "key=\"\"in quotes\"\"\n");
  EXPECT_EQ(Rendered("%s=%s\n", "protocol name", "tcp"), "protocol name=tcp\n");
}

TEST(LineFormat_Render, QuotesAValueWhoseEndsWouldBeTakenAway) {
  EXPECT_EQ(Rendered("\t%s=%s\n", "name", " Anna"), "\tname=\" Anna\"\n");
  EXPECT_EQ(Rendered("%s=%s\n", "key", "a\t"), "key=\"a\t\"\n");
  EXPECT_EQ(Rendered("%s=%s\n", "key", "\"a\""), "key=\"\"a\"\"\n");
  EXPECT_EQ(Rendered("%s=%s\n", "key", " "), "key=\" \"\n");
}

TEST(LineFormat_Render, RefusesWhatWouldNotBeReadBack) {
  EXPECT_EQ(Rendered("%s=%s\n", "key", "a\nb"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", "key", "a\rb"), "<refused>");
  EXPECT_EQ(Rendered("%s=\"%s\"\n", "key", "a\"\nother=\"b"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", "#key", "a"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", "a=b", "c"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", "[a", "b]"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", " key", "a"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s\n", "k\ney", "a"), "<refused>");
  EXPECT_EQ(Rendered("%s:%s\n", "key", "a"), "<refused>");
  EXPECT_EQ(Rendered("#%s=%s\n", "key", "a"), "<refused>");
  EXPECT_EQ(Rendered("%s=%s%%\n", "key", "a"), "<refused>");
}

TEST(ParseLine, ReadsWhatALineSays) {
  const Line pair = ParseLine("  key =  \"a value\" \r");
  EXPECT_EQ(pair.kind, Line::Kind::kPair);
  EXPECT_EQ(pair.key, "key");
  EXPECT_EQ(pair.value, "a value");
  EXPECT_EQ(ParseLine("k=\"").value, "\"");
  EXPECT_EQ(ParseLine("k=a#b").value, "a#b");
  EXPECT_EQ(ParseLine("k=a=b").value, "a=b");
  EXPECT_EQ(ParseLine("[00:11:22:33:44:55]").kind, Line::Kind::kSection);
  EXPECT_EQ(ParseLine(" [a b ] ").key, "a b ");
  for (const char *nothing : {"", " \t", "# key=a", "\t#", "words", "[open"}) {
    EXPECT_EQ(ParseLine(nothing).kind, Line::Kind::kNothing) << nothing;
  }
}

// Bytes that matter to the syntax come up often.
std::string RandomText(std::mt19937 &random) {
  constexpr std::string_view kSyntax = "\n\r\t \"#[]=%s\\;'";
  std::string text;
  for (size_t left = random() % 12; left > 0; --left) {
    text += random() % 2 == 0 ? kSyntax[random() % kSyntax.size()] : static_cast<char>(1 + random() % 255);
  }
  return text;
}

TEST(LineFormat_Render, ReadsBackEveryRandomTextThatItTakes) {
  std::mt19937 random(20240229);
  int taken = 0;
  int refused = 0;
  for (const char *format : {"%s=%s\n", "%s=\"%s\"\n", "\t%s=%s\n", "%s = %s\r\n"}) {
    for (int round = 0; round < 50000; ++round) {
      const std::string key = RandomText(random);
      const std::string value = RandomText(random);
      const auto line = LineFormat::Parse(format)->Render(key, value);
      if (!line) {
        ++refused;
        continue;
      }
      ++taken;
      ASSERT_EQ(line->find('\n'), line->size() - 1);
      const Line read = ParseLine(std::string_view(*line).substr(0, line->size() - 1));
      ASSERT_EQ(read.kind, Line::Kind::kPair);
      ASSERT_EQ(read.key, key);
      ASSERT_EQ(read.value, value);
    }
  }
  EXPECT_GT(taken, 20000);
  EXPECT_GT(refused, 20000);
}

} // namespace
