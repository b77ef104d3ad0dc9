// The wired half of the connection list: the kernel's neighbour table, read and refreshed.
#include "router/connectionlist.h"
#include "tests/router/network_files.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

using scripted::Get;
using scripted::kNeighbourTitle;
using scripted::Lines;
using scripted::NeighbourLine;
using scripted::Parse;
using scripted::PutNeighbours;
using scripted::RemoveNeighbours;
using scripted::Text;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

namespace {

constexpr char kMac[] = "aa:bb:cc:dd:ee:01";
const std::string kNoTable = "connectionlist: failed to open file (/proc/net/arp)";

class ArpTableTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().lans = {{"br0", "192.168.1.1", "255.255.255.0"},
                  {"lbr0", "192.168.1.1", "255.255.255.0"},
                  {"xbry", "192.168.1.1", "255.255.255.0"}};
    Get().subnets["192.168.1.1"] = {"192.168.1.5", "192.168.1.6"};
  }
  static std::string Load() {
    Json::Value stations(Json::arrayValue);
    EXPECT_TRUE(ConnectionList().LoadArpConnData(stations));
    return Text(stations);
  }
  static std::string Record(const std::string &ip, const std::string &mac, const std::string &netif) {
    return R"({"connection":"ethernet","hostname":"","ip":")" + ip + R"(","mac":")" + mac + R"(","netif":")" + netif +
           "\"}";
  }
  static Lines RefreshCalls(const std::string &ip, const std::string &interface) {
    return {"QARDCExec(/sbin/arp, -d, " + ip + ", null, null)",
            "QARDCExec(/usr/bin/arping, " + ip + ", " + interface + ", -w1, -f)"};
  }
};

