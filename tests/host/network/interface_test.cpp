// Interface objects, with a request whose answers the test sets.
#include "platform/interface.h"
#include "platform/webapi.h"
#include "tests/host/network/shell.h"

#include <gtest/gtest.h>
#include <json/reader.h>

#include <memory>
#include <sstream>
#include <thread>

// In the framework's place.
struct VORN::APIRequest::State {
  bool secure;
  int port;
};
bool VORN::APIRequest::IsSecure() const {
  return state_->secure;
}
int VORN::APIRequest::GetServerPort() const {
  return state_->port;
}

namespace {

using hosttest::RemoveLinks;
using hosttest::Shell;
using vorn::network::BridgeInterface;
using vorn::network::EthernetInterface;
using vorn::network::NetworkHandler;

Json::Value Parse(const std::string &text) {
  Json::Value out;
  std::istringstream(text) >> out;
  return out;
}

class Interface : public testing::Test {
protected:
  void SetUp() override {
    RemoveLinks();
    Shell("ip link add eth0 type veth peer name w0 && ip link set eth0 up && ip link set w0 up");
  }
  void TearDown() override {
    NetworkHandler::SetAPIRequest(nullptr);
    RemoveLinks();
  }
};

Json::Value Redirect(EthernetInterface &interface) {
  Json::Value result("from before");
  EXPECT_EQ(interface.GetRedirectNetInfo(result), 0);
  return result;
}

TEST_F(Interface, RedirectNamesAddressesIpv4First) {
  Shell("ip address add 2001:db8::5/64 dev eth0 nodad && ip address add 203.0.113.5/24 dev eth0 &&"
        "ip address add fe80::7/64 dev eth0 nodad");
  const VORN::APIRequest::State state{true, 8443};
  VORN::APIRequest request(state);
  NetworkHandler::SetAPIRequest(&request);
  EthernetInterface eth0("eth0");
  ASSERT_EQ(eth0.LoadData(), 0);
  EXPECT_EQ(Redirect(eth0), Parse(R"({"redirect": true, "secure": true, "port": "8443", "auth_key": "",
                                      "ip_list": ["203.0.113.5", "2001:db8::5"]})"));
}

TEST_F(Interface, RequestIsForgottenOnceUsed) {
  const VORN::APIRequest::State state{true, 8443};
  VORN::APIRequest request(state);
  NetworkHandler::SetAPIRequest(&request);
  EthernetInterface eth0("eth0");
  EXPECT_EQ(Redirect(eth0)["port"], "8443");
  EXPECT_EQ(Redirect(eth0),
            Parse(R"({"redirect": false, "secure": false, "port": "", "auth_key": "", "ip_list": []})"));
}

TEST_F(Interface, RequestBelongsToItsThread) {
  const VORN::APIRequest::State state{true, 8443};
  VORN::APIRequest request(state);
  NetworkHandler::SetAPIRequest(&request);
  std::thread([] {
    EthernetInterface eth0("eth0");
    EXPECT_EQ(Redirect(eth0)["port"], "");
  }).join();
  EthernetInterface eth0("eth0");
  EXPECT_EQ(Redirect(eth0)["port"], "8443");
}

TEST_F(Interface, RequestWithoutPortHasAnEmptyOne) {
  const VORN::APIRequest::State state{false, 0};
  VORN::APIRequest request(state);
  NetworkHandler::SetAPIRequest(&request);
  EthernetInterface eth0("eth0");
  EXPECT_EQ(Redirect(eth0)["port"], "");
}

TEST_F(Interface, LinkLocalAddressIsNoWayToIt) {
  Shell("ip address add fe80::7/64 dev eth0 nodad");
  EthernetInterface eth0("eth0");
  ASSERT_EQ(eth0.LoadData(), 0);
  EXPECT_EQ(Redirect(eth0)["redirect"], false);
}

TEST_F(Interface, MissingInterfaceHasNoAddresses) {
  Shell("ip address add 203.0.113.5/24 dev eth0");
  EthernetInterface eth0("eth0");
  ASSERT_EQ(eth0.LoadData(), 0);
  RemoveLinks();
  EXPECT_LT(eth0.LoadData(), 0);
  EXPECT_EQ(Redirect(eth0)["ip_list"], Json::Value(Json::arrayValue));
  EXPECT_EQ(Redirect(eth0)["redirect"], false);
}

TEST_F(Interface, BridgeIsLoadedThroughItsBase) {
  Shell("ip link add br0 type bridge && ip address add 203.0.113.9/24 dev br0");
  const std::unique_ptr<EthernetInterface> br0 = std::make_unique<BridgeInterface>("br0");
  ASSERT_EQ(br0->LoadData(), 0);
  EXPECT_EQ(Redirect(*br0)["ip_list"], Parse(R"(["203.0.113.9"])"));
}

TEST_F(Interface, BridgeThatIsNoneFailsAndHasNoAddresses) {
  Shell("ip address add 203.0.113.5/24 dev eth0");
  BridgeInterface eth0("eth0");
  EXPECT_LT(eth0.LoadData(), 0);
  EXPECT_EQ(Redirect(eth0)["ip_list"], Json::Value(Json::arrayValue));
  BridgeInterface nothing("nosuch");
  EXPECT_LT(nothing.LoadData(), 0);
}

} // namespace
