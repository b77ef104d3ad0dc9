#include "host/network/daemon_process.h"

#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>

#include <random>
#include <string>
#include <unistd.h>

namespace {

constexpr char kPidFile[] = "/tmp/daemon.pid";

// @return its process in the foreground, which ends when it goes into the background; it bears its name by now
pid_t StartDaemon(std::string microseconds) {
  std::string name = "daemon";
  std::string option = "-P";
  std::string file = kPidFile;
  char *const arguments[] = {name.data(), option.data(), file.data(), microseconds.data(), nullptr};
  pid_t child = 0;
  EXPECT_EQ(posix_spawn(&child, DAEMON_PROGRAM, nullptr, nullptr, arguments, environ), 0);
  return child;
}

// The one that is stopped may be about to go into the background, with another number.
TEST(DaemonProcess, OneOnItsWayIntoTheBackgroundIsStopped) {
  constexpr int kRounds = 300;
  const vornhost::DaemonProcess daemon("daemon", "-P", kPidFile);
  std::mt19937 random(1); // NOLINT(cert-msc51-cpp): the same times in every run
  for (int round = 0; round < kRounds; ++round) {
    const pid_t child = StartDaemon(std::to_string(random() % 4000));
    usleep(static_cast<useconds_t>(random() % 4000)); // at any moment of its
    daemon.Stop();
    waitpid(child, nullptr, 0);
    ASSERT_FALSE(daemon.IsRunning()) << "round " << round;
  }
}

TEST(DaemonProcess, OnlyTheOneWithTheOptionIsWatched) {
  const vornhost::DaemonProcess daemon("daemon", "-P", kPidFile);
  const pid_t child = StartDaemon("0");
  daemon.AwaitBackground();
  EXPECT_TRUE(daemon.Watch("-P", kPidFile).IsOpen());
  EXPECT_FALSE(daemon.Watch("-i", "wlan1").IsOpen());
  daemon.Stop();
  EXPECT_FALSE(daemon.Watch().IsOpen());
  waitpid(child, nullptr, 0);
}

} // namespace
