#include "webapi/login_sessions.h"

#include "webapi/password.h"
#include "webapi/random.h"

#include <algorithm>

namespace vornwebapi {
namespace {

constexpr size_t kSecretBytes = 32;

} // namespace

// REQUIRES: mutex_ is held.
void LoginSessions::DropOld(Clock::time_point now) {
  for (auto at = sessions_.begin(); at != sessions_.end();) {
    const bool over = now - at->second.used >= limits_.idle || now - at->second.made >= limits_.absolute;
    at = over ? sessions_.erase(at) : std::next(at);
  }
}

std::optional<LoginSessions::Made> LoginSessions::Make() {
  Made made{RandomDigits(kSecretBytes), RandomDigits(kSecretBytes)};
  if (made.id.empty() || made.csrf.empty()) {
    return std::nullopt;
  }
  const Clock::time_point now = Clock::now();
  const std::lock_guard lock(mutex_);
  DropOld(now);
  if (sessions_.size() >= limits_.most) {
    sessions_.erase(std::min_element(sessions_.begin(), sessions_.end(),
                                     [](const auto &a, const auto &b) { return a.second.used < b.second.used; }));
  }
  sessions_[DigestOf(made.id)] = {made.csrf, now, now};
  return made;
}

std::optional<std::string> LoginSessions::Find(const std::string &id) {
  const std::lock_guard lock(mutex_);
  DropOld(Clock::now());
  const auto found = sessions_.find(DigestOf(id));
  return found == sessions_.end() ? std::nullopt : std::optional(found->second.csrf);
}

void LoginSessions::Touch(const std::string &id) {
  const std::lock_guard lock(mutex_);
  const auto found = sessions_.find(DigestOf(id));
  if (found != sessions_.end()) {
    found->second.used = Clock::now();
  }
}

void LoginSessions::End(const std::string &id) {
  const std::lock_guard lock(mutex_);
  sessions_.erase(DigestOf(id));
}

void LoginSessions::EndAll() {
  const std::lock_guard lock(mutex_);
  sessions_.clear();
}

size_t LoginSessions::Count() {
  const std::lock_guard lock(mutex_);
  DropOld(Clock::now());
  return sessions_.size();
}

} // namespace vornwebapi
