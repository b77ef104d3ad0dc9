// The bytes of one connection. The only place that knows what carries them.
#ifndef WEBAPI_TRANSPORT_H
#define WEBAPI_TRANSPORT_H

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <mutex>
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

  explicit Transport(Socket socket) : socket_(std::move(socket)) {}

  template <typename Handler> void WaitReadable(Handler handler) {
    socket_.async_wait(boost::asio::socket_base::wait_read, std::move(handler));
  }
  template <typename Handler> void WaitWritable(Handler handler) {
    socket_.async_wait(boost::asio::socket_base::wait_write, std::move(handler));
  }

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
  Socket socket_;
  std::mutex closing_; // the descriptor is not closed while another thread uses it
};

} // namespace vornwebapi

#endif
