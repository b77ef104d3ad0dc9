// The gateway rows over the scripted platform.
#include "router/gatewaylist.h"
#include "router/mervane_base.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <type_traits>

using scripted::Exchange;
using scripted::Get;
using scripted::Parse;
using testing::ElementsAre;
using testing::IsEmpty;

static_assert(std::is_empty_v<GatewayList> && !std::is_polymorphic_v<GatewayList>);

namespace {

std::string Record(const std::string &type, int priority, const std::string &ifname) {
  return R"(AddGatewayData({"dns":"NULL","gateway":"NULL","ifname":)" + ifname + R"(,"priority":)" +
         std::to_string(priority) + R"(,"type":")" + type + R"("}))";
}

class GatewayListTest : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
};

TEST_F(GatewayListTest, Get_AsksForTheFamilyAndAnswersWhatTheFilterLeaves) {
  for (const auto &[family, type] : {std::pair("ipv4", "GTYPE_V4"), std::pair("ipv6", "GTYPE_V6")}) {
    scripted::Reset();
    Get().gateways = Parse(R"([{"ifname":"eth0"},{"ifname":"eth1"}])");
    Get().filteredGateways = Parse(R"([{"ifname":"eth1"}])");
    Exchange exchange(Parse(std::string(R"({"iptype":")") + family + R"(","type":"Some Filter"})"));
    exchange.Run(GetGatewayList);
    EXPECT_THAT(Get().calls,
                ElementsAre("HasParam(iptype)", "HasParam(type)", "GetParam(iptype, null)", "GetParam(type, null)",
                            "NetClient()", std::string(R"(GetGatewayListData({"type":")") + type + R"("}, []))",
                            R"(FilterList(Some Filter, [{"ifname":"eth0"},{"ifname":"eth1"}]))", "~NetClient()",
                            R"(SetSuccess({"configs":[{"ifname":"eth1"}]}))"));
    EXPECT_THAT(Get().log, IsEmpty());
  }
}

TEST_F(GatewayListTest, Get_UnknownFamilyAsksWithANullRequest) {
  for (const char *family : {"", "IPv4", "ipv5", "ipv4 "}) {
    scripted::Reset();
    Get().filteredGateways = Parse(R"([1])");
    Exchange exchange(Parse(std::string(R"({"iptype":")") + family + R"(","type":""})"));
    exchange.Run(GetGatewayList);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(type)", "GetParam(iptype, null)",
                                         "GetParam(type, null)", "NetClient()", "GetGatewayListData(null, [])",
                                         "FilterList(, [])", "~NetClient()", R"(SetSuccess({"configs":[1]}))"));
  }
}

TEST_F(GatewayListTest, Get_MissingParameterAnswers4302) {
  Exchange withoutFamily(Parse(R"({"type":"all"})"));
  withoutFamily.Run(GetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "SetError(4302, null)"));
  Get().calls.clear();
  Exchange withoutFilter(Parse(R"({"iptype":"ipv4"})"));
  withoutFilter.Run(GetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(type)", "SetError(4302, null)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(GatewayListTest, Get_ParameterThatIsNoTextAnswers4302) {
  for (const char *wrong : {"4", "null", "true", "1.5", "[\"ipv4\"]", "{\"a\":\"ipv4\"}"}) {
    for (const std::string &text : {std::string(R"({"type":"all","iptype":)") + wrong + "}",
                                    std::string(R"({"iptype":"ipv4","type":)") + wrong + "}"}) {
      Get().calls.clear();
      Exchange exchange(Parse(text));
      exchange.Run(GetGatewayList);
      EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(type)", "GetParam(iptype, null)",
                                           "GetParam(type, null)", "SetError(4302, null)"))
          << text;
    }
  }
}

TEST_F(GatewayListTest, GetAndSet_TextWithANulAnswers4302) {
  for (const char *text : {R"({"iptype":"ipv4\u0000","type":"all"})", R"({"iptype":"ipv4","type":"all\u0000x"})"}) {
    Get().calls.clear();
    Exchange exchange(Parse(text));
    exchange.Run(GetGatewayList);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(type)", "GetParam(iptype, null)",
                                         "GetParam(type, null)", "SetError(4302, null)"))
        << text;
  }
  Get().calls.clear();
  Exchange exchange(Parse(R"({"iptype":"ipv4\u0000"})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(iptype, null)", "SetError(4302, null)"));
}

TEST_F(GatewayListTest, Get_DaemonThatCannotListAnswers4300WithNull) {
  Get().gatewayListResult = -1;
  Exchange exchange(Parse(R"({"iptype":"ipv4","type":"all"})"));
  exchange.Run(GetGatewayList);
  EXPECT_EQ(exchange.Answer(), "SetError(4300, null)");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to get gateway list"));
}

