#include "tests/fuzz/fuzz_server.h"

#include "tests/fuzz/demand.h"
#include "webapi/config.h"
#include "webapi/password.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <limits>
#include <stdexcept>

using vornwebapi::HostRule;
using vornwebapi::Peer;
using vornwebapi::Service;
using vornwebapi::Session;

namespace vornfuzz {
namespace {

constexpr size_t kLongestRefusal = 200; // bytes

void Echo(VORN::APIRequest *request, VORN::APIResponse *response) {
  response->SetSuccess(request->GetParam("", Json::Value()));
}

void Throw(VORN::APIRequest *request, VORN::APIResponse * /*response*/) {
  throw std::runtime_error(request->GetParam("a", "").asString());
}

vornwebapi::Config MakeConfig() {
  std::string folder = std::filesystem::temp_directory_path() / "fuzz_server.XXXXXX";
  vornwebapi::Config config;
  config.state = mkdtemp(folder.data());
  config.loginFailures = std::numeric_limits<size_t>::max() / 2; // inputs do not depend on each other
  config.sessionIdleTime = config.sessionTime;
  std::ofstream(config.state + "/password") << "none kept\n"; // nothing matches it, and that is seen at once
  return config;
}

const vornwebapi::Config &TheConfig() {
  static const vornwebapi::Config kConfig = MakeConfig();
  return kConfig;
}

vornwebapi::LoginSessions::Made session;

void PutTokens() {
  std::ofstream file(TheConfig().state + "/tokens.new");
  file << "000000000001 " << vornwebapi::DigestOf(std::string(kToken)) << " full 1 9999999999 0 fuzz\n"
       << "000000000002 " << vornwebapi::DigestOf(std::string(kReadingToken)) << " read 1 9999999999 0 fuzz\n";
  file.close();
  std::filesystem::rename(TheConfig().state + "/tokens.new", TheConfig().state + "/tokens");
}

/// @return the status; 0 with the close of a connection that got no answer
std::string StatusOf(const std::string &text) {
  const size_t end = text.find("\r\n\r\n");
  Demand(text.rfind("HTTP/1.1 ", 0) == 0 && end != std::string::npos && text.find('\0') >= end);
  const std::string status = text.substr(9, 4);
  Demand(status == "200 " || text.size() - end - 4 <= kLongestRefusal);
  return status;
}

/// @return false when more bytes are wanted, or none may follow
bool Go(Session &conversation, Talk &talk) {
  switch (conversation.Step()) {
  case Session::Wants::kBytes:
    return false;
  case Session::Wants::kContinue:
    return true;
  case Session::Wants::kCall:
    talk.statuses += StatusOf(conversation.Finish(conversation.Call().answer, false, talk.closed));
    break;
  case Session::Wants::kAnswer:
    talk.statuses += StatusOf(conversation.Finish(conversation.Refusal(), false, talk.closed));
    break;
  }
  return !talk.closed;
}

void Replace(std::string &text, std::string_view mark, const std::string &value) {
  for (size_t at = text.find(mark); at != std::string::npos; at = text.find(mark, at + value.size())) {
    text.replace(at, mark.size(), value);
  }
}

} // namespace

Service &TheService() {
  static Service service(TheConfig(), {{"A", 1, "get", Echo}, {"A", 1, "set", Echo}, {"A", 2, "get", Throw}});
  static const bool kOpen = [] {
    std::string password;
    std::string fault;
    return service.Gate().Open(password, fault);
  }();
  Demand(kOpen);
  return service;
}

void Renew() {
  vornwebapi::Access &access = TheService().Gate();
  const auto tokens = access.TheTokens().List();
  const bool known = std::count_if(tokens.begin(), tokens.end(), [](const vornwebapi::Token &token) {
                       return token.name == "fuzz" && (token.id == "000000000001" || token.id == "000000000002");
                     }) == 2;
  if (tokens.size() != 2 || !known) {
    PutTokens();
  }
  if (!access.Sessions().Find(session.id)) {
    session = *access.Sessions().Make();
  }
}

const std::string &SessionId() {
  return session.id;
}

const std::string &SessionCsrf() {
  return session.csrf;
}

std::string Fill(std::string text) {
  Replace(text, "{ID}", session.id);
  Replace(text, "{CSRF}", session.csrf);
  return text;
}

Talk Converse(std::string_view bytes, size_t firstPiece, bool secure) {
  static const std::vector<std::string> kNames = {"localhost"};
  Session conversation(TheService(), HostRule{&kNames, "127.0.0.1"}, Peer{443, secure, "127.0.0.1"});
  Talk talk;
  for (size_t piece = firstPiece; !bytes.empty() && !talk.closed; piece = piece * 3 + 1) {
    conversation.Feed(bytes.substr(0, piece));
    bytes.remove_prefix(std::min(piece, bytes.size()));
    while (Go(conversation, talk)) {
    }
  }
  return talk;
}

} // namespace vornfuzz
