#include "router/clhandler.h"

#include "platform/netclient.h"
#include "platform/netif.h"
#include "router/log.h"
#include "router/parameters.h"
#include "router/station.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <optional>
#include <string_view>
#include <tuple>
#include <utility>

using vornnetwork::dbus::NetClient;
namespace station = router::station;

namespace {

constexpr char kUnit[] = "clhandler";
constexpr char kTimeFormat[] = "%T %Y/%m/%d";
constexpr double kOnlineSeconds = 60.0;
constexpr int kInterfaceCapacity = 32;

const Json::StaticString kMacAddr("macAddr");
const Json::StaticString kUserName("userdef_displayName");
const Json::StaticString kUserType("userdef_deviceType");
const Json::StaticString kDeviceCount("devicecount");

// A member of an entry that becomes one of the record as it stands, of whatever type.
struct Copied {
  const char *entryKey;
  const Json::StaticString &recordKey;
  Json::Value absent;
};

const std::array<Copied, 7> kCopied = {{
    {"macAddr", station::kMac, station::kNone},
    {"asso_time", station::kAssoTime, station::kNone},
    {"ipAddr", station::kIp, station::kNone},
    {"manufacturer", station::kBrand, station::kNone},
    {"modelName", station::kModel, station::kNone},
    {"connection", station::kConnection, station::kEthernet},
    {"netif", station::kNetif, station::kNone},
}};

// Only of a wireless station that is online.
const std::array<Copied, 3> kCopiedOnline = {{
    {"transferRX", station::kTransferRx, station::kNone},
    {"transferTX", station::kTransferTx, station::kNone},
    {"signalstrength", station::kSignalStrength, 0},
}};

struct DeviceType {
  enum Test { kContains, kEquals } test;
  const char *text;
  const char *type;
};

// In the order of the tests. The capitalised words stand inside the scanners' descriptions, the others are the types
// themselves, as a user chose them.
constexpr DeviceType kDeviceTypes[] = {
    {DeviceType::kContains, "Camera", "ipcam"},    {DeviceType::kEquals, "ipcam", "ipcam"},
    {DeviceType::kContains, "Media", "player"},    {DeviceType::kEquals, "player", "player"},
    {DeviceType::kContains, "Printer", "printer"}, {DeviceType::kEquals, "printer", "printer"},
    {DeviceType::kEquals, "nas", "nas"},           {DeviceType::kEquals, "tablet", "tablet"},
    {DeviceType::kEquals, "computer", "computer"},
};

// What the entry has is taken out of it, not copied: the entry is read once.
template <size_t count> void Take(Json::Value &entry, const std::array<Copied, count> &members, Json::Value &record) {
  for (const Copied &member : members) {
    Json::Value &value = record[member.recordKey];
    if (!entry.isObject() || !entry.removeMember(member.entryKey, &value)) {
      value = member.absent;
    }
  }
}

// The first of two members that is a text; nothing when neither is.
std::optional<std::string> FirstText(const Json::Value &entry, const char *first, const char *second) {
  auto text = router::TextOf(router::MemberOf(entry, first));
  return text ? text : router::TextOf(router::MemberOf(entry, second));
}

bool IsGuest(const Json::Value &record) {
  return router::MemberText(record, station::kNetif).find('g') != std::string::npos;
}

bool IsOnlineRecord(const Json::Value &record) {
  return router::ConvertToBool(router::MemberOf(record, station::kStatus)).value_or(false);
}

enum class NetRange { kNone, kLocal, kGuest, kAll };

NetRange ReadNetRange(const std::string &text) {
  if (text == "local") {
    return NetRange::kLocal;
  }
  if (text == "guest") {
    return NetRange::kGuest;
  }
  return text == "all" ? NetRange::kAll : NetRange::kNone;
}

bool IsInRange(ConnectionListHandler &handler, NetRange range, const Json::Value &record) {
  switch (range) {
  case NetRange::kLocal:
    return !IsGuest(record) && handler.IsMatchAnyBridge(router::MemberText(record, station::kIp));
  case NetRange::kGuest:
    return IsGuest(record);
  case NetRange::kAll:
    return true;
  default:
    return false;
  }
}

bool HasStations(const Json::Value &data) {
  const Json::Value &stations = router::MemberOf(data, station::kStations);
  return stations.isArray() && !stations.empty();
}

// The local clock at one moment. The C library looks at the time zone's file whenever it is asked for a time by mktime,
// which costs more than all else that a record needs; here it does so once.
class LocalClock {
public:
  LocalClock() {
    tzset();
    localtime_r(&now_, &fields_);
  }

