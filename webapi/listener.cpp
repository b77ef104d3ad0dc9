#include "webapi/listener.h"

#include "webapi/log.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <optional>

namespace vornwebapi {
namespace {

using boost::asio::ip::tcp;
namespace ip = boost::asio::ip;

constexpr int kFirstInherited = 3; // SD_LISTEN_FDS_START
constexpr int kBacklog = 1024;
constexpr int kMostAtOnce = 32;

std::optional<long> NumberOf(const char *text) {
  if (text == nullptr) {
    return std::nullopt;
  }
  long number = 0;
  const auto [end, fault] = std::from_chars(text, text + std::strlen(text), number);
  return fault == std::errc() && *end == '\0' ? std::optional(number) : std::nullopt;
}

/// How many sockets were handed to this process; its children do not see it any more.
long InheritedCount() {
  const std::optional<long> process = NumberOf(std::getenv("LISTEN_PID"));
  const std::optional<long> count = NumberOf(std::getenv("LISTEN_FDS"));
  for (const char *name : {"LISTEN_PID", "LISTEN_FDS", "LISTEN_FDNAMES"}) {
    unsetenv(name);
  }
  return process && count && *process == getpid() ? *count : 0;
}

int IntOption(int descriptor, int name) {
  int value = -1;
  socklen_t size = sizeof value;
  return getsockopt(descriptor, SOL_SOCKET, name, &value, &size) == 0 ? value : -1;
}

/// "127.0.0.1:80", "[::1]:80".
std::optional<tcp::endpoint> ParseEndpoint(const std::string &text) {
  const size_t colon = text.rfind(':');
  if (colon == std::string::npos) {
    return std::nullopt;
  }
  std::string host = text.substr(0, colon);
  const bool bracketed = host.size() > 2 && host.front() == '[' && host.back() == ']';
  if (bracketed) {
    host = host.substr(1, host.size() - 2);
  }
  boost::system::error_code fault;
  const ip::address address = ip::make_address(host, fault);
  const std::optional<long> port = NumberOf(text.c_str() + colon + 1);
  if (fault || address.is_v6() != bracketed || !port || *port < 0 || *port > 65535) {
    return std::nullopt;
  }
  return tcp::endpoint(address, static_cast<unsigned short>(*port));
}

bool OutOfDescriptors(int fault) {
  return fault == EMFILE || fault == ENFILE || fault == ENOBUFS || fault == ENOMEM;
}

/// As a client would write it: an IPv4 client of an IPv6 socket knows the IPv4 address.
std::string AddressText(const ip::address &address) {
  const bool mapped = address.is_v6() && address.to_v6().is_v4_mapped();
  return mapped ? ip::make_address_v4(ip::v4_mapped, address.to_v6()).to_string() : address.to_string();
}

/// Over TLS there is no answer before the handshake: nothing is sent.
/// As much of a short answer as the kernel takes at once; then the connection is closed.
void TurnAway(int descriptor, bool secure, const Answer &answer) {
  const std::string text = secure ? "" : Render(answer, false, false);
  [[maybe_unused]] const ssize_t sent = send(descriptor, text.data(), text.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
  close(descriptor);
}

} // namespace

bool Listener::Open(std::string &fault) {
  const long inherited = InheritedCount();
  if (inherited > 1) {
    fault = "more than one listening socket was handed over";
    return false;
  }
  if (inherited == 1 ? !TakeInherited(kFirstInherited, fault) : !Bind(fault)) {
    return false;
  }
  // Accepted sockets have these from the listening one.
  const int on = 1;
  const auto unacknowledged = static_cast<unsigned>(shared_.config.writeTime.count()); // milliseconds
  setsockopt(acceptor_.native_handle(), IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
  setsockopt(acceptor_.native_handle(), IPPROTO_TCP, TCP_USER_TIMEOUT, &unacknowledged, sizeof unacknowledged);
  return true;
}

bool Listener::TakeInherited(int descriptor, std::string &fault) {
  const int family = IntOption(descriptor, SO_DOMAIN);
  if ((family != AF_INET && family != AF_INET6) || IntOption(descriptor, SO_TYPE) != SOCK_STREAM ||
      IntOption(descriptor, SO_ACCEPTCONN) != 1) {
    fault = "descriptor 3, handed over, is no listening TCP socket";
    return false;
  }
  fcntl(descriptor, F_SETFD, FD_CLOEXEC);
  boost::system::error_code refused;
  acceptor_.assign(family == AF_INET ? tcp::v4() : tcp::v6(), descriptor, refused);
  if (!refused) {
    acceptor_.non_blocking(true, refused);
  }
  fault = refused.message();
  return !refused && MayServe(acceptor_.local_endpoint(refused).address(), fault);
}

// Passwords and cookies in clear are for this machine's own eyes, unless someone asks for it.
bool Listener::MayServe(const ip::address &address, std::string &fault) const {
  if (address.is_loopback() || shared_.tls != nullptr || shared_.config.plainHttp) {
    return true;
  }
  fault = "listen: " + address.to_string() + " is no loopback address: it needs tls, or plain-http";
  return false;
}

bool Listener::Bind(std::string &fault) {
  const std::optional<tcp::endpoint> endpoint = ParseEndpoint(shared_.config.listen);
  if (!endpoint) {
    fault = "listen: \"" + shared_.config.listen + "\" is no address and port such as 127.0.0.1:8080";
    return false;
  }
  if (!MayServe(endpoint->address(), fault)) {
    return false;
  }
  const int descriptor = socket(endpoint->protocol().family(), SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  const int on = 1;
  if (descriptor < 0 || setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) != 0 ||
      bind(descriptor, endpoint->data(), static_cast<socklen_t>(endpoint->size())) != 0 ||
      listen(descriptor, kBacklog) != 0) {
    fault = "listen: " + shared_.config.listen + ": " + std::strerror(errno);
    return false;
  }
  boost::system::error_code refused;
  acceptor_.assign(endpoint->protocol(), descriptor, refused);
  fault = refused.message();
  return !refused;
}

std::string Listener::Address() const {
  boost::system::error_code ignored;
  const tcp::endpoint own = acceptor_.local_endpoint(ignored);
  const std::string address = own.address().to_string();
  return (own.address().is_v6() ? "[" + address + "]" : address) + ":" + std::to_string(own.port());
}

void Listener::Start() {
  const std::lock_guard lock(mutex_);
  WaitForClient();
}

// REQUIRES: mutex_ is held.
void Listener::WaitForClient() {
  acceptor_.async_wait(boost::asio::socket_base::wait_read, [this](boost::system::error_code fault) {
    if (!fault) {
      AcceptAll();
    }
  });
}

void Listener::AcceptAll() {
  const std::lock_guard lock(mutex_);
  for (int count = 0; acceptor_.is_open() && count < kMostAtOnce; ++count) {
    const int descriptor = accept4(acceptor_.native_handle(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
    if (descriptor >= 0) {
      Welcome(descriptor);
      continue;
    }
    if (OutOfDescriptors(errno)) {
      Log(LogKind::kDescriptorLimit, "no connection can be accepted: %s", std::strerror(errno));
      paused_ = true; // until Resume: the waiting client would wake this at once, again and again
      return;
    }
    if (errno == EAGAIN) {
      break;
    }
    // Else the client is gone already, or its network failed (accept(2)): the next one may be well.
  }
  if (acceptor_.is_open()) {
    WaitForClient();
  }
}

void Listener::Resume() {
  const std::lock_guard lock(mutex_);
  if (paused_ && acceptor_.is_open()) {
    paused_ = false;
    WaitForClient();
  }
}

void Listener::Close() {
  const std::lock_guard lock(mutex_);
  boost::system::error_code ignored;
  acceptor_.close(ignored);
}

void Listener::Welcome(int descriptor) {
  boost::system::error_code fault;
  Socket socket(acceptor_.get_executor());
  tcp::endpoint own;
  tcp::endpoint client;
  socket.assign(own.protocol(), descriptor, fault); // the protocol is not looked at again
  if (fault) {
    close(descriptor);
    return;
  }
  own = socket.local_endpoint(fault);
  client = socket.remote_endpoint(fault);
  if (fault) {
    return;
  }
  const ClientKey key = KeyOf(client.address());
  const Connections::Admission admission = shared_.connections.Admit(key);
  if (admission != Connections::Admission::kAdmitted) {
    Log(LogKind::kConnectionLimit, "%s: %s", AddressText(client.address()).c_str(),
        admission == Connections::Admission::kTooMany ? "too many connections" : "too many connections of this client");
    shared_.service.Counts().CountRefused(TooManyConnections().status);
    TurnAway(socket.release(), shared_.tls != nullptr, TooManyConnections());
    return;
  }
  std::shared_ptr<Connection> connection;
  try {
    const HostRule hosts{&shared_.service.HostNames(), AddressText(own.address())};
    connection = std::make_shared<Connection>(shared_, std::move(socket), key, hosts,
                                              Peer{own.port(), shared_.tls != nullptr, AddressText(client.address())});
  } catch (const std::bad_alloc &) {
    Log(LogKind::kDescriptorLimit, "no connection can be accepted: no memory");
    shared_.connections.Release(key);
    return;
  }
  connection->Start();
}

} // namespace vornwebapi
