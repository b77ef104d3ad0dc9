#include "host/schedule/local_time.h"
#include "host/timecontrol/firewall.h"
#include "host/timecontrol/rules.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

namespace {

using hosttest::TakeLogLines;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Optional;
using vornhost::CanonicalMac;
using vornhost::CutIn;
using vornhost::IsMarked;
using vornhost::ParseRules;

const std::string kWeek(168, '1');

std::string Section(const std::string &mac, const std::string &schedule = kWeek, const std::string &name = "n") {
  return "[" + mac + "]\n\tname=" + name + "\n\ttc_sched=" + schedule + "\n";
}

TEST(CanonicalMac, TakesTheUsualWays) {
  EXPECT_THAT(CanonicalMac("d4:3d:7e:11:22:33"), Optional(std::string("d4:3d:7e:11:22:33")));
  EXPECT_THAT(CanonicalMac("D4:3D:7E:AB:CD:EF"), Optional(std::string("d4:3d:7e:ab:cd:ef")));
  EXPECT_THAT(CanonicalMac("d4-3d-7e-11-22-33"), Optional(std::string("d4:3d:7e:11:22:33")));
  EXPECT_THAT(CanonicalMac("02:00:00:00:00:00"), Optional(std::string("02:00:00:00:00:00"))) << "a private address";
}

TEST(CanonicalMac, RefusesWhatIsNoDevices) {
  for (const char *text : {"", "d4:3d:7e:11:22", "d4:3d:7e:11:22:3", "d4:3d:7e:11:22:33:44", "d43d7e112233",
                           "d4:3d-7e:11:22:33", "g4:3d:7e:11:22:33", "d4:3d:7e:11:22:3g", " d4:3d:7e:11:22:33",
                           "d4.3d.7e.11.22.33", "d4:3d:7e:11:22:33\n", "d4:3d:7e:11:22;33", "00:00:00:00:00:00",
                           "01:00:5e:00:00:01", "33:33:00:00:00:01", "ff:ff:ff:ff:ff:ff", "0x:3d:7e:11:22:33"}) {
    EXPECT_FALSE(CanonicalMac(text)) << text;
  }
}

TEST(IsMarked, IsTheCharacterOfTheSlotAndNothingBeyondTheEnd) {
  EXPECT_TRUE(IsMarked("01", 1));
  EXPECT_FALSE(IsMarked("01", 0));
  EXPECT_FALSE(IsMarked("01", 2));
  EXPECT_FALSE(IsMarked("", 0));
  EXPECT_FALSE(IsMarked(kWeek, 168));
  EXPECT_FALSE(IsMarked(kWeek, -1)) << "the clock was never set";
  EXPECT_FALSE(IsMarked("x", 0));
}

class Rules : public testing::Test {
protected:
  void SetUp() override { TakeLogLines(); }
};

TEST_F(Rules, AreTheSectionsInOrder) {
  const auto rules = ParseRules(Section("d4:3d:7e:11:22:33", kWeek, "Anna's laptop") + Section("3C-2A-F4-11-22-44"));
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules[0].mac, "d4:3d:7e:11:22:33");
  EXPECT_EQ(rules[0].name, "Anna's laptop");
  EXPECT_EQ(rules[0].schedule, kWeek);
  EXPECT_EQ(rules[1].mac, "3c:2a:f4:11:22:44");
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(Rules, OneThatCannotBeKeptIsNamedAndLeavesTheOthers) {
  const auto rules = ParseRules(Section("d4:3d:7e:11:22:33") + Section("no address") + Section("01:00:5e:00:00:01") +
                                "[3c:2a:f4:11:22:44]\n\tname=without\n" + Section("00:40:8c:11:22:55"));
  ASSERT_EQ(rules.size(), 2U);
  EXPECT_EQ(rules[0].mac, "d4:3d:7e:11:22:33");
  EXPECT_EQ(rules[1].mac, "00:40:8c:11:22:55");
  EXPECT_THAT(TakeLogLines(),
              ElementsAre("3 time control: rule [no address] is left out: not the address of a device",
                          "3 time control: rule [01:00:5e:00:00:01] is left out: not the address of a device",
                          "3 time control: rule [3c:2a:f4:11:22:44] is left out: it has no schedule"));
}

TEST_F(Rules, ASchedulesLengthIsNamedAndItsSlotsCount) {
  for (const size_t length : {0UL, 167UL, 169UL, 100000UL}) {
    const auto rules = ParseRules(Section("d4:3d:7e:11:22:33", std::string(length, '1')));
    ASSERT_EQ(rules.size(), 1U);
    EXPECT_EQ(CutIn(167, rules).size(), length > 167 ? 1U : 0U);
    EXPECT_EQ(CutIn(0, rules).size(), length > 0 ? 1U : 0U);
    EXPECT_THAT(TakeLogLines(),
                ElementsAre(HasSubstr("rule [d4:3d:7e:11:22:33] has " + std::to_string(length) + " slots, not 168")));
  }
}

TEST_F(Rules, OtherCharactersThanOneAreFree) {
  std::string schedule = "0x2 -\xff,1";
  schedule.resize(168, '0');
  const auto rules = ParseRules(Section("d4:3d:7e:11:22:33", schedule));
  for (int slot = 0; slot < 168; ++slot) {
    EXPECT_EQ(CutIn(slot, rules).size(), slot == 7 ? 1U : 0U) << slot;
  }
}

TEST_F(Rules, OfSeveralForOneDeviceEachCounts) {
  std::string evening(168, '0');
  std::string morning(168, '0');
  evening[20] = '1';
  morning[6] = '1';
  const auto rules = ParseRules(Section("d4:3d:7e:11:22:33", evening) + Section("D4-3D-7E-11-22-33", morning));
  EXPECT_THAT(CutIn(20, rules), ElementsAre("d4:3d:7e:11:22:33"));
  EXPECT_THAT(CutIn(6, rules), ElementsAre("d4:3d:7e:11:22:33"));
  EXPECT_THAT(CutIn(7, rules), IsEmpty());
}

TEST_F(Rules, AFileWithoutSectionsHasNone) {
  EXPECT_THAT(ParseRules(""), IsEmpty());
  EXPECT_THAT(ParseRules("\n# nothing\n\ttc_sched=" + kWeek + "\n"), IsEmpty());
}

TEST_F(Rules, ANameWithAnythingInItStaysAName) {
  const auto rules = ParseRules(Section("d4:3d:7e:11:22:33", kWeek, "a=b [c] #d; drop"));
  ASSERT_EQ(rules.size(), 1U);
  EXPECT_EQ(rules[0].name, "a=b [c] #d; drop");
}

TEST(RenderTable, HoldsTheDevicesAndTheirAddressesAndNoNames) {
  const std::string text =
      vornhost::RenderTable({"02:00:00:00:00:01", "02:00:00:00:00:02"}, {"192.168.1.10", "2001:db8::10", "fe80::1"});
  EXPECT_THAT(text, testing::StartsWith("add table inet vorn_timecontrol\ndelete table inet vorn_timecontrol\n"));
  EXPECT_THAT(text, HasSubstr("set cut { type ether_addr; elements = {02:00:00:00:00:01, 02:00:00:00:00:02}; }"));
  EXPECT_THAT(text, HasSubstr("elements = {192.168.1.10};"));
  EXPECT_THAT(text, HasSubstr("elements = {2001:db8::10, fe80::1};"));
  EXPECT_THAT(vornhost::RenderTable({}, {}), testing::Not(HasSubstr("elements")));
}

TEST(JoinRules, OneRuleADeviceHasTheHoursOfAll) {
  const std::vector<vornhost::TimeRule> joined =
      vornhost::JoinRules({{"a", "first", "010"}, {"b", "other", "1"}, {"a", "second", "0001x"}});
  ASSERT_EQ(joined.size(), 2U);
  EXPECT_EQ(joined[0].mac, "a");
  EXPECT_EQ(joined[0].name, "first");
  EXPECT_EQ(joined[0].schedule, "01010");
  EXPECT_EQ(joined[1].schedule, "1");
}

} // namespace
