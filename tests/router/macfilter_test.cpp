// The MacFilter rows over the scripted platform.
#include "router/macfilter.h"
#include "router/mervane_base.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <algorithm>

using scripted::Exchange;
using scripted::Get;
using scripted::Parse;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

constexpr char kNotReady[] = "macfilter: Cannot get connecton list when vornwifid is not ready";
constexpr char kNoList[] = "macfilter: Error on getting Adapter list";
constexpr char kEmptyList[] = "macfilter: Error on Adapter list is empty";
constexpr char kFirst[] = "macfilter: Error on getting first Adapter config";
constexpr char kNoConfig[] = "macfilter: Failed to get Adapter config";
constexpr char kNoWrite[] = "macfilter: Failed on writeback Adapter config";
constexpr char kParse[] = "mervane_base: Error when parsing array, msg: ";
constexpr char kNoArray[] = "mervane_base: Data mac filter list from req is not an json array";
constexpr char kNothing[] = R"(SetError(4300, {"mac_filter_list":[]}))";

class MacFilterTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().adapters = Parse(R"(["wlan0","wlan1","wlan2"])");
    Get().adapterConfigs = {{"wlan0", Parse(R"({"channel":6,"enabled":true,"mac_filter_list":[],
                                              "mac_filter_policy":"disable"})")},
                            {"wlan1", Parse(R"({"ssid":"five"})")},
                            {"wlan2", Parse("{}")}};
  }

  static Json::Value Parameters(const char *policy, const char *list) {
    Json::Value parameters(Json::objectValue);
    if (policy != nullptr) {
      parameters["mac_filter_policy"] = policy;
    }
    if (list != nullptr) {
      parameters["mac_filter_list"] = list;
    }
    return parameters;
  }

  static std::string GetAnswer() {
    Exchange exchange;
    exchange.Run(GetMacFilter);
    EXPECT_EQ(exchange.AnswerCount(), 1U);
    return exchange.Answer();
  }

  static std::string SetAnswer(const Json::Value &parameters) {
    Exchange exchange(parameters);
    exchange.Run(SetMacFilter);
    EXPECT_EQ(exchange.AnswerCount(), 1U);
    return exchange.Answer();
  }

  // The recorded calls of one function.
  static std::vector<std::string> CallsOf(const std::string &function) {
    std::vector<std::string> calls;
    for (const std::string &call : Get().calls) {
      if (call.rfind(function + "(", 0) == 0) {
        calls.push_back(call);
      }
    }
    return calls;
  }
};

TEST_F(MacFilterTest, Get_ShowsTheFirstAdaptersFilterOnly) {
  Get().adapterConfigs["wlan0"] = Parse(
      R"({"mac_filter_policy":"deny","mac_filter_list":[{"mac":"02:00:00:00:01:00","desc":"tv","mac_filter_enabled":true},
          {"mac":"02:00:00:00:02:00","desc":"","mac_filter_enabled":false}],"enabled":true})");
  Get().adapterConfigs["wlan1"] = Parse(R"({"mac_filter_policy":"allow","mac_filter_list":[{"mac":"x"}]})");
  const std::string answer = GetAnswer();
  EXPECT_EQ(answer, R"(SetSuccess({"mac_filter_list":[)"
                    R"({"desc":"tv","mac":"02:00:00:00:01:00","mac_filter_enabled":true},)"
                    R"({"desc":"","mac":"02:00:00:00:02:00","mac_filter_enabled":false}],)"
                    R"("mac_filter_policy":"deny"}))");
  EXPECT_THAT(Get().calls, ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)",
                                       "GetAdapterConfig(wlan0, null)", "~WifiClient()", answer));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MacFilterTest, Get_CopiesValuesOfAnyTypeWithoutLookingAtThem) {
  Get().adapterConfigs["wlan0"] =
      Parse(R"({"mac_filter_policy":7,"mac_filter_list":[{"mac":[1],"desc":null,"mac_filter_enabled":"yes"}]})");
  EXPECT_EQ(GetAnswer(), R"(SetSuccess({"mac_filter_list":[{"desc":null,"mac":[1],"mac_filter_enabled":"yes"}],)"
                         R"("mac_filter_policy":7}))");
}

