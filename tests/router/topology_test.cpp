// The Topology rows over the scripted platform.
#include "router/mervane_base.h"
#include "router/topology.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

using scripted::Exchange;
using scripted::Get;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

Json::Value Target(const Json::Value &topology) {
  Json::Value parameters(Json::objectValue);
  parameters["net_topology"] = topology;
  return parameters;
}

Json::Value RedirectOf(const char *address) {
  Json::Value redirect;
  redirect["redirect"] = true;
  redirect["secure"] = true;
  redirect["port"] = "443";
  redirect["auth_key"] = "k";
  redirect["ip_list"].append(address);
  return redirect;
}

constexpr char kFixedDescription[] =
    R"(SetSuccess({"auth_key":"","ip_list":[],"port":"","redirect":false,"secure":false}))";
constexpr char kDescription[] =
    R"(SetSuccess({"auth_key":"k","ip_list":["203.0.113.7"],"port":"443","redirect":true,"secure":true}))";

class TopologyTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().redirect = RedirectOf("203.0.113.7");
  }
};

TEST_F(TopologyTest, GetVersion1_AnswersFourKeys) {
  Exchange exchange;
  exchange.Run(GetTopology_V1);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"has_wifi_dongle":false,"net_topology":"router",)"
                               R"("support_net_topology":true,"switching":false}))");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
  EXPECT_THAT(Get().calls, ElementsAre("GetTopologyString()", "QARDCFileExist(/tmp/topology.lock)",
                                       "IsSupportTopology()", "HasWifiDongle()", exchange.Answer()));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(TopologyTest, GetVersion2_AddsModeAndForbidden) {
  Get().topology = "bridge";
  Get().hasDongle = true;
  Get().supportsTopology = false;
  Get().supportedMode = "router,bridge,client";
  Get().existingFiles = {"/tmp/topology.lock"};
  Exchange exchange;
  exchange.Run(GetTopology_V2);
  EXPECT_EQ(exchange.Answer(),
            R"(SetSuccess({"bridge_mode_forbidden":false,"has_wifi_dongle":true,"net_topology":"bridge",)"
            R"("support_net_topology":false,"supported_mode":"router,bridge,client","switching":true}))");
  EXPECT_THAT(Get().calls,
              ElementsAre("GetTopologyString()", "QARDCFileExist(/tmp/topology.lock)", "IsSupportTopology()",
                          "HasWifiDongle()", "GetSupportedMode()",
                          "QARDCFileCheckKeyValue(/etc/sysconfig/network-scripts/ifcfg-eth0, SLAVE, yes, 0)",
                          exchange.Answer()));
}

TEST_F(TopologyTest, GetVersion2_EnslavedPortForbidsBridgeMode) {
  Get().checkKeyValueResult = 1;
  Exchange exchange;
  exchange.Run(GetTopology_V2);
  EXPECT_THAT(exchange.Answer(), HasSubstr(R"("bridge_mode_forbidden":true)"));
}

TEST_F(TopologyTest, GetVersion2_UnreadableConfigurationForbidsBridgeModeToo) {
  Get().checkKeyValueResult = -1;
  Exchange exchange;
  exchange.Run(GetTopology_V2);
  EXPECT_THAT(exchange.Answer(), HasSubstr(R"("bridge_mode_forbidden":true)"));
}

TEST_F(TopologyTest, Get_UnreadableTopologyAnswers4300WithNull) {
  Get().topologyResult = -1;
  for (const auto handler : {GetTopology_V1, GetTopology_V2}) {
    Get().calls.clear();
    Get().log.clear();
    Exchange exchange;
    exchange.Run(handler);
    EXPECT_THAT(Get().calls, ElementsAre("GetTopologyString()", "SetError(4300, null)"));
    EXPECT_THAT(Get().log, ElementsAre("topology: Failed to get Topology String"));
  }
}

TEST_F(TopologyTest, GetVersion2_UnreadableModeAnswers4300WithNullAndVersion1DoesNotAsk) {
  Get().supportedModeResult = -1;
  Exchange two;
  two.Run(GetTopology_V2);
  EXPECT_EQ(two.Answer(), "SetError(4300, null)");
  EXPECT_EQ(two.AnswerCount(), 1U);
  EXPECT_THAT(Get().log, ElementsAre("topology: Failed to get supported mode"));
  EXPECT_THAT(Get().calls, Not(Contains(HasSubstr("QARDCFileCheckKeyValue"))));
  Get().log.clear();
  Exchange one;
  one.Run(GetTopology_V1);
  EXPECT_THAT(one.Answer(), HasSubstr("SetSuccess("));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(TopologyTest, GetTopology_FailedModeQueryLeavesTheFourKeysInTheResult) {
  Get().supportedModeResult = -1;
  Json::Value result;
  EXPECT_FALSE(Topology().GetTopology(result, 2));
  EXPECT_THAT(result.getMemberNames(),
              ElementsAre("has_wifi_dongle", "net_topology", "support_net_topology", "switching"));
}

TEST_F(TopologyTest, GetTopology_VersionZeroIsAnsweredAsVersion1) {
  Json::Value result;
  EXPECT_TRUE(Topology().GetTopology(result, 0));
  EXPECT_EQ(result.size(), 4U);
}

TEST_F(TopologyTest, Set_MissingParameterAnswers4302EvenWhileSwitching) {
  Get().existingFiles = {"/tmp/topology.lock"};
  Exchange exchange;
  exchange.Run(SetTopology);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(net_topology)", "SetError(4302, null)"));
}

TEST_F(TopologyTest, Set_WhileSwitchingAnswers4340BeforeTheParameterIsRead) {
  Get().existingFiles = {"/tmp/topology.lock"};
  Exchange exchange(Target("bridge"));
  exchange.Run(SetTopology);
  EXPECT_THAT(Get().calls,
              ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)", "SetError(4340, null)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(TopologyTest, Set_ParameterThatIsNoTextAnswers4302) {
  Json::Value object;
  object["a"] = "router";
  Json::Value array;
  array.append("router");
  for (const Json::Value &wrong : {object, array, Json::Value(), Json::Value(5), Json::Value(true), Json::Value(1.5)}) {
    Get().calls.clear();
    Exchange exchange(Target(wrong));
    exchange.Run(SetTopology);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)",
                                         "GetParam(net_topology, null)", "SetError(4302, null)"));
  }
}

