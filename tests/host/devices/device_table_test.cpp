// Who is there, under which address and name, and who is asked next; over a clock that the tests move.
#include "host/devices/device_table.h"

#include <gmock/gmock.h>
#include <sys/socket.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using vornhost::Device;
using vornhost::DeviceNeighbour;
using vornhost::DeviceTable;
using vornhost::Finding;
using vornhost::Moment;
using vornhost::Source;

constexpr char kLaptop[] = "d4:3d:7e:11:22:33";
constexpr char kPrinter[] = "3c:2a:f4:11:22:44";
constexpr uint32_t kAddress = 0xc0a8016e; // 192.168.1.110
constexpr int64_t kStart = 1700000000;

class DeviceTableTest : public testing::Test {
protected:
  Moment Now() const { return {kStart + boot_ / 1000, boot_}; }
  void Pass(int64_t seconds) { boot_ += seconds * 1000; }

  static DeviceNeighbour Entry(const std::string &mac, const std::string &address, bool reachable = true) {
    DeviceNeighbour neighbour;
    neighbour.netif = "lbr0";
    neighbour.family = address.find(':') == std::string::npos ? AF_INET : AF_INET6;
    neighbour.linkLocal = address.starts_with("fe80:");
    neighbour.address = address;
    neighbour.mac = mac;
    neighbour.reachable = reachable;
    return neighbour;
  }
  void See(const std::string &mac, const std::string &address) { table_.NoteNeighbour(Entry(mac, address), Now()); }
  void SeeOn(const std::string &netif, const std::string &mac, const std::string &address) {
    DeviceNeighbour neighbour = Entry(mac, address);
    neighbour.netif = netif;
    table_.NoteNeighbour(neighbour, Now());
  }

  // The device as it is written; every change of the others is dropped.
  Device Written(const std::string &mac) {
    for (const Device &device : table_.TakeChanges(Now())) {
      written_[device.mac] = device;
    }
    return written_[mac];
  }
  bool IsOnline(const std::string &mac) const {
    const auto presences = table_.Presences();
    const auto found = presences.find(mac);
    return found != presences.end() && boot_ - found->second.seen <= 60000;
  }

  int64_t boot_ = 1000000;
  DeviceTable table_{"Router"};
  std::map<std::string, Device> written_;
};

TEST_F(DeviceTableTest, ANeighbourThatAnsweredIsThere) {
  See(kLaptop, "192.168.1.110");
  EXPECT_TRUE(IsOnline(kLaptop));
  const Device device = Written(kLaptop);
  EXPECT_EQ(device.ip, "192.168.1.110");
  EXPECT_EQ(device.netif, "lbr0");
  EXPECT_EQ(device.connection, "ethernet");
  EXPECT_EQ(device.sources, vornhost::BitOf(Source::kArp));
  EXPECT_EQ(device.lastSeen, Now().wall);
}

TEST_F(DeviceTableTest, ItIsGoneAMinuteAfterItsLastAnswer) {
  DeviceNeighbour neighbour = Entry(kLaptop, "192.168.1.110");
  neighbour.confirmedAgo = 25000;
  table_.NoteNeighbour(neighbour, Now());
  Pass(35);
  EXPECT_TRUE(IsOnline(kLaptop));
  Pass(1);
  EXPECT_FALSE(IsOnline(kLaptop));
}

TEST_F(DeviceTableTest, AnEntryThatIsStaleOrOldShowsNobody) {
  table_.NoteNeighbour(Entry(kLaptop, "192.168.1.110", false), Now());
  DeviceNeighbour old = Entry(kPrinter, "192.168.1.111");
  old.confirmedAgo = 61000; // still "reachable" for the kernel
  table_.NoteNeighbour(old, Now());
  EXPECT_THAT(table_.Presences(), IsEmpty());
  EXPECT_THAT(table_.TakeChanges(Now()), IsEmpty());
}

TEST_F(DeviceTableTest, ALinkLocalAddressAloneKeepsNobodyOnline) {
  See(kLaptop, "192.168.1.110");
  for (int i = 0; i < 13; ++i) {
    Pass(5);
    See(kLaptop, "fe80::1");
  }
  EXPECT_FALSE(IsOnline(kLaptop));
  See(kLaptop, "2001:db8::1");
  EXPECT_TRUE(IsOnline(kLaptop));
}

