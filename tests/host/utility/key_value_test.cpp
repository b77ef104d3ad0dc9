#include "platform/utility.h"
#include "tests/host/files.h"

#include <gtest/gtest.h>

#include <array>
#include <random>

namespace {

using hosttest::ReadText;
using hosttest::WriteText;

constexpr const char *kPlain = "%s=%s\n";

class KeyValue : public testing::Test {
protected:
  void SetUp() override { hosttest::FreshFolder("/etc/kv"); }

  static std::string Get(const std::string &key) {
    std::array<char, 64> value{};
    const int length = QARDCFileGetKeyValue(kPath, key.c_str(), value.data(), value.size(), 0);
    if (length < 0) {
      return "<error " + std::to_string(QARDCErrGet()) + ">";
    }
    EXPECT_EQ(static_cast<size_t>(length), std::string(value.data()).size());
    return value.data();
  }

  static int Set(const char *key, const char *value, const char *format = kPlain) {
    return QARDCFileSetKeyValue(kPath, key, value, format);
  }

  static constexpr const char *kPath = "/etc/kv/file.conf";
};

TEST_F(KeyValue, ReadsAValueAsTheFileSaysIt) {
  WriteText(kPath, "# A=comment\n\nA = \"one two\" \r\n\tB=2\nB=3\nempty=\nnothing\nlast=end");
  EXPECT_EQ(Get("A"), "one two");
  EXPECT_EQ(Get("B"), "3");
  EXPECT_EQ(Get("empty"), "");
  EXPECT_EQ(Get("nothing"), "");
  EXPECT_EQ(Get("absent"), "");
  EXPECT_EQ(Get("a"), "");
  EXPECT_EQ(Get("last"), "end");
}

TEST_F(KeyValue, AValueThatDoesNotFitIsAnErrorAndNotCut) {
  WriteText(kPath, "key=12345678\n");
  std::array<char, 10> value{};
  value.fill('x');
  EXPECT_LT(QARDCFileGetKeyValue(kPath, "key", value.data(), 8, 0), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TOO_LARGE);
  EXPECT_EQ(value[0], '\0');
  EXPECT_EQ(QARDCFileGetKeyValue(kPath, "key", value.data(), 9, 0), 8);
  EXPECT_STREQ(value.data(), "12345678");
  EXPECT_EQ(value[9], 'x');
}

TEST_F(KeyValue, AnAbsentKeyEmptiesTheBuffer) {
  WriteText(kPath, "key=1\n");
  std::array<char, 4> value = {'o', 'l', 'd', 0};
  EXPECT_EQ(QARDCFileGetKeyValue(kPath, "other", value.data(), value.size(), 0), 0);
  EXPECT_STREQ(value.data(), "");
}

TEST_F(KeyValue, AMissingFileIsAnError) {
  EXPECT_EQ(Get("key"), "<error " + std::to_string(QARDC_ERR_NOT_FOUND) + ">");
  EXPECT_LT(QARDCFileCheckKeyValue(kPath, "SLAVE", "yes", 0), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_STREQ(QARDCErrorGetFile(), "atomic_file.cpp");
}

TEST_F(KeyValue, AFileWithANulIsNoneOfOurs) {
  WriteText(kPath, std::string("key=a\0b\n", 8));
  EXPECT_EQ(Get("key"), "<error " + std::to_string(QARDC_ERR_SYNTAX) + ">");
  EXPECT_LT(Set("other", "1"), 0);
  EXPECT_EQ(ReadText(kPath), std::string("key=a\0b\n", 8));
}

TEST_F(KeyValue, CheckComparesTheWholeValue) {
  WriteText(kPath, "SLAVE=\"yes\"\nOTHER=yes2\n");
  EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "SLAVE", "yes", 0), 1);
  EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "SLAVE", "ye", 0), 0);
  EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "SLAVE", "YES", 0), 0);
  EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "OTHER", "yes", 0), 0);
  EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "ABSENT", "", 0), 0);
}

TEST_F(KeyValue, SetMakesTheFileWithMode0644) {
  const mode_t old = umask(077);
  EXPECT_EQ(Set("DEVICE", "eth0"), 0);
  umask(old);
  EXPECT_EQ(ReadText(kPath), "DEVICE=eth0\n");
  EXPECT_EQ(hosttest::StatOf(kPath).st_mode & 07777U, 0644U);
  EXPECT_EQ(hosttest::NamesIn("/etc/kv"), std::vector<std::string>{"file.conf"});
}

TEST_F(KeyValue, SetChangesOneLineAndKeepsEveryOther) {
  WriteText(kPath, "# top\n\n  A = 1\nB=2\njunk\nA=3\n# end");
  EXPECT_EQ(Set("A", "new", "%s=\"%s\"\n"), 0);
  EXPECT_EQ(ReadText(kPath), "# top\n\n  A = 1\nB=2\njunk\nA=\"new\"\n# end");
  EXPECT_EQ(Get("A"), "new");
  EXPECT_EQ(Set("C", "4"), 0);
  EXPECT_EQ(ReadText(kPath), "# top\n\n  A = 1\nB=2\njunk\nA=\"new\"\n# end\nC=4\n");
}

