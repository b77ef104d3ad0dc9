#include "host/utility/folder.h"

#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace vornhost {

void MakeFolder(const std::string &path, mode_t mode) {
  if (mkdir(path.c_str(), mode) == 0) {
    const UniqueFd parent(open(path.substr(0, path.rfind('/') + 1).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (parent.IsOpen() && fsync(parent.Get()) == 0) {
      return;
    }
  } else if (errno == EEXIST) {
    return;
  }
  throw std::runtime_error(path + ": " + std::strerror(errno));
}

} // namespace vornhost
