#include "router/connectionlist.h"

#include "platform/netif.h"
#include "platform/utility.h"
#include "platform/wifi.h"
#include "router/log.h"
#include "router/namecache.h"
#include "router/neighbours.h"
#include "router/parameters.h"
#include "router/station.h"

#include <regex.h>

#include <array>
#include <cstdio>
#include <cstring>
#include <memory_resource>
#include <optional>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

using router::MemberOf;
using router::MemberText;
using router::ViewOf;
using vornwireless::dbus::WifiClient;
namespace station = router::station;

namespace {

constexpr char kUnit[] = "connectionlist";
constexpr char kGroup[] = "admin";
constexpr char kPrefix[] = "connectionlist";
constexpr int kErrorNoId = 114;
constexpr int kErrorPolling = 117;
constexpr char kMacPattern[] = "^([0-9a-fA-F][0-9a-fA-F]:){5}([0-9a-fA-F][0-9a-fA-F])$";
constexpr size_t kBufferSize = 1024;

// A compiled POSIX extended regular expression.
class Expression {
public:
  explicit Expression(const char *pattern) : compiled_(regcomp(&expression_, pattern, REG_EXTENDED) == 0) {}
  ~Expression() {
    if (compiled_) {
      regfree(&expression_);
    }
  }
  Expression(const Expression &) = delete;
  Expression &operator=(const Expression &) = delete;

  bool Matches(const char *text) const {
    regmatch_t match{};
    return compiled_ && regexec(&expression_, text, 1, &match, 0) == 0;
  }

private:
  regex_t expression_{};
  bool compiled_;
};

// What is no object counts as one without members, and becomes one when a member is set.
Json::Value &AsObject(Json::Value &value) {
  if (!value.isObject()) {
    value = Json::Value(Json::objectValue);
  }
  return value;
}

bool IsOn(const Json::Value &config, const char *key) {
  return router::ConvertToBool(MemberOf(config, key)).value_or(false);
}

// One kind of network of every adapter. An adapter that fails costs its own stations only.
void AppendStations(WifiClient &client, const Json::Value &adapters, const char *enabledKey, const char *networkPrefix,
                    Json::Value &stations) {
  for (const Json::Value &adapter : adapters) {
    const std::string name = router::ConvertToText(adapter).value_or("");
    Json::Value config;
    if (client.GetAdapterConfig(name, config) < 0) {
      ROUTER_LOG("%s:%d Failed to get [%s] config", name.c_str());
      continue;
    }
    if (!IsOn(config, enabledKey)) {
      continue;
    }
    Json::Value list;
    if (client.GetConnectionList(networkPrefix + name, list) < 0) {
      ROUTER_LOG("%s:%d Failed to get connection list for [%s]", name.c_str());
      continue;
    }
    if (!list.isArray()) {
      continue;
    }
    for (Json::Value &found : list) {
      AsObject(found)[station::kConnection] = station::kWifi;
      stations.append(std::move(found));
    }
  }
}

Json::Value MakeWiredRecord(const router::Neighbour &neighbour) {
  const auto text = [](std::string_view view) { return Json::Value(view.data(), view.data() + view.size()); };
  Json::Value record(Json::objectValue);
  record[station::kIp] = text(neighbour.ip);
  record[station::kMac] = text(neighbour.mac);
  record[station::kNetif] = text(neighbour.netif);
  record[station::kHostname] = station::kNone;
  record[station::kConnection] = station::kEthernet;
  return record;
}

// @return false, and the reason in the log, when the table cannot be opened
template <class Visit> bool VisitNeighbours(const Visit &visit) {
  if (!router::VisitNeighbours(visit)) {
    ROUTER_LOG("%s:%d failed to open file (%s)", router::kNeighbourFile);
    return false;
  }
  return true;
}

// @return the bridge of the LAN in the present topology; null, and the reason in the log, when it has none
const char *FindLanBridge() {
  std::string topology;
  if (vornwireless::wifi::utils::GetTopologyString(topology) < 0) {
    ROUTER_LOG("%s:%d failed to get topology, skip update arptable");
    return nullptr;
  }
  if (topology == "bridge") {
    return "br0";
  }
  if (topology == "router") {
    return "lbr0";
  }
  ROUTER_LOG("%s:%d topology (%s) is not AP mode, should not call connection list", topology.c_str());
  return nullptr;
}

bool IsNoName(const std::string &name) {
  return name.empty() || name == "?";
}

// The first record of each MAC address, which is the one that a search from the start would find. Only texts are in it:
// what a number reads as is no MAC address. It looks into the records, which may change but for their "mac".
class MacIndex {
public:
  /// @param[in] expected  how many more may be added
  MacIndex(Json::Value &stations, size_t expected) {
    byMac_.reserve(stations.size() + expected);
    for (Json::Value &record : stations) {
      Add(record);
    }
  }
  void Add(Json::Value &record) {
    if (const auto mac = ViewOf(MemberOf(record, station::kMac))) {
      byMac_.try_emplace(*mac, &record);
    }
  }
  /// @return the record of that address; null, to be set, when there is none. `mac` belongs to the record that will be.
  Json::Value *&At(std::string_view mac) { return byMac_[mac]; }

private:
  std::pmr::monotonic_buffer_resource memory_; // one piece after the other: a long table's index stays together
  std::pmr::unordered_map<std::string_view, Json::Value *> byMac_{&memory_};
};

// @return the MAC address of a record that has one of the right form, and an address; nothing otherwise
std::optional<std::string_view> UsableMac(const Json::Value &record, const Expression &macPattern) {
  const auto mac = ViewOf(MemberOf(record, station::kMac));
  if (!mac || !record.isMember(station::kIp.c_str())) {
    return std::nullopt;
  }
  const bool whole = mac->find('\0') == std::string_view::npos; // a NUL stands behind the view's end
  return whole && macPattern.Matches(mac->data()) ? mac : std::nullopt;
}

// As ConvertToText, but a text is moved.
Json::Value TakeText(Json::Value &value) {
  return value.isString() ? Json::Value(std::move(value)) : Json::Value(router::ConvertToText(value).value_or(""));
}

Json::Value &StationsOf(Json::Value &result) {
  return AsObject(result)[station::kStations];
}

// The name that the first record of each address has.
std::unordered_map<std::string, const Json::Value *> IndexByIp(const Json::Value &stations) {
  std::unordered_map<std::string, const Json::Value *> byIp;
  byIp.reserve(stations.size());
  for (const Json::Value &record : stations) {
    byIp.try_emplace(MemberText(record, station::kIp), &MemberOf(record, station::kHostname));
  }
  return byIp;
}

} // namespace

