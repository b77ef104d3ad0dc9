#include "tests/host/network/system_log.h"

#include "tests/host/network/shell.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <stdexcept>
#include <thread>
#include <utility>

namespace hosttest {

namespace {

struct Log {
  std::mutex mutex;
  std::string lines;
};

// Never destroyed: the thread that writes it ends with the process.
Log &TheLog() {
  static Log &log = *new Log;
  return log;
}

constexpr char kDevices[] = R"(set -e; mkdir -p /mnt/own-dev; mount -t tmpfs tmpfs /mnt/own-dev
for device in null zero full random urandom tty; do
  touch /mnt/own-dev/$device; mount --bind /dev/$device /mnt/own-dev/$device; done
mount --rbind /mnt/own-dev /dev)";

// "<27>Nov 21 03:00:00 program[1]: text" (RFC 3164); the facility is left out of the number.
std::string Line(const std::string &raw) {
  const size_t end = raw.find('>');
  constexpr size_t kTime = sizeof("Nov 21 03:00:00 ") - 1;
  if (raw.empty() || raw[0] != '<' || end == std::string::npos || raw.size() < end + 1 + kTime) {
    return raw;
  }
  return "<" + std::to_string(std::strtol(raw.c_str() + 1, nullptr, 10) % 8) + "> " + raw.substr(end + 1 + kTime);
}

// A program that logs waits when ten lines are unread.
void Keep(int logSocket) {
  Log &log = TheLog();
  std::array<char, 8192> buffer{};
  for (ssize_t got = 0; (got = recv(logSocket, buffer.data(), buffer.size(), 0)) >= 0;) {
    const std::lock_guard lock(log.mutex);
    log.lines += Line(std::string(buffer.data(), static_cast<size_t>(got))) + "\n";
  }
}

} // namespace

void OpenSystemLog() {
  Shell(kDevices);
  const int logSocket = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, "/dev/log");
  if (bind(logSocket, reinterpret_cast<sockaddr *>(&address), sizeof(address)) != 0) {
    throw std::runtime_error("/dev/log");
  }
  std::thread(Keep, logSocket).detach(); // as long as the program
}

std::string TakeSystemLog() {
  Sleep(20); // what was sent last is still on its way to the thread
  Log &log = TheLog();
  const std::lock_guard lock(log.mutex);
  return std::exchange(log.lines, {});
}

} // namespace hosttest
