// Malformed, ambiguous and hostile HTTP: each has its clear answer, and the same process serves on.
#include "tests/webapi/webapi_fixture.h"

#include <ostream>
#include <vector>

using vorntest::CallBytes;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::WebApiTest;

namespace {

struct Probe {
  std::string name;
  std::string bytes;
  int status;
};

void PrintTo(const Probe &probe, std::ostream *out) {
  *out << probe.name;
}

const std::string kPost = "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN "";
const std::string kJson = "Content-Type: application/json\r\n";

std::string PostWith(const std::string &fields, const std::string &body = "{}") {
  return kPost + kJson + fields + "\r\n" + body;
}

std::string Line(const std::string &requestLine) {
  return requestLine + "\r\nHost: localhost\r\n" VORN_TEST_LOGIN "\r\n";
}

std::string Fields(int count) {
  std::string fields;
  for (int index = 0; index < count; ++index) {
    fields += "X-" + std::to_string(index) + ": a\r\n";
  }
  return fields;
}

std::string Cookies(int count) {
  std::string fields;
  for (int index = 0; index < count; ++index) {
    fields += "Cookie: a=" + std::to_string(index) + "\r\n";
  }
  return fields;
}

/// These are refused and the connection closed: what follows on it cannot be told apart any more.
class RefusedProbe : public WebApiTest, public testing::WithParamInterface<Probe> {};

TEST_P(RefusedProbe, IsAnsweredAndTheConnectionClosed) {
  HttpClient client(server_.Port());
  // A good request behind a bad one must not be served on the same connection.
  ExpectRefusal(client.Exchange(GetParam().bytes + CallBytes("VORN.Test.Echo/1/get")), GetParam().status);
  EXPECT_TRUE(client.ClosedByServer(std::chrono::seconds(4)));
}

const std::vector<Probe> kLengthProbes = {
    {"TwoDifferentContentLengths", PostWith("Content-Length: 2\r\nContent-Length: 3\r\n"), 400},
    {"TwoEqualContentLengths", PostWith("Content-Length: 2\r\nContent-Length: 2\r\n"), 400},
    {"ContentLengthList", PostWith("Content-Length: 2,2\r\n"), 400},
    {"ContentLengthAndChunked", PostWith("Content-Length: 2\r\nTransfer-Encoding: chunked\r\n"), 400},
    {"ChunkedAndContentLength", PostWith("Transfer-Encoding: chunked\r\nContent-Length: 2\r\n"), 400},
    {"NegativeContentLength", PostWith("Content-Length: -1\r\n"), 400},
    {"SignedContentLength", PostWith("Content-Length: +2\r\n"), 400},
    {"HexadecimalContentLength", PostWith("Content-Length: 0x2\r\n"), 400},
    {"ContentLengthWithLetters", PostWith("Content-Length: 2x\r\n"), 400},
    {"EmptyContentLength", PostWith("Content-Length:\r\n"), 400},
    {"ContentLengthWithBlank", PostWith("Content-Length: 1 2\r\n"), 400},
    {"ContentLengthOf2To63", PostWith("Content-Length: 9223372036854775808\r\n"), 400},
    {"ContentLengthOf2To64And2", PostWith("Content-Length: 18446744073709551618\r\n"), 400},
    {"ContentLengthOf10MB", PostWith("Content-Length: 10485760\r\n"), 413},
    {"ContentLengthOneOverTheLimit", PostWith("Content-Length: 1048577\r\n"), 413},
    {"UnknownTransferCoding", PostWith("Transfer-Encoding: xchunked\r\n"), 501},
    {"ChunkedThenIdentity", PostWith("Transfer-Encoding: chunked, identity\r\n"), 501},
    {"GzipThenChunked", PostWith("Transfer-Encoding: gzip, chunked\r\n"), 501},
    {"TwoTransferEncodings", PostWith("Transfer-Encoding: chunked\r\nTransfer-Encoding: chunked\r\n"), 400},
    {"ChunkedInHttp10",
     "POST /webapi/VORN.Test.Echo/1/get HTTP/1.0\r\nContent-Type: application/json\r\nTransfer-Encoding: chunked\r\n"
     "\r\n2\r\n{}\r\n0\r\n\r\n",
     400},
    {"ChunkSizeThatIsNone", PostWith("Transfer-Encoding: chunked\r\n", "zz\r\n{}\r\n0\r\n\r\n"), 400},
    {"ChunkSizeBeyond64Bits", PostWith("Transfer-Encoding: chunked\r\n", "10000000000000000\r\n{}\r\n0\r\n\r\n"), 400},
    {"ChunkOverTheLimit", PostWith("Transfer-Encoding: chunked\r\n", "100001\r\n{}"), 413},
    {"ChunkWithoutItsEnd", PostWith("Transfer-Encoding: chunked\r\n", "2\r\n{}xx0\r\n\r\n"), 400},
    {"EndlessChunkExtension", PostWith("Transfer-Encoding: chunked\r\n", "2;" + std::string(40'000, 'x')), 400},
};

const std::vector<Probe> kHeaderProbes = {
    {"SpaceBeforeColon", kPost + "X-A : b\r\n\r\n", 400},
    {"FieldWithoutColon", kPost + "X-A\r\n\r\n", 400},
    {"FieldWithoutName", kPost + ": b\r\n\r\n", 400},
    {"FoldedLine", kPost + "X-A: b\r\n c\r\n\r\n", 400},
    {"BareLineFeed", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\nHost: localhost\n\n", 400},
    {"BareLineFeedAfterAField", kPost + "X-A: b\n\r\n", 400},
    {"BareCarriageReturn", kPost + "X-A: b\rc\r\n\r\n", 400},
    {"NulInAField", kPost + std::string("X-A: b\0c\r\n\r\n", 12), 400},
    {"ConnectionWithAnEmptyOption", kPost + "Connection: a,,b\r\n\r\n", 400},
    {"UnknownExpectation", kPost + "Expect: miracles\r\n\r\n", 417},
    {"NoHost", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\n\r\n", 400},
    {"TwoHosts", kPost + "Host: localhost\r\n" VORN_TEST_LOGIN "\r\n", 400},
    {"EmptyHost", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost:\r\n\r\n", 400},
    {"ForeignHost", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: evil.example\r\n\r\n", 421},
    {"ForeignAddressAsHost", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: 192.0.2.1\r\n\r\n", 421},
    {"HostThatEndsAsOurs", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost.evil.example\r\n\r\n", 421},
    {"HostWithUser", "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: a@localhost\r\n\r\n", 400},
    {"FieldOf64KB", kPost + "X-A: " + std::string(65'536, 'a') + "\r\n\r\n", 431},
    {"TwoThousandFields", kPost + Fields(2'000) + "\r\n", 431},
    {"OneFieldOverTheLimit", kPost + Fields(100) + "\r\n", 431},
    {"CookieOf1MB", kPost + "Cookie: " + std::string(1'048'576, 'a') + "\r\n\r\n", 431},
    {"TenThousandCookies", kPost + Cookies(10'000) + "\r\n", 431},
    {"ForeignHostOfAPersonLoggedIn",
     "POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\n" VORN_TEST_LOGIN "Host: evil.example\r\n\r\n", 421},
    {"HeaderOneByteOverTheLimit", kPost + "X: " + std::string(8192 - 24 + 1, 'a') + "\r\n\r\n", 431},
};

const std::vector<Probe> kLineProbes = {
    {"Http09", "GET /webapi/VORN.Test.Echo/1/get\r\n", 400},
    {"Http2Preface", "PRI * HTTP/2.0\r\n\r\nSM\r\n\r\n", 505},
    {"Version99", Line("POST /webapi/VORN.Test.Echo/1/get HTTP/9.9"), 505},
    {"VersionWithoutPoint", Line("POST /webapi/VORN.Test.Echo/1/get HTTP/1"), 400},
    {"VersionInLowerCase", Line("POST /webapi/VORN.Test.Echo/1/get http/1.1"), 400},
    {"VersionWithTwoDigits", Line("POST /webapi/VORN.Test.Echo/1/get HTTP/1.10"), 400},
    {"AbsoluteForm", Line("POST http://localhost/webapi/VORN.Test.Echo/1/get HTTP/1.1"), 400},
    {"AuthorityForm", Line("CONNECT localhost:80 HTTP/1.1"), 400},
    {"AsteriskForm", Line("OPTIONS * HTTP/1.1"), 400},
    {"UnknownMethod", Line("BREW /webapi/VORN.Test.Echo/1/get HTTP/1.1"), 501},
    {"MethodInLowerCase", Line("post /webapi/VORN.Test.Echo/1/get HTTP/1.1"), 501},
    {"TwoBlanks", Line("POST  /webapi/VORN.Test.Echo/1/get HTTP/1.1"), 400},
    {"TabInstead", Line("POST\t/webapi/VORN.Test.Echo/1/get HTTP/1.1"), 400},
    {"ControlCharacterInTarget", Line("POST /webapi/\x01 HTTP/1.1"), 400},
    {"LetterBeyondAsciiInTarget", Line("POST /webapi/\xC3\xA4 HTTP/1.1"), 400},
    {"LeadingBlank", Line(" POST /webapi/VORN.Test.Echo/1/get HTTP/1.1"), 400},
    {"NoMethod", Line("/webapi/VORN.Test.Echo/1/get HTTP/1.1"), 400},
    {"TlsHello", std::string("\x16\x03\x01\x02\x00\x01\x00\x01\xfc\x03\x03\n\n", 13), 400},
    {"LongRequestLine", Line("POST /" + std::string(9'000, 'a') + " HTTP/1.1"), 414},
    {"EndlessRequestLine", "POST /" + std::string(70'000, 'a'), 414},
};

std::string NameOf(const testing::TestParamInfo<Probe> &info) {
  return info.param.name;
}

INSTANTIATE_TEST_SUITE_P(Length, RefusedProbe, testing::ValuesIn(kLengthProbes), NameOf);
INSTANTIATE_TEST_SUITE_P(Header, RefusedProbe, testing::ValuesIn(kHeaderProbes), NameOf);
INSTANTIATE_TEST_SUITE_P(Line, RefusedProbe, testing::ValuesIn(kLineProbes), NameOf);

class HttpTest : public WebApiTest {};

TEST_F(HttpTest, ABodyInChunksIsTaken) {
  HttpClient client(server_.Port());
  const HttpAnswer answer =
      client.Exchange(PostWith("Transfer-Encoding: chunked\r\n", "3;x=y\r\n{\"a\r\n4\r\n\":1}\r\n0\r\nX: y\r\n\r\n"));
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, R"({"success":true,"data":{"a":1}})");
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).body, R"({"success":true,"data":{}})");
}

TEST_F(HttpTest, ARequestThatComesByteByByteIsServed) {
  HttpClient client(server_.Port());
  for (const char c : PostWith("Transfer-Encoding: chunked\r\n", "7\r\n{\"a\":1}\r\n0\r\n\r\n")) {
    ASSERT_TRUE(client.Send({&c, 1}));
  }
  EXPECT_EQ(client.Read().body, R"({"success":true,"data":{"a":1}})");
}

TEST_F(HttpTest, PipelinedRequestsAreAnsweredInOrder) {
  HttpClient client(server_.Port());
  std::string bytes;
  for (int index = 0; index < 1'000; ++index) {
    bytes += CallBytes("VORN.Test.Echo/1/get", "{\"a\":" + std::to_string(index) + "}");
  }
  ASSERT_TRUE(client.Send(bytes));
  for (int index = 0; index < 1'000; ++index) {
    ASSERT_EQ(client.Read().body, "{\"success\":true,\"data\":{\"a\":" + std::to_string(index) + "}}");
  }
}

TEST_F(HttpTest, ExpectContinueIsAnsweredBeforeTheBody) {
  HttpClient client(server_.Port());
  ASSERT_TRUE(client.Send(kPost + kJson + "Content-Length: 2\r\nExpect: 100-continue\r\n\r\n"));
  EXPECT_EQ(client.Bytes(std::chrono::seconds(5)), "HTTP/1.1 100 Continue\r\n\r\n");
  EXPECT_EQ(client.Exchange("{}").status, 200);
}

TEST_F(HttpTest, ExpectContinueForAnUnknownRowIsRefusedAtOnce) {
  HttpClient client(server_.Port());
  ExpectRefusal(client.Exchange("POST /webapi/none HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN
                                "Content-Length: 2\r\n"
                                "Expect: 100-continue\r\n\r\n"),
                404);
  EXPECT_TRUE(client.ClosedByServer());
}

TEST_F(HttpTest, AConnectionLivesOnUnlessToldOtherwise) {
  HttpClient client(server_.Port());
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).fields.count("connection"), 0U);
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/none")).status, 404);
  const HttpAnswer last = client.Exchange(CallBytes("VORN.Test.Echo/1/get", "", "Connection: close\r\n"));
  EXPECT_EQ(last.status, 200);
  EXPECT_EQ(last.fields.at("connection"), "close");
  EXPECT_TRUE(client.ClosedByServer());
}

TEST_F(HttpTest, Http10IsServedOnceAndNeedsNoHost) {
  HttpClient client(server_.Port());
  EXPECT_EQ(client.Exchange("POST /webapi/VORN.Test.Echo/1/get HTTP/1.0\r\n" VORN_TEST_LOGIN "\r\n").status, 200);
  EXPECT_TRUE(client.ClosedByServer());
}

TEST_F(HttpTest, OwnHostsAreTaken) {
  for (const char *host : {"localhost", "LOCALHOST:1", "127.0.0.1", "127.0.0.1:8080", "[::1]", "[::1]:443"}) {
    HttpClient client(server_.Port());
    EXPECT_EQ(client
                  .Exchange(std::string("POST /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: ") + host +
                            "\r\n" VORN_TEST_LOGIN "\r\n")
                  .status,
              200)
        << host;
  }
}

TEST_F(HttpTest, AnEmptyLineBeforeARequestIsPassedOver) {
  HttpClient client(server_.Port());
  EXPECT_EQ(client.Exchange("\r\n" + CallBytes("VORN.Test.Echo/1/get")).status, 200);
}

TEST_F(HttpTest, ALargeRefusedBodyDoesNotHideTheRefusal) {
  HttpClient client(server_.Port());
  std::string body;
  body.resize(10'485'760, ' ');
  client.Send(PostWith("Content-Length: 10485760\r\n", body));
  ExpectRefusal(client.Read(), 413);
}

TEST_F(HttpTest, ABodyOfExactlyTheLimitIsTaken) {
  std::string body = R"({"a":")";
  body += std::string(1'048'576 - body.size() - 2, 'x') + "\"}";
  const HttpAnswer answer = Call("VORN.Test.Echo/1/get", body);
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, R"({"success":true,"data":)" + body + "}");
}

TEST_F(HttpTest, AClientThatGoesInTheMiddleCostsNothing) {
  for (const std::string &bytes : {std::string(), std::string("PO"), kPost, PostWith("Content-Length: 100\r\n")}) {
    for (int way = 0; way < 3; ++way) {
      HttpClient client(server_.Port());
      client.Send(bytes);
      way == 0 ? client.Close() : way == 1 ? client.Reset() : client.CloseWriting();
    }
    ExpectServing();
  }
}

TEST_F(HttpTest, TheOverrideOfAMethodIsIgnored) {
  HttpClient client(server_.Port());
  ExpectRefusal(client.Exchange("GET /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN ""
                                "X-HTTP-Method-Override: POST\r\n\r\n"),
                405);
}

} // namespace
