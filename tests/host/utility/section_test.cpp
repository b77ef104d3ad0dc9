#include "host/utility/sz_hash.h"
#include "host/utility/sz_list.h"
#include "platform/utility.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>

#include <chrono>
#include <memory>
#include <thread>

namespace {

using hosttest::ReadText;
using hosttest::WriteText;
using testing::ElementsAre;

constexpr const char *kPath = "/etc/sections/timectrl.conf";
constexpr const char *kTab = "\t%s=%s\n";

class Section : public testing::Test {
protected:
  void SetUp() override { hosttest::FreshFolder("/etc/sections"); }
  void TearDown() override {
    QARDCSzHashFree(hash_);
    QARDCSzListFree(list_);
  }
  void Put(const char *key, const char *value) { ASSERT_EQ(QARDCSzHashSetValue(hash_, key, value), 0); }
  std::string Pairs() const {
    std::string out;
    for (const auto &[key, value] : hash_->Pairs()) {
      out.append(key).append("=").append(value).append(";");
    }
    return out;
  }

  QARDCSzHash *hash_ = QARDCSzHashAlloc(1024);
  QARDCSzList *list_ = QARDCSzListAlloc(1024);
};

TEST_F(Section, IsAppendedInTheOrderOfTheHash) {
  Put("tcenable", "yes");
  Put("name", "Kids' tablet #2");
  EXPECT_GE(QARDCFileAddSection(kPath, "00:11:22:33:44:55", hash_, kTab), 0);
  Put("tcenable", "no");
  EXPECT_GE(QARDCFileAddSection(kPath, "66:77:88:99:aa:bb", hash_, kTab), 0);
  EXPECT_EQ(ReadText(kPath), "[00:11:22:33:44:55]\n\ttcenable=yes\n\tname=Kids' tablet #2\n"
                             "[66:77:88:99:aa:bb]\n\ttcenable=no\n\tname=Kids' tablet #2\n");
  EXPECT_EQ(Pairs(), "tcenable=no;name=Kids' tablet #2;");
}

TEST_F(Section, WithoutPairsIsItsHeader) {
  EXPECT_GE(QARDCFileAddSection(kPath, "empty", hash_, kTab), 0);
  EXPECT_EQ(ReadText(kPath), "[empty]\n");
  EXPECT_EQ(QARDCFileGetSection(kPath, "empty", hash_), 0);
}

TEST_F(Section, EndsALastLineThatHasNoEnd) {
  WriteText(kPath, "[a]\nk=1");
  Put("k", "2");
  EXPECT_GE(QARDCFileAddSection(kPath, "b", hash_, "%s=%s\n"), 0);
  EXPECT_EQ(ReadText(kPath), "[a]\nk=1\n[b]\nk=2\n");
}

TEST_F(Section, EnumGivesEveryNameAndKeepsWhatTheListHolds) {
  WriteText(kPath, "k=0\n[one]\nk=1\n# [no]\n [two]\n[one]\n[open\n");
  list_->Append("before");
  EXPECT_EQ(QARDCFileEnumSection(kPath, list_), 3);
  EXPECT_THAT(list_->Texts(), ElementsAre("before", "one", "two", "one"));
}

TEST_F(Section, GetReadsTheFirstOfThatName) {
  WriteText(kPath, "k=outside\n[a]\nx=1\n\n# c\n y = \"2 \" \nx=3\n=none\n[b]\nx=4\n[a]\nx=5\n");
  Put("kept", "as it was");
  EXPECT_EQ(QARDCFileGetSection(kPath, "a", hash_), 2);
  EXPECT_EQ(Pairs(), "kept=as it was;x=3;y=2 ;");
  EXPECT_EQ(QARDCFileGetSection(kPath, "b", hash_), 1);
  EXPECT_EQ(Pairs(), "kept=as it was;x=4;y=2 ;");
}

TEST_F(Section, AbsentOnesAndMissingFilesAreErrors) {
  EXPECT_LT(QARDCFileEnumSection(kPath, list_), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_LT(QARDCFileGetSection(kPath, "a", hash_), 0);
  WriteText(kPath, "");
  EXPECT_EQ(QARDCFileEnumSection(kPath, list_), 0);
  EXPECT_LT(QARDCFileGetSection(kPath, "a", hash_), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_LT(QARDCFileGetSection(kPath, "", hash_), 0);
}

TEST_F(Section, ANameThatWouldNotBeReadBackIsRefused) {
  WriteText(kPath, "[a]\n");
  for (const char *name : {"a]b", "]", "a\nb", "a\n[c]", "a\r"}) {
    EXPECT_LT(QARDCFileAddSection(kPath, name, hash_, kTab), 0) << name;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_SYNTAX);
  }
  EXPECT_EQ(ReadText(kPath), "[a]\n");
  for (const char *name : {" x ", "[x", "#", "a=b", "\xc3\xa4"}) {
    EXPECT_GE(QARDCFileAddSection(kPath, name, hash_, kTab), 0) << name;
  }
  EXPECT_EQ(QARDCFileEnumSection(kPath, list_), 6);
  EXPECT_THAT(list_->Texts(), ElementsAre("a", " x ", "[x", "#", "a=b", "\xc3\xa4"));
}

TEST_F(Section, OnePairThatWouldNotBeReadBackRefusesTheWhole) {
  Put("good", "1");
  for (const char *value : {"a\n[forged]", "a\rb"}) {
    Put("bad", value);
    EXPECT_LT(QARDCFileAddSection(kPath, "s", hash_, kTab), 0) << value;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_SYNTAX);
  }
  QARDCSzHashRemoveKey(hash_, "bad");
  Put("[x", "y]");
  EXPECT_LT(QARDCFileAddSection(kPath, "s", hash_, kTab), 0);
  EXPECT_EQ(QARDCFileExist(kPath), 0);
}

TEST_F(Section, NullAndEmptyArgumentsAreErrors) {
  const auto refused = [](int result) { return result < 0 && QARDCErrGet() == QARDC_ERR_BAD_ARGUMENT; };
  EXPECT_TRUE(refused(QARDCFileAddSection(nullptr, "s", hash_, kTab)));
  EXPECT_TRUE(refused(QARDCFileAddSection(kPath, nullptr, hash_, kTab)));
  EXPECT_TRUE(refused(QARDCFileAddSection(kPath, "", hash_, kTab)));
  EXPECT_TRUE(refused(QARDCFileAddSection(kPath, "s", nullptr, kTab)));
  EXPECT_TRUE(refused(QARDCFileAddSection(kPath, "s", hash_, nullptr)));
  EXPECT_TRUE(refused(QARDCFileAddSection(kPath, "s", hash_, "%s\n")));
  EXPECT_TRUE(refused(QARDCFileEnumSection(nullptr, list_)));
  EXPECT_TRUE(refused(QARDCFileEnumSection(kPath, nullptr)));
  EXPECT_TRUE(refused(QARDCFileGetSection(nullptr, "s", hash_)));
  EXPECT_TRUE(refused(QARDCFileGetSection(kPath, nullptr, hash_)));
  EXPECT_TRUE(refused(QARDCFileGetSection(kPath, "s", nullptr)));
  EXPECT_EQ(QARDCFileExist(kPath), 0);
}

// Reading keeps what it last read: it must not outlive the file's content.
class ChangedSection : public Section {
protected:
  std::string Value() {
    const std::unique_ptr<QARDCSzHash, void (*)(QARDCSzHash *)> hash(QARDCSzHashAlloc(1024), QARDCSzHashFree);
    const int count = QARDCFileGetSection(kPath, "a", hash.get());
    return count <= 0 ? "none" : QARDCSzHashGetValue(hash.get(), "k");
  }
  // Long enough ago that the next change shows in the file's times.
  static void Settle() { std::this_thread::sleep_for(std::chrono::milliseconds(60)); }
};

TEST_F(ChangedSection, IsReadAsItIsNowWhoeverChangedIt) {
  WriteText(kPath, "[a]\nk=1\n");
  Settle();
  EXPECT_EQ(Value(), "1");
  EXPECT_EQ(Value(), "1");
  WriteText(kPath, "[a]\nk=2\n"); // in place, of the same size
  EXPECT_EQ(Value(), "2");
  Settle();
  EXPECT_EQ(Value(), "2");
  WriteText("/etc/sections/other", "[a]\nk=3\n");
  std::filesystem::rename("/etc/sections/other", kPath);
  EXPECT_EQ(Value(), "3");
  Settle();
  EXPECT_EQ(Value(), "3");
  std::filesystem::remove(kPath);
  EXPECT_EQ(Value(), "none");
  WriteText(kPath, "[a]\nk=4\n");
  EXPECT_EQ(Value(), "4");
}

TEST_F(ChangedSection, IsReadAsItIsNowWhenItChangesFasterThanFileTimes) {
  WriteText(kPath, "[a]\nk=0\n");
  Settle();
  for (int round = 0; round < 3000; ++round) {
    const std::string value = std::to_string(round % 10);
    WriteText(kPath, "[a]\nk=" + value + "\n");
    ASSERT_EQ(Value(), value) << round;
    ASSERT_EQ(Value(), value) << round;
  }
}

TEST_F(ChangedSection, OfAnotherPathIsAnothers) {
  WriteText(kPath, "[a]\nk=1\n");
  WriteText("/etc/sections/other", "[a]\nk=2\n");
  Settle();
  EXPECT_EQ(Value(), "1");
  ASSERT_GE(QARDCFileGetSection("/etc/sections/other", "a", hash_), 0);
  EXPECT_EQ(Pairs(), "k=2;");
  EXPECT_EQ(Value(), "1");
}

} // namespace