TEST_F(DeviceTableTest, WhoIsSilentIsAskedAgainAndAgainBeforeItCountsAsGone) {
  See(kLaptop, "192.168.1.110");
  std::vector<int> asked;
  for (int second = 1; second <= 60; ++second) {
    Pass(1);
    for (const vornhost::Probe &probe : table_.TakeProbes(Now())) {
      EXPECT_EQ(probe.ip, "192.168.1.110");
      EXPECT_EQ(probe.broadcast, second >= 40) << second;
      asked.push_back(second);
    }
    EXPECT_TRUE(IsOnline(kLaptop)) << second;
  }
  EXPECT_THAT(asked, ElementsAre(20, 25, 30, 35, 40, 45, 50, 55, 60));
}

TEST_F(DeviceTableTest, ASleeperThatAnswersTheLastTryDoesNotFlap) {
  for (int round = 0; round < 10; ++round) {
    See(kLaptop, "192.168.1.110");
    for (int second = 0; second < 56; ++second) {
      Pass(1);
      EXPECT_TRUE(IsOnline(kLaptop));
    }
  }
}

TEST_F(DeviceTableTest, OneThatAnswersIsAskedThreeTimesAMinute) {
  See(kLaptop, "192.168.1.110");
  int asked = 0;
  for (int second = 0; second < 600; ++second) {
    Pass(1);
    for (const vornhost::Probe &probe : table_.TakeProbes(Now())) {
      ++asked;
      See(probe.mac, probe.ip);
    }
  }
  EXPECT_EQ(asked, 30);
}

TEST_F(DeviceTableTest, OneThatIsGoneIsAskedSeldomUntilItStirs) {
  See(kLaptop, "192.168.1.110");
  Pass(61);
  EXPECT_THAT(table_.TakeProbes(Now()), SizeIs(1));
  int asked = 0;
  for (int second = 0; second < 900; ++second) {
    Pass(1);
    asked += static_cast<int>(table_.TakeProbes(Now()).size());
  }
  EXPECT_EQ(asked, 3);
  Pass(10);
  table_.NoteNeighbour(Entry(kLaptop, "192.168.1.110", false), Now());
  EXPECT_THAT(table_.TakeProbes(Now()), SizeIs(1));
  EXPECT_THAT(table_.TakeProbes(Now()), IsEmpty());
}

TEST_F(DeviceTableTest, AHostOfIpv6AloneIsAskedByItsAddress) {
  See(kLaptop, "2001:db8::1");
  Pass(20);
  const auto probes = table_.TakeProbes(Now());
  ASSERT_THAT(probes, SizeIs(1));
  EXPECT_EQ(probes[0].ip, "");
  EXPECT_EQ(probes[0].address, "2001:db8::1");
  EXPECT_EQ(Written(kLaptop).netif, "lbr0");
}

TEST_F(DeviceTableTest, AHostOfIpv6AloneThatIsSilentIsAskedByEveryAddressInTurn) {
  See(kLaptop, "2001:db8::1");
  See(kLaptop, "2001:db8::2");
  std::set<std::string> asked;
  for (int second = 0; second < 60; ++second) {
    Pass(1);
    for (const vornhost::Probe &probe : table_.TakeProbes(Now())) {
      asked.insert(probe.address);
    }
  }
  EXPECT_THAT(asked, ElementsAre("2001:db8::1", "2001:db8::2"));
}

TEST_F(DeviceTableTest, WhoIsKnownByTheLinkAloneIsAskedByAGuessAndIsNotThereYet) {
  DeviceNeighbour neighbour = Entry(kLaptop, "fe80::7");
  neighbour.guess = "2001:db8::7";
  table_.NoteNeighbour(neighbour, Now());
  const auto probes = table_.TakeProbes(Now());
  ASSERT_THAT(probes, SizeIs(1));
  EXPECT_EQ(probes[0].address, "2001:db8::7");
  EXPECT_EQ(probes[0].netif, "lbr0");
  EXPECT_EQ(probes[0].ip, "");
  EXPECT_FALSE(IsOnline(kLaptop));
  EXPECT_THAT(table_.TakeChanges(Now()), IsEmpty());
  See(kLaptop, "2001:db8::7");
  EXPECT_TRUE(IsOnline(kLaptop));
  EXPECT_EQ(Written(kLaptop).netif, "lbr0");
}

