// Tokens of programs.
#ifndef WEBAPI_TOKENS_H
#define WEBAPI_TOKENS_H

#include "webapi/state_folder.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace vornwebapi {

/// What is known of a token; its text only its program knows.
struct Token {
  std::string id;
  std::string digest;
  bool writes = false;
  std::int64_t made = 0; ///< these: seconds since 1970
  std::int64_t expires = 0;
  std::int64_t used = 0; ///< 0: never
  std::string name;
};

/// Every member may be called from any thread, and two processes may change the file in turn.
class Tokens {
public:
  enum class Result { kDone, kTooMany, kUnknown, kFailed };

  Tokens(const StateFolder &folder, size_t most) : folder_(folder), most_(most) {}

  bool Open(std::string &fault);

  /// @param[in]  name     letters, digits, '-', '_' and '.': see GoodName
  /// @param[in]  seconds  it is good for
  /// @param[out] id       what it is listed and revoked by
  /// @param[out] text     what its program shows
  Result Make(const std::string &name, bool writes, std::int64_t seconds, std::string &id, std::string &text);
  Result Revoke(const std::string &id);
  std::vector<Token> List();

  /// @return the token of that text while it is good, noted as used now
  std::optional<Token> Find(const std::string &text);
  void SaveUse(); ///< writes down when each was used last

  static bool GoodName(const std::string &name);

private:
  using Map = std::map<std::string, Token>; // by digest

  void ReadAgain();
  void Take(Map tokens);

  const StateFolder &folder_;
  const size_t most_;
  std::mutex mutex_; // guards what follows
  Map tokens_;
  std::int64_t stamp_ = 0; // of the file that tokens_ is from
  bool usedSinceSaved_ = false;
};

/// The file's form: a line a token. A line that is none is left out.
std::map<std::string, Token> ParseTokens(const std::string &text);
std::string TokensText(const std::map<std::string, Token> &tokens);

} // namespace vornwebapi

#endif
