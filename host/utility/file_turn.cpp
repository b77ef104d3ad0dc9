#include "host/utility/file_turn.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <thread>

namespace vornhost {

namespace {

[[noreturn]] void Fail(const std::string &path) {
  throw std::runtime_error(path + ": " + std::strerror(errno));
}

} // namespace

UniqueFd TakeFileTurn(const std::string &path, std::chrono::milliseconds limit) {
  UniqueFd file(open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
  if (!file.IsOpen()) {
    Fail(path);
  }
  const auto deadline = std::chrono::steady_clock::now() + limit;
  while (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
    if ((errno != EWOULDBLOCK && errno != EINTR) || std::chrono::steady_clock::now() > deadline) {
      Fail(path);
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return file;
}

} // namespace vornhost
