#include "webapi/transport.h"

#include "webapi/log.h"

#include <openssl/err.h>
#include <sys/socket.h>

#include <cerrno>

namespace vornwebapi {
namespace {

// A handshake has at most five of them. Later ones renew keys (RFC 8446, section 4.6.3: every 24 million records) or
// try to negotiate anew; the library would read them without end in one call, and hold the thread.
constexpr int kMostHandshakeMessages = 32;

Transport::Result ResultOfErrno() {
  return errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR ? Transport::Result::kWouldBlock
                                                                   : Transport::Result::kClosed;
}

} // namespace

Transport::Transport(Socket socket, SSL_CTX *tls)
    : socket_(std::move(socket)), context_(tls), broken_(tls != nullptr) {} // until TLS has begun nothing may be sent

bool Transport::StartTls() {
  if (context_ == nullptr || tls_) {
    return false;
  }
  tls_.reset(SSL_new(context_));
  if (!tls_) { // no memory
    return false;
  }
  SSL_set_accept_state(tls_.get());
  SSL_set_fd(tls_.get(), socket_.native_handle());
  SSL_set_msg_callback(tls_.get(), OnTlsMessage);
  SSL_set_msg_callback_arg(tls_.get(), this);
  broken_ = false;
  return true;
}

// What comes after such a "shutdown" is not looked at: a read ends.
void Transport::OnTlsMessage(int sent, int /*version*/, int type, const void * /*bytes*/, size_t /*size*/, SSL *ssl,
                             void *self) {
  auto *transport = static_cast<Transport *>(self);
  if (sent == 0 && type == SSL3_RT_HANDSHAKE && ++transport->handshakeMessages_ == kMostHandshakeMessages) {
    Log(LogKind::kConnectionLimit, "a client began too many TLS handshakes and was cut");
    SSL_set_shutdown(ssl, SSL_RECEIVED_SHUTDOWN);
  }
}

Transport::Result Transport::ResultOfTls(int returned, bool &wantsOther, int other) {
  const int reason = SSL_get_error(tls_.get(), returned);
  ERR_clear_error();
  wantsOther = reason == other;
  if (reason == SSL_ERROR_WANT_READ || reason == SSL_ERROR_WANT_WRITE) {
    return Result::kWouldBlock;
  }
  broken_ = reason != SSL_ERROR_ZERO_RETURN;
  return Result::kClosed;
}

Transport::Result Transport::ReadTls(char *buffer, size_t size, size_t &count) {
  const int got = SSL_read_ex(tls_.get(), buffer, size, &count);
  return got == 1 ? Result::kDone : ResultOfTls(got, readWantsWrite_, SSL_ERROR_WANT_WRITE);
}

Transport::Result Transport::WriteTls(std::string_view &bytes) {
  while (!bytes.empty()) {
    size_t sent = 0;
    const int done = SSL_write_ex(tls_.get(), bytes.data(), bytes.size(), &sent);
    if (done != 1) {
      return ResultOfTls(done, writeWantsRead_, SSL_ERROR_WANT_READ);
    }
    bytes.remove_prefix(sent);
  }
  return Result::kDone;
}

Transport::Result Transport::Read(char *buffer, size_t size, size_t &count) {
  if (broken_) {
    return Result::kClosed;
  }
  if (tls_) {
    return ReadTls(buffer, size, count);
  }
  const ssize_t got = recv(socket_.native_handle(), buffer, size, MSG_DONTWAIT);
  if (got < 0) {
    return ResultOfErrno();
  }
  count = static_cast<size_t>(got);
  return got == 0 ? Result::kClosed : Result::kDone;
}

Transport::Result Transport::Write(std::string_view &bytes) {
  if (broken_) {
    return Result::kClosed;
  }
  if (tls_) {
    return WriteTls(bytes);
  }
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
  if (tls_ && !broken_) {
    SSL_shutdown(tls_.get());
    ERR_clear_error();
  }
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
