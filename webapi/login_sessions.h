// Who is logged in.
#ifndef WEBAPI_LOGIN_SESSIONS_H
#define WEBAPI_LOGIN_SESSIONS_H

#include <chrono>
#include <cstddef>
#include <map>
#include <mutex>
#include <optional>
#include <string>

namespace vornwebapi {

/// Sessions of people, in memory only. Every member may be called from any thread.
class LoginSessions {
public:
  using Clock = std::chrono::steady_clock;

  struct Limits {
    size_t most = 32;                        ///< then the one that was silent longest gives way
    std::chrono::milliseconds idle{600'000}; ///< without a call other than polling
    std::chrono::milliseconds absolute{86'400'000};
  };

  struct Made {
    std::string id; ///< 256 bits: the cookie
    std::string csrf;
  };

  explicit LoginSessions(const Limits &limits) : limits_(limits) {}

  /// @return none when the kernel gives no random numbers
  std::optional<Made> Make();
  /// @return the session's CSRF token; none when there is no such session any more. It is not made younger.
  std::optional<std::string> Find(const std::string &id);
  void Touch(const std::string &id); ///< its person is there
  void End(const std::string &id);
  void EndAll();
  size_t Count();

private:
  struct Session {
    std::string csrf;
    Clock::time_point made;
    Clock::time_point used;
  };
  using Map = std::map<std::string, Session>;

  void DropOld(Clock::time_point now);

  const Limits limits_;
  std::mutex mutex_;
  Map sessions_; // by the id's digest, so that comparing tells nothing of the id
};

} // namespace vornwebapi

#endif
