// Starting, refusing to start, and ending.
#include "tests/webapi/webapi_fixture.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <fstream>
#include <memory>
#include <set>

using vorntest::Call;
using vorntest::CallBytes;
using vorntest::ExpectRefusal;
using vorntest::Folder;
using vorntest::HttpClient;
using vorntest::ServerProcess;

namespace {

struct BadModule {
  std::string name;
  std::string says;
};

void PrintTo(const BadModule &module, std::ostream *out) {
  *out << module.name;
}

class BadModuleTest : public testing::TestWithParam<BadModule> {};

TEST_P(BadModuleTest, IsRefusedWithAMessageThatNamesTheFault) {
  ServerProcess server({.module = GetParam().name});
  EXPECT_EQ(server.Wait(), 1);
  EXPECT_NE(server.Log().find(GetParam().says), std::string::npos) << server.Log();
  EXPECT_EQ(server.Port(), 0);
}

const std::vector<BadModule> kBadModules = {
    {"no_symbol", "no_symbol.so: no GetAPITable in it"},
    {"null_table", "null_table.so: GetAPITable returned no table"},
    {"empty_table", "empty_table.so: the table is empty"},
    {"null_handler", "row 2 (VORN.Bad, version 1, set) has no handler"},
    {"null_name", "row 2 ((null), version 1, set) has no API name"},
    {"null_method", "row 1 (VORN.Bad, version 1, (null)) has no method name"},
    {"version_zero", "row 1 (VORN.Bad, version 0, get) has a version below 1"},
    {"row_twice", "row 3 (VORN.Bad, version 1, get) stands twice"},
    {"endless_table", "row 4097 is one too many: the table has no end"},
    {"slash_in_name", "row 1 (VORN/Bad, version 1, get) has a name with other characters"},
    {"throws_in_table", "threw while it was loaded: no table today"},
    {"does_not_exist", "does_not_exist.so: cannot open shared object file"},
};

TEST(StartTest, TheReasonIsSaidHoweverLongThePathIs) {
  const std::string name = std::string(200, 'd') + "/" + std::string(200, 'm');
  ServerProcess server({.module = name});
  EXPECT_EQ(server.Wait(), 1);
  EXPECT_NE(server.Log().find(name + ".so: cannot open shared object file: No such file or directory"),
            std::string::npos)
      << server.Log();
}

INSTANTIATE_TEST_SUITE_P(Start, BadModuleTest, testing::ValuesIn(kBadModules),
                         [](const testing::TestParamInfo<BadModule> &each) { return each.param.name; });

void ExpectRefusedStart(const std::vector<std::string> &options, const std::string &says, bool listen = false) {
  ServerProcess server({.options = options, .listen = listen});
  EXPECT_EQ(server.Wait(), 1);
  EXPECT_NE(server.Log().find(says), std::string::npos) << server.Log();
}

TEST(StartTest, AnAddressBeyondThisMachineIsRefused) {
  for (const char *address : {"0.0.0.0:8080", "192.0.2.1:80", "[::]:8080", "[2001:db8::1]:80"}) {
    ExpectRefusedStart({"--listen", address}, "is no loopback address: it needs tls, or plain-http");
  }
}

TEST(StartTest, AnAddressThatIsNoneIsRefused) {
  for (const char *address : {"", "8080", "localhost:80", "127.0.0.1", "127.0.0.1:", "127.0.0.1:65536", "127.0.0.1:-1",
                              "127.0.0.1:80x", "::1:80", "[127.0.0.1]:80"}) {
    ExpectRefusedStart({"--listen", address}, "is no address and port");
  }
}

TEST(StartTest, APortInUseIsRefused) {
  ServerProcess server;
  ExpectRefusedStart({"--listen", "127.0.0.1:" + std::to_string(server.Port())}, "Address already in use");
}

TEST(StartTest, AWrongOptionIsRefused) {
  ExpectRefusedStart({"--no-such", "1"}, "unknown key \"no-such\"");
  ExpectRefusedStart({"--slots"}, "--slots without its value");
  ExpectRefusedStart({"--slots", "0"}, "slots: \"0\" is not within 1 to 256");
  ExpectRefusedStart({"--slots", "4x"}, "slots: \"4x\" is no number");
  ExpectRefusedStart({"--idle-time", "5"}, "idle-time: \"5\" is no time");
  ExpectRefusedStart({"extra"}, "unexpected argument \"extra\"");
  ExpectRefusedStart({"--config", "/nonexistent"}, "cannot read /nonexistent");
  ServerProcess none({.module = ""});
  EXPECT_EQ(none.Wait(), 1);
  EXPECT_NE(none.Log().find("no module to serve"), std::string::npos);
}

TEST(StartTest, SettingsComeFromTheFileAndTheCommandLineWins) {
  const Folder folder;
  std::ofstream(folder.Path("webd.conf")) << "# limits\r\n\n connections-per-address = 2 \r\nslots=3\n";
  ServerProcess server({.options = {"--config", folder.Path("webd.conf"), "--connections-per-address=1"}});
  HttpClient first(server.Port());
  EXPECT_EQ(first.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  HttpClient second(server.Port());
  ExpectRefusal(second.Read(), 503);
  std::ofstream(folder.Path("bad.conf")) << "slots=3\nslots\n";
  ExpectRefusedStart({"--config", folder.Path("bad.conf")}, "bad.conf:2: no key=value line");
}

TEST(StartTest, TheFirstAnswerComesWithinATenthOfASecond) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "sanitizers take their time";
#endif
  auto best = std::chrono::milliseconds::max();
  for (int round = 0; round < 5; ++round) {
    const auto begin = std::chrono::steady_clock::now();
    ServerProcess server;
    ASSERT_EQ(Call(server.Port(), "VORN.Test.Echo/1/get").status, 200);
    best =
        std::min(best, std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - begin));
  }
  EXPECT_LT(best.count(), 100);
}

