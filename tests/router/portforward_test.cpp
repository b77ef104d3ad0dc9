// The PortForward rows over the scripted platform.
#include "router/mervane_base.h"
#include "router/portforward.h"
#include "tests/router/portforward_calls.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

using scripted::Exchange;
using scripted::Get;
using scripted::Join;
using scripted::kCheckFolder;
using scripted::kFolder;
using scripted::kMkdir;
using scripted::kRestart;
using scripted::Lines;
using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

bool callocFails = false;

} // namespace

// The linker puts these in the place of the module's calls of calloc.
// NOLINTBEGIN(readability-identifier-naming)
extern "C" void *__real_calloc(size_t count, size_t size);
extern "C" void *__wrap_calloc(size_t count, size_t size);
extern "C" void *__wrap_calloc(size_t count, size_t size) {
  return callocFails ? nullptr : __real_calloc(count, size);
}
// NOLINTEND(readability-identifier-naming)

namespace {

constexpr char kRuleFile[] = "/etc/portforward/routerpf/rule.conf";
constexpr char kWebAndGame[] = R"([{"enabled":true,"protocol":"tcp","service":"Web","sourcePort":"8080",)"
                               R"("targetIP":"192.168.1.110","targetPort":"80"},{"enabled":false,"id":"7",)"
                               R"("protocol":"both","service":"Game","sourcePort":"5000-5010",)"
                               R"("targetIP":"192.168.1.111","targetPort":"5000-5010"}])";
constexpr char kRecords[] =
    "[0 enabled=1 s_port=80 s_ip=192.168.1.110 r_port=8080 protocol name=tcp service=Web; "
    "1 enabled=0 s_port=5000-5010 s_ip=192.168.1.111 r_port=5000-5010 protocol name=both service=Game]";

Json::Value Rules(const Json::Value &rules) {
  Json::Value parameters(Json::objectValue);
  parameters["rules"] = rules;
  return parameters;
}

Lines SetCalls(const std::string &hash, std::initializer_list<std::string> pairs) {
  Lines out = {"QARDCSzHashAlloc(1024)"};
  for (const std::string &pair : pairs) {
    out.push_back("QARDCSzHashSetValue(");
    out.back().append(hash).append(", ").append(pair).append(")");
  }
  return out;
}

const Lines kWebSets = SetCalls("hash 0", {"enabled, 1", "s_port, 80", "s_ip, 192.168.1.110", "r_port, 8080",
                                           "protocol name, tcp", "service, Web"});
const Lines kGameSets = SetCalls("hash 1", {"enabled, 0", "s_port, 5000-5010", "s_ip, 192.168.1.111",
                                            "r_port, 5000-5010", "protocol name, both", "service, Game"});
const Lines kReadParameter = {"HasParam(rules)", "GetParam(rules, null)"};
const std::string kWrite = std::string("VORNPFConfSet(") + kRecords + ", " + kRuleFile + ")";
const std::string kFree = std::string("VORNPFConfFree(") + kRecords + ")";
const std::string kFailed = std::string("SetError(4300, ") + kWebAndGame + ")";

class RulesTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    std::filesystem::remove_all("/etc/portforward");
  }
  void TearDown() override {
    callocFails = false;
    EXPECT_EQ(Get().liveHashes, 0);
  }
  static void MakeRuleFile() {
    std::filesystem::create_directories(kFolder);
    std::ofstream(kRuleFile) << "only tested for being there\n";
  }
  // What one call that fails makes of a set of the two rules.
  static void FailSet(const std::string &call, int result, const Lines &calls, const std::string &message) {
    Get().results[call] = result;
    Exchange exchange(Rules(kWebAndGame));
    exchange.Run(SetPortForward);
    EXPECT_THAT(Get().calls, ElementsAreArray(calls));
    EXPECT_THAT(Get().log, ElementsAre(message));
  }
};

