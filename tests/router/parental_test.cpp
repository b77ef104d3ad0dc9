// The ParentalControl rows over the scripted platform. The module makes the folder and tests the rule file itself.
#include "platform/schedule.h"
#include "router/mervane_base.h"
#include "router/parental.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <fstream>

using scripted::Exchange;
using scripted::Get;
using scripted::Join;
using scripted::Lines;
using scripted::Section;
using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

constexpr char kUserRules[] = "/etc/parental/timectrl.ui.conf";
constexpr char kEnforced[] = "/etc/parental/timectrl.conf";
constexpr char kProgramCopy[] = "/tmp/vorntimecontrol";
constexpr char kSuccess[] = "SetSuccess(null)";
constexpr char kFailure[] = "SetError(4300, null)";

constexpr char kLoadModules[] = "QARDCExecl(/usr/vorn/bin/iptablestool, 187, --insmod, timectrl, x_tables.ko, "
                                "ip_tables.ko, iptable_filter.ko, xt_mac.ko, xt_tcpudp.ko)";
constexpr char kUnloadModules[] = "QARDCExecl(/usr/vorn/bin/iptablestool, 187, --rmmod, timectrl, xt_tcpudp.ko, "
                                  "xt_mac.ko, iptable_filter.ko, ip_tables.ko, x_tables.ko)";

Json::Value Rules(const std::string &text) {
  Json::Value parameters(Json::objectValue);
  parameters["rules"] = text;
  return parameters;
}

// Two rules, the first switched on.
constexpr char kTwoRules[] = R"([{"mac":"d4:3d:7e:11:22:33","clientname":"Anna's laptop","schedule":"0110",)"
                             R"("tcenable":true},{"mac":"3c:2a:f4:11:22:44","clientname":"printer",)"
                             R"("schedule":"1111","tcenable":false}])";

const Lines kStop = {
    "QARDCFileExist(/tmp/vorntimecontrol)",
    "QARDCExec(/tmp/vorntimecontrol, --disable, null, null, null)",
    "VORNScheduleRemove(/tmp/vorntimecontrol --schedule)",
    "QARDCSysUnlink(/tmp/timectrl.conf)",
    "QARDCSysUnlink(/tmp/vorntimecontrol)",
    kUnloadModules,
};
constexpr char kAddLaptop[] = "QARDCFileAddSection(/etc/parental/timectrl.ui.conf, d4:3d:7e:11:22:33, "
                              "{tcenable=yes, name=Anna's laptop, tc_sched=0110}, \"\\t%s=%s\\n\")";
constexpr char kAddPrinter[] = "QARDCFileAddSection(/etc/parental/timectrl.ui.conf, 3c:2a:f4:11:22:44, "
                               "{tcenable=no, name=printer, tc_sched=1111}, \"\\t%s=%s\\n\")";
constexpr char kEnforceLaptop[] = "QARDCFileAddSection(/etc/parental/timectrl.conf, d4:3d:7e:11:22:33, "
                                  "{name=Anna's laptop, tc_sched=0110}, \"\\t%s=%s\\n\")";
