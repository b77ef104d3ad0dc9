// The time control over the real kernel, in a network of its own, at the real time: the schedules are all '1' or all
// '0'.
#include "host/timecontrol/control.h"
#include "host/timecontrol/firewall.h"
#include "host/timecontrol/neighbours.h"
#include "host/utility/program_runner.h"
#include "tests/host/files.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <sstream>
#include <thread>

namespace {

using hosttest::TakeLogLines;
using hosttest::WriteText;
using testing::Contains;
using testing::ElementsAre;
using testing::Eq;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::Optional;
using vornhost::MacSet;
using vornhost::ReadTable;

constexpr char kRules[] = "/tmp/timectrl.conf";
constexpr char kLaptop[] = "d4:3d:7e:11:22:33";
constexpr char kPrinter[] = "3c:2a:f4:11:22:44";

std::string Rule(const std::string &mac, char mark) {
  return "[" + mac + "]\n\tname=n\n\ttc_sched=" + std::string(168, mark) + "\n";
}

// What a command prints. For looking only, so that a shell does no harm.
std::string Output(const std::string &command) {
  FILE *pipe = popen((command + " 2>&1").c_str(), "r");
  std::string text;
  std::array<char, 4096> part{};
  while (std::fgets(part.data(), part.size(), pipe) != nullptr) {
    text += part.data();
  }
  pclose(pipe);
  return text;
}

std::string Ruleset() {
  return Output("/usr/sbin/nft -a list ruleset");
}

class TimeControl : public testing::Test {
protected:
  void SetUp() override {
    Output("/usr/sbin/nft flush ruleset");
    unlink("/run/vorntimecontrol.state");
    unlink(kRules);
    TakeLogLines();
  }
};

TEST_F(TimeControl, Apply_CutsTheDevicesWhoseHourItIs) {
  WriteText(kRules, Rule(kLaptop, '1') + Rule(kPrinter, '0'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
  EXPECT_THAT(TakeLogLines(), ElementsAre("6 time control: 1 devices are cut"));
}

TEST_F(TimeControl, Apply_DropsWhatIsForwardedInBothDirectionsAndFamilies) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_EQ(Output("/usr/sbin/nft list chain inet vorn_timecontrol forward"),
            "table inet vorn_timecontrol {\n"
            "\tchain forward {\n"
            "\t\ttype filter hook forward priority filter - 10; policy accept;\n"
            "\t\tether saddr @cut drop\n"
            "\t\tip daddr @cut4 drop\n"
            "\t\tip6 daddr @cut6 drop\n"
            "\t}\n"
            "}\n");
}

TEST_F(TimeControl, Apply_WithNobodyToCutLoadsTheTableAllTheSame) {
  WriteText(kRules, "");
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{})));
}

TEST_F(TimeControl, Apply_TakesItsTableOnly) {
  Output("/usr/sbin/nft add table inet other");
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_EQ(Output("/usr/sbin/nft list tables"), "table inet other\ntable inet vorn_timecontrol\n");
  ASSERT_EQ(vornhost::DisableTimeControl(), 0);
  EXPECT_EQ(Output("/usr/sbin/nft list tables"), "table inet other\n");
}

TEST_F(TimeControl, Apply_ABadRuleCostsNoOther) {
  WriteText(kRules, Rule("}; flush ruleset; {", '1') + Rule("01:00:5e:00:00:01", '1') + Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
  EXPECT_THAT(TakeLogLines(), Contains(HasSubstr("rule [}; flush ruleset; {] is left out")));
}

TEST_F(TimeControl, Apply_WithoutTheRulesLeavesTheTableAsItIs) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  const std::string before = Ruleset();
  unlink(kRules);
  EXPECT_LT(vornhost::ApplyTimeControl(), 0);
  EXPECT_LT(vornhost::ScheduleTimeControl(), 0);
  EXPECT_EQ(Ruleset(), before);
  EXPECT_THAT(TakeLogLines(), Contains("3 time control: /tmp/timectrl.conf cannot be read, or is not root's alone"));
}