ConnectionList::ConnectionList() = default;

ConnectionList::~ConnectionList() = default;

void ConnectionList::GetList(VORN::APIRequest *request, VORN::APIResponse *response) {
  std::string id;
  if (GetPollId(request, response, id) != 0) {
    PollStart(request, response);
  } else {
    PollStatus(request, response, id);
  }
}

int ConnectionList::GetPollId(VORN::APIRequest *request, VORN::APIResponse *response, std::string &id) {
  VORN::APIPolling polling(request);
  Json::Value groups(Json::arrayValue);
  groups.append(kGroup);
  Json::Value tasks;
  if (!polling.List(kPrefix, groups, tasks)) {
    response->SetError(kErrorPolling, Json::Value()); // what PollStart answers takes its place
    return -1;
  }
  for (const Json::Value &group : std::as_const(tasks)) {
    if (!group.isArray()) {
      continue;
    }
    for (const Json::Value &task : group) {
      if (task.isString()) {
        id = task.asString();
        return 0;
      }
    }
  }
  return -1;
}

void ConnectionList::PollStart(VORN::APIRequest *request, VORN::APIResponse *response) {
  VORN::APIPolling polling;
  polling.SetRequest(request);
  polling.SetGroupAttr(kGroup);
  polling.SetRemoveAttr(false);
  polling.SetPrefixAttr(kPrefix);
  polling.Start(response, WrapperFunc, this);
}

void ConnectionList::PollStatus(VORN::APIRequest *request, VORN::APIResponse *response, const std::string &id) {
  VORN::APIPolling polling(request);
  if (id.empty()) {
    response->SetError(kErrorNoId, Json::Value());
    return;
  }
  Json::Value data;
  if (!polling.Status(id, data)) {
    response->SetError(kErrorPolling, polling.GetError());
    return;
  }
  if (IsOn(data, "finish")) {
    polling.Stop(id, true);
  }
  response->SetSuccess(data);
}

