#include "host/packageserver/package_client.h"

#include "host/packageserver/strict_json.h"

#include <curl/curl.h>

#include <algorithm>
#include <array>
#include <memory>
#include <mutex>
#include <utility>

namespace vornhost {

namespace {

using CurlHandle = std::unique_ptr<CURL, decltype(&curl_easy_cleanup)>;
using CurlUrl = std::unique_ptr<CURLU, decltype(&curl_url_cleanup)>;
using CurlText = std::unique_ptr<char, decltype(&curl_free)>;

bool IsPlain(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') || byte == '_' ||
         byte == '-' || byte == '.';
}

// A page is one step of a path, and no step up.
bool IsPage(const std::string &page) {
  return !page.empty() && page.size() <= 128 && page.front() != '.' && std::all_of(page.begin(), page.end(), IsPlain);
}

bool IsLanguage(const std::string &language) {
  return language.size() <= 64;
}

std::string Part(CURLU *url, CURLUPart part) {
  char *text = nullptr;
  if (curl_url_get(url, part, &text, 0) != CURLUE_OK) {
    return {};
  }
  return CurlText(text, &curl_free).get();
}

// @return the empty text when the configured address is none of HTTPS
std::string FullUrl(const std::string &base, const std::string &language, const std::string &page) {
  const CurlUrl url(curl_url(), &curl_url_cleanup);
  if (!url || curl_url_set(url.get(), CURLUPART_URL, base.c_str(), 0) != CURLUE_OK ||
      Part(url.get(), CURLUPART_SCHEME) != "https" || !Part(url.get(), CURLUPART_QUERY).empty() ||
      !Part(url.get(), CURLUPART_FRAGMENT).empty()) {
    return {};
  }
  std::string path = Part(url.get(), CURLUPART_PATH);
  if (path.empty() || path.back() != '/') {
    path += '/';
  }
  const std::string query = "lang=" + language;
  if (curl_url_set(url.get(), CURLUPART_PATH, (path + page).c_str(), 0) != CURLUE_OK ||
      curl_url_set(url.get(), CURLUPART_QUERY, query.c_str(), CURLU_URLENCODE | CURLU_APPENDQUERY) != CURLUE_OK) {
    return {};
  }
  return Part(url.get(), CURLUPART_URL);
}

// What arrives, header lines counted and body kept, each up to the limit.
struct Answer {
  size_t limit = 0;
  size_t headerBytes = 0;
  std::string body;
  bool tooLarge = false;
};

// C functions: an exception must not pass through libcurl. Any other count than the given one ends the transfer.
size_t TakeBody(char *data, size_t size, size_t count, void *context) {
  auto *answer = static_cast<Answer *>(context);
  const size_t bytes = size * count;
  if (bytes > answer->limit - answer->body.size()) {
    answer->tooLarge = true;
    return 0;
  }
  try {
    answer->body.append(data, bytes);
  } catch (const std::exception &) {
    return 0;
  }
  return bytes;
}

size_t CountHeader(char * /*data*/, size_t size, size_t count, void *context) {
  auto *answer = static_cast<Answer *>(context);
  answer->headerBytes += size * count;
  answer->tooLarge = answer->tooLarge || answer->headerBytes > answer->limit;
  return answer->tooLarge ? 0 : size * count;
}

template <typename Value> void Set(CURL *curl, CURLoption option, Value value, bool &good) {
  good = curl_easy_setopt(curl, option, value) == CURLE_OK && good;
}

bool SetSecurity(CURL *curl, const PackageServer &server) {
  bool good = true;
  Set(curl, CURLOPT_PROTOCOLS_STR, "https", good);
  Set(curl, CURLOPT_REDIR_PROTOCOLS_STR, "https", good);
  Set(curl, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2), good);
  Set(curl, CURLOPT_SSL_VERIFYPEER, 1L, good);
  Set(curl, CURLOPT_SSL_VERIFYHOST, 2L, good);
  Set(curl, CURLOPT_PROXY, "", good); // the empty text also overrides the environment
  if (!server.caFile.empty()) {
    Set(curl, CURLOPT_CAINFO, server.caFile.c_str(), good);
    Set(curl, CURLOPT_CAPATH, static_cast<const char *>(nullptr), good);
  }
  return good;
}

bool SetTransfer(CURL *curl, const std::string &url, const PackageLimits &limits, Answer &answer) {
  bool good = true;
  Set(curl, CURLOPT_URL, url.c_str(), good);
  Set(curl, CURLOPT_NOSIGNAL, 1L, good); // other threads live here
  Set(curl, CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(limits.connect.count()), good);
  Set(curl, CURLOPT_TIMEOUT_MS, static_cast<long>(limits.total.count()), good);
  Set(curl, CURLOPT_FOLLOWLOCATION, 1L, good);
  Set(curl, CURLOPT_MAXREDIRS, limits.redirects, good);
  Set(curl, CURLOPT_WRITEFUNCTION, &TakeBody, good);
  Set(curl, CURLOPT_WRITEDATA, &answer, good);
  Set(curl, CURLOPT_HEADERFUNCTION, &CountHeader, good);
  Set(curl, CURLOPT_HEADERDATA, &answer, good);
  return good;
}

// @return why the answer cannot be had; empty when `answer` holds the body of a status 200
std::string Transfer(const std::string &url, const PackageServer &server, const PackageLimits &limits, Answer &answer) {
  static std::once_flag once;
  std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
  const CurlHandle curl(curl_easy_init(), &curl_easy_cleanup);
  if (!curl || !SetSecurity(curl.get(), server) || !SetTransfer(curl.get(), url, limits, answer)) {
    return "the request cannot be made";
  }
  const CURLcode code = curl_easy_perform(curl.get());
  if (answer.tooLarge) {
    return "the answer is too large";
  }
  if (code != CURLE_OK) {
    return curl_easy_strerror(code); // and not the error buffer, which may quote the server
  }
  long status = 0;
  curl_easy_getinfo(curl.get(), CURLINFO_RESPONSE_CODE, &status);
  return status == 200 ? std::string() : "HTTP status " + std::to_string(status);
}

} // namespace

PackageClient::PackageClient(PackageServer server, const PackageLimits &limits)
    : server_(std::move(server)), limits_(limits) {}

bool PackageClient::Ask(const std::string &language, const std::string &page, Json::Value &result,
                        std::string &cause) const {
  if (!IsPage(page) || !IsLanguage(language)) {
    cause = "no such page or language";
    return false;
  }
  const std::string url = FullUrl(server_.url, language, page);
  if (url.empty()) {
    cause = "the configured url is no https address";
    return false;
  }
  Answer answer;
  answer.limit = limits_.bytes;
  cause = Transfer(url, server_, limits_, answer);
  if (!cause.empty()) {
    return false;
  }
  if (!ParseStrictJson(answer.body, result)) {
    cause = "the answer is not JSON";
    return false;
  }
  return true;
}

} // namespace vornhost
