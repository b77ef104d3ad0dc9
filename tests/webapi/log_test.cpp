// What the system log says of who came and what was done, and what it never says.
#include "tests/webapi/access_fixture.h"

#include <algorithm>
#include <chrono>
#include <memory>
#include <regex>
#include <sstream>
#include <thread>

using vorntest::AccessTest;
using vorntest::ExpectRefusal;
using vorntest::HttpClient;
using vorntest::kEcho;
using vorntest::kPassword;
using vorntest::ParseJson;
using vorntest::Person;

namespace {

class LogTest : public AccessTest {
protected:
  explicit LogTest(std::vector<std::string> options = {}) : AccessTest(std::move(options)) {}

  /// Lines without the program's name.
  std::vector<std::string> Lines() const {
    std::vector<std::string> lines;
    std::istringstream log(server_.Log());
    for (std::string line; std::getline(log, line);) {
      lines.push_back(line.substr(std::min(line.find("]: ") + 3, line.size())));
    }
    return lines;
  }
  size_t Count(const std::string &text) const {
    const std::vector<std::string> lines = Lines();
    return static_cast<size_t>(std::count_if(
        lines.begin(), lines.end(), [&text](const std::string &line) { return line.find(text) != std::string::npos; }));
  }
};

TEST_F(LogTest, ARefusedLoginIsALineWithoutWhatWasTyped) {
  Enter();
  ExpectRefusal(Send("login", "", LoginBody("typed-in-vain", "somebody\\nforged: admin logged in")), 401);
  EXPECT_TRUE(server_.LogShows("a login from 127.0.0.1 refused: wrong user name or password\n"));
  EXPECT_EQ(Count("refused: wrong"), 1U);
  EXPECT_EQ(server_.Log().find("typed-in-vain"), std::string::npos);
  EXPECT_EQ(server_.Log().find("forged"), std::string::npos);
}

TEST_F(LogTest, AChangingCallIsALineOfWhoWhenceWhatAndItsOutcome) {
  const Person person = Enter();
  const std::string token = "Authorization: Bearer " + MakeToken(person, "full") + "\r\n";
  const std::string id = ParseJson(Send("tokens/list", person.Fields()).body)["data"][0]["id"].asString();
  EXPECT_EQ(Send("VORN.Test.Callback/1/set", person.Fields()).status, 200);
  EXPECT_EQ(Send("VORN.Test.Echo/1/error", token, R"({"code":4302})").status, 200);
  EXPECT_EQ(Send("VORN.Test.Throw/1/number", person.Fields()).status, 500);
  EXPECT_EQ(Send(kEcho, person.Fields()).status, 200);
  EXPECT_EQ(Send("tokens/revoke", person.Fields(), R"({"id":")" + id + "\"}").status, 200);
  ASSERT_TRUE(server_.LogShows("revoked token"));
  EXPECT_EQ(Count("admin from 127.0.0.1 changed the password"), 1U);
  EXPECT_EQ(Count("admin from 127.0.0.1 made token " + id + " t"), 1U);
  EXPECT_EQ(Count("admin from 127.0.0.1 revoked token " + id), 1U);
  EXPECT_EQ(Count("admin from 127.0.0.1 called VORN.Test.Callback v1 set: done"), 1U);
  EXPECT_EQ(Count("token " + id + " t from 127.0.0.1 called VORN.Test.Echo v1 error: failed with 4302"), 1U);
  EXPECT_EQ(Count("admin from 127.0.0.1 called VORN.Test.Throw v1 number: failed with 500"), 1U);
  EXPECT_EQ(Count(" called "), 3U); // a call that reads is none
  Send("VORN.Test.Callback/1/set", person.Fields(), "{");
  EXPECT_TRUE(
      server_.LogShows("admin from 127.0.0.1 called VORN.Test.Callback v1 set: refused with 400, body is not JSON\n"));
  Send("login", "", "{");
  EXPECT_TRUE(
      server_.LogShows("nobody from 127.0.0.1 sent a call of the server's own: refused with 400, body is not JSON\n"));
}

TEST_F(LogTest, NoSecretIsEverInIt) {
  const Person person = Enter();
  const std::string token = MakeToken(person, "full");
  Send(kEcho, "Authorization: Bearer " + token + "\r\n", R"({"wpa":"a secret of the house"})");
  Send("VORN.Test.Callback/1/set", person.Fields(), R"({"wpa":"a secret of the house"})");
  Send("VORN.Test.Callback/1/set?token=" + token, person.Fields());
  Send("VORN.Test.Echo/1/get", person.Fields(), R"({"wpa":"a secret of the house")");
  Send("VORN.Test.Echo/1/get", person.Fields() + "Bad field with a secret of the house\r\n");
  EXPECT_EQ(server_.Stop(), 0);
  for (const std::string &secret :
       {first_, std::string(kPassword), person.cookie, person.csrf, token, std::string("a secret of the house")}) {
    EXPECT_EQ(server_.Log().find(secret), std::string::npos) << secret;
  }
}

