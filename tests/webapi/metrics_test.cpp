// The counters, over the real server.
#include "tests/webapi/exposition.h"
#include "tests/webapi/webapi_fixture.h"

#include <chrono>
#include <map>
#include <memory>
#include <sstream>
#include <thread>

using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::WebApiTest;

namespace {

class MetricsTest : public WebApiTest {
protected:
  explicit MetricsTest(std::vector<std::string> options = {}) : WebApiTest(std::move(options)) {}

  HttpAnswer Get(const std::string &target, const std::string &fields = VORN_TEST_LOGIN,
                 const std::string &method = "GET") const {
    HttpClient client(server_.Port());
    return client.Exchange(method + " " + target + " HTTP/1.1\r\nHost: localhost\r\n" + fields + "\r\n");
  }
  /// Sample to value.
  std::map<std::string, double> Samples() const {
    std::map<std::string, double> samples;
    std::istringstream lines(Get("/metrics").body);
    for (std::string line; std::getline(lines, line);) {
      if (line.front() != '#') {
        EXPECT_TRUE(samples.emplace(line.substr(0, line.rfind(' ')), std::stod(line.substr(line.rfind(' ')))).second)
            << "twice: " << line;
      }
    }
    return samples;
  }
  /// A connection that its client has closed counts until the server has seen that.
  bool Settles(const std::string &sample, double value) const {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
    while (Samples().at(sample) != value) {
      if (std::chrono::steady_clock::now() > deadline) {
        return false;
      }
    }
    return true;
  }
};

std::string Requests(const std::string &row, const std::string &outcome) {
  return "vornwebd_requests_total{row=\"" + row + "\",outcome=\"" + outcome + "\"}";
}

TEST_F(MetricsTest, TheTextIsOfThePrometheusFormat) {
  HttpAnswer answer = Get("/metrics");
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.fields["content-type"], "text/plain; version=0.0.4; charset=utf-8");
  EXPECT_EQ(answer.fields["cache-control"], "no-store");
  EXPECT_EQ(vorntest::FaultOfExposition(answer.body), "");
  size_t families = 0;
  for (size_t at = 0; (at = answer.body.find("# TYPE ", at)) != std::string::npos; ++at) {
    ++families;
  }
  EXPECT_EQ(families, 6U);
}

TEST(ExpositionTest, AScrapersObjectionsAreMade) {
  const std::string head = "# HELP a_total Things.\n# TYPE a_total counter\n";
  const std::string histogram = "# HELP h Times.\n# TYPE h histogram\n";
  const std::string sums = "h_sum 1\nh_count 2\n";
  EXPECT_EQ(vorntest::FaultOfExposition(head + "a_total{x=\"a\\\"b,}\",y=\"\"} 1e+06\n"), "");
  EXPECT_EQ(vorntest::FaultOfExposition(histogram + "h_bucket{le=\"1\"} 1\nh_bucket{le=\"+Inf\"} 2\n" + sums), "");
  for (const std::string &bad :
       {std::string(),
        head,
        head + "a_total 1",
        head + "\na_total 1\n",
        head + "a_total 1 \n",
        head + "a_total one\n",
        head + "a_total -1\n",
        head + "a_total NaN\n",
        head + "a_total{x=\"1\"\n",
        head + "a_total{} 1\n",
        head + "a_total{x=\"1\",} 1\n",
        head + "a_total{x=\"1\",x=\"2\"} 1\n",
        head + "a_total{x=\"\\q\"} 1\n",
        head + "a_total{1x=\"\"} 1\n",
        head + "a_total 1\na_total 1\n",
        head + "b_total 1\n",
        std::string("a_total 1\n"),
        head + "a_total 1\n" + head + "a_total{x=\"1\"} 1\n",
        std::string("# TYPE a_total counter\na_total 1\n"),
        std::string("# HELP a Things.\n# TYPE a counter\na 1\n"),
        std::string("# HELP a Things.\n# TYPE a text\na 1\n"),
        histogram + "h_bucket{le=\"1\"} 2\n" + sums,
        histogram + "h_bucket{le=\"+Inf\"} 1\n" + sums,
        histogram + "h_bucket{le=\"+Inf\"} 2\n",
        histogram + "h_bucket{le=\"1\"} 3\nh_bucket{le=\"+Inf\"} 2\n" + sums,
        histogram + "h_bucket{le=\"2\"} 1\nh_bucket{le=\"1\"} 1\nh_bucket{le=\"+Inf\"} 2\n" + sums}) {
    EXPECT_NE(vorntest::FaultOfExposition(bad), "") << bad;
  }
}

TEST_F(MetricsTest, EveryOutcomeIsCountedOnce) {
  const auto before = Samples();
  Call("VORN.Test.Echo/1/get");
  Call("VORN.Test.Echo/1/get");
  Call("VORN.Test.Echo/1/error");
  Call("VORN.Test.Throw/1/number");
  Call("VORN.Test.Echo/1/get", "{");
  Get("/webapi/VORN.Test.Echo/2/get", "", "POST");
  Get("/");
  auto after = Samples();
  const auto grown = [&before, &after](const std::string &name) { return after.at(name) - before.at(name); };
  EXPECT_EQ(grown(Requests("VORN.Test.Echo v1 get", "done")), 2);
  EXPECT_EQ(grown(Requests("VORN.Test.Echo v1 get", "refused")), 1);
  EXPECT_EQ(grown(Requests("VORN.Test.Echo v1 error", "failed")), 1);
  EXPECT_EQ(grown(Requests("VORN.Test.Throw v1 number", "broken")), 1);
  EXPECT_EQ(grown(Requests("VORN.Test.Echo v2 get", "refused")), 1);
  EXPECT_EQ(grown(Requests("page", "refused")), 1);
  EXPECT_EQ(grown(Requests("/metrics", "done")), 1);
  EXPECT_EQ(grown("vornwebd_refusals_total{status=\"400\"}"), 1);
  EXPECT_EQ(grown("vornwebd_refusals_total{status=\"401\"}"), 1);
  EXPECT_EQ(grown("vornwebd_refusals_total{status=\"500\"}"), 1);
  EXPECT_EQ(grown("vornwebd_request_duration_seconds_count"), 4);
  EXPECT_TRUE(Settles("vornwebd_connections", 1));
}

