// Who may do what: the one place that decides it, before a request is routed.
#ifndef WEBAPI_ACCESS_H
#define WEBAPI_ACCESS_H

#include "webapi/account.h"
#include "webapi/answer.h"
#include "webapi/login_sessions.h"
#include "webapi/request_head.h"
#include "webapi/state_folder.h"
#include "webapi/tokens.h"

#include <optional>
#include <string>
#include <string_view>

namespace vornwebapi {

struct Config;

/// What is known of a connection's two ends.
struct Peer {
  int serverPort = 0;
  bool secure = false;
  std::string from; ///< the client's address as text
};

/// Someone who was let through. Only Access makes one, and without one nothing is called.
class Caller {
public:
  const std::string &User() const { return user_; }
  const std::string &SessionId() const { return session_; } ///< empty for a program

private:
  friend class Access;
  Caller(std::string user, std::string session, std::string token, bool writes)
      : user_(std::move(user)), session_(std::move(session)), token_(std::move(token)), writes_(writes) {}

  std::string user_;
  std::string session_;
  std::string token_;
  bool writes_;
};

/// The server's own calls, beside the module's rows.
enum class OwnCall {
  kNone,
  kLogin,
  kLogout,
  kSession,
  kPassword,
  kTokenList,
  kTokenMake,
  kTokenRevoke,
  kDocument, ///< these two are read with GET, with a token too
  kMetrics
};

/// Tells of the server and changes nothing.
inline bool IsReport(OwnCall call) {
  return call == OwnCall::kDocument || call == OwnCall::kMetrics;
}

/// The paths of the own calls, each at the place that its OwnCall has behind kNone.
std::vector<std::string> OwnPaths();

/// Whether it goes on with a request.
struct Decision {
  std::optional<Answer> refused;
  std::optional<Caller> caller; ///< none with kLogin and for the page
  OwnCall own = OwnCall::kNone;
  bool page = false; ///< one of the page's files is asked for, or what is none: nothing is called
};

/// @return true for methods that change nothing: "get", "getcount", "test" and "tablesget"
bool Reads(std::string_view target);

/// Every member may be called from any thread.
class Access {
public:
  explicit Access(const Config &config);

  /// Reads the state, or makes it.
  /// @param[out] firstPassword  of an administrator that was just made; else empty
  bool Open(std::string &firstPassword, std::string &fault);

  Decision Decide(const RequestHead &head, const Peer &peer);
  /// A body may have taken its time: still logged in, the token still good?
  bool Stands(const Caller &caller);
  /// After a call that was no polling: the person is there.
  void Touch(const Caller &caller);

  Account &TheAccount() { return account_; }
  LoginSessions &Sessions() { return sessions_; }
  Tokens &TheTokens() { return tokens_; }
  const StateFolder &State() const { return folder_; }

private:
  std::optional<Caller> Identify(const RequestHead &head, const Peer &peer, OwnCall own,
                                 std::optional<Answer> &refused);

  int sodium_; // below 0: the library cannot be used
  StateFolder folder_;
  Account account_;
  LoginSessions sessions_;
  Tokens tokens_;
};

/// The session cookie's name; the prefix binds it to this host and to TLS (RFC 6265bis, section 4.1.3).
inline std::string_view CookieName(bool secure) {
  return secure ? "__Host-vorn-session" : "vorn-session";
}

/// @return the value of the one cookie of that name; none when there is none or more than one
std::optional<std::string> FindCookie(const std::vector<std::string> &fields, std::string_view name);

} // namespace vornwebapi

#endif
