// What the scanner costs in a home of 50 and of 250 devices: packets, processor time, writes. It is measured over 40
// seconds, two rounds of probes, after the names were asked twice; docs/devices.md has the figures for an hour.
#include "host/devices/device_store.h"
#include "platform/netclient.h"
#include "tests/host/devices/crowd.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <csignal>
#include <ctime>
#include <sstream>
#include <unistd.h>

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
    hosttest::Shell("ip link add lbr0 type bridge && ip link add lan1 type veth peer name far1 && "
                    "sysctl -qw net.ipv6.conf.far1.disable_ipv6=1 net.ipv4.conf.far1.arp_ignore=8 "
                    "net.ipv4.conf.lbr0.arp_accept=1 && ip link set lan1 master lbr0 && ip link set far1 up && "
                    "ip link set lan1 up && ip addr add 192.168.0.1/16 dev lbr0 && ip link set lbr0 up");
    hosttest::FreshFolder("/var/lib/vorn");
    scanner_ = fork();
    if (scanner_ == 0) {
      execl(VORN_DEVICES_PROGRAM, "vorndevices", "watch", nullptr);
      _exit(127);
    }
  }
  void TearDown() override {
    kill(scanner_, SIGTERM);
    int status = -1;
    waitpid(scanner_, &status, 0);
    EXPECT_EQ(status, 0);
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
    std::istringstream fields(hosttest::ReadText("/proc/" + std::to_string(scanner_) + "/schedstat"));
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

  pid_t scanner_ = -1;
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