/// A listening socket on a free loopback port; inherited as descriptor 3.
class InheritedSocketTest : public testing::Test {
protected:
  InheritedSocketTest() : descriptor_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    EXPECT_EQ(bind(descriptor_, reinterpret_cast<sockaddr *>(&address), size), 0);
    EXPECT_EQ(getsockname(descriptor_, reinterpret_cast<sockaddr *>(&address), &size), 0);
    port_ = ntohs(address.sin_port);
  }
  ~InheritedSocketTest() override { close(descriptor_); }

  void HandOver(const char *count, bool toThisProcess = true) const {
    dup2(descriptor_, 3);
    fcntl(3, F_SETFD, 0);
    setenv("LISTEN_PID", std::to_string(toThisProcess ? getpid() : getpid() + 1).c_str(), 1);
    setenv("LISTEN_FDS", count, 1);
    setenv("LISTEN_FDNAMES", "web", 1);
  }

  int descriptor_;
  int port_ = 0;
};

TEST_F(InheritedSocketTest, IsServedOn) {
  ASSERT_EQ(listen(descriptor_, 10), 0);
  ServerProcess server({.listen = false, .inChild = [this] { HandOver("1"); }});
  ASSERT_EQ(server.Port(), port_) << server.Log();
  EXPECT_EQ(Call(port_, "VORN.Test.Echo/1/get").status, 200);
  EXPECT_EQ(server.Stop(), 0);
}

TEST_F(InheritedSocketTest, OfAnotherProcessIsLeftAlone) {
  ASSERT_EQ(listen(descriptor_, 10), 0);
  ServerProcess server({.inChild = [this] { HandOver("1", false); }});
  EXPECT_NE(server.Port(), 0) << server.Log();
  EXPECT_NE(server.Port(), port_);
}

TEST_F(InheritedSocketTest, ThatDoesNotListenIsRefused) {
  ServerProcess server({.inChild = [this] { HandOver("1"); }});
  EXPECT_EQ(server.Wait(), 1);
  EXPECT_NE(server.Log().find("descriptor 3, handed over, is no listening TCP socket"), std::string::npos);
}

TEST_F(InheritedSocketTest, WithASecondIsRefused) {
  ASSERT_EQ(listen(descriptor_, 10), 0);
  ServerProcess server({.inChild = [this] { HandOver("2"); }});
  EXPECT_EQ(server.Wait(), 1);
  EXPECT_NE(server.Log().find("more than one listening socket was handed over"), std::string::npos);
}

