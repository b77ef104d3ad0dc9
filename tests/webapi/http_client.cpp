#include "tests/webapi/http_client.h"

#include "tests/webapi/server_process.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdlib>
#include <utility>

namespace vorntest {

HttpClient::HttpClient(int port, int receiveBuffer, uint32_t from)
    : descriptor_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  if (receiveBuffer > 0) {
    setsockopt(descriptor_, SOL_SOCKET, SO_RCVBUF, &receiveBuffer, sizeof receiveBuffer);
  }
  sockaddr_in address{};
  if (from != 0) {
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(from);
    if (bind(descriptor_, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0) {
      Close();
    }
  }
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  if (connect(descriptor_, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0) {
    Close();
  }
}

void HttpClient::Close() {
  if (descriptor_ >= 0) {
    close(descriptor_);
    descriptor_ = -1;
  }
}

void HttpClient::Reset() {
  const linger now{1, 0};
  setsockopt(descriptor_, SOL_SOCKET, SO_LINGER, &now, sizeof now);
  Close();
}

void HttpClient::CloseWriting() {
  shutdown(descriptor_, SHUT_WR);
}

bool HttpClient::Send(std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t sent = send(descriptor_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent <= 0) {
      return false;
    }
    bytes.remove_prefix(static_cast<size_t>(sent));
  }
  return true;
}

bool HttpClient::Receive(std::chrono::steady_clock::time_point deadline) {
  const auto left =
      std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now()).count();
  pollfd waited{descriptor_, POLLIN, 0};
  if (ended_ || left < 0 || poll(&waited, 1, static_cast<int>(left)) <= 0) {
    return false;
  }
  std::array<char, 65536> bytes{};
  const ssize_t got = recv(descriptor_, bytes.data(), bytes.size(), 0);
  ended_ = got <= 0;
  buffer_.append(bytes.data(), got > 0 ? static_cast<size_t>(got) : 0);
  return !ended_;
}

HttpAnswer HttpClient::Read(std::chrono::milliseconds limit) {
  const auto deadline = std::chrono::steady_clock::now() + limit;
  size_t end = 0;
  while ((end = buffer_.find("\r\n\r\n")) == std::string::npos) {
    if (!Receive(deadline)) {
      return {};
    }
  }
  HttpAnswer answer;
  answer.status = std::atoi(buffer_.c_str() + 9); // NOLINT(cert-err34-c): 0 is told from a status
  for (size_t at = buffer_.find("\r\n") + 2; at < end + 2;) {
    const size_t lineEnd = buffer_.find("\r\n", at);
    const size_t colon = buffer_.find(": ", at);
    std::string name = buffer_.substr(at, colon - at);
    std::transform(name.begin(), name.end(), name.begin(), [](unsigned char c) { return std::tolower(c); });
    answer.fields[name] = buffer_.substr(colon + 2, lineEnd - colon - 2);
    at = lineEnd + 2;
  }
  buffer_.erase(0, end + 4);
  const size_t length = std::strtoul(answer.fields["content-length"].c_str(), nullptr, 10);
  while (answer.status != 100 && buffer_.size() < length) {
    if (!Receive(deadline)) {
      return {};
    }
  }
  answer.body = buffer_.substr(0, length);
  buffer_.erase(0, length);
  return answer;
}

bool HttpClient::ClosedByServer(std::chrono::milliseconds limit) {
  const auto deadline = std::chrono::steady_clock::now() + limit;
  while (Receive(deadline)) {
  }
  return ended_ && buffer_.empty();
}

std::string HttpClient::Bytes(std::chrono::milliseconds limit) {
  if (buffer_.empty()) {
    Receive(std::chrono::steady_clock::now() + limit);
  }
  return std::exchange(buffer_, {});
}

std::string CallBytes(const std::string &path, const std::string &body, const std::string &fields) {
  std::string bytes = "POST /webapi/" + path + " HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN "" + fields;
  if (!body.empty()) {
    bytes += "Content-Type: application/json\r\nContent-Length: " + std::to_string(body.size()) + "\r\n";
  }
  return bytes + "\r\n" + body;
}

HttpAnswer Call(int port, const std::string &path, const std::string &body, const std::string &fields) {
  HttpClient client(port);
  return client.Exchange(CallBytes(path, body, fields));
}

} // namespace vorntest
