// The same server over TLS.
#include "tests/webapi/tls_client.h"
#include "tests/webapi/webapi_fixture.h"

#include <sys/socket.h>
#include <sys/stat.h>

#include <csignal>
#include <fstream>
#include <iterator>
#include <memory>

using vorntest::Folder;
using vorntest::HttpClient;
using vorntest::ServerProcess;
using vorntest::TlsClient;

namespace {

class TlsTest : public testing::Test {
protected:
  TlsTest()
      : server_({.options = {"--tls", "yes", "--handshake-time", "300ms", "--state", folder_.Path("state")},
                 .knownState = false}) {}
  void SetUp() override { ASSERT_NE(server_.Port(), 0) << server_.Log(); }
  void TearDown() override { EXPECT_EQ(server_.Stop(), 0) << server_.Log(); }

  /// @return what the server answers to the bytes and then closes; empty when there is no handshake
  std::string Talk(int version, const std::string &bytes) const {
    TlsClient client(server_.Port(), version);
    return client.Handshake() && client.Send(bytes) ? client.ReadAll() : "";
  }

  Folder folder_;
  ServerProcess server_;
};

std::string LoginBytes(const std::string &password) {
  const std::string body = R"({"user":"admin","password":")" + password + "\"}";
  return "POST /webapi/login HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\nContent-Type: application/json\r\n"
         "Content-Length: " +
         std::to_string(body.size()) + "\r\n\r\n" + body;
}

TEST_F(TlsTest, OneDotTwoAndOneDotThreeAreSpokenAndNothingOlder) {
  std::string password;
  std::getline(std::ifstream(folder_.Path("state/first-password")), password);
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    const std::string answer = Talk(version, LoginBytes(password));
    EXPECT_EQ(answer.substr(0, 12), "HTTP/1.1 200") << answer;
    EXPECT_NE(answer.find("Set-Cookie: __Host-vorn-session="), std::string::npos);
    EXPECT_NE(answer.find("\r\nStrict-Transport-Security: max-age=31536000\r\n"), std::string::npos);
    EXPECT_NE(answer.find("; Path=/; HttpOnly; SameSite=Strict; Secure\r\n"), std::string::npos);
  }
  EXPECT_EQ(Talk(TLS1_VERSION, LoginBytes(password)), "");
  EXPECT_EQ(Talk(TLS1_1_VERSION, LoginBytes(password)), "");
}

TEST_F(TlsTest, ATooLongBodyIsRefusedHereToo) {
  const std::string bytes = LoginBytes(std::string(100'000, 'x'));
  EXPECT_EQ(Talk(TLS1_3_VERSION, bytes).substr(0, 12), "HTTP/1.1 413");
}

TEST_F(TlsTest, KeyAndCertificateAreItsOwnersAloneAndStay) {
  const auto read = [this](const char *name) {
    std::ifstream file(folder_.Path(name));
    return std::string(std::istreambuf_iterator<char>(file), {});
  };
  struct stat info {};
  ASSERT_EQ(stat(folder_.Path("state/tls.key").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 07777U, 0600U);
  const std::string before = read("state/tls.crt");
  EXPECT_EQ(server_.Stop(), 0);
  ServerProcess again({.options = {"--tls", "yes", "--state", folder_.Path("state")}, .knownState = false});
  EXPECT_NE(again.Port(), 0);
  EXPECT_EQ(read("state/tls.crt"), before);
}

TEST_F(TlsTest, PlainHttpAndSilenceAreCut) {
  HttpClient plain(server_.Port());
  EXPECT_EQ(plain.Exchange("GET / HTTP/1.1\r\nHost: localhost\r\n\r\n").status, 0);
  HttpClient silent(server_.Port());
  HttpClient half(server_.Port());
  half.Send("\x16\x03\x01");
  EXPECT_TRUE(silent.ClosedByServer(std::chrono::seconds(5)));
  EXPECT_TRUE(half.ClosedByServer(std::chrono::seconds(5)));
}

TEST_F(TlsTest, RenegotiationIsRefused) {
  TlsClient client(server_.Port(), TLS1_2_VERSION);
  ASSERT_TRUE(client.Handshake());
  for (int round = 0; round < 3; ++round) {
    SSL_renegotiate(client.Handle());
    EXPECT_NE(SSL_do_handshake(client.Handle()), 1);
  }
  EXPECT_EQ(Talk(TLS1_2_VERSION, "GET / HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n").substr(0, 9),
            "HTTP/1.1 ");
}

TEST_F(TlsTest, KeysMayBeRenewedAFewTimes) {
  for (const bool ask : {false, true}) {
    TlsClient client(server_.Port(), TLS1_3_VERSION);
    ASSERT_TRUE(client.Handshake());
    for (int count = 0; count < 16; ++count) {
      ASSERT_TRUE(client.RenewKeys(ask));
    }
    ASSERT_TRUE(client.Send("GET / HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n"));
    EXPECT_EQ(client.ReadAll().substr(0, 9), "HTTP/1.1 ");
  }
}

TEST_F(TlsTest, AClientThatRenewsItsKeysWithoutEndIsCut) {
  std::signal(SIGPIPE, SIG_IGN); // the library writes without MSG_NOSIGNAL
  TlsClient client(server_.Port(), TLS1_3_VERSION);
  ASSERT_TRUE(client.Handshake());
  for (int count = 0; count < 1000 && client.RenewKeys(false); ++count) {
  }
  client.Send("GET / HTTP/1.1\r\nHost: localhost\r\n\r\n");
  EXPECT_EQ(client.ReadAll(), "");
  EXPECT_TRUE(server_.LogShows("a client began too many TLS handshakes and was cut"));
}

class SlowTlsTest : public testing::Test {
protected:
  SlowTlsTest() : server_({.options = {"--tls", "yes", "--write-time", "700ms"}}) {}
  void SetUp() override { ASSERT_NE(server_.Port(), 0) << server_.Log(); }
  void TearDown() override { EXPECT_EQ(server_.Stop(), 0) << server_.Log(); }

  ServerProcess server_;
};

TEST_F(SlowTlsTest, AClientThatTakesNothingIsCut) {
  TlsClient client(server_.Port(), 0, 4'096);
  ASSERT_TRUE(client.Handshake());
  ASSERT_TRUE(client.Send(vorntest::CallBytes("VORN.Test.Large/1/get", R"({"bytes":30000000})")));
  EXPECT_TRUE(server_.LogShows("a client did not take its answer and was cut"));
}

TEST_F(SlowTlsTest, HalfARecordCostsNoProcessorTime) {
  std::vector<std::unique_ptr<HttpClient>> clients;
  for (const char *bytes : {"\x16", "\x16\x03\x01", "\x16\x03\x01\x02", "\x16\x03\x01\x02\x01\x01"}) {
    clients.push_back(std::make_unique<HttpClient>(server_.Port()));
    ASSERT_TRUE(clients.back()->Send(bytes));
  }
  TlsClient established(server_.Port());
  ASSERT_TRUE(established.Handshake());
  ASSERT_EQ(send(SSL_get_fd(established.Handle()), "\x17\x03\x03\x01\x01x", 6, MSG_NOSIGNAL), 6);
  std::this_thread::sleep_for(std::chrono::milliseconds(400)); // what watched the handshake goes to sleep
  const long before = server_.ProcessorTime();
  std::this_thread::sleep_for(std::chrono::milliseconds(1'000));
  EXPECT_LE(server_.ProcessorTime() - before, 3); // of 100 a second
}

} // namespace
