#include "host/devices/device_list.h"

#include "host/devices/device_store.h"
#include "host/devices/mac_address.h"
#include "host/utility/atomic_file.h"

#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <ctime>
#include <mutex>
#include <optional>

namespace vornhost {

namespace {

constexpr char kTimeZoneFile[] = "/etc/localtime";
constexpr unsigned kAllSources = (1U << kSourceCount) - 1;

// Whose name is the best: one that a person gave comes before one that a machine made up.
constexpr Source kPrecedence[] = {Source::kUpnp, Source::kMdns, Source::kNetbios,
                                  Source::kWifi, Source::kDhcp, Source::kArp};

// Local time, "%T %Y/%m/%d". REQUIRES: tzset, in the same answer.
std::string TimeText(int64_t wall) {
  const time_t time = wall;
  tm local{};
  std::array<char, 40> text{};
  localtime_r(&time, &local);
  return std::string(text.data(), std::strftime(text.data(), text.size(), "%T %Y/%m/%d", &local));
}

const std::string &Best(const Device &device, unsigned sources, std::string Finding::*member) {
  static const std::string kNone;
  const bool isSingle = sources != kAllSources;
  for (const bool own : {true, false}) {
    for (const Source source : kPrecedence) {
      const std::string &text = device.findings[static_cast<size_t>(source)].*member;
      if (!text.empty() && (!isSingle || !own || (sources & BitOf(source)) != 0)) {
        return text;
      }
    }
  }
  return kNone;
}

void SetText(Json::Value &entry, const Json::StaticString &key, const std::string &text) {
  if (!text.empty()) {
    entry[key] = text;
  }
}

// When the device was last seen. What the store says is as old as its last write: nobody is online by it.
int64_t LastSeen(const Device &device, const Presence *presence, const Moment &now) {
  if (presence != nullptr) {
    return now.wall - std::max<int64_t>(now.boot - presence->seen, 0) / 1000;
  }
  return std::min(device.lastSeen, now.wall - kOnlineSeconds - 1);
}

void SetRadio(Json::Value &entry, const RadioFigures &radio) {
  entry[Json::StaticString("signalstrength")] = Json::Int64(radio.signal);
  entry[Json::StaticString("transferRX")] = Json::Int64(radio.received);
  entry[Json::StaticString("transferTX")] = Json::Int64(radio.sent);
}

Json::Value EntryOf(const Device &device, const OwnerEntry *owner, const Presence *presence, unsigned sources,
                    const Moment &now) {
  Json::Value entry(Json::objectValue);
  entry[Json::StaticString("macAddr")] = device.mac;
  if (presence != nullptr || device.lastSeen != 0) {
    entry[Json::StaticString("asso_time")] = TimeText(LastSeen(device, presence, now));
  }
  SetText(entry, Json::StaticString("ipAddr"), device.ip);
  SetText(entry, Json::StaticString("displayName"), Best(device, sources, &Finding::name));
  SetText(entry, Json::StaticString("deviceType"), Best(device, sources, &Finding::type));
  SetText(entry, Json::StaticString("modelName"), Best(device, sources, &Finding::model));
  SetText(entry, Json::StaticString("manufacturer"), device.manufacturer);
  SetText(entry, Json::StaticString("connection"), device.connection);
  SetText(entry, Json::StaticString("netif"), device.netif);
  if (owner != nullptr) { // also when empty: an empty name is the owner's choice
    entry[Json::StaticString("userdef_displayName")] = owner->name;
    entry[Json::StaticString("userdef_deviceType")] = owner->type;
  }
  if (presence != nullptr && presence->radio) {
    SetRadio(entry, *presence->radio);
  }
  return entry;
}

template <typename Map> const typename Map::mapped_type *Find(const Map &map, const std::string &key) {
  const auto found = map.find(key);
  return found == map.end() ? nullptr : &found->second;
}

// Tells whether a file is the one that was looked at before, unchanged.
struct FileMark {
  dev_t device = 0;
  ino_t node = 0;
  int64_t changed = 0; // nanoseconds
  off_t size = 0;

  bool operator==(const FileMark &) const = default;
};

FileMark MarkOf(const char *path) {
  struct stat info {};
  if (stat(path, &info) != 0) {
    return {};
  }
  return {info.st_dev, info.st_ino, int64_t{info.st_mtim.tv_sec} * 1000000000 + info.st_mtim.tv_nsec, info.st_size};
}

// One connection for all readers of the process: opening one costs more than a whole listing.
class StoreReader {
public:
  std::shared_ptr<const StoredDevices> Get() {
    const std::lock_guard lock(mutex_);
    try {
      return Read();
    } catch (const DamagedDatabase &) {
      store_.reset();
      return Read();
    }
  }

private:
  std::shared_ptr<const StoredDevices> Read() {
    if (!store_ || !store_->IsCurrent()) {
      devices_.reset();
      store_.emplace();
    }
    const int64_t version = store_->DataVersion();
    if (!devices_ || version != version_) {
      devices_ = std::make_shared<const StoredDevices>(StoredDevices{store_->Devices(), store_->OwnerEntries()});
      version_ = version;
    }
    return devices_;
  }

