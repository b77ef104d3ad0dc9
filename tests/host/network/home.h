// A router's ports in the test's own network, with a provider behind the WAN port.
#ifndef TESTS_HOST_NETWORK_HOME_H
#define TESTS_HOST_NETWORK_HOME_H

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace hosttest {

constexpr char kProgram[] = "/usr/vorn/sbin/vorntopology";
constexpr char kLock[] = "/tmp/topology.lock";
constexpr char kWanFile[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";
constexpr char kLanFile[] = "/etc/sysconfig/network-scripts/ifcfg-lbr0";
constexpr char kGuestFile[] = "/etc/sysconfig/network-scripts/ifcfg-gbr0";

constexpr char kAccessPointFile[] = "/etc/hostapd/wlan0.conf";

/// What the tests compare: every link with its ports and addresses, the routes, the DHCP clients, the WAN port's file,
/// the access points' bridges and the lock. Link-local IPv6 is left out, because the kernel makes it in its own time.
std::string Picture();

/// Starts a program without waiting for it. @return its process
int StartProgram(const std::vector<std::string> &arguments);
/// @return its exit status, -N when signal N ended it
int WaitFor(int process);

/// Daemons that ended are children of the test, the first process of its namespace.
void ReapDaemons();

/// eth0 (a provider with DHCP at its other end), lan1 to lan3, guest1, all configured and brought up in router
/// topology.
class Home : public testing::Test {
protected:
  static void SetUpTestSuite();
  void SetUp() override;
  void TearDown() override;

  /// vorntopology with these arguments; its status.
  static int Run(const std::string &arguments);

  void StartDhcpServer();
  void StopDhcpServer();

  /// A command in the provider's network.
  std::string AtProvider(const std::string &command) const;

private:
  int provider_ = 0; // holds the provider's network
  int server_ = 0;
};

} // namespace hosttest

#endif
