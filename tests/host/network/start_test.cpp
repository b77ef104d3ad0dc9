// Bringing the network up, and what its parts do.
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <gmock/gmock.h>

#include <filesystem>

namespace {

namespace fs = std::filesystem;

using hosttest::Home;
using hosttest::kGuestFile;
using hosttest::kLanFile;
using hosttest::kWanFile;
using hosttest::Picture;
using hosttest::ReadFile;
using hosttest::Shell;
using hosttest::Status;
using hosttest::WriteFile;
using testing::HasSubstr;
using testing::Not;

class Start : public Home {};

TEST_F(Start, AgainChangesNothing) {
  const std::string before = Picture();
  const std::string indexes = Shell("ip -o link | cut -d: -f1,2");
  const std::string rules = Shell("nft list ruleset");
  const std::string client = Shell("pgrep -f '[u]dhcpc -i'");
  ASSERT_EQ(Run("start"), 0);
  EXPECT_EQ(Picture(), before);
  EXPECT_EQ(Shell("ip -o link | cut -d: -f1,2"), indexes);
  EXPECT_EQ(Shell("nft list ruleset"), rules);
  EXPECT_EQ(Shell("pgrep -f '[u]dhcpc -i'"), client);
}

TEST_F(Start, BringsUpTheBridgeThatTheFileSays) {
  ASSERT_EQ(Run("switch bridge"), 0);
  const std::string bridge = Picture();
  Shell("ip link delete br0; ip link set eth0 down; kill $(pgrep -f '[u]dhcpc -i')");
  ASSERT_EQ(Run("start"), 0);
  EXPECT_EQ(Picture(), bridge);
  ASSERT_EQ(Run("start"), 0);
  EXPECT_EQ(Picture(), bridge);
}

TEST_F(Start, GoesFromOneTopologyToTheConfiguredOne) {
  const std::string router = Picture();
  ASSERT_EQ(Run("switch bridge"), 0);
  WriteFile(kWanFile, "# the way out\nDEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n");
  ASSERT_EQ(Run("start"), 0);
  EXPECT_EQ(Picture(), router);
}

TEST_F(Start, AccessPointsAreInTheConfiguredBridge) {
  WriteFile(hosttest::kAccessPointFile, "interface=wlan0\nbridge=br0\n");
  ASSERT_EQ(Run("start"), 0);
  EXPECT_EQ(ReadFile(hosttest::kAccessPointFile), "interface=wlan0\nbridge=lbr0\n");
}

// Its adapter was pulled out, or is found late: the home's own network is there, and the topology can be left.
TEST_F(Start, ClientWithoutAnAdapterHasItsLanAndCanBeLeft) {
  const std::string router = Picture();
  WriteFile(kWanFile, "# the way out\nDEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=yes\nBRIDGE=lbr0\n");
  Shell("ip link delete lbr0");
  EXPECT_EQ(Run("start"), 1);
  EXPECT_THAT(hosttest::TakeSystemLog(), HasSubstr("no way out in client topology: no wireless adapter"));
  const std::string client = Picture();
  EXPECT_THAT(client, HasSubstr("address lbr0 192.168.1.1/24"));
  EXPECT_THAT(client, Not(HasSubstr("DHCP client on")));
  for (const char *port : {"eth0", "lan1"}) {
    EXPECT_THAT(Shell(std::string("ip link show ") + port), HasSubstr("master lbr0")) << port;
  }
  EXPECT_THAT(Shell(std::string(hosttest::kProgram) + " status"), HasSubstr("topology:   client\n"));
  ASSERT_EQ(Run("switch router"), 0);
  EXPECT_EQ(Picture(), router);
}

TEST_F(Start, OneMissingPortDoesNotCostTheOthers) {
  Shell("ip link delete lbr0");
  WriteFile(kLanFile, "DEVICE=lbr0\nIPADDR=192.168.1.1\nNETMASK=255.255.255.0\nPORTS=\"lan1 nosuch ../x lan2\"\n");
  EXPECT_EQ(Run("start"), 1);
  EXPECT_THAT(hosttest::TakeSystemLog(), HasSubstr("attach \"nosuch\" failed"));
  EXPECT_THAT(Shell("ip link show lan1"), HasSubstr("master lbr0"));
  EXPECT_THAT(Shell("ip link show lan2"), HasSubstr("master lbr0"));
  EXPECT_THAT(Picture(), HasSubstr("address lbr0 192.168.1.1/24"));
}

TEST_F(Start, AddressThatIsNoneIsLeftOut) {
  Shell("ip link delete lbr0");
  WriteFile(kLanFile, "DEVICE=lbr0\nIPADDR=\"192.168.1.1; reboot\"\nNETMASK=255.0.255.0\nPORTS=\"lan1\"\n");
  Run("start");
  EXPECT_THAT(Picture(), Not(HasSubstr("address lbr0")));
  EXPECT_THAT(hosttest::TakeSystemLog(), HasSubstr("IPADDR=192.168.1.1; reboot is not valid"));
}

TEST_F(Start, GuestBridgeIsOptional) {
  Shell("ip link delete gbr0");
  fs::remove(kGuestFile);
  EXPECT_EQ(Run("start"), 0);
  EXPECT_THAT(Picture(), Not(HasSubstr("link gbr0")));
}

TEST_F(Start, ConfiguredMacAddressIsTheBridges) {
  Shell("ip link delete lbr0");
  WriteFile(kLanFile, "DEVICE=lbr0\nMACADDR=02:00:5e:00:00:01\nIPADDR=192.168.1.1\nPORTS=\"lan1 lan2 lan3\"\n");
  EXPECT_EQ(Run("start"), 0);
  EXPECT_THAT(Picture(), HasSubstr("link lbr0 bridge 02:00:5e:00:00:01 up"));
  const std::string before = Picture();
  EXPECT_EQ(Run("switch bridge"), 0);
  EXPECT_EQ(Run("switch router"), 0);
  EXPECT_EQ(Picture(), before);
}

TEST_F(Start, StatusIsForPeople) {
  const std::string status = Shell(std::string(hosttest::kProgram) + " status");
  EXPECT_THAT(status, HasSubstr("topology:   router\n"));
  EXPECT_THAT(status, HasSubstr("no switch is under way"));
  EXPECT_THAT(status, HasSubstr("lan1 up, port of lbr0"));
  EXPECT_THAT(status, HasSubstr("192.168.1.1/24"));
}

// The provider's side reaches nothing that was not asked for.
TEST_F(Start, FirewallKeepsTheOutsideOut) {
  const std::string ours = Shell("ip -4 -o address show eth0 | sed 's/.*inet //; s,/.*,,' | tr -d '\\n'");
  const int server = hosttest::StartProgram({"/bin/busybox", "httpd", "-f", "-p", "80", "-h", "/etc/sysconfig"});
  ASSERT_TRUE(hosttest::Eventually(
      3000, [] { return Status("curl -s --noproxy '*' --max-time 1 -o /dev/null http://192.168.1.1/") == 0; }));
  EXPECT_THROW(AtProvider("curl -s --noproxy '*' --max-time 1 http://" + ours + "/"), std::runtime_error);
  EXPECT_NO_THROW(AtProvider("busybox ping -c 1 -W 1 " + ours));
  AtProvider("ip route add 192.168.1.0/24 via " + ours);
  EXPECT_THROW(AtProvider("curl -s --noproxy '*' --max-time 1 http://192.168.1.1/"), std::runtime_error);
  kill(server, SIGKILL);
  hosttest::WaitFor(server);
}

// The script with what a hostile server may say.
class DhcpScript : public Home {
protected:
  static int Event(const std::string &event, const std::string &lease) {
    return Status("env -i interface=lan1 " + lease + " /usr/vorn/sbin/udhcpc.script " + event + " 2>/dev/null");
  }
  static std::string Addresses() { return Shell("ip -4 -o address show lan1"); }
};

TEST_F(DhcpScript, SetsAddressRouteAndNameServers) {
  Shell("ip link set lan1 nomaster");
  EXPECT_EQ(Event("bound", "ip=10.9.0.5 mask=16 router='10.9.0.1 10.9.0.2' dns='10.9.0.1 10.9.0.3' domain=home.arpa"),
            0);
  EXPECT_THAT(Addresses(), HasSubstr("10.9.0.5/16"));
  EXPECT_THAT(Shell("ip route"), HasSubstr("default via 10.9.0.1 dev lan1"));
  // The other way out, eth0, has a lease too: its server stands behind.
  EXPECT_EQ(ReadFile("/etc/resolv.conf"),
            "search home.arpa\nnameserver 10.9.0.1\nnameserver 10.9.0.3\nnameserver 203.0.113.1\n");
}

TEST_F(DhcpScript, NameServersOfAWayOutThatWasLeftAreNotAsked) {
  Shell("ip link set lan1 nomaster && ip address add 10.78.0.5/24 dev lan2");
  WriteFile("/run/vorn/lease.gone", "ip=10.76.0.5\nrouter=\ndns=10.76.0.1\n"); // no such interface
  WriteFile("/run/vorn/lease.br0", "ip=10.77.0.5\nrouter=\ndns=10.77.0.1\n");
  WriteFile("/run/vorn/lease.lan2", "ip=10.78.0.5\nrouter=\ndns=10.78.0.1\n");
  EXPECT_EQ(Event("bound", "ip=10.9.0.5 mask=16 dns=10.9.0.1"), 0);
  EXPECT_EQ(ReadFile("/etc/resolv.conf"), "nameserver 10.9.0.1\nnameserver 203.0.113.1\nnameserver 10.78.0.1\n");
}

TEST_F(DhcpScript, NewLeaseReplacesTheOldOneAndNothingElse) {
  Shell("ip link set lan1 nomaster && ip address add 10.77.0.1/24 dev lan1");
  EXPECT_EQ(Event("bound", "ip=10.9.0.5 mask=16"), 0);
  EXPECT_EQ(Event("renew", "ip=10.9.0.6 mask=16"), 0);
  EXPECT_THAT(Addresses(), Not(HasSubstr("10.9.0.5/")));
  EXPECT_THAT(Addresses(), HasSubstr("10.9.0.6/16"));
  EXPECT_THAT(Addresses(), HasSubstr("10.77.0.1/24"));
  EXPECT_EQ(Event("deconfig", ""), 0);
  EXPECT_THAT(Addresses(), Not(HasSubstr("10.9.0.6/")));
  EXPECT_THAT(Addresses(), HasSubstr("10.77.0.1/24"));
}

TEST_F(DhcpScript, HostileValuesAreNotUsed) {
  Shell("ip link set lan1 nomaster");
  const std::string before = ReadFile("/etc/resolv.conf");
  for (const char *lease : {"ip='10.9.0.5 dev lo' mask=16", "ip='$(touch /tmp/ran)' mask=16",
                            "ip=10.9.0.5 mask='16 dev lo'", "ip=10.9.0.5 mask=33", "ip=10.9.0.5 mask=0", "ip= mask=16",
                            "ip=10.9.0 mask=16", "ip=10.9.0.5.6 mask=16", "mask=16"}) {
    EXPECT_NE(Event("bound", lease), 0) << lease;
  }
  EXPECT_EQ(Addresses(), "");
  EXPECT_EQ(
      Event("bound",
            "ip=10.9.0.5 mask=16 router='`touch /tmp/ran`' dns='$(touch /tmp/ran) *' domain='a\nnameserver 6.6.6.6'"),
      0);
  EXPECT_THAT(Shell("ip route"), Not(HasSubstr("dev lan1 proto dhcp")));
  EXPECT_EQ(ReadFile("/etc/resolv.conf"), before);
  EXPECT_FALSE(fs::exists("/tmp/ran"));
  EXPECT_FALSE(fs::exists("/etc/.resolv.conf.vorn"));
}

} // namespace
