// The merge of wireless stations and wired neighbours, also against the plain nested search on random lists.
#include "router/connectionlist.h"
#include "tests/router/network_files.h"
#include "tests/router/random_stations.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <cctype>
#include <sstream>

using scripted::Get;
using scripted::Parse;
using scripted::Text;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

class MergeTest : public testing::Test {
protected:
  void SetUp() override { scripted::Reset(); }
  static std::string Merge(const std::string &stations, const std::string &wired, bool expected = true) {
    Json::Value merged = Parse(stations);
    Json::Value arpStations = Parse(wired);
    EXPECT_EQ(ConnectionList().CombineJsonData(merged, arpStations), expected) << stations << wired;
    return Text(merged);
  }
};

TEST_F(MergeTest, WirelessStationGetsItsAddressAndKeepsTheRest) {
  EXPECT_EQ(
      Merge(R"([{"connection":"wifi","hostname":"tv","ip":"old","mac":"aa:bb:cc:dd:ee:01"}])",
            R"([{"connection":"ethernet","hostname":"","ip":"192.168.1.5","mac":"aa:bb:cc:dd:ee:01","netif":"br0"}])"),
      R"([{"connection":"wifi","hostname":"tv","ip":"192.168.1.5","mac":"aa:bb:cc:dd:ee:01"}])");
}

TEST_F(MergeTest, WiredRecordsFollowTheStationsInTheirOrder) {
  EXPECT_EQ(Merge(R"([{"mac":"x"},{}])", R"([{"ip":"2","mac":"aa:bb:cc:dd:ee:02","netif":"br0","more":[1]},
                                             {"ip":"1","mac":"aa:bb:cc:dd:ee:01"}])"),
            R"([{"mac":"x"},{},{"ip":"2","mac":"aa:bb:cc:dd:ee:02","more":[1],"netif":"br0"},)"
            R"({"ip":"1","mac":"aa:bb:cc:dd:ee:01"}])");
}

TEST_F(MergeTest, OfOneMacTwiceTheLaterAddressWins) {
  EXPECT_EQ(Merge("[]", R"([{"ip":"1","mac":"aa:bb:cc:dd:ee:01","netif":"br0"},
                            {"ip":"2","mac":"aa:bb:cc:dd:ee:01","netif":"lbr0"}])"),
            R"([{"ip":"2","mac":"aa:bb:cc:dd:ee:01","netif":"br0"}])");
}

TEST_F(MergeTest, OfEqualStationsTheFirstGetsTheAddress) {
  EXPECT_EQ(Merge(R"([{"mac":"aa:bb:cc:dd:ee:01"},{"mac":"aa:bb:cc:dd:ee:01"}])",
                  R"([{"ip":"1","mac":"aa:bb:cc:dd:ee:01","netif":"br0"}])"),
            R"([{"ip":"1","mac":"aa:bb:cc:dd:ee:01"},{"mac":"aa:bb:cc:dd:ee:01"}])");
}

TEST_F(MergeTest, AddressOfAnotherInterfaceIsNotTaken) {
  for (const char *netif : {R"("netif":"eth0")", R"("netif":null)", R"("netif":["br0"])", R"("other":"br0")"}) {
    EXPECT_EQ(Merge(R"([{"mac":"aa:bb:cc:dd:ee:01"}])",
                    std::string(R"([{"ip":"1","mac":"aa:bb:cc:dd:ee:01",)") + netif + "}]"),
              R"([{"mac":"aa:bb:cc:dd:ee:01"}])");
  }
}

TEST_F(MergeTest, LetterCaseTellsAddressesApart) {
  EXPECT_EQ(Merge(R"([{"mac":"aa:bb:cc:dd:ee:01"}])", R"([{"ip":"1","mac":"AA:BB:CC:DD:EE:01","netif":"br0"}])"),
            R"([{"mac":"aa:bb:cc:dd:ee:01"},{"ip":"1","mac":"AA:BB:CC:DD:EE:01","netif":"br0"}])");
}

TEST_F(MergeTest, MalformedOrMissingMacDropsOut) {
  for (const char *mac :
       {"aa:bb:cc:dd:ee", "aa-bb-cc-dd-ee-01", "aa:bb:cc:dd:ee:01:02", "aa:bb:cc:dd:ee:0g", "", " aa:bb:cc:dd:ee:01",
        "aa:bb:cc:dd:ee:01 ", "aa:bb:cc:dd:ee:01\\n", "aabbccddee01", "aa:bb:cc:dd:ee:01\\u0000"}) {
    EXPECT_EQ(Merge("[]", std::string(R"([{"ip":"1","netif":"br0","mac":")") + mac + "\"}]"), "[]") << mac;
  }
  EXPECT_EQ(Merge("[]", R"([{"ip":"1"},{"mac":"aa:bb:cc:dd:ee:01"},{"mac":null,"ip":"1"},{"mac":[],"ip":"1"},null,7,
                            "aa:bb:cc:dd:ee:01",[]])"),
            "[]");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MergeTest, AddressBecomesAText) {
  EXPECT_EQ(Merge(R"([{"mac":"aa:bb:cc:dd:ee:01"}])", R"([{"ip":5,"mac":"aa:bb:cc:dd:ee:01","netif":"br0"}])"),
            R"([{"ip":"5","mac":"aa:bb:cc:dd:ee:01"}])");
}

