// What handlers answer or fail to, and what they want done after the answer.
#include "tests/webapi/webapi_fixture.h"

#include <atomic>
#include <memory>
#include <set>

using vorntest::CallBytes;
using vorntest::ExpectRefusal;
using vorntest::HttpAnswer;
using vorntest::HttpClient;
using vorntest::WebApiTest;

namespace {

class CallTest : public WebApiTest {
protected:
  /// {"name":"<path of the file>",...}
  std::string Paths(const std::vector<std::string> &names, const std::string &more = "") const {
    std::string body = "{";
    for (const std::string &name : names) {
      body += "\"" + name + "\":\"" + folder_.Path(name) + "\",";
    }
    return body + "\"x\":0" + more + "}";
  }
};

TEST_F(CallTest, AnAnswerHasItsFormAndFields) {
  const HttpAnswer answer = Call("VORN.Test.Echo/1/get", R"({"b":[1],"a":"x"})");
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.body, R"({"success":true,"data":{"a":"x","b":[1]}})");
  EXPECT_EQ(answer.fields.at("content-type"), "application/json");
  EXPECT_EQ(answer.fields.at("cache-control"), "no-store");
  EXPECT_EQ(answer.fields.at("x-content-type-options"), "nosniff");
  EXPECT_EQ(answer.fields.at("date").size(), 29U);
}

TEST_F(CallTest, AnErrorOfTheModuleHasStatus200) {
  EXPECT_EQ(Call("VORN.Test.Echo/1/error", R"({"code":4302,"data":{"desc":"x"}})").body,
            R"({"success":false,"error":{"code":4302,"data":{"desc":"x"}}})");
  const HttpAnswer plain = Call("VORN.Test.Echo/1/error");
  EXPECT_EQ(plain.status, 200);
  EXPECT_EQ(plain.body, R"({"success":false,"error":{"code":4300,"data":null}})");
}

TEST_F(CallTest, AHandlerThatThrowsIsAnsweredForAndLogged) {
  ExpectRefusal(Call("VORN.Test.Throw/1/standard"), 500);
  EXPECT_TRUE(server_.LogShows("VORN.Test.Throw v1 standard threw: a line\\x0aof two\n"));
  ExpectRefusal(Call("VORN.Test.Throw/1/number"), 500);
  EXPECT_TRUE(server_.LogShows("VORN.Test.Throw v1 number threw something that is no std::exception\n"));
}

TEST_F(CallTest, AWrongTypeInTheModuleIsA500AndNoMore) {
  ExpectRefusal(Call("VORN.Test.Wait/1/get", R"({"entered":[]})"), 500);
  EXPECT_TRUE(server_.LogShows("VORN.Test.Wait v1 get threw"));
}

TEST_F(CallTest, ASilentHandlerIsAnsweredForAndLogged) {
  ExpectRefusal(Call("VORN.Test.Silent/1/get"), 500);
  EXPECT_TRUE(server_.LogShows("VORN.Test.Silent v1 get answered nothing"));
}

TEST_F(CallTest, OfTwoAnswersTheLastCounts) {
  EXPECT_EQ(Call("VORN.Test.Twice/1/get").body, R"({"success":true,"data":"second"})");
  ExpectRefusal(Call("VORN.Test.Silent/1/get"), 500);
  EXPECT_TRUE(server_.LogShows("VORN.Test.Silent v1 get answered nothing")); // a fault; what came before it was none
  EXPECT_FALSE(server_.LogShows("VORN.Test.Twice", std::chrono::milliseconds(0)));
}

TEST_F(CallTest, AFailingHandlerLeavesTheConnection) {
  HttpClient client(server_.Port());
  ExpectRefusal(client.Exchange(CallBytes("VORN.Test.Throw/1/number")), 500);
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
}

TEST_F(CallTest, CallbacksRunOnceAndInOrderAfterTheAnswer) {
  EXPECT_EQ(Call("VORN.Test.Callback/1/set", Paths({"path"}, R"(,"lines":["one","two"])")).status, 200);
  EXPECT_EQ(folder_.WaitForLines("path", 2), (std::vector<std::string>{"one", "two"}));
}

TEST_F(CallTest, TheAnswerComesBeforeTheCallbackAndTheConnectionGoesOn) {
  HttpClient client(server_.Port());
  EXPECT_EQ(
      client.Exchange(CallBytes("VORN.Test.Callback/1/set", Paths({"path", "callback_until"}, R"(,"lines":["one"])")))
          .status,
      200);
  EXPECT_TRUE(folder_.Lines("path").empty());
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/get")).status, 200);
  folder_.Make("callback_until");
  EXPECT_EQ(folder_.WaitForLines("path", 1), std::vector<std::string>{"one"});
}

