// The API table, held against its list row by row, and the small handlers beside it.
#include "router/mervane_base.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <tuple>

using scripted::Exchange;
using scripted::Get;
using testing::ElementsAre;

namespace {

struct Row {
  std::string api;
  int32_t version;
  std::string method;
  VORN::APIHandler handler;
};

const std::vector<Row> kRows = {
    {"VORN.Core.Network.Router.ConnectionList", 1, "get", GetConnectionList},
    {"VORN.Core.Network.Router.ConnectionList", 1, "set", SetConnectionListData},
    {"VORN.Core.Network.Router.ConnectionList", 1, "delete", DelConnectionListData},
    {"VORN.Core.Network.Router.ConnectionList", 1, "getcount", GetConnectionListCount},
    {"VORN.Core.Network.Router.PortForward", 1, "get", GetPortForward},
    {"VORN.Core.Network.Router.PortForward", 1, "set", SetPortForward},
    {"VORN.Core.Network.Router.DMZ", 1, "get", GetDMZ},
    {"VORN.Core.Network.Router.DMZ", 1, "set", SetDMZ},
    {"VORN.Core.Network.Router.ParentalControl", 1, "get", GetParentalControl},
    {"VORN.Core.Network.Router.ParentalControl", 1, "set", SetParentalControl},
    {"VORN.Core.Network.Router.MacFilter", 1, "get", GetMacFilter},
    {"VORN.Core.Network.Router.MacFilter", 1, "set", SetMacFilter},
    {"VORN.Core.Network.Router.LocalLan", 1, "get", GetLocalLan},
    {"VORN.Core.Network.Router.Topology", 1, "get", GetTopology_V1},
    {"VORN.Core.Network.Router.Topology", 1, "set", SetTopology},
    {"VORN.Core.Network.Router.Topology", 2, "get", GetTopology_V2},
    {"VORN.Core.Network.Router.Gateway.List", 1, "get", GetGatewayList},
    {"VORN.Core.Network.Router.Gateway.List", 1, "set", SetGatewayList},
    {"VORN.Core.Network.Router.PkgList", 1, "get", GetRecommandPkgList},
    {"VORN.Core.Network.Router.Static.Route", 1, "get", GetStaticRouteRules},
    {"VORN.Core.Network.Router.Static.Route", 1, "set", SetStaticRouteRules},
    {"VORN.Core.Network.Router.Static.Route", 1, "test", TestStaticRouteRule},
    {"VORN.Core.Network.Router.Static.Route", 1, "tablesget", GetRouteTables},
};

TEST(ApiTable, HasTheRowsInOrderAndAZeroRow) {
  const VORN::APIEntry *table = GetAPITable();
  ASSERT_EQ(kRows.size(), 23U);
  for (size_t i = 0; i < kRows.size(); ++i) {
    EXPECT_STREQ(table[i].api, kRows[i].api.c_str()) << i;
    EXPECT_EQ(table[i].version, kRows[i].version) << i;
    EXPECT_STREQ(table[i].method, kRows[i].method.c_str()) << i;
    EXPECT_EQ(table[i].handler, kRows[i].handler) << i;
  }
  EXPECT_EQ(table[23].api, nullptr);
  EXPECT_EQ(table[23].version, 0);
  EXPECT_EQ(table[23].method, nullptr);
  EXPECT_EQ(table[23].handler, nullptr);
}

TEST(ApiTable, IsTheSameOnEveryCall) {
  EXPECT_EQ(GetAPITable(), gTable);
  EXPECT_EQ(GetAPITable(), GetAPITable());
}

class PackageList : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
};

TEST_F(PackageList, AnswersTheServersListInTheCallersLanguage) {
  Get().language = "ger";
  Get().packages["packages"].append("photos");
  Json::Value unread(Json::objectValue);
  unread["language"] = "fre"; // the method reads no parameter
  Exchange exchange(unread);
  exchange.Run(GetRecommandPkgList);
  EXPECT_THAT(Get().calls,
              ElementsAre("GetUILanguage()", "PMSGetRecommendPkgList(ger, getNCRecommendPkgList.php, null)",
                          R"(SetSuccess({"packages":["photos"]}))"));
}

TEST_F(PackageList, AnyNonZeroResultIsSuccess) {
  Get().packageResult = -1;
  Exchange exchange;
  exchange.Run(GetRecommandPkgList);
  EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
}

TEST_F(PackageList, UnreachableServerAnswers4300WithNull) {
  Get().packageResult = 0;
  Get().packages["packages"].append("photos");
  Exchange exchange;
  exchange.Run(GetRecommandPkgList);
  EXPECT_EQ(exchange.Answer(), "SetError(4300, null)");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
}

TEST_F(PackageList, EachCallAsksTheServerAgain) {
  Exchange exchange;
  exchange.Run(GetRecommandPkgList);
  exchange.Run(GetRecommandPkgList);
  EXPECT_EQ(std::count(Get().calls.begin(), Get().calls.end(),
                       "PMSGetRecommendPkgList(enu, getNCRecommendPkgList.php, null)"),
            2);
}

} // namespace
