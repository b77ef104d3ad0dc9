#include "router/gatewaylist.h"

#include "platform/netclient.h"
#include "platform/network.h"
#include "platform/utility.h"
#include "router/log.h"
#include "router/parameters.h"

using vornnetwork::dbus::NetClient;

namespace {

constexpr char kUnit[] = "gatewaylist";

struct Family {
  const char *name;
  const char *type; // of the daemon's gateway records
  const char *file; // says the first interface of the order
};

constexpr Family kFamilies[] = {
    {"ipv4", "GTYPE_V4", "/etc/iproute2/config/default-gateway"},
    {"ipv6", "GTYPE_V6", "/etc/iproute2/config/default-gateway-v6"},
};
constexpr Family kUnknownFamily = {"", "", ""};

const Family &FindFamily(const std::string &name) {
  for (const Family &family : kFamilies) {
    if (name == family.name) {
      return family;
    }
  }
  return kUnknownFamily;
}

Json::Value MakeRecord(const Family &family, Json::ArrayIndex position, const Json::Value &name) {
  Json::Value record(Json::objectValue);
  record["type"] = family.type;
  record["priority"] = position;
  record["ifname"] = name;
  record["gateway"] = "NULL";
  record["dns"] = "NULL";
  return record;
}

} // namespace

GatewayList::GatewayList() = default;

GatewayList::~GatewayList() = default;

bool GatewayList::Get(const std::string &family, const std::string &filter, Json::Value &result) {
  result["configs"] = Json::Value(Json::arrayValue);
  Json::Value request;
  const Family &known = FindFamily(family);
  if (&known != &kUnknownFamily) {
    request["type"] = known.type;
  }
  NetClient client;
  Json::Value list(Json::arrayValue);
  if (client.GetGatewayListData(request, list) < 0) {
    ROUTER_LOG("%s:%d Failed to get gateway list");
    return false;
  }
  vornnetwork::network::FilterList(filter, list); // one that it does not know leaves the list as it is: no failure
  result["configs"] = list;
  return true;
}

bool GatewayList::Set(const std::string &family, const Json::Value &names) {
  const Family &known = FindFamily(family);
  NetClient client;
  const Json::ArrayIndex count = names.isArray() ? names.size() : 0;
  for (Json::ArrayIndex i = 0; i < count; ++i) {
    if (client.AddGatewayData(MakeRecord(known, i, names[i])) < 0) {
      // The name is looked up as a member of the list, which a list does not have; clients know the message so.
      ROUTER_LOG("%s:%d Failed to add gateway info for [%s]", "");
      return false;
    }
    if (i == 0) {
      const std::string first = router::ConvertToText(names[i]).value_or("");
      QARDCFileSetKeyValue(known.file, "DEVICE", first.c_str(), "%s=%s\n");
    }
  }
  Json::Value request;
  request["type"] = known.type;
  if (client.RefreshGateway(request) < 0) {
    ROUTER_LOG("%s:%d Failed to refresh default gateway");
    return false;
  }
  return true;
}
