// A server with a state of its own, and people who log in to it.
#ifndef TESTS_WEBAPI_ACCESS_FIXTURE_H
#define TESTS_WEBAPI_ACCESS_FIXTURE_H

#include "tests/webapi/webapi_fixture.h"

#include <fstream>
#include <string>
#include <utility>
#include <vector>

namespace vorntest {

constexpr const char *kPassword = "correct horse";
constexpr const char *kEcho = "VORN.Test.Echo/1/get";

struct Person {
  std::string cookie;
  std::string csrf;
  std::string Fields() const { return "Cookie: vorn-session=" + cookie + "\r\nX-CSRF-Token: " + csrf + "\r\n"; }
};

class AccessTest : public testing::Test {
protected:
  explicit AccessTest(std::vector<std::string> more = {}, const std::string &module = "test_module")
      : server_({.options = Options(std::move(more)), .module = module, .knownState = false}) {}

  void SetUp() override {
    ASSERT_NE(server_.Port(), 0) << server_.Log();
    std::getline(std::ifstream(State("first-password")), first_);
  }
  void TearDown() override {
    EXPECT_EQ(server_.Stop(), 0) << server_.Log();
    EXPECT_EQ(server_.Log().find("Sanitizer"), std::string::npos) << server_.Log();
  }

  std::vector<std::string> Options(std::vector<std::string> more) const {
    more.insert(more.end(), {"--state", folder_.Path("state")});
    return more;
  }
  std::string State(const std::string &name) const { return folder_.Path("state/" + name); }

  /// A call with just the fields given.
  HttpAnswer Send(const std::string &path, const std::string &fields, const std::string &body = "",
                  const std::string &method = "POST") const {
    HttpClient client(server_.Port());
    std::string bytes = method + " /webapi/" + path + " HTTP/1.1\r\nHost: localhost\r\n" + fields;
    if (!body.empty()) {
      bytes += "Content-Type: application/json\r\nContent-Length: " + std::to_string(body.size()) + "\r\n";
    }
    return client.Exchange(bytes + "\r\n" + body);
  }
  static std::string LoginBody(const std::string &password, const std::string &user = "admin") {
    return R"({"user":")" + user + R"(","password":")" + password + "\"}";
  }
  Person Login(const std::string &password, const std::string &fields = "") const {
    HttpAnswer answer = Send("login", fields, LoginBody(password));
    EXPECT_EQ(answer.status, 200) << answer.body;
    const std::string cookie = answer.fields["set-cookie"];
    const size_t begin = cookie.find('=') + 1;
    return {cookie.substr(begin, cookie.find(';') - begin), ParseJson(answer.body)["data"]["csrf"].asString()};
  }
  /// With the first password changed.
  Person Enter() const {
    const Person first = Login(first_);
    EXPECT_EQ(Send("password", first.Fields(), R"({"old":")" + first_ + R"(","new":")" + kPassword + "\"}").status,
              200);
    return Login(kPassword);
  }
  std::string MakeToken(const Person &person, const std::string &access) const {
    const HttpAnswer answer =
        Send("tokens/make", person.Fields(), R"({"name":"t","days":1,"access":")" + access + "\"}");
    EXPECT_EQ(answer.status, 200) << answer.body;
    return ParseJson(answer.body)["data"]["token"].asString();
  }

  Folder folder_;
  ServerProcess server_;
  std::string first_;
};

} // namespace vorntest

#endif
