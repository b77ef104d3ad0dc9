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
#include <unordered_map>
#include <utility>
#include <vector>

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
const Json::StaticString kNameless("Network Device");

// What a record is made of: the members of an entry that are read, and what is found out from them.
enum Part : size_t {
  kPartAssoTime,
  kPartConnection,
  kPartDeviceType,
  kPartDisplayName,
  kPartIpAddr,
  kPartMacAddr,
  kPartManufacturer,
  kPartModelName,
  kPartNetif,
  kPartSignalStrength,
  kPartTransferRx,
  kPartTransferTx,
  kPartUserType,
  kPartUserName,
  kEntryPartCount,
  kPartStatus = kEntryPartCount,
  kPartHostname,
  kPartType,
  kPartCount
};
using Parts = std::array<Json::Value *, kPartCount>; // null: absent

// In the order in which an entry has them, that of their bytes.
constexpr std::array<std::string_view, kEntryPartCount> kEntryKeys = {
    "asso_time",          "connection",         "deviceType", "displayName",    "ipAddr",     "macAddr",
    "manufacturer",       "modelName",          "netif",      "signalstrength", "transferRX", "transferTX",
    "userdef_deviceType", "userdef_displayName"};

struct Field {
  const Json::StaticString &key;
  Part part;
  Json::Value absent;
  bool ofStations; // only of a wireless station that is online
};

const std::array<Field, 13> kFields = {{
    {station::kMac, kPartMacAddr, station::kNone, false},
    {station::kAssoTime, kPartAssoTime, station::kNone, false},
    {station::kIp, kPartIpAddr, station::kNone, false},
    {station::kHostname, kPartHostname, station::kNone, false},
    {station::kStatus, kPartStatus, false, false},
    {station::kType, kPartType, station::kOthers, false},
    {station::kBrand, kPartManufacturer, station::kNone, false},
    {station::kModel, kPartModelName, station::kNone, false},
    {station::kConnection, kPartConnection, station::kEthernet, false},
    {station::kNetif, kPartNetif, station::kNone, false},
    {station::kTransferRx, kPartTransferRx, station::kNone, true},
    {station::kTransferTx, kPartTransferTx, station::kNone, true},
    {station::kSignalStrength, kPartSignalStrength, 0, true},
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

// Goes once through the members of an entry and the known keys, which are in the same order: a search for each costs
// more than all else that a record needs.
Parts FindParts(Json::Value &entry) {
  Parts parts{};
  if (!entry.isObject()) {
    return parts;
  }
  const auto *known = kEntryKeys.begin();
  for (auto member = entry.begin(); member != entry.end(); ++member) {
    const char *end = nullptr;
    const char *begin = member.memberName(&end);
    const std::string_view name(begin, static_cast<size_t>(end - begin));
    known = std::find_if(known, kEntryKeys.end(), [name](std::string_view key) { return key >= name; });
    if (known != kEntryKeys.end() && *known == name) {
      parts[static_cast<size_t>(known - kEntryKeys.begin())] = &*member;
    }
  }
  return parts;
}

// A record that says nothing yet. Copying it costs a fraction of setting member after member, and what a part has to
// say is moved into its place.
class BlankRecord {
public:
  explicit BlankRecord(bool ofStation) : blank_(Json::objectValue) {
    for (const Field &field : kFields) {
      if (ofStation || !field.ofStations) {
        blank_[field.key] = field.absent;
      }
    }
    for (const std::string &name : blank_.getMemberNames()) {
      const auto *field =
          std::find_if(kFields.begin(), kFields.end(), [&name](const Field &each) { return name == each.key.c_str(); });
      order_.push_back(field->part);
    }
  }

  Json::Value Fill(const Parts &parts) const {
    Json::Value record(blank_);
    auto member = record.begin();
    for (const Part part : order_) {
      if (parts[part] != nullptr) {
        member->swap(*parts[part]);
      }
      ++member;
    }
    return record;
  }

private:
  Json::Value blank_;
  std::vector<Part> order_; // of its members
};

// The first of two members that is a text; null when neither is.
template <class Value> Value *FirstText(Value *first, Value *second) {
  const auto isText = [](const Value *value) { return value != nullptr && value->isString(); };
  return isText(first) ? first : isText(second) ? second : nullptr;
}

void LogNameless() {
  ROUTER_LOG("%s:%d warning: no display name found");
}

// @param[in] text  what the user or the scanners say; null: nothing
Json::StaticString TypeOf(const Json::Value *text) {
  const auto source = text == nullptr ? std::nullopt : router::ViewOf(*text);
  if (!source) {
    return station::kOthers;
  }
  const auto *known = std::find_if(std::begin(kDeviceTypes), std::end(kDeviceTypes), [&source](const DeviceType &each) {
    return each.test == DeviceType::kContains ? source->find(each.text) != std::string_view::npos
                                              : *source == each.text;
  });
  return known == std::end(kDeviceTypes) ? station::kOthers : Json::StaticString(known->type);
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
  std::time_t Read(const char *text) const {
    std::tm parsed{}; // a text that does not match leaves it so: a time before 1970
    strptime(text, kTimeFormat, &parsed);
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

  // Many devices were last seen in the same second: a text that was read is not read again.
  bool IsOnline(const std::string &text) {
    const auto known = online_.find(text);
    if (known != online_.end()) {
      return known->second;
    }
    const std::time_t then = Read(text.c_str());
    if (then < 0) {
      ROUTER_LOG("%s:%d cannot parse time string (%s)", text.c_str());
      return false;
    }
    return online_[text] = std::difftime(now_, then) <= kOnlineSeconds;
  }

private:
  std::time_t now_ = std::time(nullptr);
  std::tm fields_{};
  std::unordered_map<std::string, bool> online_;
};

// The entry's members go into the record.
Json::Value MakeRecord(Json::Value &entry, LocalClock &clock) {
  static const BlankRecord kOfDevice(false);
  static const BlankRecord kOfStation(true);
  Parts parts = FindParts(entry);
  Json::Value nameless(kNameless);
  parts[kPartHostname] = FirstText(parts[kPartUserName], parts[kPartDisplayName]);
  if (parts[kPartHostname] == nullptr) {
    LogNameless();
    parts[kPartHostname] = &nameless;
  }
  const Json::Value *seen = parts[kPartAssoTime];
  const bool online = clock.IsOnline(seen == nullptr ? "" : router::TextOf(*seen).value_or(""));
  Json::Value status(online);
  parts[kPartStatus] = &status;
  Json::Value type(TypeOf(FirstText(parts[kPartUserType], parts[kPartDeviceType])));
  parts[kPartType] = &type;
  const Json::Value *connection = parts[kPartConnection];
  const bool isStation = online && connection != nullptr && router::ViewOf(*connection) == station::kWifi.c_str();
  return (isStation ? kOfStation : kOfDevice).Fill(parts);
}

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
  LocalClock clock;
  for (Json::Value &entry : entries) {
    stations.append(MakeRecord(entry, clock));
    entry = Json::Value(); // what is left of it makes room for the next record while it is at hand
  }
  return 0;
}

std::string ConnectionListHandler::GetHostName(const Json::Value &entry) {
  const Json::Value *name = FirstText(&router::MemberOf(entry, kUserName), &router::MemberOf(entry, "displayName"));
  if (name == nullptr) {
    LogNameless();
    return kNameless.c_str();
  }
  return name->asString();
}

std::string ConnectionListHandler::GetDeviceType(const Json::Value &entry) {
  return TypeOf(FirstText(&router::MemberOf(entry, kUserType), &router::MemberOf(entry, "deviceType"))).c_str();
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