TEST_F(LogTest, NothingFromOutsideBeginsALine) {
  const Person person = Enter();
  Send("VORN.Test.Throw/1/standard", person.Fields()); // its text has a line end
  Send("VORN.Test.Callback/1/set", person.Fields() + "User-Agent: x\ty\r\nX-Forwarded-For: 1.2.3.4\r\n");
  Send("a%0aforged", person.Fields());
  HttpClient(server_.Port()).Exchange("GET / HTTP/1.1\nforged: x\r\n\r\n");
  ASSERT_TRUE(server_.LogShows("a line\\x0aof two"));
  EXPECT_EQ(server_.Stop(), 0);
  const std::regex ours(R"(vornwebd\[[0-9]+\]: [ -~]+)");
  std::istringstream log(server_.Log());
  for (std::string line; std::getline(log, line);) {
    EXPECT_TRUE(std::regex_match(line, ours)) << line;
  }
  EXPECT_EQ(server_.Log().find("forged"), std::string::npos);
  EXPECT_EQ(server_.Log().find("1.2.3.4"), std::string::npos);
}

class LimitLogTest : public LogTest {
protected:
  LimitLogTest()
      : LogTest({"--login-failures", "1", "--connections-per-address", "8", "--tasks", "1", "--slots", "1", "--queue",
                 "0", "--header-time", "100ms"}) {}
};

TEST_F(LimitLogTest, EachLimitThatIsReachedIsALine) {
  const Person person = Enter();
  Send("login", "", LoginBody("wrong"));
  ExpectRefusal(Send("login", "", LoginBody(kPassword)), 429);
  EXPECT_TRUE(server_.LogShows("a login from 127.0.0.1 refused: too many wrong ones before\n"));

  const std::string until = R"("until":")" + folder_.Path("until") + "\"";
  EXPECT_EQ(Send("VORN.Test.Task/1/start", person.Fields(), "{" + until + "}").status, 200);
  EXPECT_EQ(Send("VORN.Test.Task/1/start", person.Fields(), R"({"prefix":"other"})").status, 200);
  EXPECT_TRUE(server_.LogShows("poll task of kind other for user admin refused with code 115\n"));

  HttpClient waits(server_.Port());
  const std::string body = "{" + until + R"(,"entered":")" + folder_.Path("entered") + "\"}";
  waits.Send("POST /webapi/VORN.Test.Wait/1/get HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\n" +
             person.Fields() + "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body);
  ASSERT_EQ(folder_.WaitForLines("entered", 1).size(), 1U);
  ExpectRefusal(Send(kEcho, person.Fields()), 503);
  EXPECT_TRUE(server_.LogShows("a call was refused: every waiting place is taken\n"));
  folder_.Make("until");
  EXPECT_EQ(waits.Read().status, 200);

  HttpClient slow(server_.Port());
  slow.Send("GET / HT");
  ExpectRefusal(slow.Read(), 408);
  EXPECT_TRUE(server_.LogShows("a request took too long and was cut\n"));

  std::vector<std::unique_ptr<HttpClient>> all;
  for (int count = 0; count < 12; ++count) {
    all.push_back(std::make_unique<HttpClient>(server_.Port()));
  }
  EXPECT_TRUE(server_.LogShows("127.0.0.1: too many connections of this client\n"));
}

TEST_F(LogTest, AFloodIsTenLinesAndThenANumber) {
  const auto flood = [this](int count) {
    while (count-- > 0) {
      HttpClient(server_.Port()).Exchange("BAD\r\n\r\n");
    }
  };
  const auto start = std::chrono::steady_clock::now();
  flood(25);
  ASSERT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(9)) << "too slow to tell";
  ExpectRefusal(Send("login", "", LoginBody("wrong")), 401);
  EXPECT_TRUE(server_.LogShows("refused: wrong")); // of another kind: not drowned; what came before has been read
  EXPECT_EQ(Count("a request from 127.0.0.1 refused with 400: "), 10U);
  std::this_thread::sleep_until(start + std::chrono::seconds(11));
  flood(1);
  EXPECT_TRUE(server_.LogShows("refused request: 15 lines left out\n"));
  EXPECT_EQ(Count("a request from 127.0.0.1 refused with 400: "), 11U);
}

} // namespace
