// The registry under several users, and the contract's classes over it.
#include "webapi/request_state.h"
#include "webapi/task_registry.h"

#include <gtest/gtest.h>

#include <future>
#include <thread>

using vornwebapi::TaskRegistry;

namespace {

void EndAtOnce(VORN::APIRequest * /*request*/, VORN::APIResponse * /*response*/, void * /*context*/) {}

void WaitForPromise(VORN::APIRequest * /*request*/, VORN::APIResponse * /*response*/, void *context) {
  static_cast<std::shared_future<void> *>(context)->wait();
}

class TaskRegistryTest : public testing::Test {
protected:
  TaskRegistryTest() : until_(go_.get_future().share()) {}
  ~TaskRegistryTest() override {
    go_.set_value();
    EXPECT_EQ(registry_.Shutdown(TaskRegistry::Clock::now() + std::chrono::seconds(10)), 0U);
  }

  int Start(const std::string &user, const std::string &prefix, std::string &id, bool waits = true) {
    const VORN::APIRequest::State request;
    return registry_.Start({user, "admin", prefix, false}, request, waits ? WaitForPromise : EndAtOnce, &until_, id);
  }
  void WaitForEnd(const std::string &user, const std::string &id) {
    Json::Value data;
    while (registry_.Status(user, id, data) == 0 && !data["finish"].asBool()) {
      std::this_thread::yield();
    }
  }

  std::promise<void> go_;
  std::shared_future<void> until_;
  TaskRegistry registry_{TaskRegistry::Limits{3, std::chrono::milliseconds(60'000)}};
};

TEST_F(TaskRegistryTest, ATaskIsSeenByItsUserOnly) {
  std::string id;
  ASSERT_EQ(Start("anna", "list", id), 0);
  Json::Value data;
  EXPECT_EQ(registry_.Status("anna", id, data), 0);
  EXPECT_EQ(registry_.Status("bert", id, data), vornwebapi::kTaskUnknown);
  EXPECT_EQ(registry_.Stop("bert", id, true), vornwebapi::kTaskUnknown);
  EXPECT_EQ(registry_.List("anna", "admin", "list"), std::vector<std::string>{id});
  EXPECT_TRUE(registry_.List("bert", "admin", "list").empty());
  EXPECT_TRUE(registry_.List("anna", "guest", "list").empty());
  EXPECT_TRUE(registry_.List("anna", "admin", "other").empty());
}

TEST_F(TaskRegistryTest, TwoUsersMayRunTheSameKind) {
  std::string first;
  std::string second;
  EXPECT_EQ(Start("anna", "list", first), 0);
  EXPECT_EQ(Start("bert", "list", second), 0);
  EXPECT_NE(first, second);
  EXPECT_EQ(Start("anna", "list", first), vornwebapi::kTaskKindRuns);
}

TEST_F(TaskRegistryTest, AFinishedOneGivesWayWhenAllPlacesAreTaken) {
  std::string older;
  std::string newer;
  std::string id;
  ASSERT_EQ(Start("anna", "a", older, false), 0);
  WaitForEnd("anna", older);
  ASSERT_EQ(Start("anna", "b", newer, false), 0);
  WaitForEnd("anna", newer);
  ASSERT_EQ(Start("anna", "c", id), 0);
  ASSERT_EQ(Start("anna", "d", id), 0);
  Json::Value data;
  EXPECT_EQ(registry_.Status("anna", older, data), vornwebapi::kTaskUnknown);
  EXPECT_EQ(registry_.Status("anna", newer, data), 0);
  ASSERT_EQ(Start("anna", "e", id), 0);
  EXPECT_EQ(Start("anna", "f", id), vornwebapi::kTaskTooMany);
}

TEST_F(TaskRegistryTest, NothingStartsOnceItStops) {
  EXPECT_EQ(registry_.Shutdown(TaskRegistry::Clock::now()), 0U);
  std::string id;
  EXPECT_EQ(Start("anna", "a", id), vornwebapi::kTaskServerStopping);
}

TEST_F(TaskRegistryTest, ManyThreadsMayUseItAtOnce) {
  std::vector<std::thread> threads;
  threads.reserve(8);
  for (int user = 0; user < 8; ++user) {
    threads.emplace_back([this, user] {
      const std::string name = std::to_string(user);
      for (int round = 0; round < 200; ++round) {
        std::string id;
        Json::Value data;
        if (Start(name, "a", id, false) == 0) {
          registry_.Status(name, id, data);
          registry_.List(name, "admin", "a");
          registry_.Stop(name, id, true);
        }
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_TRUE(registry_.List("0", "admin", "a").empty());
}

TEST(Polling, WithoutARequestFailsWithItsCode) {
  VORN::APIPolling polling;
  Json::Value out;
  EXPECT_EQ(polling.GetError(), 0);
  EXPECT_FALSE(polling.List("a", Json::Value(Json::arrayValue), out));
  EXPECT_FALSE(polling.Status("a", out));
  EXPECT_FALSE(polling.Stop("a", true));
  EXPECT_EQ(polling.GetError(), vornwebapi::kTaskBadArgument);
}

TEST(Request, TheEmptyNameIsTheWholeObject) {
  VORN::APIRequest::State state;
  state.parameters["a"] = Json::Value();
  const VORN::APIRequest request(state);
  EXPECT_TRUE(request.HasParam("a"));
  EXPECT_FALSE(request.HasParam("b"));
  EXPECT_FALSE(request.HasParam(""));
  EXPECT_EQ(request.GetParam("a", 1), Json::Value());
  EXPECT_EQ(request.GetParam("b", 1), Json::Value(1));
  EXPECT_EQ(request.GetParam("", 1), state.parameters);
  EXPECT_EQ(request.GetUILanguage(), "enu");
}

} // namespace
