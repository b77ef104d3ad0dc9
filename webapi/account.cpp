#include "webapi/account.h"

#include <optional>
#include <sstream>

namespace vornwebapi {
namespace {

constexpr const char *kFile = "password";            // "<hash> kept|first"
constexpr const char *kFirstFile = "first-password"; // in clear, until it is changed

} // namespace

bool Account::Open(std::string &firstPassword, std::string &fault) {
  std::string text;
  if (!folder_.Has(kFile)) {
    firstPassword = RandomPassword();
    const std::optional<std::string> hash = hasher_.Hash(firstPassword);
    // The password in clear first: an account whose password nobody can know would be worse.
    if (!hash || !folder_.Write(kFirstFile, firstPassword + '\n') || !Store(*hash, true)) {
      fault = folder_.Path(kFile) + ": cannot be written";
      return false;
    }
    return true;
  }
  std::string kept;
  if (folder_.Read(kFile, text)) {
    std::istringstream(text) >> hash_ >> kept;
  }
  mustChange_ = kept == "first";
  if (hash_.empty() || (kept != "kept" && kept != "first")) {
    fault = folder_.Path(kFile) + ": cannot be read";
    return false;
  }
  return true;
}

bool Account::Store(const std::string &hash, bool mustChange) {
  if (!folder_.Write(kFile, hash + (mustChange ? " first\n" : " kept\n"))) {
    return false;
  }
  const std::lock_guard lock(mutex_);
  hash_ = hash;
  mustChange_ = mustChange;
  return true;
}

// A try at work counts as a failure until it is known: a hundred at once are no way around the limit.
bool Account::AdmitTry() {
  const std::lock_guard lock(mutex_);
  if (failures_ + trying_ >= limits_.failures && (trying_ > 0 || Clock::now() < notBefore_)) {
    return false;
  }
  ++trying_;
  return true;
}

void Account::EndTry(bool wrong) {
  const std::lock_guard lock(mutex_);
  --trying_;
  if (wrong && ++failures_ >= limits_.failures) {
    notBefore_ = Clock::now() + limits_.delay;
  }
}

Account::Verdict Account::Check(const std::string &user, const std::string &password) {
  if (!AdmitTry()) {
    return Verdict::kLater;
  }
  std::string hash;
  {
    const std::lock_guard lock(mutex_);
    hash = hash_;
  }
  // An unknown user costs what a known one does: the same hash is worked on.
  const std::optional<bool> matches = hasher_.Matches(password, hash);
  const bool right = matches.value_or(false) && user == kAdministrator;
  EndTry(matches && !right);
  if (!matches) {
    return Verdict::kBusy;
  }
  if (right) {
    const std::lock_guard lock(mutex_);
    failures_ = 0;
  }
  return right ? Verdict::kRight : Verdict::kWrong;
}

Account::Verdict Account::Change(const std::string &password) {
  const std::optional<std::string> hash = hasher_.Hash(password);
  if (!hash) {
    return Verdict::kBusy;
  }
  if (!Store(*hash, false)) {
    return Verdict::kFailed;
  }
  folder_.Remove(kFirstFile);
  return Verdict::kRight;
}

bool Account::MustChange() const {
  const std::lock_guard lock(mutex_);
  return mustChange_;
}

unsigned Account::Wait() const {
  const std::lock_guard lock(mutex_);
  const auto left = std::chrono::ceil<std::chrono::seconds>(notBefore_ - Clock::now()).count();
  return left < 1 ? 1 : static_cast<unsigned>(left);
}

} // namespace vornwebapi
