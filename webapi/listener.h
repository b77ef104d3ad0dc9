// The listening socket and what comes in on it.
#ifndef WEBAPI_LISTENER_H
#define WEBAPI_LISTENER_H

#include "webapi/connection.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <mutex>
#include <string>

namespace vornwebapi {

class Listener {
public:
  Listener(boost::asio::io_context &context, Shared &shared) : acceptor_(context), shared_(shared) {}

  /// Takes the socket that the service manager hands over (LISTEN_PID and LISTEN_FDS, sd_listen_fds(3); both are
  /// unset), or binds the configured address, which must be a loopback one.
  /// @return false when there is nothing to listen on; `fault` says why
  bool Open(std::string &fault);
  std::string Address() const;

  void Start();
  void Resume(); ///< tries again when descriptors had run out; harmless otherwise
  void Close();

private:
  bool TakeInherited(int descriptor, std::string &fault);
  bool Bind(std::string &fault);
  bool MayServe(const boost::asio::ip::address &address, std::string &fault) const;
  void WaitForClient();
  void AcceptAll();
  void Welcome(int descriptor);

  boost::asio::basic_socket_acceptor<boost::asio::ip::tcp, Executor> acceptor_;
  Shared &shared_;
  std::mutex mutex_; // guards acceptor_ once it is started, and paused_
  bool paused_ = false;
};

} // namespace vornwebapi

#endif
