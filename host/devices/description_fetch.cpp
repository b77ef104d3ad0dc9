#include "host/devices/description_fetch.h"

#include <curl/curl.h>

#include <memory>

namespace vornhost {

namespace {

constexpr long kTimeLimit = 1000; // milliseconds
constexpr size_t kSizeLimit = 65536;

size_t Collect(const char *bytes, size_t one, size_t count, void *context) {
  auto *content = static_cast<std::string *>(context);
  if (content->size() + one * count > kSizeLimit) {
    return 0;
  }
  content->append(bytes, one * count);
  return one * count;
}

} // namespace

std::string FetchDescription(const std::string &url, const std::string &netif) {
  const std::unique_ptr<CURL, decltype(&curl_easy_cleanup)> handle(curl_easy_init(), &curl_easy_cleanup);
  std::string content;
  const std::string way = "if!" + netif;
  if (!handle) {
    return {};
  }
  curl_easy_setopt(handle.get(), CURLOPT_URL, url.c_str());
  curl_easy_setopt(handle.get(), CURLOPT_PROTOCOLS_STR, "http");
  curl_easy_setopt(handle.get(), CURLOPT_PROXY, "");
  curl_easy_setopt(handle.get(), CURLOPT_INTERFACE, way.c_str());
  curl_easy_setopt(handle.get(), CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(handle.get(), CURLOPT_FAILONERROR, 1L);
  curl_easy_setopt(handle.get(), CURLOPT_TIMEOUT_MS, kTimeLimit);
  curl_easy_setopt(handle.get(), CURLOPT_WRITEFUNCTION, Collect);
  curl_easy_setopt(handle.get(), CURLOPT_WRITEDATA, &content);
  return curl_easy_perform(handle.get()) == CURLE_OK ? content : std::string();
}

} // namespace vornhost
