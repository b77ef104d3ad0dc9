// vorntimecontrol and iptablestool as they are installed and copied, at a chosen time and in a chosen zone.
#include "host/schedule/cron_task.h"
#include "host/timecontrol/firewall.h"
#include "tests/host/files.h"
#include "tests/host/schedule/utc.h"

#include <gmock/gmock.h>

#include <sys/mount.h>
#include <sys/utsname.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <thread>

namespace {

using hosttest::FreshFolder;
using hosttest::NamesIn;
using hosttest::ReadText;
using hosttest::Utc;
using hosttest::WriteText;
using testing::ElementsAre;
using testing::Eq;
using testing::HasSubstr;
using testing::Not;
using testing::Optional;
using vornhost::MacSet;
using vornhost::ReadTable;

constexpr char kCopy[] = "/tmp/vorntimecontrol";
constexpr char kInstalled[] = "/usr/vorn/sbin/vorntimecontrol";
constexpr char kTool[] = "/usr/vorn/bin/iptablestool";
constexpr char kLaptop[] = "d4:3d:7e:11:22:33";
constexpr char kCommand[] = "/tmp/vorntimecontrol --schedule";

int RunLine(const std::string &command) {
  const int status = std::system((command + " >/tmp/output 2>&1").c_str());
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

// A command whose clock begins at that moment.
int RunAt(const std::string &zone, std::time_t moment, const std::string &command) {
  const std::string offset = std::to_string(moment - std::time(nullptr));
  return RunLine("env TZ=" + zone + " FAKETIME=" + (offset[0] == '-' ? "" : "+") + offset +
                 " LD_PRELOAD=" FAKE_TIME " ASAN_OPTIONS=verify_asan_link_order=0:detect_leaks=0 " + command);
}

void ScheduleEveryHour() {
  VORNScheduleRecord record{};
  record.weekdays = 127;
  record.intervalHours = 1;
  record.lastHour = 23;
  std::snprintf(record.command, sizeof(record.command), "%s", kCommand);
  ASSERT_GE(VORNScheduleSet(&record, 0), 0);
}

std::string Marked(std::initializer_list<int> slots) {
  std::string schedule(168, '0');
  for (const int slot : slots) {
    schedule[static_cast<size_t>(slot)] = '1';
  }
  return schedule;
}

std::string Section(const std::string &mac, const std::string &keys) {
  return "[" + mac + "]\n" + keys;
}

void WriteRules(const std::string &schedule) {
  WriteText("/tmp/timectrl.conf", Section(kLaptop, "\tname=Anna\n\ttc_sched=" + schedule + "\n"));
}

class TimeProgram : public testing::Test {
protected:
  // The library that moves the clock leaves files there when its process is killed.
  static void SetUpTestSuite() { ASSERT_EQ(mount("shm", "/dev/shm", "tmpfs", 0, "mode=1777"), 0); }
  static void TearDownTestSuite() { umount("/dev/shm"); }

  void SetUp() override {
    ASSERT_EQ(access(FAKE_TIME, R_OK), 0) << "package libfaketime";
    std::filesystem::create_directories("/usr/vorn/sbin");
    std::filesystem::create_directories("/usr/vorn/bin");
    const auto replace = std::filesystem::copy_options::overwrite_existing;
    std::filesystem::copy_file(TIME_CONTROL, kInstalled, replace);
    std::filesystem::copy_file(TIME_CONTROL, kCopy, replace);
    std::filesystem::copy_file(MODULE_TOOL, kTool, replace);
    std::filesystem::copy_file(RUNNER, "/usr/vorn/sbin/vornrun", replace);
    FreshFolder("/etc/cron.d");
    FreshFolder("/etc/parental");
    RunLine("/usr/sbin/nft flush ruleset");
    unlink("/run/vorntimecontrol.state");
    unlink("/tmp/timectrl.conf");
  }

  // Whether the laptop is cut after the hourly run at that time.
  static bool IsCutAt(const std::string &zone, std::time_t moment) {
    EXPECT_EQ(RunAt(zone, moment, kCommand), 0);
    const auto cut = ReadTable();
    EXPECT_TRUE(cut.has_value());
    return cut == MacSet{kLaptop};
  }

  static void Begin(const std::string &schedule) {
    WriteRules(schedule);
    ASSERT_EQ(RunLine(std::string(kCopy) + " --apply"), 0);
  }
};

TEST_F(TimeProgram, CutsFromTheFirstSecondOfAnHourToItsLast) {
  Begin(Marked({24 + 20})); // Monday, 20:00
  EXPECT_FALSE(IsCutAt("UTC", Utc(3, 4, 19, 59, 57)));
  EXPECT_TRUE(IsCutAt("UTC", Utc(3, 4, 20, 0, 1)));
  EXPECT_TRUE(IsCutAt("UTC", Utc(3, 4, 20, 59, 57)));
  EXPECT_FALSE(IsCutAt("UTC", Utc(3, 4, 21, 0, 1)));
  EXPECT_FALSE(IsCutAt("UTC", Utc(3, 5, 20, 30))) << "Tuesday";
}

TEST_F(TimeProgram, AWindowPastMidnightAndTheWeeksEndIsOnePiece) {
  Begin(Marked({6 * 24 + 22, 6 * 24 + 23, 0, 1})); // Saturday 22:00 to Sunday 02:00, an hour earlier in UTC
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 9, 20, 59, 57)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 9, 21, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 9, 22, 59, 57)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 9, 23, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 10, 0, 59, 57)));
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 10, 1, 0, 1)));
}