  // A text does not say whether it is daylight saving time, and in the hour that a clock change repeats both would do:
  // it is taken for what holds now, as the stamps that matter are a minute old.
  // @return negative when the text is no time
  std::time_t Read(const std::string &text) const {
    std::tm parsed{}; // a text that does not match leaves it so: a time before 1970
    strptime(text.c_str(), kTimeFormat, &parsed);
    std::tm asUtc = parsed;
    const std::time_t time = timegm(&asUtc) - fields_.tm_gmtoff;
    std::tm shown{};
    localtime_r(&time, &shown);
    if (std::tie(parsed.tm_year, parsed.tm_mon, parsed.tm_mday, parsed.tm_hour, parsed.tm_min, parsed.tm_sec) ==
        std::tie(shown.tm_year, shown.tm_mon, shown.tm_mday, shown.tm_hour, shown.tm_min, shown.tm_sec)) {
      return time;
    }
    parsed.tm_isdst = -1; // the other half of the year, or no time at all
    return std::mktime(&parsed);
  }

  bool IsOnline(const std::string &text) const {
    const std::time_t then = Read(text);
    if (then < 0) {
      ROUTER_LOG("%s:%d cannot parse time string (%s)", text.c_str());
      return false;
    }
    return std::difftime(now_, then) <= kOnlineSeconds;
  }

private:
  std::time_t now_ = std::time(nullptr);
  std::tm fields_{};
};

} // namespace

ConnectionListHandler::ConnectionListHandler() = default;

ConnectionListHandler::~ConnectionListHandler() = default;

int ConnectionListHandler::GetScannerData(const std::string &scannerType, Json::Value &result) {
  Json::Value data;
  if (NetClient().GetDeviceListData(scannerType, data) != 0) {
    ROUTER_LOG("%s:%d failed to get upnp data");
    return -1;
  }
  Json::Value entries;
  if (data.isObject()) {
    data.removeMember("ClientList", &entries);
  }
  if (ValueMapping(std::move(entries), result[station::kStations]) != 0) {
    ROUTER_LOG("%s:%d failed on mapping json value");
    return -1;
  }
  return 0;
}

int ConnectionListHandler::ValueMapping(Json::Value entries, Json::Value &stations) {
  if (!stations.isArray()) {
    stations = Json::Value(Json::arrayValue);
  }
  if (entries.empty()) {
    return 0;
  }
  if (!entries.isArray()) {
    ROUTER_LOG("%s:%d input should be array");
    return -1;
  }
  const LocalClock clock;
  for (Json::Value &entry : entries) {
    Json::Value record(Json::objectValue);
    Take(entry, kCopied, record);
    record[station::kHostname] = GetHostName(entry);
    const bool online = clock.IsOnline(router::TextOf(record[station::kAssoTime]).value_or(""));
    record[station::kStatus] = online;
    record[station::kType] = GetDeviceType(entry);
    if (online && router::MemberText(record, station::kConnection) == station::kWifi.c_str()) {
      Take(entry, kCopiedOnline, record);
    }
    stations.append(std::move(record));
  }
  return 0;
}

std::string ConnectionListHandler::GetHostName(const Json::Value &entry) {
  auto name = FirstText(entry, kUserName, "displayName");
  if (!name) {
    ROUTER_LOG("%s:%d warning: no display name found");
    return "Network Device";
  }
  return *std::move(name);
}

std::string ConnectionListHandler::GetDeviceType(const Json::Value &entry) {
  const auto source = FirstText(entry, kUserType, "deviceType");
  if (!source) {
    return station::kOthers.c_str();
  }
  for (const DeviceType &known : kDeviceTypes) {
    const bool holds =
        known.test == DeviceType::kContains ? source->find(known.text) != std::string::npos : *source == known.text;
    if (holds) {
      return known.type;
    }
  }
  return station::kOthers.c_str();
}

bool ConnectionListHandler::IsOnline(const std::string &assoTime) {
  return LocalClock().IsOnline(assoTime);
}

