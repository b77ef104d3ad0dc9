// The scanner, run as a process in the test's own view.
#ifndef TESTS_HOST_DEVICES_SCANNER_PROCESS_H
#define TESTS_HOST_DEVICES_SCANNER_PROCESS_H

#include "host/utility/unique_fd.h"
#include "tests/host/network/shell.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/wait.h>

#include <csignal>
#include <sched.h>
#include <stdexcept>
#include <string>
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

/// A host of its own at the other end of a cable to a bridge, as long as it lives.
class FarHost {
public:
  FarHost(const std::string &bridge, const std::string &port, const std::string &mac) : port_(port), pid_(fork()) {
    if (pid_ == 0) {
      unshare(CLONE_NEWNET);
      pause();
      _exit(0);
    }
    const std::string own = std::to_string(getpid());
    const std::string far = std::to_string(pid_);
    if (!Eventually(5000, [&] {
          return Shell("readlink /proc/" + own + "/ns/net") != Shell("readlink /proc/" + far + "/ns/net");
        })) {
      throw std::runtime_error("no network for a host");
    }
    Shell("ip link add " + port + " type veth peer name eth0 netns " + far + " && ip link set " + port + " master " +
          bridge + " up");
    Run("ip link set eth0 address " + mac);
  }
  ~FarHost() {
    Shell("ip link del " + port_);
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  FarHost(const FarHost &) = delete;
  FarHost &operator=(const FarHost &) = delete;

  std::string Run(const std::string &command) const {
    return Shell("nsenter --target " + std::to_string(pid_) + " --net sh -c '" + command + "'");
  }

  /// A socket made in the host's network.
  vornhost::UniqueFd Open(int family, int type, int protocol) const {
    const vornhost::UniqueFd own(open("/proc/self/ns/net", O_RDONLY | O_CLOEXEC));
    const vornhost::UniqueFd far(open(("/proc/" + std::to_string(pid_) + "/ns/net").c_str(), O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(setns(far.Get(), CLONE_NEWNET), 0);
    vornhost::UniqueFd fd(socket(family, type | SOCK_CLOEXEC | SOCK_NONBLOCK, protocol));
    EXPECT_EQ(setns(own.Get(), CLONE_NEWNET), 0);
    EXPECT_TRUE(fd.IsOpen());
    return fd;
  }

private:
  std::string port_;
  pid_t pid_;
};

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