TEST_F(MacFilterTest, Get_UnknownKeysOfEntriesNeverAppearAndMissingOnesAreNull) {
  Get().adapterConfigs["wlan0"] =
      Parse(R"({"mac_filter_policy":"deny","mac_filter_list":[{"mac":"a","vlan":3},5,"text",null]})");
  EXPECT_EQ(GetAnswer(), R"(SetSuccess({"mac_filter_list":[{"desc":null,"mac":"a","mac_filter_enabled":null},)"
                         R"({"desc":null,"mac":null,"mac_filter_enabled":null},)"
                         R"({"desc":null,"mac":null,"mac_filter_enabled":null},)"
                         R"({"desc":null,"mac":null,"mac_filter_enabled":null}],"mac_filter_policy":"deny"}))");
}

TEST_F(MacFilterTest, Get_ConfigurationWithoutAFilterIsANullPolicyAndAnEmptyList) {
  for (const char *config :
       {"{}", "null", R"({"mac_filter_list":{"0":{"mac":"a"}}})", R"({"mac_filter_list":"x"})", "[]", "5"}) {
    Get().adapterConfigs["wlan0"] = Parse(config);
    EXPECT_EQ(GetAnswer(), R"(SetSuccess({"mac_filter_list":[],"mac_filter_policy":null}))") << config;
  }
}

TEST_F(MacFilterTest, Get_DaemonNotReadyAnswers4300WithAnEmptyList) {
  Get().serverReady = false;
  EXPECT_EQ(GetAnswer(), kNothing);
  EXPECT_THAT(Get().calls, ElementsAre("WifiClient()", "IsServerReady()", "~WifiClient()", kNothing));
  EXPECT_THAT(Get().log, ElementsAre(kNotReady, kNoConfig));
}

TEST_F(MacFilterTest, Get_UnreadableAdapterListAnswers4300WithAnEmptyList) {
  Get().results["GetAdapterList(null)"] = -1;
  EXPECT_EQ(GetAnswer(), kNothing);
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "~WifiClient()", kNothing));
  EXPECT_THAT(Get().log, ElementsAre(kNoList, kNoConfig));
}

TEST_F(MacFilterTest, Get_WithoutAdaptersAnswers4300WithAnEmptyList) {
  for (const char *adapters : {"[]", "null", R"({"0":"wlan0"})", R"("wlan0")", "1"}) {
    scripted::Reset();
    Get().adapters = Parse(adapters);
    EXPECT_EQ(GetAnswer(), kNothing) << adapters;
    EXPECT_THAT(Get().calls,
                ElementsAre("WifiClient()", "IsServerReady()", "GetAdapterList(null)", "~WifiClient()", kNothing));
    EXPECT_THAT(Get().log, ElementsAre(kEmptyList, kNoConfig));
  }
}

TEST_F(MacFilterTest, Get_UnreadableFirstAdapterAnswers4300WithAnEmptyListAndTriesNoOther) {
  Get().adapterConfigs.erase("wlan0");
  EXPECT_EQ(GetAnswer(), kNothing);
  EXPECT_THAT(CallsOf("GetAdapterConfig"), ElementsAre("GetAdapterConfig(wlan0, null)"));
  EXPECT_THAT(Get().log, ElementsAre(kFirst, kNoConfig));
}

TEST_F(MacFilterTest, Get_FirstAdapterNameThatIsNoTextNamesNone) {
  for (const char *adapters : {R"([{"name":"wlan0"},"wlan1"])", R"([["wlan0"],"wlan1"])", R"([null,"wlan1"])"}) {
    scripted::Reset();
    Get().adapters = Parse(adapters);
    Get().adapterConfigs["wlan1"] = Parse("{}");
    EXPECT_EQ(GetAnswer(), kNothing) << adapters;
    EXPECT_THAT(CallsOf("GetAdapterConfig"), ElementsAre("GetAdapterConfig(, null)"));
    EXPECT_THAT(Get().log, ElementsAre(kFirst, kNoConfig));
  }
}