// The object that started the task went with its request. As it has no state, another one is the same.
void ConnectionList::WrapperFunc(VORN::APIRequest *request, VORN::APIResponse *response, void *) {
  ConnectionList().DoPollingTask(request, response);
}

void ConnectionList::DoPollingTask(VORN::APIRequest *, VORN::APIResponse *response) {
  Json::Value result(Json::objectValue);
  Json::Value &stations = result[station::kStations] = Json::Value(Json::arrayValue);
  if (!LoadWirelessConnData(stations)) {
    ROUTER_LOG("%s:%d failed to get connection list from hostapd");
    return;
  }
  Json::Value arpStations(Json::arrayValue);
  if (!LoadArpConnData(arpStations)) {
    ROUTER_LOG("%s:%d failed to get connection list from arp");
    return;
  }
  if (!CombineJsonData(stations, arpStations)) {
    ROUTER_LOG("%s:%d failed when combine data with arp conn list");
    return;
  }
  response->SetSuccess(result);
  ApplyOldHostName(result);
  response->SetSuccess(result);
  UpdateHostName(result, response);
  if (!UpdateArpTable()) {
    ROUTER_LOG("%s:%d cannot update arp table, skip");
  }
}

bool ConnectionList::LoadWirelessConnData(Json::Value &stations) {
  WifiClient client;
  Json::Value adapters;
  if (!client.IsServerReady()) {
    return true;
  }
  if (client.GetAdapterList(adapters) < 0) {
    ROUTER_LOG("%s:%d Failed to get wireless interface list");
    return false;
  }
  AppendStations(client, adapters, "enabled", "", stations);
  AppendStations(client, adapters, "guest_enabled", "g", stations);
  if (!AssignDetailInfo(stations)) {
    ROUTER_LOG("%s:%d failed to assign detail info");
    return false;
  }
  return true;
}

bool ConnectionList::AssignDetailInfo(Json::Value &stations) {
  if (stations.empty()) {
    return true;
  }
  if (!stations.isArray()) {
    ROUTER_LOG("%s:%d input json args should both be array");
    return false;
  }
  for (Json::Value &record : stations) {
    AsObject(record)[station::kStatus] = true;
    record[station::kType] = station::kOthers;
    record[station::kBrand] = station::kNone;
    record[station::kModel] = station::kNone;
  }
  return true;
}

bool ConnectionList::LoadArpConnData(Json::Value &stations) {
  return VisitNeighbours([this, &stations](const router::Neighbour &neighbour) {
    Json::Value record = MakeWiredRecord(neighbour);
    if (CheckArpObject(record)) {
      stations.append(std::move(record));
    }
  });
}

bool ConnectionList::CheckArpObject(const Json::Value &record) {
  const std::string ip = MemberText(record, station::kIp);
  const std::string mac = MemberText(record, station::kMac);
  const std::string netif = MemberText(record, station::kNetif);
  if (ip.empty() || mac.empty() || netif.empty()) {
    return false;
  }
  if (!router::IsWhole(ip) || !router::IsWhole(netif)) {
    return false;
  }
  VORNNetIFInfo info{};
  return VORNNetIFGetInfo(netif.c_str(), 0, &info) >= 1 && VORNNetIsSameSubnet(ip.c_str(), info.ip, info.mask) == 1;
}

bool ConnectionList::UpdateArpTable() {
  std::vector<std::string> addresses;
  if (!VisitNeighbours([&addresses](const router::Neighbour &neighbour) { addresses.emplace_back(neighbour.ip); })) {
    return false;
  }
  const char *bridge = FindLanBridge();
  if (bridge == nullptr) {
    return false;
  }
  const std::string interfaceArgument = std::string("-I") + bridge;
  for (const std::string &address : addresses) {
    if (QARDCExec("/sbin/arp", "-d", address.c_str(), nullptr, nullptr) < 0) {
      ROUTER_LOG("%s:%d failed to delete arp (%s)", address.c_str());
    }
    if (QARDCExec("/usr/bin/arping", address.c_str(), interfaceArgument.c_str(), "-w1", "-f") < 0) {
      ROUTER_LOG("%s:%d failed to ping (%s)", address.c_str());
    }
  }
  return true;
}