TEST_F(TimeControl, Apply_RulesThatOthersMayWriteAreNotTaken) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(chmod(kRules, 0666), 0);
  EXPECT_LT(vornhost::ApplyTimeControl(), 0);
  unlink(kRules);
  WriteText("/tmp/elsewhere", Rule(kLaptop, '1'));
  ASSERT_EQ(symlink("/tmp/elsewhere", kRules), 0);
  EXPECT_LT(vornhost::ApplyTimeControl(), 0);
  EXPECT_FALSE(ReadTable());
}

TEST_F(TimeControl, Apply_FiveHundredDevicesInUnderTwoTenthsOfASecond) {
  std::string rules;
  for (int i = 0; i < 500; ++i) {
    char mac[18];
    std::snprintf(mac, sizeof(mac), "02:00:00:00:%02x:%02x", i / 256, i % 256);
    rules += Rule(mac, '1');
  }
  WriteText(kRules, rules);
  const auto begin = std::chrono::steady_clock::now();
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  const auto took = std::chrono::steady_clock::now() - begin;
  EXPECT_EQ(ReadTable().value_or(MacSet{}).size(), 500U);
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
  EXPECT_LT(took, std::chrono::milliseconds(200));
#endif
  RecordProperty("milliseconds", static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(took).count()));
}

TEST_F(TimeControl, Apply_KnowsTheDevicesAddressesFromTheStart) {
  Output("ip link add lbr0 type bridge; ip link set lbr0 up; ip addr add 192.168.1.1/24 dev lbr0;"
         "ip neigh add 192.168.1.10 lladdr d4:3d:7e:11:22:33 dev lbr0;"
         "ip neigh add 192.168.1.11 lladdr 3c:2a:f4:11:22:44 dev lbr0;"
         "ip neigh add 2001:db8:2::10 lladdr d4:3d:7e:11:22:33 dev lbr0");
  EXPECT_THAT(vornhost::AddressesOf({kLaptop}), testing::UnorderedElementsAre("192.168.1.10", "2001:db8:2::10"));
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  const std::string ruleset = Ruleset();
  EXPECT_THAT(ruleset, HasSubstr("elements = { 192.168.1.10 "));
  EXPECT_THAT(ruleset, HasSubstr("elements = { 2001:db8:2::10 "));
  EXPECT_THAT(ruleset, Not(HasSubstr("192.168.1.11")));
  Output("ip link del lbr0");
}

TEST_F(TimeControl, Schedule_TouchesNothingWhenNothingChanges) {
  WriteText(kRules, Rule(kLaptop, '1') + Rule(kPrinter, '0'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  const std::string before = Ruleset(); // with the handles, which every change renews
  TakeLogLines();
  const struct stat state = hosttest::StatOf("/run/vorntimecontrol.state");
  ASSERT_EQ(vornhost::ScheduleTimeControl(), 0);
  EXPECT_EQ(Ruleset(), before);
  EXPECT_THAT(TakeLogLines(), IsEmpty());
  EXPECT_EQ(hosttest::StatOf("/run/vorntimecontrol.state").st_mtim.tv_nsec, state.st_mtim.tv_nsec);
}

TEST_F(TimeControl, Schedule_BringsTheTableToThePresentHour) {
  WriteText(kRules, Rule(kLaptop, '1') + Rule(kPrinter, '0'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  WriteText(kRules, Rule(kLaptop, '0') + Rule(kPrinter, '1')); // as if an hour had passed
  ASSERT_EQ(vornhost::ScheduleTimeControl(), 0);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kPrinter})));
}

TEST_F(TimeControl, Schedule_PutsBackATableThatSomebodyFlushed) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  Output("/usr/sbin/nft flush ruleset");
  ASSERT_EQ(vornhost::ScheduleTimeControl(), 0);
  EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
}

