// The gateway records and the default routes by their order, over the kernel of a private network.
#include "host/routes/route_follower.h"
#include "platform/netclient.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/routes/scene.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <thread>

using namespace hosttest; // NOLINT(google-build-using-namespace)
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornnetwork::dbus::NetClient;
using vornnetwork::network::FilterList;

namespace {

constexpr char kOrder4[] = "/etc/iproute2/config/gateway-order";
constexpr char kOrder6[] = "/etc/iproute2/config/gateway-order-v6";

using GatewayTest = RoutesTest;

Json::Value Record(const Json::Value &ifname, const Json::Value &priority, const char *type = "GTYPE_V4") {
  Json::Value record;
  record["type"] = type;
  record["priority"] = priority;
  record["ifname"] = ifname;
  record["gateway"] = "NULL";
  record["dns"] = "NULL";
  return record;
}

Json::Value TypeOf(const char *type) {
  Json::Value request;
  request["type"] = type;
  return request;
}

void Order(const std::vector<std::string> &names, const char *type = "GTYPE_V4") {
  NetClient client;
  for (Json::UInt i = 0; i < names.size(); ++i) {
    ASSERT_GE(client.AddGatewayData(Record(names[i], i, type)), 0) << names[i];
  }
  ASSERT_GE(client.RefreshGateway(TypeOf(type)), 0);
}

std::string Defaults(const char *family = "-4") {
  return Shell(std::string("ip ") + family + " route show default | sed 's/ *$//' | sort");
}

// By which interface a packet leaves.
std::string WayOut(const char *address = "198.51.100.1") {
  return Shell(std::string("ip route get ") + address + " | sed -n 's/.* dev \\([^ ]*\\) .*/\\1/p'");
}

TEST_F(GatewayTest, Add_StoresAnOrderThatOtherInterfacesStandBehind) {
  NetClient client;
  EXPECT_GE(client.AddGatewayData(Record("wan1", 0U)), 0);
  EXPECT_GE(client.AddGatewayData(Record("wan0", 1U)), 0);
  EXPECT_GE(client.AddGatewayData(Record("usb0", 2U)), 0); // not there now
  EXPECT_EQ(ReadText(kOrder4), "wan1\nwan0\nusb0\n");
  EXPECT_GE(client.AddGatewayData(Record("usb0", 0U)), 0);
  EXPECT_EQ(ReadText(kOrder4), "usb0\nwan1\nwan0\n");
  EXPECT_EQ(ReadText(kOrder6), "<no file>");
  EXPECT_GE(client.AddGatewayData(Record("wan0", 0U, "GTYPE_V6")), 0);
  EXPECT_EQ(ReadText(kOrder6), "wan0\n");
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(GatewayTest, Add_WhatIsNoRecordIsRefusedAndChangesNothing) {
  NetClient client;
  ASSERT_GE(client.AddGatewayData(Record("wan0", 0U)), 0);
  for (const char *name : {"eth0;id", "../x", "-x", "sixteencharacter", "", "lo", "a b", "wan0\n"}) {
    EXPECT_LT(client.AddGatewayData(Record(name, 0U)), 0) << Text(name);
  }
  for (const Json::Value &name : {Json::Value(), Json::Value(5), Json::Value(Json::arrayValue), Json::Value(true)}) {
    EXPECT_LT(client.AddGatewayData(Record(name, 0U)), 0) << Text(name);
  }
  for (const Json::Value &priority : {Json::Value(-1), Json::Value("0"), Json::Value(), Json::Value(0.5)}) {
    EXPECT_LT(client.AddGatewayData(Record("wan1", priority)), 0) << Text(priority);
  }
  for (const char *type : {"", "GTYPE_V5", "gtype_v4"}) {
    EXPECT_LT(client.AddGatewayData(Record("wan1", 0U, type)), 0) << type;
  }
  Json::Value other = Record("wan1", 0U);
  other["gateway"] = "10.8.0.1"; // comes from the interface's own configuration
  EXPECT_LT(client.AddGatewayData(other), 0);
  for (const Json::Value &wrong : {Json::Value(), Json::Value("wan1"), Json::Value(Json::arrayValue)}) {
    EXPECT_LT(client.AddGatewayData(wrong), 0);
  }
  EXPECT_EQ(ReadText(kOrder4), "wan0\n");
}

TEST_F(GatewayTest, Add_ANamePlacedAgainMovesAndAGapIsRefused) {
  NetClient client;
  ASSERT_GE(client.AddGatewayData(Record("wan1", 0U)), 0);
  ASSERT_GE(client.AddGatewayData(Record("wan0", 1U)), 0);
  TakeLogLines();
  EXPECT_GE(client.AddGatewayData(Record("wan1", 1U)), 0);
  EXPECT_EQ(ReadText(kOrder4), "wan0\nwan1\n");
  EXPECT_LT(client.AddGatewayData(Record("wan1", 2U)), 0);
  EXPECT_LT(client.AddGatewayData(Record("usb0", 3U)), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 gateway \"wan1\" refused: its place 2 is behind the end",
                                          "3 gateway \"usb0\" refused: its place 3 is behind the end"));
  EXPECT_EQ(ReadText(kOrder4), "wan0\nwan1\n");
}

TEST_F(GatewayTest, Add_ALongOrderLosesItsTail) {
  NetClient client;
  for (Json::UInt i = 0; i < 64; ++i) {
    ASSERT_GE(client.AddGatewayData(Record("usb" + std::to_string(i), i)), 0);
  }
  EXPECT_GE(client.AddGatewayData(Record("wan0", 0U)), 0);
  const std::string order = ReadText(kOrder4);
  EXPECT_EQ(order.substr(0, 10), "wan0\nusb0\n");
  EXPECT_EQ(order.substr(order.size() - 6), "usb62\n");
  EXPECT_EQ(std::count(order.begin(), order.end(), '\n'), 64);
  EXPECT_THAT(TakeLogLines(), IsEmpty());
  for (const Json::UInt place : {64U, 4294967295U}) {
    EXPECT_LT(client.AddGatewayData(Record("usb0", place)), 0);
    EXPECT_THAT(TakeLogLines(), ElementsAre("3 gateway \"usb0\" refused: no order is longer than 64"));
  }
  EXPECT_EQ(ReadText(kOrder4), order);
}

TEST_F(GatewayTest, Add_EveryRefusalSaysWhy) {
  NetClient client;
  Json::Value other = Record("wan1", 0U);
  other["dns"] = "10.8.0.1";
  EXPECT_LT(client.AddGatewayData(Record("eth0;id", 0U)), 0);
  EXPECT_LT(client.AddGatewayData(Record("wan1", -1)), 0);
  EXPECT_LT(client.AddGatewayData(other), 0);
  EXPECT_LT(client.AddGatewayData(Record("wan1", 0U, "GTYPE_V5")), 0);
  EXPECT_LT(client.RefreshGateway(TypeOf("GTYPE_V5")), 0);
  Json::Value list;
  EXPECT_LT(client.GetGatewayListData(TypeOf("GTYPE_V5"), list), 0);
  EXPECT_THAT(TakeLogLines(),
              ElementsAre("3 gateway \"eth0;id\" refused: no interface name",
                          "3 gateway \"wan1\" refused: its priority is no place",
                          "3 gateway \"wan1\" refused: gateway and name server come from the interface's own "
                          "configuration",
                          "3 gateway refused: unknown type", "3 default gateway not refreshed: unknown type",
                          "3 gateways not listed: unknown type"));
}

TEST_F(GatewayTest, Add_ARefusedRecordLeavesKernelAndFileInAgreement) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50");
  Order({"wan0", "wan1"});
  NetClient client;
  ASSERT_GE(client.AddGatewayData(Record("wan1", 0U)), 0);
  EXPECT_LT(client.AddGatewayData(Record("eth0;id", 1U)), 0);
  EXPECT_EQ(ReadText(kOrder4), "wan1\nwan0\n");
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 metric 100\ndefault via 10.9.0.1 dev wan0 metric 101\n");
}

