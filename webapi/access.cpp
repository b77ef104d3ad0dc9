#include "webapi/access.h"

#include "webapi/config.h"
#include "webapi/text.h"

#include <sodium.h>

#include <algorithm>
#include <array>
#include <utility>

namespace vornwebapi {
namespace {

constexpr size_t kMostTokens = 32;

struct OwnPath {
  std::string_view path;
  OwnCall call;
};

// None has the form of a row's path, which has three parts behind "/webapi/".
constexpr std::array<OwnPath, 9> kOwnPaths = {{{"/webapi/login", OwnCall::kLogin},
                                               {"/webapi/logout", OwnCall::kLogout},
                                               {"/webapi/session", OwnCall::kSession},
                                               {"/webapi/password", OwnCall::kPassword},
                                               {"/webapi/tokens/list", OwnCall::kTokenList},
                                               {"/webapi/tokens/make", OwnCall::kTokenMake},
                                               {"/webapi/tokens/revoke", OwnCall::kTokenRevoke},
                                               {"/openapi.json", OwnCall::kDocument},
                                               {"/metrics", OwnCall::kMetrics}}};

constexpr bool InOrder() {
  size_t place = 0;
  for (const OwnPath &each : kOwnPaths) {
    if (static_cast<size_t>(each.call) != ++place) {
      return false;
    }
  }
  return true;
}
static_assert(InOrder(), "OwnPaths promises it");

OwnCall FindOwn(std::string_view target) {
  const auto *found =
      std::find_if(kOwnPaths.begin(), kOwnPaths.end(), [target](const OwnPath &each) { return each.path == target; });
  return found == kOwnPaths.end() ? OwnCall::kNone : found->call;
}

/// A browser says where a request comes from; a program says nothing.
bool FromElsewhere(const RequestHead &head, const Peer &peer) {
  const std::string own = (peer.secure ? "https://" : "http://") + Lower(head.host);
  const bool origin = head.origin.empty() || (head.origin.size() == 1 && Lower(head.origin.front()) == own);
  const bool site =
      head.fetchSite.empty() ||
      (head.fetchSite.size() == 1 && (head.fetchSite.front() == "same-origin" || head.fetchSite.front() == "none"));
  return !origin || !site;
}

/// What lies outside "/webapi" is the page's, and the page is everyone's.
bool OfPage(const RequestHead &head) {
  constexpr std::string_view kCalls = "/webapi";
  return (head.method == "GET" || head.method == "HEAD") && head.target.compare(0, kCalls.size(), kCalls) != 0;
}

/// A link on another site may lead to the page; nothing of the page may be made part of another site's.
bool Navigates(const RequestHead &head) {
  return head.origin.empty() && head.fetchMode == std::vector<std::string>{"navigate"} &&
         head.fetchDest == std::vector<std::string>{"document"};
}

std::optional<std::string> BearerToken(const RequestHead &head) {
  constexpr std::string_view kScheme = "bearer ";
  if (head.authorization.size() != 1 || Lower(head.authorization.front().substr(0, kScheme.size())) != kScheme) {
    return std::nullopt;
  }
  return head.authorization.front().substr(kScheme.size());
}

} // namespace

std::vector<std::string> OwnPaths() {
  std::vector<std::string> paths;
  paths.reserve(kOwnPaths.size());
  for (const OwnPath &each : kOwnPaths) {
    paths.emplace_back(each.path);
  }
  return paths;
}

bool Reads(std::string_view target) {
  constexpr std::array<std::string_view, 4> kReading = {"get", "getcount", "test", "tablesget"};
  const std::string_view method = target.substr(target.rfind('/') + 1);
  return std::find(kReading.begin(), kReading.end(), method) != kReading.end();
}

std::optional<std::string> FindCookie(const std::vector<std::string> &fields, std::string_view name) {
  std::optional<std::string> value;
  for (const std::string &field : fields) {
    std::string_view rest = field;
    while (!rest.empty()) {
      const size_t end = std::min(rest.find(';'), rest.size());
      const std::string_view pair = Trim(rest.substr(0, end));
      rest.remove_prefix(std::min(end + 1, rest.size()));
      const size_t equals = std::min(pair.find('='), pair.size());
      if (pair.substr(0, equals) != name) {
        continue;
      }
      if (value) {
        return std::nullopt; // which of the two is the browser's own, nobody can tell
      }
      value = pair.substr(std::min(equals + 1, pair.size()));
    }
  }
  return value;
}

Access::Access(const Config &config)
    : sodium_(sodium_init()), folder_(config.state),
      account_(folder_, {config.loginFailures, config.loginDelay,
                         // waiting logins hold slots: half of them are for other calls
                         std::min(config.loginQueue, config.slots / 2)}),
      sessions_({config.sessions, config.sessionIdleTime, config.sessionTime}), tokens_(folder_, kMostTokens) {}

bool Access::Open(std::string &firstPassword, std::string &fault) {
  if (sodium_ < 0) {
    fault = "no random numbers";
    return false;
  }
  return folder_.Open(fault) && account_.Open(firstPassword, fault) && tokens_.Open(fault);
}

std::optional<Caller> Access::Identify(const RequestHead &head, const Peer &peer, OwnCall own,
                                       std::optional<Answer> &refused) {
  if (!head.authorization.empty()) {
    const std::optional<std::string> text = BearerToken(head);
    const std::optional<Token> token = text ? tokens_.Find(*text) : std::nullopt;
    if (!token) {
      refused = NotLoggedIn();
      return std::nullopt;
    }
    return Caller("token " + token->id + " " + token->name, "", *text, token->writes);
  }
  const std::optional<std::string> cookie = FindCookie(head.cookies, CookieName(peer.secure));
  const std::optional<std::string> csrf = cookie ? sessions_.Find(*cookie) : std::nullopt;
  if (!csrf) {
    refused = NotLoggedIn();
    return std::nullopt;
  }
  // Asking for the session tells the page its token: it changes nothing, and no other site can read the answer.
  if (own == OwnCall::kSession) {
    return Caller(kAdministrator, *cookie, "", false);
  }
  if (head.csrf.size() != 1 || !SameSecret(head.csrf.front(), *csrf)) {
    refused = Forbidden("the X-CSRF-Token of this session is missing");
    return std::nullopt;
  }
  return Caller(kAdministrator, *cookie, "", true);
}

Decision Access::Decide(const RequestHead &head, const Peer &peer) {
  Decision decision;
  decision.own = FindOwn(head.target);
  decision.page = decision.own == OwnCall::kNone && OfPage(head);
  if (FromElsewhere(head, peer) && !(decision.page && Navigates(head))) {
    decision.refused = Forbidden("the request comes from another site");
    return decision;
  }
  if (decision.page || decision.own == OwnCall::kLogin) {
    return decision;
  }
  decision.caller = Identify(head, peer, decision.own, decision.refused);
  if (!decision.caller) {
    return decision;
  }
  const Caller &caller = *decision.caller;
  if (!caller.session_.empty()) {
    const bool permitted =
        decision.own == OwnCall::kPassword || decision.own == OwnCall::kLogout || decision.own == OwnCall::kSession;
    if (account_.MustChange() && !permitted) {
      decision.refused = Forbidden("the first password must be changed");
    }
  } else if (decision.own != OwnCall::kNone && !IsReport(decision.own)) {
    decision.refused = Forbidden("this is for the administrator in person");
  } else if (decision.own == OwnCall::kNone && !caller.writes_ && !Reads(head.target)) {
    decision.refused = Forbidden("this token may only read");
  }
  return decision;
}

bool Access::Stands(const Caller &caller) {
  return caller.session_.empty() ? tokens_.Find(caller.token_).has_value()
                                 : sessions_.Find(caller.session_).has_value();
}

void Access::Touch(const Caller &caller) {
  if (!caller.session_.empty()) {
    sessions_.Touch(caller.session_);
  }
}

} // namespace vornwebapi
