// One question to the package server over HTTPS.
#ifndef HOST_PACKAGESERVER_PACKAGE_CLIENT_H
#define HOST_PACKAGESERVER_PACKAGE_CLIENT_H

#include <json/value.h>

#include <chrono>
#include <string>

namespace vornhost {

struct PackageServer {
  std::string url;    ///< https, with the path that pages are under
  std::string caFile; ///< certificates to trust, PEM; empty: the system's
};

struct PackageLimits {
  std::chrono::milliseconds connect{5000};
  std::chrono::milliseconds total{15000};
  size_t bytes = 1024UL * 1024; ///< of an answer's body, and of its header
  long redirects = 3;
};

/// Asks for `<url>/<page>?lang=<language>`. The connection is encrypted and the server's certificate and name are
/// checked, also after a redirect; nothing in the environment sends it through a proxy.
class PackageClient {
public:
  explicit PackageClient(PackageServer server, const PackageLimits &limits = {});

  /// @param[out] result  the answer; left as it was on failure
  /// @param[out] cause   why it failed, fit for the log; without anything that the server sent
  bool Ask(const std::string &language, const std::string &page, Json::Value &result, std::string &cause) const;

private:
  PackageServer server_;
  PackageLimits limits_;
};

} // namespace vornhost

#endif
