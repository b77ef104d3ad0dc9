// Slow clients, many clients, no descriptors.
#include "tests/webapi/webapi_fixture.h"

#include <sys/resource.h>

#include <fstream>
#include <memory>

using std::chrono::milliseconds;
using vorntest::CallBytes;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::ServerProcess;
using vorntest::WebApiTest;

namespace {

const std::string kPost = "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN "";

using Clock = std::chrono::steady_clock;

/// Sends the text a byte at a time until the server answers or the text is over.
/// @return how long it took
milliseconds Drip(HttpClient &client, const std::string &text, milliseconds pause, HttpAnswer &answer) {
  const auto begin = Clock::now();
  for (const char c : text) {
    client.Send({&c, 1});
    answer = client.Read(pause);
    if (answer.status != 0) {
      break;
    }
  }
  return std::chrono::duration_cast<milliseconds>(Clock::now() - begin);
}

class DeadlineTest : public WebApiTest {
protected:
  DeadlineTest()
      : WebApiTest({"--header-time", "400ms", "--body-time", "600ms", "--idle-time", "800ms", "--write-time", "700ms",
                    "--connections-per-address", "1000"}) {}
};

TEST_F(DeadlineTest, AHeaderThatDripsIsCutAtTheDeadline) {
  HttpClient client(server_.Port());
  HttpAnswer answer;
  const milliseconds took = Drip(client, kPost + "X-A: " + std::string(500, 'a'), milliseconds(10), answer);
  ExpectRefusal(answer, 408);
  EXPECT_GE(took, milliseconds(250));
  EXPECT_LE(took, milliseconds(1500));
  EXPECT_TRUE(client.ClosedByServer(std::chrono::seconds(4)));
  EXPECT_TRUE(server_.LogShows("a request took too long and was cut"));
}

TEST_F(DeadlineTest, ABodyThatDripsIsCutAtTheDeadline) {
  HttpClient client(server_.Port());
  ASSERT_TRUE(client.Send(kPost + "Content-Type: application/json\r\nContent-Length: 1000\r\n\r\n"));
  HttpAnswer answer;
  const milliseconds took = Drip(client, std::string(1'000, ' '), milliseconds(10), answer);
  ExpectRefusal(answer, 408);
  EXPECT_GE(took, milliseconds(400));
  EXPECT_LE(took, milliseconds(2000));
}

TEST_F(DeadlineTest, ASilentConnectionIsClosedWithoutAWord) {
  const auto begin = Clock::now();
  HttpClient client(server_.Port());
  EXPECT_TRUE(client.ClosedByServer());
  EXPECT_GE(Clock::now() - begin, milliseconds(600));
  EXPECT_LE(Clock::now() - begin, milliseconds(2500));
}

TEST_F(DeadlineTest, AnIdleConnectionIsClosedAfterAnAnswer) {
  HttpClient client(server_.Port());
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  EXPECT_TRUE(client.ClosedByServer());
}

TEST_F(DeadlineTest, ACallMayTakeLongerThanEveryDeadline) {
  HttpClient client(server_.Port());
  ASSERT_TRUE(client.Send(CallBytes("VORN.Test.Wait/1/get", "{\"until\":\"" + folder_.Path("until") + "\"}")));
  std::this_thread::sleep_for(milliseconds(1'500));
  folder_.Make("until");
  EXPECT_EQ(client.Read().status, 200);
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
}

TEST_F(DeadlineTest, AClientThatTakesNothingIsCut) {
  HttpClient client(server_.Port(), 4'096);
  ASSERT_TRUE(client.Send(CallBytes("VORN.Test.Large/1/get", R"({"bytes":30000000})")));
  EXPECT_TRUE(server_.LogShows("a client did not take its answer and was cut"));
}

TEST_F(DeadlineTest, ACallbackRunsWhenTheClientTakesNothing) {
  HttpClient client(server_.Port(), 4'096);
  ASSERT_TRUE(client.Send(CallBytes("VORN.Test.Callback/1/set", "{\"path\":\"" + folder_.Path("path") +
                                                                    R"(","lines":["once"],"bytes":30000000})")));
  EXPECT_EQ(folder_.WaitForLines("path", 1), std::vector<std::string>{"once"});
}

TEST_F(DeadlineTest, ManyHalfSentHeadersDoNotHinderAnother) {
  std::vector<std::unique_ptr<HttpClient>> slow;
  for (int index = 0; index < 200; ++index) {
    slow.push_back(std::make_unique<HttpClient>(server_.Port()));
    ASSERT_TRUE(slow.back()->Send(kPost));
  }
  ExpectServing();
  for (const auto &each : slow) {
    ExpectRefusal(each->Read(), 408);
  }
}

class AddressLimitTest : public WebApiTest {
protected:
  AddressLimitTest() : WebApiTest({"--connections-per-address", "5"}) {}
};

TEST_F(AddressLimitTest, ConnectionsBeyondTheLimitAreTurnedAway) {
  std::vector<std::unique_ptr<HttpClient>> clients;
  for (int index = 0; index < 5; ++index) {
    clients.push_back(std::make_unique<HttpClient>(server_.Port()));
    EXPECT_EQ(clients.back()->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  }
  HttpClient one(server_.Port());
  ExpectRefusal(one.Read(), 503);
  EXPECT_TRUE(one.ClosedByServer());
  EXPECT_TRUE(server_.LogShows("127.0.0.1: too many connections of this client"));
  clients.pop_back();
  const auto deadline = Clock::now() + std::chrono::seconds(5);
  int status = 0;
  while (status != 200 && Clock::now() < deadline) {
    status = Call("VORN.Test.Echo/1/get").status;
  }
  EXPECT_EQ(status, 200);
  for (const auto &each : clients) {
    EXPECT_EQ(each->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  }
  clients.clear();
}

TEST_F(AddressLimitTest, AFloodIsLoggedInAFewLines) {
  std::vector<std::unique_ptr<HttpClient>> clients;
  clients.reserve(100);
  for (int index = 0; index < 100; ++index) {
    clients.push_back(std::make_unique<HttpClient>(server_.Port()));
  }
  ASSERT_TRUE(server_.LogShows("too many connections of this client"));
  clients.clear();
  std::this_thread::sleep_for(milliseconds(200));
  const std::string log = server_.Log();
  size_t lines = 0;
  for (size_t at = log.find("too many"); at != std::string::npos; at = log.find("too many", at + 1)) {
    ++lines;
  }
  EXPECT_LE(lines, 10U);
}

TEST(Idleness, CostsNoProcessorTime) {
  ServerProcess server;
  HttpClient client(server.Port());
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  std::this_thread::sleep_for(milliseconds(400)); // threads that watched the call go to sleep
  const long before = server.ProcessorTime();
  std::this_thread::sleep_for(milliseconds(1'000));
  EXPECT_LE(server.ProcessorTime() - before, 2); // of 100 a second
  EXPECT_EQ(server.Stop(), 0);
}

TEST(DescriptorLimit, RunningOutIsSurvivedWithoutABusyLoop) {
  ServerProcess server({.options = {"--connections-per-address", "1000", "--slots", "2"}, .inChild = [] {
                          const rlimit few{40, 40};
                          setrlimit(RLIMIT_NOFILE, &few);
                        }});
  ASSERT_NE(server.Port(), 0) << server.Log();
  std::vector<std::unique_ptr<HttpClient>> clients;
  clients.push_back(std::make_unique<HttpClient>(server.Port()));
  // The undefined-behaviour sanitizer needs a descriptor at its first look at a class.
  EXPECT_EQ(clients.front()->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  for (int index = 0; index < 60; ++index) {
    clients.push_back(std::make_unique<HttpClient>(server.Port()));
  }
  EXPECT_TRUE(server.LogShows("no connection can be accepted: Too many open files"));
  EXPECT_EQ(clients.front()->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200) << server.Log();
  const long before = server.ProcessorTime();
  std::this_thread::sleep_for(milliseconds(1'000));
  EXPECT_LT(server.ProcessorTime() - before, 20); // of 100 a second
  for (int index = 0; index < 40; ++index) {
    clients.erase(clients.begin());
  }
  EXPECT_EQ(clients.back()->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  clients.clear();
  EXPECT_EQ(server.Stop(), 0);
}

TEST(ConnectionLimit, BeyondAllConnectionsOneIsTurnedAway) {
  ServerProcess server({.options = {"--connections", "3"}});
  std::vector<std::unique_ptr<HttpClient>> clients;
  for (int index = 0; index < 3; ++index) {
    clients.push_back(std::make_unique<HttpClient>(server.Port()));
    EXPECT_EQ(clients.back()->Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  }
  HttpClient one(server.Port());
  ExpectRefusal(one.Read(), 503);
  EXPECT_TRUE(server.LogShows("127.0.0.1: too many connections"));
  EXPECT_EQ(server.Stop(), 0);
}

} // namespace
