// From an entry of the device list to a station record: names, types, and who is online.
#include "router/clhandler.h"
#include "tests/router/device_calls.h"

#include <gmock/gmock.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>

using scripted::Ago;
using scripted::DeviceListCalls;
using scripted::Get;
using scripted::Parse;
using scripted::Text;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

namespace {

class DeviceTest : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
};

class MappingTest : public DeviceTest {
protected:
  // The one record that the mapping makes of an entry.
  static Json::Value Map(const Json::Value &entry) {
    Json::Value entries(Json::arrayValue);
    entries.append(entry);
    Json::Value stations;
    EXPECT_EQ(ConnectionListHandler().ValueMapping(entries, stations), 0);
    EXPECT_EQ(stations.size(), 1U);
    return stations[0];
  }
  static std::string TypeOf(const std::string &entry) { return ConnectionListHandler().GetDeviceType(Parse(entry)); }
  static std::string NameOf(const std::string &entry) { return ConnectionListHandler().GetHostName(Parse(entry)); }
};

TEST_F(MappingTest, EmptyEntryHasEveryDefaultAndNoTransferKeys) {
  EXPECT_EQ(Text(Map(Json::Value(Json::objectValue))),
            R"({"asso_time":"","brand":"","connection":"ethernet","hostname":"Network Device","ip":"","mac":"",)"
            R"("model":"","netif":"","status":false,"type":"others"})");
  EXPECT_THAT(Get().log,
              ElementsAre("clhandler: warning: no display name found", "clhandler: cannot parse time string ()"));
}

TEST_F(MappingTest, EntryThatIsNoObjectCountsAsAnEmptyOne) {
  const std::string empty = Text(Map(Json::Value(Json::objectValue)));
  for (const char *entry : {"null", "7", "\"text\"", "[1]", "true"}) {
    EXPECT_EQ(Text(Map(Parse(entry))), empty) << entry;
  }
}

