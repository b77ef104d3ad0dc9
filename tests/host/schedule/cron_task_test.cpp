#include "host/schedule/cron_task.h"
#include "platform/schedule.h"
#include "platform/utility.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>

#include <unistd.h>

#include <cstring>

namespace {

using hosttest::NamesIn;
using hosttest::ReadText;
using hosttest::StatOf;
using hosttest::WriteText;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::MatchesRegex;
using vornhost::CronFileOf;

constexpr char kFolder[] = "/etc/cron.d";
constexpr char kCommand[] = "/tmp/vorntimecontrol --schedule";
constexpr char kHeader[] = "# Written by the router's scheduler; changes are lost.\n";

VORNScheduleRecord Hourly(const std::string &command = kCommand) {
  VORNScheduleRecord record{};
  record.weekdays = 127;
  record.intervalHours = 1;
  record.lastHour = 23;
  std::memcpy(record.command, command.data(), std::min(command.size(), sizeof(record.command)));
  return record;
}

std::string Line(const std::string &command) {
  return std::string(kHeader) + "0 * * * * root /usr/vorn/sbin/vornrun " + command + "\n";
}

class CronTask : public testing::Test {
protected:
  void SetUp() override { hosttest::FreshFolder(kFolder); }

  static int Set(const VORNScheduleRecord &record) { return VORNScheduleSet(&record, 0); }
};

TEST_F(CronTask, Set_WritesAFileThatCronReads) {
  ASSERT_GE(Set(Hourly()), 0);
  EXPECT_THAT(NamesIn(kFolder), ElementsAre(MatchesRegex("[A-Za-z0-9_-]+")));
  const std::string path = CronFileOf(kCommand);
  EXPECT_EQ(ReadText(path), Line(kCommand));
  const struct stat info = StatOf(path);
  EXPECT_TRUE(S_ISREG(info.st_mode));
  EXPECT_EQ(info.st_mode & 07777U, 0644U);
  EXPECT_EQ(info.st_uid, 0U);
}

TEST_F(CronTask, Set_ReplacesTheTaskOfTheSameCommandOnly) {
  ASSERT_GE(Set(Hourly()), 0);
  ASSERT_GE(Set(Hourly("/tmp/vorntimecontrol --apply")), 0);
  VORNScheduleRecord evening = Hourly();
  evening.weekdays = 1 << 1 | 1 << 5;
  evening.startHour = 20;
  evening.intervalHours = 2;
  ASSERT_GE(Set(evening), 0);
  EXPECT_EQ(NamesIn(kFolder).size(), 2U);
  EXPECT_EQ(ReadText(CronFileOf(kCommand)),
            kHeader + std::string("0 20-23/2 * * 1,5 root /usr/vorn/sbin/vornrun /tmp/vorntimecontrol --schedule\n"));
  EXPECT_EQ(ReadText(CronFileOf("/tmp/vorntimecontrol --apply")), Line("/tmp/vorntimecontrol --apply"));
}

TEST_F(CronTask, Set_TheSameTaskAgainLeavesTheFileAsItIs) {
  ASSERT_GE(Set(Hourly()), 0);
  const struct stat before = StatOf(CronFileOf(kCommand));
  ASSERT_GE(Set(Hourly()), 0);
  EXPECT_EQ(StatOf(CronFileOf(kCommand)).st_ino, before.st_ino);
}

TEST_F(CronTask, Set_HoursAreWrittenAsCronWantsThem) {
  VORNScheduleRecord record = Hourly();
  record.startHour = record.lastHour = 7;
  EXPECT_THAT(vornhost::RenderTask(record), testing::Optional(testing::HasSubstr("\n0 7 * * * root ")));
  record = Hourly();
  record.startHour = 8;
  EXPECT_THAT(vornhost::RenderTask(record), testing::Optional(testing::HasSubstr("\n0 8-23/1 * * * root ")));
  record = Hourly();
  record.intervalHours = 6;
  EXPECT_THAT(vornhost::RenderTask(record), testing::Optional(testing::HasSubstr("\n0 0-23/6 * * * root ")));
}

TEST_F(CronTask, Set_FieldOutOfItsRangeIsRefused) {
  const auto refused = [](void (*change)(VORNScheduleRecord &)) {
    VORNScheduleRecord record = Hourly();
    change(record);
    return Set(record) < 0 && QARDCErrGet() == QARDC_ERR_BAD_ARGUMENT;
  };
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.weekdays = 0; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.weekdays = 128; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.weekdays = -1; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.startHour = -1; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.startHour = 24; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.lastHour = 24; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) {
    record.startHour = 10;
    record.lastHour = 9;
  }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.intervalHours = 0; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.intervalHours = 25; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.reserved[0] = 1; }));
  EXPECT_TRUE(refused([](VORNScheduleRecord &record) { record.reserved[1] = 1; }));
  const VORNScheduleRecord good = Hourly();
  EXPECT_LT(VORNScheduleSet(&good, 1), 0);
  EXPECT_LT(VORNScheduleSet(nullptr, 0), 0);
  EXPECT_THAT(NamesIn(kFolder), IsEmpty());
}

