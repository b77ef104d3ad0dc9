// The OpenAPI document, held against the server that it speaks of.
#include "tests/webapi/access_fixture.h"
#include "webapi/access.h"
#include "webapi/api_document.h"
#include "webapi/module.h"

#include <gmock/gmock.h>

#include <fstream>
#include <set>

using testing::ElementsAre;
using testing::IsEmpty;
using vorntest::AccessTest;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::kPassword;
using vorntest::ParseJson;
using vorntest::Person;

namespace {

/// Every "$ref" in it leads somewhere.
void ExpectReferencesLead(const Json::Value &document, const Json::Value &value) {
  if (value.isObject() && value.isMember("$ref")) {
    const std::string reference = value["$ref"].asString();
    ASSERT_EQ(reference.rfind("#/components/", 0), 0U) << reference;
    const size_t slash = reference.rfind('/');
    const std::string group = reference.substr(13, slash - 13);
    EXPECT_TRUE(document["components"][group].isMember(reference.substr(slash + 1))) << reference;
    return;
  }
  if (value.isObject() || value.isArray()) {
    for (const Json::Value &each : value) {
      ExpectReferencesLead(document, each);
    }
  }
}

std::vector<VORN::APIEntry> Rows() {
  std::vector<VORN::APIEntry> rows;
  std::string fault;
  EXPECT_TRUE(vornwebapi::LoadModule(RECORDED_MODULE, rows, fault)) << fault;
  return rows;
}

std::string Description() {
  std::string description;
  EXPECT_TRUE(vornwebapi::ReadDescription(DESCRIPTION, description));
  return description;
}

class DocumentTest : public AccessTest {
protected:
  DocumentTest()
      : AccessTest({"--description", DESCRIPTION, "--body-bytes", "2000", "--login-failures", "3"},
                   "recording_module") {}

  HttpAnswer Get(const std::string &fields) const {
    return vorntest::HttpClient(server_.Port())
        .Exchange("GET /openapi.json HTTP/1.1\r\nHost: localhost\r\n" + fields + "\r\n");
  }
  static std::set<std::string> Documented(const Json::Value &operation) {
    std::set<std::string> statuses;
    for (const std::string &status : operation["responses"].getMemberNames()) {
      if (status != "default") {
        statuses.insert(status);
      }
    }
    return statuses;
  }
  /// Statuses that calls of the path with these fields get, each in the way that it is documented for.
  std::set<std::string> Provoked(const std::string &target, const std::string &fields) const {
    const std::string path = target.substr(std::string("/webapi/").size());
    std::set<std::string> statuses;
    for (const HttpAnswer &answer :
         {Send(path, fields, "{"), Send(path, "", R"({"user":"x","password":"y"})"),
          Send(path, fields + "Origin: http://evil.example\r\n"), Send(path, fields, std::string(5000, ' ')),
          Send(path, fields + "Content-Type: text/plain\r\n", "{}"), Send(path, fields)}) {
      statuses.insert(std::to_string(answer.status));
      if (answer.status != 200) {
        ExpectRefusal(answer, answer.status);
      }
    }
    return statuses;
  }
};

TEST_F(DocumentTest, IsOpenApiOfTheLoadedTable) {
  const Person person = Enter();
  HttpAnswer answer = Get(person.Fields());
  ASSERT_EQ(answer.status, 200);
  EXPECT_EQ(answer.fields["content-type"], "application/json");
  const Json::Value document = ParseJson(answer.body);
  EXPECT_EQ(document["openapi"], "3.1.0");
  EXPECT_TRUE(document["info"]["title"].isString());
  EXPECT_TRUE(document["info"]["version"].isString());
  ExpectReferencesLead(document, document);
  std::set<std::string> expected = {"/openapi.json", "/metrics"};
  for (const char *own : {"login", "logout", "session", "password", "tokens/make", "tokens/list", "tokens/revoke"}) {
    expected.insert(std::string("/webapi/") + own);
  }
  for (const VORN::APIEntry &row : Rows()) {
    const std::string path = vornwebapi::PathOf(row);
    expected.insert(path);
    const Json::Value &operation = document["paths"][path]["post"];
    EXPECT_FALSE(operation["summary"].asString().empty()) << path;
    EXPECT_EQ(operation["x-access"], vornwebapi::Reads(row.method) ? "read" : "write") << path;
    EXPECT_TRUE(operation["requestBody"]["content"]["application/json"]["schema"].isObject()) << path;
  }
  std::set<std::string> ids;
  std::set<std::string> found;
  for (const std::string &path : document["paths"].getMemberNames()) {
    found.insert(path);
    for (const Json::Value &operation : document["paths"][path]) {
      EXPECT_TRUE(ids.insert(operation["operationId"].asString()).second) << path;
      for (const Json::Value &response : operation["responses"]) {
        EXPECT_TRUE(response.isMember("description") || response.isMember("$ref")) << path;
      }
      for (const Json::Value &way : operation.get("security", document["security"])) {
        for (const std::string &scheme : way.getMemberNames()) {
          EXPECT_TRUE(document["components"]["securitySchemes"].isMember(scheme)) << scheme;
        }
      }
    }
  }
  EXPECT_EQ(found, expected);
}

TEST_F(DocumentTest, EveryDocumentedStatusOfEveryRowIsWhatTheServerAnswers) {
  const Person person = Enter();
  const Json::Value document = ParseJson(Get(person.Fields()).body);
  for (const VORN::APIEntry &row : Rows()) {
    const std::string path = vornwebapi::PathOf(row);
    EXPECT_EQ(Provoked(path, person.Fields()), Documented(document["paths"][path]["post"])) << path;
    const HttpAnswer failed = Send(path.substr(std::string("/webapi/").size()), person.Fields(), R"({"fail":true})");
    EXPECT_EQ(failed.body, R"({"success":false,"error":{"code":4300,"data":null}})");
  }
  for (const char *path : {"/openapi.json", "/metrics"}) {
    EXPECT_EQ(Documented(document["paths"][path]["get"]), (std::set<std::string>{"200", "401", "403"})) << path;
  }
}

TEST_F(DocumentTest, EveryDocumentedStatusOfAnOwnCallIsWhatTheServerAnswers) {
  const Json::Value paths = ParseJson(Get(Enter().Fields()).body)["paths"];
  for (const char *name : {"login", "logout", "session", "password", "tokens/make", "tokens/list", "tokens/revoke"}) {
    const std::string path = std::string("/webapi/") + name;
    const Person person = Login(kPassword);
    std::set<std::string> statuses = Provoked(path, person.Fields());
    if (name == std::string("login")) {
      statuses.insert(std::to_string(Send(name, "", LoginBody(kPassword)).status));
    } else if (name == std::string("tokens/make")) {
      statuses.insert(std::to_string(Send(name, person.Fields(), R"({"name":"x","access":"read","days":1})").status));
    } else if (name == std::string("tokens/revoke")) {
      const std::string id = ParseJson(Send("tokens/list", person.Fields()).body)["data"][0]["id"].asString();
      statuses.insert(std::to_string(Send(name, person.Fields(), R"({"id":")" + id + "\"}").status));
    } else if (name == std::string("password")) {
      const std::string change = R"({"old":")" + std::string(kPassword) + R"(","new":"another horse"})";
      const std::string back = R"({"old":"another horse","new":")" + std::string(kPassword) + "\"}";
      statuses.insert(std::to_string(Send(name, person.Fields(), change).status));
      EXPECT_EQ(Send(name, Login("another horse").Fields(), back).status, 200);
    }
    std::set<std::string> documented = Documented(paths[path]["post"]);
    EXPECT_EQ(documented.erase("429"), name == std::string("login") || name == std::string("password") ? 1U : 0U);
    EXPECT_EQ(statuses, documented) << path;
  }
  const Person person = Login(kPassword);
  for (int count = 0; count < 3; ++count) {
    Send("login", "", LoginBody("wrong"));
  }
  ExpectRefusal(Send("login", "", LoginBody(kPassword)), 429);
  ExpectRefusal(Send("password", person.Fields(), R"({"old":"correct horse","new":"another horse"})"), 429);
}