TEST_F(GatewayListTest, Get_FailureLeavesAnEmptyArrayInTheResult) {
  Get().gatewayListResult = -1;
  Get().gateways = Parse(R"([{"ifname":"eth0"}])");
  Json::Value result;
  EXPECT_FALSE(GatewayList().Get("ipv4", "all", result));
  EXPECT_EQ(scripted::Text(result), R"({"configs":[]})");
  EXPECT_EQ(Get().calls.back(), "~NetClient()");
}

TEST_F(GatewayListTest, Get_RefusedFilterIsNoFailure) {
  Get().filterListResult = -1;
  Get().filteredGateways = Parse(R"([{"ifname":"eth0"}])");
  Exchange exchange(Parse(R"({"iptype":"ipv4","type":"no such filter"})"));
  exchange.Run(GetGatewayList);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"configs":[{"ifname":"eth0"}]}))");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(GatewayListTest, Set_StoresInOrderWritesTheFirstAndRefreshes) {
  for (const auto &[family, type, file] : {std::tuple("ipv4", "GTYPE_V4", "/etc/iproute2/config/default-gateway"),
                                           std::tuple("ipv6", "GTYPE_V6", "/etc/iproute2/config/default-gateway-v6")}) {
    scripted::Reset();
    Exchange exchange(Parse(std::string(R"({"iptype":")") + family + R"(","ifnames":["eth1","eth0"]})"));
    exchange.Run(SetGatewayList);
    EXPECT_THAT(Get().calls,
                ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)",
                            "GetParam(iptype, null)", "NetClient()", Record(type, 0, R"("eth1")"),
                            std::string("QARDCFileSetKeyValue(") + file + ", DEVICE, eth1, %s=%s\n)",
                            Record(type, 1, R"("eth0")"), std::string(R"(RefreshGateway({"type":")") + type + R"("}))",
                            "~NetClient()", "SetSuccess(null)"));
    EXPECT_THAT(Get().log, IsEmpty());
  }
}

TEST_F(GatewayListTest, Set_UnknownFamilyHasAnEmptyTypeAndAnEmptyFileName) {
  Exchange exchange(Parse(R"({"iptype":"ipx","ifnames":["eth1"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)", "GetParam(iptype, null)",
                          "NetClient()", Record("", 0, R"("eth1")"), "QARDCFileSetKeyValue(, DEVICE, eth1, %s=%s\n)",
                          R"(RefreshGateway({"type":""}))", "~NetClient()", "SetSuccess(null)"));
}

TEST_F(GatewayListTest, Set_UnknownFamilyWithARefusedRecordAnswersTheList) {
  Get().addGatewayResults = {-1};
  Exchange exchange(Parse(R"({"iptype":"ipx","ifnames":["eth1"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)", "GetParam(iptype, null)",
                          "NetClient()", Record("", 0, R"("eth1")"), "~NetClient()", R"(SetError(4300, ["eth1"]))"));
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to add gateway info for []"));
}

TEST_F(GatewayListTest, Set_UnknownFamilyWithARefusedRefreshAnswersTheList) {
  Get().refreshResult = -1;
  Exchange exchange(Parse(R"({"iptype":"ipx","ifnames":["eth1"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)", "GetParam(iptype, null)",
                          "NetClient()", Record("", 0, R"("eth1")"), "QARDCFileSetKeyValue(, DEVICE, eth1, %s=%s\n)",
                          R"(RefreshGateway({"type":""}))", "~NetClient()", R"(SetError(4300, ["eth1"]))"));
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to refresh default gateway"));
}

TEST_F(GatewayListTest, Set_UnknownFamilyWithoutAListOnlyRefreshesWithAnEmptyType) {
  Exchange exchange(Parse(R"({"iptype":"ipx"})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(iptype, null)", "NetClient()",
                                       R"(RefreshGateway({"type":""}))", "~NetClient()", "SetSuccess(null)"));
}

TEST_F(GatewayListTest, Set_WithoutAListOnlyRefreshes) {
  Exchange absent(Parse(R"({"iptype":"ipv4"})"));
  absent.Run(SetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(iptype, null)", "NetClient()",
                                       R"(RefreshGateway({"type":"GTYPE_V4"}))", "~NetClient()", "SetSuccess(null)"));
  for (const char *list : {"null", "[]"}) {
    Get().calls.clear();
    Exchange empty(Parse(std::string(R"({"iptype":"ipv6","ifnames":)") + list + "}"));
    empty.Run(SetGatewayList);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)",
                                         "GetParam(iptype, null)", "NetClient()",
                                         R"(RefreshGateway({"type":"GTYPE_V6"}))", "~NetClient()", "SetSuccess(null)"));
  }
}

