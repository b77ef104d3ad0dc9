// The ConnectionList rows that answer from the device store: ranges, counting and edits.
#include "router/clhandler.h"
#include "router/mervane_base.h"
#include "tests/router/device_calls.h"

#include <gmock/gmock.h>

using scripted::Ago;
using scripted::DeviceListCalls;
using scripted::Exchange;
using scripted::Get;
using scripted::Join;
using scripted::Lines;
using scripted::Parse;
using scripted::Text;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

namespace {

const Lines kAskNothing = {"HasParam(scannertype)", "HasParam(netrange)"};
const std::string kEnumerate = "QARDNetInterfaceEnum(32, 0)";

// Two bridges, one of them with another name than usual, and a port.
class RangeTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().lans = {{"eth0", "203.0.113.2", "255.255.255.0"},
                  {"lbr0", "192.168.1.1", "255.255.255.0"},
                  {"xbry", "10.0.0.1", "255.0.0.0"}};
    Get().subnets = {{"203.0.113.2", {"203.0.113.9"}}, {"192.168.1.1", {"192.168.1.5"}}, {"10.0.0.1", {"10.9.9.9"}}};
    Add("a", "lbr0", "192.168.1.5", 0);
    Add("b", "lbr0", "", 0);
    Add("c", "lbr0", "203.0.113.9", 0);
    Add("d", "gbr0", "192.168.1.5", 0);
    Add("e", "gwlan0", "", 100);
    Add("f", "eth1", "10.9.9.9", 100);
    Add("g", "", "10.9.9.9", 0);
  }
  static void Add(const std::string &name, const std::string &netif, const std::string &ip, int age) {
    Json::Value entry;
    entry["displayName"] = name;
    entry["netif"] = netif;
    entry["ipAddr"] = ip;
    entry["asso_time"] = Ago(age);
    Get().deviceList["ClientList"].append(entry);
  }
  static std::string Names(const Json::Value &result) {
    std::string out;
    for (const Json::Value &record : result["stations"]) {
      out += record["hostname"].asString();
    }
    return out;
  }
  // Of the list that an answer holds.
  static std::string NamesAnswered(const std::string &answer) {
    const std::string begin = "SetSuccess(";
    EXPECT_EQ(answer.rfind(begin, 0), 0U) << answer;
    return Names(Parse(answer.substr(begin.size(), answer.size() - begin.size() - 1)));
  }
  static std::string Listed(const std::string &netRange) {
    Json::Value result;
    EXPECT_EQ(ConnectionListHandler().GetList("all", netRange, result), 0);
    return Names(result);
  }
  static unsigned Counted(const std::string &netRange) {
    Json::Value result;
    EXPECT_EQ(ConnectionListHandler().GetOnlineDeviceNumber("all", netRange, result), 0);
    EXPECT_TRUE(result["devicecount"].isUInt());
    return result["devicecount"].asUInt();
  }
};

