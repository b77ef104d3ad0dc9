// A client that speaks TLS, over a connection that can be told where it comes from.
#ifndef TESTS_WEBAPI_TLS_CLIENT_H
#define TESTS_WEBAPI_TLS_CLIENT_H

#include "tests/webapi/http_client.h"

#include <openssl/ssl.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <memory>
#include <string>

namespace vorntest {

class TlsClient {
public:
  /// @param[in] version  0: whatever both know
  explicit TlsClient(int port, int version = 0, int receiveBuffer = 0, uint32_t from = 0)
      : client_(port, receiveBuffer, from), context_(SSL_CTX_new(TLS_client_method())) {
    SSL_CTX_set_security_level(context_.get(), 0); // what the client would refuse itself is the server's to refuse
    SSL_CTX_set_min_proto_version(context_.get(), version);
    SSL_CTX_set_max_proto_version(context_.get(), version);
    tls_.reset(SSL_new(context_.get()));
    SSL_set_fd(tls_.get(), client_.Descriptor());
    const timeval limit{20, 0};
    setsockopt(client_.Descriptor(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  }

  bool Handshake() { return SSL_connect(tls_.get()) == 1; }
  bool Send(const std::string &bytes) {
    return SSL_write(tls_.get(), bytes.data(), static_cast<int>(bytes.size())) == static_cast<int>(bytes.size());
  }
  /// What comes until the server closes.
  std::string ReadAll() {
    std::string answer;
    char buffer[4096];
    for (int got = 0; (got = SSL_read(tls_.get(), buffer, sizeof buffer)) > 0;) {
      answer.append(buffer, static_cast<size_t>(got));
    }
    return answer;
  }
  /// TLS 1.3: takes new keys, and asks the server to do so too or does not.
  bool RenewKeys(bool ask) {
    return SSL_key_update(tls_.get(), ask ? SSL_KEY_UPDATE_REQUESTED : SSL_KEY_UPDATE_NOT_REQUESTED) == 1 &&
           SSL_do_handshake(tls_.get()) == 1;
  }
  SSL *Handle() { return tls_.get(); }

private:
  template <auto Free> struct Deleter {
    template <typename T> void operator()(T *object) const { Free(object); }
  };

  HttpClient client_;
  std::unique_ptr<SSL_CTX, Deleter<SSL_CTX_free>> context_;
  std::unique_ptr<SSL, Deleter<SSL_free>> tls_;
};

/// The first message of a handshake.
inline std::string ClientHello() {
  const std::unique_ptr<SSL_CTX, decltype(&SSL_CTX_free)> context(SSL_CTX_new(TLS_client_method()), SSL_CTX_free);
  const std::unique_ptr<SSL, decltype(&SSL_free)> tls(SSL_new(context.get()), SSL_free);
  BIO *out = BIO_new(BIO_s_mem());
  SSL_set_bio(tls.get(), BIO_new(BIO_s_mem()), out); // the handle owns both
  SSL_connect(tls.get());
  char *bytes = nullptr;
  const long size = BIO_get_mem_data(out, &bytes);
  return {bytes, static_cast<size_t>(size)};
}

} // namespace vorntest

#endif