TEST_F(MacFilterTest, GetRules_AppendsToAListThatIsThereAndKeepsItOnFailure) {
  Get().adapterConfigs["wlan0"] = Parse(R"({"mac_filter_policy":"deny","mac_filter_list":[{"mac":"b"}]})");
  Json::Value out = Parse(R"({"mac_filter_list":["a"],"other":1})");
  EXPECT_TRUE(MacFilterHandler().GetRules(out));
  const char *appended = R"({"mac_filter_list":["a",{"desc":null,"mac":"b","mac_filter_enabled":null}],)"
                         R"("mac_filter_policy":"deny","other":1})";
  EXPECT_EQ(scripted::Text(out), appended);
  Get().serverReady = false;
  EXPECT_FALSE(MacFilterHandler().GetRules(out));
  EXPECT_EQ(scripted::Text(out), appended);
  Json::Value fresh;
  EXPECT_FALSE(MacFilterHandler().GetRules(fresh));
  EXPECT_EQ(scripted::Text(fresh), R"({"mac_filter_list":[]})");
}

TEST_F(MacFilterTest, Set_WritesTheSameFilterToEveryAdapterAndKeepsTheOtherKeys) {
  const std::string answer =
      SetAnswer(Parameters("deny", R"([{"mac":"02:00:00:00:01:00","desc":"tv","mac_filter_enabled":true,"vlan":3}])"));
  EXPECT_EQ(answer, "SetSuccess(null)");
  const std::string filter = R"("mac_filter_list":[{"desc":"tv","mac":"02:00:00:00:01:00","mac_filter_enabled":true}],)"
                             R"("mac_filter_policy":"deny")";
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(mac_filter_policy)", "GetParam(mac_filter_policy, null)",
                          "HasParam(mac_filter_list)", "GetParam(mac_filter_list, null)", "WifiClient()",
                          "IsServerReady()", "GetAdapterList(null)", "GetAdapterConfig(wlan0, null)",
                          R"(ApplyAdapter(wlan0, {"channel":6,"enabled":true,)" + filter + "})",
                          "GetAdapterConfig(wlan1, null)", "ApplyAdapter(wlan1, {" + filter + R"(,"ssid":"five"}))",
                          "GetAdapterConfig(wlan2, null)", "ApplyAdapter(wlan2, {" + filter + "})", "~WifiClient()",
                          answer));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(MacFilterTest, Set_UnknownKeysOfEntriesAreNotPassedOn) {
  Get().adapters = Parse(R"(["wlan2"])");
  EXPECT_EQ(SetAnswer(Parameters("deny", R"([{"vlan":3,"mac":"a","Mac":"b","desc":{"x":1}},{"name":"tv"}])")),
            "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[)"
                          R"({"desc":{"x":1},"mac":"a","mac_filter_enabled":null},)"
                          R"({"desc":null,"mac":null,"mac_filter_enabled":null}],"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_WithoutEitherParameterWritesANullPolicyAndAnEmptyList) {
  EXPECT_EQ(SetAnswer(Parameters(nullptr, nullptr)), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan0, {"channel":6,"enabled":true,"mac_filter_list":[],)"
                          R"("mac_filter_policy":null}))",
                          R"(ApplyAdapter(wlan1, {"mac_filter_list":[],"mac_filter_policy":null,"ssid":"five"}))",
                          R"(ApplyAdapter(wlan2, {"mac_filter_list":[],"mac_filter_policy":null}))"));
}

