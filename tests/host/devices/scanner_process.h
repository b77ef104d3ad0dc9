// The scanner, run as a process in the test's own view.
#ifndef TESTS_HOST_DEVICES_SCANNER_PROCESS_H
#define TESTS_HOST_DEVICES_SCANNER_PROCESS_H

#include "tests/host/network/shell.h"

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <csignal>
#include <unistd.h>

namespace hosttest {

/// lbr0, 192.168.0.1/16, with a cable whose far end is far1. A bridge whose address is not set has its lowest port's,
/// and forgets its neighbours when that changes.
inline void MakeCable() {
  Shell("ip link add lbr0 address 02:00:5e:00:00:01 type bridge && ip link add lan1 type veth peer name far1 && "
        "sysctl -qw net.ipv6.conf.far1.disable_ipv6=1 net.ipv4.conf.far1.arp_ignore=8 "
        "net.ipv4.conf.lbr0.arp_accept=1 && ip link set lan1 master lbr0 && ip link set far1 up && "
        "ip link set lan1 up && ip addr add 192.168.0.1/16 dev lbr0 && ip link set lbr0 up");
}

/// Runs as long as it lives, and is to end with status 0.
class ScannerProcess {
public:
  ScannerProcess() : pid_(fork()) {
    if (pid_ == 0) {
      execl(VORN_DEVICES_PROGRAM, "vorndevices", "watch", nullptr);
      _exit(127);
    }
  }
  ~ScannerProcess() {
    kill(pid_, SIGTERM);
    int status = -1;
    waitpid(pid_, &status, 0);
    EXPECT_EQ(status, 0);
  }
  ScannerProcess(const ScannerProcess &) = delete;
  ScannerProcess &operator=(const ScannerProcess &) = delete;

  pid_t Pid() const { return pid_; }

private:
  pid_t pid_;
};

} // namespace hosttest

#endif