TEST_F(MetricsTest, NoLabelComesFromOutside) {
  const size_t before = Samples().size();
  for (int count = 0; count < 50; ++count) {
    Call("VORN.Unknown" + std::to_string(count) + "/1/get");
    Get("/x" + std::to_string(count));
    Get("/webapi/\"} 1\\" + std::to_string(count), "", "POST");
    HttpClient(server_.Port()).Exchange("BAD" + std::to_string(count) + " / HTTP/1.1\r\n\r\n");
  }
  const auto after = Samples();
  EXPECT_EQ(after.size(), before);
  EXPECT_GE(after.at(Requests("none", "refused")), 100);
  EXPECT_EQ(after.at(Requests("none", "broken")), 50);
  EXPECT_EQ(after.at(Requests("page", "refused")), 50);
}

TEST_F(MetricsTest, BucketsOfTimesHoldWhatTheyShould) {
  Call("VORN.Test.Processor/1/get"); // 2 ms at least
  const auto samples = Samples();
  const auto bucket = [&samples](const std::string &bound) {
    return samples.at("vornwebd_request_duration_seconds_bucket{le=\"" + bound + "\"}");
  };
  double last = 0;
  for (const char *bound : {"0.0005", "0.001", "0.005", "0.01", "0.05", "0.1", "0.5", "1", "5", "15", "+Inf"}) {
    EXPECT_GE(bucket(bound), last) << bound;
    last = bucket(bound);
  }
  EXPECT_EQ(bucket("+Inf"), samples.at("vornwebd_request_duration_seconds_count"));
  EXPECT_GE(bucket("+Inf"), bucket("0.001") + 1);
  EXPECT_GE(samples.at("vornwebd_request_duration_seconds_sum"), 0.002);
}

TEST_F(MetricsTest, TasksAndConnectionsAreThoseOfNow) {
  const std::string until = folder_.Path("until");
  EXPECT_EQ(Call("VORN.Test.Task/1/start", R"({"until":")" + until + "\"}").status, 200);
  HttpClient open(server_.Port());
  open.Exchange(vorntest::CallBytes("VORN.Test.Echo/1/get"));
  const auto samples = Samples();
  EXPECT_EQ(samples.at("vornwebd_tasks"), 1);
  EXPECT_TRUE(Settles("vornwebd_connections", 2));
  EXPECT_EQ(samples.at("vornwebd_sessions"), 0);
  folder_.Make("until");
}

TEST_F(MetricsTest, ReportsAreReadWithALoginAndNeverFromElsewhere) {
  for (const char *target : {"/metrics", "/openapi.json"}) {
    EXPECT_EQ(Get(target).status, 200);
    ExpectRefusal(Get(target, ""), 401);
    ExpectRefusal(Get(target, "Sec-Fetch-Site: none\r\nSec-Fetch-Mode: navigate\r\nSec-Fetch-Dest: document\r\n"), 401);
    ExpectRefusal(Get(target, "Authorization: Bearer x\r\n"), 401);
    ExpectRefusal(Get(target, VORN_TEST_LOGIN "Origin: http://evil.example\r\n"), 403);
    ExpectRefusal(Get(target, VORN_TEST_LOGIN "Sec-Fetch-Site: cross-site\r\nSec-Fetch-Mode: navigate\r\n"
                                              "Sec-Fetch-Dest: document\r\n"),
                  403);
    for (const char *method : {"POST", "PUT", "DELETE", "OPTIONS"}) {
      const HttpAnswer answer = Get(target, VORN_TEST_LOGIN, method);
      ExpectRefusal(answer, 405);
      EXPECT_EQ(answer.fields.at("allow"), "GET, HEAD");
    }
    HttpClient client(server_.Port());
    client.Send(std::string("HEAD ") + target +
                " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n" VORN_TEST_LOGIN "\r\n");
    const std::string bytes = client.Bytes(std::chrono::seconds(5));
    EXPECT_EQ(bytes.substr(0, 12), "HTTP/1.1 200");
    EXPECT_EQ(bytes.find("\r\n\r\n"), bytes.size() - 4);
  }
}

class FewConnectionsMetricsTest : public MetricsTest {
protected:
  FewConnectionsMetricsTest() : MetricsTest({"--connections-per-address", "4"}) {}
};

TEST_F(FewConnectionsMetricsTest, ConnectionsThatAreTurnedAwayAreCounted) {
  {
    std::vector<std::unique_ptr<HttpClient>> all;
    for (int count = 0; count < 4; ++count) {
      all.push_back(std::make_unique<HttpClient>(server_.Port()));
      all.back()->Exchange(vorntest::CallBytes("VORN.Test.Echo/1/get"));
    }
    EXPECT_EQ(HttpClient(server_.Port()).Read().status, 503);
  }
  const auto areGone = [this] { // while one of them stands, the next caller may be turned away
    return Get("/metrics").body.find("\nvornwebd_connections 1\n") != std::string::npos;
  };
  bool gone = areGone();
  for (int tries = 0; tries < 1000 && !gone; ++tries) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
    gone = areGone();
  }
  EXPECT_TRUE(gone);
  EXPECT_GE(Samples().at("vornwebd_refusals_total{status=\"503\"}"), 1);
}

} // namespace
