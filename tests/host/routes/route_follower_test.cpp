// Routes that follow the network: what goes with an interface comes back with it, and the traffic moves to a link that
// works.
#include "host/routes/route_follower.h"
#include "platform/netclient.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/routes/scene.h"

#include <unistd.h>

#include <chrono>
#include <memory>

using namespace hosttest; // NOLINT(google-build-using-namespace)
using std::chrono::steady_clock;
using vornnetwork::network::IP_TYPE_V6;

namespace {

class RouteFollowerTest : public RoutesTest {
protected:
  void Follow() {
    follower_ = std::make_unique<Child>([] { vornhost::RouteFollower().Follow(); });
  }

  std::unique_ptr<Child> follower_;
};

void StoreOrder(const char *content) {
  Shell("mkdir -p /etc/iproute2/config");
  WriteText("/etc/iproute2/config/gateway-order", content);
  WriteText("/etc/iproute2/config/gateway-order-v6", content);
}

bool LeavesBy(const std::string &ifname, const char *address = "198.51.100.1") {
  return Shell(std::string("ip route get ") + address + " || true").find(" dev " + ifname + " ") != std::string::npos;
}

TEST_F(RouteFollowerTest, RulesAreThereAtTheStart) {
  ASSERT_EQ(SetRules(ManyRules(3, "192.168.7.2")), 0);
  const std::string before = OwnRoutes();
  Shell("ip route flush proto 86");
  Follow();
  EXPECT_TRUE(Eventually(2000, [&] { return OwnRoutes() == before; }));
}

TEST_F(RouteFollowerTest, RulesComeBackWithTheirInterface) {
  ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "10.9.0.1", "wan0"))), 0);
  ASSERT_EQ(SetRules(List(Rule6("2001:db8:5::", "48", "fd00:9::1", "wan0"), Rule6("2001:db8:6::", "48", "", "wan0")),
                     IP_TYPE_V6),
            0);
  const std::string four = OwnRoutes("-4");
  const std::string six = OwnRoutes("-6");
  Follow();
  Shell("ip link set wan0 down");
  EXPECT_EQ(OwnRoutes("-4") + OwnRoutes("-6"), "");
  Shell("ip link set wan0 up && ip addr add fd00:9::2/64 nodad dev wan0");
  EXPECT_TRUE(Eventually(2000, [&] { return OwnRoutes("-4") == four && OwnRoutes("-6") == six; }));
  Shell("ip link delete wan0");
  EXPECT_EQ(OwnRoutes("-4"), "");
  Shell("ip link add wan0 type veth peer name wan0p && ip link set wan0p up && ip link set wan0 up && "
        "ip addr add 10.9.0.2/24 dev wan0");
  EXPECT_TRUE(Eventually(2000, [&] { return OwnRoutes("-4") == four; }));
}

TEST_F(RouteFollowerTest, ARuleWhoseGatewayLeftItsLinkIsTakenOut) {
  ASSERT_EQ(SetRules(List(Rule4("10.20.0.0", "255.255.0.0", "10.9.0.1", "wan0"))), 0);
  Follow();
  Shell("ip addr add 10.66.0.1/24 dev wan0 && ip addr del 10.9.0.2/24 dev wan0");
  EXPECT_TRUE(Eventually(2000, [] { return OwnRoutes().empty(); }));
}

TEST_F(RouteFollowerTest, TrafficMovesAtOnceAndBackOnlyToALinkThatStays) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 9");
  StoreOrder("wan0\nwan1\n");
  Follow();
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan0"); }));
  const auto lost = steady_clock::now();
  Shell("ip link set wan0p down");
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan1"); }));
  std::printf("moved after %.0f ms\n", std::chrono::duration<double, std::milli>(steady_clock::now() - lost).count());
  for (int bounce = 0; bounce < 5; ++bounce) {
    Shell("ip link set wan0p up");
    Sleep(150);
    EXPECT_TRUE(LeavesBy("wan1"));
    Shell("ip link set wan0p down");
    Sleep(150);
    EXPECT_TRUE(LeavesBy("wan1"));
  }
  Shell("ip link set wan0p up");
  const auto back = steady_clock::now();
  ASSERT_TRUE(Eventually(10000, [] { return LeavesBy("wan0"); }));
  EXPECT_GT(steady_clock::now() - back, std::chrono::seconds(4));
}

TEST_F(RouteFollowerTest, ASettlingLinkIsBetterThanNone) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 9");
  StoreOrder("wan0\nwan1\n");
  Follow();
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan0"); }));
  Shell("ip link set wan1p down && ip link set wan0p down");
  Sleep(300);
  Shell("ip link set wan1p up");
  EXPECT_TRUE(Eventually(1000, [] { return LeavesBy("wan1"); }));
}

TEST_F(RouteFollowerTest, ARefreshOfSomebodyElseMovesNothingBackToASettlingLink) {
  Shell("ip route add default via 10.9.0.1 dev wan0 && ip route add default via 10.8.0.1 dev wan1 metric 9");
  StoreOrder("wan0\nwan1\n");
  Follow();
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan0"); }));
  Shell("ip link set wan0p down");
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan1"); }));
  const auto back = steady_clock::now();
  Shell("ip link set wan0p up");
  Json::Value request;
  request["type"] = "GTYPE_V4";
  while (steady_clock::now() - back < std::chrono::seconds(3)) {
    ASSERT_GE(vornnetwork::dbus::NetClient().RefreshGateway(request), 0);
    vornhost::RestoreRoutes();
    ASSERT_TRUE(LeavesBy("wan1"));
    Sleep(50);
  }
  EXPECT_TRUE(Eventually(10000, [] { return LeavesBy("wan0"); }));
}

