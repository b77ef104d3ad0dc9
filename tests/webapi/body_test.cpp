// JSON bodies, good and hostile, over HTTP.
#include "tests/webapi/webapi_fixture.h"

#include <fstream>

using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::WebApiTest;

namespace {

const std::string kEcho = "VORN.Test.Echo/1/get";

std::string Repeat(const std::string &text, size_t count) {
  std::string out;
  for (size_t index = 0; index < count; ++index) {
    out += text;
  }
  return out;
}

/// {"a":[[...]]} and the like, nested `depth` deep in all.
std::string Arrays(size_t depth) {
  return "{\"a\":" + Repeat("[", depth - 1) + Repeat("]", depth - 1) + "}";
}
std::string Objects(size_t depth) {
  return Repeat("{\"a\":", depth - 1) + "{}" + Repeat("}", depth - 1);
}
std::string Mixed(size_t pairs) {
  return Repeat("{\"a\":[", pairs) + Repeat("]}", pairs);
}

class BodyTest : public WebApiTest {};

TEST_F(BodyTest, NestingUpToTheLimitIsTaken) {
  for (const std::string &body : {Arrays(64), Objects(64), Mixed(32)}) {
    const HttpAnswer answer = Call(kEcho, body);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, "{\"success\":true,\"data\":" + body + "}");
  }
}

TEST_F(BodyTest, DeeperNestingIsRefused) {
  for (const size_t depth : {size_t{65}, size_t{1001}, size_t{100'000}}) {
    ExpectRefusal(Call(kEcho, Arrays(depth)), 400);
    ExpectRefusal(Call(kEcho, Objects(depth)), 400);
    ExpectRefusal(Call(kEcho, Mixed(depth / 2 + 1)), 400);
    ExpectRefusal(Call(kEcho, "{\"a\":" + Repeat("[", depth)), 400);
    ExpectServing();
  }
}

TEST_F(BodyTest, WhatIsNoObjectIsRefused) {
  for (const char *body : {"[]", "\"x\"", "1", "null", "true", "-0.5e1", " ", "\r", "\r\n"}) {
    ExpectRefusal(Call(kEcho, body), 400);
  }
}

TEST_F(BodyTest, WhatIsNoJsonIsRefused) {
  for (const char *body : {"\xEF\xBB\xBF{}",
                           "{}{}",
                           "{} {}",
                           "{}x",
                           "{}\r1",
                           "{",
                           "}",
                           "{\"a\"",
                           "{\"a\":",
                           "{\"a\":1",
                           "{\"a\":1,}",
                           "{a:1}",
                           "{'a':1}",
                           "{\"a\":1 \"b\":2}",
                           "{\"a\":[1,]}",
                           "{\"a\":[1 2]}",
                           "{\"a\":tru}",
                           "{\"a\":True}",
                           "{\"a\":NaN}",
                           "{\"a\":Infinity}",
                           "{\"a\":-}",
                           "{\"a\":01}",
                           "{\"a\":1.}",
                           "{\"a\":.5}",
                           "{\"a\":+1}",
                           "{\"a\":1e}",
                           "{\"a\":0x10}",
                           "{\"a\":\"\n\"}",
                           "{\"a\":\"\\x\"}",
                           "{\"a\":\"\\u12\"}",
                           "{\"a\":\"\\ud800\"}",
                           "{\"a\":\"\\udc00\\ud800\"}",
                           "// c\n{}",
                           "{/*c*/}",
                           "{\"a\":1}//",
                           "a=1&b=2",
                           "<a/>",
                           "{\"a\":\r",
                           "{\"a\":1\r",
                           "{\"a\":\"\xff\"}",
                           "{\"a\":\"\xC0\xAF\"}",
                           "{\"a\":\"\xED\xA0\x80\"}",
                           "{\"a\":\"\xF4\x90\x80\x80\"}",
                           "{\"a\":\"\xC3\"}",
                           "{\"\x80\":1}"}) {
    SCOPED_TRACE(body);
    ExpectRefusal(Call(kEcho, body), 400);
  }
  ExpectRefusal(Call(kEcho, std::string("{}\0", 3)), 400);
  ExpectRefusal(Call(kEcho, std::string("{\"a\":\"\0\"}", 9)), 400);
}

TEST_F(BodyTest, AKeyTwiceIsRefused) {
  ExpectRefusal(Call(kEcho, R"({"a":1,"a":2})"), 400);
  ExpectRefusal(Call(kEcho, R"({"a":{"b":1,"b":1}})"), 400);
  ExpectRefusal(Call(kEcho, "{\"a\":1,\"\\u0061\":2}"), 400);
}

TEST_F(BodyTest, ValuesAreHandedOnAsTheyAre) {
  const std::string data = R"({"":0,"a":[1,-1,9223372036854775807,-9223372036854775808,18446744073709551615,1.5,)"
                           R"(1e+99,true,false,null,"",{},[]],"text":"\u0000\u00e4\ud83d\ude00\"\\/"})";
  const HttpAnswer answer = Call(kEcho, data);
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(vorntest::ParseJson(answer.body)["data"], vorntest::ParseJson(data));
}