TEST_F(CallTest, ACallbackRunsWhenTheHandlerThrowsOrSaysNothing) {
  ExpectRefusal(Call("VORN.Test.Callback/1/set", Paths({"path"}, R"(,"lines":["thrown"],"then":"throw")")), 500);
  EXPECT_EQ(folder_.WaitForLines("path", 1), std::vector<std::string>{"thrown"});
  ExpectRefusal(Call("VORN.Test.Callback/1/set", Paths({"path"}, R"(,"lines":["silent"],"then":"nothing")")), 500);
  EXPECT_EQ(folder_.WaitForLines("path", 2), (std::vector<std::string>{"thrown", "silent"}));
}

TEST_F(CallTest, WhatACallbackThrowsIsLoggedAndTheNextRuns) {
  EXPECT_EQ(
      Call("VORN.Test.Callback/1/set", Paths({"path"}, R"(,"lines":["one","two"],"callback_throws":true)")).status,
      200);
  EXPECT_EQ(folder_.WaitForLines("path", 2), (std::vector<std::string>{"one", "two"}));
  EXPECT_TRUE(server_.LogShows("callback after the answer threw: thrown in a callback"));
}

TEST_F(CallTest, ACallbackRunsOnceWhenTheClientHasGone) {
  for (const bool reset : {false, true}) {
    const std::string name = reset ? "reset" : "closed";
    HttpClient client(server_.Port());
    ASSERT_TRUE(client.Send(CallBytes("VORN.Test.Callback/1/set",
                                      "{\"path\":\"" + folder_.Path(name) + "\",\"lines\":[\"once\"],\"entered\":\"" +
                                          folder_.Path(name + "_in") + "\",\"until\":\"" + folder_.Path(name + "_go") +
                                          "\",\"bytes\":8000000}")));
    ASSERT_EQ(folder_.WaitForLines(name + "_in", 1).size(), 1U);
    reset ? client.Reset() : client.Close();
    folder_.Make(name + "_go");
    EXPECT_EQ(folder_.WaitForLines(name, 1), std::vector<std::string>{"once"});
  }
}

TEST_F(CallTest, WaitingCallsOnAllSlotsLeaveTheServerServing) {
  std::vector<std::unique_ptr<HttpClient>> waiting;
  for (int index = 0; index < 20; ++index) {
    waiting.push_back(std::make_unique<HttpClient>(server_.Port()));
    ASSERT_TRUE(waiting.back()->Send(CallBytes("VORN.Test.Wait/1/get", Paths({"entered", "until"}))));
  }
  EXPECT_EQ(folder_.WaitForLines("entered", 16).size(), 16U); // the others wait before the gate
  HttpClient client(server_.Port());
  for (int index = 0; index < 50; ++index) { // what needs no slot is answered at once
    client.Send(CallBytes("VORN.Test.Echo/1/none"));
    ExpectRefusal(client.Read(std::chrono::seconds(1)), 404);
  }
  folder_.Make("until");
  for (const auto &each : waiting) {
    EXPECT_EQ(each->Read().body, R"({"success":true,"data":"waited"})");
  }
}

