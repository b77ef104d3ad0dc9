// The wireless half of the connection list: the stations of every main and guest network.
#include "router/connectionlist.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

using scripted::Get;
using scripted::Parse;
using scripted::Text;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

constexpr char kNotLists[] = "connectionlist: input json args should both be array";

class WirelessStationsTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().adapters = Parse(R"(["wlan0","wlan1"])");
    Get().adapterConfigs["wlan0"] = Parse(R"({"enabled":true,"guest_enabled":true})");
    Get().adapterConfigs["wlan1"] = Parse(R"({"enabled":true,"guest_enabled":true})");
    for (const char *network : {"wlan0", "wlan1", "gwlan0", "gwlan1"}) {
      Json::Value station;
      station["mac"] = network;
      Get().wifiStations[network].append(station);
    }
  }
  static bool Load(Json::Value &stations) { return ConnectionList().LoadWirelessConnData(stations); }
  static std::string Load() {
    Json::Value stations(Json::arrayValue);
    EXPECT_TRUE(Load(stations));
    return Text(stations);
  }
  static std::string Filled(const std::string &mac) {
    return R"({"brand":"","connection":"wifi","mac":")" + mac + R"(","model":"","status":true,"type":"others"})";
  }
};

TEST_F(WirelessStationsTest, MainNetworksOfAllAdaptersComeBeforeGuestNetworks) {
  EXPECT_EQ(Load(),
            "[" + Filled("wlan0") + "," + Filled("wlan1") + "," + Filled("gwlan0") + "," + Filled("gwlan1") + "]");
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "GetAdapterConfig(wlan0, null)",
                          "GetConnectionList(wlan0, null)", "GetAdapterConfig(wlan1, null)",
                          "GetConnectionList(wlan1, null)", "GetAdapterConfig(wlan0, null)",
                          "GetConnectionList(gwlan0, null)", "GetAdapterConfig(wlan1, null)",
                          "GetConnectionList(gwlan1, null)", "~WifiClient()"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(WirelessStationsTest, DaemonThatIsNotReadyMeansNoStations) {
  Get().serverReady = false;
  Json::Value stations("no array"); // the defaults would refuse it
  EXPECT_TRUE(Load(stations));
  EXPECT_EQ(Text(stations), "\"no array\"");
  EXPECT_THAT(Get().calls, ElementsAre("WifiClient()", "IsServerReady()", "~WifiClient()"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(WirelessStationsTest, AdapterListThatCannotBeHadFails) {
  Get().results["GetAdapterList(null)"] = -1;
  Json::Value stations(Json::arrayValue);
  EXPECT_FALSE(Load(stations));
  EXPECT_THAT(Get().calls, ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "~WifiClient()"));
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: Failed to get wireless interface list"));
}

TEST_F(WirelessStationsTest, OnlyNetworksThatAreOnAreAsked) {
  Get().adapterConfigs["wlan0"] = Parse(R"({"enabled":false,"guest_enabled":true})");
  Get().adapterConfigs["wlan1"] = Parse("{}");
  EXPECT_EQ(Load(), "[" + Filled("gwlan0") + "]");
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "GetAdapterConfig(wlan0, null)",
                          "GetAdapterConfig(wlan1, null)", "GetAdapterConfig(wlan0, null)",
                          "GetConnectionList(gwlan0, null)", "GetAdapterConfig(wlan1, null)", "~WifiClient()"));
}

TEST_F(WirelessStationsTest, ConfigurationOfAnOddTypeIsOff) {
  for (const char *config : {"null", "[]", "\"enabled\"", R"({"enabled":"true","guest_enabled":[true]})"}) {
    Get().adapterConfigs["wlan0"] = Get().adapterConfigs["wlan1"] = Parse(config);
    EXPECT_EQ(Load(), "[]") << config;
  }
}

TEST_F(WirelessStationsTest, AdapterWithoutAConfigurationIsLoggedInBothPasses) {
  Get().results["GetAdapterConfig(wlan0, null)"] = -1;
  EXPECT_EQ(Load(), "[" + Filled("wlan1") + "," + Filled("gwlan1") + "]");
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: Failed to get [wlan0] config",
                                     "connectionlist: Failed to get [wlan0] config"));
}

TEST_F(WirelessStationsTest, NetworkThatCannotBeAskedIsLoggedByItsAdapter) {
  Get().results["GetConnectionList(wlan1, null)"] = -1;
  Get().results["GetConnectionList(gwlan0, null)"] = -1;
  EXPECT_EQ(Load(), "[" + Filled("wlan0") + "," + Filled("gwlan1") + "]");
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: Failed to get connection list for [wlan1]",
                                     "connectionlist: Failed to get connection list for [wlan0]"));
}

