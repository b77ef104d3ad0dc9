#include "host/devices/device_table.h"

#include "host/network/ipv4.h"

#include <strings.h>
#include <sys/socket.h>

#include <algorithm>

namespace vornhost {

namespace {

constexpr int64_t kSecond = 1000;
constexpr int64_t kOnlineMillis = kOnlineSeconds * kSecond;

// A device that is there is asked to show it when it has not for this long, and then again and again: it has seven more
// tries before it counts as gone, so that one that sleeps with one eye open does not come and go.
constexpr int64_t kProbeAfter = 20 * kSecond;
constexpr int64_t kProbeAgain = 5 * kSecond;
// Some devices answer only to what everybody hears.
constexpr int64_t kBroadcastAfter = 40 * kSecond;
// One that is gone mostly makes itself heard when it comes back; it is asked seldom.
constexpr int64_t kProbeGone = 300 * kSecond;
constexpr size_t kProbesAtOnce = 50;

// An entry of the kernel's that changed so lately was touched by its device, or by the kernel's own probing.
constexpr int64_t kStirring = 10 * kSecond;

// When a device is asked its names: at once, twice again soon, for its services may still be starting, then every hour.
constexpr int64_t kInquiryPauses[] = {30 * kSecond, 120 * kSecond, 3600 * kSecond};
constexpr size_t kInquiriesAtOnce = 20;

// A device that changes its facts all the time is not worth more of the flash; a guest that makes up addresses neither.
constexpr int64_t kHour = 3600 * kSecond;
constexpr int kWritesPerHour = 20;
constexpr int64_t kMinute = 60 * kSecond;
constexpr int kNewPerMinute = 512;

// What the store says of when a device was last seen is for the time after a loss of power only.
constexpr int64_t kSeenWriteSeconds = int64_t{6} * 3600;

constexpr size_t kAddressLimit = 4;

std::string PlaceKey(const std::string &netif, const std::string &ip) {
  return netif + ' ' + ip;
}

bool IsOnline(const std::optional<int64_t> &seen, int64_t now) {
  return seen && now - *seen <= kOnlineMillis;
}

int64_t WallOf(int64_t boot, const Moment &now) {
  return now.wall - (now.boot - boot) / kSecond;
}

void KeepAddress(std::vector<std::string> &addresses, const std::string &address) {
  const auto found = std::find(addresses.begin(), addresses.end(), address);
  if (found == addresses.begin() && !addresses.empty()) {
    return;
  }
  if (found != addresses.end()) {
    addresses.erase(found);
  }
  addresses.insert(addresses.begin(), address);
  addresses.resize(std::min(addresses.size(), kAddressLimit));
}

// Whether the facts that last are other ones; the time of the last sight is none.
bool HasNews(const Device &now, const Device &written) {
  Device same = now;
  same.lastSeen = written.lastSeen;
  return same != written;
}

} // namespace

DeviceTable::DeviceTable(const std::string &ownName) : ownName_(ownName) {}

void DeviceTable::Load(std::vector<Device> devices, const PresenceMap &presence, const Moment &now) {
  for (Device &device : devices) {
    Record &record = records_[device.mac];
    record.created = now.boot;
    record.writesSince = now.boot;
    record.written = device;
    if (!device.ip.empty()) {
      places_[PlaceKey(device.netif, device.ip)] = device.mac;
    }
    const auto seen = presence.find(device.mac);
    if (seen != presence.end() && seen->second.seen <= now.boot) {
      record.seen = seen->second.seen;
      record.placeSeen = seen->second.seen;
    }
    record.device = std::move(device);
  }
}

// @return null when too many new ones come at once: they come again
DeviceTable::Record *DeviceTable::Get(const std::string &mac, const Moment &now) {
  const auto found = records_.find(mac);
  if (found != records_.end()) {
    return &found->second;
  }
  if (now.boot - minute_ >= kMinute) {
    minute_ = now.boot;
    newInMinute_ = 0;
  }
  if (++newInMinute_ > kNewPerMinute) {
    return nullptr;
  }
  Record &record = records_[mac];
  record.device.mac = mac;
  record.device.connection = "ethernet";
  record.created = now.boot;
  record.writesSince = now.boot;
  return &record;
}

void DeviceTable::See(Record &record, int64_t when) {
  if (!record.seen || *record.seen < when) {
    record.seen = when;
    record.stirred = false;
  }
}

// A device with several addresses keeps the one that it is shown with, as long as that one is confirmed.
void DeviceTable::Place(Record &record, const std::string &netif, const std::string &ip, int64_t when) {
  Device &device = record.device;
  if (ip.empty() && device.netif == netif) { // IPv6 says nothing of the IPv4 address
    return;
  }
  const bool isSame = device.netif == netif && device.ip == ip;
  const bool isSettled = !device.netif.empty() && (!device.ip.empty() || ip.empty());
  if (!isSame && isSettled && when - record.placeSeen <= kOnlineMillis) {
    return;
  }
  record.placeSeen = std::max(record.placeSeen, when);
  const auto old = places_.find(PlaceKey(device.netif, device.ip));
  if (!isSame && old != places_.end() && old->second == device.mac) {
    places_.erase(old);
  }
  device.netif = netif;
  device.ip = ip;
  if (ip.empty()) {
    return;
  }
  std::string &holder = places_[PlaceKey(netif, ip)];
  if (!holder.empty() && holder != device.mac) { // an address is one device's
    const auto other = records_.find(holder);
    if (other != records_.end()) {
      other->second.device.ip.clear();
    }
  }
  holder = device.mac;
}

void DeviceTable::SetFinding(Record &record, Source source, const Finding &finding) {
  Finding kept = finding;
  if (strcasecmp(kept.name.c_str(), ownName_.c_str()) == 0) {
    kept.name.clear();
  }
  // An answer has one part of the truth, the next one another: what it does not say stays.
  Finding &known = record.device.findings[static_cast<size_t>(source)];
  known.name = kept.name.empty() ? known.name : kept.name;
  known.type = kept.type.empty() ? known.type : kept.type;
  known.model = kept.model.empty() ? known.model : kept.model;
  record.device.sources |= BitOf(source);
}

// An address of the link is no evidence, but it says that there may be somebody.
void DeviceTable::NoteGuess(const DeviceNeighbour &neighbour, const Moment &now) {
  Record *record = neighbour.guess.empty() ? nullptr : Get(neighbour.mac, now);
  if (record == nullptr) {
    return;
  }
  record->guess = neighbour.guess;
  record->guessNetif = neighbour.netif;
  record->stirred = record->stirred || neighbour.updatedAgo < kStirring;
}

void DeviceTable::NoteNeighbour(const DeviceNeighbour &neighbour, const Moment &now) {
  if (neighbour.linkLocal) {
    NoteGuess(neighbour, now);
    return;
  }
  Record *record = Get(neighbour.mac, now);
  if (record == nullptr) {
    return;
  }
  const int64_t when = now.boot - neighbour.confirmedAgo;
  const bool isEvidence = neighbour.reachable && neighbour.confirmedAgo <= kOnlineMillis;
  if (!isEvidence) {
    // Enough to ask it, and where; not enough to believe in it.
    if (record->device.netif.empty() && !record->seen) {
      record->device.netif = neighbour.netif;
      record->device.ip = neighbour.family == AF_INET ? neighbour.address : "";
    }
    if (neighbour.family == AF_INET6) {
      KeepAddress(record->addresses, neighbour.address);
    }
    if (neighbour.updatedAgo < kStirring) {
      record->stirred = true;
      const bool isElsewhere = neighbour.family == AF_INET && neighbour.netif == record->device.netif &&
                               neighbour.address != record->device.ip;
      record->candidate = isElsewhere ? neighbour.address : record->candidate;
    }
    return;
  }
  record->device.sources |= BitOf(Source::kArp);
  if (neighbour.family == AF_INET6) {
    KeepAddress(record->addresses, neighbour.address);
  }
  if (!record->seen) { // whatever was guessed before
    record->placeSeen = when - kOnlineMillis - 1;
  }
  Place(*record, neighbour.netif, neighbour.family == AF_INET ? neighbour.address : "", when);
  See(*record, when);
}

void DeviceTable::NoteLease(const Lease &lease, const std::string &netif, const Moment &now) {
  Record *record = Get(lease.mac, now);
  if (record == nullptr) {
    return;
  }
  SetFinding(*record, Source::kDhcp, {lease.name, "", ""});
  record->stirred = true;
  const std::optional<uint32_t> ip = ParseIpv4(lease.ip.c_str());
  const bool isOthers = ip && Knows(netif, *ip) && places_[PlaceKey(netif, lease.ip)] != lease.mac;
  if (!netif.empty() && !isOthers && record->device.ip != lease.ip) {
    record->placeSeen = now.boot - kOnlineMillis - 1;
    Place(*record, netif, lease.ip, now.boot);
  }
}

void DeviceTable::NoteStation(const WifiStation &station, const Moment &now) {
  Record *record = Get(station.mac, now);
  if (record == nullptr) {
    return;
  }
  SetFinding(*record, Source::kWifi, {station.name, "", ""});
  record->device.connection = "wifi";
  record->radio = station.radio;
  record->stationSeen = now.boot;
  if (record->device.netif.empty()) {
    record->device.netif = station.network;
  }
  if (record->device.ip.empty() && !station.ip.empty()) {
    Place(*record, record->device.netif, station.ip, now.boot);
  }
  See(*record, now.boot);
}

void DeviceTable::NoteStations(const std::vector<WifiStation> &stations, const Moment &now) {
  for (const WifiStation &station : stations) {
    NoteStation(station, now);
  }
  for (auto &[mac, record] : records_) {
    if (record.stationSeen == now.boot) {
      continue;
    }
    record.radio.reset();
    // It has left the radio for longer than a change of access points takes, and yet it is there: by a cable.
    if (record.device.connection == "wifi" && IsOnline(record.seen, now.boot) &&
        !IsOnline(record.stationSeen, now.boot)) {
      record.device.connection = "ethernet";
    }
  }
}

bool DeviceTable::Knows(const std::string &netif, uint32_t ip) const {
  return places_.contains(PlaceKey(netif, Ipv4Text(ip)));
}

void DeviceTable::NoteFinding(Source source, const std::string &netif, uint32_t ip, const Finding &finding) {
  const auto place = places_.find(PlaceKey(netif, Ipv4Text(ip)));
  if (place != places_.end() && !finding.IsEmpty()) {
    SetFinding(records_[place->second], source, finding);
  }
}

bool DeviceTable::IsProbeDue(const Record &record, int64_t now) {
  const int64_t sinceProbe = record.probed ? now - *record.probed : INT64_MAX;
  if (IsOnline(record.seen, now)) {
    return (now - *record.seen >= kProbeAfter || !record.candidate.empty()) && sinceProbe >= kProbeAgain;
  }
  return sinceProbe >= (record.stirred ? kProbeAgain : kProbeGone);
}

// REQUIRES: an address is known, or guessed.
Probe DeviceTable::NextProbe(const std::string &mac, Record &record, int64_t now) {
  const std::string &known = record.device.ip;
  if (known.empty() && record.addresses.empty()) {
    return {mac, record.guessNetif, "", record.guess, false};
  }
  const int64_t age = record.seen ? now - *record.seen : INT64_MAX;
  const bool isUrgent = age >= kBroadcastAfter;
  Probe probe{mac, record.device.netif, record.candidate.empty() ? known : record.candidate, "", isUrgent};
  if (!record.addresses.empty() && (known.empty() || isUrgent)) {
    probe.address = record.addresses.front();
    if (isUrgent) { // that one may be over, as temporary addresses are: another one the next time
      std::rotate(record.addresses.begin(), record.addresses.begin() + 1, record.addresses.end());
    }
  }
  return probe;
}

std::vector<Probe> DeviceTable::TakeProbes(const Moment &now) {
  std::vector<Probe> probes;
  for (auto &[mac, record] : records_) {
    const bool hasAddress = (!record.device.ip.empty() || !record.addresses.empty()) && !record.device.netif.empty();
    if (probes.size() == kProbesAtOnce || (!hasAddress && record.guess.empty()) || !IsProbeDue(record, now.boot)) {
      continue;
    }
    probes.push_back(NextProbe(mac, record, now.boot));
    record.candidate.clear();
    record.probed = now.boot;
    record.stirred = false;
  }
  return probes;
}

std::vector<Inquiry> DeviceTable::TakeInquiries(const Moment &now) {
  std::vector<Inquiry> inquiries;
  for (auto &[mac, record] : records_) {
    const std::optional<uint32_t> ip = ParseIpv4(record.device.ip.c_str());
    if (inquiries.size() < kInquiriesAtOnce && ip && IsOnline(record.seen, now.boot) &&
        now.boot >= record.nextInquiry) {
      inquiries.push_back({record.device.netif, *ip});
      record.nextInquiry = now.boot + kInquiryPauses[std::min<int>(record.inquiries, std::size(kInquiryPauses) - 1)];
      ++record.inquiries;
    }
  }
  return inquiries;
}

std::vector<std::string> DeviceTable::WithoutVendor() const {
  std::vector<std::string> macs;
  for (const auto &[mac, record] : records_) {
    if (record.device.manufacturer.empty() && !record.vendorAsked && record.device.sources != 0) {
      macs.push_back(mac);
    }
  }
  return macs;
}

void DeviceTable::SetVendors(const std::vector<std::string> &asked, const std::map<std::string, std::string> &vendors) {
  for (const std::string &mac : asked) {
    const auto record = records_.find(mac);
    if (record != records_.end()) {
      const auto vendor = vendors.find(mac);
      record->second.vendorAsked = true;
      record->second.device.manufacturer = vendor == vendors.end() ? "" : vendor->second;
    }
  }
}

bool DeviceTable::MayWrite(Record &record, int64_t now) {
  if (now - record.writesSince >= kHour) {
    record.writesSince = now;
    record.writes = 0;
  }
  return record.writes++ < kWritesPerHour;
}

std::vector<Device> DeviceTable::TakeChanges(const Moment &now, bool isLast) {
  std::vector<Device> changes;
  for (auto &[mac, record] : records_) {
    Device &device = record.device;
    if (device.sources == 0) {
      continue;
    }
    const int64_t seenAt = record.seen ? WallOf(*record.seen, now) : device.lastSeen;
    const int64_t unwritten = record.written ? seenAt - record.written->lastSeen : 0;
    // The two clocks are read one after the other: a second's difference is none.
    const bool isGone = !IsOnline(record.seen, now.boot) && unwritten > 1;
    const bool isDue =
        !record.written || HasNews(device, *record.written) || isGone || unwritten >= (isLast ? 2 : kSeenWriteSeconds);
    if (isDue && (isLast || MayWrite(record, now.boot))) {
      device.lastSeen = seenAt;
      record.written = device;
      changes.push_back(device);
    }
  }
  return changes;
}

void DeviceTable::NoteUnwritten(const std::vector<Device> &changes) {
  for (const Device &device : changes) {
    const auto record = records_.find(device.mac);
    if (record != records_.end()) {
      record->second.written.reset();
    }
  }
}

void DeviceTable::NoteAllUnwritten() {
  for (auto &[mac, record] : records_) {
    record.written.reset();
    record.writes = 0;
  }
}

void DeviceTable::Erase(const std::string &mac) {
  const auto record = records_.find(mac);
  if (record == records_.end()) {
    return;
  }
  const auto place = places_.find(PlaceKey(record->second.device.netif, record->second.device.ip));
  if (place != places_.end() && place->second == mac) {
    places_.erase(place);
  }
  records_.erase(record);
}

void DeviceTable::ForgetMissing(const std::set<std::string> &stored) {
  std::vector<std::string> missing;
  for (const auto &[mac, record] : records_) {
    if (record.written && !stored.contains(mac)) {
      missing.push_back(mac);
    }
  }
  for (const std::string &mac : missing) {
    Erase(mac);
  }
}

std::vector<std::string> DeviceTable::Shrink(const std::map<std::string, OwnerEntry> &owner, const Moment &now) {
  std::vector<std::pair<int64_t, std::string>> candidates; // by when they were last seen
  std::vector<std::string> doomed;
  for (const auto &[mac, record] : records_) {
    // Who never answered; a guess has its time, or it would be made anew, and asked, every minute.
    const int64_t patience = record.guess.empty() ? kOnlineMillis : kProbeGone - kProbeAgain;
    if (record.device.sources == 0 && now.boot - record.created > patience) {
      doomed.push_back(mac);
    } else if (!owner.contains(mac)) {
      candidates.emplace_back(record.seen ? WallOf(*record.seen, now) : record.device.lastSeen, mac);
    }
  }
  std::sort(candidates.begin(), candidates.end());
  const size_t left = records_.size() - doomed.size();
  for (size_t i = 0; i < candidates.size() && left > kDeviceLimit + i; ++i) {
    doomed.push_back(candidates[i].second);
  }
  std::vector<std::string> written;
  for (const std::string &mac : doomed) {
    if (records_[mac].written) {
      written.push_back(mac);
    }
    Erase(mac);
  }
  return written;
}

PresenceMap DeviceTable::Presences() const {
  PresenceMap presences;
  for (const auto &[mac, record] : records_) {
    if (record.seen && record.device.sources != 0) {
      presences[mac] = {*record.seen, record.radio};
    }
  }
  return presences;
}

} // namespace vornhost
