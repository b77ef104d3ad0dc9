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

#include <optional>
#include <stdexcept>

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
// @return why it is no record; nothing when it is one
std::optional<std::string> FaultOf(const Json::Value &record) {
  if (!record["ifname"].isString() || !vornhost::IsRoutableName(record["ifname"].asString())) {
    return "no interface name";
  }
  if (!record["priority"].isUInt()) {
    return "its priority is no place";
  }
  if (record["gateway"] != Json::Value("NULL") || record["dns"] != Json::Value("NULL")) {
    return "gateway and name server come from the interface's own configuration";
  }
  return std::nullopt;
}

// @return why it was not stored; nothing when it was
std::optional<std::string> Store(Gateways &gateways, const Json::Value &record) {
  if (auto fault = FaultOf(record)) {
    return fault;
  }
  try {
    return gateways.Place(record["ifname"].asString(), record["priority"].asUInt());
  } catch (const std::runtime_error &error) {
    return error.what();
  }
}

} // namespace

NetClient::NetClient() = default;

NetClient::~NetClient() = default;

int NetClient::GetGatewayListData(const Json::Value &request, Json::Value &list) {
  return vornhost::AnswerFor("gateways cannot be listed", [&] {
    const Family *asked = FamilyOf(request);
    if (asked == nullptr && !request.isNull()) {
      LogError("gateways not listed: unknown type");
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

// A refused record ends a new order half-way: what was stored of it stays, and nobody asks for a refresh. The kernel is
// made to follow right here, so that it and the file agree.
int NetClient::AddGatewayData(const Json::Value &record) {
  return vornhost::AnswerFor("a gateway cannot be stored", [&] {
    const Family *family = FamilyOf(record);
    if (family == nullptr) {
      LogError("gateway refused: unknown type");
      return false;
    }
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn();
    Netlink netlink;
    Gateways gateways(netlink, family->number);
    const auto fault = Store(gateways, record);
    if (fault) {
      const std::string name = record["ifname"].isString() ? record["ifname"].asString() : "";
      LogError("gateway \"%s\" refused: %s", LogText(name).c_str(), LogText(*fault).c_str());
      gateways.Refresh();
    }
    return !fault;
  });
}

int NetClient::RefreshGateway(const Json::Value &request) {
  return vornhost::AnswerFor("default gateway cannot be refreshed", [&] {
    const Family *family = FamilyOf(request);
    if (family == nullptr) {
      LogError("default gateway not refreshed: unknown type");
      return false;
    }
    const vornhost::UniqueFd turn = vornhost::TakeRouteTurn();
    Netlink netlink;
    Gateways(netlink, family->number).Refresh();
    return true;
  });
}

} // namespace vornnetwork::dbus
