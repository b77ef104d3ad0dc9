// The static-route rows over the scripted platform.
#include "router/mervane_base.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

using scripted::Exchange;
using scripted::Get;
using scripted::Parse;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

constexpr char kNoType[] = R"(SetError(4302, {"desc":"no type parameter"}))";
constexpr char kNoRules[] = R"(SetError(4302, {"desc":"no rules parameter"}))";
constexpr char kWrongType[] = R"(SetError(4302, {"desc":"wrong type parameter"}))";

constexpr char kRule[] = R"({"ip":"10.0.0.0","mask":"255.0.0.0","prefix_length":"64","gateway":"192.168.1.2",)"
                         R"("ifname":"lbr0","enable":true})";

std::vector<std::string> Call(VORN::APIHandler handler, const std::string &parameters) {
  Get().calls.clear();
  Exchange exchange(Parse(parameters));
  exchange.Run(handler);
  EXPECT_EQ(exchange.AnswerCount(), 1U) << parameters;
  return Get().calls;
}

// A call of the service between the reading of the parameters and the answer.
auto Calls(const std::string &call, const std::string &answer) {
  return ElementsAre("StaticRoute()", "GetParam(, null)", call, answer, "~StaticRoute()");
}

auto Refused(const std::string &answer) {
  return ElementsAre("StaticRoute()", "GetParam(, null)", answer, "~StaticRoute()");
}

class StaticRouteTest : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
};

TEST_F(StaticRouteTest, EveryMethod_WithoutTypeIsToldSoEvenWhenTheListIsMissingToo) {
  for (const auto handler : {GetStaticRouteRules, SetStaticRouteRules, TestStaticRouteRule, GetRouteTables}) {
    for (const char *parameters : {"{}", R"({"rules":[],"rule":{}})", R"({"Type":"ipv4"})"}) {
      EXPECT_THAT(Call(handler, parameters), Refused(kNoType));
    }
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, EveryMethod_TypeIsComparedExactly) {
  for (const auto handler : {GetStaticRouteRules, SetStaticRouteRules, TestStaticRouteRule, GetRouteTables}) {
    for (const char *type : {R"("IPV4")", R"("IPv6")", R"("ipv5")", R"("")", R"(" ipv4")", R"("ipv4\u0000")", "4",
                             "null", "true", "[]", R"(["ipv4"])", R"({"type":"ipv4"})"}) {
      const std::string parameters = std::string(R"({"rules":[],"rule":{},"type":)") + type + "}";
      EXPECT_THAT(Call(handler, parameters), Refused(kWrongType)) << parameters;
    }
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, SetAndTest_WithoutTheListAreToldSoBeforeABadType) {
  for (const char *type : {R"("ipv4")", R"("IPV4")", "null", "[]"}) {
    const std::string member = std::string(R"("type":)") + type;
    EXPECT_THAT(Call(SetStaticRouteRules, "{" + member + "}"), Refused(kNoRules));
    EXPECT_THAT(Call(SetStaticRouteRules, "{" + member + R"(,"rule":{}})"), Refused(kNoRules));
    EXPECT_THAT(Call(TestStaticRouteRule, "{" + member + "}"), Refused(kNoRules));
    EXPECT_THAT(Call(TestStaticRouteRule, "{" + member + R"(,"rules":[]})"), Refused(kNoRules));
  }
}

TEST_F(StaticRouteTest, SetAndTest_AListOfTheWrongJsonTypeCountsAsNone) {
  for (const char *wrong : {"null", "5", "true", R"("x")", "1.5"}) {
    EXPECT_THAT(Call(SetStaticRouteRules, std::string(R"({"type":"ipv4","rules":)") + wrong + "}"), Refused(kNoRules));
    EXPECT_THAT(Call(TestStaticRouteRule, std::string(R"({"type":"ipv4","rule":)") + wrong + "}"), Refused(kNoRules));
  }
  EXPECT_THAT(Call(SetStaticRouteRules, R"({"type":"ipv4","rules":{}})"), Refused(kNoRules));
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv4","rule":[]})"), Refused(kNoRules));
}

