#include "host/network/turn.h"

#include "host/network/names.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <stdexcept>
#include <string>
#include <thread>

namespace vornhost {

namespace {

// A switch is refused while another is under way, but not for the moments that a look at the network takes, or the
// start of a daemon that had died.
constexpr std::chrono::milliseconds kPatience{5000};
constexpr std::chrono::milliseconds kPause{20};

} // namespace

UniqueFd TakeTurn() {
  mkdir(kRunFolder, 0700); // whoever could open it could hold every change up
  UniqueFd folder(open(kRunFolder, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  const auto end = std::chrono::steady_clock::now() + kPatience;
  while (folder.IsOpen()) {
    if (flock(folder.Get(), LOCK_EX | LOCK_NB) == 0) {
      return folder;
    }
    if (errno != EWOULDBLOCK) {
      break;
    }
    if (access(kTopologyLock, F_OK) == 0 || std::chrono::steady_clock::now() > end) {
      return {};
    }
    std::this_thread::sleep_for(kPause);
  }
  throw std::runtime_error(std::string(kRunFolder) + ": " + std::strerror(errno));
}

} // namespace vornhost
