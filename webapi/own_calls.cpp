#include "webapi/own_calls.h"

#include "webapi/json_writer.h"
#include "webapi/log.h"

#include <utility>

namespace vornwebapi {
namespace {

constexpr size_t kShortestPassword = 8; // NIST SP 800-63B, section 5.1.1.2
constexpr size_t kLongestPassword = 256;
constexpr int kMostDays = 3650;
constexpr std::int64_t kDay = 86'400; // seconds

Answer Done(const Json::Value &data = Json::Value(Json::objectValue)) {
  Json::Value body(Json::objectValue);
  body["success"] = true;
  body["data"] = data;
  std::string text;
  WriteJson(body, text);
  return Answered(std::move(text));
}

std::string Cookie(bool secure, const std::string &value) {
  return std::string(CookieName(secure)) + '=' + value + "; Path=/; HttpOnly; SameSite=Strict" +
         (secure ? "; Secure" : "") + (value.empty() ? "; Max-Age=0" : "");
}

/// What came of a try at the password, when it was not right.
Answer Refuse(Account::Verdict verdict, Account &account, const Peer &peer, const char *what) {
  switch (verdict) {
  case Account::Verdict::kWrong:
    Log(LogKind::kRefusedLogin, "%s from %s refused: wrong user name or password", what, peer.from.c_str());
    return WrongPassword();
  case Account::Verdict::kLater:
    Log(LogKind::kLoginLimit, "%s from %s refused: too many wrong ones before", what, peer.from.c_str());
    return TooManyTries(account.Wait());
  case Account::Verdict::kBusy:
    Log(LogKind::kLoginLimit, "%s from %s refused: too many at once", what, peer.from.c_str());
    return TooManyTries(1);
  default:
    return HandlerFailed();
  }
}

/// What a page must know of its session.
Json::Value Describe(const std::string &csrf, Account &account) {
  Json::Value data(Json::objectValue);
  data["user"] = kAdministrator;
  data["csrf"] = csrf;
  data["must_change"] = account.MustChange();
  return data;
}

Answer Login(Access &access, const Peer &peer, const RequestHead &head, const Json::Value &parameters) {
  if (!parameters["user"].isString() || !parameters["password"].isString()) {
    return BadBody("user and password are texts");
  }
  Account &account = access.TheAccount();
  const Account::Verdict verdict = account.Check(parameters["user"].asString(), parameters["password"].asString());
  if (verdict != Account::Verdict::kRight) {
    return Refuse(verdict, account, peer, "a login");
  }
  if (const auto old = FindCookie(head.cookies, CookieName(peer.secure))) {
    access.Sessions().End(*old);
  }
  const auto made = access.Sessions().Make();
  if (!made) {
    return HandlerFailed();
  }
  Log(LogKind::kLogin, "%s logged in from %s", kAdministrator, peer.from.c_str());
  Answer answer = Done(Describe(made->csrf, account));
  answer.cookie = Cookie(peer.secure, made->id);
  return answer;
}

Answer TellSession(Access &access, const Caller &caller) {
  const std::optional<std::string> csrf = access.Sessions().Find(caller.SessionId());
  return csrf ? Done(Describe(*csrf, access.TheAccount())) : NotLoggedIn();
}

Answer Logout(Access &access, const Caller &caller, const Peer &peer) {
  access.Sessions().End(caller.SessionId());
  Answer answer = Done();
  answer.cookie = Cookie(peer.secure, "");
  return answer;
}

Answer ChangePassword(Access &access, const Peer &peer, const Json::Value &parameters) {
  if (!parameters["old"].isString() || !parameters["new"].isString()) {
    return BadBody("old and new are texts");
  }
  const std::string old = parameters["old"].asString();
  const std::string fresh = parameters["new"].asString();
  if (fresh.size() < kShortestPassword || fresh.size() > kLongestPassword || fresh == old) {
    return BadBody("new is 8 to 256 bytes and not the old one");
  }
  Account &account = access.TheAccount();
  Account::Verdict verdict = account.Check(kAdministrator, old);
  if (verdict == Account::Verdict::kRight) {
    verdict = account.Change(fresh);
  }
  if (verdict != Account::Verdict::kRight) {
    return Refuse(verdict, account, peer, "a change of the password");
  }
  access.Sessions().EndAll();
  Log(LogKind::kChange, "%s from %s changed the password", kAdministrator, peer.from.c_str());
  Answer answer = Done();
  answer.cookie = Cookie(peer.secure, "");
  return answer;
}

Answer ListTokens(Access &access) {
  Json::Value list(Json::arrayValue);
  for (const Token &token : access.TheTokens().List()) {
    Json::Value each(Json::objectValue);
    each["id"] = token.id;
    each["name"] = token.name;
    each["access"] = token.writes ? "full" : "read";
    each["made"] = Json::Int64(token.made);
    each["expires"] = Json::Int64(token.expires);
    each["used"] = token.used == 0 ? Json::Value() : Json::Value(Json::Int64(token.used));
    list.append(std::move(each));
  }
  return Done(list);
}

Answer MakeToken(Access &access, const Peer &peer, const Json::Value &parameters) {
  const Json::Value &name = parameters["name"];
  const Json::Value &kind = parameters["access"];
  const Json::Value &days = parameters["days"];
  if (!name.isString() || !Tokens::GoodName(name.asString())) {
    return BadBody("name is 1 to 64 letters, digits, - _ and .");
  }
  if (kind != "read" && kind != "full") {
    return BadBody("access is read or full");
  }
  if (!days.isInt() || days.asInt() < 1 || days.asInt() > kMostDays) {
    return BadBody("days is 1 to 3650");
  }
  Json::Value data(Json::objectValue);
  std::string id;
  std::string text;
  switch (access.TheTokens().Make(name.asString(), kind == "full", days.asInt() * kDay, id, text)) {
  case Tokens::Result::kDone:
    Log(LogKind::kChange, "%s from %s made token %s %s", kAdministrator, peer.from.c_str(), id.c_str(),
        name.asCString());
    data["id"] = id;
    data["token"] = text;
    return Done(data);
  case Tokens::Result::kTooMany:
    return BadBody("there are too many tokens");
  default:
    return HandlerFailed();
  }
}

Answer RevokeToken(Access &access, const Peer &peer, const Json::Value &parameters) {
  if (!parameters["id"].isString()) {
    return BadBody("id is a text");
  }
  switch (access.TheTokens().Revoke(parameters["id"].asString())) {
  case Tokens::Result::kDone:
    Log(LogKind::kChange, "%s from %s revoked token %s", kAdministrator, peer.from.c_str(), // its id is ours
        parameters["id"].asCString());
    return Done();
  case Tokens::Result::kUnknown:
    return BadBody("there is no such token");
  default:
    return HandlerFailed();
  }
}

} // namespace

Answer RunOwnCall(OwnCall call, Access &access, const Caller *caller, const Peer &peer, const RequestHead &head,
                  const Json::Value &parameters) {
  if (call == OwnCall::kLogin) {
    return Login(access, peer, head, parameters);
  }
  if (caller == nullptr) {
    return NotLoggedIn();
  }
  switch (call) {
  case OwnCall::kLogout:
    return Logout(access, *caller, peer);
  case OwnCall::kSession:
    return TellSession(access, *caller);
  case OwnCall::kPassword:
    return ChangePassword(access, peer, parameters);
  case OwnCall::kTokenList:
    return ListTokens(access);
  case OwnCall::kTokenMake:
    return MakeToken(access, peer, parameters);
  case OwnCall::kTokenRevoke:
    return RevokeToken(access, peer, parameters);
  default:
    return NotFound();
  }
}

} // namespace vornwebapi