TEST_F(DeviceTableTest, AWrongGuessIsAskedEveryFiveMinutes) {
  DeviceNeighbour neighbour = Entry(kLaptop, "fe80::7", false);
  neighbour.guess = "2001:db8::7";
  neighbour.updatedAgo = 3600000;
  size_t asked = 0;
  for (int second = 0; second < 3600; ++second) {
    table_.NoteNeighbour(neighbour, Now());
    asked += table_.TakeProbes(Now()).size();
    EXPECT_THAT(table_.Shrink({}, Now()), IsEmpty());
    Pass(1);
  }
  EXPECT_GE(asked, 11U);
  EXPECT_LE(asked, 13U);
  EXPECT_FALSE(IsOnline(kLaptop));
}

TEST_F(DeviceTableTest, WhoHasAnAddressIsNotAskedByAGuess) {
  DeviceNeighbour neighbour = Entry(kLaptop, "fe80::7");
  neighbour.guess = "2001:db8::7";
  table_.NoteNeighbour(neighbour, Now());
  See(kLaptop, "192.168.1.110");
  for (int second = 0; second < 120; ++second) {
    Pass(1);
    table_.NoteNeighbour(neighbour, Now());
    for (const vornhost::Probe &probe : table_.TakeProbes(Now())) {
      EXPECT_EQ(probe.address, "");
      EXPECT_EQ(probe.ip, "192.168.1.110");
    }
  }
}

TEST_F(DeviceTableTest, ProbesGoOutInSmallPortions) {
  for (int i = 0; i < 200; ++i) {
    char mac[18];
    std::snprintf(mac, sizeof(mac), "d4:3d:7e:00:00:%02x", i);
    See(mac, "192.168.1." + std::to_string(i));
  }
  Pass(20);
  EXPECT_THAT(table_.TakeProbes(Now()), SizeIs(50));
}

// ---- addresses

TEST_F(DeviceTableTest, AnAddressThatMovesIsTheNewDevices) {
  See(kLaptop, "192.168.1.110");
  Pass(10);
  See(kPrinter, "192.168.1.110");
  EXPECT_EQ(Written(kPrinter).ip, "192.168.1.110");
  EXPECT_EQ(Written(kLaptop).ip, "");
  table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"printer", "", ""});
  EXPECT_EQ(Written(kPrinter).findings[2].name, "printer");
  EXPECT_EQ(Written(kLaptop).findings[2].name, "");
}

TEST_F(DeviceTableTest, ADeviceWithTwoAddressesKeepsTheOneItIsShownWith) {
  for (int i = 0; i < 20; ++i) {
    See(kLaptop, "192.168.1.110");
    See(kLaptop, "192.168.1.120");
    Pass(5);
    EXPECT_EQ(Written(kLaptop).ip, "192.168.1.110");
  }
  for (int i = 0; i < 14; ++i) {
    Pass(5);
    See(kLaptop, "192.168.1.120");
    See(kLaptop, "2001:db8::1"); // which says nothing of the other family
  }
  EXPECT_EQ(Written(kLaptop).ip, "192.168.1.120");
}

TEST_F(DeviceTableTest, WhoAnnouncesAnotherAddressIsAskedThereAndMovesOnceTheOldOneIsSilent) {
  See(kLaptop, "192.168.1.110");
  Pass(5);
  table_.NoteNeighbour(Entry(kLaptop, "192.168.1.120", false), Now());
  const auto probes = table_.TakeProbes(Now());
  ASSERT_THAT(probes, SizeIs(1));
  EXPECT_EQ(probes[0].ip, "192.168.1.120");
  EXPECT_EQ(Written(kLaptop).ip, "192.168.1.110");
  EXPECT_THAT(table_.TakeProbes(Now()), IsEmpty());
  Pass(56);
  See(kLaptop, "192.168.1.120");
  EXPECT_EQ(Written(kLaptop).ip, "192.168.1.120");
}

TEST_F(DeviceTableTest, TheSameAddressOnTwoBridgesIsTwoDevices) {
  SeeOn("lbr0", kLaptop, "192.168.1.110");
  SeeOn("gbr0", kPrinter, "192.168.1.110");
  EXPECT_EQ(Written(kLaptop).ip, "192.168.1.110");
  EXPECT_EQ(Written(kPrinter).ip, "192.168.1.110");
  EXPECT_EQ(Written(kPrinter).netif, "gbr0");
  table_.NoteFinding(Source::kMdns, "gbr0", kAddress, {"guest", "", ""});
  EXPECT_EQ(Written(kLaptop).findings[2].name, "");
}

TEST_F(DeviceTableTest, AnswersOfUnknownAddressesArePassedOver) {
  table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"ghost", "", ""});
  EXPECT_EQ(table_.Size(), 0U);
}

// ---- names