TEST_F(GatewayTest, Add_AnOrderThatCannotBeWrittenLeavesKernelAndFileInAgreement) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50");
  Order({"wan0", "wan1"});
  ASSERT_GE(NetClient().AddGatewayData(Record("wan1", 0U)), 0);
  Shell(std::string("mv ") + kOrder4 + " /etc/elsewhere && ln -s /etc/elsewhere " + kOrder4);
  EXPECT_LT(NetClient().AddGatewayData(Record("usb0", 1U)), 0);
  EXPECT_EQ(ReadText(kOrder4), "wan1\nwan0\n");
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 metric 100\ndefault via 10.9.0.1 dev wan0 metric 101\n");
}

TEST_F(GatewayTest, Add_TwoWhoStoreAnOrderAtOnceAreBothTaken) {
  const auto store = [](const std::vector<std::string> &names) {
    for (int round = 0; round < 50; ++round) {
      Order(names);
    }
  };
  std::thread one(store, std::vector<std::string>{"wan0", "wan1", "usb0"});
  std::thread other(store, std::vector<std::string>{"usb0", "wan1", "wan0"});
  one.join();
  other.join();
  EXPECT_THAT(TakeLogLines(), IsEmpty());
  std::string order = ReadText(kOrder4);
  EXPECT_THAT((std::vector<std::string>{order.substr(0, 5), order.substr(5, 5), order.substr(10)}),
              testing::UnorderedElementsAre("wan0\n", "wan1\n", "usb0\n"));
}

