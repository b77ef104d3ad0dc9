// Interfaces of the test's own network.
#include "platform/netif.h"
#include "platform/utility.h"
#include "tests/host/network/shell.h"

#include <gmock/gmock.h>

#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <set>
#include <string>
#include <vector>

namespace {

using hosttest::RemoveLinks;
using hosttest::Shell;
using testing::ElementsAre;

class Netif : public testing::Test {
protected:
  void SetUp() override { RemoveLinks(); }
  void TearDown() override { RemoveLinks(); }
};

// One text an entry: "name ip/mask".
std::vector<std::string> Enumerate(int kind, int capacity = 64) {
  std::vector<QARDNetInterface> entries(64);
  const int count = QARDNetInterfaceEnum(entries.data(), capacity, kind);
  std::vector<std::string> out;
  for (int at = 0; at < count; ++at) {
    const QARDNetInterface &entry = entries[static_cast<size_t>(at)];
    out.push_back(std::string(entry.name) + " " + entry.ip + "/" + entry.mask);
  }
  return out;
}

void MakeRouter() {
  Shell("set -e; ip link add eth0 type veth peer name w0; ip address add 203.0.113.5/24 dev eth0;"
        "ip link add lbr0 type bridge; ip address add 192.168.1.1/24 dev lbr0; ip address add 192.168.9.1/16 dev lbr0;"
        "ip link add gbr0 type bridge; ip address add 192.168.2.1/25 dev gbr0; ip link add xbr9 type bridge;"
        "ip address add 10.0.0.1/8 dev xbr9");
}

TEST_F(Netif, AllIsEveryInterfaceInTheKernelsOrder) {
  MakeRouter();
  EXPECT_THAT(Enumerate(QARD_NETIF_ALL), ElementsAre("lo 127.0.0.1/255.0.0.0", "w0 /", "eth0 203.0.113.5/255.255.255.0",
                                                     "lbr0 192.168.1.1/255.255.255.0",
                                                     "gbr0 192.168.2.1/255.255.255.128", "xbr9 10.0.0.1/255.0.0.0"));
}

TEST_F(Netif, EveryChangeIsSeenByTheNextCall) {
  MakeRouter();
  ASSERT_EQ(Enumerate(QARD_NETIF_LAN).size(), 2U);
  for (int round = 0; round < 50; ++round) {
    const std::string address = "192.168.77." + std::to_string(round + 1);
    Shell("ip address flush dev gbr0 scope global && ip address add " + address + "/24 dev gbr0");
    EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre(testing::_, "gbr0 " + address + "/255.255.255.0"));
  }
  Shell("ip link set gbr0 name gbr7");
  EXPECT_EQ(Enumerate(QARD_NETIF_LAN).size(), 1U);
  Shell("ip link set gbr7 name gbr0 && ip link del lbr0");
  EXPECT_EQ(Enumerate(QARD_NETIF_LAN).size(), 1U);
}

TEST_F(Netif, MoreChangesThanTheKernelKeepsForUsAreSeenToo) {
  MakeRouter();
  ASSERT_EQ(Enumerate(QARD_NETIF_LAN).size(), 2U);
  Shell("for i in $(seq 200); do echo \"link set gbr0 mtu $((1300 + i % 7))\"; done | ip -batch -; ip link del gbr0");
  EXPECT_EQ(Enumerate(QARD_NETIF_LAN).size(), 1U);
}

TEST_F(Netif, ChildSeesChangesAndTakesNoneFromItsParent) {
  MakeRouter();
  ASSERT_EQ(Enumerate(QARD_NETIF_LAN).size(), 2U);
  Shell("ip link del gbr0");
  const pid_t child = fork();
  if (child == 0) {
    _exit(static_cast<int>(Enumerate(QARD_NETIF_LAN).size()));
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(WEXITSTATUS(status), 1);
  EXPECT_EQ(Enumerate(QARD_NETIF_LAN).size(), 1U);
}

TEST_F(Netif, LanIsLanAndGuestBridge) {
  MakeRouter();
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN),
              ElementsAre("lbr0 192.168.1.1/255.255.255.0", "gbr0 192.168.2.1/255.255.255.128"));
}

TEST_F(Netif, LanLeavesOutABridgeWithoutIpv4) {
  MakeRouter();
  Shell("ip address flush dev gbr0 && ip address add 2001:db8::1/64 dev gbr0");
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre("lbr0 192.168.1.1/255.255.255.0"));
}

