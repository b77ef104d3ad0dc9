// The listing as a poll task, from the first get to the one that ends it.
#include "router/connectionlist.h"
#include "router/mervane_base.h"
#include "tests/router/network_files.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

using scripted::Exchange;
using scripted::Get;
using scripted::kNeighbourTitle;
using scripted::Lines;
using scripted::NeighbourLine;
using scripted::Parse;
using scripted::PutNetBiosReply;
using scripted::Text;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

namespace {

const std::string kList = R"(List(request, connectionlist, ["admin"]))";
const std::string kStart = "Start(request, admin, connectionlist, keep)";

class PollTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    scripted::RemoveNameFile();
    scripted::PutNmblookup();
    Get().startReply = Parse(R"({"id":"connectionlist_1","finish":false})");
    Get().lans = {{"lbr0", "192.168.1.1", "255.255.255.0"}};
    Get().subnets["192.168.1.1"] = {"192.168.1.5", "192.168.1.6"};
    Get().adapters = Parse(R"(["wlan0"])");
    Get().adapterConfigs["wlan0"] = Parse(R"({"enabled":true})");
    Get().wifiStations["wlan0"] = Parse(R"([{"mac":"aa:bb:cc:dd:ee:01"}])");
    scripted::PutNeighbours(kNeighbourTitle + NeighbourLine("192.168.1.5", "aa:bb:cc:dd:ee:01", "lbr0") +
                            NeighbourLine("192.168.1.6", "aa:bb:cc:dd:ee:02", "lbr0"));
  }
  static std::string Run(const std::string &parameters = "{}") {
    Exchange exchange(Parse(parameters));
    exchange.Run(GetConnectionList);
    return exchange.Answer();
  }
  // What the task answers, one after the other.
  static Lines RunTask() {
    Get().startedTask = ConnectionList::WrapperFunc;
    Exchange exchange;
    exchange.RunTask();
    return exchange.Answers();
  }
  static std::string Listed(const std::string &wifiName, const std::string &wiredName) {
    return R"({"stations":[{"brand":"","connection":"wifi",)" + wifiName +
           R"("ip":"192.168.1.5","mac":"aa:bb:cc:dd:ee:01","model":"","status":true,"type":"others"},)"
           R"({"connection":"ethernet","hostname":")" +
           wiredName + R"(","ip":"192.168.1.6","mac":"aa:bb:cc:dd:ee:02","netif":"lbr0"}]})";
  }
  // A task that fails answers nothing and leaves file and table alone.
  static void ExpectTaskFails(const Lines &log) {
    EXPECT_THAT(RunTask(), IsEmpty());
    EXPECT_THAT(Get().log, ElementsAreArray(log));
    EXPECT_EQ(scripted::ReadNameFile(), "");
    EXPECT_THAT(scripted::TakeNmblookupCalls(), IsEmpty());
    EXPECT_THAT(Get().calls, testing::Not(testing::Contains("GetTopologyString()")));
  }
};

TEST_F(PollTest, Get_FirstStartsATaskAndAnswersTheStartReply) {
  EXPECT_EQ(Run(), R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))");
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(scannertype)", kList, kStart,
                                       R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))"));
  EXPECT_EQ(Get().startedTask, &ConnectionList::WrapperFunc);
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(PollTest, Start_TheTaskGetsTheObjectThatStartedIt) {
  ConnectionList list; // the task gets its address, whatever it is good for
  static ConnectionList *object = nullptr;
  object = &list;
  Exchange exchange;
  exchange.Run([](VORN::APIRequest *request, VORN::APIResponse *response) { object->PollStart(request, response); });
  EXPECT_THAT(Get().calls, ElementsAre(kStart, R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))"));
  EXPECT_EQ(Get().startedTask, &ConnectionList::WrapperFunc);
  EXPECT_EQ(Get().startedContext, &list);
}

TEST_F(PollTest, Get_ScannerTypeThatIsNoTextGoesToPolling) {
  for (const char *wrong : {"1", "null", "[]", "[\"all\"]", "{}", "true"}) {
    Get().calls.clear();
    Run(std::string(R"({"netrange":"guest","scannertype":)") + wrong + "}");
    ASSERT_EQ(Get().calls.size(), 5U) << wrong;
    EXPECT_EQ(Get().calls[1] + Get().calls[2] + Get().calls[3], "GetParam(scannertype, null)" + kList + kStart);
  }
}

TEST_F(PollTest, Get_RunningTaskAnswersItsStateAndGoesOn) {
  Get().tasks["admin"] = Parse(R"(["t1"])");
  Get().taskStatus = Parse(R"({"stations":[{"mac":"m"}],"finish":false,"more":1})");
  Run();
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(scannertype)", kList, "Status(request, t1)",
                                       R"(SetSuccess({"finish":false,"more":1,"stations":[{"mac":"m"}]}))"));
}

