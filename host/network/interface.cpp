#include "host/export.h"

namespace vorn::network {
class VORN_EXPORT NetworkHandler;
class VORN_EXPORT EthernetInterface;
class VORN_EXPORT BridgeInterface;
} // namespace vorn::network

#include "platform/interface.h"

#include "host/network/netlink.h"
#include "host/utility/error.h"
#include "platform/webapi.h"

#include <cerrno>

#include <string>
#include <utility>

namespace vorn::network {

namespace {

thread_local VORN::APIRequest *currentRequest = nullptr;

} // namespace

void NetworkHandler::SetAPIRequest(VORN::APIRequest *request) {
  currentRequest = request;
}

namespace {

// Taken once: the request dies with its handler, and whoever uses this thread next must not find it.
VORN::APIRequest *TakeRequest() {
  return std::exchange(currentRequest, nullptr);
}

// IPv4 before IPv6, as the kernel's list is made.
Json::Value ReadAddresses(const std::string &name) {
  Json::Value list(Json::arrayValue);
  vornhost::Netlink netlink;
  const auto link = netlink.FindLink(name);
  if (!link) {
    throw vornhost::NetlinkError(name, ENODEV);
  }
  for (const vornhost::Address &address : netlink.Addresses()) {
    if (address.index == link->index && !address.IsLinkLocal6()) {
      list.append(address.Host());
    }
  }
  return list;
}

bool IsBridge(const std::string &name) {
  const auto link = vornhost::Netlink().FindLink(name);
  return link && link->kind == "bridge";
}

} // namespace

EthernetInterface::EthernetInterface(const std::string &name) : name_(name), addresses_(Json::arrayValue) {}

EthernetInterface::~EthernetInterface() = default;

void EthernetInterface::DropData() {
  addresses_ = Json::Value(Json::arrayValue);
}

int EthernetInterface::LoadData() {
  DropData();
  return vornhost::Guarded(-1, [this] {
    addresses_ = ReadAddresses(name_);
    return 0;
  });
}

int EthernetInterface::GetRedirectNetInfo(Json::Value &result) {
  const VORN::APIRequest *request = TakeRequest();
  const int port = request != nullptr ? request->GetServerPort() : 0;
  result = Json::Value(Json::objectValue);
  result["redirect"] = !addresses_.empty();
  result["secure"] = request != nullptr && request->IsSecure();
  result["port"] = port > 0 ? std::to_string(port) : "";
  result["auth_key"] = "";
  result["ip_list"] = addresses_;
  return 0;
}

BridgeInterface::BridgeInterface(const std::string &name) : EthernetInterface(name) {}

BridgeInterface::~BridgeInterface() = default;

int BridgeInterface::LoadData() {
  DropData();
  const int checked =
      vornhost::Guarded(-1, [this] { return IsBridge(GetName()) ? 0 : vornhost::SetError(QARDC_ERR_NOT_FOUND); });
  return checked == 0 ? EthernetInterface::LoadData() : checked;
}

} // namespace vorn::network
