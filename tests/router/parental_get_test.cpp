// Reading the parental rules back over the scripted platform.
#include "platform/schedule.h"
#include "router/mervane_base.h"
#include "router/parental.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <cstring>
#include <filesystem>
#include <fstream>

using scripted::Exchange;
using scripted::Get;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

constexpr char kUserRules[] = "/etc/parental/timectrl.ui.conf";
constexpr char kEnumerate[] = "QARDCFileEnumSection(/etc/parental/timectrl.ui.conf)";

void MakeRuleFile() {
  std::filesystem::create_directories("/etc/parental");
  std::ofstream(kUserRules) << "\n";
}

class ParentalGetTest : public testing::Test {
protected:
  void SetUp() override {
    std::filesystem::remove_all("/etc/parental");
    scripted::Reset();
  }

  void TearDown() override { EXPECT_EQ(Get().liveHashes + Get().liveLists, 0); }
};

TEST_F(ParentalGetTest, Get_WithoutARuleFileAnswersNoRules) {
  Exchange exchange;
  exchange.Run(GetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAre(R"(SetSuccess({"rules":[]}))"));
}

TEST_F(ParentalGetTest, Get_RuleFileWithoutSectionsAnswers4300WithNoRules) {
  MakeRuleFile();
  Exchange exchange;
  exchange.Run(GetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAre("QARDCSzListAlloc(1024)", kEnumerate, "QARDCSzListFree()",
                                       R"(SetError(4300, {"rules":[]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ParentalGetTest, Get_AnswersTheRulesInTheFilesOrder) {
  MakeRuleFile();
  Get().slot = 1;
  Get().sectionFiles[kUserRules] = {
      {"d4:3d:7e:11:22:33", {{"tcenable", "yes"}, {"name", "Anna"}, {"tc_sched", "0110"}}},
      {"3c:2a:f4:11:22:44", {{"tcenable", "no"}, {"name", ""}, {"tc_sched", "1011"}}},
  };
  Exchange exchange;
  exchange.Run(GetParentalControl);
  EXPECT_EQ(exchange.Answer(),
            R"(SetSuccess({"rules":[{"clientname":"Anna","mac":"d4:3d:7e:11:22:33","schedule":"0110","status":1,)"
            R"("tcenable":true},{"clientname":"","mac":"3c:2a:f4:11:22:44","schedule":"1011","status":0,)"
            R"("tcenable":false}]}))");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
}

TEST_F(ParentalGetTest, Get_SectionThatCannotBeReadAnswers4300WithTheRulesBeforeIt) {
  MakeRuleFile();
  Get().sectionFiles[kUserRules] = {
      {"a", {{"tcenable", "yes"}, {"name", "n"}, {"tc_sched", "1"}}}, {"b", {}}, {"c", {}}};
  Exchange exchange;
  exchange.Run(GetParentalControl);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"rules":[{"clientname":"n","mac":"a","schedule":"1","status":1,)"
                               R"("tcenable":true}]}))");
  EXPECT_THAT(Get().calls, Not(Contains(HasSubstr(", c)"))));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ParentalGetTest, Get_EachFailingStepAnswers4300) {
  MakeRuleFile();
  const std::vector<std::pair<std::string, std::vector<std::string>>> steps = {
      {"QARDCSzListAlloc(1024)", {"parental: Failed to QARDCSzListAlloc"}},
      {"QARDCFileEnumSection(/etc/parental/timectrl.ui.conf)", {}},
      {"QARDCSzHashAlloc(1024)", {}}};
  for (const auto &[call, log] : steps) {
    scripted::Reset();
    Get().sectionFiles[kUserRules] = {{"a", {{"tcenable", "yes"}}}};
    Get().results[call] = -1;
    Exchange exchange;
    exchange.Run(GetParentalControl);
    EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"rules":[]}))");
    EXPECT_EQ(*std::find_if(Get().calls.rbegin() + 1, Get().calls.rend(),
                            [](const std::string &each) { return each.find("Free(") == std::string::npos; }),
              call);
    EXPECT_THAT(Get().log, ElementsAreArray(log));
    EXPECT_EQ(Get().liveHashes + Get().liveLists, 0);
  }
}

TEST_F(ParentalGetTest, Get_RuleWithoutAScheduleIsLoggedAndCountsAsMarked) {
  MakeRuleFile();
  Get().sectionFiles[kUserRules] = {{"a", {{"tcenable", "yes"}}}};
  Exchange exchange;
  exchange.Run(GetParentalControl);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"rules":[{"clientname":"","mac":"a","schedule":"","status":1,)"
                               R"("tcenable":true}]}))");
  EXPECT_THAT(Get().log, ElementsAre("parental: Wrong parameter to GetScheduleNowStatus"));
}

TEST_F(ParentalGetTest, Status_IsTheCharacterOfThePresentSlot) {
  const ParentalHandler parental;
  std::string schedule(168, '0');
  for (int slot = 0; slot < 168; ++slot) {
    Get().slot = slot;
    EXPECT_FALSE(parental.GetScheduleNowStatus(schedule.c_str()));
    schedule[static_cast<size_t>(slot)] = '1';
    EXPECT_TRUE(parental.GetScheduleNowStatus(schedule.c_str()));
    schedule[static_cast<size_t>(slot)] = 'x';
    EXPECT_FALSE(parental.GetScheduleNowStatus(schedule.c_str()));
  }
}

TEST_F(ParentalGetTest, Status_BeyondTheSchedulesEndIsNotMarkedAndNotRead) {
  const ParentalHandler parental;
  for (const size_t length : {0UL, 1UL, 166UL, 167UL}) {
    const std::unique_ptr<char[]> exact(new char[length + 1]); // the address sanitizer watches its end
    std::memset(exact.get(), '1', length);
    exact[length] = '\0';
    Get().slot = 167;
    EXPECT_FALSE(parental.GetScheduleNowStatus(exact.get()));
    Get().slot = static_cast<int>(length);
    EXPECT_FALSE(parental.GetScheduleNowStatus(exact.get()));
    Get().slot = -1;
    EXPECT_FALSE(parental.GetScheduleNowStatus(exact.get()));
  }
  Get().slot = 167;
  EXPECT_TRUE(parental.GetScheduleNowStatus(std::string(100000, '1').c_str()));
}

} // namespace
