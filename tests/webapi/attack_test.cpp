// What others have met: logins, sessions, requests of other sites and values that are meant to break something. Each
// has its answer, and the same process serves the next good call.
#include "tests/webapi/access_fixture.h"

#include <algorithm>
#include <array>
#include <thread>

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

class AttackTest : public AccessTest {
protected:
  using AccessTest::AccessTest;
  void SetUp() override {
    AccessTest::SetUp();
    owner_ = Enter();
  }
  void TearDown() override {
    EXPECT_TRUE(server_.Running());
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(Send(kEcho, owner_.Fields()).status, 200);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(1));
    AccessTest::TearDown();
  }
  HttpAnswer Change(const Person &person, const std::string &from, const std::string &to) const {
    return Send("password", person.Fields(), R"({"old":")" + from + R"(","new":")" + to + "\"}");
  }
  bool Logged(const std::string &text) const { return server_.Log().find(text) != std::string::npos; }

  Person owner_;
};

TEST_F(AttackTest, FieldsOfALoginReachNeitherLogNorAddress) {
  const Person person =
      Login(kPassword, "User-Agent: () { :;}; id\r\nX-Forwarded-For: $(id)\r\nForwarded: for=$(id)\r\n");
  EXPECT_EQ(Send(kEcho, person.Fields()).status, 200);
  EXPECT_TRUE(Logged("admin logged in from 127.0.0.1"));
  EXPECT_FALSE(Logged("id)"));
  EXPECT_FALSE(Logged(":;}"));
  std::ifstream environment("/proc/" + std::to_string(server_.Pid()) + "/environ", std::ios::binary);
  const std::string variables(std::istreambuf_iterator<char>(environment), {});
  EXPECT_EQ(variables.find("$(id)"), std::string::npos);
}

TEST_F(AttackTest, NoTextFromOutsideMakesALogLine) {
  ExpectRefusal(Send("login", "", LoginBody("x\\nforged", "admin\\nvornwebd: forged line")), 401);
  ExpectRefusal(Send("x%0aforged", owner_.Fields()), 404);
  ExpectRefusal(Send("tokens/make", owner_.Fields(), R"({"name":"a\nforged","days":1,"access":"read"})"), 400);
  ExpectRefusal(Send("tokens/revoke", owner_.Fields(), R"({"id":"a\nforged"})"), 400);
  EXPECT_TRUE(server_.LogShows("a login from 127.0.0.1 refused"));
  EXPECT_FALSE(Logged("forged"));
}

TEST_F(AttackTest, NoAnswerShowsWhatWasSent) {
  for (const char *path : {"<script>alert(1)</script>", "VORN.Test.Echo/1/<svg>"}) {
    const HttpAnswer answer = Send(path, owner_.Fields());
    ExpectRefusal(answer, 404);
    EXPECT_EQ(answer.body.find('<'), std::string::npos);
    EXPECT_NE(answer.fields.at("content-security-policy").find("frame-ancestors 'none'"), std::string::npos);
    EXPECT_EQ(answer.fields.at("cache-control"), "no-store");
    EXPECT_EQ(answer.fields.at("x-frame-options"), "DENY");
    EXPECT_EQ(answer.fields.at("referrer-policy"), "no-referrer");
    EXPECT_EQ(answer.fields.at("cross-origin-opener-policy"), "same-origin");
    EXPECT_EQ(answer.fields.at("cross-origin-resource-policy"), "same-origin");
  }
  ExpectRefusal(Send(kEcho, owner_.Fields(), R"({"<svg onload=1>")"), 400);
}

TEST_F(AttackTest, NoWayOfWritingAPathComesBehindTheAccess) {
  const std::array<const char *, 9> targets = {"/webapi?x/static/",
                                               "//webapi/VORN.Test.Echo/1/get",
                                               "/static/..%2fwebapi/VORN.Test.Echo/1/get",
                                               "/webapi/.",
                                               "/WEBAPI/VORN.Test.Echo/1/get",
                                               "/webapi/VORN.Test.Echo/1/get%00.css",
                                               "/webapi/VORN.Test.Echo/1/get;x",
                                               "/webapi/login/../VORN.Test.Echo/1/get",
                                               "/webapi/login/VORN.Test.Echo/1/get"};
  for (const char *target : targets) {
    HttpClient client(server_.Port());
    const HttpAnswer answer = client.Exchange(std::string("POST ") + target + " HTTP/1.1\r\nHost: localhost\r\n\r\n");
    EXPECT_TRUE(answer.status == 401 || answer.status == 404 || answer.status == 405) << target << ' ' << answer.status;
    ExpectRefusal(answer, answer.status);
  }
}