TEST_F(KeyValue, SetOfTheLastLineWithoutItsEnd) {
  WriteText(kPath, "A=1\nB=2");
  EXPECT_EQ(Set("B", "22"), 0);
  EXPECT_EQ(ReadText(kPath), "A=1\nB=22\n");
}

TEST_F(KeyValue, SetOfTheSameValueWritesNothing) {
  WriteText(kPath, "A = \"1\"\n");
  const auto before = hosttest::StatOf(kPath);
  EXPECT_EQ(Set("A", "1"), 0);
  const auto after = hosttest::StatOf(kPath);
  EXPECT_EQ(ReadText(kPath), "A = \"1\"\n");
  EXPECT_EQ(before.st_ino, after.st_ino);
  EXPECT_EQ(before.st_mtim.tv_nsec, after.st_mtim.tv_nsec);
}

TEST_F(KeyValue, SetQuotesAValueWhoseEndsWouldBeTakenAway) {
  for (const std::string value : {" blank", "blank\t", "\"quoted\"", " ", "\""}) {
    ASSERT_EQ(Set("A", value.c_str()), 0) << value;
    EXPECT_EQ(QARDCFileCheckKeyValue(kPath, "A", value.c_str(), 0), 1) << value;
  }
}

TEST_F(KeyValue, SetRefusesWhatTheFileCannotHold) {
  WriteText(kPath, "A=1\n");
  for (const char *value : {"a\nB=2", "x\r"}) {
    EXPECT_LT(Set("A", value), 0) << value;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_SYNTAX);
  }
  for (const char *key : {"a=b", "#a", "[a", " a", "a\nb"}) {
    EXPECT_LT(Set(key, "v]"), 0) << key;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_SYNTAX);
  }
  EXPECT_EQ(ReadText(kPath), "A=1\n");
  EXPECT_EQ(hosttest::NamesIn("/etc/kv"), std::vector<std::string>{"file.conf"});
}

TEST_F(KeyValue, NullAndEmptyArgumentsAreErrors) {
  std::array<char, 8> value{};
  const auto refused = [](int result) { return result < 0 && QARDCErrGet() == QARDC_ERR_BAD_ARGUMENT; };
  EXPECT_TRUE(refused(QARDCFileGetKeyValue(nullptr, "k", value.data(), value.size(), 0)));
  EXPECT_TRUE(refused(QARDCFileGetKeyValue("", "k", value.data(), value.size(), 0)));
  EXPECT_TRUE(refused(QARDCFileGetKeyValue(kPath, nullptr, value.data(), value.size(), 0)));
  EXPECT_TRUE(refused(QARDCFileGetKeyValue(kPath, "k", nullptr, value.size(), 0)));
  EXPECT_TRUE(refused(QARDCFileGetKeyValue(kPath, "k", value.data(), 0, 0)));
  EXPECT_TRUE(refused(QARDCFileCheckKeyValue(nullptr, "k", "v", 0)));
  EXPECT_TRUE(refused(QARDCFileCheckKeyValue(kPath, nullptr, "v", 0)));
  EXPECT_TRUE(refused(QARDCFileCheckKeyValue(kPath, "k", nullptr, 0)));
  EXPECT_TRUE(refused(QARDCFileSetKeyValue(nullptr, "k", "v", kPlain)));
  EXPECT_TRUE(refused(QARDCFileSetKeyValue("", "k", "v", kPlain)));
  EXPECT_TRUE(refused(Set(nullptr, "v")));
  EXPECT_TRUE(refused(Set("", "v")));
  EXPECT_TRUE(refused(Set("k", nullptr)));
  EXPECT_TRUE(refused(Set("k", "v", nullptr)));
  EXPECT_TRUE(refused(Set("k", "v", "%s=%n\n")));
  EXPECT_EQ(QARDCFileExist(kPath), 0);
}

TEST_F(KeyValue, EveryValueThatIsTakenIsReadBackByteForByte) {
  std::mt19937 random(7);
  int taken = 0;
  for (int round = 0; round < 2000; ++round) {
    std::string value;
    for (size_t left = random() % 8; left > 0; --left) {
      value += static_cast<char>(1 + random() % 255);
    }
    const std::string before = ReadText(kPath);
    if (Set("key", value.c_str(), round % 2 == 0 ? kPlain : "%s=\"%s\"\n") == 0) {
      ++taken;
      ASSERT_EQ(Get("key"), value);
    } else {
      ASSERT_EQ(ReadText(kPath), before);
    }
  }
  EXPECT_GT(taken, 1000);
}

TEST_F(KeyValue, AFileOverTheLimitIsNeitherReadNorWritten) {
  WriteText(kPath, "k=1\n" + std::string(1024UL * 1024, '#'));
  EXPECT_EQ(Get("k"), "<error " + std::to_string(QARDC_ERR_TOO_LARGE) + ">");
  EXPECT_LT(Set("k", "2"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TOO_LARGE);
  WriteText(kPath, std::string(1024UL * 1024 - 4, '#') + "\nk=");
  EXPECT_EQ(Get("k"), "");
  EXPECT_LT(Set("k", "23"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TOO_LARGE);
  EXPECT_EQ(hosttest::StatOf(kPath).st_size, 1024 * 1024 - 1);
}

} // namespace
