// Texts: hostapd's station records and configuration, dnsmasq's leases, MAC addresses, and what follows from them.
#include "host/network/mac_address.h"
#include "host/wireless/hostapd_config.h"
#include "host/wireless/station_facts.h"
#include "host/wireless/stations.h"
#include "tests/host/wireless/hostapd_peer.h"

#include <gmock/gmock.h>

#include <linux/neighbour.h>
#include <sys/socket.h>

namespace {

using hosttest::StationText;
using testing::ElementsAre;
using testing::IsEmpty;
using vornhost::DhcpLease;
using vornhost::Neighbour;
using vornhost::ParseHostapdConfig;
using vornhost::ParseLeases;
using vornhost::ParseMac;
using vornhost::ParseStation;
using vornhost::StationFacts;

constexpr char kMac[] = "02:00:00:00:01:0a";

TEST(MacAddress, ComesOutInLowerCaseWithColons) {
  EXPECT_EQ(ParseMac("02:AB:cd:EF:01:99"), "02:ab:cd:ef:01:99");
  EXPECT_EQ(ParseMac("02-AB-cd-EF-01-99"), "02:ab:cd:ef:01:99");
}

TEST(MacAddress, WhatIsNoneIsNone) {
  for (const char *text : {"", "02:ab:cd:ef:01", "02:ab:cd:ef:01:9", "02:ab:cd:ef:01:999", "02:ab:cd-ef:01:99",
                           "02ab:cd:ef:01:99:", "0g:ab:cd:ef:01:99", "02:ab:cd:ef:01:99\n", " 2:ab:cd:ef:01:99",
                           "02.ab.cd.ef.01.99", "@2:ab:cd:ef:01:99", "*"}) {
    EXPECT_EQ(ParseMac(text), std::nullopt) << text;
  }
}

TEST(MacAddress, GroupsAndZerosAreNoStations) {
  EXPECT_TRUE(vornhost::IsStationMac("02:00:00:00:00:00"));
  EXPECT_FALSE(vornhost::IsStationMac("01:00:5e:00:00:01"));
  EXPECT_FALSE(vornhost::IsStationMac("ff:ff:ff:ff:ff:ff"));
  EXPECT_FALSE(vornhost::IsStationMac("00:00:00:00:00:00"));
  EXPECT_FALSE(vornhost::IsStationMac("0b:00:00:00:00:01"));
}

TEST(StationRecord, IsReadWhole) {
  const auto station = ParseStation(StationText("02:00:00:00:01:0A", true));
  ASSERT_TRUE(station);
  EXPECT_EQ(station->mac, kMac);
  EXPECT_TRUE(station->authorized);
  EXPECT_EQ(station->signal, -52);
  EXPECT_EQ(station->received, 6000000123U);
  EXPECT_EQ(station->sent, 1406U);
}

TEST(StationRecord, WithoutADriverHasNeitherSignalNorTraffic) {
  const auto station = ParseStation(std::string(kMac) + "\nflags=\naid=0\n");
  ASSERT_TRUE(station);
  EXPECT_FALSE(station->authorized);
  EXPECT_EQ(station->signal, std::nullopt);
  EXPECT_EQ(station->received, std::nullopt);
  EXPECT_EQ(station->sent, std::nullopt);
}

TEST(StationRecord, OnlyAssociatedIsNotAuthorized) {
  EXPECT_FALSE(ParseStation(StationText(kMac, false))->authorized);
}

TEST(StationRecord, CutShortAnywhereBeforeItsFlagsEndIsNone) {
  const std::string whole = StationText(kMac, true);
  const size_t flagsEnd = whole.find('\n', whole.find("flags="));
  for (size_t length = 0; length <= flagsEnd; ++length) {
    EXPECT_EQ(ParseStation(whole.substr(0, length)), std::nullopt) << length;
  }
}

TEST(StationRecord, GarbageIsNone) {
  for (const char *text : {"FAIL\n", "OK\n", "UNKNOWN COMMAND\n", "\n", "<3>AP-STA-CONNECTED 02:00:00:00:01:0a\n",
                           "02:00:00:00:01:0a\n", "02:00:00:00:01\nflags=[AUTHORIZED]\n"}) {
    EXPECT_EQ(ParseStation(text), std::nullopt) << text;
  }
}

TEST(StationRecord, NumbersThatAreNoneAreLeftOut) {
  const auto station = ParseStation(
      std::string(kMac) + "\nflags=[AUTHORIZED]\nsignal=strong\nrx_bytes=-1\ntx_bytes=" + "99999999999999999999999\n");
  ASSERT_TRUE(station);
  EXPECT_EQ(station->signal, std::nullopt);
  EXPECT_EQ(station->received, std::nullopt);
  EXPECT_EQ(station->sent, std::nullopt);
}

std::vector<std::string> NetworksOf(const std::string &content) {
  std::vector<std::string> out;
  for (const auto &network : ParseHostapdConfig(content, "/etc/hostapd/x.conf")) {
    out.push_back(network.name + " " + network.control);
  }
  return out;
}

TEST(HostapdConfig, EveryBssIsANetworkWithItsOwnSocket) {
  EXPECT_THAT(NetworksOf("#interface=no\ninterface=wlan0\nctrl_interface=/run/hostapd\nssid=a=b\nbss=gwlan0\n"
                         "ctrl_interface=DIR=/run/guests GROUP=netdev\nbss=third0\nssid=c\n"),
              ElementsAre("wlan0 /run/hostapd/wlan0", "gwlan0 /run/guests/gwlan0", "third0 "));
}

TEST(HostapdConfig, WithoutAnInterfaceIsNone) {
  EXPECT_THAT(NetworksOf(""), IsEmpty());
  EXPECT_THAT(NetworksOf("ssid=a\nbss=gwlan0\n"), IsEmpty());
}

TEST(HostapdConfig, AnInterfaceNameThatIsNoneCostsTheFile) {
  EXPECT_THAT(NetworksOf("interface=../../etc/passwd\n"), IsEmpty());
  EXPECT_THAT(NetworksOf("interface=wlan0\nbss=..\n"), IsEmpty());
  EXPECT_THAT(NetworksOf("interface=wlan0\nbss=aninterfacenametoolong\n"), IsEmpty());
}

std::vector<std::string> LeasesOf(const std::string &content) {
  std::vector<std::string> out;
  for (const DhcpLease &lease : ParseLeases(content, 1000)) {
    out.push_back(lease.mac + " " + lease.ip + " '" + lease.hostname + "' " + std::to_string(lease.expires));
  }
  return out;
}

TEST(Leases, AreReadLineByLine) {
  EXPECT_THAT(LeasesOf("1001 02:00:00:00:01:0A 192.168.1.100 phone 01:02:00:00:00:01:0a\n"
                       "0 02:00:00:00:01:0b 192.168.1.101 * *\n"),
              ElementsAre("02:00:00:00:01:0a 192.168.1.100 'phone' 1001", "02:00:00:00:01:0b 192.168.1.101 '' 0"));
}

TEST(Leases, OverOrCutOrOfDhcp6ArePassedOver) {
  EXPECT_THAT(LeasesOf("1000 02:00:00:00:01:0a 192.168.1.100 old *\n"
                       "2000 02:00:00:00:01:0b 192.168.1.101 cut\n"
                       "2000 02:00:00:00:01:0c 192.168.1. cut *\n"
                       "2000 02:00:00:00:01 192.168.1.102 cut *\n"
                       "duid 00:01:00:01:2c\n"
                       "2000 1234 fd00::5 six 00:01:00:01\n"
                       "x 02:00:00:00:01:0a 192.168.1.100 time *\n"
                       "-1 02:00:00:00:01:0a 192.168.1.100 time *\n"
                       "20"),
              IsEmpty());
}

TEST(Leases, NamesThatAreNoHostnamesAreLeftOut) {
  for (const std::string &name : {std::string("<b>x</b>"), std::string("$(id)"), std::string("a\x1b[2J"),
                                  std::string("\xff\xfe"), std::string(254, 'a')}) {
    EXPECT_THAT(LeasesOf("2000 02:00:00:00:01:0a 192.168.1.100 " + name + " *\n"),
                ElementsAre("02:00:00:00:01:0a 192.168.1.100 '' 2000"));
  }
}

std::string FactsOf(const std::vector<DhcpLease> &leases, const std::vector<Neighbour> &neighbours) {
  const auto facts = StationFacts(leases, neighbours).Find(kMac);
  return facts.ip + " '" + facts.hostname + "'";
}

TEST(StationFacts, OfSeveralLeasesTheOneInUseCounts) {
  const std::vector<DhcpLease> leases = {{kMac, "192.168.1.100", "lan", 9000},
                                         {kMac, "192.168.2.100", "guest", 5000},
                                         {"02:00:00:00:01:0b", "192.168.1.7", "other", 9000}};
  EXPECT_EQ(FactsOf(leases, {{1, AF_INET, "192.168.2.100", kMac, NUD_STALE}}), "192.168.2.100 'guest'");
}

TEST(StationFacts, OfSeveralLeasesNotSeenTheLongestCounts) {
  const std::vector<DhcpLease> leases = {{kMac, "192.168.1.100", "a", 5000}, {kMac, "192.168.1.101", "b", 9000}};
  EXPECT_EQ(FactsOf(leases, {}), "192.168.1.101 'b'");
  EXPECT_EQ(FactsOf({leases[0], leases[1], {kMac, "192.168.1.102", "ever", 0}}, {}), "192.168.1.102 'ever'");
}

TEST(StationFacts, WithoutALeaseTheNeighbourTableKnows) {
  EXPECT_EQ(FactsOf({}, {{1, AF_INET6, "fd00::5", kMac, NUD_REACHABLE},
                         {1, AF_INET, "192.168.1.9", kMac, NUD_STALE},
                         {1, AF_INET, "192.168.1.8", kMac, NUD_REACHABLE}}),
            "192.168.1.8 ''");
}

TEST(StationFacts, Ipv6AloneIsNoAddress) {
  EXPECT_EQ(FactsOf({}, {{1, AF_INET6, "fe80::5", kMac, NUD_REACHABLE}, {1, AF_INET6, "fd00::5", kMac, NUD_REACHABLE}}),
            " ''");
}

} // namespace
