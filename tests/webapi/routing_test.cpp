// Paths, methods and the types of bodies.
#include "tests/webapi/webapi_fixture.h"

using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::WebApiTest;

namespace {

class RoutingTest : public WebApiTest {
protected:
  HttpAnswer Request(const std::string &method, const std::string &target, const std::string &fields = "",
                     const std::string &body = "") const {
    HttpClient client(server_.Port());
    return client.Exchange(method + " " + target + " HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN "" + fields +
                           "\r\n" + body);
  }
};

TEST_F(RoutingTest, OnlyTheExactPathOfARowFindsIt) {
  EXPECT_EQ(Request("POST", "/webapi/VORN.Test.Echo/1/get").status, 200);
  EXPECT_EQ(Request("POST", "/webapi/VORN.Test.Echo/2/get").status, 200);
  for (const char *target : {"/",
                             "/webapi",
                             "/webapi/",
                             "/webapi/VORN.Test.Echo",
                             "/webapi/VORN.Test.Echo/1",
                             "/webapi/VORN.Test.Echo/1/",
                             "/webapi/VORN.Test.Echo/1/get/",
                             "/webapi/VORN.Test.Echo/2/set",
                             "/webapi/VORN.Test.Echo/3/get",
                             "/webapi/VORN.Test.Echo/01/get",
                             "/webapi/VORN.Test.Echo/+1/get",
                             "/webapi/VORN.Test.Echo/1/GET",
                             "/webapi/vorn.test.echo/1/get",
                             "/WEBAPI/VORN.Test.Echo/1/get",
                             "//webapi/VORN.Test.Echo/1/get",
                             "/webapi//VORN.Test.Echo/1/get",
                             "/webapi/./VORN.Test.Echo/1/get",
                             "/webapi/VORN.Test.Echo/1/get/.",
                             "/static/../webapi/VORN.Test.Echo/1/get",
                             "/static/..%2fwebapi/VORN.Test.Echo/1/get",
                             "/webapi/VORN.Test.Echo/1/%67et",
                             "/webapi/VORN.Test.Echo%2f1/get",
                             "/webapi/VORN.Test.Echo/1/get%00.css",
                             "/webapi/VORN.Test.Echo/1/get;x",
                             "/webapi/VORN.Test.Echo/1/get?",
                             "/webapi/VORN.Test.Echo/1/get?a=1",
                             "/webapi?x/static/",
                             "/webapi/VORN.Test.Echo/1/get#a",
                             "/webapi\\VORN.Test.Echo\\1\\get",
                             "/../../etc/shadow",
                             "/%2e%2e%2fetc/shadow"}) {
    ExpectRefusal(Request("POST", target), 404);
  }
}

TEST_F(RoutingTest, ARowIsCalledWithPostOnly) {
  for (const char *method : {"GET", "PUT", "DELETE", "PATCH", "OPTIONS", "TRACE", "PROPFIND"}) {
    const HttpAnswer answer = Request(method, "/webapi/VORN.Test.Echo/1/get");
    ExpectRefusal(answer, 405);
    EXPECT_EQ(answer.fields.at("allow"), "POST");
  }
  ExpectRefusal(Request("GET", "/webapi/VORN.Test.Echo/2/set"), 404);
}

TEST_F(RoutingTest, HeadGetsNoBody) {
  HttpClient client(server_.Port());
  client.Send("HEAD /webapi/VORN.Test.Echo/1/get HTTP/1.1\r\nHost: localhost\r\n" VORN_TEST_LOGIN "\r\n");
  const std::string bytes = client.Bytes(std::chrono::seconds(5));
  EXPECT_EQ(bytes.substr(0, 12), "HTTP/1.1 405");
  EXPECT_EQ(bytes.substr(bytes.size() - 4), "\r\n\r\n");
}

TEST_F(RoutingTest, ABodyIsJsonByItsType) {
  const std::string target = "/webapi/VORN.Test.Echo/1/get";
  for (const char *type : {"application/json", "Application/JSON", "application/json; charset=utf-8",
                           "application/json;charset=\"UTF-8\"", "application/json;"}) {
    EXPECT_EQ(Request("POST", target, std::string("Content-Type: ") + type + "\r\nContent-Length: 2\r\n", "{}").status,
              200)
        << type;
  }
  for (const char *type :
       {"text/plain", "application/x-www-form-urlencoded", "multipart/form-data; boundary=x", "application/json5",
        "application/json; charset=latin1", "text/json", "", "application/json, text/plain"}) {
    ExpectRefusal(Request("POST", target, std::string("Content-Type: ") + type + "\r\nContent-Length: 2\r\n", "{}"),
                  415);
  }
  ExpectRefusal(Request("POST", target, "Content-Length: 2\r\n", "{}"), 415);
  ExpectRefusal(Request("POST", target,
                        "Content-Type: application/json\r\nContent-Encoding: gzip\r\nContent-Length: 2\r\n", "{}"),
                415);
  ExpectRefusal(Request("POST", target,
                        "Content-Type: application/json\r\nContent-Type: text/plain\r\nContent-Length: 2\r\n", "{}"),
                415);
  ExpectRefusal(Request("POST", target, "Transfer-Encoding: chunked\r\n", "2\r\n{}\r\n0\r\n\r\n"), 415);
}

TEST_F(RoutingTest, NoBodyNeedsNoType) {
  const std::string target = "/webapi/VORN.Test.Echo/1/get";
  EXPECT_EQ(Request("POST", target, "Content-Length: 0\r\n").body, R"({"success":true,"data":{}})");
  EXPECT_EQ(Request("POST", target, "Transfer-Encoding: chunked\r\n", "0\r\n\r\n").body,
            R"({"success":true,"data":{}})");
}

TEST_F(RoutingTest, WhatTheCallerIsKnownBy) {
  const HttpAnswer answer =
      Call("VORN.Test.Caller/1/get", R"({"a":null})", "Accept-Language: xx, fr;q=0.5, de-AT;q=0.8\r\n");
  EXPECT_EQ(answer.body, R"({"success":true,"data":{"a":null,"has_a":true,"language":"ger","port":)" +
                             std::to_string(server_.Port()) + R"(,"secure":false}})");
  EXPECT_EQ(vorntest::ParseJson(Call("VORN.Test.Caller/1/get").body)["data"]["language"], "enu");
  EXPECT_EQ(vorntest::ParseJson(Call("VORN.Test.Caller/1/get").body)["data"]["a"], "fallback");
}

TEST_F(RoutingTest, HostileFieldsChangeNothing) {
  const HttpAnswer answer = Call("VORN.Test.Echo/1/get", "", "User-Agent: () { :;}; id\r\nX-Forwarded-For: $(id)\r\n");
  EXPECT_EQ(answer.body, R"({"success":true,"data":{}})");
}

} // namespace