TEST_F(TopologyTest, Set_UnreadableTopologyAnswers4300AndSwitchesNothing) {
  Get().topologyResult = -1;
  Exchange exchange(Target("bridge"));
  exchange.Run(SetTopology);
  exchange.RunCallbacks();
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)",
                                       "GetParam(net_topology, null)", "SetAPIRequest(request)", "GetTopologyString()",
                                       "SetError(4300, null)"));
  EXPECT_THAT(Get().log, ElementsAre("topology: Failed to get Topology String"));
}

TEST_F(TopologyTest, Set_RouterToClientAndBackAnswersTheFixedDescription) {
  for (const auto &[current, target] : {std::pair("router", "client"), std::pair("client", "router")}) {
    Get().calls.clear();
    Get().topology = current;
    Exchange exchange(Target(target));
    exchange.Run(SetTopology);
    EXPECT_THAT(Get().calls, ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)",
                                         "GetParam(net_topology, null)", "SetAPIRequest(request)",
                                         "GetTopologyString()", "SetCallbackFunc()", kFixedDescription));
  }
}

TEST_F(TopologyTest, Set_OtherwiseAnswersTheDescriptionOfEth0) {
  for (const auto &[current, target] :
       {std::pair("router", "bridge"), std::pair("router", "router"), std::pair("client", "bridge"),
        std::pair("client", "client"), std::pair("router", "no such topology"), std::pair("router", "")}) {
    Get().calls.clear();
    Get().topology = current;
    Exchange exchange(Target(target));
    exchange.Run(SetTopology);
    EXPECT_THAT(Get().calls,
                ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)",
                            "GetParam(net_topology, null)", "SetAPIRequest(request)", "GetTopologyString()",
                            "EthernetInterface(eth0)", "EthernetInterface::LoadData(eth0)", "GetRedirectNetInfo(eth0)",
                            "~EthernetInterface(eth0)", "SetCallbackFunc()", kDescription));
  }
}

TEST_F(TopologyTest, Set_FromBridgeToAnythingAnswersTheDescriptionOfBr0) {
  for (const char *target : {"router", "client", "bridge"}) {
    Get().calls.clear();
    Get().topology = "bridge";
    Exchange exchange(Target(target));
    exchange.Run(SetTopology);
    EXPECT_THAT(Get().calls,
                ElementsAre("HasParam(net_topology)", "QARDCFileExist(/tmp/topology.lock)",
                            "GetParam(net_topology, null)", "SetAPIRequest(request)", "GetTopologyString()",
                            "EthernetInterface(br0)", "BridgeInterface(br0)", "BridgeInterface::LoadData(br0)",
                            "GetRedirectNetInfo(br0)", "~BridgeInterface(br0)", "~EthernetInterface(br0)",
                            "SetCallbackFunc()", kDescription));
  }
}

TEST_F(TopologyTest, Set_InterfaceThatCannotBeLoadedIsLoggedAndAnsweredWithSuccess) {
  Get().loadDataResult = -1;
  Exchange fromRouter(Target("bridge"));
  fromRouter.Run(SetTopology);
  EXPECT_EQ(fromRouter.Answer(), kDescription);
  EXPECT_THAT(Get().log, ElementsAre("topology: Failed to LoadData() for [eth0]"));
  Get().topology = "bridge";
  Exchange fromBridge(Target("router"));
  fromBridge.Run(SetTopology);
  EXPECT_EQ(fromBridge.Answer(), kDescription);
  EXPECT_EQ(Get().log.back(), "topology: Failed to LoadData() for [br0]");
}

TEST_F(TopologyTest, Set_SwitchesAfterTheAnswerWithTheTextAsItWas) {
  const std::string odd("no \"such\" topology;\0id\n", 23);
  Exchange exchange(Target(odd));
  exchange.Run(SetTopology);
  EXPECT_THAT(Get().calls, Not(Contains(HasSubstr("WifiClient"))));
  Get().calls.clear();
  exchange.RunCallbacks();
  EXPECT_THAT(Get().calls,
              ElementsAre("WifiClient()", "IsServerReady()", "SwitchTopology(" + odd + ")", "~WifiClient()"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(TopologyTest, Callback_DaemonNotReadyIsLoggedAndAsksForNothing) {
  Get().serverReady = false;
  Topology::APICallback(new std::string("bridge"));
  EXPECT_THAT(Get().calls, ElementsAre("WifiClient()", "IsServerReady()", "~WifiClient()"));
  EXPECT_THAT(Get().log, ElementsAre("topology: The vornwifid is not ready"));
}

TEST_F(TopologyTest, Callback_RefusedSwitchIsOnlyLogged) {
  Get().switchResult = -1;
  Topology::APICallback(new std::string("bridge"));
  EXPECT_THAT(Get().log, ElementsAre("topology: Failed to SwitchTopology"));
}

TEST_F(TopologyTest, Callback_NullIsLoggedAndNothingElse) {
  Topology::APICallback(nullptr);
  EXPECT_THAT(Get().calls, IsEmpty());
  EXPECT_THAT(Get().log, ElementsAre("topology: passed object is null"));
}

} // namespace
