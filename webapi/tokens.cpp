#include "webapi/tokens.h"

#include "webapi/password.h"
#include "webapi/random.h"
#include "webapi/text.h"

#include <sys/stat.h>

#include <algorithm>
#include <ctime>
#include <sstream>
#include <utility>

namespace vornwebapi {
namespace {

constexpr const char *kFile = "tokens";
constexpr size_t kIdBytes = 6;
constexpr size_t kSecretBytes = 32;
constexpr size_t kLongestName = 64;

/// Changes with every write: a write puts a new file in the old one's place.
std::int64_t StampOf(const std::string &path) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) {
    return 0;
  }
  constexpr std::int64_t kNanoseconds = 1'000'000'000;
  return info.st_mtim.tv_sec * kNanoseconds + info.st_mtim.tv_nsec + static_cast<std::int64_t>(info.st_ino);
}

bool IsHex(const std::string &text, size_t length) {
  return text.size() == length && text.find_first_not_of("0123456789abcdef") == std::string::npos;
}

} // namespace

std::map<std::string, Token> ParseTokens(const std::string &text) {
  std::map<std::string, Token> tokens;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    Token token;
    std::string access;
    std::string rest;
    const bool whole = static_cast<bool>(words >> token.id >> token.digest >> access >> token.made >> token.expires >>
                                         token.used >> token.name);
    token.writes = access == "full";
    if (whole && !(words >> rest) && IsHex(token.id, 2 * kIdBytes) && IsHex(token.digest, 2 * kSecretBytes) &&
        (token.writes || access == "read") && Tokens::GoodName(token.name)) {
      tokens[token.digest] = token;
    }
  }
  return tokens;
}

std::string TokensText(const std::map<std::string, Token> &tokens) {
  std::ostringstream out;
  for (const auto &[digest, token] : tokens) {
    out << token.id << ' ' << digest << ' ' << (token.writes ? "full" : "read") << ' ' << token.made << ' '
        << token.expires << ' ' << token.used << ' ' << token.name << '\n';
  }
  return out.str();
}

bool Tokens::GoodName(const std::string &name) {
  return !name.empty() && name.size() <= kLongestName && std::all_of(name.begin(), name.end(), [](char c) {
    return IsAlphanumeric(c) || c == '-' || c == '_' || c == '.';
  });
}

bool Tokens::Open(std::string &fault) {
  std::string text;
  if (folder_.Has(kFile) && !folder_.Read(kFile, text)) {
    fault = folder_.Path(kFile) + ": cannot be read";
    return false;
  }
  const std::lock_guard lock(mutex_);
  Take(ParseTokens(text));
  return true;
}

// REQUIRES: mutex_ is held. When each was used is known here, if not yet in the file.
void Tokens::Take(Map tokens) {
  for (auto &[digest, token] : tokens) {
    const auto known = tokens_.find(digest);
    token.used = std::max(token.used, known == tokens_.end() ? 0 : known->second.used);
  }
  tokens_ = std::move(tokens);
  stamp_ = StampOf(folder_.Path(kFile));
}

// REQUIRES: mutex_ is held. Another process may have made one.
void Tokens::ReadAgain() {
  std::string text;
  if (StampOf(folder_.Path(kFile)) != stamp_ && folder_.Read(kFile, text)) {
    Take(ParseTokens(text));
  }
}

Tokens::Result Tokens::Make(const std::string &name, bool writes, std::int64_t seconds, std::string &id,
                            std::string &text) {
  const std::int64_t now = std::time(nullptr);
  Token token{RandomDigits(kIdBytes), "", writes, now, now + seconds, 0, name};
  text = RandomDigits(kSecretBytes);
  if (token.id.empty() || text.empty()) {
    return Result::kFailed;
  }
  token.digest = DigestOf(text);
  Result result = Result::kFailed;
  const std::lock_guard lock(mutex_);
  const bool written = folder_.Change(kFile, [&](const std::string &old, std::string &fresh) {
    Map tokens = ParseTokens(old);
    for (auto at = tokens.begin(); at != tokens.end();) {
      at = at->second.expires <= now ? tokens.erase(at) : std::next(at);
    }
    if (tokens.size() >= most_) {
      result = Result::kTooMany;
      return false;
    }
    tokens[token.digest] = token;
    fresh = TokensText(tokens);
    return true;
  });
  ReadAgain();
  id = token.id;
  return written ? Result::kDone : result;
}

Tokens::Result Tokens::Revoke(const std::string &id) {
  Result result = Result::kFailed;
  const std::lock_guard lock(mutex_);
  const bool written = folder_.Change(kFile, [&](const std::string &old, std::string &fresh) {
    Map tokens = ParseTokens(old);
    const auto found =
        std::find_if(tokens.begin(), tokens.end(), [&id](const auto &each) { return each.second.id == id; });
    if (found == tokens.end()) {
      result = Result::kUnknown;
      return false;
    }
    tokens.erase(found);
    fresh = TokensText(tokens);
    return true;
  });
  ReadAgain();
  return written ? Result::kDone : result;
}

std::vector<Token> Tokens::List() {
  std::vector<Token> list;
  const std::lock_guard lock(mutex_);
  ReadAgain();
  for (const auto &[digest, token] : tokens_) {
    list.push_back(token);
  }
  std::sort(list.begin(), list.end(), [](const Token &a, const Token &b) { return a.made < b.made; });
  return list;
}

std::optional<Token> Tokens::Find(const std::string &text) {
  if (!IsHex(text, 2 * kSecretBytes)) {
    return std::nullopt;
  }
  const std::string digest = DigestOf(text);
  const std::int64_t now = std::time(nullptr);
  const std::lock_guard lock(mutex_);
  auto found = tokens_.find(digest);
  if (found == tokens_.end()) {
    ReadAgain();
    found = tokens_.find(digest);
  }
  if (found == tokens_.end() || now >= found->second.expires || now < found->second.made) {
    return std::nullopt;
  }
  found->second.used = now;
  usedSinceSaved_ = true;
  return found->second;
}

void Tokens::SaveUse() {
  const std::lock_guard lock(mutex_);
  if (!std::exchange(usedSinceSaved_, false)) {
    return;
  }
  folder_.Change(kFile, [this](const std::string &old, std::string &fresh) {
    Map tokens = ParseTokens(old);
    for (auto &[digest, token] : tokens) {
      const auto known = tokens_.find(digest);
      token.used = std::max(token.used, known == tokens_.end() ? 0 : known->second.used);
    }
    fresh = TokensText(tokens);
    return true;
  });
  ReadAgain();
}

} // namespace vornwebapi