TEST_F(CronTask, Set_CommandThatCronOrItsShellWouldChangeIsRefused) {
  for (const std::string &command : std::vector<std::string>{"",
                                                             "relative",
                                                             " /tmp/x",
                                                             "/tmp/x\n* * * * * root /tmp/y",
                                                             "/tmp/x\r",
                                                             "/tmp/x %",
                                                             "/tmp/x;id",
                                                             "/tmp/x $(id)",
                                                             "/tmp/x `id`",
                                                             "/tmp/x | y",
                                                             "/tmp/x > y",
                                                             "/tmp/x & y",
                                                             "/tmp/x 'y'",
                                                             "/tmp/x \"y\"",
                                                             "/tmp/x \\y",
                                                             "/tmp/x\ty",
                                                             "/tmp/x *",
                                                             "/tmp/x ~",
                                                             "/tmp/\xc3\xa4",
                                                             "/" + std::string(960, 'x'),
                                                             "/" + std::string(1022, 'x'),
                                                             "/" + std::string(1023, 'x')}) {
    EXPECT_LT(Set(Hourly(command)), 0) << command;
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  }
  EXPECT_THAT(NamesIn(kFolder), IsEmpty());
  EXPECT_GE(Set(Hourly("/" + std::string(959, 'x'))), 0);
}

TEST_F(CronTask, Set_CommandsThatLookAlikeHaveFilesOfTheirOwn) {
  for (const char *command : {"/a b", "/a-b", "/a_b", "/a/b", "/a.b", "/A b"}) {
    ASSERT_GE(Set(Hourly(command)), 0);
  }
  EXPECT_EQ(NamesIn(kFolder).size(), 6U);
  EXPECT_EQ(ReadText(CronFileOf("/a/b")), Line("/a/b"));
}

TEST_F(CronTask, Set_AFileThatCronWouldPassOverIsMadeAnew) {
  ASSERT_GE(Set(Hourly()), 0);
  ASSERT_EQ(chmod(CronFileOf(kCommand).c_str(), 0664), 0);
  ASSERT_GE(Set(Hourly()), 0);
  EXPECT_EQ(StatOf(CronFileOf(kCommand)).st_mode & 07777U, 0644U);
  EXPECT_EQ(ReadText(CronFileOf(kCommand)), Line(kCommand));
}

TEST_F(CronTask, AnEmptyFileIsTakenAndRemoved) {
  const std::string path = CronFileOf(kCommand);
  WriteText(path, "");
  EXPECT_GE(Set(Hourly()), 0);
  WriteText(path, "");
  EXPECT_GE(VORNScheduleRemove(kCommand), 0);
  EXPECT_NE(access(path.c_str(), F_OK), 0);
}

TEST_F(CronTask, AnothersFileOfThatNameIsNotTouched) {
  const std::string path = CronFileOf(kCommand);
  WriteText(path, "# mine\n");
  ASSERT_EQ(chmod(path.c_str(), 0600), 0); // as cron would pass it over
  EXPECT_LT(Set(Hourly()), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_ACCESS);
  EXPECT_LT(VORNScheduleRemove(kCommand), 0);
  EXPECT_EQ(ReadText(path), "# mine\n");
  ASSERT_EQ(unlink(path.c_str()), 0);
  WriteText("/etc/elsewhere", "# mine\n");
  ASSERT_EQ(symlink("/etc/elsewhere", path.c_str()), 0);
  EXPECT_LT(Set(Hourly()), 0);
  EXPECT_LT(VORNScheduleRemove(kCommand), 0);
  EXPECT_EQ(ReadText("/etc/elsewhere"), "# mine\n");
}

TEST_F(CronTask, Remove_TakesThatTaskAndNothingElse) {
  WriteText(std::string(kFolder) + "/other", "# mine\n");
  ASSERT_GE(Set(Hourly()), 0);
  ASSERT_GE(Set(Hourly("/tmp/other")), 0);
  EXPECT_GE(VORNScheduleRemove(kCommand), 0);
  EXPECT_EQ(ReadText(CronFileOf(kCommand)), "<no file>");
  EXPECT_EQ(NamesIn(kFolder).size(), 2U);
}

TEST_F(CronTask, Remove_ATaskThatIsNotThereIsNoError) {
  EXPECT_GE(VORNScheduleRemove(kCommand), 0);
  EXPECT_GE(VORNScheduleRemove("no command at all; $(id)"), 0);
  EXPECT_GE(VORNScheduleRemove(""), 0);
  EXPECT_LT(VORNScheduleRemove(nullptr), 0);
  std::filesystem::remove_all(kFolder);
  EXPECT_GE(VORNScheduleRemove(kCommand), 0);
}

TEST_F(CronTask, Set_WithoutCronsFolderFails) {
  std::filesystem::remove_all(kFolder);
  EXPECT_LT(Set(Hourly()), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
}

} // namespace
