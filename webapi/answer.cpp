#include "webapi/answer.h"

#include <array>
#include <boost/beast/http/status.hpp>
#include <cstdio>
#include <ctime>
#include <ostream>
#include <string_view>
#include <utility>

namespace vornwebapi {
namespace {

Answer Refused(unsigned status, std::string_view message) {
  Answer answer;
  answer.status = status;
  answer.body = R"({"success":false,"error":{"code":)" + std::to_string(status) + R"(,"message":")";
  answer.body += message;
  answer.body += "\"}}";
  return answer;
}

Answer RefusedAndClosed(unsigned status, std::string_view message) {
  Answer answer = Refused(status, message);
  answer.close = true;
  return answer;
}

/// For browsers: an answer is data, shown by no page and kept nowhere.
constexpr std::string_view kBrowserFields =
    "Cache-Control: no-store\r\nX-Content-Type-Options: nosniff\r\n"
    "Content-Security-Policy: default-src 'none'; frame-ancestors 'none'; base-uri 'none'; form-action 'none'\r\n"
    "X-Frame-Options: DENY\r\nReferrer-Policy: no-referrer\r\nCross-Origin-Opener-Policy: same-origin\r\n"
    "Cross-Origin-Resource-Policy: same-origin\r\n";

/// The Date field's value (RFC 9110, section 5.6.7), made once a second and thread.
std::string_view DateText() {
  thread_local std::time_t made = -1;
  thread_local std::array<char, 32> text{};
  const std::time_t now = std::time(nullptr);
  if (now != made) {
    std::tm parts{};
    gmtime_r(&now, &parts);
    std::strftime(text.data(), text.size(), "%a, %d %b %Y %H:%M:%S GMT", &parts); // the process keeps the C locale
    made = now;
  }
  return text.data();
}

} // namespace

Answer Answered(std::string body) {
  Answer answer;
  answer.body = std::move(body);
  return answer;
}

bool IsRowsError(const Answer &answer) {
  constexpr std::string_view kFailed = R"({"success":false)";
  return answer.status == 200 && answer.body.compare(0, kFailed.size(), kFailed) == 0;
}

Answer BadRequest(const char *reason) {
  return RefusedAndClosed(400, reason);
}
Answer BadBody(const char *reason) {
  return Refused(400, reason);
}
Answer NotLoggedIn() {
  return Refused(401, "not logged in");
}
Answer WrongPassword() {
  return Refused(401, "wrong user name or password");
}
Answer Forbidden(const char *reason) {
  return Refused(403, reason);
}
Answer TooManyTries(unsigned retryAfter) {
  Answer answer = Refused(429, "too many tries");
  answer.retryAfter = retryAfter;
  return answer;
}
Answer NotFound() {
  return Refused(404, "no such row");
}
Answer NoPage() {
  return Refused(404, "no page is installed here");
}
Answer NoSuchFile() {
  return Refused(404, "no such file");
}
Answer MethodNotAllowed(const char *allow) {
  Answer answer = Refused(405, "only the methods in Allow");
  answer.allow = allow;
  return answer;
}
Answer RequestTimeout() {
  return RefusedAndClosed(408, "the request took too long");
}
Answer BodyTooLarge() {
  return RefusedAndClosed(413, "the body is too large");
}
Answer TargetTooLong() {
  return RefusedAndClosed(414, "the request line is too long");
}
Answer UnsupportedMediaType() {
  return Refused(415, "a body is application/json");
}
Answer ExpectationFailed() {
  return RefusedAndClosed(417, "unknown expectation");
}
Answer MisdirectedRequest() {
  return RefusedAndClosed(421, "this server has another name");
}
Answer HeaderTooLarge() {
  return RefusedAndClosed(431, "the header is too large");
}
Answer HandlerFailed() {
  return Refused(500, "the call failed inside");
}
Answer UnknownMethod() {
  return RefusedAndClosed(501, "unknown method");
}
Answer UnknownTransferCoding() {
  return RefusedAndClosed(501, "unknown transfer coding");
}
Answer Busy() {
  Answer answer = Refused(503, "too many calls at once");
  answer.retryAfter = 1;
  return answer;
}
Answer Stopping() {
  return RefusedAndClosed(503, "the server is stopping");
}
Answer TooManyConnections() {
  return RefusedAndClosed(503, "too many connections");
}
Answer UnknownVersion() {
  return RefusedAndClosed(505, "HTTP/1.1 is spoken here");
}

std::string Render(const Answer &answer, bool keepAlive, bool headOnly, bool secure) {
  const auto reason = boost::beast::http::obsolete_reason(static_cast<boost::beast::http::status>(answer.status));
  std::string out;
  out.reserve(704 + answer.body.size());
  out += "HTTP/1.1 ";
  out += std::to_string(answer.status);
  out += ' ';
  out.append(reason.data(), reason.size());
  out += "\r\nDate: ";
  out += DateText();
  out += "\r\n";
  if (answer.fileFields.empty()) {
    out.append("Content-Type: ").append(answer.type).append("\r\n");
    out += kBrowserFields;
  } else {
    out += answer.fileFields;
  }
  if (answer.status != 304) { // it has no body, whatever it would say of one (RFC 9110, section 15.4.5)
    out.append("Content-Length: ").append(std::to_string(answer.body.size() + answer.file.size())).append("\r\n");
  }
  if (secure) { // of use once the owner trusts the certificate; until then browsers do not heed it (RFC 6797,
                // section 8.1)
    out += "Strict-Transport-Security: max-age=31536000\r\n";
  }
  if (!answer.cookie.empty()) {
    out.append("Set-Cookie: ").append(answer.cookie).append("\r\n");
  }
  if (answer.allow != nullptr) {
    out.append("Allow: ").append(answer.allow).append("\r\n");
  }
  if (answer.retryAfter > 0) {
    out.append("Retry-After: ").append(std::to_string(answer.retryAfter)).append("\r\n");
  }
  out += keepAlive ? "\r\n" : "Connection: close\r\n\r\n";
  if (!headOnly) {
    out += answer.body;
  }
  return out;
}

} // namespace vornwebapi