TEST_F(MergeTest, AddressThatIsNullIsAnEmptyOne) {
  const std::string wired = R"({"ip":null,"mac":"aa:bb:cc:dd:ee:01","netif":"br0"})";
  EXPECT_EQ(Merge("[]", "[" + wired + "]"), "[" + wired + "]");
  EXPECT_EQ(Merge(R"([{"ip":"old","mac":"aa:bb:cc:dd:ee:01"}])", "[" + wired + "]"),
            R"([{"ip":"","mac":"aa:bb:cc:dd:ee:01"}])");
}

TEST_F(MergeTest, NothingWiredChangesNothing) {
  for (const char *wired : {"[]", "null", "{}"}) {
    for (const char *stations : {R"([{"mac":"x"}])", "null", "\"no array\""}) {
      EXPECT_EQ(Merge(stations, wired), stations);
    }
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MergeTest, WhatIsNoArrayIsRefused) {
  const std::string wired = R"([{"ip":"1","mac":"aa:bb:cc:dd:ee:01"}])";
  const std::pair<std::string, std::string> cases[] = {{"null", wired},      {"{}", wired},      {"\"text\"", wired},
                                                       {"[]", R"({"a":1})"}, {"[]", "\"text\""}, {"[]", "5"}};
  for (const auto &[stations, arpStations] : cases) {
    Get().log.clear();
    EXPECT_EQ(Merge(stations, arpStations, false), stations);
    EXPECT_THAT(Get().log, ElementsAre("connectionlist: input json args should both be array"));
  }
}

bool IsMac(const std::string &text) {
  bool right = text.size() == 17;
  for (size_t i = 0; right && i < text.size(); ++i) {
    right = i % 3 == 2 ? text[i] == ':' : std::isxdigit(static_cast<unsigned char>(text[i])) != 0;
  }
  return right;
}

// The merge as it reads, a search of the list for each wired record.
void MergePlainly(Json::Value &stations, const Json::Value &wiredStations) {
  for (const Json::Value &wired : wiredStations) {
    if (!wired.isMember("mac") || !wired.isMember("ip") || !IsMac(wired["mac"].asString())) {
      continue;
    }
    bool found = false;
    for (Json::Value &station : stations) {
      if (station.get("mac", "").asString() == wired["mac"].asString()) {
        if (wired.get("netif", "").asString().find("br") != std::string::npos) {
          station["ip"] = wired["ip"].asString();
        }
        found = true;
        break;
      }
    }
    if (!found) {
      stations.append(wired);
    }
  }
}

TEST_F(MergeTest, RandomListsComeOutAsBySearch) {
  scripted::RandomStations random(1);
  for (int round = 0; round < 4000; ++round) {
    const Json::Value stations = random.List();
    Json::Value wired = random.List();
    Json::Value expected = stations;
    MergePlainly(expected, wired);
    Json::Value merged = stations;
    ASSERT_TRUE(ConnectionList().CombineJsonData(merged, wired));
    ASSERT_EQ(Text(merged), Text(expected)) << round << " " << Text(stations);
  }
}

// The table as it reads: six words a line, and two filters.
Json::Value LoadPlainly(const std::string &table) {
  Json::Value stations(Json::arrayValue);
  std::istringstream file(table);
  for (std::string line; std::getline(file, line);) {
    std::istringstream words(line);
    std::string ip, type, flags, mac, mask, netif;
    words >> ip >> type >> flags >> mac >> mask >> netif;
    if (flags != "0x0" && netif.find("br") != std::string::npos && Get().subnets["192.168.1.1"].count(ip) != 0) {
      Json::Value record;
      record["ip"] = ip;
      record["mac"] = mac;
      record["netif"] = netif;
      record["hostname"] = "";
      record["connection"] = "ethernet";
      stations.append(record);
    }
  }
  return stations;
}

TEST_F(MergeTest, RandomTablesComeOutAsByWords) {
  scripted::RandomStations random(2);
  Get().lans = {{"br0", "192.168.1.1", ""}, {"lbr0", "192.168.1.1", ""}, {"xbr", "192.168.1.1", ""}};
  Get().subnets["192.168.1.1"] = {"192.168.1.1", "192.168.1.2", "0x2"};
  for (int round = 0; round < 2000; ++round) {
    const std::string table = random.Table();
    scripted::PutNeighbours(table);
    Json::Value stations(Json::arrayValue);
    ASSERT_TRUE(ConnectionList().LoadArpConnData(stations));
    ASSERT_EQ(Text(stations), Text(LoadPlainly(table))) << table;
    Get().calls.clear();
  }
}

} // namespace
