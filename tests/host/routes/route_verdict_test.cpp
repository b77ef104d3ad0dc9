// The verdict on one rule: which field, and why.
#include "tests/host/network/shell.h"
#include "tests/host/routes/scene.h"

using namespace hosttest; // NOLINT(google-build-using-namespace)
using vornnetwork::network::IP_TYPE_V4;
using vornnetwork::network::IP_TYPE_V6;
using vornnetwork::network::StaticRoute;
using vornnetwork::network::StaticRouteRule;

namespace {

using RouteVerdictTest = RoutesTest;

StaticRouteRule Make(vornnetwork::network::IP_TYPE type, const std::string &ip, const std::string &length,
                     const std::string &gateway, const std::string &ifname, bool enabled = true) {
  StaticRouteRule rule{};
  rule.ipType = type;
  rule.destination = ip;
  if (type == IP_TYPE_V4) {
    rule.netmask = length;
  } else {
    rule.prefixLength = length;
  }
  rule.gateway = gateway;
  rule.ifname = ifname;
  rule.enabled = enabled;
  return rule;
}

std::string Verdict(const StaticRouteRule &rule) {
  const std::string before = Everything();
  Json::Value result;
  const int answer = StaticRoute().TestRuleVaild(rule, result);
  EXPECT_EQ(answer >= 0, result["valid"] == Json::Value(true));
  EXPECT_EQ(Everything(), before);
  return Text(result);
}

std::string Bad(const std::string &field, const std::string &reason) {
  return R"({"field":")" + field + R"(","reason":")" + reason + R"(","valid":false})";
}

TEST_F(RouteVerdictTest, AcceptableRules) {
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.2", "lan0")), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "", "lan0")), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "2001:db8::", "32", "fd00:7::2", "lan0")), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "2001:db8::1", "128", "fe80::2", "wan0")), R"({"valid":true})");
}

TEST_F(RouteVerdictTest, NamesTheFieldAndTheReason) {
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "10.9.0.1", "lan0")),
            Bad("gateway", "not on the interface's link"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "2001:db8::", "32", "fd00:9::1", "lan0")),
            Bad("gateway", "not on the interface's link"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.1", "255.255.0.0", "192.168.7.2", "lan0")),
            Bad("ip", "host bits are set"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "2001:db8::1", "64", "fd00:7::2", "lan0")), Bad("ip", "host bits are set"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.2", "nosuch0")),
            Bad("ifname", "no such interface"));
  for (const char *length : {"129", "-1", "64x", ""}) {
    EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "2001:db8::", length, "fd00:7::2", "lan0")),
              Bad("prefix_length", "no prefix length of 1 to 128"));
  }
  EXPECT_EQ(Verdict(Make(IP_TYPE_V6, "10.20.0.0", "16", "fd00:7::2", "lan0")),
            Bad("ip", "an address of the other family"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "fd00:7::2", "lan0")),
            Bad("gateway", "an address of the other family"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "", "", "", "", false)), Bad("ip", "no address"));
}

TEST_F(RouteVerdictTest, ADuplicateIsOneOfAnEnabledRuleAlone) {
  ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.2"),
                          Rule4("10.21.0.0", "255.255.0.0", "192.168.7.2", "lan0", false))),
            0);
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.3", "lan0")),
            Bad("ip", "duplicate of another rule's network"));
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.3", "lan0", false)), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.255.0", "192.168.7.3", "lan0")), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.21.0.0", "255.255.0.0", "192.168.7.3", "lan0")), R"({"valid":true})");
}

TEST_F(RouteVerdictTest, ARuleThatIsOffMayWaitForItsInterface) {
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "10.66.0.1", "nosuch0", false)), R"({"valid":true})");
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.1", "255.255.0.0", "", "nosuch0", false)),
            Bad("ip", "host bits are set"));
}

TEST_F(RouteVerdictTest, ARuleThatIsStoredAlreadyIsNoDuplicateOfItself) {
  ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "192.168.7.2"))), 0);
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.2", "lan0")), R"({"valid":true})");
  Shell("ip link set lan0 down"); // it waits, and so it may
  EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", "192.168.7.2", "lan0")), R"({"valid":true})");
}

TEST_F(RouteVerdictTest, NoHostHasTheSubnetsOwnAddressOrItsBroadcastAddress) {
  for (const char *gateway : {"192.168.7.0", "192.168.7.255"}) {
    EXPECT_EQ(Verdict(Make(IP_TYPE_V4, "10.20.0.0", "255.255.0.0", gateway, "lan0")),
              Bad("gateway", "the subnet's own address or its broadcast address"));
  }
}

} // namespace
