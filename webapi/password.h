// Hashing of passwords: slow on purpose, and never much of it at once.
#ifndef WEBAPI_PASSWORD_H
#define WEBAPI_PASSWORD_H

#include <condition_variable>
#include <cstddef>
#include <mutex>
#include <optional>
#include <string>

namespace vornwebapi {

/// argon2id with 32 MiB. One hash is made at a time; a bounded number of callers waits for its turn.
class PasswordHasher {
public:
  /// @param[in] waiting  callers that may wait beside the one at work
  explicit PasswordHasher(size_t waiting) : most_(waiting + 1) {}

  /// @return none when too many wait, or there is no memory
  std::optional<std::string> Hash(const std::string &password);
  std::optional<bool> Matches(const std::string &password, const std::string &hash);

private:
  class Turn;

  const size_t most_;
  std::mutex mutex_;
  std::condition_variable free_;
  size_t inside_ = 0;
  bool working_ = false;
};

/// A password for the first login: 100 bits, in letters and digits that are not mistaken for each other.
std::string RandomPassword();

/// BLAKE2b-256 as hexadecimal digits: of a random text of 128 bits or more, which it hides, or of a file. Not for
/// passwords.
std::string DigestOf(const std::string &secret);

/// Equal, in a time that depends on the lengths only.
bool SameSecret(const std::string &a, const std::string &b);

} // namespace vornwebapi

#endif
