// TLS as this server speaks it, and its key and certificate.
#ifndef WEBAPI_TLS_H
#define WEBAPI_TLS_H

#include "webapi/state_folder.h"

#include <memory>
#include <openssl/ssl.h>
#include <string>

namespace vornwebapi {

struct FreeContext {
  void operator()(SSL_CTX *context) const { SSL_CTX_free(context); }
};
using TlsContext = std::unique_ptr<SSL_CTX, FreeContext>;

/// Reads key and certificate from the folder, or makes this device's own: P-256, signed by itself.
/// @param[in]  names        blank-separated, beside localhost
/// @param[out] fingerprint  SHA-256 of the certificate, as browsers show it
/// @param[out] fault        what is wrong, with null
TlsContext OpenTls(const StateFolder &folder, const std::string &names, std::string &fingerprint, std::string &fault);

} // namespace vornwebapi

#endif
