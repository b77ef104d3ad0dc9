#include "tests/webapi/webapi_fixture.h"

#include <json/reader.h>

#include <filesystem>
#include <fstream>
#include <memory>

namespace vorntest {

Json::Value ParseJson(const std::string &text) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["strictRoot"] = false;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  std::string fault;
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &fault)) << text.substr(0, 200) << fault;
  return value;
}

Folder::Folder() {
  std::string pattern = std::filesystem::temp_directory_path() / "webapi_test.XXXXXX";
  path_ = mkdtemp(pattern.data());
}

Folder::~Folder() {
  std::error_code ignored;
  std::filesystem::remove_all(path_, ignored);
}

void Folder::Make(const std::string &name) const {
  std::ofstream(Path(name)).flush();
}

std::vector<std::string> Folder::Lines(const std::string &name) const {
  std::vector<std::string> lines;
  std::ifstream file(Path(name));
  for (std::string line; std::getline(file, line);) {
    lines.push_back(line);
  }
  return lines;
}

std::vector<std::string> Folder::WaitForLines(const std::string &name, size_t count) const {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (Lines(name).size() < count && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  return Lines(name);
}

void WebApiTest::ExpectServing() {
  EXPECT_TRUE(server_.Running()) << server_.Log();
  HttpClient client(server_.Port());
  client.Send(CallBytes("VORN.Test.Echo/1/get", R"({"a":1})"));
  const HttpAnswer answer = client.Read(std::chrono::seconds(1));
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, R"({"success":true,"data":{"a":1}})");
}

void WebApiTest::TearDown() {
  if (server_.Running()) {
    ExpectServing();
    EXPECT_EQ(server_.Stop(), 0) << server_.Log();
  }
  EXPECT_EQ(server_.Log().find("Sanitizer"), std::string::npos) << server_.Log();
  EXPECT_EQ(server_.Log().find("runtime error:"), std::string::npos) << server_.Log();
}

void ExpectRefusal(const HttpAnswer &answer, int status) {
  EXPECT_EQ(answer.status, status) << answer.body;
  ASSERT_NE(answer.status, 0);
  EXPECT_LE(answer.body.size(), 200U);
  EXPECT_EQ(answer.fields.at("content-type"), "application/json");
  EXPECT_EQ(answer.fields.at("x-content-type-options"), "nosniff");
  const Json::Value body = ParseJson(answer.body);
  ASSERT_TRUE(body.isObject());
  EXPECT_EQ(body["success"], Json::Value(false));
  EXPECT_EQ(body["error"]["code"].asInt(), status);
  EXPECT_FALSE(body["error"]["message"].asString().empty());
  EXPECT_EQ(body.size(), 2U);
  EXPECT_EQ(body["error"].size(), 2U);
}

} // namespace vorntest
