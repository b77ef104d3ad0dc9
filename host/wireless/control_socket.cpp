#include "host/wireless/control_socket.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace vornhost {

namespace {

// hostapd's own room for an answer is 4096 bytes; what is longer than this is not hostapd's.
constexpr size_t kAnswerSize = 16384;

bool Connect(int socket, const std::string &path) {
  sockaddr_un here{};
  here.sun_family = AF_UNIX;
  sockaddr_un there = here;
  if (path.size() >= sizeof(there.sun_path)) {
    errno = ENAMETOOLONG;
    return false;
  }
  std::memcpy(there.sun_path, path.c_str(), path.size() + 1);
  return bind(socket, reinterpret_cast<const sockaddr *>(&here), sizeof(sa_family_t)) == 0 && // autobind
         connect(socket, reinterpret_cast<const sockaddr *>(&there), sizeof(there)) == 0;
}

} // namespace

ControlSocket::ControlSocket(const std::string &path, Deadline deadline) : deadline_(deadline) {
  UniqueFd fresh(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!fresh.IsOpen()) {
    return;
  }
  if (!Connect(fresh.Get(), path)) {
    absent_ = errno == ENOENT || errno == ECONNREFUSED;
    return;
  }
  socket_ = std::move(fresh);
}

std::optional<std::string> ControlSocket::Ask(const std::string &request) {
  if (!socket_.IsOpen()) {
    return std::nullopt;
  }
  std::optional<std::string> answer;
  if (Send(request)) {
    answer = Receive();
  }
  if (!answer) {
    socket_.Reset();
  }
  return answer;
}

bool ControlSocket::Do(const std::string &request) {
  return Ask(request) == "OK\n";
}

bool ControlSocket::WaitFor(short events) const {
  for (;;) {
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline_ - std::chrono::steady_clock::now());
    pollfd entry{socket_.Get(), events, 0};
    const int got = poll(&entry, 1, static_cast<int>(std::max<std::chrono::milliseconds::rep>(left.count(), 0)));
    if (got > 0) {
      return true;
    }
    if (got == 0 || errno != EINTR) {
      return false;
    }
  }
}

bool ControlSocket::Send(const std::string &request) {
  for (;;) {
    if (send(socket_.Get(), request.data(), request.size(), MSG_NOSIGNAL) >= 0) {
      return true;
    }
    // A hostapd that reads no more has a full queue: the wait is for room in it.
    if ((errno != EAGAIN && errno != EINTR) || !WaitFor(POLLOUT)) {
      return false;
    }
  }
}

std::optional<std::string> ControlSocket::Receive() {
  std::string answer(kAnswerSize, '\0');
  for (;;) {
    const ssize_t got = recv(socket_.Get(), answer.data(), answer.size(), MSG_TRUNC);
    if (got < 0) {
      if ((errno != EAGAIN && errno != EINTR) || !WaitFor(POLLIN)) {
        return std::nullopt;
      }
      continue;
    }
    if (static_cast<size_t>(got) > answer.size()) {
      return std::nullopt;
    }
    answer.resize(static_cast<size_t>(got));
    return answer;
  }
}

} // namespace vornhost
