// The list as the contract has it.
#include "host/devices/device_list.h"

#include <gtest/gtest.h>
#include <json/writer.h>

#include <cstdlib>
#include <ctime>

namespace {

using vornhost::Device;
using vornhost::Moment;
using vornhost::PresenceMap;
using vornhost::Source;
using vornhost::SourcesOf;
using vornhost::StoredDevices;

constexpr char kMac[] = "d4:3d:7e:11:22:33";
constexpr Moment kNow = {1700000000, 500000};

class DeviceListTest : public testing::Test {
protected:
  DeviceListTest() {
    setenv("TZ", "UTC", 1);
    tzset();
    Device device;
    device.mac = kMac;
    device.ip = "192.168.1.110";
    device.netif = "lbr0";
    device.connection = "ethernet";
    device.sources = vornhost::BitOf(Source::kArp) | vornhost::BitOf(Source::kDhcp) | vornhost::BitOf(Source::kNetbios);
    device.lastSeen = kNow.wall - 1000;
    device.findings[1].name = "laptop";
    device.findings[4].name = "LAPTOP-ANNA";
    stored_.devices.push_back(device);
  }

  std::string List(const std::string &type) const {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, vornhost::RenderDevices(stored_, presence_, SourcesOf(type), kNow));
  }

  StoredDevices stored_;
  PresenceMap presence_;
};

TEST_F(DeviceListTest, UnknownThingsAreLeftOut) {
  EXPECT_EQ(List("all"), R"([{"asso_time":"21:56:40 2023/11/14","connection":"ethernet","displayName":"LAPTOP-ANNA",)"
                         R"("ipAddr":"192.168.1.110","macAddr":"d4:3d:7e:11:22:33","netif":"lbr0"}])");
}

TEST_F(DeviceListTest, EverythingThatIsKnownIsThere) {
  Device &device = stored_.devices[0];
  device.connection = "wifi";
  device.manufacturer = "Maker";
  device.findings[2] = {"", "Printer", "Model"};
  stored_.owner[kMac] = {"", "nas"};
  presence_[kMac] = {kNow.boot - 5000, vornhost::RadioFigures{-61, 10, 5000000000}};
  EXPECT_EQ(
      List("all"),
      R"([{"asso_time":"22:13:15 2023/11/14","connection":"wifi","deviceType":"Printer","displayName":"LAPTOP-ANNA",)"
      R"("ipAddr":"192.168.1.110","macAddr":"d4:3d:7e:11:22:33","manufacturer":"Maker","modelName":"Model",)"
      R"("netif":"lbr0","signalstrength":-61,"transferRX":10,"transferTX":5000000000,"userdef_deviceType":"nas",)"
      R"("userdef_displayName":""}])");
}

TEST_F(DeviceListTest, ASourceGivesWhatItHasSeenUnderItsOwnNames) {
  EXPECT_NE(List("dhcp").find(R"("displayName":"laptop")"), std::string::npos);
  EXPECT_NE(List("netbios").find(R"("displayName":"LAPTOP-ANNA")"), std::string::npos);
  EXPECT_NE(List("arp").find(R"("displayName":"LAPTOP-ANNA")"), std::string::npos);
  EXPECT_EQ(List("mdns"), "[]");
}

TEST_F(DeviceListTest, ScannerTypesAreThoseOfTheContract) {
  for (const char *type : {"all", "arp", "dhcp", "mdns", "upnp", "netbios", "wifi"}) {
    EXPECT_NE(SourcesOf(type), 0U) << type;
  }
  for (const char *type : {"", "ALL", "arp ", "ssdp"}) {
    EXPECT_EQ(SourcesOf(type), 0U) << type;
  }
}

TEST_F(DeviceListTest, WhatTheStoreRemembersMakesNobodyOnline) {
  stored_.devices[0].lastSeen = kNow.wall; // written just before everything stopped
  EXPECT_NE(List("all").find(R"("asso_time":"22:12:19 2023/11/14")"), std::string::npos); // 61 seconds ago
  stored_.devices[0].lastSeen = kNow.wall + 86400;                                        // the clock was set back
  EXPECT_NE(List("all").find(R"("asso_time":"22:12:19 2023/11/14")"), std::string::npos);
}

TEST_F(DeviceListTest, TheTimeIsLocal) {
  setenv("TZ", "Europe/Berlin", 1);
  EXPECT_NE(List("all").find(R"("asso_time":"22:56:40 2023/11/14")"), std::string::npos);
}

TEST_F(DeviceListTest, ADeviceThatWasNeverSeenHasNoTime) {
  stored_.devices[0].lastSeen = 0;
  EXPECT_EQ(List("all").find("asso_time"), std::string::npos);
}

TEST_F(DeviceListTest, WhatOnlyTheOwnerKnowsIsListedInItsPlace) {
  for (const char *mac : {"00:00:00:00:00:01", kMac, "ff:00:00:00:00:01"}) {
    stored_.owner[mac] = {"mine", "nas"};
  }
  const Json::Value list = vornhost::RenderDevices(stored_, presence_, SourcesOf("all"), kNow);
  ASSERT_EQ(list.size(), 3U);
  EXPECT_EQ(list[0]["macAddr"], "00:00:00:00:00:01");
  EXPECT_EQ(list[0]["userdef_displayName"], "mine");
  EXPECT_EQ(list[1]["userdef_displayName"], "mine");
  EXPECT_EQ(list[2]["macAddr"], "ff:00:00:00:00:01");
  EXPECT_EQ(vornhost::RenderDevices(stored_, presence_, SourcesOf("arp"), kNow).size(), 1U);
}

} // namespace
