// What the server's tests share.
#ifndef TESTS_WEBAPI_WEBAPI_FIXTURE_H
#define TESTS_WEBAPI_WEBAPI_FIXTURE_H

#include "tests/webapi/http_client.h"
#include "tests/webapi/server_process.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include <string>
#include <vector>

namespace vorntest {

/// JSON of a text that must be some.
Json::Value ParseJson(const std::string &text);

/// A folder of the test's own, removed with it.
class Folder {
public:
  Folder();
  Folder(const Folder &) = delete;
  Folder &operator=(const Folder &) = delete;
  ~Folder();
  std::string Path(const std::string &name) const { return path_ + "/" + name; }
  /// Makes an empty file: what waits for it goes on.
  void Make(const std::string &name) const;
  std::vector<std::string> Lines(const std::string &name) const;
  /// Waits for that many lines, and a moment for one too many.
  std::vector<std::string> WaitForLines(const std::string &name, size_t count) const;

private:
  std::string path_;
};

/// A server for each test, which must live through it, serve on and stop in order.
class WebApiTest : public testing::Test {
protected:
  explicit WebApiTest(std::vector<std::string> options = {}) : server_({.options = std::move(options)}) {}
  void SetUp() override { ASSERT_NE(server_.Port(), 0) << server_.Log(); }
  void TearDown() override;

  /// The same process answers a good call within a second.
  void ExpectServing();
  HttpAnswer Call(const std::string &path, const std::string &body = "", const std::string &fields = "") const {
    return vorntest::Call(server_.Port(), path, body, fields);
  }

  ServerProcess server_;
  Folder folder_;
};

/// A transport error's body: status and form, at most 200 bytes.
void ExpectRefusal(const HttpAnswer &answer, int status);

} // namespace vorntest

#endif