TEST_F(TimeProgram, InSpringTheHourAfterTheGapIsCutAtOnce) {
  Begin(Marked({3})); // Sunday, 03:00, which follows 01:59
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 31, 0, 59, 57)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 31, 1, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(3, 31, 1, 59, 57)));
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 31, 2, 0, 1)));
}

TEST_F(TimeProgram, InSpringTheHourThatIsLeftOutCutsNothing) {
  Begin(Marked({2}));
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 31, 0, 59, 57)));
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(3, 31, 1, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(4, 7, 0, 0, 1))) << "a week later";
}

TEST_F(TimeProgram, InAutumnTheRepeatedHourIsCutBothTimes) {
  Begin(Marked({2})); // Sunday, 02:00: from midnight UTC on, for two hours
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(10, 26, 23, 59, 57)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(10, 27, 0, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(10, 27, 0, 59, 57)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(10, 27, 1, 0, 1)));
  EXPECT_TRUE(IsCutAt("Europe/Berlin", Utc(10, 27, 1, 59, 57)));
  EXPECT_FALSE(IsCutAt("Europe/Berlin", Utc(10, 27, 2, 0, 1)));
}

TEST_F(TimeProgram, AClockThatWasNeverSetCutsNothingAndSaysSo) {
  Begin(std::string(168, '1'));
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
  EXPECT_FALSE(IsCutAt("UTC", 10));
  EXPECT_EQ(RunAt("UTC", 10, std::string(kCopy) + " --status"), 0);
  EXPECT_EQ(ReadText("/tmp/output"), "Time control is on. The clock was never set: nothing is cut.\n"
                                     "d4:3d:7e:11:22:33  free  Anna\n");
  EXPECT_TRUE(IsCutAt("UTC", Utc(1, 1, 0, 0, 10))) << "once it is set";
}

TEST_F(TimeProgram, StatusTellsTheHourAndTheNextChange) {
  Begin(Marked({24 + 20, 24 + 21}));
  ASSERT_EQ(RunAt("UTC", Utc(3, 4, 20, 15), kCommand), 0);
  ASSERT_EQ(RunAt("UTC", Utc(3, 4, 20, 15), std::string(kCopy) + " --status"), 0);
  EXPECT_EQ(ReadText("/tmp/output"), "Time control is on. It is Monday 20:00\n"
                                     "d4:3d:7e:11:22:33  cut until Monday 22:00  Anna\n");
  ASSERT_EQ(RunAt("UTC", Utc(3, 4, 22, 15), std::string(kCopy) + " --status"), 0);
  EXPECT_EQ(ReadText("/tmp/output"), "Time control is on. It is Monday 22:00\n"
                                     "d4:3d:7e:11:22:33  free until Monday 20:00  Anna\n"
                                     "The packet filter says otherwise; --schedule puts it right.\n");
}

TEST_F(TimeProgram, TheCopyNeedsNoLibraryOfOurs) {
  ASSERT_EQ(RunLine(std::string("ldd ") + kCopy), 0);
  EXPECT_THAT(ReadText("/tmp/output"), HasSubstr("libnftables"));
  EXPECT_THAT(ReadText("/tmp/output"), Not(HasSubstr("vorn")));
  EXPECT_THAT(ReadText("/tmp/output"), Not(HasSubstr("not found")));
}

TEST_F(TimeProgram, AnythingElseIsAnsweredWithTheUsage) {
  for (const char *arguments : {"", "--apply --schedule", "apply", "--APPLY", "--help"}) {
    EXPECT_EQ(RunLine(std::string(kCopy) + " " + arguments), 2);
    EXPECT_THAT(ReadText("/tmp/output"), HasSubstr("usage: vorntimecontrol "));
  }
  EXPECT_FALSE(ReadTable());
}

