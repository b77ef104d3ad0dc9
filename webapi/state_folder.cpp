#include "webapi/state_folder.h"

#include "host/utility/atomic_file.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace vornwebapi {

bool StateFolder::Open(std::string &fault) const {
  struct stat info {};
  if (mkdir(path_.c_str(), 0700) != 0 && errno != EEXIST) {
    fault = path_ + ": " + std::strerror(errno);
    return false;
  }
  if (lstat(path_.c_str(), &info) != 0 || !S_ISDIR(info.st_mode) || info.st_uid != geteuid() ||
      (info.st_mode & 077U) != 0) {
    fault = path_ + ": is no folder of this user alone (mode 0700)";
    return false;
  }
  return true;
}

bool StateFolder::Has(const std::string &name) const {
  struct stat info {};
  return lstat(Path(name).c_str(), &info) == 0 && info.st_size > 0; // an empty one was never written
}

bool StateFolder::Read(const std::string &name, std::string &content) const {
  return vornhost::ReadWholeFile(Path(name).c_str(), content) == 0;
}

bool StateFolder::Change(const std::string &name,
                         const std::function<bool(const std::string &, std::string &)> &render) const {
  const std::string path = Path(name);
  // The writer keeps the mode of the file that it finds: here that is never one which others may read.
  const vornhost::UniqueFd file(open(path.c_str(), O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
  if (!file.IsOpen() || fchmod(file.Get(), 0600) != 0) {
    return false;
  }
  return vornhost::ChangeFile(path.c_str(), [&render](const std::string &old, std::string &fresh) {
           return render(old, fresh) ? 0 : -1;
         }) == 0;
}

bool StateFolder::Write(const std::string &name, const std::string &content) const {
  return Change(name, [&content](const std::string &, std::string &fresh) {
    fresh = content;
    return true;
  });
}

void StateFolder::Remove(const std::string &name) const {
  vornhost::RemoveFile(Path(name).c_str());
}

} // namespace vornwebapi
