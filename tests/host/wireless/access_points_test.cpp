// The access points' bridges in a switch of the topology.
#include "host/wireless/access_points.h"
#include "tests/host/files.h"
#include "tests/host/utility/syslog_record.h"
#include "tests/host/wireless/hostapd_peer.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>

namespace {

using hosttest::FakeHostapd;
using hosttest::ReadText;
using hosttest::RealHostapd;
using hosttest::TakeLogLines;
using hosttest::WriteHostapdConfig;
using hosttest::WriteText;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornhost::MoveAccessPoints;
using vornhost::WithBridge;

TEST(BridgeLines, OnlyTheHomesBridgesAreReplaced) {
  EXPECT_EQ(WithBridge("interface=wlan0\nbridge=lbr0\n#bridge=lbr0\nbss=gwlan0\nbridge=gbr0\nbridge=br0", "br0"),
            "interface=wlan0\nbridge=br0\n#bridge=lbr0\nbss=gwlan0\nbridge=gbr0\nbridge=br0\n");
  EXPECT_EQ(WithBridge("bridge=lbr01\nwds_bridge=lbr0\nbridge=\n", "br0"), "bridge=lbr01\nwds_bridge=lbr0\nbridge=\n");
}

class AccessPoints : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder("/etc/hostapd");
    hosttest::FreshFolder(hosttest::kControlFolder);
    std::filesystem::remove_all("/run/vorn");
    TakeLogLines();
  }
};

std::string FileOf(const std::string &name) {
  return ReadText("/etc/hostapd/" + name + ".conf");
}

TEST_F(AccessPoints, FilesAndRunningHostapdAreTold) {
  WriteHostapdConfig("wlan0", "bridge=lbr0\nbss=gwlan0\nctrl_interface=/run/hostapd\nbridge=gbr0\n");
  WriteHostapdConfig("wlan1", "bridge=lbr0\n");
  const auto obey = [](const std::string &) { return "OK\n"; };
  FakeHostapd home("wlan0", obey);
  FakeHostapd guests("gwlan0", obey);
  FakeHostapd other("wlan1", obey);
  MoveAccessPoints("br0");
  EXPECT_THAT(FileOf("wlan0"), HasSubstr("bridge=br0\nbss=gwlan0\nctrl_interface=/run/hostapd\nbridge=gbr0\n"));
  EXPECT_THAT(FileOf("wlan1"), HasSubstr("bridge=br0\n"));
  EXPECT_THAT(home.Requests(), ElementsAre("SET bridge br0"));
  EXPECT_THAT(guests.Requests(), IsEmpty());
  EXPECT_THAT(other.Requests(), ElementsAre("SET bridge br0"));
  MoveAccessPoints("br0"); // they are there
  EXPECT_EQ(home.Requests().size(), 1U);
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(AccessPoints, RealHostapdTakesIt) {
  WriteHostapdConfig("none0", "bridge=lbr0\n");
  const RealHostapd hostapd({"none0"});
  MoveAccessPoints("br0");
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(AccessPoints, DeadHostapdFindsItsFile) {
  WriteHostapdConfig("wlan0", "bridge=br0\n");
  MoveAccessPoints("lbr0");
  EXPECT_THAT(FileOf("wlan0"), HasSubstr("bridge=lbr0\n"));
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(AccessPoints, HostapdThatRefusesOrHangsIsLoggedAndHoldsNobodyUp) {
  WriteHostapdConfig("wlan0", "bridge=lbr0\n");
  WriteHostapdConfig("wlan1", "bridge=lbr0\n");
  const FakeHostapd refusing("wlan0", [](const std::string &) { return "FAIL\n"; });
  const FakeHostapd hanging("wlan1", [](const std::string &) { return std::nullopt; });
  const auto start = std::chrono::steady_clock::now();
  MoveAccessPoints("br0");
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(2800));
  EXPECT_THAT(FileOf("wlan1"), HasSubstr("bridge=br0\n"));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 wlan0: hostapd does not take the bridge br0 before it is started again",
                                          "3 wlan1: hostapd does not take the bridge br0 before it is started again"));
}

TEST_F(AccessPoints, FileThatCannotBeWrittenLeavesAllAsTheyWere) {
  WriteHostapdConfig("wlan0", "bridge=lbr0\n");
  WriteHostapdConfig("wlan1", "bridge=lbr0\n");
  const std::string before = FileOf("wlan0");
  std::filesystem::rename("/etc/hostapd/wlan1.conf", "/etc/hostapd/wlan1.moved");
  std::filesystem::create_symlink("/etc/hostapd/wlan1.moved", "/etc/hostapd/wlan1.conf");
  FakeHostapd hostapd("wlan0", [](const std::string &) { return "OK\n"; });
  EXPECT_THROW(MoveAccessPoints("br0"), std::runtime_error);
  EXPECT_EQ(FileOf("wlan0"), before);
  EXPECT_THAT(hostapd.Requests(), IsEmpty());
}

} // namespace