  std::mutex mutex_;
  std::optional<DeviceStore> store_;
  int64_t version_ = 0;
  std::shared_ptr<const StoredDevices> devices_;
};

class PresenceReader {
public:
  std::shared_ptr<const PresenceMap> Get() {
    const std::lock_guard lock(mutex_);
    const FileMark mark = MarkOf(kPresenceFile);
    if (!presence_ || mark != mark_) {
      std::string content;
      if (mark == FileMark() || ReadWholeFile(kPresenceFile, content) != 0) {
        content.clear();
      }
      presence_ = std::make_shared<const PresenceMap>(ParsePresence(content));
      mark_ = mark;
    }
    return presence_;
  }

private:
  std::mutex mutex_;
  FileMark mark_;
  std::shared_ptr<const PresenceMap> presence_;
};

// What a list was made of.
struct Ingredients {
  std::shared_ptr<const StoredDevices> stored;
  std::shared_ptr<const PresenceMap> presence;
  FileMark timeZone;

  bool operator==(const Ingredients &) const = default;
};

// By the difference of the two clocks, a list says when a device was seen: it holds until one of them is set. That they
// are read one after the other moves the difference a little, so it is kept as it was first read: a sight has the same
// time in every list.
class ListKeeper {
public:
  std::shared_ptr<const Json::Value> Get(unsigned sources, const Ingredients &of) {
    const int64_t wall = WallMillis();
    const int64_t bootedAt = wall - BootMillis();
    const std::lock_guard lock(mutex_);
    const bool isSet = std::abs(bootedAt - bootedAt_) > kClockTolerance;
    if (isSet || of != of_) {
      lists_.clear();
      of_ = of;
      bootedAt_ = isSet ? bootedAt : bootedAt_;
    }
    std::shared_ptr<const Json::Value> &list = lists_[sources];
    if (!list) {
      const int64_t second = wall / 1000;
      const Moment now{second, second * 1000 - bootedAt_};
      list = std::make_shared<const Json::Value>(RenderDevices(*of.stored, *of.presence, sources, now));
    }
    return list;
  }

private:
  static constexpr int64_t kClockTolerance = 500; // milliseconds

  static int64_t WallMillis() {
    timespec time{};
    clock_gettime(CLOCK_REALTIME, &time);
    return int64_t{time.tv_sec} * 1000 + time.tv_nsec / 1000000;
  }

  std::mutex mutex_;
  Ingredients of_;
  int64_t bootedAt_ = 0;
  std::map<unsigned, std::shared_ptr<const Json::Value>> lists_;
};

} // namespace

unsigned SourcesOf(const std::string &scannerType) {
  if (scannerType == "all") {
    return kAllSources;
  }
  const auto *found = std::find(kSourceNames.begin(), kSourceNames.end(), scannerType);
  return found == kSourceNames.end() ? 0 : 1U << static_cast<unsigned>(found - kSourceNames.begin());
}

Json::Value RenderDevices(const StoredDevices &stored, const PresenceMap &presence, unsigned sources,
                          const Moment &now) {
  tzset(); // localtime_r alone would keep the zone of the first call, also when the owner has chosen another since
  Json::Value list(Json::arrayValue);
  auto owned = stored.owner.begin(); // both are in the order of the MAC addresses
  const auto takeOwned = [&](const std::string *before) {
    for (; owned != stored.owner.end() && (before == nullptr || owned->first < *before); ++owned) {
      if (sources == kAllSources) {
        Device unseen;
        unseen.mac = owned->first;
        list.append(EntryOf(unseen, &owned->second, nullptr, sources, now));
      }
    }
  };
  for (const Device &device : stored.devices) {
    takeOwned(&device.mac);
    const bool isOwned = owned != stored.owner.end() && owned->first == device.mac;
    if ((device.sources & sources) != 0) {
      list.append(EntryOf(device, isOwned ? &owned->second : nullptr, Find(presence, device.mac), sources, now));
    }
    owned = isOwned ? std::next(owned) : owned;
  }
  takeOwned(nullptr);
  return list;
}

std::shared_ptr<const StoredDevices> CurrentDevices() {
  static StoreReader reader;
  return reader.Get();
}

std::shared_ptr<const Json::Value> CurrentList(unsigned sources) {
  static PresenceReader presence;
  static ListKeeper keeper;
  return keeper.Get(sources, {CurrentDevices(), presence.Get(), MarkOf(kTimeZoneFile)});
}

} // namespace vornhost
