// Every row of the loaded table against everyone who may not call it: nothing is accepted and no handler is entered.
#include "tests/webapi/access_fixture.h"
#include "webapi/access.h"
#include "webapi/module.h"

#include <chrono>
#include <cstdlib>
#include <thread>

using vorntest::AccessTest;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::kPassword;
using vorntest::Person;

namespace {

class TableAccessTest : public AccessTest {
protected:
  TableAccessTest() : AccessTest({"--session-time", "60s"}, EnterInto(kFolder)) {
    std::string fault;
    EXPECT_TRUE(vornwebapi::LoadModule(RECORDED_MODULE, rows_, fault)) << fault;
  }

  static std::string EnterInto(const vorntest::Folder &folder) {
    setenv("VORN_TEST_ENTERED", folder.Path("entered").c_str(), 1);
    return "recording_module";
  }
  size_t Entered() const { return kFolder.Lines("entered").size(); }

  static std::string PathOf(const VORN::APIEntry &row) {
    return vornwebapi::PathOf(row).substr(std::string("/webapi/").size());
  }
  /// Refuses the row to whoever has these fields, with a body and without.
  void ExpectRefused(const VORN::APIEntry &row, const std::string &fields, int status) {
    for (const char *body : {"", "{}", R"({"net_topology":"bridge"})"}) {
      ExpectRefusal(Send(PathOf(row), fields, body), status);
    }
  }

  static const vorntest::Folder kFolder;
  std::vector<VORN::APIEntry> rows_;
};

const vorntest::Folder TableAccessTest::kFolder;

TEST_F(TableAccessTest, NobodyGetsToARowWhoMayNot) {
  ASSERT_EQ(rows_.size(), 23U);
  const Person gone = Enter();
  ASSERT_EQ(Send("logout", gone.Fields()).status, 200);
  const Person person = Login(kPassword);
  const Person other = Login(kPassword);
  const std::string reads = "Authorization: Bearer " + MakeToken(person, "read") + "\r\n";
  const std::string cookie = "Cookie: vorn-session=" + person.cookie + "\r\n";
  const std::string origin = "Origin: http://evil.example\r\n";
  const size_t before = Entered();
  for (const VORN::APIEntry &row : rows_) {
    SCOPED_TRACE(PathOf(row));
    ExpectRefused(row, "", 401);
    ExpectRefused(row, "Cookie: vorn-session=garbage\r\nX-CSRF-Token: garbage\r\n", 401);
    ExpectRefused(row, "Cookie: vorn-session=" + std::string(64, '0') + "\r\nX-CSRF-Token: " + person.csrf + "\r\n",
                  401);
    ExpectRefused(row, "Authorization: Bearer " + std::string(64, '0') + "\r\n", 401);
    ExpectRefused(row, gone.Fields(), 401);
    ExpectRefused(row, cookie, 403);
    ExpectRefused(row, cookie + "X-CSRF-Token: " + other.csrf + "\r\n", 403);
    ExpectRefused(row, cookie + "X-CSRF-Token: " + gone.csrf + "\r\n", 403);
    ExpectRefused(row, person.Fields() + origin, 403);
    ExpectRefused(row, person.Fields() + "Sec-Fetch-Site: cross-site\r\nSec-Fetch-Mode: navigate\r\n", 403);
    ExpectRefused(row, reads + origin, 403);
    for (const char *method : {"GET", "PUT", "DELETE", "PATCH", "OPTIONS"}) {
      ExpectRefusal(Send(PathOf(row), person.Fields(), "", method), 405);
    }
    if (!vornwebapi::Reads(row.method)) {
      ExpectRefused(row, reads, 403);
    }
  }
  EXPECT_EQ(Entered(), before);
  size_t entered = before;
  for (const VORN::APIEntry &row : rows_) {
    EXPECT_EQ(Send(PathOf(row), person.Fields()).status, 200) << PathOf(row);
    EXPECT_EQ(Entered(), ++entered) << PathOf(row);
    if (vornwebapi::Reads(row.method)) {
      EXPECT_EQ(Send(PathOf(row), reads).status, 200) << PathOf(row);
      EXPECT_EQ(Entered(), ++entered) << PathOf(row);
    }
  }
}

TEST_F(TableAccessTest, TheFirstPasswordOpensNoRow) {
  const Person person = Login(first_);
  const size_t before = Entered();
  for (const VORN::APIEntry &row : rows_) {
    ExpectRefused(row, person.Fields(), 403);
  }
  EXPECT_EQ(Entered(), before);
}

TEST_F(TableAccessTest, AnExpiredSessionOpensNoRow) {
  ASSERT_EQ(server_.Stop(), 0);
  vorntest::ServerProcess again(
      {.options = Options({"--session-time", "300ms"}), .module = "recording_module", .knownState = false});
  const auto send = [&again](const std::string &path, const std::string &fields, const std::string &body) {
    return vorntest::HttpClient(again.Port())
        .Exchange("POST /webapi/" + path + " HTTP/1.1\r\nHost: localhost\r\n" + fields +
                  "Content-Type: application/json\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
                  body);
  };
  HttpAnswer login = send("login", "", LoginBody(first_));
  ASSERT_EQ(login.status, 200) << login.body;
  const std::string value = login.fields["set-cookie"];
  const Person person{value.substr(value.find('=') + 1, 64),
                      vorntest::ParseJson(login.body)["data"]["csrf"].asString()};
  std::this_thread::sleep_for(std::chrono::milliseconds(400));
  const size_t before = Entered();
  for (const VORN::APIEntry &row : rows_) {
    ExpectRefusal(send(PathOf(row), person.Fields(), "{}"), 401);
  }
  EXPECT_EQ(Entered(), before);
}

} // namespace