const Lines kWrite = {
    "QARDCFileCheckDir(/etc/parental)",
    "QARDCSysUnlink(/etc/parental/timectrl.ui.conf)",
    "QARDCSzHashAlloc(1024)",
    "QARDCSzHashSetValue(hash 0, tcenable, yes)",
    "QARDCSzHashSetValue(hash 0, name, Anna's laptop)",
    "QARDCSzHashSetValue(hash 0, tc_sched, 0110)",
    kAddLaptop,
    "QARDCSzHashSetValue(hash 0, tcenable, no)",
    "QARDCSzHashSetValue(hash 0, name, printer)",
    "QARDCSzHashSetValue(hash 0, tc_sched, 1111)",
    kAddPrinter,
    "QARDCSzHashFree(hash 0)",
};
const Lines kSetUp = {
    "QARDCFileExist(/etc/parental/timectrl.ui.conf)",
    "QARDCSysUnlink(/etc/parental/timectrl.conf)",
    "QARDCSysUnlink(/tmp/timectrl.conf)",
    "QARDCSzListAlloc(1024)",
    "QARDCSzHashAlloc(1024)",
    "QARDCFileEnumSection(/etc/parental/timectrl.ui.conf)",
    "QARDCFileGetSection(/etc/parental/timectrl.ui.conf, d4:3d:7e:11:22:33)",
    "QARDCSzHashRemoveKey(hash 1, tcenable)",
    kEnforceLaptop,
    "QARDCFileGetSection(/etc/parental/timectrl.ui.conf, 3c:2a:f4:11:22:44)",
    "QARDCSzHashRemoveKey(hash 1, tcenable)",
    "QARDCFileExist(/etc/parental/timectrl.conf)",
    "QARDCExec(/bin/cp, -f, /etc/parental/timectrl.conf, /tmp/timectrl.conf, null)",
    "QARDCSzHashFree(hash 1)",
    "QARDCSzListFree()",
    "QARDCFileExist(/tmp/timectrl.conf)",
};
const Lines kEnforce = {
    "QARDCExec(/bin/cp, -f, /usr/vorn/sbin/vorntimecontrol, /tmp/vorntimecontrol, null)",
    kLoadModules,
    "QARDCExec(/tmp/vorntimecontrol, --apply, null, null, null)",
    "VORNScheduleSet(/tmp/vorntimecontrol --schedule, 0)",
    "QARDCExec(/tmp/vorntimecontrol --schedule, null, null, null, null)",
};

// The calls up to that one, and those of `rest`.
Lines UpTo(Lines calls, const std::string &last, const Lines &rest) {
  const auto at = std::find(calls.begin(), calls.end(), last);
  EXPECT_NE(at, calls.end()) << last;
  calls.erase(at + 1, calls.end());
  return Join({calls, rest});
}

const Lines kRead = {"HasParam(rules)", "GetParam(rules, null)"};

class ParentalTest : public testing::Test {
protected:
  void SetUp() override {
    std::filesystem::remove_all("/etc/parental");
    scripted::Reset();
    Get().folders = {"/etc/parental"};
  }

  void TearDown() override { EXPECT_EQ(Get().liveHashes + Get().liveLists, 0); }

  // Enforcement is running when `running`; then the two rules are set.
  static std::string SetTwoRules(bool running) {
    if (running) {
      Get().existingFiles = {kProgramCopy};
    }
    Exchange exchange(Rules(kTwoRules));
    exchange.Run(SetParentalControl);
    EXPECT_EQ(exchange.AnswerCount(), 1U);
    return exchange.Answer();
  }
};

TEST_F(ParentalTest, Set_StopsThenWritesThenStarts) {
  EXPECT_EQ(SetTwoRules(true), kSuccess);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, kStop, kWrite, kSetUp, kEnforce, {kSuccess}})));
  EXPECT_THAT(Get().log, IsEmpty());
  EXPECT_THAT(Get().existingFiles, ElementsAre(kUserRules, kEnforced, "/tmp/timectrl.conf", "/tmp/vorntimecontrol"));
}

TEST_F(ParentalTest, Set_WhenEnforcementIsOffStopsNothing) {
  EXPECT_EQ(SetTwoRules(false), kSuccess);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {kStop[0]}, kWrite, kSetUp, kEnforce, {kSuccess}})));
}

TEST_F(ParentalTest, Set_GivesTheSchedulerItsRecordByteByByte) {
  SetTwoRules(false);
  std::string wanted(1048, '\0');
  wanted[0] = 127; // every day
  wanted[8] = 1;   // every hour
  wanted[12] = 23; // from 0 to 23
  const std::string command = "/tmp/vorntimecontrol --schedule";
  wanted.replace(24, command.size(), command);
  EXPECT_THAT(Get().schedulerRecords, ElementsAre(wanted));
}

struct FailingStep {
  std::string call; // that fails
  Lines log;
  Lines freed; // what is still called after it
};

class FailingStepTest : public ParentalTest, public testing::WithParamInterface<FailingStep> {};

TEST_P(FailingStepTest, Set_EndsThereAndAnswers4300WithNull) {
  const FailingStep &step = GetParam();
  Get().results[step.call] = -1;
  EXPECT_EQ(SetTwoRules(true), kFailure);
  const Lines whole = Join({kRead, kStop, kWrite, kSetUp, kEnforce});
  EXPECT_THAT(Get().calls, ElementsAreArray(UpTo(whole, step.call, Join({step.freed, {kFailure}}))));
  EXPECT_THAT(Get().log, ElementsAreArray(step.log));
}

