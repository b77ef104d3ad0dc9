// What the scanner costs in a home of 50 and of 250 devices: packets, processor time, writes. It is measured over 40
// seconds, two rounds of probes, after the names were asked twice; docs/devices.md has the figures for an hour.
#include "host/devices/device_store.h"
#include "platform/netclient.h"
#include "tests/host/devices/crowd.h"
#include "tests/host/devices/scanner_process.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <gtest/gtest.h>

#include <ctime>
#include <optional>
#include <sstream>

namespace {

constexpr int kSettleMillis = 36000;
constexpr int kWindowMillis = 40000;

struct Cost {
  double packets = 0; // a minute
  double cpu = 0;     // share of one processor
};

class ScannerBudget : public testing::Test {
protected:
  void SetUp() override {
    hosttest::MakeCable();
    hosttest::Shell("ip addr add 2001:db8:2::1/64 dev lbr0 nodad"); // or nobody of IPv6 alone would be looked for
    hosttest::FreshFolder("/var/lib/vorn");
    scanner_.emplace();
  }

  static int Online() {
    Json::Value result;
    vornnetwork::dbus::NetClient().GetDeviceListData("arp", result);
    int online = 0;
    for (const Json::Value &entry : result["ClientList"]) {
      tm local{};
      local.tm_isdst = -1;
      strptime(entry["asso_time"].asCString(), "%T %Y/%m/%d", &local);
      online += std::difftime(time(nullptr), mktime(&local)) <= 60 ? 1 : 0;
    }
    return online;
  }

  // The scheduler's own count, in nanoseconds; clock ticks are too coarse for so little.
  double CpuSeconds() const {
    std::istringstream fields(hosttest::ReadText("/proc/" + std::to_string(scanner_->Pid()) + "/schedstat"));
    double nanoseconds = -1;
    fields >> nanoseconds;
    EXPECT_GT(nanoseconds, 0);
    return nanoseconds / 1e9;
  }

  Cost Measure(hosttest::Crowd &crowd, int devices) {
    crowd.Grow(devices);
    EXPECT_TRUE(hosttest::Eventually(20000, [devices] { return Online() == devices; })) << Online();
    hosttest::Sleep(kSettleMillis);
    vornhost::DeviceStore watcher;
    const int64_t version = watcher.DataVersion();
    const double cpu = CpuSeconds();
    const int packets = crowd.Received();
    hosttest::Sleep(kWindowMillis);
    EXPECT_EQ(watcher.DataVersion(), version) << "something that had not changed was written";
    EXPECT_EQ(Online(), devices);
    const Cost cost{(crowd.Received() - packets) * 60000.0 / kWindowMillis,
                    (CpuSeconds() - cpu) * 1000 / kWindowMillis};
    std::printf("%d devices: %.0f packets a minute, %.2f %% of a processor, nothing written\n", devices, cost.packets,
                cost.cpu * 100);
    return cost;
  }

  std::optional<hosttest::ScannerProcess> scanner_;
};

TEST_F(ScannerBudget, IsKeptAt50AndAt250Devices) {
  hosttest::Crowd crowd("far1");
  const Cost small = Measure(crowd, 50);
  EXPECT_LE(small.packets, 50 * 4 + 20);
  EXPECT_GE(small.packets, 50 * 2); // or nobody was asked
  EXPECT_LE(small.cpu, 0.01);
  const Cost large = Measure(crowd, 250);
  EXPECT_LE(large.packets, 250 * 4 + 20);
  EXPECT_GE(large.packets, 250 * 2);
  EXPECT_LE(large.cpu, 0.02);
}

} // namespace