TEST_F(AttackTest, ATokenInTheQueryIsNoneAndIsNotLogged) {
  const std::string token = MakeToken(owner_, "full");
  ExpectRefusal(Send(std::string(kEcho) + "?token=" + token, ""), 401);
  ExpectRefusal(Send(std::string(kEcho) + "?access_token=" + token, owner_.Fields()), 404);
  EXPECT_EQ(Send(kEcho, "Authorization: Bearer " + token + "\r\n").status, 200);
  EXPECT_FALSE(Logged(token));
  EXPECT_FALSE(Logged("?"));
}

TEST_F(AttackTest, EveryTryAfterTheTenthWaitsFromWhereverItComes) {
  for (int count = 0; count < 10; ++count) {
    ExpectRefusal(Send("login", "", LoginBody("wrong")), 401);
  }
  for (int count = 11; count <= 20; ++count) {
    HttpClient client(server_.Port(), 0, 0x7f000002U + static_cast<uint32_t>(count)); // 127.0.0.2 and on
    const std::string body = LoginBody(count % 2 == 0 ? kPassword : "wrong");
    HttpAnswer answer = client.Exchange(
        "POST /webapi/login HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\nContent-Length: " +
        std::to_string(body.size()) + "\r\n\r\n" + body);
    ExpectRefusal(answer, 429);
    EXPECT_GT(std::stoi(answer.fields["retry-after"]), 50);
  }
  ExpectRefusal(Change(owner_, "wrong one", "another horse"), 429); // no way round
}

TEST_F(AttackTest, AnUnknownUserTakesAsLongAsAWrongPassword) {
  const auto time = [this](const char *user) {
    const auto begin = std::chrono::steady_clock::now();
    ExpectRefusal(Send("login", "", LoginBody("wrong", user)), 401);
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
  };
  double known = time("admin");
  double unknown = time("nobody");
  for (int round = 0; round < 3; ++round) { // in turn, so that what disturbs the machine disturbs both
    known = std::min(known, time("admin"));
    unknown = std::min(unknown, time("nobody"));
  }
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__) // sanitizers take their time
  EXPECT_GT(unknown, known * 0.5);
  EXPECT_LT(unknown, known * 2);
#endif
}

TEST_F(AttackTest, PasswordsAreComparedByEveryByte) {
  const std::string password = std::string(70, 'a') + "\xC3\xBC\\u0000z"; // u with two dots; a NUL
  EXPECT_EQ(Change(owner_, kPassword, password).status, 200);
  owner_ = Login(password);
  for (const std::string &other : {std::string(70, 'a'), std::string(72, 'a'), std::string(70, 'a') + "\xC3\xBC",
                                   std::string(70, 'a') + "u\xCC\x88\\u0000z", std::string(70, 'a') + "\xC3\xBC\\u0000",
                                   std::string(70, 'a') + "\xC3\xBC\\u0000zz"}) {
    ExpectRefusal(Send("login", "", LoginBody(other)), 401);
  }
  EXPECT_EQ(Send("login", "", LoginBody(std::string(70, 'a') + "\\u00fc\\u0000z")).status, 200); // the same bytes
}

TEST_F(AttackTest, APasswordOfTenMegabytesIsRefusedUnread) {
  HttpClient client(server_.Port());
  client.Send("POST /webapi/login HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\n"
              "Content-Length: 10485760\r\n\r\n" +
              std::string(10'485'760, 'x'));
  ExpectRefusal(client.Read(), 413);
}

TEST_F(AttackTest, APageOfAnotherSiteCannotWrite) {
  const std::string cookie = "Cookie: vorn-session=" + owner_.cookie + "\r\n";
  const std::string form = "Content-Type: application/x-www-form-urlencoded\r\nContent-Length: 3\r\n\r\na=1";
  for (const std::string &fields :
       {cookie + form, cookie + "Content-Type: text/plain\r\nContent-Length: 2\r\n\r\n{}"}) {
    HttpClient client(server_.Port());
    ExpectRefusal(client.Exchange("POST /webapi/VORN.Test.Callback/1/set HTTP/1.1\r\nHost: localhost\r\n" + fields),
                  403);
  }
  for (const char *type : {"text/plain", "multipart/form-data; boundary=x", "application/x-www-form-urlencoded"}) {
    HttpClient client(server_.Port());
    ExpectRefusal(client.Exchange("POST /webapi/VORN.Test.Callback/1/set HTTP/1.1\r\nHost: localhost\r\n" +
                                  owner_.Fields() + "Content-Type: " + type + "\r\nContent-Length: 2\r\n\r\n{}"),
                  415);
  }
  const std::string body = LoginBody(kPassword);
  HttpClient client(server_.Port());
  ExpectRefusal(client.Exchange("POST /webapi/login HTTP/1.1\r\nHost: localhost\r\nOrigin: http://evil.example\r\n"
                                "Content-Type: text/plain\r\nContent-Length: " +
                                std::to_string(body.size()) + "\r\n\r\n" + body),
                403);
}