TEST_F(RangeTest, ListsOnlineAndOfflineStationsOfTheRangeInOrder) {
  EXPECT_EQ(Listed("all"), "abcdefg");
  EXPECT_EQ(Listed("local"), "abfg");
  EXPECT_EQ(Listed("guest"), "de");
  for (const char *unknown : {"", "LOCAL", "All", "guest ", "lan"}) {
    EXPECT_EQ(Listed(unknown), "") << unknown;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(RangeTest, CountsOnlineStationsOfTheRange) {
  EXPECT_EQ(Counted("all"), 5U);
  EXPECT_EQ(Counted("local"), 3U);
  EXPECT_EQ(Counted("guest"), 1U);
  for (const char *unknown : {"", "LOCAL", "ALL", "guests"}) {
    EXPECT_EQ(Counted(unknown), 0U) << unknown;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(RangeTest, SmallGAnywhereInTheInterfaceIsGuestAndACapitalOneIsNot) {
  Add("h", "brg0", "", 0);
  Add("i", "GBR0", "", 0);
  EXPECT_EQ(Listed("guest"), "deh");
  EXPECT_EQ(Listed("local"), "abfgi");
  EXPECT_EQ(Counted("guest"), 2U);
  EXPECT_EQ(Counted("local"), 4U);
}

TEST_F(RangeTest, OldStationsOfTheResultAreReplaced) {
  for (const auto &[range, listed] : {std::pair("all", R"([{"netif":"br0"},{"netif":"gbr0"}])"),
                                      std::pair("guest", R"([{"netif":"gbr0"}])"), std::pair("other", "[]")}) {
    Json::Value result = Parse(R"({"kept":1,"stations":["old"]})");
    ConnectionListHandler().FilterNetRange(Parse(R"({"stations":[{"netif":"br0"},{"netif":"gbr0"}]})"), range, result);
    EXPECT_EQ(Text(result), R"({"kept":1,"stations":)" + std::string(listed) + "}") << range;
  }
}

TEST_F(RangeTest, Count_AsksTheBridgesOnceAndTheSubnetsOfLocalStationsOnly) {
  Counted("local");
  const auto same = [](const std::string &ip, const std::string &bridge, const std::string &mask) {
    return "VORNNetIsSameSubnet(" + ip + ", " + bridge + ", " + mask + ")";
  };
  EXPECT_THAT(Get().calls,
              ElementsAreArray(Join(
                  {DeviceListCalls("all"),
                   {kEnumerate, same("192.168.1.5", "192.168.1.1", "255.255.255.0"),
                    same("203.0.113.9", "192.168.1.1", "255.255.255.0"), same("203.0.113.9", "10.0.0.1", "255.0.0.0"),
                    same("10.9.9.9", "192.168.1.1", "255.255.255.0"), same("10.9.9.9", "10.0.0.1", "255.0.0.0"),
                    same("10.9.9.9", "192.168.1.1", "255.255.255.0"), same("10.9.9.9", "10.0.0.1", "255.0.0.0")}})));
  Get().calls.clear();
  Counted("guest");
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({DeviceListCalls("all"), {kEnumerate}})));
}

TEST_F(RangeTest, FailedEnumerationIsAnEmptySuccessForEveryRange) {
  for (const char *range : {"all", "local", "guest", "other"}) {
    for (const int failure : {0, -3}) {
      Get().log.clear();
      Get().results[kEnumerate] = failure;
      EXPECT_EQ(Counted(range), 0U);
      EXPECT_EQ(Listed(range), "");
      const std::string enumeration = "clhandler: Error on net interface enum [" + std::to_string(failure) + "]";
      const char *bridges = "clhandler: failed to get all bridge's ip";
      EXPECT_THAT(Get().log, ElementsAre(enumeration, bridges, enumeration, bridges));
    }
  }
}

TEST_F(RangeTest, WithoutABridgeOnlyStationsWithoutAnAddressAreLocal) {
  Get().lans = {{"eth0", "203.0.113.2", "255.255.255.0"}};
  EXPECT_EQ(Listed("local"), "b");
  EXPECT_EQ(Listed("all"), "abcdefg");
}

TEST_F(RangeTest, NoStationsAsksForNoBridge) {
  for (const char *data :
       {"null", "{}", "[]", R"({"stations":[]})", R"({"stations":{"a":1}})", R"({"stations":"x"})"}) {
    Json::Value result = Parse(R"({"stations":["old"]})");
    ConnectionListHandler().FilterNetRange(Parse(data), "all", result);
    EXPECT_EQ(Text(result), R"({"stations":[]})") << data;
    EXPECT_EQ(ConnectionListHandler().CountOnlineDevice("all", Parse(data)), 0U);
  }
  EXPECT_THAT(Get().calls, IsEmpty());
}

TEST_F(RangeTest, RecordsOfOddTypesAreReadAsTextsAndTruthValues) {
  const Json::Value data = Parse(R"({"stations":[null,7,[],{"netif":["g"],"ip":{},"status":"true"},
                                    {"netif":5,"ip":null,"status":1},{"netif":"g","status":null}]})");
  Json::Value result;
  ConnectionListHandler().FilterNetRange(data, "local", result);
  EXPECT_EQ(Text(result["stations"]),
            R"([null,7,[],{"ip":{},"netif":["g"],"status":"true"},{"ip":null,"netif":5,"status":1}])");
  EXPECT_EQ(ConnectionListHandler().CountOnlineDevice("local", data), 1U);
  EXPECT_EQ(ConnectionListHandler().CountOnlineDevice("all", data), 1U);
  EXPECT_EQ(ConnectionListHandler().CountOnlineDevice("guest", data), 0U);
}