TEST_F(StaticRouteTest, Get_AnswersTheRulesUnderTheirOneKey) {
  Get().routeData = Parse(R"([{"ip":"10.0.0.0"},{"x":[1]}])");
  EXPECT_THAT(Call(GetStaticRouteRules, R"({"type":"ipv4"})"),
              Calls("GetRules(0, [])", R"(SetSuccess({"rules":[{"ip":"10.0.0.0"},{"x":[1]}]}))"));
  Get().routeData = Parse("[]");
  Get().routeResult = 3;
  EXPECT_THAT(Call(GetStaticRouteRules, R"({"type":"ipv6"})"), Calls("GetRules(1, [])", R"(SetSuccess({"rules":[]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, Get_ServiceThatCannotReadAnswers4300WithNull) {
  Get().routeResult = -1;
  Get().routeData = Parse("[1]");
  EXPECT_THAT(Call(GetStaticRouteRules, R"({"type":"ipv4"})"), Calls("GetRules(0, [])", "SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("mervane_base: Failed to get rules for static route."));
}

TEST_F(StaticRouteTest, Set_HandsTheListOverAsItIs) {
  EXPECT_THAT(Call(SetStaticRouteRules, R"({"type":"ipv4","rules":[{"ip":"10.0.0.0","odd":[null]},5,"x"]})"),
              Calls(R"(SetRules(0, [{"ip":"10.0.0.0","odd":[null]},5,"x"]))", "SetSuccess(null)"));
  EXPECT_THAT(Call(SetStaticRouteRules, R"({"type":"ipv6","rules":[]})"), Calls("SetRules(1, [])", "SetSuccess(null)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, Set_AnswersSuccessWithANullPayload) {
  Get().routeResult = 5;
  EXPECT_THAT(Call(SetStaticRouteRules, R"({"type":"ipv4","rules":[{"ip":"10.0.0.0"}]})"),
              Calls(R"(SetRules(0, [{"ip":"10.0.0.0"}]))", "SetSuccess(null)"));
}

TEST_F(StaticRouteTest, Set_RefusedListAnswers4300WithNull) {
  Get().routeResult = -1;
  EXPECT_THAT(Call(SetStaticRouteRules, R"({"type":"ipv6","rules":[]})"),
              Calls("SetRules(1, [])", "SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("mervane_base: Failed to set rules for static route."));
}

TEST_F(StaticRouteTest, Test_Ipv4FillsTheNetmaskAndNoPrefixLength) {
  Get().routeData = Parse(R"({"valid":true})");
  EXPECT_THAT(Call(TestStaticRouteRule, std::string(R"({"type":"ipv4","rule":)") + kRule + "}"),
              Calls("TestRuleVaild({0, 10.0.0.0, 255.0.0.0, 192.168.1.2, , lbr0, true}, null)",
                    R"(SetSuccess({"valid":true}))"));
}

TEST_F(StaticRouteTest, Test_Ipv6FillsThePrefixLengthAndNoNetmask) {
  EXPECT_THAT(Call(TestStaticRouteRule, std::string(R"({"type":"ipv6","rule":)") + kRule + "}"),
              Calls("TestRuleVaild({1, 10.0.0.0, , 192.168.1.2, 64, lbr0, true}, null)", "SetSuccess(null)"));
}

TEST_F(StaticRouteTest, Test_TheOtherFamilysMemberIsNotEvenLookedAt) {
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv4","rule":{"prefix_length":{}}})"),
              Calls("TestRuleVaild({0, , , , , , false}, null)", "SetSuccess(null)"));
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv6","rule":{"mask":[]}})"),
              Calls("TestRuleVaild({1, , , , , , false}, null)", "SetSuccess(null)"));
}

TEST_F(StaticRouteTest, Test_MissingMembersReadAsEmptyTextsAndFalse) {
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv4","rule":{}})"),
              Calls("TestRuleVaild({0, , , , , , false}, null)", "SetSuccess(null)"));
}

TEST_F(StaticRouteTest, Test_MembersAreReadByTheJsonConversions) {
  EXPECT_THAT(Call(TestStaticRouteRule,
                   R"({"type":"ipv6","rule":{"ip":null,"prefix_length":64,"gateway":true,"ifname":-5,"enable":1}})"),
              Calls("TestRuleVaild({1, , , true, 64, -5, true}, null)", "SetSuccess(null)"));
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv4","rule":{"enable":null,"mask":4294967296}})"),
              Calls("TestRuleVaild({0, , 4294967296, , , , false}, null)", "SetSuccess(null)"));
}

TEST_F(StaticRouteTest, Test_MembersThatCannotBeConvertedAnswer4302) {
  for (const char *rule :
       {R"({"ip":[]})", R"({"ip":{"a":1}})", R"({"mask":["255.0.0.0"]})", R"({"gateway":{}})", R"({"ifname":[1]})",
        R"({"enable":"true"})", R"({"enable":""})", R"({"enable":[]})", R"({"enable":{}})"}) {
    EXPECT_THAT(Call(TestStaticRouteRule, std::string(R"({"type":"ipv4","rule":)") + rule + "}"), Refused(kWrongType))
        << rule;
  }
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv6","rule":{"prefix_length":["64"]}})"), Refused(kWrongType));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, Test_RejectedRuleAnswers4300WithNullAndLogsNothing) {
  Get().routeResult = -1;
  Get().routeData = Parse(R"({"valid":false,"field":"ip"})");
  EXPECT_THAT(Call(TestStaticRouteRule, R"({"type":"ipv4","rule":{"ip":"10.0.0.1"}})"),
              Calls("TestRuleVaild({0, 10.0.0.1, , , , , false}, null)", "SetError(4300, null)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, Tables_EveryMainIsShownAsMainTableAndNothingElseIsTouched) {
  Get().routeData = Parse(R"([{"id":255,"name":"local"},{"id":254,"name":"main"},{"name":"Main"},{"id":1},7,
                             ["main"],"main",null,{"name":5},{"name":"main","x":{"name":"main"}},{"name":"main2"}])");
  EXPECT_THAT(Call(GetRouteTables, R"({"type":"ipv4"})"),
              Calls("GetRouteTables(0, [])",
                    R"(SetSuccess({"tables":[{"id":255,"name":"local"},{"id":254,"name":"main-table"},)"
                    R"({"name":"Main"},{"id":1},7,["main"],"main",null,{"name":5},)"
                    R"({"name":"main-table","x":{"name":"main"}},{"name":"main2"}]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(StaticRouteTest, Tables_ServiceThatCannotListAnswers4300WithNull) {
  Get().routeResult = -1;
  Get().routeData = Parse(R"([{"name":"main"}])");
  EXPECT_THAT(Call(GetRouteTables, R"({"type":"ipv6"})"), Calls("GetRouteTables(1, [])", "SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("mervane_base: Failed to get route tables."));
}

} // namespace
