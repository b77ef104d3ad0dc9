// A request's header: what of it is let through, and what of it the server uses.
#ifndef WEBAPI_REQUEST_HEAD_H
#define WEBAPI_REQUEST_HEAD_H

#include "webapi/answer.h"

#include <boost/beast/http/message.hpp>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vornwebapi {

/// What the server uses of a header.
struct RequestHead {
  std::string method;
  std::string target;
  std::string language;               ///< the caller's language code
  std::string host;                   ///< as it stands; empty: none
  std::vector<std::string> origin;    ///< these: every value that was sent
  std::vector<std::string> fetchSite; ///< Sec-Fetch-Site
  std::vector<std::string> fetchMode; ///< Sec-Fetch-Mode
  std::vector<std::string> fetchDest; ///< Sec-Fetch-Dest
  std::vector<std::string> authorization;
  std::vector<std::string> cookies;
  std::vector<std::string> csrf; ///< X-CSRF-Token
  std::vector<std::string> acceptEncoding;
  std::vector<std::string> ifNoneMatch;
  bool poll = false; ///< X-Poll: the page asks by itself, nobody may be there
  bool keepAlive = true;
  bool hasBody = false;
  bool chunked = false;
  bool expectsContinue = false;
  bool json = false; ///< the body is said to be application/json, as it stands
};

/// Names by which a request may speak to this server.
struct HostRule {
  const std::vector<std::string> *names; ///< lower case; outlives the rule
  std::string ownAddress;                ///< the connection's own end, as text
};

/// Line checks before the HTTP parser, for what it tolerates. `line` is without its CR LF.
std::optional<Answer> CheckRequestLine(std::string_view line);
std::optional<Answer> CheckFieldLine(std::string_view line);

/// Checks a parsed header and takes out what is used.
std::optional<Answer> ReadHead(const boost::beast::http::request_header<> &header, const HostRule &hosts,
                               RequestHead &head);

} // namespace vornwebapi

#endif
