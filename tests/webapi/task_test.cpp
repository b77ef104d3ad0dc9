// Poll tasks, over HTTP as a client meets them.
#include "tests/webapi/webapi_fixture.h"

#include <json/writer.h>

using vorntest::HttpAnswer;
using vorntest::ParseJson;
using vorntest::WebApiTest;

namespace {

class TaskTest : public WebApiTest {
protected:
  explicit TaskTest(std::vector<std::string> options = {}) : WebApiTest(std::move(options)) {}

  Json::Value Ask(const std::string &method, const std::string &body = "") const {
    const HttpAnswer answer = Call("VORN.Test.Task/1/" + method, body);
    EXPECT_EQ(answer.status, 200);
    return ParseJson(answer.body);
  }
  /// A task that waits for the file "until".
  std::string StartWaiting(const std::string &prefix = "test") const {
    const Json::Value answer =
        Ask("start", "{\"prefix\":\"" + prefix + "\",\"until\":\"" + folder_.Path("until") + "\"}");
    EXPECT_TRUE(answer["success"].asBool()) << answer;
    return answer["data"]["id"].asString();
  }
  Json::Value Status(const std::string &id) const { return Ask("status", "{\"id\":\"" + id + "\"}"); }
  Json::Value WaitForEnd(const std::string &id) const {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    Json::Value answer = Status(id);
    while (!answer["data"]["finish"].asBool() && std::chrono::steady_clock::now() < deadline) {
      answer = Status(id);
    }
    return answer;
  }
  size_t Listed(const std::string &prefix = "test") const {
    return Ask("list", "{\"prefix\":\"" + prefix + "\"}")["data"]["admin"].size();
  }
  static int ErrorOf(const Json::Value &answer) { return answer["error"]["code"].asInt(); }
};

TEST_F(TaskTest, LivesFromStartThroughStatusToStop) {
  EXPECT_EQ(Ask("list"), ParseJson(R"({"success":true,"data":{"admin":[]}})"));
  const Json::Value started = Ask("start", "{\"data\":{\"stations\":[1]},\"last\":{\"stations\":[1,2]},\"until\":\"" +
                                               folder_.Path("until") + "\"}");
  const std::string id = started["data"]["id"].asString();
  EXPECT_EQ(started, ParseJson(R"({"success":true,"data":{"id":")" + id + R"(","finish":false}})"));
  EXPECT_EQ(id.substr(0, 5), "test_");
  EXPECT_EQ(id.size(), 37U);
  EXPECT_EQ(Ask("list"), ParseJson(R"({"success":true,"data":{"admin":[")" + id + "\"]}}"));
  Json::Value status = Status(id);
  while (!status["data"].isMember("stations")) {
    EXPECT_EQ(status, ParseJson(R"({"success":true,"data":{"finish":false}})")); // before its first word
    status = Status(id);
  }
  EXPECT_EQ(status, ParseJson(R"({"success":true,"data":{"stations":[1],"finish":false}})"));
  folder_.Make("until");
  EXPECT_EQ(WaitForEnd(id), ParseJson(R"({"success":true,"data":{"stations":[1,2],"finish":true}})"));
  EXPECT_EQ(Listed(), 1U); // kept until Stop
  EXPECT_EQ(Ask("stop", "{\"id\":\"" + id + "\"}"), ParseJson(R"({"success":true,"data":null})"));
  EXPECT_EQ(Listed(), 0U);
  EXPECT_EQ(Status(id), ParseJson(R"({"success":false,"error":{"code":117,"data":111}})"));
}

TEST_F(TaskTest, AnEndedTaskIsDroppedAtOnceWhenItWantsSo) {
  const Json::Value started = Ask("start", R"({"remove":true})");
  EXPECT_TRUE(started["success"].asBool());
  while (Listed() > 0) {
  }
  EXPECT_EQ(Status(started["data"]["id"].asString())["error"]["data"], 111);
}

TEST_F(TaskTest, ASecondOfItsKindIsRefusedWhileTheFirstRuns) {
  const std::string id = StartWaiting();
  EXPECT_EQ(Ask("start"), ParseJson(R"({"success":false,"error":{"code":113,"data":null}})"));
  EXPECT_NE(StartWaiting("other"), id);
  folder_.Make("until");
  WaitForEnd(id);
  const Json::Value next = Ask("start"); // the finished one gives way
  EXPECT_TRUE(next["success"].asBool());
  EXPECT_EQ(Listed(), 1U);
  EXPECT_EQ(Status(id)["error"]["data"], 111);
  EXPECT_TRUE(server_.LogShows("poll task of kind test for user token 000000000001 tests refused with code 113"));
}