int ConnectionListHandler::SetDevice(const std::string &mac, const std::string &displayName,
                                     const std::string &deviceType) {
  Json::Value record(Json::objectValue);
  record[kMacAddr] = mac;
  record[kUserName] = displayName;
  record[kUserType] = deviceType;
  if (NetClient().SetDeviceListData(record) != 0) {
    ROUTER_LOG("%s:%d failed to edit dev info for (%s)", mac.c_str());
    return -1;
  }
  return 0;
}

int ConnectionListHandler::DelDevice(const std::string &mac) {
  if (NetClient().DelDeviceListData(mac) != 0) {
    ROUTER_LOG("%s:%d failed to del device (%s)", mac.c_str());
    return -1;
  }
  return 0;
}

int ConnectionListHandler::GetOnlineDeviceNumber(const std::string &scannerType, const std::string &netRange,
                                                 Json::Value &result) {
  Json::Value data;
  if (GetScannerData(scannerType, data) != 0) {
    ROUTER_LOG("%s:%d failed to get scanner data for counting");
    return -1;
  }
  result[kDeviceCount] = CountOnlineDevice(netRange, data);
  return 0;
}

unsigned ConnectionListHandler::CountOnlineDevice(const std::string &netRange, const Json::Value &data) {
  if (!HasStations(data)) {
    return 0;
  }
  if (GetAllBridgeIP() != 0) { // asked, and needed, for every net range
    ROUTER_LOG("%s:%d failed to get all bridge's ip");
    return 0;
  }
  const NetRange range = ReadNetRange(netRange);
  const Json::Value &stations = data[station::kStations];
  return static_cast<unsigned>(std::count_if(stations.begin(), stations.end(), [this, range](const auto &record) {
    return IsInRange(*this, range, record) && IsOnlineRecord(record);
  }));
}

int ConnectionListHandler::GetList(const std::string &scannerType, const std::string &netRange, Json::Value &result) {
  Json::Value data;
  if (GetScannerData(scannerType, data) != 0) {
    ROUTER_LOG("%s:%d failed to get scanner (%s) data", scannerType.c_str());
    return -1;
  }
  FilterNetRange(std::move(data), netRange, result);
  return 0;
}

void ConnectionListHandler::FilterNetRange(Json::Value data, const std::string &netRange, Json::Value &result) {
  Json::Value &out = result[station::kStations];
  out = Json::Value(Json::arrayValue);
  if (!HasStations(data)) {
    return;
  }
  if (GetAllBridgeIP() != 0) {
    ROUTER_LOG("%s:%d failed to get all bridge's ip");
    return;
  }
  const NetRange range = ReadNetRange(netRange);
  Json::Value &stations = data[station::kStations];
  if (range == NetRange::kAll) {
    out.swap(stations);
    return;
  }
  for (Json::Value &record : stations) {
    if (IsInRange(*this, range, record)) {
      out.append(std::move(record));
    }
  }
}

int ConnectionListHandler::GetAllBridgeIP() {
  std::array<QARDNetInterface, kInterfaceCapacity> entries{};
  const int count = QARDNetInterfaceEnum(entries.data(), kInterfaceCapacity, QARD_NETIF_ALL);
  if (count < 1) {
    ROUTER_LOG("%s:%d Error on net interface enum [%d]", count);
    return -1;
  }
  for (int i = 0; i < std::min(count, kInterfaceCapacity); ++i) {
    const QARDNetInterface &entry = entries[static_cast<size_t>(i)];
    if (std::string_view(entry.name).find("br") != std::string_view::npos) {
      bridgeAddresses_.emplace_back(entry.ip);
      bridgeNetmasks_.emplace_back(entry.mask);
    }
  }
  return 0;
}

bool ConnectionListHandler::IsMatchAnyBridge(const std::string &ip) {
  if (ip.empty()) {
    return true;
  }
  if (!router::IsWhole(ip)) {
    return false;
  }
  const size_t count = std::min(bridgeAddresses_.size(), bridgeNetmasks_.size());
  for (size_t i = 0; i < count; ++i) {
    if (VORNNetIsSameSubnet(ip.c_str(), bridgeAddresses_[i].c_str(), bridgeNetmasks_[i].c_str()) == 1) {
      return true;
    }
  }
  return false;
}