TEST_F(RulesTest, Get_WithoutARuleFileAnswersNoRulesAndAsksForNothing) {
  Exchange exchange;
  exchange.Run(GetPortForward);
  EXPECT_THAT(Get().calls, ElementsAre(R"(SetSuccess({"rules":[]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(RulesTest, Get_UnreadableRuleFileAnswersNoRules) {
  MakeRuleFile();
  const std::string read = std::string("VORNPFConfGet(") + kRuleFile + ", 0, 0, 0)";
  Get().results[read] = -1;
  Exchange exchange;
  exchange.Run(GetPortForward);
  EXPECT_THAT(Get().calls, ElementsAre(read, R"(SetSuccess({"rules":[]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(RulesTest, Get_EmptyRuleFileAnswersNoRules) {
  MakeRuleFile();
  Exchange exchange;
  exchange.Run(GetPortForward);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"rules":[]}))");
}

TEST_F(RulesTest, Get_AnswersTheRecordsInOrderUnderTheApisNames) {
  MakeRuleFile();
  Get().ruleFile = {{"1",
                     {{"enabled", "1"},
                      {"s_port", "80"},
                      {"s_ip", "192.168.1.110"},
                      {"r_port", "8080"},
                      {"protocol name", "tcp"},
                      {"service", "Web"}}},
                    {"0",
                     {{"service", ""},
                      {"protocol name", "udp"},
                      {"r_port", "53"},
                      {"s_ip", "x"},
                      {"s_port", "54"},
                      {"enabled", "0"}}}};
  Exchange exchange;
  exchange.Run(GetPortForward);
  EXPECT_EQ(exchange.Answer(),
            R"(SetSuccess({"rules":[{"enabled":true,"id":"1","protocol":"tcp","service":"Web","sourcePort":"8080",)"
            R"("targetIP":"192.168.1.110","targetPort":"80"},{"enabled":false,"id":"0","protocol":"udp","service":"",)"
            R"("sourcePort":"53","targetIP":"x","targetPort":"54"}]}))");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
}

TEST_F(RulesTest, Get_KeyThatTheRecordLacksIsLeftOut) {
  MakeRuleFile();
  Get().ruleFile = {{"0", {}}, {"1", {{"s_ip", "192.168.1.7"}, {"other", "x"}}}, {"", {{"enabled", "1"}}}};
  Exchange exchange;
  exchange.Run(GetPortForward);
  EXPECT_EQ(exchange.Answer(),
            R"(SetSuccess({"rules":[{"id":"0"},{"id":"1","targetIP":"192.168.1.7"},{"enabled":true,"id":""}]}))");
}

TEST_F(RulesTest, Get_OnlyTheText1IsEnabled) {
  MakeRuleFile();
  for (const char *text : {"0", "", "yes", "true", "11", " 1"}) {
    Get().ruleFile = {{"0", {{"enabled", text}}}};
    Exchange exchange;
    exchange.Run(GetPortForward);
    EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"rules":[{"enabled":false,"id":"0"}]}))") << text;
  }
}

TEST_F(RulesTest, Set_WritesTheRecordsAndRestarts) {
  Get().folders = {kFolder};
  Exchange exchange(Rules(kWebAndGame));
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls,
              ElementsAreArray(Join(
                  {kReadParameter, kWebSets, kGameSets, {kCheckFolder, kWrite, kRestart, kFree, "SetSuccess(null)"}})));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(RulesTest, Set_MakesTheFolderWhenItIsMissing) {
  Exchange exchange(Rules(kWebAndGame));
  exchange.Run(SetPortForward);
  EXPECT_THAT(
      Get().calls,
      ElementsAreArray(Join(
          {kReadParameter, kWebSets, kGameSets, {kCheckFolder, kMkdir, kWrite, kRestart, kFree, "SetSuccess(null)"}})));
}

TEST_F(RulesTest, Set_EmptyArrayWritesAnEmptyListAndRestarts) {
  Get().folders = {kFolder};
  Exchange exchange(Rules("[]"));
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadParameter,
                                                  {kCheckFolder, std::string("VORNPFConfSet([], ") + kRuleFile + ")",
                                                   kRestart, "SetSuccess(null)"}})));
}

TEST_F(RulesTest, Set_MissingParameterAnswers4300WithNull) {
  Exchange exchange;
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(rules)", "SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("portforward: Cannot find rules in data member"));
}

TEST_F(RulesTest, Set_TextThatIsNoJsonAnswers4300WithNull) {
  for (const char *text : {"", "[", "no json", "[{]}", "[1,"}) {
    Get().calls.clear();
    Get().log.clear();
    Exchange exchange(Rules(text));
    exchange.Run(SetPortForward);
    EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadParameter, {"SetError(4300, null)"}})));
    EXPECT_THAT(Get().log, ElementsAre(HasSubstr("mervane_base: Error when parsing array, msg: * Line 1, Column ")))
        << text;
  }
}

TEST_F(RulesTest, Set_JsonThatIsNoArrayAnswers4300WithIt) {
  const std::vector<std::pair<Json::Value, std::string>> cases = {{"{}", "{}"},
                                                                  {R"({"rules":[]})", R"({"rules":[]})"},
                                                                  {"5", "5"},
                                                                  {"null", "null"},
                                                                  {R"("[]")", R"("[]")"},
                                                                  {"true", "true"},
                                                                  {Json::Value(5), "5"},
                                                                  {Json::Value(false), "false"}};
  for (const auto &[parameter, answer] : cases) {
    Get().calls.clear();
    Get().log.clear();
    Exchange exchange(Rules(parameter));
    exchange.Run(SetPortForward);
    EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadParameter, {"SetError(4300, " + answer + ")"}})));
    EXPECT_THAT(Get().log, ElementsAre("mervane_base: Data rules from req is not an json array"));
  }
}