TEST_F(Netif, LanIsTheOneBridgeOnlyWhileItHasTheWanPort) {
  Shell("set -e; ip link add eth0 type veth peer name w0; ip link add br0 type bridge;"
        "ip address add 203.0.113.5/32 dev br0");
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre());
  Shell("ip link set eth0 master br0");
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre("br0 203.0.113.5/255.255.255.255"));
}

TEST_F(Netif, LanNeedsABridge) {
  Shell("ip link add lbr0 type veth peer name w0 && ip address add 192.168.1.1/24 dev lbr0");
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre());
}

TEST_F(Netif, LabelledAddressBelongsToItsInterface) {
  Shell("ip link add lbr0 type bridge && ip address add 192.168.1.1/24 dev lbr0 label lbr0:1");
  EXPECT_THAT(Enumerate(QARD_NETIF_LAN), ElementsAre("lbr0 192.168.1.1/255.255.255.0"));
}

TEST_F(Netif, CapacityIsKept) {
  MakeRouter();
  std::array<QARDNetInterface, 3> entries;
  std::memset(entries.data(), 0x5a, sizeof(entries));
  EXPECT_EQ(QARDNetInterfaceEnum(entries.data(), 2, QARD_NETIF_ALL), 2);
  EXPECT_STREQ(entries[1].name, "w0");
  EXPECT_EQ(reinterpret_cast<const char *>(&entries[2])[0], 0x5a);
  EXPECT_EQ(QARDNetInterfaceEnum(entries.data(), 0, QARD_NETIF_ALL), 0);
}

TEST_F(Netif, UnusedBytesAreZero) {
  MakeRouter();
  std::array<QARDNetInterface, 8> entries;
  std::memset(entries.data(), 0x5a, sizeof(entries));
  ASSERT_EQ(QARDNetInterfaceEnum(entries.data(), 8, QARD_NETIF_ALL), 6);
  QARDNetInterface expected{};
  std::strcpy(expected.name, "lbr0");
  std::strcpy(expected.ip, "192.168.1.1");
  std::strcpy(expected.mask, "255.255.255.0");
  EXPECT_EQ(std::memcmp(&entries[3], &expected, sizeof(expected)), 0);
}

TEST_F(Netif, MoreThan32InterfacesFillExactly32) {
  for (int number = 0; number < 40; ++number) {
    Shell("ip link add p" + std::to_string(number) + " type bridge");
  }
  EXPECT_EQ(Enumerate(QARD_NETIF_ALL, 32).size(), 32U);
  const std::vector<std::string> all = Enumerate(QARD_NETIF_ALL);
  EXPECT_EQ(std::set<std::string>(all.begin(), all.end()).size(), 41U);
}

TEST_F(Netif, LongestNameIsWhole) {
  Shell("ip link add abcdefghijklmno type bridge");
  EXPECT_EQ(Enumerate(QARD_NETIF_ALL).back(), "abcdefghijklmno /");
}

TEST_F(Netif, WrongArgumentsAreErrors) {
  std::array<QARDNetInterface, 1> entries{};
  EXPECT_LT(QARDNetInterfaceEnum(nullptr, 1, QARD_NETIF_ALL), 0);
  EXPECT_LT(QARDNetInterfaceEnum(entries.data(), -1, QARD_NETIF_ALL), 0);
  EXPECT_LT(QARDNetInterfaceEnum(entries.data(), 1, 1), 0);
  EXPECT_LT(QARDNetInterfaceEnum(entries.data(), 1, -1), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
}

TEST_F(Netif, InformationIsTheFirstAddress) {
  MakeRouter();
  VORNNetIFInfo info{};
  EXPECT_EQ(VORNNetIFGetInfo("lbr0", 0, &info), 1);
  EXPECT_STREQ(info.ip, "192.168.1.1");
  EXPECT_STREQ(info.mask, "255.255.255.0");
}

TEST_F(Netif, InformationOfWhatHasNoneIsAnError) {
  MakeRouter();
  VORNNetIFInfo info{"before", "before"};
  EXPECT_LT(VORNNetIFGetInfo("w0", 0, &info), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_LT(VORNNetIFGetInfo("nosuch", 0, &info), 0);
  EXPECT_LT(VORNNetIFGetInfo("lbr0-and-much-longer", 0, &info), 0);
  EXPECT_LT(VORNNetIFGetInfo("", 0, &info), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NOT_FOUND);
  EXPECT_LT(VORNNetIFGetInfo(nullptr, 0, &info), 0);
  EXPECT_LT(VORNNetIFGetInfo("lbr0", 0, nullptr), 0);
  EXPECT_LT(VORNNetIFGetInfo("lbr0", 1, &info), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  EXPECT_STREQ(info.ip, "before");
}

} // namespace
