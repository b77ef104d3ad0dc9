// A file descriptor with an owner.
#ifndef HOST_UTILITY_UNIQUE_FD_H
#define HOST_UTILITY_UNIQUE_FD_H

#include <unistd.h>

#include <utility>

namespace vornhost {

class UniqueFd {
public:
  UniqueFd() = default;
  explicit UniqueFd(int fd) : fd_(fd) {}
  UniqueFd(UniqueFd &&other) noexcept : fd_(other.Release()) {}
  UniqueFd &operator=(UniqueFd &&other) noexcept {
    Reset(other.Release());
    return *this;
  }
  UniqueFd(const UniqueFd &) = delete;
  UniqueFd &operator=(const UniqueFd &) = delete;
  ~UniqueFd() { Reset(); }

  int Get() const { return fd_; }
  bool IsOpen() const { return fd_ >= 0; }
  int Release() { return std::exchange(fd_, -1); }
  void Reset(int fd = -1) {
    const int old = std::exchange(fd_, fd);
    if (old >= 0) {
      close(old);
    }
  }

private:
  int fd_ = -1;
};

} // namespace vornhost

#endif
