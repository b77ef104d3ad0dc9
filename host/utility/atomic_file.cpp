#include "host/utility/atomic_file.h"

#include "host/utility/error.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <optional>
#include <thread>

namespace vornhost {

namespace {

using std::chrono::steady_clock;

struct Place {
  UniqueFd folder;  // locked
  std::string name; // in it
  std::string fresh;
};

int LockFolder(int folder, std::chrono::milliseconds limit) {
  const auto deadline = steady_clock::now() + limit;
  auto pause = std::chrono::microseconds(200);
  while (flock(folder, LOCK_EX | LOCK_NB) != 0) {
    if (errno != EWOULDBLOCK && errno != EINTR) {
      return SetErrno(errno);
    }
    if (steady_clock::now() >= deadline) {
      return SetError(QARDC_ERR_TIMEOUT);
    }
    std::this_thread::sleep_for(pause);
    pause = std::min(pause * 2, std::chrono::microseconds(5000));
  }
  return 0;
}

int OpenPlace(const char *path, std::chrono::milliseconds lockLimit, Place &place) {
  const std::string text = path;
  const size_t slash = text.rfind('/');
  place.name = slash == std::string::npos ? text : text.substr(slash + 1);
  if (place.name.empty() || place.name == "." || place.name == "..") {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  place.fresh = "." + place.name + ".new";
  const std::string folder = slash == std::string::npos ? "." : text.substr(0, slash + 1);
  place.folder.Reset(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!place.folder.IsOpen()) {
    return SetErrno(errno);
  }
  return LockFolder(place.folder.Get(), lockLimit);
}

int ReadOpened(int file, std::string &content) {
  struct stat info {};
  if (fstat(file, &info) != 0) {
    return SetErrno(errno);
  }
  if (!S_ISREG(info.st_mode)) {
    return SetError(QARDC_ERR_ACCESS);
  }
  std::string read(static_cast<size_t>(std::clamp<off_t>(info.st_size, 0, kFileLimit)) + 1, '\0');
  size_t filled = 0;
  for (;;) {
    const ssize_t got = ::read(file, read.data() + filled, read.size() - filled);
    if (got == 0) {
      break;
    }
    if (got < 0) {
      if (errno == EINTR) {
        continue;
      }
      return SetErrno(errno);
    }
    filled += static_cast<size_t>(got);
    if (filled > kFileLimit) {
      return SetError(QARDC_ERR_TOO_LARGE);
    }
    if (filled == read.size()) {
      read.resize(std::min(filled * 2, kFileLimit + 1));
    }
  }
  read.resize(filled);
  if (read.find('\0') != std::string::npos) {
    return SetError(QARDC_ERR_SYNTAX);
  }
  content = std::move(read);
  return 0;
}

// @param[out] info  the old file's mode and owner; none when there is no file
int ReadOld(const Place &place, std::string &content, std::optional<struct stat> &info) {
  // O_NONBLOCK: a FIFO in the file's place must not hold the writer.
  const UniqueFd file(openat(place.folder.Get(), place.name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!file.IsOpen()) {
    return errno == ENOENT ? 0 : SetErrno(errno);
  }
  info.emplace();
  if (fstat(file.Get(), &*info) != 0) {
    return SetErrno(errno);
  }
  return ReadOpened(file.Get(), content);
}

int WriteAll(int file, const std::string &content) {
  size_t written = 0;
  while (written < content.size()) {
    const ssize_t got = write(file, content.data() + written, content.size() - written);
    if (got < 0 && errno != EINTR) {
      return SetErrno(errno);
    }
    written += static_cast<size_t>(std::max<ssize_t>(got, 0));
  }
  return 0;
}

int WriteFresh(const Place &place, const std::string &content, const std::optional<struct stat> &old) {
  const int folder = place.folder.Get();
  // What a killed writer left; with the lock held it is nobody's.
  if (unlinkat(folder, place.fresh.c_str(), 0) != 0 && errno != ENOENT) {
    return SetErrno(errno);
  }
  UniqueFd file(openat(folder, place.fresh.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
  if (!file.IsOpen()) {
    return SetErrno(errno);
  }
  if (old && fchown(file.Get(), old->st_uid, old->st_gid) != 0) {
    return SetErrno(errno);
  }
  const mode_t mode = old ? old->st_mode & 07777U : 0644U;
  if (fchmod(file.Get(), mode) != 0) { // after fchown, which clears the set-id bits
    return SetErrno(errno);
  }
  if (WriteAll(file.Get(), content) != 0) {
    return -1;
  }
  if (fsync(file.Get()) != 0 || close(file.Release()) != 0) {
    return SetErrno(errno);
  }
  return 0;
}

// The old file changes places with the new one and is removed only when the folder is on the disk, so that it can be
// put back. Needs a file system that knows RENAME_EXCHANGE: ext4, xfs, btrfs, f2fs, ubifs, tmpfs, overlay.
int PutInPlace(const Place &place, bool existed) {
  const int folder = place.folder.Get();
  const char *fresh = place.fresh.c_str();
  const char *name = place.name.c_str();
  const unsigned how = existed ? RENAME_EXCHANGE : RENAME_NOREPLACE;
  if (renameat2(folder, fresh, folder, name, how) != 0) {
    return SetErrno(errno);
  }
  if (fsync(folder) != 0) {
    SetErrno(errno);
    renameat2(folder, name, folder, fresh, how);
    return -1;
  }
  if (existed) {
    unlinkat(folder, fresh, 0); // when this fails the next writer does it
  }
  return 0;
}

} // namespace

int ReadWholeFile(const char *path, std::string &content) {
  const UniqueFd file(open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  return file.IsOpen() ? ReadOpened(file.Get(), content) : SetErrno(errno);
}

int ChangeFile(const char *path, const RenderContent &render, std::chrono::milliseconds lockLimit) {
  Place place;
  std::string old;
  std::string fresh;
  std::optional<struct stat> info;
  if (OpenPlace(path, lockLimit, place) != 0 || ReadOld(place, old, info) != 0 || render(old, fresh) != 0) {
    return -1;
  }
  if (info && fresh == old) {
    return 0;
  }
  if (fresh.size() > kFileLimit) {
    return SetError(QARDC_ERR_TOO_LARGE);
  }
  if (WriteFresh(place, fresh, info) != 0 || PutInPlace(place, info.has_value()) != 0) {
    unlinkat(place.folder.Get(), place.fresh.c_str(), 0);
    return -1;
  }
  return 0;
}

int RemoveFile(const char *path) {
  Place place;
  if (OpenPlace(path, kLockLimit, place) != 0) {
    return QARDCErrGet() == QARDC_ERR_NOT_FOUND ? 0 : -1; // no folder, so no file in it
  }
  if (unlinkat(place.folder.Get(), place.name.c_str(), 0) != 0) {
    return errno == ENOENT ? 0 : SetErrno(errno);
  }
  return fsync(place.folder.Get()) == 0 ? 0 : SetErrno(errno);
}

} // namespace vornhost