TEST_F(GatewayListTest, Set_MissingFamilyAnswers4302) {
  Exchange exchange(Parse(R"({"ifnames":["eth0"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "SetError(4302, null)"));
}

TEST_F(GatewayListTest, Set_WrongTypesAnswer4302AndStoreNothing) {
  for (const char *wrong :
       {R"({"iptype":4,"ifnames":["eth0"]})", R"({"iptype":null,"ifnames":["eth0"]})",
        R"({"iptype":["ipv4"],"ifnames":["eth0"]})", R"({"iptype":"ipv4","ifnames":"eth0"})",
        R"({"iptype":"ipv4","ifnames":0})", R"({"iptype":"ipv4","ifnames":false})",
        R"({"iptype":"ipv4","ifnames":{"0":"eth0"}})", R"({"iptype":"ipv4","ifnames":["eth0",1]})",
        R"({"iptype":"ipv4","ifnames":["eth0",null]})", R"({"iptype":"ipv4","ifnames":[["eth0"]]})",
        R"({"iptype":"ipv4","ifnames":[{"ifname":"eth0"}]})", R"({"iptype":"ipv4","ifnames":["eth0\u0000x"]})"}) {
    Get().calls.clear();
    Exchange exchange(Parse(wrong));
    exchange.Run(SetGatewayList);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)",
                                         "GetParam(iptype, null)", "SetError(4302, null)"))
        << wrong;
    EXPECT_THAT(Get().log, IsEmpty());
  }
}

TEST_F(GatewayListTest, Set_RepeatedNameAnswers4302BeforeTheFirstRecord) {
  for (const char *names : {R"(["eth1","eth1"])", R"(["eth0","eth1","eth0"])"}) {
    Get().calls.clear();
    Exchange exchange(Parse(std::string(R"({"iptype":"ipv4","ifnames":)") + names + "}"));
    exchange.Run(SetGatewayList);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)",
                                         "GetParam(iptype, null)", "SetError(4302, null)"))
        << names;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(GatewayListTest, Set_RefusedFirstRecordWritesNoFileAndRefreshesNothing) {
  Get().addGatewayResults = {-1};
  Exchange exchange(Parse(R"({"iptype":"ipv4","ifnames":["eth1","eth0"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)",
                                       "GetParam(iptype, null)", "NetClient()", Record("GTYPE_V4", 0, R"("eth1")"),
                                       "~NetClient()", R"(SetError(4300, ["eth1","eth0"]))"));
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to add gateway info for []"));
}

TEST_F(GatewayListTest, Set_RefusedLaterRecordStopsThereWithEmptyBrackets) {
  Get().addGatewayResults = {0, -3};
  Exchange exchange(Parse(R"({"iptype":"ipv4","ifnames":["eth1","eth0","eth2"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(iptype)", "HasParam(ifnames)", "GetParam(ifnames, null)", "GetParam(iptype, null)",
                          "NetClient()", Record("GTYPE_V4", 0, R"("eth1")"),
                          "QARDCFileSetKeyValue(/etc/iproute2/config/default-gateway, DEVICE, eth1, %s=%s\n)",
                          Record("GTYPE_V4", 1, R"("eth0")"), "~NetClient()",
                          R"(SetError(4300, ["eth1","eth0","eth2"]))"));
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to add gateway info for []"));
}

TEST_F(GatewayListTest, Set_RefusedRefreshAnswersTheListAsReceived) {
  Get().refreshResult = -1;
  Exchange exchange(Parse(R"({"iptype":"ipv4","ifnames":["eth1"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, ["eth1"]))");
  Exchange withoutList(Parse(R"({"iptype":"ipv4"})"));
  withoutList.Run(SetGatewayList);
  EXPECT_EQ(withoutList.Answer(), "SetError(4300, null)");
  EXPECT_THAT(Get().log, ElementsAre("gatewaylist: Failed to refresh default gateway",
                                     "gatewaylist: Failed to refresh default gateway"));
}

TEST_F(GatewayListTest, Set_FileThatCannotBeWrittenIsNoFailure) {
  Get().setKeyValueResult = -1;
  Exchange exchange(Parse(R"({"iptype":"ipv4","ifnames":["eth1"]})"));
  exchange.Run(SetGatewayList);
  EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(GatewayListTest, Set_PositiveResultsAreSuccess) {
  Get().addGatewayResults = {1};
  Get().refreshResult = 7;
  EXPECT_TRUE(GatewayList().Set("ipv4", Parse(R"(["eth0"])")));
}

TEST_F(GatewayListTest, Set_ObjectGoesElementsAsGivenAndWithoutAnException) {
  EXPECT_TRUE(GatewayList().Set("ipv4", Parse(R"([{"a":1}, 7])")));
  EXPECT_THAT(Get().calls,
              ElementsAre("NetClient()", Record("GTYPE_V4", 0, R"({"a":1})"),
                          "QARDCFileSetKeyValue(/etc/iproute2/config/default-gateway, DEVICE, , %s=%s\n)",
                          Record("GTYPE_V4", 1, "7"), R"(RefreshGateway({"type":"GTYPE_V4"}))", "~NetClient()"));
  EXPECT_TRUE(GatewayList().Set("ipv4", Parse(R"({"ifnames":["eth0"]})")));
  EXPECT_TRUE(GatewayList().Set("ipv4", Json::Value("eth0")));
}

} // namespace