constexpr char kTool[] = "parental: Can't execute /usr/vorn/bin/iptablestool ";
constexpr char kNoSetup[] = "parental: Failed to setup [/etc/parental/timectrl.conf] in /tmp/";
constexpr char kNoMemory[] = "parental: Failed to alloc memory";
constexpr char kNotAdded[] = "parental: Failed to add section: d4:3d:7e:11:22:33 from /etc/parental/timectrl.conf, "
                             "errno=0x300";
const Lines kFreeFirst = {"QARDCSzHashFree(hash 0)"};
const Lines kFreeSecond = {"QARDCSzHashFree(hash 1)", "QARDCSzListFree()"};

const std::vector<FailingStep> kFailingSteps = {
    {kStop[1], {"parental: Can't execute /tmp/vorntimecontrol --disable"}, {}},
    {kStop[2], {"parental: Can't remove time control scheduler\n"}, {}},
    {kUnloadModules,
     {std::string(kTool) + "--rmmod timectrl xt_tcpudp.ko xt_mac.ko iptable_filter.ko ip_tables.ko x_tables.ko"},
     {}},
    {kWrite[2], {kNoMemory}, {}},
    {kWrite[3], {kNoMemory}, kFreeFirst},
    {kWrite[4], {kNoMemory}, kFreeFirst},
    {kWrite[5], {kNoMemory}, kFreeFirst},
    {kAddLaptop, {kNotAdded}, kFreeFirst},
    {kWrite[7], {kNoMemory}, kFreeFirst},
    {kAddPrinter,
     {"parental: Failed to add section: 3c:2a:f4:11:22:44 from /etc/parental/timectrl.conf, errno=0x300"},
     kFreeFirst},
    {kSetUp[3], {"parental: Failed to QARDCSzListAlloc", kNoSetup}, {}},
    {kSetUp[5], {"parental: Failed to QARDCFileEnumSection", kNoSetup}, kFreeSecond},
    {kEnforceLaptop, {kNotAdded, kNoSetup}, kFreeSecond},
    {kSetUp[12], {"parental: Failed to copy /etc/parental/timectrl.conf to /tmp/", kNoSetup}, kFreeSecond},
    {kEnforce[0], {"parental: Failed to copy /usr/vorn/sbin/vorntimecontrol to /tmp/"}, {}},
    {kLoadModules,
     {std::string(kTool) + "--insmod timectrl x_tables.ko ip_tables.ko iptable_filter.ko xt_mac.ko xt_tcpudp.ko"},
     {}},
    {kEnforce[2], {"parental: Failed to execute /tmp/vorntimecontrol --apply"}, {}},
    {kEnforce[3], {"parental: Failed to set time control scheduler\n"}, {}},
    {kEnforce[4], {"parental: Failed to execute /tmp/vorntimecontrol --schedule"}, {}},
};
INSTANTIATE_TEST_SUITE_P(EveryStep, FailingStepTest, testing::ValuesIn(kFailingSteps));

TEST_F(ParentalTest, Set_RuleFileThatCannotBeDeletedAnswers4300) {
  Get().existingFiles = {kUserRules};
  Get().results[kWrite[1]] = -1;
  EXPECT_EQ(SetTwoRules(false), kFailure);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {kStop[0], kWrite[0], kWrite[1], kSetUp[0], kFailure}})));
  EXPECT_THAT(Get().log, ElementsAre("parental: Failed to delete /etc/parental/timectrl.ui.conf"));
}

TEST_F(ParentalTest, SetTimeCtrlRules_NoMemoryForTheHashIsAFailure) {
  Get().results["QARDCSzHashAlloc(1024)"] = -1;
  EXPECT_FALSE(ParentalHandler().SetTimeCtrlRules());
  EXPECT_THAT(Get().calls, ElementsAre(kSetUp[1], kSetUp[2], kSetUp[3], kSetUp[4], "QARDCSzListFree()"));
  EXPECT_THAT(Get().log, ElementsAre(kNoMemory));
}