TEST_F(BodyTest, ANumberBeyondADoubleIsRefused) {
  ExpectRefusal(Call(kEcho, R"({"a":1e999})"), 400);
  ExpectRefusal(Call(kEcho, R"({"a":-1e999})"), 400);
  EXPECT_EQ(Call(kEcho, R"({"a":1e99,"b":-0,"c":4294967296,"d":12345678901234567890})").status, 200);
}

TEST_F(BodyTest, AMegabyteOfZerosIsRefused) {
  const std::string zeros = "{\"a\":[" + Repeat("0,", 524'000) + "0]}";
  ExpectRefusal(Call(kEcho, zeros), 400);
  ExpectRefusal(Call(kEcho, zeros.substr(0, zeros.size() - 2)), 400);
}

TEST_F(BodyTest, AMegabyteOfDigitsIsRefused) {
  ExpectRefusal(Call(kEcho, "{\"a\":" + std::string(1'048'000, '1') + "}"), 400);
}

TEST_F(BodyTest, AHundredThousandKeysAreRefused) {
  std::string body = "{";
  for (int index = 0; index < 100'000; ++index) {
    body += "\"" + std::to_string(index) + "\":1,";
  }
  ExpectRefusal(Call(kEcho, body.substr(0, 1'000'000) + "\"x\":1}"), 400);
}

TEST_F(BodyTest, ADocumentThatEndsInACarriageReturnIsTaken) {
  EXPECT_EQ(Call(kEcho, "{\"a\":1}\r").body, R"({"success":true,"data":{"a":1}})");
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__) // sanitizers hold memory of their own
class LargeBodyTest : public WebApiTest {
protected:
  LargeBodyTest() : WebApiTest({"--json-values", "1000000"}) {}
};

TEST_F(BodyTest, IdleMemoryIsUnderTenMegabytes) {
  ExpectServing();
  EXPECT_LT(server_.PrivateMemory(), 10'240U);
  EXPECT_GT(server_.PrivateMemory(), 100U);
}

/// Kilobytes of the most memory that the process ever had, pages of libraries among them.
size_t PeakMemory(pid_t process) {
  std::ifstream status("/proc/" + std::to_string(process) + "/status");
  size_t peak = 0;
  for (std::string word; status >> word && word != "VmHWM:";) {
  }
  status >> peak;
  return peak;
}

void ExpectMemoryGivenBack(const vorntest::ServerProcess &process, size_t before) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
  while (process.PrivateMemory() > before + 4'096 && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  EXPECT_LT(process.PrivateMemory(), before + 4'096);
}

TEST_F(BodyTest, TheMemoryOfTheWorstAcceptedDocumentIsBoundedAndGivenBack) {
  ExpectServing();
  const size_t before = server_.PrivateMemory();
  const size_t peak = PeakMemory(server_.Pid());
  const std::string objects = "{\"a\":[" + Repeat("{\"12345678\":[]},", 24'990) + "{}]}";
  for (int round = 0; round < 3; ++round) {
    ASSERT_EQ(Call("VORN.Test.Processor/1/get", objects).status, 200);
  }
  EXPECT_GT(PeakMemory(server_.Pid()), peak);
  EXPECT_LT(PeakMemory(server_.Pid()), peak + 32'768);
  ExpectMemoryGivenBack(server_, before);
}

TEST_F(LargeBodyTest, AMegabyteOfZerosStaysWithin64MegabytesWhenItIsTaken) {
  ExpectServing();
  const size_t before = server_.PrivateMemory();
  const size_t peak = PeakMemory(server_.Pid());
  ASSERT_EQ(Call("VORN.Test.Processor/1/get", "{\"a\":[" + Repeat("0,", 524'000) + "0]}").status, 200);
  EXPECT_LT(PeakMemory(server_.Pid()), peak + 65'536);
  ExpectMemoryGivenBack(server_, before);
}
#endif

} // namespace