TEST_F(RulesTest, Set_ParameterWithoutATextAnswers4300WithNull) {
  Json::Value array;
  array.append(Json::Value(Json::objectValue));
  for (const Json::Value &parameter : {array, Json::Value(Json::objectValue), Json::Value(Json::arrayValue)}) {
    Get().log.clear();
    Exchange exchange(Rules(parameter));
    exchange.Run(SetPortForward);
    EXPECT_EQ(exchange.Answer(), "SetError(4300, null)");
    EXPECT_THAT(Get().log, ElementsAre("mervane_base: Error when parsing array, msg: no text"));
  }
  Exchange null(Rules(Json::Value()));
  null.Run(SetPortForward);
  EXPECT_EQ(null.Answer(), "SetError(4300, null)"); // its text is empty
}

TEST_F(RulesTest, Set_DeeplyNestedTextAnswers4300AndNothingIsThrown) {
  for (const int depth : {65, 1001, 100000}) {
    Exchange exchange(Rules(std::string(static_cast<size_t>(depth), '[')));
    exchange.Run(SetPortForward);
    EXPECT_EQ(exchange.Answer(), "SetError(4300, null)");
    EXPECT_EQ(Get().log.back(), "mervane_base: Error when parsing array, msg: nested too deeply");
  }
}

TEST_F(RulesTest, Set_IdsOfTheClientAreIgnored) {
  Exchange exchange(
      Rules(R"([{"id":"9","targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p","service":""},)"
            R"({"id":{},"targetPort":"3","targetIP":"b","sourcePort":"4","protocol":"","service":"s"}])"));
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls,
              Contains(std::string("VORNPFConfSet([0 enabled=0 s_port=1 s_ip=a r_port=2 protocol name=p service=; "
                                   "1 enabled=0 s_port=3 s_ip=b r_port=4 protocol name= service=s], ") +
                       kRuleFile + ")"));
}

TEST_F(RulesTest, Set_TextsAreCarriedUnread) {
  Json::Value rule;
  rule["enabled"] = 2;
  rule["targetPort"] = "0\"]\n[x]=\\";
  rule["targetIP"] = "$(id)";
  rule["sourcePort"] = " 70000 ";
  rule["protocol"] = "\xff";
  rule["service"] = std::string(65536, '=');
  VORNPFRecord *record = CreateRuleRecord(rule, 4);
  ASSERT_NE(record, nullptr);
  EXPECT_STREQ(record->name, "4");
  EXPECT_EQ(record->next, nullptr);
  const auto value = [&record](const char *key) { return std::string(QARDCSzHashGetValue(record->values, key)); };
  EXPECT_EQ(value("enabled"), "1");
  EXPECT_EQ(value("s_port"), "0\"]\n[x]=\\");
  EXPECT_EQ(value("s_ip"), "$(id)");
  EXPECT_EQ(value("r_port"), " 70000 ");
  EXPECT_EQ(value("protocol name"), "\xff");
  EXPECT_EQ(value("service").size(), 65536U);
  VORNPFConfFree(record);
}

TEST_F(RulesTest, Set_RuleThatCannotBeStoredFreesTheRecordsBeforeItAndWritesNothing) {
  const std::string good = R"({"targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p","service":"s"})";
  const std::string cases[] = {
      R"({"targetIP":"a","sourcePort":"2","protocol":"p","service":"s"})",
      R"({"targetPort":"1","sourcePort":"2","protocol":"p","service":"s"})",
      R"({"targetPort":"1","targetIP":"a","protocol":"p","service":"s"})",
      R"({"targetPort":"1","targetIP":"a","sourcePort":"2","service":"s"})",
      R"({"targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p"})",
      R"({"targetPort":1,"targetIP":"a","sourcePort":"2","protocol":"p","service":"s"})",
      R"({"targetPort":"1","targetIP":null,"sourcePort":"2","protocol":"p","service":"s"})",
      R"({"targetPort":"1","targetIP":"a","sourcePort":["2"],"protocol":"p","service":"s"})",
      R"({"targetPort":"1","targetIP":"a","sourcePort":"2","protocol":{},"service":"s"})",
      R"({"targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p","service":"a\u0000b"})",
      R"({"enabled":"1","targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p","service":"s"})",
      R"({"enabled":[],"targetPort":"1","targetIP":"a","sourcePort":"2","protocol":"p","service":"s"})",
      "{}",
      "[]",
      "[[]]",
      "null",
      R"("rule")",
      "5",
      "true"};
  for (const std::string &bad : cases) {
    Get().calls.clear();
    Get().log.clear();
    Exchange exchange(
        Rules(std::string("[").append(good).append(",").append(bad).append(",").append(good).append("]")));
    exchange.Run(SetPortForward);
    EXPECT_THAT(exchange.Answer(), testing::StartsWith("SetError(4300, [{")) << bad;
    EXPECT_THAT(Get().calls,
                Contains("VORNPFConfFree([0 enabled=0 s_port=1 s_ip=a r_port=2 protocol name=p service=s])"));
    EXPECT_THAT(Get().calls, Not(Contains(HasSubstr("QARDCExec"))));
    EXPECT_THAT(Get().calls, Not(Contains(HasSubstr("VORNPFConfSet"))));
    EXPECT_THAT(Get().log, ElementsAre("portforward: Failed to create rule record")) << bad;
    EXPECT_EQ(Get().liveHashes, 0) << bad;
  }
}