TEST_F(GatewayTest, List_WhatCouldNotHaveBeenStoredIsNoPartOfTheOrder) {
  Shell("mkdir -p /etc/iproute2/config");
  std::string content = "lo\n-x\n\nwan0\na b\nwan0\n";
  for (int i = 0; i < 80; ++i) {
    content += "usb" + std::to_string(i) + "\n";
  }
  WriteText(kOrder4, content);
  Json::Value list;
  ASSERT_GE(NetClient().GetGatewayListData(TypeOf("GTYPE_V4"), list), 0);
  ASSERT_EQ(list.size(), 64U);
  EXPECT_EQ(list[0]["ifname"], "wan0");
  EXPECT_EQ(list[1]["ifname"], "usb0");
}

TEST_F(GatewayTest, Refresh_TrafficLeavesByTheFirstOfTheOrder) {
  Shell("ip route add default via 10.9.0.1 dev wan0 proto dhcp && "
        "ip route add default via 10.8.0.1 dev wan1 metric 50 proto static src 10.8.0.2");
  Order({"wan1", "wan0"});
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 proto static src 10.8.0.2 metric 100\n"
                        "default via 10.9.0.1 dev wan0 proto dhcp metric 101\n");
  EXPECT_EQ(WayOut(), "wan1\n");
  Order({"wan0", "wan1"});
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 proto static src 10.8.0.2 metric 101\n"
                        "default via 10.9.0.1 dev wan0 proto dhcp metric 100\n");
  EXPECT_EQ(WayOut(), "wan0\n");
}

TEST_F(GatewayTest, Refresh_WithoutAnOrderTheRoutesAreLeftAlone) {
  Shell("ip route add default via 10.9.0.1 metric 7");
  EXPECT_GE(NetClient().RefreshGateway(TypeOf("GTYPE_V4")), 0);
  EXPECT_EQ(Defaults(), "default via 10.9.0.1 dev wan0 metric 7\n");
}

TEST_F(GatewayTest, Refresh_AnInterfaceOutsideTheOrderComesLast) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50");
  Order({"wan1"});
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 metric 100\ndefault via 10.9.0.1 dev wan0 metric 101\n");
}

TEST_F(GatewayTest, Refresh_ANewGatewayOfTheLeaseTakesTheOldOnesPlace) {
  Shell("ip route add default via 10.9.0.1 dev wan0 proto dhcp");
  Order({"wan0"});
  Shell("ip route add default via 10.9.0.77 dev wan0 proto dhcp metric 1002");
  ASSERT_GE(NetClient().RefreshGateway(TypeOf("GTYPE_V4")), 0);
  EXPECT_EQ(Defaults(), "default via 10.9.0.77 dev wan0 proto dhcp metric 100\n");
}

TEST_F(GatewayTest, Refresh_ALostLinkGoesBehindAllOthers) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50");
  Order({"wan0", "wan1"});
  Shell("ip link set wan0p down");
  ASSERT_TRUE(Eventually(2000, [] { return Shell("cat /sys/class/net/wan0/carrier") == "0\n"; }));
  Sleep(20);
  ASSERT_GE(NetClient().RefreshGateway(TypeOf("GTYPE_V4")), 0);
  EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 metric 101\n"
                        "default via 10.9.0.1 dev wan0 metric 30000 linkdown\n");
  EXPECT_EQ(WayOut(), "wan1\n");
}