TEST_F(RangeTest, Bridges_EachCallAppendsThemAgain) {
  ConnectionListHandler handler;
  EXPECT_FALSE(handler.IsMatchAnyBridge("192.168.1.5"));
  EXPECT_TRUE(handler.IsMatchAnyBridge(""));
  EXPECT_EQ(handler.GetAllBridgeIP(), 0);
  EXPECT_EQ(handler.GetAllBridgeIP(), 0);
  Get().calls.clear();
  EXPECT_FALSE(handler.IsMatchAnyBridge("198.51.100.1"));
  EXPECT_EQ(Get().calls.size(), 4U);
  EXPECT_TRUE(handler.IsMatchAnyBridge("10.9.9.9"));
  EXPECT_FALSE(handler.IsMatchAnyBridge(std::string("10.9.9.9\0x", 10)));
}

TEST_F(RangeTest, Bridges_LbrAloneIsOne) {
  Get().lans = {{"lbr0", "192.168.1.1", "255.255.255.0"}};
  ConnectionListHandler handler;
  EXPECT_EQ(handler.GetAllBridgeIP(), 0);
  EXPECT_TRUE(handler.IsMatchAnyBridge("192.168.1.5"));
  EXPECT_FALSE(handler.IsMatchAnyBridge("203.0.113.9"));
  EXPECT_EQ(Listed("local"), "ab");
}

TEST_F(RangeTest, Bridges_OnlyTheResult1IsAMatch) {
  ConnectionListHandler handler;
  handler.GetAllBridgeIP();
  for (const int result : {2, -1, 0}) {
    Get().results["VORNNetIsSameSubnet(192.168.1.5, 192.168.1.1, 255.255.255.0)"] = result;
    EXPECT_FALSE(handler.IsMatchAnyBridge("192.168.1.5"));
  }
}

TEST_F(RangeTest, Bridges_MoreInterfacesThanThereIsRoomForAreLeftOut) {
  Get().lans.assign(40, {"br0", "192.168.1.1", "255.255.255.0"});
  Get().results[kEnumerate] = 40; // what a platform that counts on would say
  ConnectionListHandler handler;
  EXPECT_EQ(handler.GetAllBridgeIP(), 0);
  Get().calls.clear();
  EXPECT_FALSE(handler.IsMatchAnyBridge("198.51.100.1"));
  EXPECT_EQ(Get().calls.size(), 32U);
}

TEST_F(RangeTest, GetCount_WithoutParametersCountsAll) {
  Exchange exchange;
  exchange.Run(GetConnectionListCount);
  EXPECT_THAT(
      Get().calls,
      ElementsAreArray(Join({kAskNothing, DeviceListCalls("all"), {kEnumerate, R"(SetSuccess({"devicecount":5}))"}})));
}

TEST_F(RangeTest, GetCount_PassesTheScannerTypeOn) {
  Exchange exchange(Parse(R"({"scannertype":"No Such","netrange":"guest"})"));
  exchange.Run(GetConnectionListCount);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({{"HasParam(scannertype)", "GetParam(scannertype, null)",
                                                   "HasParam(netrange)", "GetParam(netrange, null)"},
                                                  DeviceListCalls("No Such"),
                                                  {kEnumerate, R"(SetSuccess({"devicecount":1}))"}})));
}

TEST_F(RangeTest, GetCount_ParameterThatIsNoTextCountsAsAbsent) {
  for (const char *wrong : {"1", "null", "[\"guest\"]", "{}", "true"}) {
    Get().calls.clear();
    Exchange exchange(Parse(std::string(R"({"scannertype":)") + wrong + R"(,"netrange":)" + wrong + "}"));
    exchange.Run(GetConnectionListCount);
    EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"devicecount":5}))") << wrong;
    EXPECT_EQ(Get().calls[5], "GetDeviceListData(all, null)") << wrong;
  }
}

TEST_F(RangeTest, GetCount_UnknownRangeAnswersNone) {
  Exchange exchange(Parse(R"({"netrange":"LOCAL"})"));
  exchange.Run(GetConnectionListCount);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"devicecount":0}))");
}

