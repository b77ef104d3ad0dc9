// A token file of any content: what is read of it is whole, can be written and read again, lets nobody in whom it does
// not name, and a token made beside it comes and goes.
#include "tests/fuzz/demand.h"
#include "webapi/password.h"
#include "webapi/tokens.h"

#include <sodium.h>

#include <cstdint>
#include <ctime>
#include <filesystem>
#include <fstream>

using vornfuzz::Demand;
using vornwebapi::Tokens;

namespace {

constexpr const char *kText = "5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e";
constexpr size_t kMost = 32;

bool AreSame(const vornwebapi::Token &a, const vornwebapi::Token &b) {
  return a.id == b.id && a.digest == b.digest && a.writes == b.writes && a.made == b.made && a.expires == b.expires &&
         a.used == b.used && a.name == b.name;
}

void CheckText(const std::string &content) {
  const auto tokens = vornwebapi::ParseTokens(content);
  const auto again = vornwebapi::ParseTokens(vornwebapi::TokensText(tokens));
  Demand(tokens.size() == again.size());
  for (const auto &[digest, token] : tokens) {
    Demand(digest == token.digest && again.contains(digest) && AreSame(token, again.at(digest)));
    Demand(Tokens::GoodName(token.name) && token.id.find_first_not_of("0123456789abcdef") == std::string::npos);
  }
}

const vornwebapi::StateFolder &TheFolder() {
  static const vornwebapi::StateFolder kFolder = [] {
    Demand(sodium_init() >= 0);
    std::string path = std::filesystem::temp_directory_path() / "fuzz_tokens.XXXXXX";
    return vornwebapi::StateFolder(mkdtemp(path.data()));
  }();
  return kFolder;
}

void CheckFile(const std::string &content) {
  std::ofstream(TheFolder().Path("tokens"), std::ios::binary) << content;
  Tokens tokens(TheFolder(), kMost);
  std::string fault;
  if (!tokens.Open(fault)) { // no text: the server says so and does not start
    Demand(content.find('\0') != std::string::npos);
    return;
  }
  if (const auto found = tokens.Find(kText)) {
    Demand(content.find(vornwebapi::DigestOf(kText)) != std::string::npos && found->expires > std::time(nullptr));
  }
  std::string id;
  std::string text;
  if (tokens.Make("fresh", false, 60, id, text) != Tokens::Result::kDone) {
    Demand(tokens.List().size() >= kMost);
    return;
  }
  const auto made = tokens.Find(text);
  Demand(made && !made->writes && made->name == "fresh" && tokens.List().size() <= kMost);
  Demand(tokens.Revoke(id) == Tokens::Result::kDone && !tokens.Find(text));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  const std::string content(reinterpret_cast<const char *>(data), size);
  CheckText(content);
  CheckFile(content);
  return 0;
}