TEST(StopTest, BothSignalsEndItInOrder) {
  for (const int signal : {SIGTERM, SIGINT}) {
    ServerProcess server;
    HttpClient idle(server.Port());
    EXPECT_EQ(idle.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
    server.Signal(signal);
    EXPECT_EQ(server.Wait(std::chrono::seconds(3)), 0);
    EXPECT_TRUE(idle.ClosedByServer());
    EXPECT_NE(server.Log().find(": stopped\n"), std::string::npos) << server.Log();
  }
}

std::string WaitBody(const Folder &folder) {
  return "{\"entered\":\"" + folder.Path("entered") + "\",\"until\":\"" + folder.Path("until") + "\"}";
}

TEST(StopTest, CallsAtWorkAreFinishedAndNewOnesRefused) {
  const Folder folder;
  ServerProcess server({.options = {"--slots", "1"}});
  HttpClient working(server.Port());
  working.Send(CallBytes("VORN.Test.Wait/1/get", WaitBody(folder)));
  ASSERT_EQ(folder.WaitForLines("entered", 1).size(), 1U);
  HttpClient queued(server.Port());
  queued.Send(CallBytes("VORN.Test.Echo/1/get"));
  HttpClient half(server.Port());
  half.Send("POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\n");
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  server.Signal(SIGTERM);
  ExpectRefusal(queued.Read(), 503);
  ExpectRefusal(half.Read(), 503);
  EXPECT_FALSE(HttpClient(server.Port()).Connected());
  folder.Make("until");
  const vorntest::HttpAnswer answer = working.Read();
  EXPECT_EQ(answer.body, R"({"success":true,"data":"waited"})");
  EXPECT_EQ(answer.fields.at("connection"), "close");
  working.Close();
  queued.Close();
  half.Close();
  EXPECT_EQ(server.Wait(), 0);
  EXPECT_NE(server.Log().find(": stopped\n"), std::string::npos) << server.Log();
}

TEST(StopTest, CallbacksRunBeforeTheEnd) {
  const Folder folder;
  ServerProcess server;
  HttpClient client(server.Port());
  const std::string paths = "\"path\":\"" + folder.Path("path") + "\",\"callback_until\":\"" + folder.Path("go") + "\"";
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Callback/1/set", "{" + paths + ",\"lines\":[\"one\"]}")).status, 200);
  client.Send(CallBytes("VORN.Test.Callback/1/set", "{\"lines\":[\"two\"]," + paths + ",\"entered\":\"" +
                                                        folder.Path("entered") + "\",\"until\":\"" +
                                                        folder.Path("until") + "\"}"));
  ASSERT_EQ(folder.WaitForLines("entered", 1).size(), 1U);
  server.Signal(SIGTERM);
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  folder.Make("until");
  EXPECT_EQ(client.Read().status, 200);
  folder.Make("go");
  EXPECT_EQ(server.Wait(), 0);
  const std::vector<std::string> lines = folder.Lines("path");
  EXPECT_EQ(std::multiset<std::string>(lines.begin(), lines.end()), (std::multiset<std::string>{"one", "two"}));
}

TEST(StopTest, ACallThatDoesNotEndIsLeftBehind) {
  const Folder folder;
  ServerProcess server({.options = {"--stop-time", "200ms"}});
  HttpClient client(server.Port());
  client.Send(CallBytes("VORN.Test.Wait/1/get", WaitBody(folder)));
  ASSERT_EQ(folder.WaitForLines("entered", 1).size(), 1U);
  server.Signal(SIGTERM);
  EXPECT_EQ(server.Wait(std::chrono::seconds(5)), 0);
  EXPECT_NE(server.Log().find("stopped with calls and 0 poll tasks still running"), std::string::npos) << server.Log();
}

TEST(StopTest, ABrokenPipeDoesNotEndIt) {
  ServerProcess server;
  server.Signal(SIGPIPE);
  EXPECT_EQ(Call(server.Port(), "VORN.Test.Echo/1/get").status, 200);
  EXPECT_EQ(server.Stop(), 0);
}

} // namespace