TEST_F(AttackTest, TheCsrfTokenOfAnEndedSessionIsNone) {
  const Person gone = Login(kPassword);
  EXPECT_EQ(Send("logout", gone.Fields()).status, 200);
  ExpectRefusal(Send(kEcho, "Cookie: vorn-session=" + owner_.cookie + "\r\nX-CSRF-Token: " + gone.csrf + "\r\n"), 403);
  ExpectRefusal(Send(kEcho, "Cookie: vorn-session=" + gone.cookie + "\r\nX-CSRF-Token: " + owner_.csrf + "\r\n"), 401);
}

TEST_F(AttackTest, NumbersThatAreNoneMakeNoToken) {
  for (const char *days : {"1e99", "4294967297", "-0", "-1", "0", "3651", "18446744073709551617",
                           "99999999999999999999", "1.9", "\"5\"", "true", "null", "[]", "{}", "[1]"}) {
    ExpectRefusal(
        Send("tokens/make", owner_.Fields(), std::string(R"({"name":"t","access":"full","days":)") + days + "}"), 400);
  }
  for (const char *name : {"1", "null", "[\"a\"]", "{}", "true", R"("a\u0000b")", "\"\"", R"("../x")", R"("a b")"}) {
    ExpectRefusal(
        Send("tokens/make", owner_.Fields(), std::string(R"({"days":1,"access":"full","name":)") + name + "}"), 400);
  }
  for (const char *kind : {"1", "null", "[]", "\"FULL\"", R"("full\u0000")"}) {
    ExpectRefusal(Send("tokens/make", owner_.Fields(), std::string(R"({"days":1,"name":"t","access":)") + kind + "}"),
                  400);
  }
  EXPECT_EQ(ParseJson(Send("tokens/list", owner_.Fields()).body)["data"].size(), 0U);
}

TEST_F(AttackTest, TokensAreBoundedInNumber) {
  for (int count = 0; count < 32; ++count) {
    MakeToken(owner_, "read");
  }
  ExpectRefusal(Send("tokens/make", owner_.Fields(), R"({"name":"t","days":1,"access":"read"})"), 400);
  EXPECT_EQ(ParseJson(Send("tokens/list", owner_.Fields()).body)["data"].size(), 32U);
}

TEST_F(AttackTest, LoginsAtOnceWaitForEachOtherOrAreRefused) {
  std::vector<std::thread> threads;
  std::array<int, 30> statuses{};
  for (size_t index = 0; index < statuses.size(); ++index) {
    threads.emplace_back(
        [this, &statuses, index] { statuses[index] = Send("login", "", LoginBody(kPassword)).status; });
  }
  size_t peak = 0;
  for (std::thread &thread : threads) {
    peak = std::max(peak, server_.PrivateMemory());
    thread.join();
  }
  const auto count = [&statuses](int status) { return std::count(statuses.begin(), statuses.end(), status); };
  EXPECT_GT(count(200), 0);
  EXPECT_GT(count(429), 0);
  EXPECT_EQ(count(200) + count(429), 30);
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__) // sanitizers hold memory of their own
  EXPECT_LT(peak, 48U * 1024);                                      // one hash of 32 MiB at a time
  EXPECT_LT(server_.PrivateMemory(), 10U * 1024);
#endif
}

TEST_F(AccessTest, ARestartEndsEverySession) {
  const Person person = Enter();
  EXPECT_EQ(server_.Stop(), 0);
  ServerProcess again({.options = Options({}), .knownState = false});
  HttpClient client(again.Port());
  ExpectRefusal(client.Exchange(std::string("POST /webapi/") + kEcho + " HTTP/1.1\r\nHost: localhost\r\n" +
                                person.Fields() + "\r\n"),
                401);
  EXPECT_EQ(again.Stop(), 0);
}

class FewSessionsTest : public AttackTest {
protected:
  FewSessionsTest() : AttackTest({"--sessions", "2"}) {}
};

TEST_F(FewSessionsTest, SessionsAreBoundedAndTheSilentOneGivesWay) {
  const Person second = Login(kPassword);
  EXPECT_EQ(Send(kEcho, owner_.Fields()).status, 200);
  Login(kPassword);
  ExpectRefusal(Send(kEcho, second.Fields()), 401);
}

class ShortDayTest : public AttackTest {
protected:
  ShortDayTest() : AttackTest({"--session-time", "1500ms"}) {}
};

TEST_F(ShortDayTest, ASessionEndsHoweverBusyItIs) {
  const Person busy = Login(kPassword);
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(1'700);
  while (std::chrono::steady_clock::now() < end) {
    Send(kEcho, busy.Fields());
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  ExpectRefusal(Send(kEcho, busy.Fields()), 401);
  owner_ = Login(kPassword);
}

} // namespace