TEST_F(GatewayTest, Refresh_MovesNoTrafficBackToALinkThatSettles) {
  for (const char *metric : {"500", "30000"}) { // settling; or the follower did not see yet that the link is back
    Shell(std::string("ip route replace default via 10.9.0.1 dev wan0 metric ") + metric +
          " && ip route replace default via 10.8.0.1 dev wan1 metric 101");
    Order({"wan0", "wan1"});
    EXPECT_THAT(vornhost::RestoreRoutes(), IsEmpty());
    EXPECT_EQ(Defaults(), "default via 10.8.0.1 dev wan1 metric 101\ndefault via 10.9.0.1 dev wan0 metric 500\n");
  }
}

TEST_F(GatewayTest, Refresh_ADefaultRouteOverSeveralHopsIsLeftAlone) {
  Shell("ip route add default metric 7 nexthop via 10.9.0.1 dev wan0 nexthop via 10.8.0.1 dev wan1");
  const std::string before = Defaults();
  Order({"wan1", "wan0"});
  EXPECT_EQ(Defaults(), before);
}

TEST_F(GatewayTest, Refresh_AnAdvertisedRouteStaysAndGetsACopyBeforeIt) {
  Shell("ip -6 route add default via fe80::1 dev wan0 proto ra metric 1024 && "
        "ip -6 route add default via fe80::2 dev wan1 proto ra metric 1025");
  const std::string advertised = Defaults("-6");
  Order({"wan1", "wan0"}, "GTYPE_V6");
  EXPECT_EQ(WayOut("2001:db8::1"), "wan1\n");
  EXPECT_THAT(Defaults("-6"), HasSubstr("via fe80::2 dev wan1 proto 87 metric 100"));
  EXPECT_THAT(Defaults("-6"), HasSubstr("via fe80::1 dev wan0 proto 87 metric 101"));
  Order({"wan0", "wan1"}, "GTYPE_V6");
  EXPECT_EQ(WayOut("2001:db8::1"), "wan0\n");
  Shell("ip -6 route delete default via fe80::1 dev wan0 proto ra metric 1024"); // its router is gone
  ASSERT_GE(NetClient().RefreshGateway(TypeOf("GTYPE_V6")), 0);
  EXPECT_EQ(WayOut("2001:db8::1"), "wan1\n");
  EXPECT_EQ(Shell("ip -6 route show default proto 87 | wc -l"), "1\n");
}

TEST_F(GatewayTest, Refresh_WhatTheKernelRefusesIsPutBack) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50");
  ASSERT_GE(NetClient().AddGatewayData(Record("wan0", 0U)), 0);
  ASSERT_GE(NetClient().AddGatewayData(Record("wan1", 1U)), 0);
  Shell("ip addr flush dev wan1 && ip route add 10.8.0.1 dev lan0"); // now the gateway is elsewhere
  Shell("ip route replace default via 10.8.0.1 dev wan1 metric 50 onlink && ip addr add 10.8.0.1/32 dev wan1");
  const std::string before = Defaults();
  EXPECT_LT(NetClient().RefreshGateway(TypeOf("GTYPE_V4")), 0);
  EXPECT_EQ(Defaults(), before);
}

TEST_F(GatewayTest, Refresh_AnUnknownTypeIsRefused) {
  for (const char *type : {"", "GTYPE_V5"}) {
    EXPECT_LT(NetClient().RefreshGateway(TypeOf(type)), 0);
  }
  EXPECT_LT(NetClient().RefreshGateway(Json::Value()), 0);
}