TEST_F(TimeControl, Schedule_PutsBackARuleThatSomebodyTookOut) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  for (const char *damage : {"flush chain inet vorn_timecontrol forward", "flush chain inet vorn_timecontrol learn",
                             "add element inet vorn_timecontrol cut '{ 3c:2a:f4:11:22:44 comment \"mine\" }'"}) {
    ASSERT_EQ(Output(std::string("/usr/sbin/nft ") + damage), "") << damage;
    EXPECT_THAT(ReadTable(), Not(Optional(Eq(MacSet{kLaptop})))) << damage;
    ASSERT_EQ(vornhost::ScheduleTimeControl(), 0);
    EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop}))) << damage;
  }
}

TEST_F(TimeControl, Schedule_ThatComesAfterTheEndCutsNobody) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ScheduleTimeControl(), 0) << "enforcement was never begun";
  EXPECT_FALSE(ReadTable());
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  ASSERT_EQ(vornhost::DisableTimeControl(), 0);
  ASSERT_EQ(vornhost::ScheduleTimeControl(), 0);
  EXPECT_FALSE(ReadTable());
}

TEST_F(TimeControl, Schedule_WaitsForTheChangeThatIsUnderWay) {
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  Output("/usr/sbin/nft flush ruleset");
  const int other = open("/run/vorntimecontrol.state", O_RDWR | O_CLOEXEC);
  ASSERT_EQ(flock(other, LOCK_EX), 0);
  std::thread run([] { EXPECT_EQ(vornhost::ScheduleTimeControl(), 0); });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  EXPECT_FALSE(ReadTable());
  ASSERT_EQ(ftruncate(other, 0), 0); // the other one ends enforcement
  close(other);
  run.join();
  EXPECT_FALSE(ReadTable());
}

TEST_F(TimeControl, Disable_IsRightHoweverOften) {
  EXPECT_EQ(vornhost::DisableTimeControl(), 0);
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  EXPECT_EQ(vornhost::DisableTimeControl(), 0);
  EXPECT_EQ(vornhost::DisableTimeControl(), 0);
  EXPECT_EQ(Ruleset(), "");
}

// The change that it begins could not be written, and the stored rules would be enforced by nobody.
TEST_F(TimeControl, Disable_OnADiskThatTakesNothingLeavesTheRulesEnforced) {
  std::filesystem::create_directories("/etc/parental");
  WriteText(kRules, Rule(kLaptop, '1'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  for (const char *folder : {"/etc/parental", "/etc/cron.d"}) {
    for (const char *options : {"size=64k", "ro"}) {
      const std::string mount = std::string("/bin/mount -t tmpfs -o ") + options + " small " + folder;
      Output(mount.c_str());
      EXPECT_EQ(vornhost::DisableTimeControl(), -1) << mount;
      EXPECT_THAT(ReadTable(), Optional(Eq(MacSet{kLaptop})));
      EXPECT_THAT(TakeLogLines(), Contains(HasSubstr(std::string("stays on, ") + folder + " takes no files: ")));
      Output((std::string("/bin/umount ") + folder).c_str());
    }
  }
  EXPECT_EQ(vornhost::DisableTimeControl(), 0);
  EXPECT_FALSE(ReadTable());
}

TEST_F(TimeControl, Show_TellsWhatIsCutAndUntilWhen) {
  std::ostringstream off;
  ASSERT_EQ(vornhost::ShowTimeControl(off), 0);
  EXPECT_EQ(off.str(), "Time control is off.\n");
  WriteText(kRules, Rule(kLaptop, '1') + Rule(kPrinter, '0'));
  ASSERT_EQ(vornhost::ApplyTimeControl(), 0);
  std::ostringstream on;
  ASSERT_EQ(vornhost::ShowTimeControl(on), 0);
  EXPECT_THAT(on.str(), HasSubstr("d4:3d:7e:11:22:33  cut  n\n3c:2a:f4:11:22:44  free  n\n"));
  EXPECT_THAT(on.str(), Not(HasSubstr("otherwise")));
  Output("/usr/sbin/nft flush ruleset");
  std::ostringstream flushed;
  ASSERT_EQ(vornhost::ShowTimeControl(flushed), 0);
  EXPECT_THAT(flushed.str(), HasSubstr("The packet filter says otherwise"));
}

} // namespace
