#include "webapi/password.h"

#include "webapi/random.h"

#include <sodium.h>

#include <array>
#include <cstdint>
#include <string_view>

namespace vornwebapi {
namespace {

// RFC 9106, section 4, asks for 64 MiB and three passes where memory is scarce; a small machine has less to spare.
constexpr unsigned long long kPasses = 3;
constexpr size_t kMemory = 32UL * 1024 * 1024; // bytes

} // namespace

/// A place before the hasher, and then the hasher itself.
class PasswordHasher::Turn {
public:
  explicit Turn(PasswordHasher &hasher) : hasher_(hasher) {
    std::unique_lock lock(hasher_.mutex_);
    if (hasher_.inside_ >= hasher_.most_) {
      return;
    }
    ++hasher_.inside_;
    admitted_ = true;
    hasher_.free_.wait(lock, [this] { return !hasher_.working_; });
    hasher_.working_ = true;
  }
  Turn(const Turn &) = delete;
  Turn &operator=(const Turn &) = delete;
  ~Turn() {
    if (admitted_) {
      const std::lock_guard lock(hasher_.mutex_);
      --hasher_.inside_;
      hasher_.working_ = false;
      hasher_.free_.notify_one();
    }
  }
  bool Admitted() const { return admitted_; }

private:
  PasswordHasher &hasher_;
  bool admitted_ = false;
};

std::optional<std::string> PasswordHasher::Hash(const std::string &password) {
  const Turn turn(*this);
  std::array<char, crypto_pwhash_STRBYTES> hash{};
  if (!turn.Admitted() || crypto_pwhash_str_alg(hash.data(), password.data(), password.size(), kPasses, kMemory,
                                                crypto_pwhash_ALG_ARGON2ID13) != 0) {
    return std::nullopt;
  }
  return std::string(hash.data());
}

std::optional<bool> PasswordHasher::Matches(const std::string &password, const std::string &hash) {
  const Turn turn(*this);
  if (!turn.Admitted()) {
    return std::nullopt;
  }
  return crypto_pwhash_str_verify(hash.c_str(), password.data(), password.size()) == 0;
}

std::string RandomPassword() {
  constexpr std::string_view kLetters = "abcdefghjkmnpqrstuvwxyz23456789";
  constexpr size_t kLength = 20; // 4.95 bits each
  std::string password;
  for (size_t at = 0; at < kLength; ++at) {
    password += kLetters[randombytes_uniform(static_cast<uint32_t>(kLetters.size()))];
  }
  return password;
}

std::string DigestOf(const std::string &secret) {
  std::array<unsigned char, crypto_generichash_BYTES> digest{};
  crypto_generichash(digest.data(), digest.size(), reinterpret_cast<const unsigned char *>(secret.data()),
                     secret.size(), nullptr, 0);
  return HexDigits(digest.data(), digest.size());
}

bool SameSecret(const std::string &a, const std::string &b) {
  return a.size() == b.size() && sodium_memcmp(a.data(), b.data(), a.size()) == 0;
}

} // namespace vornwebapi