TEST_F(MacFilterTest, Set_EmptyListClearsTheListInEveryAdapter) {
  for (auto &[name, config] : Get().adapterConfigs) {
    config = Parse(R"({"mac_filter_policy":"deny","mac_filter_list":[{"mac":"a"}]})");
  }
  EXPECT_EQ(SetAnswer(Parameters("deny", "[]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan0, {"mac_filter_list":[],"mac_filter_policy":"deny"}))",
                          R"(ApplyAdapter(wlan1, {"mac_filter_list":[],"mac_filter_policy":"deny"}))",
                          R"(ApplyAdapter(wlan2, {"mac_filter_list":[],"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_AdapterThatCannotBeReadIsSkippedAndTheAnswerIsSuccess) {
  Get().adapters = Parse(R"(["wlan0","wlan1"])");
  Get().adapterConfigs.erase("wlan0");
  EXPECT_EQ(SetAnswer(Parameters("allow", "[]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan1, {"mac_filter_list":[],"mac_filter_policy":"allow","ssid":"five"}))"));
  EXPECT_THAT(Get().log, ElementsAre("macfilter: Error on getting Adapter config from [wlan0], skip it"));
}

TEST_F(MacFilterTest, Set_AllAdaptersSkippedIsSuccessToo) {
  Get().adapterConfigs.clear();
  EXPECT_EQ(SetAnswer(Parameters("allow", "[]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"), IsEmpty());
  EXPECT_THAT(Get().log, ElementsAre("macfilter: Error on getting Adapter config from [wlan0], skip it",
                                     "macfilter: Error on getting Adapter config from [wlan1], skip it",
                                     "macfilter: Error on getting Adapter config from [wlan2], skip it"));
}

TEST_F(MacFilterTest, Set_ConfigurationThatIsNoObjectIsSkipped) {
  Get().adapterConfigs["wlan0"] = Parse("[]");
  Get().adapterConfigs["wlan1"] = Parse(R"("text")");
  EXPECT_EQ(SetAnswer(Parameters("allow", "[]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[],"mac_filter_policy":"allow"}))"));
  EXPECT_THAT(Get().log, ElementsAre("macfilter: Error on getting Adapter config from [wlan0], skip it",
                                     "macfilter: Error on getting Adapter config from [wlan1], skip it"));
}

TEST_F(MacFilterTest, Set_FailureOnTheSecondAdapterKeepsTheFirstAndLeavesTheThird) {
  Get().applyResults["wlan1"] = -1;
  EXPECT_EQ(SetAnswer(Parameters("deny", R"([{"mac":"a","vlan":3}])")),
            R"(SetError(4300, {"mac_filter_list":[{"mac":"a","vlan":3}],"mac_filter_policy":"deny"}))");
  const std::string filter = R"("mac_filter_list":[{"desc":null,"mac":"a","mac_filter_enabled":null}],)"
                             R"("mac_filter_policy":"deny")";
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan0, {"channel":6,"enabled":true,)" + filter + "})",
                          "ApplyAdapter(wlan1, {" + filter + R"(,"ssid":"five"}))"));
  EXPECT_THAT(CallsOf("GetAdapterConfig"),
              ElementsAre("GetAdapterConfig(wlan0, null)", "GetAdapterConfig(wlan1, null)"));
  EXPECT_THAT(Get().log, ElementsAre(kFirst, kNoWrite));
}

TEST_F(MacFilterTest, Set_DaemonNotReadyAnswers4300WithTheParameters) {
  Get().serverReady = false;
  EXPECT_EQ(SetAnswer(Parameters("deny", "[]")),
            R"(SetError(4300, {"mac_filter_list":[],"mac_filter_policy":"deny"}))");
  EXPECT_EQ(SetAnswer(Parameters(nullptr, nullptr)), "SetError(4300, null)");
  EXPECT_THAT(CallsOf("GetAdapterList"), IsEmpty());
  EXPECT_THAT(Get().log, ElementsAre(kNotReady, kNoWrite, kNotReady, kNoWrite));
}

TEST_F(MacFilterTest, Set_AdapterListThatFailsOrIsEmptyAnswers4300) {
  const char *refused = R"(SetError(4300, {"mac_filter_policy":"deny"}))";
  const std::vector<std::string> asked = {"WifiClient()", "IsServerReady()", "GetAdapterList(null)", "~WifiClient()",
                                          refused};
  const auto afterTheParameters = [] {
    auto calls = Get().calls;
    calls.erase(calls.begin(), std::find(calls.begin(), calls.end(), "WifiClient()"));
    return calls;
  };
  Get().results["GetAdapterList(null)"] = -1;
  EXPECT_EQ(SetAnswer(Parameters("deny", nullptr)), refused);
  EXPECT_EQ(afterTheParameters(), asked);
  EXPECT_THAT(Get().log, ElementsAre(kNoList, kNoWrite));
  for (const char *adapters : {"[]", R"({"0":"wlan0"})", "null"}) {
    scripted::Reset();
    Get().adapters = Parse(adapters);
    EXPECT_EQ(SetAnswer(Parameters("deny", nullptr)), refused) << adapters;
    EXPECT_EQ(afterTheParameters(), asked) << adapters;
    EXPECT_THAT(Get().log, ElementsAre(kEmptyList, kNoWrite)) << adapters;
  }
}

TEST_F(MacFilterTest, Set_AdapterNameThatIsNoTextNamesNone) {
  Get().adapters = Parse(R"([{"name":"wlan0"},["wlan1"]])");
  EXPECT_EQ(SetAnswer(Parameters("deny", "[]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("GetAdapterConfig"), ElementsAre("GetAdapterConfig(, null)", "GetAdapterConfig(, null)"));
}

TEST_F(MacFilterTest, Set_ListThatIsNoJsonAnswers4300WithNullAndAsksNobody) {
  for (const char *list : {"", "[", R"([{"mac":"a")", "[}", "x"}) {
    scripted::Reset();
    EXPECT_EQ(SetAnswer(Parameters("deny", list)), "SetError(4300, null)") << list;
    EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
    EXPECT_THAT(Get().log, ElementsAre(HasSubstr(kParse))) << list;
  }
}

TEST_F(MacFilterTest, Set_ListThatIsNoTextAnswers4300WithNull) {
  for (const char *list : {"[]", "{}", R"([{"mac":"a"}])"}) {
    scripted::Reset();
    Json::Value parameters = Parameters("deny", nullptr);
    parameters["mac_filter_list"] = Parse(list);
    EXPECT_EQ(SetAnswer(parameters), "SetError(4300, null)") << list;
    EXPECT_THAT(Get().log, ElementsAre(std::string(kParse) + "no text"));
    EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
  }
}

// A number, a boolean and null are taken for their texts; that of null is empty.
TEST_F(MacFilterTest, Set_ListThatIsANumberAnswers4300WithIt) {
  for (const char *list : {"5", "true"}) {
    scripted::Reset();
    Json::Value parameters = Parameters("deny", nullptr);
    parameters["mac_filter_list"] = Parse(list);
    EXPECT_EQ(SetAnswer(parameters), std::string("SetError(4300, ") + list + ")");
    EXPECT_THAT(Get().log, ElementsAre(kNoArray));
    EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
  }
  scripted::Reset();
  Json::Value parameters = Parameters("deny", nullptr);
  parameters["mac_filter_list"] = Json::Value();
  EXPECT_EQ(SetAnswer(parameters), "SetError(4300, null)");
  EXPECT_THAT(Get().log, ElementsAre(HasSubstr(kParse)));
  EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
}

TEST_F(MacFilterTest, Set_JsonThatIsNoArrayAnswers4300WithIt) {
  for (const char *list : {R"({"mac":"a"})", "{}", "5", "null", R"("x")", "true"}) {
    scripted::Reset();
    EXPECT_EQ(SetAnswer(Parameters("deny", list)), std::string("SetError(4300, ") + list + ")");
    EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
    EXPECT_THAT(Get().log, ElementsAre(kNoArray));
  }
}

TEST_F(MacFilterTest, Set_WhatFollowsTheArrayIsPassedOver) {
  Get().adapters = Parse(R"(["wlan2"])");
  EXPECT_EQ(SetAnswer(Parameters("deny", "[] rubbish")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[],"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_ListNestedTooDeeplyIsNoJson) {
  for (const size_t depth : {65U, 100000U}) {
    scripted::Reset();
    EXPECT_EQ(SetAnswer(Parameters("deny", (std::string(depth, '[') + std::string(depth, ']')).c_str())),
              "SetError(4300, null)");
    EXPECT_THAT(Get().log, ElementsAre(std::string(kParse) + "nested too deeply"));
    EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
  }
  scripted::Reset();
  Get().adapters = Parse(R"(["wlan2"])");
  Get().adapterConfigs["wlan2"] = Parse("{}");
  EXPECT_EQ(SetAnswer(Parameters("deny", (std::string(64, '[') + std::string(64, ']')).c_str())), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"), ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[{"desc":null,"mac":null,)"
                                                   R"("mac_filter_enabled":null}],"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_PolicyIsTakenAsText) {
  Get().adapters = Parse(R"(["wlan2"])");
  for (const auto &[value, text] :
       std::map<std::string, std::string>{{"7", "7"}, {"true", "true"}, {"null", ""}, {R"("d\ne<b>")", R"(d\ne<b>)"}}) {
    Get().calls.clear();
    Json::Value parameters(Json::objectValue);
    parameters["mac_filter_policy"] = Parse(value);
    EXPECT_EQ(SetAnswer(parameters), "SetSuccess(null)");
    EXPECT_THAT(CallsOf("ApplyAdapter"),
                ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[],"mac_filter_policy":")" + text + R"("}))"));
  }
}

TEST_F(MacFilterTest, Set_PolicyThatHasNoTextAnswers4300AndAsksNobody) {
  for (const char *value : {"[]", R"({"a":1})"}) {
    Json::Value parameters(Json::objectValue);
    parameters["mac_filter_policy"] = Parse(value);
    EXPECT_EQ(SetAnswer(parameters), "SetError(4300, null)") << value;
  }
  EXPECT_THAT(CallsOf("WifiClient"), IsEmpty());
}

TEST_F(MacFilterTest, Set_EntriesThatAreNoObjectsHaveNullMembers) {
  Get().adapters = Parse(R"(["wlan2"])");
  EXPECT_EQ(SetAnswer(Parameters("deny", R"([1,"a",null,["b"]])")), "SetSuccess(null)");
  const std::string null = R"({"desc":null,"mac":null,"mac_filter_enabled":null})";
  EXPECT_THAT(CallsOf("ApplyAdapter"), ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[)" + null + "," + null +
                                                   "," + null + "," + null + R"(],"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_TwoThousandEntriesArePassedOnWhole) {
  Get().adapters = Parse(R"(["wlan2"])");
  std::string list = "[";
  for (int i = 0; i < 2000; ++i) {
    list += R"({"desc":"line\nend <b>","mac":"x","mac_filter_enabled":true})";
    list += i < 1999 ? "," : "]";
  }
  EXPECT_EQ(SetAnswer(Parameters("deny", list.c_str())), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"),
              ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":)" + list + R"(,"mac_filter_policy":"deny"}))"));
}

TEST_F(MacFilterTest, Set_CommentsInTheListAreNotKept) {
  Get().adapters = Parse(R"(["wlan2"])");
  EXPECT_EQ(SetAnswer(Parameters("deny", "[ // one\n {\"mac\":\"a\"} /* two */ ]")), "SetSuccess(null)");
  EXPECT_THAT(CallsOf("ApplyAdapter"), ElementsAre(R"(ApplyAdapter(wlan2, {"mac_filter_list":[{"desc":null,)"
                                                   R"("mac":"a","mac_filter_enabled":null}],)"
                                                   R"("mac_filter_policy":"deny"}))"));
}

} // namespace
