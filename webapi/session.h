// One connection's conversation, without its socket.
#ifndef WEBAPI_SESSION_H
#define WEBAPI_SESSION_H

#include "webapi/request_reader.h"
#include "webapi/service.h"

#include <chrono>
#include <string>
#include <string_view>

namespace vornwebapi {

/// Bytes in, bytes out, one request after the other. For one thread at a time.
class Session {
public:
  enum class Wants {
    kBytes,    ///< Feed it
    kContinue, ///< send ContinueText, then go on
    kCall,     ///< Call, or Refuse, then send the outcome and go on
    kAnswer    ///< send Refusal, which may also be a file of the page, then go on
  };

  Session(Service &service, HostRule hosts, Peer peer);

  void Feed(std::string_view bytes) { reader_.Feed(bytes); }
  Wants Step();

  /// With kBytes: what it waits for.
  bool Idle() const { return state_ == RequestReader::State::kIdle; }
  bool InBody() const { return state_ == RequestReader::State::kBody; }

  static std::string_view ContinueText() { return "HTTP/1.1 100 Continue\r\n\r\n"; }

  Turn TurnOfCall() const; ///< with kCall
  Outcome Call();
  size_t BodySize() const { return reader_.Body().size(); }         ///< with kCall
  bool HeadOnly() const { return reader_.Head().method == "HEAD"; } ///< an answer has no body
  /// The bytes of an answer to the request at hand, which is over with it; a file's own come behind them.
  /// @param[out] close  no further request may follow
  std::string Finish(const Answer &answer, bool stopping, bool &close);
  const Answer &Refusal() const { return refusal_; }

private:
  Wants Head();
  Wants Refuse(Answer answer);

  Service &service_;
  const HostRule hosts_;
  const Peer peer_;
  RequestReader reader_;
  RequestReader::State state_ = RequestReader::State::kIdle;
  Decision decision_;                                // on the request at hand
  std::chrono::steady_clock::time_point begun_ = {}; // its header was whole
  const Route *route_ = nullptr;                     // null: one of the server's own calls
  Answer refusal_;
};

} // namespace vornwebapi

#endif
