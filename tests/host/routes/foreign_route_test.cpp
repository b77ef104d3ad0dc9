// Static routes beside the routes of others, over the kernel of a private network.
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/routes/scene.h"

#include <gmock/gmock.h>

using namespace hosttest; // NOLINT(google-build-using-namespace)
using testing::HasSubstr;
using vornnetwork::network::IP_TYPE_V6;

namespace {

constexpr char kFile4[] = "/etc/iproute2/config/static-route";

using ForeignRouteTest = RoutesTest;

TEST_F(ForeignRouteTest, Set_LeavesTheRoutesOfOthersAlone) {
  Shell("ip route add 10.77.0.0/16 via 192.168.7.9 proto static");
  ASSERT_EQ(SetRules(ManyRules(1, "192.168.7.2")), 0);
  EXPECT_EQ(SetRules(Json::Value(Json::arrayValue)), 0);
  EXPECT_THAT(Shell("ip route"), HasSubstr("10.77.0.0/16 via 192.168.7.9 dev lan0 proto static"));
}

TEST_F(ForeignRouteTest, Set_FileThatCannotBeWrittenIsNoReasonToTouchABlockedRule) {
  ASSERT_EQ(
      SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.2"), Rule4("10.60.0.0", "255.255.0.0", "192.168.7.2"),
                    Rule4("10.61.0.0", "255.255.0.0", "192.168.7.2"))),
      0);
  Shell("ip route delete 10.60.0.0/16 && ip route add 10.60.0.0/16 via 192.168.7.9 proto static"); // in its way
  Shell(std::string("mv ") + kFile4 + " /etc/elsewhere && ln -s /etc/elsewhere " + kFile4);
  const std::string before = Everything();
  EXPECT_LT(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.3"),
                          Rule4("10.62.0.0", "255.255.0.0", "192.168.7.2"))),
            0);
  EXPECT_EQ(Everything(), before);
}

TEST_F(ForeignRouteTest, Set_ARouteOfAnothersBesideOneOfOursStays) {
  for (const char *place : {"append", "prepend"}) {
    ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.2"))), 0);
    const std::string foreign = "10.20.0.0/16 via 192.168.7.9 dev lan0 proto static \n";
    Shell(std::string("ip route ") + place + " 10.20.0.0/16 via 192.168.7.9 proto static");
    EXPECT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.3"))), 0);
    EXPECT_EQ(OwnRoutes(), "10.20.0.0/16 via 192.168.7.3 dev lan0\n") << place;
    EXPECT_EQ(Shell("ip route show proto static"), foreign.substr(0, foreign.find(" proto")) + " \n") << place;
    EXPECT_EQ(SetRules(Json::Value(Json::arrayValue)), 0);
    EXPECT_EQ(Shell("ip route show 10.20.0.0/16"), foreign) << place;
    Shell("ip route flush proto static");
  }
}

TEST_F(ForeignRouteTest, Set_AnIpv6RouteOfAnothersBesideOneOfOursStays) {
  ASSERT_EQ(SetRules(List(Rule6("2001:db8:5::", "48", "fd00:7::2")), IP_TYPE_V6), 0);
  Shell("ip -6 route append 2001:db8:5::/48 via fd00:7::9 proto static"); // the kernel shows one of two hops
  EXPECT_EQ(GetRules(IP_TYPE_V6)[0]["installed"], true);
  EXPECT_EQ(SetRules(List(Rule6("2001:db8:5::", "48", "fd00:7::3")), IP_TYPE_V6), 0);
  EXPECT_EQ(Shell("ip -6 route show 2001:db8:5::/48 | grep -o 'via [^ ]*' | sort"), "via fd00:7::3\nvia fd00:7::9\n");
  EXPECT_EQ(SetRules(Json::Value(Json::arrayValue), IP_TYPE_V6), 0);
  EXPECT_EQ(Shell("ip -6 route show 2001:db8:5::/48 | sed 's/ *$//'"),
            "2001:db8:5::/48 via fd00:7::9 dev lan0 proto static metric 1024 pref medium\n");
}

TEST_F(ForeignRouteTest, Set_AnIpv6RouteOfSeveralHopsOfAnothersStays) {
  Shell("ip -6 route add 2001:db8:77::/48 proto static nexthop via fd00:7::8 nexthop via fd00:7::9");
  const std::string before = AllRoutes();
  EXPECT_EQ(SetRules(List(Rule6("2001:db8:5::", "48", "fd00:7::2")), IP_TYPE_V6), 0);
  EXPECT_LT(
      SetRules(List(Rule6("2001:db8:5::", "48", "fd00:7::3"), Rule6("2001:db8:5::", "48", "fd00:7::4")), IP_TYPE_V6),
      0);
  EXPECT_EQ(SetRules(Json::Value(Json::arrayValue), IP_TYPE_V6), 0);
  EXPECT_EQ(AllRoutes(), before);
}

TEST_F(ForeignRouteTest, Set_WhatIsRefusedBesideARouteOfAnothersIsUndoneWhole) {
  ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.2"))), 0);
  Shell("ip route prepend 10.20.0.0/16 via 192.168.7.9 proto static && ip route add 10.60.0.0/16 dev lan0");
  const std::string before = Everything();
  EXPECT_LT(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.3"),
                          Rule4("10.60.0.0", "255.255.0.0", "192.168.7.3"))),
            0);
  EXPECT_EQ(Everything(), before);
}

} // namespace
