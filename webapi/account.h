// The administrator: one account, its password, and how often it may be guessed.
#ifndef WEBAPI_ACCOUNT_H
#define WEBAPI_ACCOUNT_H

#include "webapi/password.h"
#include "webapi/state_folder.h"

#include <chrono>
#include <cstddef>
#include <mutex>
#include <string>

namespace vornwebapi {

inline constexpr const char *kAdministrator = "admin";

/// Every member may be called from any thread.
class Account {
public:
  using Clock = std::chrono::steady_clock;

  enum class Verdict {
    kRight,
    kWrong, ///< the password or the user: nothing tells which
    kBusy,  ///< too many wait for the hasher
    kLater, ///< too many failures: see Wait
    kFailed ///< nothing was stored
  };

  struct Limits {
    size_t failures = 10;                    ///< as many are free
    std::chrono::milliseconds delay{60'000}; ///< from then on, one try each
    size_t waiting = 8;                      ///< for the hasher
  };

  Account(const StateFolder &folder, const Limits &limits)
      : folder_(folder), limits_(limits), hasher_(limits.waiting) {}

  /// Reads the account, or makes it with a random password.
  /// @param[out] firstPassword  the new account's; empty when there was one
  /// @param[out] fault          what is wrong
  bool Open(std::string &firstPassword, std::string &fault);

  /// One try at the password, for a login or for a change.
  Verdict Check(const std::string &user, const std::string &password);
  /// REQUIRES: Check said kRight for the old one.
  Verdict Change(const std::string &password);

  bool MustChange() const;
  /// With kLater: whole seconds until the next try, 1 at least.
  unsigned Wait() const;

private:
  bool AdmitTry();
  void EndTry(bool wrong);
  bool Store(const std::string &hash, bool mustChange);

  const StateFolder &folder_;
  const Limits limits_;
  PasswordHasher hasher_;
  mutable std::mutex mutex_; // guards what follows
  std::string hash_;
  bool mustChange_ = false;
  size_t failures_ = 0; // since the last right password
  size_t trying_ = 0;
  Clock::time_point notBefore_{};
};

} // namespace vornwebapi

#endif
