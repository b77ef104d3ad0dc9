// A real HTTPS server for the package client: nginx with a configuration and certificates of its own.
#ifndef TESTS_HOST_PACKAGESERVER_WEB_SERVER_H
#define TESTS_HOST_PACKAGESERVER_WEB_SERVER_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace hosttest {

/// Serves while it lives, on 127.0.0.1: 8443 with a good certificate, 8444 with one for another name, 8445 with one
/// that has expired, 8446 with one of another authority, 8080 without TLS. Its folder is /tmp/web.
class WebServer {
public:
  WebServer();
  ~WebServer();
  WebServer(const WebServer &) = delete;
  WebServer &operator=(const WebServer &) = delete;

  bool IsUp() const { return up_; }
  /// The requests since the last call, each as "<port> <request line>".
  std::vector<std::string> TakeRequests();

  static constexpr const char *kAuthority = "/tmp/web/ca.pem";

private:
  pid_t pid_ = 0;
  bool up_ = false;
  size_t seen_ = 0;
};

} // namespace hosttest

#endif
