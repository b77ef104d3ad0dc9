#include "host/network/daemon_process.h"

#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <thread>
#include <utility>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

// A DHCP client is not at home for signals while its script runs; it gets this long to end in order.
constexpr int kStopMilliseconds = 3000;

std::vector<std::string> ReadArguments(int pid) {
  std::ifstream file("/proc/" + std::to_string(pid) + "/cmdline", std::ios::binary);
  std::vector<std::string> out;
  for (std::string argument; std::getline(file, argument, '\0');) {
    out.push_back(argument);
  }
  return out;
}

bool HasOption(const std::vector<std::string> &arguments, const std::string &option, const std::string &value) {
  for (size_t at = 1; at + 1 < arguments.size(); ++at) {
    if (arguments[at] == option && arguments[at + 1] == value) {
      return true;
    }
  }
  return false;
}

bool IsInOurNetwork(int pid) {
  struct stat own {};
  struct stat other {};
  return stat("/proc/self/ns/net", &own) == 0 &&
         stat(("/proc/" + std::to_string(pid) + "/ns/net").c_str(), &other) == 0 && own.st_ino == other.st_ino &&
         own.st_dev == other.st_dev;
}

// Anybody may give a process of his any name and arguments.
bool IsOurs(int pid) {
  struct stat info {};
  return stat(("/proc/" + std::to_string(pid)).c_str(), &info) == 0 && info.st_uid == geteuid();
}

bool IsInBackground(int pid) {
  std::error_code failed;
  return fs::read_symlink("/proc/" + std::to_string(pid) + "/fd/1", failed) == "/dev/null";
}

int PidOf(const fs::path &folder) {
  const std::string name = folder.filename();
  int pid = 0;
  const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), pid);
  return error == std::errc() && end == name.data() + name.size() ? pid : 0;
}

// By number: glibc 2.36 declares these two for C only.
UniqueFd OpenProcess(int pid) {
  return UniqueFd(static_cast<int>(syscall(SYS_pidfd_open, pid, 0)));
}

void SignalAndWait(const UniqueFd &process, int signal) {
  if (syscall(SYS_pidfd_send_signal, process.Get(), signal, nullptr, 0) != 0) {
    return; // it has ended
  }
  pollfd wait{process.Get(), POLLIN, 0};
  while (poll(&wait, 1, kStopMilliseconds) < 0 && errno == EINTR) {
  }
}

} // namespace

DaemonProcess::DaemonProcess(std::string program, std::string option, std::string pidFile)
    : program_(std::move(program)), option_(std::move(option)), pidFile_(std::move(pidFile)) {}

bool DaemonProcess::IsIt(int pid) const {
  const std::vector<std::string> arguments = ReadArguments(pid);
  return HasOption(arguments, option_, pidFile_) && fs::path(arguments[0]).filename() == program_ && IsOurs(pid) &&
         IsInOurNetwork(pid);
}

// One that goes into the background while the list of processes is read is missed: the old number is gone by the time
// it is looked at, and the new one was not there when the list was made. It does so once.
std::vector<int> DaemonProcess::Find() const {
  std::vector<int> found = FindInOneLook();
  return found.empty() ? FindInOneLook() : found;
}

std::vector<int> DaemonProcess::FindInOneLook() const {
  std::vector<int> out;
  std::error_code failed;
  for (fs::directory_iterator entry("/proc", failed), end; !failed && entry != end; entry.increment(failed)) {
    const int pid = PidOf(entry->path());
    if (pid != 0 && IsIt(pid)) {
      out.push_back(pid);
    }
  }
  return out;
}

bool DaemonProcess::IsRunning() const {
  const std::vector<int> found = Find();
  return std::any_of(found.begin(), found.end(), IsInBackground);
}

UniqueFd DaemonProcess::Watch(const std::string &option, const std::string &value) const {
  for (const int pid : Find()) {
    const bool wanted = IsInBackground(pid) && (option.empty() || HasOption(ReadArguments(pid), option, value));
    UniqueFd process = wanted ? OpenProcess(pid) : UniqueFd();
    if (process.IsOpen() && IsIt(pid)) { // asked again now that the number is pinned
      return process;
    }
  }
  return {};
}

void DaemonProcess::AwaitBackground() const {
  constexpr int kRounds = 200;
  for (int round = 0; round < kRounds; ++round) {
    if (IsRunning()) {
      return;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  throw std::runtime_error(program_ + " with " + pidFile_ + " does not run");
}

// On its way into the background a daemon forks: what is found once may have a child by the time of the signal.
void DaemonProcess::Stop() const {
  constexpr int kRounds = 5;
  for (int round = 0; round < kRounds; ++round) {
    const std::vector<int> found = Find();
    if (found.empty()) {
      unlink(pidFile_.c_str());
      return;
    }
    for (const int pid : found) {
      const UniqueFd process = OpenProcess(pid);
      if (process.IsOpen() && IsIt(pid)) { // asked again now that the number is pinned
        SignalAndWait(process, SIGTERM);
        SignalAndWait(process, SIGKILL);
      }
    }
  }
  throw std::runtime_error(program_ + " with " + pidFile_ + " does not end");
}

} // namespace vornhost
