#include "host/packageserver/package_client.h"

#include "host/utility/unique_fd.h"
#include "platform/packageserver.h"
#include "tests/host/files.h"
#include "tests/host/packageserver/web_server.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <chrono>
#include <cstdlib>
#include <memory>
#include <thread>

namespace {

using hosttest::TakeLogLines;
using hosttest::WebServer;
using hosttest::WriteText;
using std::chrono::milliseconds;
using std::chrono::steady_clock;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

constexpr const char *kBase = "https://127.0.0.1:8443/list";
constexpr const char *kList = R"({"packages": [{"id": "Säge", "size": 12}]})";

class PackageClient : public testing::Test {
protected:
  static void SetUpTestSuite() {
    server_ = std::make_unique<WebServer>();
    for (const char *folder : {"list", "drip"}) {
      std::filesystem::create_directories(std::string("/tmp/web/pages/") + folder);
    }
    WriteText("/tmp/web/pages/list/good.php", kList);
    WriteText("/tmp/web/pages/list/html.php", "<html>SECRET</html>");
    WriteText("/tmp/web/pages/list/empty.php", "");
    WriteText("/tmp/web/pages/list/deep.php", std::string(65, '[') + std::string(65, ']'));
    WriteText("/tmp/web/pages/list/abyss.php", std::string(100000, '['));
    WriteText("/tmp/web/pages/list/limit.php", "\"" + std::string(1024UL * 1024 - 2, 'x') + "\"");
    WriteText("/tmp/web/pages/list/large.php", "\"" + std::string(1024UL * 1024 - 1, 'x') + "\"");
    WriteText("/tmp/web/pages/drip/slow.php", std::string(1000, '1'));
  }
  static void TearDownTestSuite() { server_.reset(); }

  void SetUp() override {
    ASSERT_TRUE(server_->IsUp()) << hosttest::ReadText("/tmp/web/make.log") << hosttest::ReadText("/tmp/web/error.log");
    hosttest::FreshFolder("/etc/vorn");
    server_->TakeRequests();
    TakeLogLines();
  }

  /// @return "ok", or the cause; the result must be left as it was on failure
  std::string Ask(const std::string &url, const std::string &page = "good.php", const std::string &language = "enu",
                  const vornhost::PackageLimits &limits = {}) {
    const Json::Value before = "before";
    result_ = before;
    std::string cause;
    if (vornhost::PackageClient({url, WebServer::kAuthority}, limits).Ask(language, page, result_, cause)) {
      return "ok";
    }
    EXPECT_EQ(result_, before);
    EXPECT_FALSE(cause.empty());
    EXPECT_THAT(cause, Not(HasSubstr("SECRET")));
    return cause;
  }

  static void Configure(const std::string &text) { WriteText("/etc/vorn/packageserver.conf", text); }

  static std::unique_ptr<WebServer> server_;
  Json::Value result_;
};

std::unique_ptr<WebServer> PackageClient::server_;

TEST_F(PackageClient, TheContractsFunctionGivesTheServersList) {
  Configure("# the home's server\nurl=https://127.0.0.1:8443/list/\ncafile=/tmp/web/ca.pem\n");
  EXPECT_NE(VORNPackageServer::PMSGetRecommendPkgList("enu", "good.php", result_), 0);
  EXPECT_EQ(result_["packages"][0]["id"], "Säge");
  EXPECT_EQ(result_["packages"][0]["size"], 12);
  EXPECT_THAT(server_->TakeRequests(), ElementsAre("8443 GET /list/good.php?lang=enu HTTP/1.1"));
  EXPECT_THAT(TakeLogLines(), IsEmpty());
}

TEST_F(PackageClient, WithoutAConfiguredServerItFailsAndSaysSo) {
  result_ = 7;
  for (const char *text : {"", "cafile=/tmp/web/ca.pem\n", "url=\n", "#url=https://127.0.0.1:8443/list\n"}) {
    Configure(text);
    EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList("enu", "good.php", result_), 0);
    EXPECT_THAT(TakeLogLines(), ElementsAre("3 package server: none is configured"));
  }
  std::filesystem::remove("/etc/vorn/packageserver.conf");
  EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList("enu", "good.php", result_), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 package server: none is configured"));
  EXPECT_EQ(result_, Json::Value(7));
  EXPECT_THAT(server_->TakeRequests(), IsEmpty());
}

