#include "host/network/turn.h"

#include "host/network/names.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

namespace vornhost {

UniqueFd TakeTurn() {
  mkdir(kRunFolder, 0755);
  UniqueFd folder(open(kRunFolder, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  if (folder.IsOpen() && flock(folder.Get(), LOCK_EX | LOCK_NB) == 0) {
    return folder;
  }
  if (errno != EWOULDBLOCK) {
    throw std::runtime_error(std::string(kRunFolder) + ": " + std::strerror(errno));
  }
  return {};
}

} // namespace vornhost