TEST_F(DeviceTableTest, ALeaseGivesNameAndAddressButNotPresence) {
  table_.NoteLease({kLaptop, "192.168.1.110", "laptop", 0}, "lbr0", Now());
  EXPECT_FALSE(IsOnline(kLaptop));
  const Device device = Written(kLaptop);
  EXPECT_EQ(device.sources, vornhost::BitOf(Source::kDhcp));
  EXPECT_EQ(device.findings[1].name, "laptop");
  EXPECT_EQ(device.ip, "192.168.1.110");
  EXPECT_EQ(device.lastSeen, 0);
  EXPECT_THAT(table_.TakeProbes(Now()), SizeIs(1));
}

TEST_F(DeviceTableTest, ALeaseForAnAddressThatAnotherAnswersWithTakesItFromNobody) {
  See(kPrinter, "192.168.1.110");
  table_.NoteLease({kLaptop, "192.168.1.110", "laptop", 0}, "lbr0", Now());
  EXPECT_EQ(Written(kPrinter).ip, "192.168.1.110");
  EXPECT_EQ(Written(kLaptop).ip, "");
}

TEST_F(DeviceTableTest, ARenewedLeaseMovesTheDeviceAtOnce) {
  See(kLaptop, "192.168.1.110");
  table_.NoteLease({kLaptop, "192.168.1.120", "laptop", 0}, "lbr0", Now());
  EXPECT_EQ(Written(kLaptop).ip, "192.168.1.120");
}

TEST_F(DeviceTableTest, TheRoutersOwnNameIsNoDevices) {
  See(kLaptop, "192.168.1.110");
  table_.NoteFinding(Source::kNetbios, "lbr0", kAddress, {"ROUTER", "", ""});
  EXPECT_EQ(Written(kLaptop).findings[4].name, "");
}

TEST_F(DeviceTableTest, WhatALaterAnswerDoesNotSayStays) {
  See(kLaptop, "192.168.1.110");
  table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"one", "Printer", "X"});
  table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"two", "", ""});
  EXPECT_EQ(Written(kLaptop).findings[2], (Finding{"two", "Printer", "X"}));
}

TEST_F(DeviceTableTest, NamesAreAskedAtOnceAndThenMoreAndMoreSeldom) {
  See(kLaptop, "192.168.1.110");
  std::vector<int> asked;
  for (int second = 0; second < 8000; ++second) {
    See(kLaptop, "192.168.1.110");
    if (!table_.TakeInquiries(Now()).empty()) {
      asked.push_back(second);
    }
    Pass(1);
  }
  EXPECT_THAT(asked, ElementsAre(0, 30, 150, 3750, 7350));
}

// ---- stations

TEST_F(DeviceTableTest, AnAssociatedStationIsThere) {
  table_.NoteStations({{kLaptop, "wlan0", "", "phone", {-60, 1, 2}}}, Now());
  EXPECT_TRUE(IsOnline(kLaptop));
  EXPECT_EQ(table_.Presences()[kLaptop].radio, (vornhost::RadioFigures{-60, 1, 2}));
  const Device device = Written(kLaptop);
  EXPECT_EQ(device.connection, "wifi");
  EXPECT_EQ(device.netif, "wlan0");
  EXPECT_EQ(device.findings[5].name, "phone");
}

TEST_F(DeviceTableTest, OneThatLeavesTheRadioAndAnswersIsOnTheCable) {
  table_.NoteStations({{kLaptop, "wlan0", "", "", {}}}, Now());
  for (int i = 0; i < 7; ++i) {
    Pass(10);
    See(kLaptop, "192.168.1.110");
    table_.NoteStations({}, Now());
  }
  EXPECT_EQ(Written(kLaptop).connection, "ethernet");
  EXPECT_EQ(table_.Presences()[kLaptop].radio, std::nullopt);
}

// ---- what is written

TEST_F(DeviceTableTest, UnchangedFactsAreWrittenOnce) {
  size_t writes = 0;
  for (int second = 0; second < 5 * 3600; second += 5) {
    See(kLaptop, "192.168.1.110");
    table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"laptop", "", ""});
    writes += table_.TakeChanges(Now()).size();
    Pass(5);
  }
  EXPECT_EQ(writes, 1U);
}