TEST_F(ParentalTest, Set_AfterAFailedUnloadFindsNothingToStop) {
  Get().results[kUnloadModules] = -1;
  EXPECT_EQ(SetTwoRules(true), kFailure);
  EXPECT_THAT(Get().existingFiles, IsEmpty());
  Get().calls.clear();
  EXPECT_EQ(SetTwoRules(false), kSuccess);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {kStop[0]}, kWrite, kSetUp, kEnforce, {kSuccess}})));
}

TEST_F(ParentalTest, Set_AfterAFailedStopTriesItAgain) {
  Get().results[kStop[1]] = -1;
  EXPECT_EQ(SetTwoRules(true), kFailure);
  EXPECT_THAT(Get().existingFiles, ElementsAre(kProgramCopy));
  Get().results.clear();
  Get().calls.clear();
  EXPECT_EQ(SetTwoRules(false), kSuccess);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, kStop, kWrite, kSetUp, kEnforce, {kSuccess}})));
}

TEST_F(ParentalTest, Set_NoRulesStopsDeletesTheFileAndStartsNothing) {
  Get().existingFiles = {kProgramCopy, kUserRules};
  Exchange exchange(Rules("[]"));
  exchange.Run(SetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, kStop, {kWrite[0], kWrite[1], kSetUp[0], kSuccess}})));
  EXPECT_THAT(Get().existingFiles, IsEmpty());
}

TEST_F(ParentalTest, Set_WithAllRulesOffStoresThemAndEnforcesNothing) {
  Exchange exchange(Rules(R"([{"mac":"a","clientname":"b","schedule":"1","tcenable":false},)"
                          R"({"mac":"c","clientname":"d","schedule":"1"}])"));
  exchange.Run(SetParentalControl);
  EXPECT_EQ(exchange.Answer(), kSuccess);
  EXPECT_THAT(Get().existingFiles, ElementsAre(kUserRules));
  EXPECT_THAT(Get().calls, Not(Contains(HasSubstr("QARDCExec"))));
  EXPECT_EQ(Get().calls.end()[-2], "QARDCFileExist(/tmp/timectrl.conf)");
}

TEST_F(ParentalTest, Set_WithoutRulesAnswers4300WithNullAndTouchesNothing) {
  Exchange exchange;
  exchange.Run(SetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(rules)", kFailure));
  EXPECT_THAT(Get().log, ElementsAre("parental: missing member from input json data"));
}

TEST_F(ParentalTest, Set_TextThatIsNoJsonAnswers4300WithNull) {
  Exchange exchange(Rules("[{]"));
  exchange.Run(SetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {kFailure}})));
  EXPECT_THAT(Get().log, ElementsAre("mervane_base: Error when parsing array, msg: * Line 1, Column 3\n  "
                                     "Missing '}' or object member name\n"));
}

TEST_F(ParentalTest, Set_JsonThatIsNoArrayAnswers4300WithThatValue) {
  Exchange exchange(Rules(R"({"mac":"a"})"));
  exchange.Run(SetParentalControl);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {R"(SetError(4300, {"mac":"a"}))"}})));
  EXPECT_THAT(Get().log, ElementsAre("mervane_base: Data rules from req is not an json array"));
}

TEST_F(ParentalTest, Set_NestedBeyondTheLimitAnswers4300) {
  Exchange exchange(Rules(std::string(100000, '[')));
  exchange.Run(SetParentalControl);
  EXPECT_EQ(exchange.Answer(), kFailure);
  ASSERT_EQ(Get().log.size(), 1U);
  EXPECT_THAT(Get().log[0], HasSubstr("mervane_base: Error when parsing array, msg: "));
}

TEST_F(ParentalTest, Set_ParameterThatHoldsNoArrayAsTextAnswers4300) {
  Json::Value array(Json::arrayValue);
  array.append("a");
  for (const Json::Value &wrong : {array, Json::Value(Json::objectValue), Json::Value(), Json::Value(true),
                                   Json::Value(5), Json::Value(1.5), Json::Value("")}) {
    Get().calls.clear();
    Json::Value parameters;
    parameters["rules"] = wrong;
    Exchange exchange(parameters);
    exchange.Run(SetParentalControl);
    EXPECT_THAT(exchange.Answer(), HasSubstr("SetError(4300, "));
    EXPECT_EQ(Get().calls.size(), 3U);
  }
}

