// The whole server: threads, limits, start and stop.
#ifndef WEBAPI_SERVER_H
#define WEBAPI_SERVER_H

#include "webapi/config.h"
#include "webapi/connection.h"
#include "webapi/listener.h"
#include "webapi/runners.h"

#include <boost/asio/io_context.hpp>
#include <string>

namespace vornwebapi {

class Server {
public:
  /// @param[in] config, service  outlive the server
  /// @param[in] tls  null: plain HTTP; outlives the server
  Server(const Config &config, Service &service, SSL_CTX *tls);
  Server(const Server &) = delete;
  Server &operator=(const Server &) = delete;
  ~Server();

  bool Open(std::string &fault) { return listener_.Open(fault); }
  std::string Address() const { return listener_.Address(); }

  /// Serves until `stop` becomes readable, then ends in order.
  /// @return false when something in the module still runs: the process must end without tearing down what it uses
  bool Run(int stop);

private:
  void Sweep();
  bool Stop();

  const Config &config_;
  const Milliseconds sweepTime_;
  Service &service_;
  Connections connections_;
  boost::asio::io_context context_;
  Gate gate_;
  Runners runners_;
  Shared shared_;
  Listener listener_;
};

} // namespace vornwebapi

#endif