TEST_F(WirelessStationsTest, PositiveResultsAreNoFailure) {
  Get().adapters = Parse(R"(["wlan0"])");
  Get().results = {{"GetAdapterList(null)", 1},
                   {"GetAdapterConfig(wlan0, null)", 1},
                   {"GetConnectionList(wlan0, null)", 1},
                   {"GetConnectionList(gwlan0, null)", 1}};
  EXPECT_EQ(Load(), "[" + Filled("wlan0") + "," + Filled("gwlan0") + "]");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(WirelessStationsTest, ListThatIsNoArrayFails) {
  Get().adapters = Json::Value(Json::arrayValue);
  Json::Value stations("no array");
  EXPECT_FALSE(Load(stations));
  EXPECT_EQ(Text(stations), "\"no array\"");
  EXPECT_THAT(Get().log, ElementsAre(kNotLists, "connectionlist: failed to assign detail info"));
}

TEST_F(WirelessStationsTest, StationsAreKeptWholeButForFiveKeys) {
  Get().adapters = Parse(R"(["wlan0"])");
  Get().adapterConfigs["wlan0"] = Parse(R"({"enabled":true})");
  Get().wifiStations["wlan0"] =
      Parse(R"([{"mac":"m","ip":"192.168.1.9","hostname":"tv","signalstrength":-50,"own":[1],"status":false,
                 "type":"nas","brand":"b","model":"m","connection":"ethernet"}])");
  EXPECT_EQ(Load(), R"([{"brand":"","connection":"wifi","hostname":"tv","ip":"192.168.1.9","mac":"m","model":"",)"
                    R"("own":[1],"signalstrength":-50,"status":true,"type":"others"}])");
}

TEST_F(WirelessStationsTest, StationThatIsNoObjectCountsAsAnEmptyOne) {
  Get().adapters = Parse(R"(["wlan0"])");
  Get().adapterConfigs["wlan0"] = Parse(R"({"enabled":true})");
  const std::string empty = R"({"brand":"","connection":"wifi","model":"","status":true,"type":"others"})";
  Get().wifiStations["wlan0"] = Parse(R"([null,"text",[1],7])");
  EXPECT_EQ(Load(), "[" + empty + "," + empty + "," + empty + "," + empty + "]");
  for (const char *list : {"null", "{\"a\":{}}", "\"text\"", "7"}) {
    Get().wifiStations["wlan0"] = Parse(list);
    EXPECT_EQ(Load(), "[]") << list;
  }
}

TEST_F(WirelessStationsTest, AdapterListOfOddTypesAsksForTheirTexts) {
  Get().adapters = Parse(R"([null,5,["wlan0"]])");
  EXPECT_EQ(Load(), "[]");
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "GetAdapterConfig(, null)",
                          "GetAdapterConfig(5, null)", "GetAdapterConfig(, null)", "GetAdapterConfig(, null)",
                          "GetAdapterConfig(5, null)", "GetAdapterConfig(, null)", "~WifiClient()"));
  for (const char *adapters : {"null", "\"wlan0\"", "5"}) {
    Get().adapters = Parse(adapters);
    EXPECT_EQ(Load(), "[]") << adapters;
  }
}

TEST_F(WirelessStationsTest, NoStationsAtAllIsSuccess) {
  for (auto &[network, stations] : Get().wifiStations) {
    stations = Json::Value();
  }
  EXPECT_EQ(Load(), "[]");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(WirelessStationsTest, Assign_FillsEveryElementAndOverwrites) {
  Json::Value stations = Parse(R"([{"status":"away","type":"tv","brand":1,"model":null,"x":1},null])");
  EXPECT_TRUE(ConnectionList().AssignDetailInfo(stations));
  EXPECT_EQ(Text(stations), R"([{"brand":"","model":"","status":true,"type":"others","x":1},)"
                            R"({"brand":"","model":"","status":true,"type":"others"}])");
}

TEST_F(WirelessStationsTest, Assign_EmptyIsDoneAndOtherTypesAreRefused) {
  for (const char *empty : {"null", "[]", "{}"}) {
    Json::Value stations = Parse(empty);
    EXPECT_TRUE(ConnectionList().AssignDetailInfo(stations));
    EXPECT_EQ(Text(stations), empty);
  }
  EXPECT_THAT(Get().log, IsEmpty());
  for (const char *wrong : {R"({"a":1})", "\"text\"", "5"}) {
    Get().log.clear();
    Json::Value stations = Parse(wrong);
    EXPECT_FALSE(ConnectionList().AssignDetailInfo(stations));
    EXPECT_EQ(Text(stations), wrong);
    EXPECT_THAT(Get().log, ElementsAre(kNotLists));
  }
}

} // namespace
