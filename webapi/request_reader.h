// One connection's bytes taken apart into requests.
#ifndef WEBAPI_REQUEST_READER_H
#define WEBAPI_REQUEST_READER_H

#include "webapi/answer.h"
#include "webapi/request_head.h"

#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace vornwebapi {

struct HttpLimits {
  size_t requestLineBytes = 8192;
  size_t headerBytes = 8192;
  size_t headerFields = 100;
  size_t bodyBytes = 1048576;
};

/// Strictness: lines are looked at here first (ends, characters, lengths, number), Boost.Beast parses them, then
/// request_head.h decides on what they say. Bodies are Beast's alone. A reader that failed stays so.
class RequestReader {
public:
  enum class State {
    kIdle,   ///< no byte of a request yet
    kHeader, ///< in the middle of a header
    kHead,   ///< the header is complete and good; call ReadBody, or drop the connection
    kBody,   ///< in the middle of a body
    kDone,   ///< the request is complete; call Next after it
    kFailed  ///< see Fault
  };

  RequestReader(const HttpLimits &limits, const HostRule &hosts);

  void Feed(std::string_view bytes);
  /// Goes as far as the bytes at hand allow.
  State Advance();
  /// After kHead.
  /// @param[in] most  bytes of the body, within the limits
  void ReadBody(size_t most);
  void Next(); ///< after kDone: forgets the request; bytes that came behind it are the next one's

  const RequestHead &Head() const { return head_; }
  const std::string &Body() const { return parser_->get().body(); }
  const Answer &Fault() const { return fault_; }
  bool HasBytes() const { return !buffer_.empty(); }

private:
  using Parser = boost::beast::http::request_parser<boost::beast::http::string_body>;

  bool SkipEmptyLines();
  void AdvanceHeader();
  bool TakeLine();
  void CheckPartialLine();
  void ParseHeader();
  void AdvanceBody();
  void Fail(Answer fault);

  const HttpLimits &limits_;
  const HostRule &hosts_;
  State state_ = State::kIdle;
  std::string buffer_;     // bytes that the parser has not taken
  size_t lineStart_ = 0;   // in buffer_, of the first line that is not complete
  size_t headerStart_ = 0; // in buffer_, behind the request line
  size_t lines_ = 0;       // complete ones, the request line among them
  std::unique_ptr<Parser> parser_;
  size_t bodyBytes_ = 0; // most of the request at hand
  RequestHead head_;
  Answer fault_;
};

} // namespace vornwebapi

#endif