TEST_F(ParentalTest, Set_RuleWhoseTextsCannotBeKeptIsRefusedBeforeAnythingIsTouched) {
  const std::string good = R"({"mac":"a","clientname":"b","schedule":"1"},)";
  for (const char *bad : {
           "5",
           "null",
           R"("text")",
           "[]",
           "{}", // no texts at all
           R"({"mac":"a","clientname":"b"})",
           R"({"mac":"a","schedule":"1"})", // one is missing
           R"({"clientname":"b","schedule":"1"})",
           R"({"mac":1,"clientname":"b","schedule":"1"})", // no text
           R"({"mac":"a","clientname":["b"],"schedule":"1"})",
           R"({"mac":"a","clientname":"b","schedule":null})",
           R"({"mac":"a\u0000","clientname":"b","schedule":"1"})", // C would cut it
           R"({"mac":"a","clientname":"b\u0000c","schedule":"1"})",
           R"({"mac":"a","clientname":"b","schedule":"1\u00001"})",
           R"({"mac":"a\n","clientname":"b","schedule":"1"})", // a line of the rule file would end
           R"({"mac":"a","clientname":"b\nc","schedule":"1"})",
           R"({"mac":"","clientname":"b","schedule":"1"})", // no section's name
           R"({"mac":"a]","clientname":"b","schedule":"1"})",
           R"({"mac":"[a","clientname":"b","schedule":"1"})",
           R"({"mac":" a","clientname":"b","schedule":"1"})",
           R"({"mac":"a\t","clientname":"b","schedule":"1"})",
           R"({"mac":"a","clientname":"b\rc","schedule":"1"})",
           R"({"mac":"a","clientname":"b","schedule":"1\n"})",
       }) {
    Get().calls.clear();
    Get().log.clear();
    Exchange exchange(Rules("[" + good + bad + "]"));
    exchange.Run(SetParentalControl);
    EXPECT_THAT(Get().calls, ElementsAreArray(Join({kRead, {kFailure}}))) << bad;
    EXPECT_THAT(Get().log, ElementsAre("mervane_base: Rule 1 is refused, not all of its texts can be kept"));
  }
}

TEST_F(ParentalTest, Set_OnlyATrueBooleanSwitchesARuleOn) {
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"true", "yes"}, {"1", "yes"},      {"false", "no"}, {"0", "no"},
      {"null", "no"},  {"\"yes\"", "no"}, {"[1]", "no"},   {"{\"a\":1}", "no"}};
  for (const auto &[json, stored] : cases) {
    scripted::Reset();
    Get().folders = {"/etc/parental"};
    Exchange exchange(Rules(R"([{"mac":"a","clientname":"b","schedule":"1","tcenable":)" + json + "}]"));
    exchange.Run(SetParentalControl);
    EXPECT_EQ(exchange.Answer(), kSuccess);
    EXPECT_THAT(Get().calls, Contains("QARDCFileAddSection(/etc/parental/timectrl.ui.conf, a, {tcenable=" + stored +
                                      R"(, name=b, tc_sched=1}, "\t%s=%s\n"))"))
        << json;
  }
}

TEST_F(ParentalTest, Set_TwoRulesOfOneDeviceBecomeTwoSections) {
  Exchange exchange(Rules(R"([{"mac":"a","clientname":"one","schedule":"1","tcenable":true},)"
                          R"({"mac":"a","clientname":"two","schedule":"0","tcenable":true}])"));
  exchange.Run(SetParentalControl);
  EXPECT_EQ(exchange.Answer(), kSuccess);
  const auto &file = Get().sectionFiles[kUserRules];
  ASSERT_EQ(file.size(), 2U);
  EXPECT_EQ(file[0].name, "a");
  EXPECT_EQ(file[1].name, "a");
  EXPECT_EQ(file[1].pairs[1].second, "two");
}

TEST_F(ParentalTest, Set_MakesTheFolderWhenItIsMissing) {
  Get().folders.clear();
  const mode_t old = umask(0);
  EXPECT_EQ(SetTwoRules(false), kSuccess);
  umask(old);
  struct stat info {};
  ASSERT_EQ(stat("/etc/parental", &info), 0);
  EXPECT_TRUE(S_ISDIR(info.st_mode));
  EXPECT_EQ(info.st_mode & 07777U, 0755U);
}