TEST_F(DeviceTableTest, TheTimeOfTheLastSightIsWrittenWhenItGoes) {
  See(kLaptop, "192.168.1.110");
  table_.TakeChanges(Now());
  Pass(30);
  See(kLaptop, "192.168.1.110");
  const int64_t seen = Now().wall;
  Pass(60);
  EXPECT_THAT(table_.TakeChanges(Now()), IsEmpty());
  Pass(1);
  const auto changes = table_.TakeChanges(Now());
  ASSERT_THAT(changes, SizeIs(1));
  EXPECT_EQ(changes[0].lastSeen, seen);
  Pass(1000);
  EXPECT_THAT(table_.TakeChanges(Now()), IsEmpty());
}

TEST_F(DeviceTableTest, ADeviceThatRenamesItselfAllTheTimeIsWrittenTwentyTimesAnHour) {
  size_t writes = 0;
  for (int second = 0; second < 3600; ++second) {
    See(kLaptop, "192.168.1.110");
    table_.NoteFinding(Source::kMdns, "lbr0", kAddress, {"name" + std::to_string(second), "", ""});
    writes += table_.TakeChanges(Now()).size();
    Pass(1);
  }
  EXPECT_EQ(writes, 20U);
  Pass(1);
  EXPECT_EQ(Written(kLaptop).findings[2].name, "name3599");
}

TEST_F(DeviceTableTest, WhatCouldNotBeWrittenComesAgain) {
  See(kLaptop, "192.168.1.110");
  table_.NoteUnwritten(table_.TakeChanges(Now()));
  EXPECT_THAT(table_.TakeChanges(Now()), SizeIs(1));
}

TEST_F(DeviceTableTest, AForgottenDeviceIsNewWhenItAnswersAgain) {
  See(kLaptop, "192.168.1.110");
  See(kPrinter, "192.168.1.111");
  table_.TakeChanges(Now());
  table_.ForgetMissing({kPrinter});
  EXPECT_EQ(table_.Size(), 1U);
  See(kLaptop, "192.168.1.110");
  EXPECT_THAT(table_.TakeChanges(Now()), SizeIs(1));
}

TEST_F(DeviceTableTest, ARestartMakesNobodyGo) {
  See(kLaptop, "192.168.1.110");
  const auto devices = table_.TakeChanges(Now());
  DeviceTable next("Router");
  Pass(10);
  next.Load(devices, table_.Presences(), Now());
  EXPECT_EQ(next.Presences(), table_.Presences());
  EXPECT_TRUE(next.Knows("lbr0", kAddress));
  EXPECT_THAT(next.TakeChanges(Now()), IsEmpty());
}

// ---- how many there can be

std::string MacOf(int number) {
  char mac[18];
  std::snprintf(mac, sizeof(mac), "d4:3d:%02x:%02x:%02x:01", (number >> 16) & 0xff, (number >> 8) & 0xff,
                number & 0xff);
  return mac;
}

TEST_F(DeviceTableTest, OfTooManyThoseGoThatWereNotSeenTheLongest) {
  for (int i = 0; i < 4200; ++i) {
    if (i % 500 == 0) {
      Pass(60);
    }
    SeeOn("lbr0", MacOf(i), "10.0." + std::to_string(i / 250) + "." + std::to_string(i % 250));
  }
  table_.TakeChanges(Now());
  const auto forgotten = table_.Shrink({{MacOf(3), {"mine", ""}}}, Now());
  EXPECT_EQ(table_.Size(), 4096U);
  EXPECT_THAT(forgotten, SizeIs(104));
  EXPECT_THAT(forgotten, testing::Each(testing::AnyOfArray([] {
                std::vector<std::string> first;
                for (int i = 0; i < 500; ++i) {
                  first.push_back(MacOf(i));
                }
                return first;
              }())));
  EXPECT_THAT(forgotten, testing::Not(testing::Contains(MacOf(3))));
}

TEST_F(DeviceTableTest, NewOnesBeyondAMeasureHaveToWait) {
  for (int i = 0; i < 2000; ++i) {
    See(MacOf(i), "192.168.1.110");
  }
  EXPECT_EQ(table_.Size(), 512U);
  Pass(60);
  See(MacOf(1999), "192.168.1.110");
  EXPECT_EQ(table_.Size(), 513U);
}

TEST_F(DeviceTableTest, OneThatNeverAnswersIsDropped) {
  table_.NoteNeighbour(Entry(kLaptop, "192.168.1.110", false), Now());
  EXPECT_EQ(table_.Size(), 1U);
  Pass(61);
  EXPECT_THAT(table_.Shrink({}, Now()), IsEmpty());
  EXPECT_EQ(table_.Size(), 0U);
}

} // namespace
