#include "webapi/session.h"

#include "webapi/log.h"

#include <utility>

namespace vornwebapi {
namespace {

/// The text of a refusal, which is one of the server's own and has no quotation marks.
std::string MessageOf(const Answer &refusal) {
  constexpr std::string_view kMember = R"("message":")";
  const size_t found = refusal.body.find(kMember);
  if (found == std::string::npos) {
    return {};
  }
  const size_t begin = found + kMember.size();
  return refusal.body.substr(begin, refusal.body.find('"', begin) - begin);
}

} // namespace

Session::Session(Service &service, HostRule hosts, Peer peer)
    : service_(service), hosts_(std::move(hosts)), peer_(std::move(peer)), reader_(service.Limits(), hosts_) {}

Session::Wants Session::Step() {
  state_ = reader_.Advance();
  switch (state_) {
  case RequestReader::State::kHead:
    return Head();
  case RequestReader::State::kDone:
    if (reader_.Head().hasBody && !reader_.Body().empty() && !reader_.Head().json) {
      return Refuse(UnsupportedMediaType());
    }
    return Wants::kCall;
  case RequestReader::State::kFailed:
    Log(LogKind::kRefusedRequest, "a request from %s refused with %u: %s", peer_.from.c_str(), reader_.Fault().status,
        MessageOf(reader_.Fault()).c_str());
    return Refuse(reader_.Fault());
  default:
    return Wants::kBytes;
  }
}

// What the header alone decides is answered before the body is taken.
Session::Wants Session::Head() {
  const RequestHead &head = reader_.Head();
  begun_ = std::chrono::steady_clock::now();
  decision_ = service_.Gate().Decide(head, peer_);
  if (decision_.refused) {
    return Refuse(*decision_.refused);
  }
  if (decision_.page) {
    return Refuse(service_.Page().Get(head));
  }
  const bool own = decision_.own != OwnCall::kNone;
  route_ = own ? nullptr : service_.Find(head.target);
  if (!own && route_ == nullptr) {
    return Refuse(NotFound());
  }
  if (IsReport(decision_.own)) {
    const bool reads = head.method == "GET" || head.method == "HEAD";
    return Refuse(reads ? service_.Report(decision_.own) : MethodNotAllowed("GET, HEAD"));
  }
  if (head.method != "POST") {
    return Refuse(MethodNotAllowed());
  }
  if (head.hasBody && !head.chunked && !head.json) {
    return Refuse(UnsupportedMediaType());
  }
  const bool expects = head.expectsContinue && !reader_.HasBytes();
  reader_.ReadBody(own ? service_.LoginBodyBytes() : service_.Limits().bodyBytes);
  return expects && reader_.Advance() == RequestReader::State::kBody ? Wants::kContinue : Step();
}

Session::Wants Session::Refuse(Answer answer) {
  refusal_ = std::move(answer);
  return Wants::kAnswer;
}

// Own calls lock what they share themselves, and a login must not wait for another's.
Turn Session::TurnOfCall() const {
  return route_ == nullptr ? Turn{} : route_->turn;
}

Outcome Session::Call() {
  if (route_ == nullptr) {
    return service_.CallOwn(decision_, peer_, reader_.Head(), reader_.Body());
  }
  return service_.Call(*route_, *decision_.caller, peer_, reader_.Head(), reader_.Body());
}

std::string Session::Finish(const Answer &answer, bool stopping, bool &close) {
  const RequestHead &head = reader_.Head();
  // A request whose body was not read leaves the connection where no one can tell body from request.
  const bool whole = state_ == RequestReader::State::kDone || (state_ == RequestReader::State::kHead && !head.hasBody);
  close = answer.close || stopping || !whole || !head.keepAlive;
  const bool headed = state_ != RequestReader::State::kFailed && begun_ != std::chrono::steady_clock::time_point();
  service_.Counts().Count(headed ? service_.LabelOf(decision_, head.target) : Metrics::kUnknown, answer.status,
                          IsRowsError(answer), std::chrono::steady_clock::now() - begun_);
  begun_ = {};
  std::string text = Render(answer, !close, HeadOnly(), peer_.secure);
  if (!close) {
    reader_.Next();
    decision_ = {};
    route_ = nullptr;
    state_ = RequestReader::State::kIdle;
  }
  return text;
}

} // namespace vornwebapi
