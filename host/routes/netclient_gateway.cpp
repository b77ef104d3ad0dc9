// The gateway records of the contract.
#include "host/export.h"

namespace vornnetwork::dbus {
class VORN_EXPORT NetClient;
}

#include "platform/netclient.h"

#include "host/routes/answer.h"
#include "host/routes/gateways.h"
#include "host/routes/route_rule.h"
#include "host/routes/rule_store.h"
#include "host/utility/log.h"

#include <sys/socket.h>

namespace vornnetwork::dbus {

namespace {

using vornhost::Gateways;
using vornhost::LogError;
using vornhost::LogText;
using vornhost::Netlink;

struct Family {
  const char *type;
  int number;
};

constexpr Family kFamilies[] = {{"GTYPE_V4", AF_INET}, {"GTYPE_V6", AF_INET6}};

// @return null for an unknown type
const Family *FamilyOf(const Json::Value &request) {
  for (const Family &family : kFamilies) {
    if (request.isObject() && request["type"] == Json::Value(family.type)) {
      return &family;
    }
  }
  return nullptr;
}

void AppendRecords(Netlink &netlink, const Family &family, Json::Value &list) {
  Json::UInt priority = 0;
  for (const vornhost::Gateway &gateway : Gateways(netlink, family.number).List()) {
    Json::Value &record = list.append(Json::Value(Json::objectValue));
    record["type"] = family.type;
    record["priority"] = priority++;
    record["ifname"] = gateway.ifname;
    record["gateway"] = gateway.address;
    record["dns"] = gateway.dns;
    record["state"] = gateway.state;
    record["active"] = gateway.active;
  }
}

// Gateways and name servers come from an interface's own configuration, which "NULL" stands for, and from nowhere else.
bool IsRecord(const Json::Value &record) {
  return FamilyOf(record) != nullptr && record["ifname"].isString() &&
         vornhost::IsRoutableName(record["ifname"].asString()) && record["priority"].isUInt() &&
         record["gateway"] == Json::Value("NULL") && record["dns"] == Json::Value("NULL");
}

} // namespace

NetClient::NetClient() = default;

NetClient::~NetClient() = default;

int NetClient::GetGatewayListData(const Json::Value &request, Json::Value &list) {
  return vornhost::AnswerFor("gateways cannot be listed", [&] {
    const Family *asked = FamilyOf(request);
    if (asked == nullptr && !request.isNull()) {
      return false;
    }
    Json::Value records(Json::arrayValue);
    Netlink netlink;
    for (const Family &family : kFamilies) {
      if (asked == nullptr || asked == &family) {
        AppendRecords(netlink, family, records);
      }
    }
    list = records;
    return true;
  });
}

int NetClient::AddGatewayData(const Json::Value &record) {
  return vornhost::AnswerFor("a gateway cannot be stored", [&] {
    if (!IsRecord(record)) {
      LogError("gateway refused: no type, interface name or priority of the network's");
      return false;
    }
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn();
    Netlink netlink;
    const std::string name = record["ifname"].asString();
    if (!Gateways(netlink, FamilyOf(record)->number).Place(name, record["priority"].asUInt())) {
      LogError("gateway %s refused: named twice, or its place %u is behind the end", LogText(name).c_str(),
               record["priority"].asUInt());
      return false;
    }
    return true;
  });
}

int NetClient::RefreshGateway(const Json::Value &request) {
  return vornhost::AnswerFor("default gateway cannot be refreshed", [&] {
    const Family *family = FamilyOf(request);
    if (family == nullptr) {
      return false;
    }
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn();
    Netlink netlink;
    Gateways(netlink, family->number).Refresh();
    return true;
  });
}

} // namespace vornnetwork::dbus
