// The rule file, written and read back.
#include "host/utility/atomic_file.h"
#include "host/utility/sz_hash.h"
#include "tests/host/files.h"
#include "tests/host/portforward/records.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <unistd.h>

namespace {

using hosttest::List;
using hosttest::MakeList;
using hosttest::ReadText;
using hosttest::Records;
using hosttest::TakeLogLines;
using hosttest::WriteText;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char *kFolder = "/var/lib/rules";
constexpr const char *kPath = "/var/lib/rules/rule.conf";

Records ReadBack() {
  VORNPFRecord *head = nullptr;
  EXPECT_GE(VORNPFConfGet(&head, kPath, 0, 0, 0), 0);
  const List list(head);
  Records out;
  for (const VORNPFRecord *record = head; record != nullptr; record = record->next) {
    out.emplace_back(record->name, hosttest::Pairs{});
    for (const auto &[key, value] : record->values->Pairs()) {
      out.back().second.emplace_back(key, value);
    }
  }
  return out;
}

int Write(const Records &records) {
  return VORNPFConfSet(MakeList(records).get(), kPath);
}

// A failed read gives a code and no list.
int ReadError() {
  VORNPFRecord *head = MakeList({{"stale", {}}}).release();
  const List freed(head);
  EXPECT_LT(VORNPFConfGet(&head, kPath, 0, 0, 0), 0);
  EXPECT_EQ(head, nullptr);
  return QARDCErrGet();
}

class RecordFile : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder(kFolder);
    TakeLogLines();
  }
};

TEST_F(RecordFile, HoldsTheRecordsAndTheirPairsInOrder) {
  const Records records = {{"1", {{"z", "1"}, {"a", "2"}, {"protocol name", "tcp"}}}, {"0", {}}, {"1", {{"b", ""}}}};
  ASSERT_EQ(Write(records), 0);
  EXPECT_EQ(ReadText(kPath), "[1]\nz=\"1\"\na=\"2\"\nprotocol name=\"tcp\"\n[0]\n[1]\nb=\"\"\n");
  EXPECT_EQ(ReadBack(), records);
  EXPECT_EQ(hosttest::StatOf(kPath).st_mode & 07777U, 0644U);
  EXPECT_THAT(hosttest::NamesIn(kFolder), ElementsAre("rule.conf"));
}

TEST_F(RecordFile, NullListWritesAnEmptySet) {
  ASSERT_EQ(Write({{"0", {{"a", "1"}}}}), 0);
  ASSERT_EQ(VORNPFConfSet(nullptr, kPath), 0);
  EXPECT_EQ(ReadText(kPath), "");
  EXPECT_THAT(ReadBack(), IsEmpty());
}

TEST_F(RecordFile, WritingReplacesTheWholeContent) {
  WriteText(kPath, "# by hand\nx=1\n[9]\na=\"9\"\n");
  ASSERT_EQ(Write({{"0", {{"a", "1"}}}}), 0);
  EXPECT_EQ(ReadText(kPath), "[0]\na=\"1\"\n");
}

TEST_F(RecordFile, EveryByteThatMayStandInAValueComesBack) {
  for (int byte = 1; byte < 256; ++byte) {
    if (byte == '\n' || byte == '\r') {
      continue;
    }
    const std::string one(1, static_cast<char>(byte));
    const Records records = {{"0", {{"service", one}, {"b", one + one}, {"c", "a" + one + "b"}, {"d", one + "x"}}}};
    ASSERT_EQ(Write(records), 0) << byte;
    ASSERT_EQ(ReadBack(), records) << byte;
  }
}

TEST_F(RecordFile, TextsThatLookLikeSyntaxComeBack) {
  for (const char *text : {"",  " ",  "\"",  "\"\"",  "a\"",    "\"a\"", "[x]",   "[1]",  "a=b",      "=",
                           "#", "\\", "x\\", " lead", "trail ", "\t",    "$(id)", "%s%n", "\xff\xfe", "\xc3\xa9"}) {
    const Records records = {{"0", {{"service", text}, {"after", "1"}}}, {"1", {}}};
    ASSERT_EQ(Write(records), 0) << text;
    ASSERT_EQ(ReadBack(), records) << text;
  }
}

