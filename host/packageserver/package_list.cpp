// The package server's function of the contract. The server is named in /etc/vorn/packageserver.conf, a key/value file:
//   url=https://packages.example.net/list   where its pages are
//   cafile=/etc/vorn/packageserver.pem      certificates to trust instead of the system's; may be left out
#include "host/export.h"
#include "host/packageserver/package_client.h"
#include "host/utility/log.h"

#include "platform/packageserver.h"
#include "platform/utility.h"

#include <array>
#include <exception>

namespace {

constexpr const char *kConfiguration = "/etc/vorn/packageserver.conf";

std::string Configured(const char *key) {
  std::array<char, 2048> value{};
  const int length = QARDCFileGetKeyValue(kConfiguration, key, value.data(), value.size(), 0);
  return length > 0 ? std::string(value.data()) : std::string();
}

bool Ask(const char *language, const char *page, Json::Value &result) {
  const vornhost::PackageServer server{Configured("url"), Configured("cafile")};
  if (language == nullptr || page == nullptr || server.url.empty()) {
    vornhost::LogError("package server: %s", server.url.empty() ? "none is configured" : "no page or language");
    return false;
  }
  std::string cause;
  if (!vornhost::PackageClient(server).Ask(language, page, result, cause)) {
    vornhost::LogError("package server: %s", vornhost::LogText(cause).c_str());
    return false;
  }
  return true;
}

} // namespace

namespace VORNPackageServer {

VORN_EXPORT int PMSGetRecommendPkgList(const char *language, const char *page, Json::Value &result) {
  try {
    return Ask(language, page, result) ? 1 : 0;
  } catch (const std::exception &) {
    vornhost::LogError("package server: out of memory");
    return 0;
  }
}

} // namespace VORNPackageServer