TEST_F(RangeTest, GetCount_DaemonThatFailsAnswers4300WithNull) {
  Get().results["GetDeviceListData(all, null)"] = -1;
  Exchange exchange;
  exchange.Run(GetConnectionListCount);
  EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
  EXPECT_THAT(Get().log,
              ElementsAre("clhandler: failed to get upnp data", "clhandler: failed to get scanner data for counting"));
}

TEST_F(RangeTest, GetCount_DeviceListThatIsNoArrayAnswers4300WithNull) {
  Get().deviceList["ClientList"] = Parse(R"({"a":1})");
  Exchange exchange;
  exchange.Run(GetConnectionListCount);
  EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("clhandler: input should be array", "clhandler: failed on mapping json value",
                                     "clhandler: failed to get scanner data for counting"));
}

TEST_F(RangeTest, Get_WithAScannerTypeAnswersAtOnce) {
  Get().deviceList = Parse(R"({"ClientList":[{"displayName":"x","asso_time":"12:00:00 2020/01/01"}]})");
  Exchange exchange(Parse(R"({"scannertype":"arp"})"));
  exchange.Run(GetConnectionList);
  EXPECT_THAT(Get().calls,
              ElementsAreArray(Join({{"HasParam(scannertype)", "GetParam(scannertype, null)", "HasParam(netrange)"},
                                     DeviceListCalls("arp"),
                                     {kEnumerate, R"(SetSuccess({"stations":[{"asso_time":"12:00:00 2020/01/01",)"
                                                  R"("brand":"","connection":"ethernet","hostname":"x","ip":"",)"
                                                  R"("mac":"","model":"","netif":"","status":false,)"
                                                  R"("type":"others"}]}))"}})));
}

TEST_F(RangeTest, Get_NetRangeIsUsedWhenItIsAText) {
  for (const auto &[range, names] :
       {std::pair("\"guest\"", "de"), std::pair("5", "abcdefg"), std::pair("null", "abcdefg"),
        std::pair("[\"guest\"]", "abcdefg"), std::pair("\"GUEST\"", "")}) {
    Exchange exchange(Parse(std::string(R"({"scannertype":"all","netrange":)") + range + "}"));
    exchange.Run(GetConnectionList);
    EXPECT_EQ(NamesAnswered(exchange.Answer()), names) << range;
  }
}

TEST_F(RangeTest, Get_WithoutANetRangeListsAll) {
  Exchange exchange(Parse(R"({"scannertype":"all"})"));
  exchange.Run(GetConnectionList);
  EXPECT_EQ(NamesAnswered(exchange.Answer()), "abcdefg");
}

TEST_F(RangeTest, Get_DeviceListThatIsNoArrayAnswers4300WithNull) {
  Get().deviceList["ClientList"] = Parse(R"({"a":1})");
  Exchange exchange(Parse(R"({"scannertype":"all"})"));
  exchange.Run(GetConnectionList);
  EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("clhandler: input should be array", "clhandler: failed on mapping json value",
                                     "clhandler: failed to get scanner (all) data"));
}

TEST_F(RangeTest, Get_DaemonThatFailsAnswers4300WithNull) {
  Get().results["GetDeviceListData(x%s, null)"] = 1;
  Exchange exchange(Parse(R"({"scannertype":"x%s","netrange":"all"})"));
  exchange.Run(GetConnectionList);
  EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
  EXPECT_THAT(Get().log,
              ElementsAre("clhandler: failed to get upnp data", "clhandler: failed to get scanner (x%s) data"));
}

class EditTest : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
};

const Lines kReadEdit = {"HasParam(mac)",  "GetParam(mac, null)", "HasParam(hostname)", "GetParam(hostname, null)",
                         "HasParam(type)", "GetParam(type, null)"};
const std::string kStore = R"(SetDeviceListData({"macAddr":"AA-bb","userdef_deviceType":"printer",)"
                           R"("userdef_displayName":" My $(id) "}))";