TEST_F(PollTest, Get_FinishedTaskAnswersItsStateAndIsStopped) {
  Get().tasks["admin"] = Parse(R"(["t1"])");
  Get().taskStatus = Parse(R"({"stations":[],"finish":true})");
  for (const int stopped : {1, 0}) { // whether it could be stopped is all the same to the client
    Get().calls.clear();
    Get().results["Stop(t1, force)"] = stopped;
    Run();
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(scannertype)", kList, "Status(request, t1)", "Stop(t1, force)",
                                         R"(SetSuccess({"finish":true,"stations":[]}))"));
  }
}

TEST_F(PollTest, Get_OddStateIsAnsweredAndNotStopped) {
  Get().tasks["admin"] = Parse(R"(["t1"])");
  for (const char *state : {"null", "[]", "{}", R"({"finish":"true"})", R"({"finish":null})", "\"text\""}) {
    Get().calls.clear();
    Get().taskStatus = Parse(state);
    EXPECT_EQ(Run(), "SetSuccess(" + Text(Parse(state)) + ")");
    EXPECT_EQ(Get().calls.size(), 4U);
  }
}

TEST_F(PollTest, Get_FirstTextInTheListIsTheTask) {
  Get().taskStatus = Parse(R"({"finish":false})");
  for (const char *tasks : {R"({"a":"no array","admin":[1,null,["x"],"t1","t2"],"b":["t3"]})",
                            R"({"a":[],"b":{"c":"t2"},"c":["t1"]})", R"([["t1"]])"}) {
    Get().calls.clear();
    Get().tasks = Parse(tasks);
    Run();
    EXPECT_EQ(Get().calls[2], "Status(request, t1)") << tasks;
  }
}

TEST_F(PollTest, Get_ListWithoutATextStartsATask) {
  for (const char *tasks : {"null", "{}", "[]", R"({"admin":[]})", R"({"admin":"t1"})", R"({"admin":[1,{}]})",
                            R"(["t1"])", "\"t1\"", "5"}) {
    Get().calls.clear();
    Get().tasks = Parse(tasks);
    Run();
    EXPECT_EQ(Get().calls[2], kStart) << tasks;
  }
}

TEST_F(PollTest, Get_FailedListIsAnsweredAndReplacedByTheStart) {
  Get().pollError = 42;
  Exchange exchange;
  exchange.Run(GetConnectionList);
  EXPECT_THAT(exchange.Answers(),
              ElementsAre("SetError(117, null)", R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))"));
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(scannertype)", kList, "SetError(117, null)", kStart,
                                       R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))"));
}

TEST_F(PollTest, Status_EmptyIdAnswers114) {
  Get().tasks["admin"] = Parse(R"(["","t1"])");
  EXPECT_EQ(Run(), "SetError(114, null)");
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(scannertype)", kList, "SetError(114, null)"));
}

TEST_F(PollTest, Status_FailureAnswers117WithTheFrameworksCode) {
  Get().pollError = 111;
  Exchange exchange;
  exchange.Run([](VORN::APIRequest *request, VORN::APIResponse *response) {
    ConnectionList().PollStatus(request, response, "t1");
  });
  EXPECT_THAT(Get().calls, ElementsAre("Status(request, t1)", "SetError(117, 111)"));
}