TEST_F(TimeProgram, RestoreEnforcesTheStoredRules) {
  const std::string keys = "\tname=Anna\n\ttc_sched=" + std::string(168, '1') + "\n";
  WriteText("/etc/parental/timectrl.ui.conf",
            Section(kLaptop, "\ttcenable=yes\n" + keys) + Section("3c:2a:f4:11:22:44", "\ttcenable=no\n" + keys));
  unlink(kCopy); // a restart has emptied /tmp
  ASSERT_EQ(RunLine(std::string(kInstalled) + " --restore"), 0) << ReadText("/tmp/output");
  EXPECT_EQ(ReadText("/etc/parental/timectrl.conf"), Section(kLaptop, keys));
  EXPECT_EQ(ReadText("/tmp/timectrl.conf"), Section(kLaptop, keys));
  EXPECT_EQ(ReadText(kCopy), ReadText(kInstalled));
  EXPECT_EQ(NamesIn("/etc/cron.d").size(), 1U);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
  EXPECT_EQ(RunLine(kCommand), 0);
}

// As a set over the web API makes them: the same after a restart as before it.
TEST_F(TimeProgram, RestoreReadsRepeatedAndIncompleteSectionsAsASetDoes) {
  const std::string day(168, '1');
  WriteText("/etc/parental/timectrl.ui.conf", Section(kLaptop, "\ttcenable=yes\n\tname=A\n\ttc_sched=" + day + "\n") +
                                                  Section(kLaptop, "\ttcenable=no\n\tname=B\n\ttc_sched=0\n") +
                                                  Section("3c:2a:f4:11:22:44", "\ttcenable=yes\n\tname=C\n"));
  ASSERT_EQ(RunLine(std::string(kInstalled) + " --restore"), 0) << ReadText("/tmp/output");
  const std::string laptop = Section(kLaptop, "\tname=A\n\ttc_sched=" + day + "\n");
  EXPECT_EQ(ReadText("/etc/parental/timectrl.conf"),
            laptop + laptop + Section("3c:2a:f4:11:22:44", "\tname=C\n\ttc_sched=" + day + "\n"));
}

TEST_F(TimeProgram, RestoreUsesNothingThatSomebodyElseHasPutInTheWay) {
  WriteText("/etc/parental/timectrl.ui.conf",
            Section(kLaptop, "\ttcenable=yes\n\tname=A\n\ttc_sched=" + std::string(168, '1') + "\n"));
  for (const char *path : {"/tmp/timectrl.conf", kCopy}) {
    unlink(path);
    WriteText(path, "theirs\n");
    ASSERT_EQ(chmod(path, 0666), 0);
  }
  ASSERT_EQ(RunLine(std::string(kInstalled) + " --restore"), 0) << ReadText("/tmp/output");
  EXPECT_EQ(ReadText(kCopy), ReadText(kInstalled));
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
}

TEST_F(TimeProgram, RestoreWithoutARuleThatIsOnLeavesNothing) {
  Begin(std::string(168, '1'));
  WriteText("/etc/parental/timectrl.ui.conf", Section(kLaptop, "\ttcenable=no\n\tname=n\n\ttc_sched=1\n"));
  WriteText("/etc/parental/timectrl.conf", "left over");
  WriteText("/etc/cron.d/other", "# mine\n");
  ScheduleEveryHour();
  ASSERT_EQ(RunLine(std::string(kInstalled) + " --restore"), 0);
  EXPECT_FALSE(ReadTable());
  EXPECT_THAT(NamesIn("/etc/cron.d"), ElementsAre("other"));
  EXPECT_THAT(NamesIn("/etc/parental"), ElementsAre("timectrl.ui.conf"));
  EXPECT_EQ(access("/tmp/timectrl.conf", F_OK), -1);
  EXPECT_EQ(access(kCopy, F_OK), -1);
}

TEST_F(TimeProgram, TheSchedulersRunnerRunsOnlyWhatIsRootsAlone) {
  const std::string run = "/usr/vorn/sbin/vornrun ";
  EXPECT_EQ(RunLine(run + kCommand), 0);
  EXPECT_EQ(RunLine(run + "/bin/false"), 1);
  ASSERT_EQ(chmod(kCopy, 0777), 0);
  EXPECT_EQ(RunLine(run + kCommand), 126);
  ASSERT_EQ(unlink(kCopy), 0);
  EXPECT_EQ(RunLine(run + kCommand), 126);
  EXPECT_EQ(RunLine(run), 126);
}