TEST_F(ParentalTest, Set_FolderThatCannotBeMadeAnswers4300AndDeletesNothing) {
  Get().folders.clear();
  std::ofstream("/etc/parental") << "a file in its place";
  EXPECT_EQ(SetTwoRules(false), kFailure);
  EXPECT_EQ(Get().calls.end()[-2], kWrite[0]);
  EXPECT_THAT(Get().log, ElementsAre("parental: Failed to mkdir /etc/parental"));
}

TEST_F(ParentalTest, Start_WithoutARuleFileDoesNothing) {
  EXPECT_TRUE(ParentalHandler().StartTimeCtrlRules());
  EXPECT_THAT(Get().calls, ElementsAre(kSetUp[0]));
}

TEST_F(ParentalTest, Start_RuleFileWithoutSectionsEnforcesNothing) {
  Get().existingFiles = {kUserRules};
  EXPECT_TRUE(ParentalHandler().StartTimeCtrlRules());
  EXPECT_THAT(Get().calls,
              ElementsAreArray(UpTo(kSetUp, kSetUp[5],
                                    {"QARDCFileExist(/etc/parental/timectrl.conf)", "QARDCSzHashFree(hash 0)",
                                     "QARDCSzListFree()", "QARDCFileExist(/tmp/timectrl.conf)"})));
}

TEST_F(ParentalTest, Start_SkipsASectionThatCannotBeReadAndEnforcesTheOthers) {
  Get().existingFiles = {kUserRules};
  const Section bad{"bad", {{"tcenable", "yes"}}};
  const Section empty{"empty", {}};
  const Section good{"good", {{"tcenable", "yes"}, {"name", "n"}, {"tc_sched", "1"}}};
  Get().sectionFiles[kUserRules] = {bad, empty, good};
  Get().results["QARDCFileGetSection(/etc/parental/timectrl.ui.conf, bad)"] = -1;
  EXPECT_TRUE(ParentalHandler().StartTimeCtrlRules());
  EXPECT_THAT(Get().log, ElementsAre("parental: Failed to get section [bad], skip it",
                                     "parental: Failed to get section [empty], skip it"));
  ASSERT_EQ(Get().sectionFiles[kEnforced].size(), 1U);
  EXPECT_EQ(Get().sectionFiles[kEnforced][0].name, "good");
}

TEST_F(ParentalTest, Start_TheHashGoesFromSectionToSectionAsItIs) {
  Get().existingFiles = {kUserRules};
  Get().sectionFiles[kUserRules] = {{"a", {{"tcenable", "yes"}, {"name", "n"}, {"tc_sched", "1"}}},
                                    {"b", {{"tcenable", "yes"}, {"name", "m"}}},
                                    {"c", {{"name", "o"}}}};
  EXPECT_TRUE(ParentalHandler().StartTimeCtrlRules());
  const auto &enforced = Get().sectionFiles[kEnforced];
  ASSERT_EQ(enforced.size(), 2U) << "the third has no tcenable: the one before it was removed from the hash";
  EXPECT_EQ(enforced[1].name, "b");
  EXPECT_EQ(enforced[1].pairs, (scripted::Pairs{{"name", "m"}, {"tc_sched", "1"}}));
}

TEST_F(ParentalTest, Stop_WhenEnforcementIsOffRunsNothing) {
  EXPECT_TRUE(ParentalHandler().StopTimeCtrlRules());
  EXPECT_THAT(Get().calls, ElementsAre(kStop[0]));
}

TEST_F(ParentalTest, Check_TakesObjectsWithRulesOnly) {
  ParentalHandler parental;
  Json::Value array(Json::arrayValue);
  for (const Json::Value &wrong :
       {Json::Value(), Json::Value("rules"), Json::Value(1), array, Json::Value(Json::objectValue)}) {
    Get().log.clear();
    EXPECT_FALSE(parental.CheckTimeCtrlData(wrong));
    EXPECT_THAT(Get().log, ElementsAre("parental: missing member from input json data"));
  }
  EXPECT_TRUE(parental.CheckTimeCtrlData(Rules("[]")));
}

} // namespace
