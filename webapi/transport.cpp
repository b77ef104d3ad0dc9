#include "webapi/transport.h"

#include <sys/socket.h>

#include <cerrno>

namespace vornwebapi {
namespace {

Transport::Result ResultOfErrno() {
  return errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR ? Transport::Result::kWouldBlock
                                                                   : Transport::Result::kClosed;
}

} // namespace

Transport::Result Transport::Read(char *buffer, size_t size, size_t &count) {
  const ssize_t got = recv(socket_.native_handle(), buffer, size, MSG_DONTWAIT);
  if (got < 0) {
    return ResultOfErrno();
  }
  count = static_cast<size_t>(got);
  return got == 0 ? Result::kClosed : Result::kDone;
}

Transport::Result Transport::Write(std::string_view &bytes) {
  while (!bytes.empty()) {
    const ssize_t sent = send(socket_.native_handle(), bytes.data(), bytes.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
    if (sent < 0) {
      return ResultOfErrno();
    }
    bytes.remove_prefix(static_cast<size_t>(sent));
  }
  return Result::kDone;
}

void Transport::CloseWriting() {
  shutdown(socket_.native_handle(), SHUT_WR);
}

void Transport::Close() {
  const std::lock_guard lock(closing_);
  boost::system::error_code ignored;
  socket_.close(ignored);
}

void Transport::Interrupt() {
  const std::lock_guard lock(closing_);
  if (socket_.is_open()) {
    shutdown(socket_.native_handle(), SHUT_RD);
  }
}

void Transport::Abort() {
  const std::lock_guard lock(closing_);
  if (socket_.is_open()) {
    const linger now{1, 0};
    setsockopt(socket_.native_handle(), SOL_SOCKET, SO_LINGER, &now, sizeof now);
    shutdown(socket_.native_handle(), SHUT_RDWR);
  }
}

} // namespace vornwebapi