TEST_F(PackageClient, AFailureIsLoggedWithItsCauseAndWithoutTheAnswer) {
  Configure("url=https://127.0.0.1:8443/list\ncafile=/tmp/web/ca.pem\n");
  result_ = 7;
  EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList("enu", "html.php", result_), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 package server: the answer is not JSON"));
  EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList(nullptr, "good.php", result_), 0);
  EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList("enu", nullptr, result_), 0);
  EXPECT_THAT(TakeLogLines(), SizeIs(2));
  Configure("url=https://127.0.0.1:8443/list\n"); // the system's authorities do not know this one
  EXPECT_EQ(VORNPackageServer::PMSGetRecommendPkgList("enu", "good.php", result_), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("SSL peer certificate")));
  EXPECT_EQ(result_, Json::Value(7));
}

TEST_F(PackageClient, AServerThatCannotBeTrustedIsNotAsked) {
  for (const char *url :
       {"https://127.0.0.1:8444/list", "https://127.0.0.1:8445/list", "https://127.0.0.1:8446/list"}) {
    EXPECT_THAT(Ask(url), HasSubstr("SSL peer certificate")) << url;
  }
  EXPECT_THAT(server_->TakeRequests(), IsEmpty());
}

TEST_F(PackageClient, OnlyHttpsIsSpoken) {
  for (const char *url : {"http://127.0.0.1:8080/list", "file:///tmp/web/pages/list", "127.0.0.1:8080/list",
                          "ftp://127.0.0.1", "https://", "https://127.0.0.1:99999/", "https://127.0.0.1:8443/list?x=1",
                          "https://127.0.0.1:8443/list#x", "https://127.0.0.1 :8443/", "\x01"}) {
    EXPECT_EQ(Ask(url), "the configured url is no https address") << url;
  }
  EXPECT_THAT(server_->TakeRequests(), IsEmpty());
}

TEST_F(PackageClient, ARedirectIsFollowedToHttpsOnly) {
  EXPECT_EQ(Ask("https://127.0.0.1:8443/moved"), "ok");
  EXPECT_THAT(server_->TakeRequests(), SizeIs(2));
  EXPECT_EQ(Ask("https://127.0.0.1:8443/tohttp"), "Unsupported protocol");
  EXPECT_EQ(Ask("https://127.0.0.1:8443/tofile"), "Unsupported protocol");
  EXPECT_THAT(Ask("https://127.0.0.1:8443/tostranger"), HasSubstr("SSL peer certificate"));
  EXPECT_THAT(server_->TakeRequests(),
              ElementsAre("8443 GET /tohttp/good.php?lang=enu HTTP/1.1", "8443 GET /tofile/good.php?lang=enu HTTP/1.1",
                          "8443 GET /tostranger/good.php?lang=enu HTTP/1.1"));
}

TEST_F(PackageClient, ThreeRedirectsAreTheMost) {
  EXPECT_EQ(Ask("https://127.0.0.1:8443/loop"), "Number of redirects hit maximum amount");
  EXPECT_THAT(server_->TakeRequests(), SizeIs(4));
}

TEST_F(PackageClient, AnotherStatusThan200IsAFailure) {
  EXPECT_EQ(Ask("https://127.0.0.1:8443/broken"), "HTTP status 500");
  EXPECT_EQ(Ask("https://127.0.0.1:8443/created"), "HTTP status 201");
  EXPECT_EQ(Ask(kBase, "absent.php"), "HTTP status 404");
}

TEST_F(PackageClient, AnAnswerThatIsNoJsonIsAFailure) {
  for (const char *page : {"html.php", "empty.php", "deep.php", "abyss.php"}) {
    EXPECT_EQ(Ask(kBase, page), "the answer is not JSON") << page;
  }
}