TEST_F(DocumentTest, AReadingTokenReadsIt) {
  const Person person = Enter();
  EXPECT_EQ(Get("Authorization: Bearer " + MakeToken(person, "read") + "\r\n").status, 200);
  ExpectRefusal(Get("Cookie: vorn-session=" + person.cookie + "\r\n"), 403);
  ExpectRefusal(Get(""), 401);
}

TEST(DescriptionTest, EveryRowIsDescribed) {
  std::vector<std::string> faults;
  vornwebapi::MakeApiDocument(Rows(), Description(), false, faults);
  EXPECT_THAT(faults, IsEmpty());
}

TEST(DescriptionTest, WhatIsMissingOrTooMuchIsNamed) {
  Json::Value description = ParseJson(Description());
  Json::Value &rows = description["rows"];
  rows.removeMember("VORN.Core.Network.Router.DMZ/1/get");
  rows["VORN.Core.Network.Router.DMZ/1/set"].removeMember("summary");
  rows["VORN.Core.Network.Router.LocalLan/1/get"].removeMember("errors");
  rows["VORN.Core.Network.Router.LocalLan/2/get"] = rows["VORN.Core.Network.Router.LocalLan/1/get"];
  std::vector<std::string> faults;
  const Json::Value document =
      ParseJson(vornwebapi::MakeApiDocument(Rows(), description.toStyledString(), true, faults));
  EXPECT_THAT(faults, ElementsAre("VORN.Core.Network.Router.DMZ/1/get is not described",
                                  "VORN.Core.Network.Router.DMZ/1/set has no summary",
                                  "VORN.Core.Network.Router.LocalLan/1/get has no object \"errors\"",
                                  "VORN.Core.Network.Router.LocalLan/2/get is described and is no row"));
  EXPECT_TRUE(document["paths"].isMember("/webapi/VORN.Core.Network.Router.DMZ/1/get"));
  EXPECT_FALSE(document["paths"].isMember("/webapi/VORN.Core.Network.Router.LocalLan/2/get"));
  EXPECT_EQ(document["components"]["securitySchemes"]["session"]["name"], "__Host-vorn-session");
}

TEST(DescriptionTest, NoneAtAllLeavesTheRows) {
  for (const char *text : {"", "{", "[]", "null", R"({"rows":[],"schemas":[]})", R"({"rows":1,"schemas":"x"})"}) {
    std::vector<std::string> faults;
    const Json::Value document = ParseJson(vornwebapi::MakeApiDocument(Rows(), text, false, faults));
    EXPECT_EQ(faults.size(), 23U);
    EXPECT_EQ(document["paths"].size(), 32U);
  }
}

} // namespace