bool ConnectionList::RegMatch(const char *text, const char *pattern) {
  return Expression(pattern).Matches(text);
}

bool ConnectionList::CombineJsonData(Json::Value &stations, Json::Value &arpStations) {
  if (arpStations.empty()) {
    return true;
  }
  if (!stations.isArray() || !arpStations.isArray()) {
    ROUTER_LOG("%s:%d input json args should both be array");
    return false;
  }
  const Expression macPattern(kMacPattern);
  MacIndex byMac(stations, arpStations.size());
  for (Json::Value &wired : arpStations) {
    const auto mac = UsableMac(wired, macPattern);
    if (!mac) {
      continue;
    }
    Json::Value *&known = byMac.At(*mac);
    if (known == nullptr) {
      known = &stations.append(std::move(wired)); // its texts stay where they are
    } else if (MemberText(wired, station::kNetif).find("br") != std::string::npos) {
      (*known)[station::kIp] = TakeText(wired[station::kIp]);
    }
    wired = Json::Value(); // while it is at hand: freed later, a long table would be fetched from memory once more
  }
  return true;
}

void ConnectionList::ApplyOldHostName(Json::Value &result) {
  Json::Value &stations = StationsOf(result);
  if (stations.empty()) {
    return;
  }
  Json::Value old(Json::objectValue);
  // A file that ends in the middle gives no names at all: its last record may have lost its address.
  if (!router::ReadNameCache(old) || !MemberOf(old, station::kStations).isArray()) {
    return;
  }
  const auto oldNames = IndexByIp(MemberOf(old, station::kStations));
  for (Json::Value &record : stations) {
    if (!IsNoName(MemberText(record, station::kHostname))) {
      continue;
    }
    const auto found = oldNames.find(MemberText(record, station::kIp));
    if (found == oldNames.end()) {
      continue;
    }
    const std::string name = router::ConvertToText(*found->second).value_or("");
    if (!IsNoName(name)) {
      AsObject(record)[station::kHostname] = name;
    }
  }
}

void ConnectionList::UpdateHostName(Json::Value &result, VORN::APIResponse *response) {
  Json::Value &stations = StationsOf(result);
  if (stations.empty()) {
    response->SetSuccess(result);
  }
  for (Json::Value &record : stations) {
    const std::string ip = MemberText(record, station::kIp);
    std::string name;
    if (GetNetBIOSNameByIP(ip, name) != 0) {
      ROUTER_LOG("%s:%d Failed to get net bios name with ip (%s)", ip.c_str());
      continue;
    }
    if (!name.empty()) {
      AsObject(record)[station::kHostname] = name;
    }
    response->SetSuccess(result);
  }
  WriteDataToFile(result);
}

int ConnectionList::GetNetBIOSNameByIP(const std::string &ip, std::string &name) {
  if (!router::IsWhole(ip)) { // the command would end in the address, and ask another host
    return -1;
  }
  std::array<char, kBufferSize> command{};
  std::array<char, kBufferSize> line{};
  std::snprintf(command.data(), command.size(),
                "/usr/bin/nmblookup -A %s \t\t\t| /bin/grep ACTIVE | /bin/grep -v GROUP | /usr/bin/awk {'print $1'} "
                "\t\t\t| /usr/bin/uniq | /usr/bin/xargs",
                ip.c_str());
  std::FILE *pipe = popen(command.data(), "r");
  if (pipe == nullptr) {
    ROUTER_LOG("%s:%d Failed to execute cmd [%s]", command.data());
    return -1;
  }
  if (std::fgets(line.data(), static_cast<int>(line.size()), pipe) != nullptr) {
    const size_t length = std::strlen(line.data());
    if (length > 1) {
      name.assign(line.data(), length - 1);
    }
  }
  pclose(pipe);
  return 0;
}

void ConnectionList::WriteDataToFile(const Json::Value &result) {
  if (!router::WriteNameCache(result)) {
    ROUTER_LOG("%s:%d could not open (%s)", router::kNameCache);
  }
}

void ConnectionList::ReadDataFromFile(Json::Value &result) {
  router::ReadNameCache(result);
}