TEST_F(CallTest, AWritingCallIsAloneAmongThoseOfItsApi) {
  HttpClient first(server_.Port());
  HttpClient second(server_.Port());
  HttpClient reader(server_.Port());
  ASSERT_TRUE(first.Send(CallBytes("VORN.Test.Wait/2/set", Paths({"entered", "until"}))));
  ASSERT_EQ(folder_.WaitForLines("entered", 1).size(), 1U);
  ASSERT_TRUE(second.Send(CallBytes("VORN.Test.Wait/2/set", Paths({"entered", "until"}))));
  ASSERT_TRUE(reader.Send(CallBytes("VORN.Test.Wait/1/get", Paths({"entered", "until"}))));
  for (int count = 0; count < 20; ++count) { // another API's are not held up
    EXPECT_EQ(Call("VORN.Test.Echo/1/get").status, 200);
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  EXPECT_EQ(folder_.Lines("entered").size(), 1U);
  folder_.Make("until");
  for (HttpClient *each : {&first, &second, &reader}) {
    EXPECT_EQ(each->Read().body, R"({"success":true,"data":"waited"})");
  }
  EXPECT_EQ(folder_.Lines("entered").size(), 3U);
}

TEST_F(CallTest, ACallbackHoldsUpNobodyOfItsApi) {
  EXPECT_EQ(Call("VORN.Test.Callback/1/set", Paths({"path", "callback_until"}, R"(,"lines":["first"])")).status, 200);
  EXPECT_EQ(Call("VORN.Test.Callback/1/set", Paths({"path"}, R"(,"lines":["second"])")).status, 200);
  EXPECT_EQ(folder_.WaitForLines("path", 1), std::vector<std::string>{"second"});
  folder_.Make("callback_until");
  EXPECT_EQ(folder_.WaitForLines("path", 2), (std::vector<std::string>{"second", "first"}));
}

TEST_F(CallTest, BothProcessorsServe) {
  if (std::thread::hardware_concurrency() < 2) {
    GTEST_SKIP() << "one processor";
  }
  std::set<int> processors;
  std::atomic<bool> seen{false};
  std::mutex mutex;
  std::vector<std::thread> clients;
  clients.reserve(8);
  for (int count = 0; count < 8; ++count) {
    clients.emplace_back([this, &processors, &mutex, &seen] {
      HttpClient client(server_.Port());
      // Others may keep one processor busy for a while: it need not happen at once.
      const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
      while (!seen && std::chrono::steady_clock::now() < deadline) {
        const HttpAnswer answer = client.Exchange(CallBytes("VORN.Test.Processor/1/get"));
        const std::lock_guard lock(mutex);
        processors.insert(vorntest::ParseJson(answer.body)["data"].asInt());
        seen = processors.size() >= 2;
      }
    });
  }
  for (std::thread &client : clients) {
    client.join();
  }
  EXPECT_GE(processors.size(), 2U);
}

class FewSlotsTest : public CallTest {
protected:
  std::unique_ptr<vorntest::ServerProcess> server2_;
};

TEST_F(FewSlotsTest, CallsBeyondSlotsAndQueueAreRefusedAndTheRestIsServed) {
  server2_ = std::make_unique<vorntest::ServerProcess>(
      vorntest::ServerProcess::Setup{.options = {"--slots", "2", "--queue", "3"}});
  std::vector<std::unique_ptr<HttpClient>> waiting;
  for (int index = 0; index < 2; ++index) {
    waiting.push_back(std::make_unique<HttpClient>(server2_->Port()));
    ASSERT_TRUE(waiting.back()->Send(CallBytes("VORN.Test.Wait/1/get", Paths({"entered", "until"}))));
  }
  ASSERT_EQ(folder_.WaitForLines("entered", 2).size(), 2U);
  std::vector<std::unique_ptr<HttpClient>> queued;
  for (int index = 0; index < 4; ++index) {
    queued.push_back(std::make_unique<HttpClient>(server2_->Port()));
    ASSERT_TRUE(queued.back()->Send(CallBytes("VORN.Test.Echo/1/get")));
  }
  int refused = 0;
  for (const auto &each : queued) {
    const HttpAnswer answer = each->Read(std::chrono::milliseconds(500));
    if (answer.status != 0) {
      ExpectRefusal(answer, 503);
      EXPECT_EQ(answer.fields.at("retry-after"), "1");
      each->Send(CallBytes("VORN.Test.Echo/1/none"));
      ++refused;
    }
  }
  EXPECT_EQ(refused, 1);
  EXPECT_TRUE(server2_->LogShows("every waiting place is taken"));
  folder_.Make("until");
  for (const auto &each : waiting) {
    EXPECT_EQ(each->Read().status, 200);
  }
  int served = 0;
  for (const auto &each : queued) {
    served += each->Read().status == 200 ? 1 : 0;
  }
  EXPECT_EQ(served, 3);
  EXPECT_EQ(server2_->Stop(), 0);
}

TEST_F(FewSlotsTest, AWaitingCallbackHoldsItsSlotButNoThreadOfTheOthers) {
  server2_ = std::make_unique<vorntest::ServerProcess>(vorntest::ServerProcess::Setup{.options = {"--slots", "1"}});
  HttpClient client(server2_->Port());
  EXPECT_EQ(
      client.Exchange(CallBytes("VORN.Test.Callback/1/set", Paths({"path", "callback_until"}, R"(,"lines":["one"])")))
          .status,
      200);
  EXPECT_EQ(client.Exchange(CallBytes("VORN.Test.Echo/1/none")).status, 404);
  client.Send(CallBytes("VORN.Test.Echo/1/get")); // waits for the slot
  EXPECT_EQ(client.Read(std::chrono::milliseconds(100)).status, 0);
  folder_.Make("callback_until");
  EXPECT_EQ(client.Read().status, 200);
  EXPECT_EQ(folder_.WaitForLines("path", 1), std::vector<std::string>{"one"});
  EXPECT_EQ(server2_->Stop(), 0);
}

} // namespace
