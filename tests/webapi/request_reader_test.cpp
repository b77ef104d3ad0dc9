#include "webapi/request_reader.h"

#include <cstdint>
#include <gtest/gtest.h>

using vornwebapi::HostRule;
using vornwebapi::HttpLimits;
using vornwebapi::RequestReader;
using State = RequestReader::State;

namespace {

const std::vector<std::string> kNames = {"localhost"};

class RequestReaderTest : public testing::Test {
protected:
  /// Advances through the header too.
  static State Go(RequestReader &reader, std::string_view bytes) {
    reader.Feed(bytes);
    State state = reader.Advance();
    if (state == State::kHead) {
      reader.ReadBody(SIZE_MAX);
      state = reader.Advance();
    }
    return state;
  }

  HttpLimits limits_;
  HostRule hosts_{&kNames, "192.0.2.7"};
};

TEST_F(RequestReaderTest, TheSameComesOfAnySplit) {
  const std::string bytes = "POST /a HTTP/1.1\r\nHost: localhost\r\nTransfer-Encoding: chunked\r\n\r\n"
                            "2;x=\"y\"\r\nab\r\n1\r\nc\r\n0\r\nX: y\r\n\r\n";
  for (size_t first = 0; first <= bytes.size(); ++first) {
    for (size_t second = first; second <= bytes.size(); second += 7) {
      RequestReader reader(limits_, hosts_);
      Go(reader, bytes.substr(0, first));
      Go(reader, bytes.substr(first, second - first));
      ASSERT_EQ(Go(reader, bytes.substr(second)), State::kDone) << first << " " << second;
      ASSERT_EQ(reader.Body(), "abc");
      ASSERT_EQ(reader.Head().target, "/a");
      ASSERT_FALSE(reader.HasBytes());
    }
  }
}

TEST_F(RequestReaderTest, TheNextRequestBeginsWhereTheFirstEnds) {
  RequestReader reader(limits_, hosts_);
  ASSERT_EQ(Go(reader, "POST /a HTTP/1.1\r\nHost: localhost\r\nContent-Length: 1\r\n\r\nxPOST /b HTTP/1.1\r\nHost: "),
            State::kDone);
  EXPECT_EQ(reader.Body(), "x");
  reader.Next();
  EXPECT_EQ(reader.Advance(), State::kHeader);
  ASSERT_EQ(Go(reader, "localhost\r\n\r\n"), State::kDone);
  EXPECT_EQ(reader.Head().target, "/b");
  EXPECT_EQ(reader.Body(), "");
  reader.Next();
  EXPECT_EQ(reader.Advance(), State::kIdle);
}

TEST_F(RequestReaderTest, EmptyLinesBeforeARequestAreNoneHoweverTheyCome) {
  RequestReader reader(limits_, hosts_);
  for (const char *piece : {"\r", "\n\r\n", "\r\n\r"}) {
    EXPECT_EQ(Go(reader, piece), State::kIdle);
  }
  EXPECT_EQ(Go(reader, "\nPOST /a HTTP/1.1\r\nHost: localhost\r\n\r\n"), State::kDone);
}

TEST_F(RequestReaderTest, ItsOwnAddressIsAHost) {
  RequestReader reader(limits_, hosts_);
  EXPECT_EQ(Go(reader, "POST /a HTTP/1.1\r\nHost: 192.0.2.7:8080\r\n\r\n"), State::kDone);
  RequestReader other(limits_, hosts_);
  EXPECT_EQ(Go(other, "POST /a HTTP/1.1\r\nHost: 192.0.2.8\r\n\r\n"), State::kFailed);
  EXPECT_EQ(other.Fault().status, 421U);
}

TEST_F(RequestReaderTest, LimitsAreExact) {
  limits_ = {.requestLineBytes = 40, .headerBytes = 60, .headerFields = 2, .bodyBytes = 3};
  const auto status = [this](const std::string &bytes) {
    RequestReader reader(limits_, hosts_);
    return Go(reader, bytes) == State::kFailed ? reader.Fault().status : 200U;
  };
  const std::string line = "POST /a HTTP/1.1\r\n";
  const std::string host = "Host: localhost\r\n"; // 17 bytes
  EXPECT_EQ(status("POST /" + std::string(25, 'a') + " HTTP/1.1\r\n" + host + "\r\n"), 200U);
  EXPECT_EQ(status("POST /" + std::string(26, 'a') + " HTTP/1.1\r\n" + host + "\r\n"), 414U);
  EXPECT_EQ(status("POST /" + std::string(36, 'a')), 414U);
  EXPECT_EQ(status(line + host + "X: " + std::string(36, 'a') + "\r\n\r\n"), 200U); // 60 with the empty line
  EXPECT_EQ(status(line + host + "X: " + std::string(37, 'a') + "\r\n\r\n"), 431U);
  EXPECT_EQ(status(line + host + "X: " + std::string(60, 'a')), 431U);
  EXPECT_EQ(status(line + host + "X: a\r\n\r\n"), 200U);
  EXPECT_EQ(status(line + host + "X: a\r\nY: b\r\n\r\n"), 431U);
  EXPECT_EQ(status(line + host + "Content-Length: 3\r\n\r\nabc"), 200U);
  EXPECT_EQ(status(line + host + "Content-Length: 4\r\n\r\nabcd"), 413U);
  limits_.headerBytes = 100;
  EXPECT_EQ(status(line + host + "Transfer-Encoding: chunked\r\n\r\n1\r\na\r\n2\r\nbc\r\n0\r\n\r\n"), 200U);
  EXPECT_EQ(status(line + host + "Transfer-Encoding: chunked\r\n\r\n1\r\na\r\n3\r\nbcd\r\n0\r\n\r\n"), 413U);
}

TEST_F(RequestReaderTest, AFaultIsFoundAtTheFirstLineThatHasIt) {
  RequestReader reader(limits_, hosts_);
  EXPECT_EQ(Go(reader, "GET /\r\n"), State::kFailed); // HTTP/0.9 has no end of a header to wait for
  EXPECT_EQ(reader.Fault().status, 400U);
  EXPECT_TRUE(reader.Fault().close);
  RequestReader second(limits_, hosts_);
  EXPECT_EQ(Go(second, "POST /a HTTP/1.1\r\nHost : localhost\r\n"), State::kFailed);
}

} // namespace