// Cron itself, with a clock that stands shortly before the full hour.
TEST_F(TimeProgram, CronRunsTheTaskAtTheFullHour) {
  ASSERT_EQ(access("/usr/sbin/cron", X_OK), 0) << "package cron";
  if (!ReadText("/proc/self/uid_map").ends_with("4294967295\n")) {
    GTEST_SKIP() << "cron runs nothing for the root of a user namespace";
  }
  Begin(std::string(168, '1'));
  ScheduleEveryHour();
  RunLine("/usr/sbin/nft flush ruleset"); // the run will put the table back
  std::filesystem::create_directories("/var/spool/cron/crontabs");
  const pid_t cron = fork();
  if (cron == 0) {
    setenv("TZ", "UTC", 1);
    setenv("FAKETIME", "@2030-03-04 19:59:57", 1);
    setenv("LD_PRELOAD", FAKE_TIME, 1);
    execl("/usr/sbin/cron", "cron", "-f", nullptr);
    _exit(127);
  }
  for (int round = 0; round < 150 && !ReadTable(); ++round) {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
  kill(cron, SIGKILL);
  waitpid(cron, nullptr, 0);
}

constexpr char kLoad[] = " --insmod timectrl x_tables.ko ip_tables.ko iptable_filter.ko xt_mac.ko xt_tcpudp.ko";
constexpr char kUnload[] = " --rmmod timectrl xt_tcpudp.ko xt_mac.ko iptable_filter.ko ip_tables.ko x_tables.ko";

class ModuleTool : public TimeProgram {
protected:
  void SetUp() override {
    TimeProgram::SetUp();
    utsname kernel{};
    uname(&kernel);
    folder_ = FreshFolder(std::string("/usr/lib/modules/") + kernel.release);
    WriteText("/usr/sbin/modprobe.fake", "#!/bin/sh\necho \"$@\" >> /tmp/loaded\n[ \"$2\" != broken ]\n");
    chmod("/usr/sbin/modprobe.fake", 0755);
    std::filesystem::remove("/usr/sbin/modprobe");
    std::filesystem::rename("/usr/sbin/modprobe.fake", "/usr/sbin/modprobe");
    unlink("/tmp/loaded");
  }

  std::string folder_;
};

TEST_F(ModuleTool, WhatTheKernelHasBuiltInCountsAsLoaded) {
  WriteText(folder_ + "/modules.builtin", "kernel/net/netfilter/x_tables.ko\nkernel/net/ipv4/netfilter/ip_tables.ko\n"
                                          "kernel/net/ipv4/netfilter/iptable_filter.ko\n"
                                          "kernel/net/netfilter/xt_mac.ko\nkernel/net/netfilter/xt_tcpudp.ko\n");
  EXPECT_EQ(RunLine(std::string(kTool) + kLoad), 0);
  EXPECT_EQ(ReadText("/tmp/loaded"), "<no file>");
  EXPECT_EQ(RunLine(std::string(kTool) + kUnload), 0);
}

TEST_F(ModuleTool, WhatIsLoadedAlreadyCountsAsLoaded) {
  ASSERT_TRUE(std::filesystem::exists("/sys/module/kernel"));
  EXPECT_EQ(RunLine(std::string(kTool) + " --insmod g kernel.ko"), 0);
  EXPECT_EQ(ReadText("/tmp/loaded"), "<no file>");
}

TEST_F(ModuleTool, TheOthersAreLoadedInOrderUntilOneCannotBe) {
  EXPECT_EQ(RunLine(std::string(kTool) + " --insmod g vorn_one.ko vorn-two.ko broken.ko vorn_three.ko"), 1);
  EXPECT_EQ(ReadText("/tmp/loaded"), "-- vorn_one\n-- vorn_two\n-- broken\n");
}

TEST_F(ModuleTool, AModuleOfALikeNameDoesNotCount) {
  WriteText(folder_ + "/modules.builtin", "kernel/net/netfilter/xt_vorn_one.ko\nkernel/vorn_one.ko.old\n");
  EXPECT_EQ(RunLine(std::string(kTool) + " --insmod g vorn_one.ko"), 0);
  EXPECT_EQ(ReadText("/tmp/loaded"), "-- vorn_one\n");
}

TEST_F(ModuleTool, UnloadingWhatIsNotLoadedIsNoError) {
  EXPECT_EQ(RunLine(std::string(kTool) + " --rmmod g vorn_one.ko"), 0);
}

TEST_F(ModuleTool, AnythingElseIsAnsweredWithTheUsageAndLoadsNothing) {
  for (const char *arguments :
       {"", "--insmod", "--insmod g", "--insmod g x_tables", "--insmod g ../x.ko", "--insmod g -r.ko", "--insmod g .ko",
        "--insmod '' x.ko", "--insmod -g x.ko", "--load g x.ko", "--insmod g 'a b.ko'", "--insmod g x.ko y"}) {
    EXPECT_EQ(RunLine(std::string(kTool) + " " + arguments), 2) << arguments;
  }
  EXPECT_EQ(ReadText("/tmp/loaded"), "<no file>");
}

} // namespace
