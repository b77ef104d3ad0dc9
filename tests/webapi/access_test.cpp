// Who is let through, and who is not.
#include "tests/webapi/access_fixture.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>

using vorntest::AccessTest;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::kEcho;
using vorntest::kPassword;
using vorntest::ParseJson;
using vorntest::Person;
using vorntest::ServerProcess;

namespace {

TEST_F(AccessTest, TheStateIsItsOwnersAlone) {
  struct stat info {};
  ASSERT_EQ(stat(folder_.Path("state").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 07777U, 0700U);
  for (const char *name : {"password", "first-password"}) {
    ASSERT_EQ(stat(State(name).c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777U, 0600U);
  }
  std::string stored;
  std::getline(std::ifstream(State("password")), stored);
  EXPECT_EQ(stored.rfind("$argon2id$", 0), 0U) << stored;
}

TEST_F(AccessTest, TheFirstPasswordMustBeChanged) {
  const Person person = Login(first_);
  ExpectRefusal(Send(kEcho, person.Fields()), 403);
  ExpectRefusal(Send("tokens/make", person.Fields(), R"({"name":"t","days":1,"access":"full"})"), 403);
  const Person entered = Enter();
  EXPECT_EQ(Send(kEcho, entered.Fields()).status, 200);
  EXPECT_NE(access(State("first-password").c_str(), F_OK), 0);
  ExpectRefusal(Send("login", "", LoginBody(first_)), 401);
}

TEST_F(AccessTest, APageThatIsLoadedAnewIsToldItsSession) {
  const Person first = Login(first_);
  const std::string cookie = "Cookie: vorn-session=" + first.cookie + "\r\n";
  EXPECT_EQ(ParseJson(Send("session", cookie).body)["data"],
            ParseJson(R"({"user":"admin","must_change":true,"csrf":")" + first.csrf + "\"}"));
  ExpectRefusal(Send("session", ""), 401);
  ExpectRefusal(Send("session", "X-CSRF-Token: " + first.csrf + "\r\n"), 401);
  ExpectRefusal(Send("session", cookie + "Origin: http://evil.example\r\n"), 403);
  ExpectRefusal(Send("session", cookie + "Sec-Fetch-Site: same-site\r\n"), 403);
  ExpectRefusal(Send("session", cookie, "", "GET"), 405);
  ExpectRefusal(Send(kEcho, cookie), 403); // what it needs no token for is this call alone
  const Person entered = Enter();
  ExpectRefusal(Send("session", cookie), 401); // the password was changed
  const std::string now = "Cookie: vorn-session=" + entered.cookie + "\r\n";
  EXPECT_EQ(ParseJson(Send("session", now).body)["data"]["must_change"], false);
  ExpectRefusal(Send("session", "Authorization: Bearer " + MakeToken(entered, "full") + "\r\n"), 403);
}

TEST_F(AccessTest, WithoutASessionNothingIsReached) {
  const Person person = Enter();
  const std::string cookie = "Cookie: vorn-session=" + person.cookie + "\r\n";
  const std::string csrf = "X-CSRF-Token: " + person.csrf + "\r\n";
  const Person other = Login(kPassword);
  for (const char *path : {kEcho, "VORN.Test.None/1/get", "logout", "tokens/list", "x"}) {
    ExpectRefusal(Send(path, ""), 401);
    ExpectRefusal(Send(path, csrf + "Cookie: vorn-session=\r\n"), 401);
    ExpectRefusal(Send(path, csrf + "Cookie: vorn-session=" + person.cookie + "0\r\n"), 401);
    ExpectRefusal(Send(path, csrf + "Cookie: vorn-session=" + person.cookie.substr(1) + "\r\n"), 401);
    ExpectRefusal(Send(path, csrf + "Cookie: vorn-session=x; vorn-session=" + person.cookie + "\r\n"), 401);
    ExpectRefusal(Send(path, csrf + "Cookie: vorn-session=" + person.cookie + "; vorn-session=x\r\n"), 401);
    ExpectRefusal(Send(path, csrf + cookie + "Cookie: vorn-session=x\r\n"), 401);
    ExpectRefusal(Send(path, "Authorization: Bearer " + person.cookie + "\r\n"), 401);
    ExpectRefusal(Send(path, person.Fields() + "Authorization: Basic YTpi\r\n"), 401);
    ExpectRefusal(Send(path, cookie), 403);
    ExpectRefusal(Send(path, cookie + "X-CSRF-Token: " + other.csrf + "\r\n"), 403);
    ExpectRefusal(Send(path, cookie + csrf + csrf), 403);
  }
  EXPECT_EQ(Send(kEcho, person.Fields()).status, 200);
  ExpectRefusal(Send(kEcho, person.Fields() + "X-HTTP-Method-Override: POST\r\n", "", "GET"), 405);
}

TEST_F(AccessTest, OtherSitesAreRefusedBeforeAnything) {
  const Person person = Enter();
  for (const char *fields : {"Origin: http://evil.example\r\n", "Origin: null\r\n", "Origin: https://localhost\r\n",
                             "Origin: http://localhost\r\nOrigin: http://localhost\r\n",
                             "Sec-Fetch-Site: cross-site\r\n", "Sec-Fetch-Site: same-site\r\n"}) {
    ExpectRefusal(Send(kEcho, person.Fields() + fields), 403);
    ExpectRefusal(Send("login", fields, LoginBody(kPassword)), 403);
  }
  EXPECT_EQ(Send(kEcho, person.Fields() + "Origin: http://localhost\r\nSec-Fetch-Site: same-origin\r\n").status, 200);
}

TEST_F(AccessTest, LogoutAndPasswordChangeEndSessions) {
  const Person gone = Enter();
  EXPECT_EQ(Send("logout", gone.Fields()).status, 200);
  ExpectRefusal(Send(kEcho, gone.Fields()), 401);
  const Person one = Login(kPassword);
  const Person two = Login(kPassword);
  EXPECT_EQ(Send("password", one.Fields(), R"({"old":"correct horse","new":"another horse"})").status, 200);
  ExpectRefusal(Send(kEcho, one.Fields()), 401);
  ExpectRefusal(Send(kEcho, two.Fields()), 401);
}

TEST_F(AccessTest, ALoginMakesANewSession) {
  Enter();
  const Person person = Login(kPassword, "Cookie: vorn-session=chosen\r\n");
  EXPECT_NE(person.cookie, "chosen");
  EXPECT_EQ(person.cookie.size(), 64U);
  ExpectRefusal(Send(kEcho, "Cookie: vorn-session=chosen\r\nX-CSRF-Token: " + person.csrf + "\r\n"), 401);
  Login(kPassword, person.Fields());
  ExpectRefusal(Send(kEcho, person.Fields()), 401);
}

TEST_F(AccessTest, UserAndPasswordAreToldApartByNobody) {
  Enter();
  const HttpAnswer wrong = Send("login", "", LoginBody("wrong"));
  const HttpAnswer unknown = Send("login", "", LoginBody(kPassword, "nobody"));
  ExpectRefusal(wrong, 401);
  EXPECT_EQ(wrong.body, unknown.body);
  ExpectRefusal(Send("login", "", LoginBody(std::string(kPassword) + "\\u0000x")), 401);
  EXPECT_EQ(server_.Log().find(kPassword), std::string::npos);
}

TEST_F(AccessTest, LoginBodiesAreBounded) {
  ExpectRefusal(Send("login", "", LoginBody(std::string(5000, 'x'))), 413);
  for (const char *body : {"{}", R"({"user":"admin"})", R"({"user":1,"password":[]})", R"(["admin"])"}) {
    ExpectRefusal(Send("login", "", body), 400);
  }
}

TEST_F(AccessTest, AReadingTokenOnlyReads) {
  const Person person = Enter();
  const std::string reads = "Authorization: Bearer " + MakeToken(person, "read") + "\r\n";
  const std::string writes = "Authorization: Bearer " + MakeToken(person, "full") + "\r\n";
  EXPECT_EQ(Send(kEcho, reads).status, 200);
  ExpectRefusal(Send("VORN.Test.Callback/1/set", reads), 403);
  EXPECT_EQ(Send("VORN.Test.Callback/1/set", writes).status, 200);
  ExpectRefusal(Send("tokens/make", writes, R"({"name":"t","days":1,"access":"full"})"), 403);
  ExpectRefusal(Send("password", writes, R"({"old":"correct horse","new":"another horse"})"), 403);
  const Json::Value list = ParseJson(Send("tokens/list", person.Fields()).body)["data"];
  ASSERT_EQ(list.size(), 2U);
  for (const Json::Value &token : list) {
    EXPECT_TRUE(token["used"].isIntegral());
    EXPECT_EQ(Send("tokens/revoke", person.Fields(), R"({"id":")" + token["id"].asString() + "\"}").status, 200);
  }
  ExpectRefusal(Send(kEcho, reads), 401);
  ExpectRefusal(Send(kEcho, writes), 401);
}

TEST_F(AccessTest, AnExpiredTokenIsNone) {
  const Person person = Enter();
  const std::string field = "Authorization: Bearer " + MakeToken(person, "full") + "\r\n";
  server_.Stop();
  std::string id;
  std::string digest;
  std::ifstream(State("tokens")) >> id >> digest;
  std::ofstream(State("tokens")) << id << ' ' << digest << " full 1 2 0 t\n";
  ServerProcess again({.options = Options({}), .knownState = false});
  HttpClient client(again.Port());
  ExpectRefusal(
      client.Exchange(std::string("POST /webapi/") + kEcho + " HTTP/1.1\r\nHost: localhost\r\n" + field + "\r\n"), 401);
}

TEST_F(AccessTest, AfterTenFailuresEachTryWaits) {
  const Person person = Enter();
  for (int count = 0; count < 10; ++count) {
    ExpectRefusal(Send("login", "", LoginBody("wrong")), 401);
  }
  HttpAnswer later = Send("login", "", LoginBody(kPassword));
  ExpectRefusal(later, 429);
  EXPECT_GT(std::stoi(later.fields["retry-after"]), 50);
  EXPECT_EQ(Send(kEcho, person.Fields()).status, 200);
}

class ShortSessionTest : public AccessTest {
protected:
  ShortSessionTest() : AccessTest({"--session-idle-time", "1500ms"}) {}
};

TEST_F(ShortSessionTest, PollingDoesNotKeepASession) {
  const Person person = Enter();
  const Person active = Login(kPassword);
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(2);
  while (std::chrono::steady_clock::now() < end) {
    EXPECT_EQ(Send(kEcho, active.Fields()).status, 200);
    Send(kEcho, person.Fields() + "X-Poll: 1\r\n");
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
  }
  ExpectRefusal(Send(kEcho, person.Fields()), 401);
  EXPECT_EQ(Send(kEcho, active.Fields()).status, 200);
}

} // namespace