TEST_F(PackageClient, AnAnswerOfOneMebibyteIsTakenAndNoneLarger) {
  EXPECT_EQ(Ask(kBase, "limit.php"), "ok");
  EXPECT_EQ(result_.asString().size(), 1024UL * 1024 - 2);
  EXPECT_EQ(Ask(kBase, "large.php"), "the answer is too large");
  vornhost::PackageLimits limits;
  limits.bytes = 100; // less than the header has
  EXPECT_EQ(Ask(kBase, "empty.php", "enu", limits), "the answer is too large");
}

TEST_F(PackageClient, TheLanguageGoesInAsOneValue) {
  EXPECT_EQ(Ask(kBase, "good.php", "a b&page=x#y/../\r\nZ: 1%00?"), "ok");
  EXPECT_EQ(Ask(kBase, "good.php", ""), "ok");
  EXPECT_THAT(server_->TakeRequests(),
              ElementsAre("8443 GET /list/good.php?lang=a+b%26page%3dx%23y%2f..%2f%0d%0aZ%3a+1%2500%3f HTTP/1.1",
                          "8443 GET /list/good.php?lang= HTTP/1.1"));
  EXPECT_EQ(Ask(kBase, "good.php", std::string(65, 'x')), "no such page or language");
}

TEST_F(PackageClient, APageIsOneStepOfThePath) {
  for (const char *page :
       {"", ".", "..", "../list/good.php", "a/b", "a?b", "a#b", "a%2fb", "a b", "a\r\nb", ".hidden", "ä"}) {
    EXPECT_EQ(Ask(kBase, page), "no such page or language") << page;
  }
  EXPECT_EQ(Ask(kBase, std::string(129, 'x')), "no such page or language");
  EXPECT_THAT(server_->TakeRequests(), IsEmpty());
}

TEST_F(PackageClient, TheEnvironmentSendsItNowhereElse) {
  for (const char *name : {"https_proxy", "HTTPS_PROXY", "ALL_PROXY"}) {
    setenv(name, "http://127.0.0.1:1", 1);
  }
  EXPECT_EQ(Ask(kBase), "ok");
  for (const char *name : {"https_proxy", "HTTPS_PROXY", "ALL_PROXY"}) {
    unsetenv(name);
  }
}

// A listener that takes connections and never says a word.
class SilentServer {
public:
  SilentServer() : socket_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(8447);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    EXPECT_EQ(bind(socket_.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)), 0);
    EXPECT_EQ(listen(socket_.Get(), 8), 0);
  }

private:
  vornhost::UniqueFd socket_;
};

TEST_F(PackageClient, AServerThatDoesNotAnswerCostsNoMoreThanTheLimit) {
  const SilentServer silent;
  vornhost::PackageLimits limits;
  limits.connect = milliseconds(300);
  limits.total = milliseconds(600);
  const auto timed = [&](const std::string &url, const std::string &page, const std::string &cause, int least) {
    const auto begin = steady_clock::now();
    EXPECT_EQ(Ask(url, page, "enu", limits), cause);
    const auto took = steady_clock::now() - begin;
    EXPECT_GE(took, milliseconds(least));
    EXPECT_LT(took, milliseconds(3000));
  };
  timed("https://127.0.0.1:8447/", "good.php", "Timeout was reached", 290);
  timed("https://127.0.0.1:8443/drip", "slow.php", "Timeout was reached", 590);
  timed("https://127.0.0.1:9/", "good.php", "Couldn't connect to server", 0);
}

TEST_F(PackageClient, SeveralThreadsAskAtOnce) {
  std::vector<std::thread> threads;
  threads.reserve(8);
  for (int number = 0; number < 8; ++number) {
    threads.emplace_back([] {
      for (int round = 0; round < 5; ++round) {
        Json::Value result;
        std::string cause;
        EXPECT_TRUE(vornhost::PackageClient({kBase, WebServer::kAuthority}).Ask("enu", "good.php", result, cause))
            << cause;
        EXPECT_EQ(result["packages"].size(), 1U);
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

} // namespace