TEST_F(TaskTest, ANinthIsRefusedUntilOneHasEnded) {
  std::string first;
  for (int index = 0; index < 8; ++index) {
    const std::string id = StartWaiting("kind" + std::to_string(index));
    first = index == 0 ? id : first;
  }
  EXPECT_EQ(ErrorOf(Ask("start", R"({"prefix":"kind8"})")), 115);
  // Stopping does not tear a function down: its thread still counts.
  EXPECT_TRUE(Ask("stop", "{\"id\":\"" + first + "\"}")["success"].asBool());
  EXPECT_EQ(ErrorOf(Ask("start", R"({"prefix":"kind8"})")), 115);
  folder_.Make("until");
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  Json::Value answer;
  while (!answer["success"].asBool() && std::chrono::steady_clock::now() < deadline) {
    answer = Ask("start", R"({"prefix":"kind8"})");
  }
  EXPECT_TRUE(answer["success"].asBool());
}

TEST_F(TaskTest, StoppingOneThatRunsNeedsForce) {
  const std::string id = StartWaiting();
  EXPECT_EQ(Ask("stop", "{\"id\":\"" + id + "\",\"force\":false}"),
            ParseJson(R"({"success":false,"error":{"code":117,"data":112}})"));
  EXPECT_EQ(Listed(), 1U);
  EXPECT_TRUE(Ask("stop", "{\"id\":\"" + id + "\",\"force\":true}")["success"].asBool());
  EXPECT_EQ(Listed(), 0U);
  EXPECT_EQ(Ask("stop", "{\"id\":\"" + id + "\"}")["error"]["data"], 111);
  const std::string next = StartWaiting(); // its further answers go nowhere, and a new one may run
  EXPECT_NE(next, id);
  folder_.Make("until");
  EXPECT_TRUE(WaitForEnd(next)["success"].asBool());
}

TEST_F(TaskTest, AnUnknownIdIsRefused) {
  for (const char *id : {"", "test_", "test_00000000000000000000000000000000", "x"}) {
    EXPECT_EQ(Status(id)["error"]["data"], 111);
  }
}

TEST_F(TaskTest, GroupsMustBeTexts) {
  EXPECT_EQ(Ask("list", R"({"groups":"admin"})")["error"]["data"], 110);
  EXPECT_EQ(Ask("list", R"({"groups":[1]})")["error"]["data"], 110);
  const std::string id = StartWaiting();
  EXPECT_EQ(Ask("list", R"({"groups":["guest","admin"]})")["data"],
            ParseJson(R"({"guest":[],"admin":[")" + id + "\"]}"));
  EXPECT_EQ(Ask("list", R"({"groups":[]})")["data"], ParseJson("{}"));
  folder_.Make("until");
}

TEST_F(TaskTest, OneThatThrowsEndsAndIsLogged) {
  const std::string id = Ask("start", R"({"data":{"a":1},"throws":true})")["data"]["id"].asString();
  EXPECT_EQ(WaitForEnd(id)["data"], ParseJson(R"({"a":1,"finish":true})"));
  EXPECT_TRUE(server_.LogShows("poll task of kind test threw: thrown in a task"));
}

TEST_F(TaskTest, DataThatIsNoObjectIsPutIntoOne) {
  const std::string id = Ask("start", R"({"last":[1]})")["data"]["id"].asString();
  EXPECT_EQ(WaitForEnd(id)["data"], ParseJson(R"({"data":[1],"finish":true})"));
}

TEST_F(TaskTest, AThousandStartsLeaveOneOfTheKind) {
  StartWaiting();
  for (int index = 0; index < 1'000; ++index) {
    ASSERT_EQ(ErrorOf(Ask("start")), 113);
  }
  EXPECT_EQ(Listed(), 1U);
  folder_.Make("until");
}

class ForgottenTaskTest : public TaskTest {
protected:
  ForgottenTaskTest() : TaskTest({"--task-keep-time", "300ms"}) {}
};

TEST_F(ForgottenTaskTest, IsDroppedSomeTimeAfterItsEnd) {
  const std::string id = Ask("start")["data"]["id"].asString();
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(600);
  while (std::chrono::steady_clock::now() < deadline) { // asking for it keeps it
    ASSERT_TRUE(Status(id)["success"].asBool());
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  EXPECT_EQ(Listed(), 0U);
}

TEST_F(TaskTest, ATaskAtWorkIsAwaitedAtTheEnd) {
  ASSERT_TRUE(Ask("start", "{\"entered\":\"" + folder_.Path("entered") + "\",\"until\":\"" + folder_.Path("until") +
                               "\"}")["success"]
                  .asBool());
  ASSERT_EQ(folder_.WaitForLines("entered", 1).size(), 1U);
  server_.Signal(SIGTERM);
  EXPECT_EQ(server_.Wait(std::chrono::milliseconds(300)), -1);
  folder_.Make("until");
  EXPECT_EQ(server_.Wait(), 0);
  EXPECT_NE(server_.Log().find(": stopped\n"), std::string::npos) << server_.Log();
}

class ShortStopTest : public TaskTest {
protected:
  ShortStopTest() : TaskTest({"--stop-time", "200ms"}) {}
};

TEST_F(ShortStopTest, ATaskThatDoesNotEndIsLeftBehind) {
  StartWaiting();
  EXPECT_EQ(server_.Stop(), 0);
  EXPECT_NE(server_.Log().find("stopped with 1 poll tasks still running"), std::string::npos) << server_.Log();
}

} // namespace
