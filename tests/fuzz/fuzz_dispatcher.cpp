// A connection's bytes to the real dispatcher, cut into reads where the input says so: every answer is whole, and how
// the bytes were cut makes no difference to what is answered.
#include "webapi/config.h"
#include "webapi/session.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>

using vornwebapi::HostRule;
using vornwebapi::Peer;
using vornwebapi::Service;
using vornwebapi::Session;

namespace {

void Echo(VORN::APIRequest *request, VORN::APIResponse *response) {
  response->SetSuccess(request->GetParam("", Json::Value()));
}

void Throw(VORN::APIRequest *request, VORN::APIResponse * /*response*/) {
  throw std::runtime_error(request->GetParam("a", "").asString());
}

/// With a state of its own: the corpus has the token that stands in it.
vornwebapi::Config MakeConfig() {
  std::string folder = std::filesystem::temp_directory_path() / "fuzz_dispatcher.XXXXXX";
  vornwebapi::Config config;
  config.state = mkdtemp(folder.data());
  std::ofstream(config.state + "/tokens")
      << "000000000001 c7885720cc206bad14bd4e9d89f15aa1887b5214c0802cd9019770f571b90824 full 1 9999999999 0 fuzz\n";
  return config;
}

Service &TheService() {
  static const vornwebapi::Config kConfig = MakeConfig();
  static Service service(kConfig, {{"A", 1, "get", Echo}, {"A", 2, "get", Throw}});
  return service;
}

struct Talk {
  std::string answers; ///< status codes in their order
  bool closed = false;
};

void Note(const std::string &text, Talk &talk) {
  const size_t end = text.find("\r\n\r\n");
  if (text.rfind("HTTP/1.1 ", 0) != 0 || end == std::string::npos || text.find('\0') < end) {
    std::abort();
  }
  talk.answers += text.substr(9, 4);
}

/// @return false when more bytes are wanted, or none may follow
bool Go(Session &session, Talk &talk) {
  switch (session.Step()) {
  case Session::Wants::kBytes:
    return false;
  case Session::Wants::kContinue:
    return true;
  case Session::Wants::kCall:
    Note(session.Finish(session.Call().answer, false, talk.closed), talk);
    break;
  case Session::Wants::kAnswer:
    Note(session.Finish(session.Refusal(), false, talk.closed), talk);
    break;
  }
  return !talk.closed;
}

Talk Converse(std::string_view bytes, size_t firstPiece) {
  static const std::vector<std::string> kNames = {"localhost"};
  Session session(TheService(), HostRule{&kNames, "127.0.0.1"}, Peer{});
  Talk talk;
  for (size_t piece = firstPiece; !bytes.empty() && !talk.closed; piece = piece * 3 + 1) {
    session.Feed(bytes.substr(0, piece));
    bytes.remove_prefix(std::min(piece, bytes.size()));
    while (Go(session, talk)) {
    }
  }
  return talk;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size < 1) {
    return 0;
  }
  const std::string_view bytes(reinterpret_cast<const char *>(data) + 1, size - 1);
  const Talk whole = Converse(bytes, size + 1);
  const Talk pieces = Converse(bytes, data[0] % 16U + 1);
  if (whole.answers != pieces.answers || whole.closed != pieces.closed) {
    std::abort();
  }
  return 0;
}
