// What the server sends, and the named answers that speak of the way to a handler. Nobody writes an error body by hand.
#ifndef WEBAPI_ANSWER_H
#define WEBAPI_ANSWER_H

#include <string>
#include <string_view>

namespace vornwebapi {

struct Answer {
  unsigned status = 200;
  std::string body;
  bool close = false; ///< the connection cannot be used after it
  const char *type = "application/json";
  const char *allow = nullptr;
  std::string cookie;      ///< the value of Set-Cookie; empty: none
  unsigned retryAfter = 0; ///< seconds; 0: not said
  /// A file of the page in place of `body`, and the header's lines that go with it. Both outlive the connection.
  std::string_view file = {};
  std::string_view fileFields = {};
};

/// A handler's own answer.
Answer Answered(std::string body);
/// The row answered, and with an error: the status does not tell.
bool IsRowsError(const Answer &answer);

// Each that follows has the body {"success":false,"error":{"code":<status>,"message":"..."}}, at most 200 bytes.
// `reason` is a static text without characters that JSON escapes; no input is ever repeated in it.
Answer BadRequest(const char *reason); ///< malformed HTTP: closes
Answer BadBody(const char *reason);
Answer NotLoggedIn();
Answer WrongPassword();
Answer Forbidden(const char *reason);
Answer TooManyTries(unsigned retryAfter);
Answer NotFound();
Answer NoPage();     ///< none is installed
Answer NoSuchFile(); ///< of the page
Answer MethodNotAllowed(const char *allow = "POST");
Answer RequestTimeout();
Answer BodyTooLarge();
Answer TargetTooLong();
Answer UnsupportedMediaType();
Answer ExpectationFailed();
Answer MisdirectedRequest();
Answer HeaderTooLarge();
Answer HandlerFailed();
Answer UnknownMethod();
Answer UnknownTransferCoding();
Answer Busy();
Answer Stopping();
Answer TooManyConnections();
Answer UnknownVersion();

/// The bytes on the wire; of a file its header only.
/// @param[in] keepAlive  the client may go on using the connection
/// @param[in] headOnly   without the body, as HEAD asks for
/// @param[in] secure     over TLS
std::string Render(const Answer &answer, bool keepAlive, bool headOnly, bool secure = false);

} // namespace vornwebapi

#endif