TEST_F(RecordFile, LongTextComesBackWhole) {
  const Records records = {{"0", {{"service", std::string(65536, 'x')}}}};
  ASSERT_EQ(Write(records), 0);
  EXPECT_EQ(ReadBack(), records);
}

TEST_F(RecordFile, FiveThousandRecordsComeBack) {
  Records records;
  for (int i = 0; i < 5000; ++i) {
    records.emplace_back(std::to_string(i), hosttest::Rule("60000-60010", "both", "192.168.100.100", "60000-60010", "1",
                                                           "A service name"));
  }
  ASSERT_EQ(Write(records), 0);
  EXPECT_EQ(ReadBack(), records);
}

TEST_F(RecordFile, TextThatCannotBeKeptWholeIsRefusedBeforeTheFileIsTouched) {
  ASSERT_EQ(Write({{"0", {{"a", "old"}}}}), 0);
  const ino_t before = hosttest::StatOf(kPath).st_ino;
  const Records cases = {{"0", {{"service", "a\nb"}}},
                         {"0", {{"service", "\n"}}},
                         {"0", {{"service", "a\r"}}},
                         {"0", {{"a\n", "1"}}},
                         {"0", {{"a=b", "1"}}},

                         {"0", {{" a", "1"}}},
                         {"0", {{"#a", "1"}}},
                         {"a]b", {}},
                         {"a\nb", {}},
                         {"", {}},
                         {std::string(1024, 'n'), {}}};
  for (const auto &bad : cases) {
    EXPECT_NE(Write({{"0", {{"a", "1"}}}, bad}), 0) << bad.first;
    EXPECT_EQ(ReadText(kPath), "[0]\na=\"old\"\n");
    EXPECT_EQ(hosttest::StatOf(kPath).st_ino, before);
    EXPECT_THAT(hosttest::NamesIn(kFolder), ElementsAre("rule.conf"));
  }
}

TEST_F(RecordFile, LongestNameComesBack) {
  const Records records = {{std::string(1023, 'n'), {}}, {" 0 ", {}}};
  ASSERT_EQ(Write(records), 0);
  EXPECT_EQ(ReadBack(), records);
}

TEST_F(RecordFile, MoreThanTheLimitIsRefused) {
  ASSERT_EQ(Write({{"0", {{"a", "old"}}}}), 0);
  EXPECT_NE(Write({{"0", {{"a", std::string(vornhost::kFileLimit, 'x')}}}}), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TOO_LARGE);
  EXPECT_EQ(ReadText(kPath), "[0]\na=\"old\"\n");
}

TEST_F(RecordFile, ListThatRunsInACircleIsRefused) {
  List list = MakeList({{"0", {{"a", "1"}}}, {"1", {{"a", "1"}}}});
  list->next->next = list.get();
  EXPECT_NE(VORNPFConfSet(list.get(), kPath), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_TOO_LARGE);
  list->next->next = nullptr;
}

