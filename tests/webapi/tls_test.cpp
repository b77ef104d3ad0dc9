// The same server over TLS.
#include "tests/webapi/webapi_fixture.h"

#include <openssl/bio.h>
#include <openssl/ssl.h>
#include <sys/stat.h>

#include <fstream>
#include <iterator>
#include <memory>

using vorntest::Folder;
using vorntest::HttpClient;
using vorntest::ServerProcess;

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
    const std::unique_ptr<SSL_CTX, decltype(&SSL_CTX_free)> context(SSL_CTX_new(TLS_client_method()), SSL_CTX_free);
    SSL_CTX_set_security_level(context.get(), 0); // what the client would refuse itself is the server's to refuse
    SSL_CTX_set_min_proto_version(context.get(), version);
    SSL_CTX_set_max_proto_version(context.get(), version);
    const std::unique_ptr<BIO, decltype(&BIO_free_all)> connection(BIO_new_ssl_connect(context.get()), BIO_free_all);
    BIO_set_conn_hostname(connection.get(), ("127.0.0.1:" + std::to_string(server_.Port())).c_str());
    if (BIO_do_handshake(connection.get()) != 1) {
      return {};
    }
    BIO_write(connection.get(), bytes.data(), static_cast<int>(bytes.size()));
    std::string answer;
    char buffer[4096];
    for (int got = 0; (got = BIO_read(connection.get(), buffer, sizeof buffer)) > 0;) {
      answer.append(buffer, static_cast<size_t>(got));
    }
    return answer;
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

} // namespace