TEST_F(GatewayTest, List_TellsOfEachInterfaceHowItStands) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && mkdir -p /run/vorn");
  WriteText("/run/vorn/lease.wan0", "ip=10.9.0.2\nrouter=10.9.0.1\ndns=10.9.0.53 10.9.0.54\n");
  Order({"wan1", "wan0", "usb0", "lan0"});
  Shell("ip link set lan0 down");
  Json::Value list;
  ASSERT_GE(NetClient().GetGatewayListData(TypeOf("GTYPE_V4"), list), 0);
  EXPECT_EQ(Text(list), R"([{"active":false,"dns":"","gateway":"","ifname":"wan1","priority":0,"state":"no-gateway",)"
                        R"("type":"GTYPE_V4"},)"
                        R"({"active":true,"dns":"10.9.0.53 10.9.0.54","gateway":"10.9.0.1","ifname":"wan0",)"
                        R"("priority":1,"state":"ready","type":"GTYPE_V4"},)"
                        R"({"active":false,"dns":"","gateway":"","ifname":"usb0","priority":2,"state":"absent",)"
                        R"("type":"GTYPE_V4"},)"
                        R"({"active":false,"dns":"","gateway":"","ifname":"lan0","priority":3,"state":"down",)"
                        R"("type":"GTYPE_V4"}])");
  Shell("ip link set wan0p down");
  Sleep(50);
  ASSERT_GE(NetClient().GetGatewayListData(TypeOf("GTYPE_V4"), list), 0);
  EXPECT_EQ(list[1]["state"], "no-link");
  ASSERT_GE(NetClient().GetGatewayListData(TypeOf("GTYPE_V6"), list), 0);
  EXPECT_EQ(Text(list), "[]");
}

TEST_F(GatewayTest, List_ARouteOverALostLinkIsNotActive) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 50 && "
        "ip link set wan0p down");
  ASSERT_TRUE(Eventually(2000, [] { return Shell("cat /sys/class/net/wan0/carrier") == "0\n"; }));
  Json::Value list;
  const auto isActive = [&list](const std::string &name) {
    return std::any_of(list.begin(), list.end(), [&name](const Json::Value &record) {
      return record["ifname"] == name && record["active"] == Json::Value(true);
    });
  };
  ASSERT_TRUE(Eventually(
      2000, [&] { return NetClient().GetGatewayListData(TypeOf("GTYPE_V4"), list) >= 0 && isActive("wan1"); }));
  EXPECT_FALSE(isActive("wan0"));
}

TEST_F(GatewayTest, List_ADefaultRouteWithoutAGatewayIsReady) {
  Shell("ip route add default dev wan0");
  Json::Value list;
  ASSERT_GE(NetClient().GetGatewayListData(TypeOf("GTYPE_V4"), list), 0);
  ASSERT_EQ(list.size(), 1U);
  EXPECT_EQ(list[0]["state"], "ready");
  EXPECT_EQ(list[0]["gateway"], "");
}

TEST_F(GatewayTest, List_NullAsksForBothFamiliesAndAnUnknownTypeForNone) {
  Shell("ip route add default via 10.9.0.1 && ip -6 route add default via fd00:8::1");
  Json::Value list;
  ASSERT_GE(NetClient().GetGatewayListData(Json::Value(), list), 0);
  ASSERT_EQ(list.size(), 2U);
  EXPECT_EQ(list[0]["ifname"], "wan0");
  EXPECT_EQ(list[1]["ifname"], "wan1");
  EXPECT_EQ(list[1]["gateway"], "fd00:8::1");
  const Json::Value before = list;
  EXPECT_LT(NetClient().GetGatewayListData(TypeOf("GTYPE_V5"), list), 0);
  EXPECT_LT(NetClient().GetGatewayListData(Json::Value("GTYPE_V4"), list), 0);
  EXPECT_EQ(list, before);
}

TEST(FilterListTest, LetsThroughWhatTheTextNames) {
  const Json::Value all = Parse(R"([{"ifname":"a","state":"ready","active":true},
                                    {"ifname":"b","state":"ready","active":false},{"ifname":"c","state":"no-link"},5])");
  const auto names = [&all](const char *filter) {
    Json::Value list = all;
    EXPECT_GE(FilterList(filter, list), 0);
    return Text(list);
  };
  EXPECT_EQ(names(""), Text(all));
  EXPECT_EQ(names("all"), Text(all));
  EXPECT_EQ(names("active"), R"([{"active":true,"ifname":"a","state":"ready"}])");
  EXPECT_EQ(names("no-link"), R"([{"ifname":"c","state":"no-link"}])");
  EXPECT_EQ(names("absent"), "[]");
  for (const char *filter : {"All", "wan", "ready ", "ready,active"}) {
    Json::Value list = all;
    EXPECT_LT(FilterList(filter, list), 0) << filter;
    EXPECT_EQ(list, all);
  }
  Json::Value none("x");
  EXPECT_LT(FilterList("all", none), 0);
  EXPECT_EQ(none, Json::Value("x"));
}

} // namespace