TEST_F(RulesTest, Set_NoMemoryForARecordAnswers4300) {
  callocFails = true;
  Exchange exchange(Rules(kWebAndGame));
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadParameter, {kFailed}})));
  EXPECT_THAT(Get().log, ElementsAre("portforward: malloc failed", "portforward: Failed to create rule record"));
}

TEST_F(RulesTest, Set_NoMemoryForAHashAnswers4300) {
  Get().results["QARDCSzHashAlloc(1024)"] = 1;
  Exchange exchange(Rules(kWebAndGame));
  exchange.Run(SetPortForward);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadParameter, {"QARDCSzHashAlloc(1024)", kFailed}})));
  EXPECT_THAT(Get().log, ElementsAre("portforward: hash malloc failed", "portforward: Failed to create rule record"));
}

TEST_F(RulesTest, Set_EachHashSetThatFailsStopsTheRecordAndFreesAll) {
  const std::string first = "VORNPFConfFree([0 enabled=1 s_port=80 s_ip=192.168.1.110 r_port=8080 protocol name=tcp "
                            "service=Web])";
  for (size_t failing = 1; failing < kWebSets.size(); ++failing) {
    scripted::Reset();
    FailSet(kWebSets[failing], -1,
            Join({kReadParameter,
                  Lines(kWebSets.begin(), kWebSets.begin() + static_cast<ptrdiff_t>(failing) + 1),
                  {"QARDCSzHashFree(hash 0)", kFailed}}),
            "portforward: Failed to create rule record");
    scripted::Reset();
    FailSet(kGameSets[failing], -1,
            Join({kReadParameter,
                  kWebSets,
                  Lines(kGameSets.begin(), kGameSets.begin() + static_cast<ptrdiff_t>(failing) + 1),
                  {"QARDCSzHashFree(hash 1)", first, kFailed}}),
            "portforward: Failed to create rule record");
  }
}

TEST_F(RulesTest, Set_FailedMkdirWritesNothing) {
  FailSet(kMkdir, -1, Join({kReadParameter, kWebSets, kGameSets, {kCheckFolder, kMkdir, kFree, kFailed}}),
          "portforward: Failed to mkdir [/etc/portforward/routerpf]");
}

TEST_F(RulesTest, Set_FailedWriteRestartsNothing) {
  Get().folders = {kFolder};
  for (const int result : {-1, 1}) {
    Get().calls.clear();
    Get().log.clear();
    Get().hashes = 0;
    FailSet(kWrite, result, Join({kReadParameter, kWebSets, kGameSets, {kCheckFolder, kWrite, kFree, kFailed}}),
            "portforward: Failed to set pfconf");
  }
}

TEST_F(RulesTest, Set_FailedRestartLeavesTheFileAsWritten) {
  Get().folders = {kFolder};
  FailSet(kRestart, -1, Join({kReadParameter, kWebSets, kGameSets, {kCheckFolder, kWrite, kRestart, kFree, kFailed}}),
          "portforward: Failed to execute rc network start-dnat");
}

TEST_F(RulesTest, Set_FiveThousandRulesAreWrittenInOrder) {
  Json::Value rules(Json::arrayValue);
  for (int i = 0; i < 5000; ++i) {
    Json::Value rule;
    for (const char *key : {"targetPort", "targetIP", "sourcePort", "protocol", "service"}) {
      rule[key] = std::to_string(i);
    }
    rules.append(rule);
  }
  Exchange exchange(Rules(scripted::Text(rules)));
  exchange.Run(SetPortForward);
  EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
  EXPECT_THAT(Get().calls, Contains(HasSubstr("; 4999 enabled=0 s_port=4999 s_ip=4999 r_port=4999 protocol name=4999 "
                                              "service=4999], /etc/portforward")));
}

} // namespace