TEST_F(RecordFile, WrongArgumentsAreRefused) {
  VORNPFRecord *head = nullptr;
  const List list = MakeList({{"0", {}}});
  EXPECT_LT(VORNPFConfGet(nullptr, kPath, 0, 0, 0), 0);
  EXPECT_LT(VORNPFConfGet(&head, nullptr, 0, 0, 0), 0);
  EXPECT_LT(VORNPFConfGet(&head, "", 0, 0, 0), 0);
  EXPECT_NE(VORNPFConfSet(list.get(), nullptr), 0);
  EXPECT_NE(VORNPFConfSet(list.get(), ""), 0);
  EXPECT_NE(VORNPFConfSet(list.get(), "/var/lib/no-such-folder/rule.conf"), 0);
  QARDCSzHashFree(list->values);
  list->values = nullptr;
  EXPECT_NE(VORNPFConfSet(list.get(), kPath), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  VORNPFConfFree(nullptr);
  EXPECT_THAT(hosttest::NamesIn(kFolder), IsEmpty());
}

TEST_F(RecordFile, MissingFileCannotBeRead) {
  EXPECT_EQ(ReadError(), QARDC_ERR_NOT_FOUND);
}

TEST_F(RecordFile, WhatIsNoRecordIsPassedOver) {
  WriteText(kPath, "stray=\"1\"\n# note\n\n[0]\nno pair\n =\"x\"\na = bare \na=\"last\"\r\n[]\n");
  EXPECT_EQ(ReadBack(), (Records{{"0", {{"a", "last"}}}, {"", {}}}));
}

TEST_F(RecordFile, CutFileReadsAsFarAsItGoesAndNeverWithAnotherPort) {
  const std::string whole = "[0]\nr_port=\"8080\"\ns_ip=\"192.168.1.110\"\n[1]\nr_port=\"8081\"\n";
  for (size_t length = 0; length <= whole.size(); ++length) {
    WriteText(kPath, whole.substr(0, length));
    for (const auto &[name, pairs] : ReadBack()) {
      for (const auto &[key, value] : pairs) {
        const bool isCut = !value.empty() && value.front() == '"'; // the closing one is missing
        EXPECT_TRUE(isCut || value.empty() || value == "8080" || value == "8081" || value == "192.168.1.110")
            << length << " " << value;
      }
    }
  }
}

TEST_F(RecordFile, FileWithANulOrANameTooLongCannotBeRead) {
  WriteText(kPath, std::string("[0]\na=\"1\0\"\n", 11));
  EXPECT_EQ(ReadError(), QARDC_ERR_SYNTAX);
  WriteText(kPath, "[0]\n[" + std::string(1024, 'n') + "]\n");
  EXPECT_EQ(ReadError(), QARDC_ERR_SYNTAX);
}

TEST_F(RecordFile, SymbolicLinkIsNeitherReadNorReplaced) {
  const std::string other = std::string(kFolder) + "/other";
  WriteText(other, "[0]\na=\"1\"\n");
  ASSERT_EQ(symlink(other.c_str(), kPath), 0);
  EXPECT_EQ(ReadError(), QARDC_ERR_ACCESS);
  EXPECT_NE(Write({{"0", {}}}), 0);
  EXPECT_EQ(ReadText(other), "[0]\na=\"1\"\n");
  EXPECT_TRUE(S_ISLNK(hosttest::StatOf(kPath).st_mode));
  EXPECT_THAT(TakeLogLines(), SizeIs(2));
}

TEST_F(RecordFile, FileThatOthersMayWriteIsNeitherReadNorReplaced) {
  WriteText(kPath, "[0]\na=\"1\"\n");
  for (const mode_t mode : {0664U, 0646U, 0666U}) {
    ASSERT_EQ(chmod(kPath, mode), 0);
    EXPECT_EQ(ReadError(), QARDC_ERR_ACCESS);
    EXPECT_NE(Write({{"1", {}}}), 0);
    EXPECT_EQ(ReadText(kPath), "[0]\na=\"1\"\n");
    EXPECT_THAT(TakeLogLines(), ElementsAre("3 /var/lib/rules/rule.conf is no plain file of root's alone",
                                            "3 /var/lib/rules/rule.conf is no plain file of root's alone"));
  }
}

TEST_F(RecordFile, SomebodyElsesFileIsNeitherReadNorReplaced) {
  WriteText(kPath, "[0]\na=\"1\"\n");
  if (chown(kPath, 1000, 1000) != 0) {
    GTEST_SKIP() << "only root can give a file away";
  }
  EXPECT_EQ(ReadError(), QARDC_ERR_ACCESS);
  EXPECT_NE(Write({{"1", {}}}), 0);
  EXPECT_EQ(ReadText(kPath), "[0]\na=\"1\"\n");
}

TEST_F(RecordFile, FolderOrPipeInItsPlaceIsRefused) {
  ASSERT_EQ(mkfifo(kPath, 0600), 0);
  EXPECT_EQ(ReadError(), QARDC_ERR_ACCESS);
  EXPECT_NE(Write({{"0", {}}}), 0);
  unlink(kPath);
  ASSERT_EQ(mkdir(kPath, 0755), 0);
  EXPECT_EQ(ReadError(), QARDC_ERR_ACCESS);
  EXPECT_NE(Write({{"0", {}}}), 0);
}

} // namespace
