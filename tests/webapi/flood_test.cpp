// Many at once: what they hold is bounded, and another client is served. Shortened; VORN_LONG_TESTS=1 has the full
// length.
#include "tests/webapi/tls_client.h"
#include "tests/webapi/webapi_fixture.h"

#include <sys/resource.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <thread>

using std::chrono::milliseconds;
using vorntest::CallBytes;
using vorntest::HttpClient;
using vorntest::ServerProcess;
using vorntest::TlsClient;

namespace {

using Clock = std::chrono::steady_clock;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__) // memory and time of their own
constexpr bool kMeasures = false;
#else
constexpr bool kMeasures = true;
#endif

bool Long() {
  return std::getenv("VORN_LONG_TESTS") != nullptr;
}

/// A flood comes from many addresses: 60 connections from each.
uint32_t SourceOf(size_t index) {
  return 0x7f010001U + static_cast<uint32_t>(index / 60); // 127.1.0.1 and on
}

milliseconds Percentile99(std::vector<milliseconds> times) {
  std::sort(times.begin(), times.end());
  return times[times.size() * 99 / 100];
}

milliseconds Since(Clock::time_point begin) {
  return std::chrono::duration_cast<milliseconds>(Clock::now() - begin);
}

class FloodTest : public testing::Test {
protected:
  explicit FloodTest(const std::vector<std::string> &options = {}) : server_({.options = options}) {
    rlimit limit{};
    getrlimit(RLIMIT_NOFILE, &limit);
    limit.rlim_cur = limit.rlim_max;
    setrlimit(RLIMIT_NOFILE, &limit);
  }
  void SetUp() override { ASSERT_NE(server_.Port(), 0) << server_.Log(); }
  void TearDown() override {
    EXPECT_TRUE(server_.Running());
    EXPECT_EQ(server_.Stop(), 0) << server_.Log();
    EXPECT_EQ(server_.Log().find("Sanitizer"), std::string::npos) << server_.Log();
  }
  /// Calls one after the other, each on a connection of its own.
  milliseconds OthersWait(int calls) const {
    std::vector<milliseconds> times;
    for (int count = 0; count < calls; ++count) {
      const auto begin = Clock::now();
      EXPECT_EQ(vorntest::Call(server_.Port(), "VORN.Test.Echo/1/get").status, 200);
      times.push_back(Since(begin));
    }
    return Percentile99(times);
  }
  void ExpectMemory(size_t most, const char *when) const {
    const size_t held = server_.PrivateMemory();
    RecordProperty(when, std::to_string(held));
    std::printf("%s: %zu kB\n", when, held);
    EXPECT_TRUE(!kMeasures || held < most) << held;
  }
  void ExpectMemoryBack(size_t most) const {
    const auto deadline = Clock::now() + std::chrono::seconds(10);
    while (kMeasures && server_.PrivateMemory() > most && Clock::now() < deadline) {
      std::this_thread::sleep_for(milliseconds(50));
    }
    ExpectMemory(most, "afterwards");
  }

  ServerProcess server_;
};

TEST_F(FloodTest, SlowConnectionsAreHeldWhileAnotherClientIsServed) {
  const size_t many = Long() ? 10'000 : 1'000;
  const std::string header = "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN;
  const std::vector<std::string> kinds = {
      "", header, header + "Content-Type: application/json\r\nContent-Length: 1000\r\n\r\n{\"a\":",
      CallBytes("VORN.Test.Large/1/get", R"({"bytes":10000})")};
  std::vector<std::unique_ptr<HttpClient>> slow;
  const auto begin = Clock::now();
  for (size_t index = 0; index < many; ++index) {
    slow.push_back(std::make_unique<HttpClient>(server_.Port(), 0, SourceOf(index)));
    ASSERT_TRUE(slow.back()->Connected()) << index;
    ASSERT_TRUE(slow.back()->Send(kinds[index % kinds.size()]));
  }
  const milliseconds wait = OthersWait(200);
  std::printf("%zu connections in %ld ms, the other client's p99 %ld ms\n", many, Since(begin).count(), wait.count());
  EXPECT_LT(wait, milliseconds(500));
  ExpectMemory(64U * 1024, "while held");
  if (kMeasures && Since(begin) < std::chrono::seconds(10)) { // they are still there
    EXPECT_FALSE(slow.back()->ClosedByServer(milliseconds(0)));
  }
  EXPECT_TRUE(slow[many / 4 * 4 - 4]->ClosedByServer(std::chrono::seconds(16))); // a silent one
  slow.clear();
  ExpectMemoryBack(10U * 1024);
}

/// With a password that is worked on; made before the server is.
class OwnState {
protected:
  OwnState() {
    std::filesystem::permissions(state_.Path(""), std::filesystem::perms::owner_all);
    std::ofstream(state_.Path("tokens"))
        << "000000000001 c7885720cc206bad14bd4e9d89f15aa1887b5214c0802cd9019770f571b90824 full 1 9999999999 0 tests\n";
  }
  vorntest::Folder state_;
};

class LoginFloodTest : private OwnState, public FloodTest {
protected:
  // The worst that a flood can do: each try is worked on.
  LoginFloodTest() : FloodTest({"--login-failures", "1000", "--state", state_.Path("")}) {}
};