TEST_F(EditTest, Set_StoresTheTextsAsTheyAre) {
  Exchange exchange(Parse(R"({"mac":"AA-bb","hostname":" My $(id) ","type":"printer"})"));
  exchange.Run(SetConnectionListData);
  EXPECT_THAT(Get().calls,
              ElementsAreArray(Join({kReadEdit, {"NetClient()", kStore, "~NetClient()", "SetSuccess(null)"}})));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(EditTest, Set_EmptyTextsAndUnknownTypesAreAccepted) {
  Exchange exchange(Parse(R"({"mac":"","hostname":"","type":"toaster"})"));
  exchange.Run(SetConnectionListData);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadEdit,
                                                  {"NetClient()",
                                                   R"(SetDeviceListData({"macAddr":"","userdef_deviceType":"toaster",)"
                                                   R"("userdef_displayName":""}))",
                                                   "~NetClient()", "SetSuccess(null)"}})));
}

TEST_F(EditTest, Set_FirstMissingParameterAnswers4302AndTheLaterOnesAreNotLookedAt) {
  const std::tuple<const char *, size_t> cases[] = {
      {R"({"hostname":"a","type":"b"})", 1}, {R"({"mac":1,"hostname":"a","type":"b"})", 2},
      {R"({"mac":"a","type":"b"})", 3},      {R"({"mac":"a","hostname":5,"type":"b"})", 4},
      {R"({"mac":"a","hostname":"b"})", 5},  {R"({"mac":"a","hostname":"b","type":null})", 6}};
  for (const auto &[parameters, looks] : cases) {
    Get().calls.clear();
    Exchange exchange(Parse(parameters));
    exchange.Run(SetConnectionListData);
    Lines expected(kReadEdit.begin(), kReadEdit.begin() + static_cast<ptrdiff_t>(looks));
    expected.emplace_back("SetError(4302, null)");
    EXPECT_THAT(Get().calls, ElementsAreArray(expected)) << parameters;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(EditTest, Set_RefusedByTheDaemonAnswers4300WithNull) {
  for (const int failure : {-1, 1}) {
    scripted::Reset();
    Get().results[kStore] = failure;
    Exchange exchange(Parse(R"({"mac":"AA-bb","hostname":" My $(id) ","type":"printer"})"));
    exchange.Run(SetConnectionListData);
    EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
    EXPECT_THAT(Get().log, ElementsAre("clhandler: failed to edit dev info for (AA-bb)"));
  }
}

TEST_F(EditTest, Set_WhatWasStoredWinsInLaterListings) {
  Json::Value entry = Parse(R"({"macAddr":"a","displayName":"cam","deviceType":"Network Camera"})");
  entry["userdef_displayName"] = "";
  entry["userdef_deviceType"] = "printer";
  Get().deviceList["ClientList"].append(entry);
  Json::Value result;
  ConnectionListHandler().GetScannerData("all", result);
  EXPECT_EQ(Text(result["stations"][0]["hostname"]) + Text(result["stations"][0]["type"]), R"("""printer")");
}

TEST_F(EditTest, Delete_PassesTheTextOn) {
  Exchange exchange(Parse(R"({"mac":"AA-bb","hostname":1})"));
  exchange.Run(DelConnectionListData);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(mac)", "GetParam(mac, null)", "NetClient()",
                                       "DelDeviceListData(AA-bb)", "~NetClient()", "SetSuccess(null)"));
}

TEST_F(EditTest, Delete_MissingOrWrongParameterAnswers4302) {
  for (const char *parameters : {"{}", R"({"mac":["a"]})", R"({"mac":null})", R"({"mac":1})", R"({"MAC":"a"})"}) {
    Get().calls.clear();
    Exchange exchange(Parse(parameters));
    exchange.Run(DelConnectionListData);
    EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4302, null)")) << parameters;
    EXPECT_LE(Get().calls.size(), 3U);
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(EditTest, Delete_UnknownDeviceAnswers4300WithNull) {
  for (const int failure : {-1, 1}) {
    scripted::Reset();
    Get().results["DelDeviceListData(x)"] = failure;
    Exchange exchange(Parse(R"({"mac":"x"})"));
    exchange.Run(DelConnectionListData);
    EXPECT_THAT(exchange.Answers(), ElementsAre("SetError(4300, null)"));
    EXPECT_THAT(Get().log, ElementsAre("clhandler: failed to del device (x)"));
  }
}

} // namespace