TEST_F(PollTest, Task_CollectsMergesNamesAndRefreshesInThisOrder) {
  scripted::PutNameFile(R"({"stations":[{"ip":"192.168.1.6","hostname":"cached"}]})");
  PutNetBiosReply("192.168.1.5", "\tPHONE <00> - B <ACTIVE>\n");
  RunTask();
  const auto answer = [](const std::string &text) { return "SetSuccess(" + text + ")"; };
  const std::string named = R"("hostname":"PHONE",)";
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "GetAdapterConfig(wlan0, null)",
                          "GetConnectionList(wlan0, null)", "GetAdapterConfig(wlan0, null)", "~WifiClient()",
                          "VORNNetIFGetInfo(lbr0, 0)", "VORNNetIsSameSubnet(192.168.1.5, 192.168.1.1, 255.255.255.0)",
                          "VORNNetIFGetInfo(lbr0, 0)", "VORNNetIsSameSubnet(192.168.1.6, 192.168.1.1, 255.255.255.0)",
                          answer(Listed("", "")), answer(Listed("", "cached")), answer(Listed(named, "cached")),
                          answer(Listed(named, "cached")), "GetTopologyString()",
                          "QARDCExec(/sbin/arp, -d, 192.168.1.5, null, null)",
                          "QARDCExec(/usr/bin/arping, 192.168.1.5, -Ilbr0, -w1, -f)",
                          "QARDCExec(/sbin/arp, -d, 192.168.1.6, null, null)",
                          "QARDCExec(/usr/bin/arping, 192.168.1.6, -Ilbr0, -w1, -f)"));
  EXPECT_EQ(Text(Parse(scripted::ReadNameFile())), Listed(named, "cached"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(PollTest, Task_StationWithoutANetBiosNameKeepsTheCachedOne) {
  scripted::PutNameFile(R"({"stations":[{"ip":"192.168.1.6","hostname":"cached"}]})");
  EXPECT_EQ(RunTask().back(), "SetSuccess(" + Listed("", "cached") + ")");
  RunTask(); // the file of that run has it too
  EXPECT_EQ(Text(Parse(scripted::ReadNameFile())), Listed("", "cached"));
}

TEST_F(PollTest, Task_EmptyNetworkAnswersTheEmptyListThrice) {
  Get().serverReady = false;
  scripted::PutNeighbours(kNeighbourTitle);
  const std::string empty = R"(SetSuccess({"stations":[]}))";
  EXPECT_THAT(RunTask(), ElementsAre(empty, empty, empty));
  EXPECT_EQ(scripted::ReadNameFile(), "{\n\t\"stations\" : []\n}\n");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(PollTest, Task_WithoutTheWirelessDaemonListsTheWiredStations) {
  Get().serverReady = false;
  const auto wired = [](const std::string &last) {
    return R"({"connection":"ethernet","hostname":"","ip":"192.168.1.)" + last + R"(","mac":"aa:bb:cc:dd:ee:0)" +
           (last == "5" ? "1" : "2") + R"(","netif":"lbr0"})";
  };
  const std::string listed = R"({"stations":[)" + wired("5") + "," + wired("6") + "]}";
  const std::string answer = "SetSuccess(" + listed + ")";
  EXPECT_THAT(RunTask(), ElementsAre(answer, answer, answer, answer));
  EXPECT_EQ(Text(Parse(scripted::ReadNameFile())), listed);
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(PollTest, Task_WithoutAdaptersFails) {
  Get().results["GetAdapterList(null)"] = -1;
  ExpectTaskFails({"connectionlist: Failed to get wireless interface list",
                   "connectionlist: failed to get connection list from hostapd"});
}

TEST_F(PollTest, Task_WithoutANeighbourTableFails) {
  scripted::RemoveNeighbours();
  ExpectTaskFails({"connectionlist: failed to open file (/proc/net/arp)",
                   "connectionlist: failed to get connection list from arp"});
}

TEST_F(PollTest, Task_FailedRefreshIsLogged) {
  Get().topology = "client";
  EXPECT_EQ(RunTask().size(), 4U);
  EXPECT_THAT(Get().log,
              ElementsAre("connectionlist: topology (client) is not AP mode, should not call connection list",
                          "connectionlist: cannot update arp table, skip"));
}

TEST_F(PollTest, Task_NeedsNoObject) {
  Get().startedContext = nullptr; // the one that started it is gone by then
  EXPECT_EQ(RunTask().size(), 4U);
}

// The framework between the calls: what the task answered last, and whether it has returned.
TEST_F(PollTest, Life_FromTheStartToTheNextStart) {
  Run();
  ASSERT_EQ(Get().startedTask, &ConnectionList::WrapperFunc);
  PutNetBiosReply("192.168.1.6", "\tLAPTOP <00> - B <ACTIVE>\n");
  const Lines answers = RunTask();
  const Lines states = {Listed("", ""), Listed("", ""), Listed("", ""), Listed("", "LAPTOP")};
  ASSERT_EQ(answers.size(), states.size());
  Get().tasks["admin"] = Parse(R"(["connectionlist_1"])");
  for (size_t i = 0; i < states.size(); ++i) {
    EXPECT_EQ(answers[i], "SetSuccess(" + states[i] + ")");
    for (const bool finish : {false, true}) {
      if (finish && i + 1 < states.size()) {
        continue;
      }
      Get().calls.clear();
      Get().taskStatus = Parse(states[i]);
      Get().taskStatus["finish"] = finish;
      EXPECT_EQ(Run(), "SetSuccess(" + Text(Get().taskStatus) + ")");
      EXPECT_EQ(Get().calls.size(), finish ? 5U : 4U);
    }
  }
  Get().calls.clear();
  Get().tasks["admin"] = Json::Value(Json::arrayValue); // stopped
  EXPECT_EQ(Run(), R"(SetSuccess({"finish":false,"id":"connectionlist_1"}))");
  EXPECT_EQ(Get().calls[2], kStart);
}

} // namespace