TEST_F(LoginFloodTest, OthersAreServedDuringIt) {
  const int seconds = Long() ? 60 : 3;
  std::atomic<bool> over{false};
  std::vector<std::thread> attackers;
  std::atomic<int> tries{0};
  for (uint32_t each = 0; each < 20; ++each) { // five a second each
    attackers.emplace_back([this, each, &over, &tries] {
      const std::string body = R"({"user":"admin","password":"wrong"})";
      auto next = Clock::now() + milliseconds(10 * each);
      while (!over) {
        std::this_thread::sleep_until(next);
        next += milliseconds(200);
        HttpClient client(server_.Port(), 0, 0x7f020001U + each);
        client.Send("POST /webapi/login HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\n"
                    "Content-Length: " +
                    std::to_string(body.size()) + "\r\n\r\n" + body);
        const int status = client.Read().status;
        EXPECT_TRUE(status == 401 || status == 429) << status;
        ++tries;
      }
    });
  }
  std::vector<milliseconds> times;
  const auto begin = Clock::now();
  while (Since(begin) < std::chrono::seconds(seconds)) {
    const auto call = Clock::now();
    EXPECT_EQ(vorntest::Call(server_.Port(), "VORN.Test.Echo/1/get").status, 200);
    times.push_back(Since(call));
    std::this_thread::sleep_for(milliseconds(5));
  }
  over = true;
  for (std::thread &attacker : attackers) {
    attacker.join();
  }
  std::printf("%d logins in %d s, %zu other calls, their p99 %ld ms\n", tries.load(), seconds, times.size(),
              Percentile99(times).count());
  EXPECT_GT(tries, seconds * 50);
  if (kMeasures) {
    EXPECT_LT(Percentile99(times), milliseconds(200));
  }
  EXPECT_TRUE(server_.LogShows("a login from 127.2.0.1 refused: wrong user name or password"));
  ExpectMemory(64U * 1024, "after the flood");
}

class TlsFloodTest : public FloodTest {
protected:
  TlsFloodTest() : FloodTest({"--tls", "yes"}) {}

  milliseconds TlsCall() const {
    const auto begin = Clock::now();
    TlsClient client(server_.Port());
    EXPECT_TRUE(client.Handshake() && client.Send(CallBytes("VORN.Test.Echo/1/get", "", "Connection: close\r\n")));
    EXPECT_EQ(client.ReadAll().substr(0, 12), "HTTP/1.1 200");
    return Since(begin);
  }
};

TEST_F(TlsFloodTest, HalfOpenHandshakesAreBoundedAndOthersAreServed) {
  const size_t many = Long() ? 10'000 : 1'000;
  const std::string hello = vorntest::ClientHello();
  const std::vector<std::string> kinds = {hello.substr(0, 3), hello.substr(0, hello.size() / 2), hello, ""};
  std::vector<std::unique_ptr<HttpClient>> half;
  for (size_t index = 0; index < many; ++index) {
    half.push_back(std::make_unique<HttpClient>(server_.Port(), 0, SourceOf(index)));
    ASSERT_TRUE(half.back()->Connected()) << index;
    half.back()->Send(kinds[index % kinds.size()]);
  }
  std::vector<milliseconds> times;
  for (int count = 0; count < 50; ++count) {
    times.push_back(TlsCall());
  }
  std::printf("%zu half handshakes, the other client's p99 %ld ms\n", many, Percentile99(times).count());
  EXPECT_LT(Percentile99(times), milliseconds(500));
  ExpectMemory(64U * 1024, "while held");
  EXPECT_TRUE(server_.LogShows("too many TLS connections: the one that waited longest was cut"));
  EXPECT_TRUE(half.back()->ClosedByServer(std::chrono::seconds(16)));
  half.clear();
  ExpectMemoryBack(16U * 1024);
}

TEST_F(TlsFloodTest, OthersAreServedWhileKeysAreRenewedWithoutEnd) {
  std::signal(SIGPIPE, SIG_IGN); // the library writes without MSG_NOSIGNAL
  std::atomic<bool> over{false};
  std::atomic<long> renewed{0};
  std::atomic<int> cut{0};
  std::vector<std::thread> attackers;
  for (uint32_t each = 0; each < 8; ++each) {
    attackers.emplace_back([this, each, &over, &renewed, &cut] {
      while (!over) {
        TlsClient client(server_.Port(), TLS1_3_VERSION, 0, 0x7f020001U + each);
        EXPECT_TRUE(client.Handshake());
        while (!over && client.RenewKeys(false)) {
          ++renewed;
        }
        ++cut;
        std::this_thread::sleep_for(milliseconds(20)); // it is not about the cost of handshakes
      }
    });
  }
  std::vector<milliseconds> times;
  for (int count = 0; count < 200; ++count) {
    times.push_back(TlsCall());
  }
  over = true;
  for (std::thread &attacker : attackers) {
    attacker.join();
  }
  std::printf("%ld renewals, %d connections cut, the other client's p99 %ld ms\n", renewed.load(), cut.load(),
              Percentile99(times).count());
  EXPECT_GT(cut, 8);
  EXPECT_TRUE(!kMeasures || Percentile99(times) < milliseconds(500));
  EXPECT_TRUE(server_.LogShows("a client began too many TLS handshakes and was cut"));
}

TEST_F(TlsFloodTest, EstablishedConnectionsAreBoundedToo) {
  const size_t many = 600;
  std::vector<std::unique_ptr<TlsClient>> idle;
  for (size_t index = 0; index < many; ++index) {
    idle.push_back(std::make_unique<TlsClient>(server_.Port(), 0, 0, SourceOf(index)));
    ASSERT_TRUE(idle.back()->Handshake()) << index;
  }
  EXPECT_TRUE(server_.LogShows("too many TLS connections: the one that waited longest was cut"));
  EXPECT_EQ(idle.front()->ReadAll(), "");
  EXPECT_TRUE(idle.back()->Send(CallBytes("VORN.Test.Echo/1/get", "", "Connection: close\r\n")));
  EXPECT_EQ(idle.back()->ReadAll().substr(0, 12), "HTTP/1.1 200");
  ExpectMemory(32U * 1024, "while held");
}

} // namespace
