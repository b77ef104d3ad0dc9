#include "router/namecache.h"

#include "router/parameters.h"

#include <json/writer.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <sstream>
#include <string>

namespace router {

namespace {

constexpr mode_t kMode = 0600; // who is in the network is its owner's affair
// Others may have put the file there, and it must not fill the memory. A listing is far smaller: 1,024 neighbours (the
// kernel's limit, gc_thresh3) with names of 1,022 characters, each of them written with six, have 7 MB.
constexpr off_t kSizeLimit = off_t{64} << 20;

class File {
public:
  // Others may make files in the folder. A link could lead to a file of ours, and opening a pipe would wait for its
  // other end.
  explicit File(int flags) : descriptor_(open(kNameCache, flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, kMode)) {}
  ~File() {
    if (descriptor_ >= 0) {
      close(descriptor_);
    }
  }
  File(const File &) = delete;
  File &operator=(const File &) = delete;

  int Descriptor() const { return descriptor_; }
  /// @return its size in bytes; negative when there is no file, or it is none
  off_t Size() const {
    struct stat facts {};
    return descriptor_ >= 0 && fstat(descriptor_, &facts) == 0 && S_ISREG(facts.st_mode) ? facts.st_size : -1;
  }

private:
  int descriptor_;
};

// What does not fit is lost; the next reader finds the file broken and has no names.
void WriteAll(int descriptor, const std::string &text) {
  for (size_t at = 0; at < text.size();) {
    const ssize_t count = write(descriptor, text.data() + at, text.size() - at);
    if (count < 0 && errno != EINTR) {
      return;
    }
    at += count > 0 ? static_cast<size_t>(count) : 0;
  }
}

bool ReadAll(int descriptor, std::string &text) {
  std::array<char, 65536> part{};
  for (;;) {
    const ssize_t count = read(descriptor, part.data(), part.size());
    if (count == 0) {
      return true;
    }
    if (count > 0) {
      text.append(part.data(), static_cast<size_t>(count));
    } else if (errno != EINTR) {
      return false;
    }
  }
}

} // namespace

bool WriteNameCache(const Json::Value &listing) {
  const File file(O_WRONLY | O_CREAT);
  if (file.Size() < 0 || ftruncate(file.Descriptor(), 0) != 0) {
    return false;
  }
  std::ostringstream text;
  Json::StyledStreamWriter("\t").write(text, listing);
  WriteAll(file.Descriptor(), text.str());
  return true;
}

bool ReadNameCache(Json::Value &listing) {
  const File file(O_RDONLY);
  std::string text;
  std::string ignored;
  const off_t size = file.Size();
  return size >= 0 && size <= kSizeLimit && ReadAll(file.Descriptor(), text) && ParseJson(text, listing, ignored);
}

} // namespace router