TEST_F(ArpTableTest, Load_MakesARecordOfEachNeighbourOnABridge) {
  PutNeighbours(kNeighbourTitle + NeighbourLine("192.168.1.5", kMac, "lbr0") +
                NeighbourLine("192.168.1.6", "AA:BB:CC:DD:EE:02", "br0"));
  EXPECT_EQ(Load(),
            "[" + Record("192.168.1.5", kMac, "lbr0") + "," + Record("192.168.1.6", "AA:BB:CC:DD:EE:02", "br0") + "]");
  EXPECT_THAT(Get().calls,
              ElementsAre("VORNNetIFGetInfo(lbr0, 0)", "VORNNetIsSameSubnet(192.168.1.5, 192.168.1.1, 255.255.255.0)",
                          "VORNNetIFGetInfo(br0, 0)", "VORNNetIsSameSubnet(192.168.1.6, 192.168.1.1, 255.255.255.0)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ArpTableTest, Load_AppendsAndKeepsDuplicates) {
  const std::string line = NeighbourLine("192.168.1.5", kMac, "xbry");
  PutNeighbours(line + line);
  Json::Value stations = Parse("[1]");
  EXPECT_TRUE(ConnectionList().LoadArpConnData(stations));
  const std::string record = Record("192.168.1.5", kMac, "xbry");
  EXPECT_EQ(Text(stations), "[1," + record + "," + record + "]");
}

TEST_F(ArpTableTest, Load_LeavesIncompleteEntriesAndOtherInterfacesOut) {
  PutNeighbours(kNeighbourTitle + NeighbourLine("192.168.1.5", "00:00:00:00:00:00", "lbr0", "0x0") +
                NeighbourLine("192.168.1.5", kMac, "eth0") + NeighbourLine("192.168.1.5", kMac, "wlan0") +
                NeighbourLine("192.168.1.5", kMac, "b-r0") + NeighbourLine("192.168.1.5", kMac, "BR0"));
  EXPECT_EQ(Load(), "[]");
  EXPECT_THAT(Get().calls, IsEmpty());
}

TEST_F(ArpTableTest, Load_BrAnywhereInTheNameIsABridge) {
  for (const char *name : {"br", "br0", "lbr0", "gbr0", "zebra", "xbr", "library1", "0br"}) {
    Get().lans.push_back({name, "192.168.1.1", "255.255.255.0"});
    PutNeighbours(NeighbourLine("192.168.1.5", kMac, name));
    EXPECT_EQ(Load(), "[" + Record("192.168.1.5", kMac, name) + "]");
  }
}

TEST_F(ArpTableTest, Load_BrInAnotherColumnIsNone) {
  PutNeighbours("br0 br br br br eth0\nbr0 0x1 0x2 br:br br0\n192.168.1.5 0x1 0x2 " + std::string(kMac) + " * e br0\n");
  EXPECT_EQ(Load(), "[]");
}

TEST_F(ArpTableTest, Load_OnlyTheExactFlags0x0IsIncomplete) {
  for (const char *flags : {"0x2", "0x6", "0x00", "0X0", "0", "0xc"}) {
    PutNeighbours(NeighbourLine("192.168.1.5", kMac, "lbr0", flags));
    EXPECT_EQ(Load(), "[" + Record("192.168.1.5", kMac, "lbr0") + "]") << flags;
  }
}

TEST_F(ArpTableTest, Load_LinesWithMissingColumnsDropOut) {
  std::string table;
  const std::string line = NeighbourLine("192.168.1.5", kMac, "lbr0");
  for (size_t length = 0; length + 5 < line.size(); ++length) { // up to before the interface
    table += line.substr(0, length) + "\n";
  }
  PutNeighbours(table + "\n \n\t\n" + line.substr(0, line.size() - 1));
  EXPECT_EQ(Load(), "[" + Record("192.168.1.5", kMac, "lbr0") + "]");
}

TEST_F(ArpTableTest, Load_AnyBlanksAndFurtherColumnsMakeNoDifference) {
  PutNeighbours("\t 192.168.1.5\t0x1\v0x2 \f" + std::string(kMac) + "\r* lbr0 more br0\n");
  EXPECT_EQ(Load(), "[" + Record("192.168.1.5", kMac, "lbr0") + "]");
}

TEST_F(ArpTableTest, Load_EmptyTableAndTableOfRubbishAreNoFailure) {
  for (const std::string &table : {std::string(), std::string("\n"), kNeighbourTitle, std::string(1 << 20, 'x'),
                                   std::string(1 << 20, '\0'), std::string("\xff\xfe\n\x01")}) {
    PutNeighbours(table);
    EXPECT_EQ(Load(), "[]");
  }
}

TEST_F(ArpTableTest, Load_TableThatCannotBeOpenedFails) {
  RemoveNeighbours();
  Json::Value stations(Json::arrayValue);
  EXPECT_FALSE(ConnectionList().LoadArpConnData(stations));
  EXPECT_EQ(Text(stations), "[]");
  EXPECT_THAT(Get().log, ElementsAre(kNoTable));
}

TEST_F(ArpTableTest, Load_ReadsALongTableWhole) {
  std::string table = kNeighbourTitle;
  for (int i = 0; i < 4000; ++i) {
    const std::string ip = "10.0." + std::to_string(i / 250) + "." + std::to_string(i % 250);
    table += NeighbourLine(ip, kMac, "lbr0");
    Get().subnets["192.168.1.1"].insert(ip);
  }
  PutNeighbours(table);
  Json::Value stations(Json::arrayValue);
  EXPECT_TRUE(ConnectionList().LoadArpConnData(stations));
  ASSERT_EQ(stations.size(), 4000U);
  EXPECT_EQ(stations[3999]["ip"].asString(), "10.0.15.249");
}

TEST_F(ArpTableTest, NeighbourOfAnotherSubnetIsNotListedButRefreshed) {
  PutNeighbours(kNeighbourTitle + NeighbourLine("203.0.113.9", kMac, "br0"));
  EXPECT_EQ(Load(), "[]");
  Get().calls.clear();
  EXPECT_TRUE(ConnectionList().UpdateArpTable());
  EXPECT_THAT(Get().calls,
              ElementsAreArray(scripted::Join({{"GetTopologyString()"}, RefreshCalls("203.0.113.9", "-Ilbr0")})));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ArpTableTest, Check_NeedsAddressMacAndInterface) {
  for (const char *record :
       {R"({"ip":"192.168.1.5","mac":"m"})", R"({"ip":"192.168.1.5","netif":"br0"})", R"({"mac":"m","netif":"br0"})",
        R"({"ip":"","mac":"m","netif":"br0"})", R"({"ip":"192.168.1.5","mac":"","netif":"br0"})",
        R"({"ip":"192.168.1.5","mac":"m","netif":""})", R"({"ip":null,"mac":"m","netif":"br0"})",
        R"({"ip":["192.168.1.5"],"mac":"m","netif":"br0"})", R"({"ip":"192.168.1.5","mac":{},"netif":"br0"})",
        R"({"ip":"192.168.1.5\u0000x","mac":"m","netif":"br0"})", "null", "[]", "\"text\"", "7"}) {
    EXPECT_FALSE(ConnectionList().CheckArpObject(Parse(record))) << record;
  }
  EXPECT_THAT(Get().calls, IsEmpty());
}

TEST_F(ArpTableTest, Check_InterfaceWithoutInformationIsNoBridge) {
  const Json::Value record = Parse(R"({"ip":"192.168.1.5","mac":"m","netif":"br0"})");
  EXPECT_TRUE(ConnectionList().CheckArpObject(record));
  Get().results["VORNNetIFGetInfo(br0, 0)"] = 2; // whatever it counts, there is some
  EXPECT_TRUE(ConnectionList().CheckArpObject(record));
  for (const int result : {0, -1}) {
    Get().calls.clear();
    Get().results["VORNNetIFGetInfo(br0, 0)"] = result;
    EXPECT_FALSE(ConnectionList().CheckArpObject(record));
    EXPECT_THAT(Get().calls, ElementsAre("VORNNetIFGetInfo(br0, 0)"));
  }
}

TEST_F(ArpTableTest, Check_OnlyTheSubnetResult1IsAMatch) {
  const Json::Value record = Parse(R"({"ip":"192.168.1.5","mac":"m","netif":"br0"})");
  for (const int result : {0, -1, 2}) {
    Get().results["VORNNetIsSameSubnet(192.168.1.5, 192.168.1.1, 255.255.255.0)"] = result;
    EXPECT_FALSE(ConnectionList().CheckArpObject(record));
  }
}

TEST_F(ArpTableTest, Refresh_DeletesAndProbesEachAddressOnTheTopologysBridge) {
  PutNeighbours(kNeighbourTitle + NeighbourLine("192.168.1.5", kMac, "lbr0") +
                NeighbourLine("192.168.1.6", kMac, "eth0") + NeighbourLine("192.168.1.7", kMac, "lbr0", "0x0") +
                NeighbourLine("203.0.113.9", kMac, "br0") + NeighbourLine("192.168.1.5", kMac, "lbr0"));
  for (const auto &[topology, interface] : {std::pair("router", "-Ilbr0"), std::pair("bridge", "-Ibr0")}) {
    Get().calls.clear();
    Get().topology = topology;
    EXPECT_TRUE(ConnectionList().UpdateArpTable());
    const Lines first = RefreshCalls("192.168.1.5", interface);
    EXPECT_THAT(Get().calls, ElementsAreArray(scripted::Join({{"GetTopologyString()"},
                                                              first,
                                                              RefreshCalls("203.0.113.9", interface), // of any subnet
                                                              first})));
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ArpTableTest, Refresh_FailedCommandsAreLoggedAndTheRestGoesOn) {
  PutNeighbours(NeighbourLine("192.168.1.5", kMac, "lbr0") + NeighbourLine("192.168.1.6", kMac, "lbr0"));
  Get().results[RefreshCalls("192.168.1.5", "-Ilbr0")[0]] = -1;
  Get().results[RefreshCalls("192.168.1.5", "-Ilbr0")[1]] = -2;
  Get().results[RefreshCalls("192.168.1.6", "-Ilbr0")[1]] = -1;
  EXPECT_TRUE(ConnectionList().UpdateArpTable());
  EXPECT_EQ(Get().calls.size(), 5U);
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: failed to delete arp (192.168.1.5)",
                                     "connectionlist: failed to ping (192.168.1.5)",
                                     "connectionlist: failed to ping (192.168.1.6)"));
}

TEST_F(ArpTableTest, Refresh_AddressTwiceInTheTableIsRefreshedTwice) {
  const std::string line = NeighbourLine("192.168.1.5", kMac, "lbr0");
  PutNeighbours(line + line);
  EXPECT_TRUE(ConnectionList().UpdateArpTable());
  const Lines once = RefreshCalls("192.168.1.5", "-Ilbr0");
  EXPECT_THAT(Get().calls, ElementsAreArray(scripted::Join({{"GetTopologyString()"}, once, once})));
}

TEST_F(ArpTableTest, Refresh_PositiveResultsAreNoFailure) {
  PutNeighbours(NeighbourLine("192.168.1.5", kMac, "lbr0"));
  const Lines refresh = RefreshCalls("192.168.1.5", "-Ilbr0");
  Get().topologyResult = 1;
  Get().results = {{refresh[0], 1}, {refresh[1], 1}};
  EXPECT_TRUE(ConnectionList().UpdateArpTable());
  EXPECT_THAT(Get().calls, ElementsAreArray(scripted::Join({{"GetTopologyString()"}, refresh})));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(ArpTableTest, Refresh_OtherTopologyRunsNothing) {
  PutNeighbours(NeighbourLine("192.168.1.5", kMac, "lbr0"));
  for (const char *topology : {"ap", "client", "", "Router", "bridge "}) {
    scripted::Reset();
    Get().topology = topology;
    EXPECT_FALSE(ConnectionList().UpdateArpTable());
    EXPECT_THAT(Get().calls, ElementsAre("GetTopologyString()"));
    EXPECT_THAT(Get().log, ElementsAre(std::string("connectionlist: topology (") + topology +
                                       ") is not AP mode, should not call connection list"));
  }
}

TEST_F(ArpTableTest, Refresh_UnknownTopologyRunsNothing) {
  PutNeighbours(NeighbourLine("192.168.1.5", kMac, "lbr0"));
  Get().topologyResult = -1;
  EXPECT_FALSE(ConnectionList().UpdateArpTable());
  EXPECT_THAT(Get().calls, ElementsAre("GetTopologyString()"));
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: failed to get topology, skip update arptable"));
}

TEST_F(ArpTableTest, Refresh_WithoutATableAsksForNothing) {
  RemoveNeighbours();
  EXPECT_FALSE(ConnectionList().UpdateArpTable());
  EXPECT_THAT(Get().calls, IsEmpty());
  EXPECT_THAT(Get().log, ElementsAre(kNoTable));
}

TEST_F(ArpTableTest, Refresh_EmptyTableIsDone) {
  PutNeighbours(kNeighbourTitle);
  EXPECT_TRUE(ConnectionList().UpdateArpTable());
  EXPECT_THAT(Get().calls, ElementsAre("GetTopologyString()"));
}

TEST_F(ArpTableTest, RegMatch_TakesPosixExtendedExpressions) {
  ConnectionList list;
  EXPECT_TRUE(list.RegMatch("abc", "b"));
  EXPECT_TRUE(list.RegMatch("aac", "^a{2}c$"));
  EXPECT_FALSE(list.RegMatch("abc", "B"));
  EXPECT_TRUE(list.RegMatch("", "^$"));
  EXPECT_FALSE(list.RegMatch("abc\n", "^abc$"));
  for (const char *broken : {"(", "[", "a{2", "*)("}) {
    EXPECT_FALSE(list.RegMatch("", broken)) << broken;
    EXPECT_FALSE(list.RegMatch("(", broken)) << broken;
  }
}

} // namespace
