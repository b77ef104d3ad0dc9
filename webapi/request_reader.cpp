#include "webapi/request_reader.h"

#include <algorithm>
#include <boost/asio/buffer.hpp>
#include <limits>
#include <utility>

namespace vornwebapi {
namespace {

namespace http = boost::beast::http;

constexpr std::string_view kLineEnd = "\r\n";
// A chunk's line with its extensions, or the last chunk with its trailers.
constexpr size_t kMostUnparsedBody = 16384;

} // namespace

RequestReader::RequestReader(const HttpLimits &limits, const HostRule &hosts) : limits_(limits), hosts_(hosts) {}

void RequestReader::Feed(std::string_view bytes) {
  buffer_.append(bytes);
}

RequestReader::State RequestReader::Advance() {
  if (state_ == State::kIdle && SkipEmptyLines()) {
    state_ = State::kHeader;
  }
  if (state_ == State::kHeader) {
    AdvanceHeader();
  }
  if (state_ == State::kBody) {
    AdvanceBody();
  }
  return state_;
}

// RFC 9112, section 2.2: some clients end a body with one.
/// @return true when a request begins
bool RequestReader::SkipEmptyLines() {
  size_t begin = 0;
  while (buffer_.compare(begin, 2, kLineEnd) == 0) {
    begin += 2;
  }
  buffer_.erase(0, begin);
  return !buffer_.empty() && buffer_ != "\r";
}

void RequestReader::AdvanceHeader() {
  while (state_ == State::kHeader && TakeLine()) {
  }
  if (state_ == State::kHeader) {
    CheckPartialLine();
  }
}

// Checks the next complete line. The empty one ends the header.
bool RequestReader::TakeLine() {
  const size_t end = buffer_.find('\n', lineStart_);
  if (end == std::string::npos) {
    return false;
  }
  if (end == lineStart_ || buffer_[end - 1] != '\r') {
    Fail(BadRequest("lines end in CR LF"));
    return false;
  }
  const std::string_view line(buffer_.data() + lineStart_, end - 1 - lineStart_);
  const bool first = lines_++ == 0;
  lineStart_ = end + 1;
  if (first && line.size() > limits_.requestLineBytes) {
    Fail(TargetTooLong());
  } else if (first) {
    headerStart_ = lineStart_;
    if (auto fault = CheckRequestLine(line)) {
      Fail(std::move(*fault));
    }
  } else if (lineStart_ - headerStart_ > limits_.headerBytes ||
             lines_ - (line.empty() ? 2 : 1) > limits_.headerFields) {
    Fail(HeaderTooLarge());
  } else if (line.empty()) {
    ParseHeader();
  } else if (auto fault = CheckFieldLine(line)) {
    Fail(std::move(*fault));
  }
  return state_ == State::kHeader;
}

void RequestReader::CheckPartialLine() {
  if (lines_ == 0 && buffer_.size() > limits_.requestLineBytes + 1) {
    Fail(TargetTooLong());
  } else if (lines_ > 0 && buffer_.size() - headerStart_ > limits_.headerBytes) {
    Fail(HeaderTooLarge());
  }
}

// REQUIRES: the header's bytes are buffer_ up to lineStart_.
void RequestReader::ParseHeader() {
  parser_ = std::make_unique<Parser>();
  parser_->header_limit(static_cast<std::uint32_t>(lineStart_ + 1));
  parser_->body_limit(std::numeric_limits<std::uint64_t>::max()); // until the header is known to be good
  boost::system::error_code fault;
  const size_t taken = parser_->put(boost::asio::const_buffer(buffer_.data(), lineStart_), fault);
  if (fault || taken != lineStart_ || !parser_->is_header_done()) {
    Fail(BadRequest("bad header"));
    return;
  }
  buffer_.erase(0, taken);
  head_ = RequestHead();
  if (auto refused = ReadHead(parser_->get(), hosts_, head_)) {
    Fail(std::move(*refused));
    return;
  }
  state_ = State::kHead;
}

void RequestReader::ReadBody(size_t most) {
  bodyBytes_ = std::min(most, limits_.bodyBytes);
  const auto length = parser_->content_length();
  if (length && *length > bodyBytes_) {
    Fail(BodyTooLarge());
    return;
  }
  parser_->body_limit(bodyBytes_);
  state_ = parser_->is_done() ? State::kDone : State::kBody;
}

void RequestReader::AdvanceBody() {
  size_t used = 0;
  boost::system::error_code fault;
  while (!parser_->is_done() && !fault && used < buffer_.size()) {
    used += parser_->put(boost::asio::const_buffer(buffer_.data() + used, buffer_.size() - used), fault);
  }
  buffer_.erase(0, used);
  if (fault == http::error::body_limit || fault == http::error::buffer_overflow) {
    Fail(BodyTooLarge());
  } else if ((fault && fault != http::error::need_more) || buffer_.size() > kMostUnparsedBody + bodyBytes_) {
    Fail(BadRequest("bad body"));
  } else if (parser_->is_done()) {
    state_ = State::kDone;
  } else if (buffer_.size() > kMostUnparsedBody) {
    Fail(BadRequest("chunk header too long"));
  }
}

void RequestReader::Next() {
  parser_.reset();
  head_ = RequestHead();
  lineStart_ = 0;
  headerStart_ = 0;
  lines_ = 0;
  state_ = State::kIdle;
  if (buffer_.empty()) {
    std::string().swap(buffer_); // an idle connection holds no memory
  }
}

void RequestReader::Fail(Answer fault) {
  fault_ = std::move(fault);
  state_ = State::kFailed;
}

} // namespace vornwebapi
