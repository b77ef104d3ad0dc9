#include "host/network/topology_lock.h"

#include "host/network/names.h"
#include "host/utility/atomic_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace vornhost {

namespace {

[[noreturn]] void Fail(const char *what) {
  const int code = errno;
  throw std::runtime_error(std::string(kTopologyLock) + ": " + what + ": " + std::strerror(code));
}

// A second name would be somebody's trick to have another file taken for the lock.
bool IsOurs(const struct stat &info) {
  return S_ISREG(info.st_mode) && info.st_uid == geteuid() && info.st_nlink == 1 &&
         (info.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

std::string PathOf(int file) {
  return "/proc/self/fd/" + std::to_string(file);
}

} // namespace

TopologyLock::State TopologyLock::TakeOver() {
  for (;;) {
    struct stat info {};
    if (lstat(kTopologyLock, &info) != 0) {
      if (errno == ENOENT) {
        return State::kAbsent;
      }
      Fail("lstat");
    }
    if (!S_ISREG(info.st_mode)) { // opening a pipe or a device may wait or act
      return State::kForeign;
    }
    UniqueFd file(open(kTopologyLock, O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!file.IsOpen()) {
      if (errno == ENOENT) {
        continue;
      }
      return errno == ELOOP || errno == EACCES ? State::kForeign
                                               : throw std::runtime_error("the lock cannot be opened");
    }
    if (fstat(file.Get(), &info) == 0 && info.st_nlink > 0 && !IsOurs(info)) {
      return State::kForeign;
    }
    if (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
      return errno == EWOULDBLOCK ? State::kHeld : throw std::runtime_error("the lock cannot be tried");
    }
    if (fstat(file.Get(), &info) == 0 && info.st_nlink > 0) { // else its holder finished meanwhile: look again
      file_ = std::move(file);
      return State::kStale;
    }
  }
}

bool TopologyLock::Make(const std::string &content) {
  const std::string folder(kTopologyLock, std::string(kTopologyLock).rfind('/'));
  UniqueFd file(open(folder.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0600));
  if (!file.IsOpen()) {
    Fail("creating");
  }
  if (flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
    Fail("locking");
  }
  for (size_t done = 0; done < content.size();) {
    const ssize_t wrote = write(file.Get(), content.data() + done, content.size() - done);
    if (wrote < 0 && errno != EINTR) {
      Fail("writing");
    }
    done += wrote > 0 ? static_cast<size_t>(wrote) : 0;
  }
  if (fsync(file.Get()) != 0) {
    Fail("writing");
  }
  if (linkat(AT_FDCWD, PathOf(file.Get()).c_str(), AT_FDCWD, kTopologyLock, AT_SYMLINK_FOLLOW) != 0) {
    if (errno == EEXIST) {
      return false;
    }
    Fail("creating");
  }
  file_ = std::move(file);
  return true;
}

std::string TopologyLock::Read() const {
  std::string content;
  // By descriptor: the name may mean something else by now.
  if (ReadWholeFile(PathOf(file_.Get()).c_str(), content) != 0) {
    content.clear();
  }
  return content;
}

void TopologyLock::Remove() {
  if (unlink(kTopologyLock) != 0 && errno != ENOENT) {
    Fail("removing");
  }
  file_.Reset();
}

} // namespace vornhost