TEST_F(RouteFollowerTest, AnInterfaceThatTheKernelRefusesCostsNoOther) {
  Shell("ip route add default via 10.9.0.1 dev wan0");
  Shell("ip addr flush dev wan1 && ip route add default via 10.8.0.1 dev wan1 metric 5000 onlink && "
        "ip addr add 10.8.0.1/32 dev wan1"); // a gateway that is the router itself now
  StoreOrder("wan1\nwan0\n");
  Follow();
  EXPECT_TRUE(Eventually(2000, [] {
    return Shell("ip route show default | sed 's/ *$//'") ==
           "default via 10.9.0.1 dev wan0 metric 101\ndefault via 10.8.0.1 dev wan1 metric 5000 onlink\n";
  })) << Shell("ip route show default");
  Shell("ip addr add 10.8.0.2/24 dev wan1 && ip addr del 10.8.0.1/32 dev wan1"); // now it is not
  EXPECT_TRUE(Eventually(2000, [] { return LeavesBy("wan1"); }));
}

TEST_F(RouteFollowerTest, AGatewayOutsideItsLeasesSubnetIsReachedOnTheLink) {
  Shell("ip addr flush dev wan0 && ip addr add 10.9.0.2/32 dev wan0 && mkdir -p /run/vorn");
  WriteText("/run/vorn/lease.wan0", "ip=10.9.0.2\nrouter=10.66.0.1\n");
  StoreOrder("wan0\n");
  Follow();
  EXPECT_TRUE(Eventually(2000, [] {
    return Shell("ip route show default | sed 's/ *$//'") ==
           "default via 10.66.0.1 dev wan0 proto dhcp metric 100 onlink\n";
  })) << Shell("ip route show default");
}

TEST_F(RouteFollowerTest, WhatCouldNotBeDoneIsTriedAgainWithoutNews) {
  ASSERT_EQ(SetRules(ManyRules(1, "192.168.7.2")), 0);
  const std::string file = ReadText("/etc/iproute2/config/static-route");
  const std::string before = OwnRoutes();
  WriteText("/etc/iproute2/config/static-route", "no rules");
  Shell("ip route flush proto 86");
  Follow();
  Sleep(300);
  EXPECT_EQ(OwnRoutes(), "");
  WriteText("/etc/iproute2/config/static-route", file); // which no netlink message tells of
  EXPECT_TRUE(Eventually(8000, [&] { return OwnRoutes() == before; }));
}

TEST_F(RouteFollowerTest, ASocketThatIsNoneAnyMoreEndsIt) {
  const int before = dup(STDIN_FILENO); // the lowest number that is free is the socket's
  close(before);
  vornhost::RouteFollower follower;
  ASSERT_EQ(dup2(STDIN_FILENO, before), before);
  EXPECT_THROW(follower.Follow(), std::runtime_error);
}

TEST_F(RouteFollowerTest, AnInterfaceSetDownAndUpGetsTheRouteOfItsLeaseAgain) {
  Shell("ip route add default via 10.9.0.1 dev wan0 proto dhcp && mkdir -p /run/vorn");
  WriteText("/run/vorn/lease.wan0", "ip=10.9.0.2\nrouter=10.9.0.1\n");
  StoreOrder("wan0\n");
  Follow();
  Shell("ip link set wan0 down");
  EXPECT_EQ(Shell("ip route show default"), "");
  Shell("ip link set wan0 up");
  EXPECT_TRUE(Eventually(2000, [] { return LeavesBy("wan0"); }));
  Shell("ip addr flush dev wan0"); // the lease is over
  Shell("ip addr add 10.9.0.9/24 dev wan0");
  Sleep(200);
  EXPECT_EQ(Shell("ip route show default"), "");
}

TEST_F(RouteFollowerTest, Ipv6TrafficMovesWithTheAdvertisedRoutes) {
  Shell("ip -6 route add default via fe80::1 dev wan0 proto ra metric 1024 && "
        "ip -6 route add default via fe80::2 dev wan1 proto ra metric 1025");
  StoreOrder("wan1\nwan0\n");
  Follow();
  ASSERT_TRUE(Eventually(2000, [] { return LeavesBy("wan1", "2001:db8::1"); }));
  Shell("ip link set wan1p down");
  EXPECT_TRUE(Eventually(2000, [] { return LeavesBy("wan0", "2001:db8::1"); }));
  Shell("ip link set wan1p up");
  EXPECT_TRUE(Eventually(10000, [] { return LeavesBy("wan1", "2001:db8::1"); }));
}

TEST_F(RouteFollowerTest, ItsOwnChangesEndInSilence) {
  Shell("ip route add default via 10.9.0.1 dev wan0");
  StoreOrder("wan0\n");
  ASSERT_EQ(SetRules(ManyRules(20, "192.168.7.2")), 0);
  Follow();
  Sleep(300);
  const std::string before = AllRoutes();
  Child monitor([] {
    if (std::freopen("/tmp/quiet", "w", stdout) != nullptr) {
      execlp("ip", "ip", "monitor", "route", nullptr);
    }
  });
  Sleep(1000);
  EXPECT_EQ(ReadText("/tmp/quiet"), "");
  EXPECT_EQ(AllRoutes(), before);
}

} // namespace