TEST_F(MappingTest, CopiesTheEntrysMembersWhole) {
  Json::Value entry = Parse(R"({"macAddr":"aa:bb:cc:dd:ee:ff","ipAddr":"192.168.1.2","displayName":"tv",
                               "deviceType":"Media Renderer","manufacturer":"Maker","modelName":"X1",
                               "connection":"ethernet","netif":"lbr0","transferRX":1,"transferTX":2,
                               "signalstrength":3,"more":4})");
  const std::string time = Ago(0);
  entry["asso_time"] = time;
  EXPECT_EQ(Text(Map(entry)),
            R"({"asso_time":")" + time +
                R"(","brand":"Maker","connection":"ethernet","hostname":"tv","ip":"192.168.1.2",)"
                R"("mac":"aa:bb:cc:dd:ee:ff","model":"X1","netif":"lbr0","status":true,"type":"player"})");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MappingTest, CopiedMembersKeepTheirJsonType) {
  EXPECT_EQ(Text(Map(Parse(R"({"macAddr":1,"asso_time":null,"ipAddr":["a"],"manufacturer":{"b":1},"modelName":true,
                               "connection":null,"netif":1.5,"displayName":"x"})"))),
            R"({"asso_time":null,"brand":{"b":1},"connection":null,"hostname":"x","ip":["a"],"mac":1,"model":true,)"
            R"("netif":1.5,"status":false,"type":"others"})");
  EXPECT_THAT(Get().log, ElementsAre("clhandler: cannot parse time string ()"));
}

TEST_F(MappingTest, AssoTimeThatIsNoTextIsCopiedAndReadAsAnEmptyOne) {
  for (const char *time : {"5", "null", "true", R"(["12:00:00 2099/01/01"])", "{}"}) {
    Get().log.clear();
    Json::Value entry = Parse(R"({"displayName":"x"})");
    entry["asso_time"] = Parse(time);
    const Json::Value record = Map(entry);
    EXPECT_EQ(Text(record["asso_time"]) + Text(record["status"]), time + std::string("false"));
    EXPECT_THAT(Get().log, ElementsAre("clhandler: cannot parse time string ()")) << time;
  }
}

TEST_F(MappingTest, WirelessStationThatIsOnlineHasTransferKeys) {
  Json::Value entry = Parse(R"({"connection":"wifi","displayName":"phone"})");
  entry["asso_time"] = Ago(30);
  Json::Value record = Map(entry);
  EXPECT_EQ(Text(record["transferRX"]) + Text(record["transferTX"]) + Text(record["signalstrength"]), R"(""""0)");
  EXPECT_TRUE(record["signalstrength"].isInt());
  EXPECT_EQ(record.size(), 13U);
  entry["transferRX"] = "100";
  entry["transferTX"] = 200;
  entry["signalstrength"] = -60;
  record = Map(entry);
  EXPECT_EQ(Text(record["transferRX"]) + Text(record["transferTX"]) + Text(record["signalstrength"]), R"("100"200-60)");
}

TEST_F(MappingTest, WirelessStationThatIsOfflineHasNone) {
  Json::Value entry = Parse(R"({"connection":"wifi","displayName":"phone","transferRX":1,"signalstrength":2})");
  entry["asso_time"] = Ago(62);
  const Json::Value record = Map(entry);
  EXPECT_EQ(record.size(), 10U);
  EXPECT_EQ(Text(record["status"]), "false");
  EXPECT_FALSE(record.isMember("transferRX") || record.isMember("transferTX") || record.isMember("signalstrength"));
}

TEST_F(MappingTest, OnlyExactlyWifiIsWireless) {
  for (const char *connection : {"\"WiFi\"", "\"wifi \"", "\"\"", "null", "[\"wifi\"]", "1"}) {
    Json::Value entry = Parse(R"({"displayName":"phone","transferRX":1})");
    entry["asso_time"] = Ago(0);
    entry["connection"] = Parse(connection);
    EXPECT_FALSE(Map(entry).isMember("transferRX")) << connection;
  }
}

TEST_F(MappingTest, KeepsOrderAndDuplicatesAndAppends) {
  Json::Value stations = Parse(R"(["before"])");
  const Json::Value entries = Parse(R"([{"displayName":"b"},{"displayName":"a"},{"displayName":"b"}])");
  EXPECT_EQ(ConnectionListHandler().ValueMapping(entries, stations), 0);
  ASSERT_EQ(stations.size(), 4U);
  EXPECT_EQ(Text(stations[0]), "\"before\"");
  EXPECT_EQ(stations[1]["hostname"].asString() + stations[2]["hostname"].asString() +
                stations[3]["hostname"].asString(),
            "bab");
  EXPECT_EQ(Text(entries), R"([{"displayName":"b"},{"displayName":"a"},{"displayName":"b"}])");
}

TEST_F(MappingTest, EmptyInputGivesAnEmptyArray) {
  for (const char *entries : {"null", "[]", "{}"}) {
    Json::Value stations("old");
    EXPECT_EQ(ConnectionListHandler().ValueMapping(Parse(entries), stations), 0) << entries;
    EXPECT_EQ(Text(stations), "[]") << entries;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MappingTest, InputThatIsNoArrayFailsWithAnEmptyArray) {
  for (const char *entries : {R"({"a":1})", "\"text\"", "\"\"", "1", "false"}) {
    Get().log.clear();
    Json::Value stations;
    EXPECT_EQ(ConnectionListHandler().ValueMapping(Parse(entries), stations), -1) << entries;
    EXPECT_EQ(Text(stations), "[]") << entries;
    EXPECT_THAT(Get().log, ElementsAre("clhandler: input should be array"));
  }
}

TEST_F(MappingTest, HostName_TheUsersTextWinsEvenWhenEmpty) {
  EXPECT_EQ(NameOf(R"({"userdef_displayName":"mine","displayName":"theirs"})"), "mine");
  EXPECT_EQ(NameOf(R"({"userdef_displayName":"","displayName":"theirs"})"), "");
  EXPECT_EQ(NameOf(R"({"displayName":""})"), "");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MappingTest, HostName_WhatIsNoTextIsPassedOver) {
  for (const char *wrong : {"1", "null", "true", "[\"a\"]", "{\"a\":1}"}) {
    const std::string user = std::string(R"({"userdef_displayName":)") + wrong;
    EXPECT_EQ(NameOf(user + R"(,"displayName":"theirs"})"), "theirs") << wrong;
    EXPECT_THAT(Get().log, IsEmpty());
    EXPECT_EQ(NameOf(user + R"(,"displayName":)" + wrong + "}"), "Network Device") << wrong;
    EXPECT_THAT(Get().log, ElementsAre("clhandler: warning: no display name found"));
    Get().log.clear();
  }
}

TEST_F(MappingTest, HostName_MarkupControlCharactersAndBrokenUtf8StayAsTheyAre) {
  for (const std::string &name : {std::string("<script>alert(1)</script>"), std::string("$(id)`id`;\n\x01%s%n"),
                                  std::string("\xff\xfe caf\xe9"), std::string(255, 'x'), std::string("a\0b", 3)}) {
    Json::Value entry;
    entry["displayName"] = name;
    EXPECT_EQ(Map(entry)["hostname"].asString(), name);
  }
}

TEST_F(MappingTest, DeviceType_TestsInTheirOrder) {
  const std::pair<const char *, const char *> cases[] = {
      {"Network Camera 1", "ipcam"},
      {"Camera", "ipcam"},
      {"network camera", "others"},
      {"ipcam", "ipcam"},
      {"an ipcam", "others"},
      {"MediaServer", "player"},
      {"media", "others"},
      {"player", "player"},
      {"players", "others"},
      {"Printer", "printer"},
      {"LaserPrinter x", "printer"},
      {"printer", "printer"},
      {"a printer", "others"},
      {"nas", "nas"},
      {"NAS", "others"},
      {"my nas", "others"},
      {"tablet", "tablet"},
      {"Tablet", "others"},
      {"computer", "computer"},
      {"computers", "others"},
      {"others", "others"},
      {"", "others"},
      {"Printer Media Camera", "ipcam"},
      {"Printer Media", "player"},
  };
  for (const auto &[text, type] : cases) {
    EXPECT_EQ(TypeOf(std::string(R"({"deviceType":")") + text + "\"}"), type) << text;
    EXPECT_EQ(TypeOf(std::string(R"({"userdef_deviceType":")") + text + R"(","deviceType":"nas"})"), type) << text;
  }
}

TEST_F(MappingTest, DeviceType_TheUsersTextWinsAndWhatIsNoTextIsPassedOver) {
  EXPECT_EQ(TypeOf(R"({"userdef_deviceType":"tablet","deviceType":"Camera"})"), "tablet");
  EXPECT_EQ(TypeOf(R"({"userdef_deviceType":"toaster","deviceType":"Camera"})"), "others");
  EXPECT_EQ(TypeOf(R"({"userdef_deviceType":1,"deviceType":"Camera"})"), "ipcam");
  EXPECT_EQ(TypeOf(R"({"userdef_deviceType":null,"deviceType":["Camera"]})"), "others");
  EXPECT_EQ(TypeOf("{}"), "others");
}

// In a time zone for one test.
class OnlineTest : public DeviceTest {
protected:
  void TearDown() override {
    unsetenv("TZ");
    tzset();
  }
  static void SetZone(const std::string &zone) {
    setenv("TZ", zone.c_str(), 1);
    tzset();
  }
  static bool IsOnline(const std::string &text) { return ConnectionListHandler().IsOnline(text); }
  // The end of daylight saving time, which repeats an hour of the clock, so many seconds ahead.
  static void SetZoneThatEndsDaylightSavingIn(int seconds) {
    const std::time_t change = std::time(nullptr) + seconds + 3600; // on the clock, an hour ahead of UTC
    std::tm fields{};
    gmtime_r(&change, &fields);
    char rule[64];
    std::snprintf(rule, sizeof(rule), "AAA0BBB-1,0/0,%d/%02d:%02d:%02d", fields.tm_yday, fields.tm_hour, fields.tm_min,
                  fields.tm_sec);
    SetZone(rule);
  }
};

TEST_F(OnlineTest, AtMostAMinuteAgoOrInTheFutureIsOnline) {
  EXPECT_TRUE(IsOnline(Ago(0)));
  EXPECT_TRUE(IsOnline(Ago(58)));
  EXPECT_FALSE(IsOnline(Ago(62)));
  EXPECT_FALSE(IsOnline(Ago(86400)));
  EXPECT_TRUE(IsOnline(Ago(-3000)));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(OnlineTest, ExactlyAMinuteAgoIsOnline) {
  for (;;) { // until no second ended between the two looks at the clock
    const std::time_t before = std::time(nullptr);
    const bool at60 = IsOnline(Ago(60));
    const bool at61 = IsOnline(Ago(61));
    if (std::time(nullptr) == before) {
      EXPECT_TRUE(at60);
      EXPECT_FALSE(at61);
      return;
    }
  }
}

TEST_F(OnlineTest, TextThatIsNoTimeIsLoggedAndOffline) {
  for (const std::string text : {"", "soon", "2026/05/01 12:00:00", "12:00:00", "12:00:00 ", "25:00:00 2026/05/01",
                                 "%s%n", "12:00:00 1969/12/30"}) {
    Get().log.clear();
    EXPECT_FALSE(IsOnline(text)) << text;
    EXPECT_THAT(Get().log, ElementsAre("clhandler: cannot parse time string (" + text + ")"));
  }
}

// Neither a text that ends early nor one that goes on is looked at: what was read of it is the time.
TEST_F(OnlineTest, HowTheTextEndsMakesNoDifference) {
  EXPECT_TRUE(IsOnline("12:00:00 2099/"));
  EXPECT_FALSE(IsOnline("12:00:00 2020/01"));
  EXPECT_TRUE(IsOnline(Ago(0) + " x"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(OnlineTest, DaylightSavingTimeDoesNotKeepADeviceOnlineForAnHour) {
  SetZone("AAA0BBB-1,0/0,J365/25"); // the whole year
  EXPECT_TRUE(IsOnline(Ago(30)));
  EXPECT_FALSE(IsOnline(Ago(62)));
  EXPECT_FALSE(IsOnline(Ago(3000)));
}

TEST_F(OnlineTest, EastAndWestAreReadInLocalTime) {
  for (const char *zone : {"AAA-14", "AAA12", "AAA-5:30"}) {
    SetZone(zone);
    EXPECT_TRUE(IsOnline(Ago(30))) << zone;
    EXPECT_FALSE(IsOnline(Ago(62))) << zone;
  }
}

TEST_F(OnlineTest, TheHourThatAClockChangeRepeatsIsReadAsTheOneOfNow) {
  for (const int change : {1800, -1800}) { // in its first and in its second pass
    SetZoneThatEndsDaylightSavingIn(change);
    EXPECT_TRUE(IsOnline(Ago(30))) << change;
    EXPECT_FALSE(IsOnline(Ago(600))) << change;
  }
}

TEST_F(DeviceTest, ScannerData_WithoutAClientListIsEmpty) {
  for (const char *answer : {"{}", "null", R"({"ClientList":[]})", R"({"ClientList":null})", "[]", "\"text\""}) {
    Get().deviceList = Parse(answer);
    Json::Value result;
    EXPECT_EQ(ConnectionListHandler().GetScannerData("arp", result), 0) << answer;
    EXPECT_EQ(Text(result), R"({"stations":[]})") << answer;
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(DeviceTest, ScannerData_ClientListThatIsNoArrayFails) {
  for (const char *list : {R"({"a":1})", "\"text\"", "5"}) {
    scripted::Reset();
    Get().deviceList["ClientList"] = Parse(list);
    Json::Value result;
    EXPECT_EQ(ConnectionListHandler().GetScannerData("all", result), -1);
    EXPECT_EQ(Text(result), R"({"stations":[]})");
    EXPECT_THAT(Get().log, ElementsAre("clhandler: input should be array", "clhandler: failed on mapping json value"));
  }
}

TEST_F(DeviceTest, ScannerData_DaemonThatFailsLeavesTheResult) {
  for (const int failure : {-1, 1}) {
    scripted::Reset();
    Get().results["GetDeviceListData(mdns, null)"] = failure;
    Json::Value result = Parse(R"({"kept":1})");
    EXPECT_EQ(ConnectionListHandler().GetScannerData("mdns", result), -1);
    EXPECT_EQ(Text(result), R"({"kept":1})");
    EXPECT_THAT(Get().calls, ElementsAreArray(DeviceListCalls("mdns")));
    EXPECT_THAT(Get().log, ElementsAre("clhandler: failed to get upnp data"));
  }
}

} // namespace
