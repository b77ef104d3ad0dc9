// The bytes of one connection. The only place that knows what carries them.
#ifndef WEBAPI_TRANSPORT_H
#define WEBAPI_TRANSPORT_H

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <memory>
#include <mutex>
#include <openssl/ssl.h>
#include <string_view>
#include <utility>

namespace vornwebapi {

using Executor = boost::asio::io_context::executor_type;
using Socket = boost::asio::basic_stream_socket<boost::asio::ip::tcp, Executor>;

/// Waits without a buffer, then reads and writes without waiting, so that an idle connection holds no memory.
/// For one thread at a time, but for Interrupt and Abort.
class Transport {
public:
  enum class Result { kDone, kWouldBlock, kClosed };

  /// @param[in] tls  null: the bytes go as they are. The handshake is part of the first reads.
  Transport(Socket socket, SSL_CTX *tls);

  template <typename Handler> void WaitReadable(Handler handler) {
    // What was decrypted and not read. Half a record is waited for as any bytes are: SSL_has_pending counts it too.
    if (tls_ && SSL_pending(tls_.get()) > 0) {
      boost::asio::post(socket_.get_executor(), [handler = std::move(handler)]() mutable { handler({}); });
      return;
    }
    socket_.async_wait(readWantsWrite_ ? boost::asio::socket_base::wait_write : boost::asio::socket_base::wait_read,
                       std::move(handler));
  }
  template <typename Handler> void WaitWritable(Handler handler) {
    socket_.async_wait(writeWantsRead_ ? boost::asio::socket_base::wait_read : boost::asio::socket_base::wait_write,
                       std::move(handler));
  }

  /// Before the first Read: a client that says nothing costs nothing of TLS.
  /// @return true when TLS begins now
  bool StartTls();

  /// @param[out] count  bytes read, 1 or more with kDone
  Result Read(char *buffer, size_t size, size_t &count);
  /// @param[in,out] bytes  what is left to be written
  Result Write(std::string_view &bytes);
  void CloseWriting();
  void Close();

  Executor GetExecutor() { return socket_.get_executor(); }

  /// From any thread: whoever waits for bytes is woken, and finds none.
  void Interrupt();
  /// From any thread: whoever waits is woken, and what the client has not taken is thrown away.
  void Abort();

private:
  struct FreeSsl {
    void operator()(SSL *ssl) const { SSL_free(ssl); }
  };

  Result ResultOfTls(int returned, bool &wantsOther, int other);
  static void OnTlsMessage(int sent, int version, int type, const void *bytes, size_t size, SSL *ssl, void *self);
  Result ReadTls(char *buffer, size_t size, size_t &count);
  Result WriteTls(std::string_view &bytes);

  Socket socket_;
  SSL_CTX *const context_; // null: no TLS
  std::unique_ptr<SSL, FreeSsl> tls_;
  bool readWantsWrite_ = false; // a read or write that the handshake turns round
  bool writeWantsRead_ = false;
  int handshakeMessages_ = 0; // that the client has sent
  bool broken_ = false;       // after a fault of TLS nothing may be sent
  std::mutex closing_;        // the descriptor is not closed while another thread uses it
};

} // namespace vornwebapi

#endif
