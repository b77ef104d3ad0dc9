#include "host/devices/scanner.h"

#include "host/devices/description_fetch.h"
#include "host/devices/ssdp.h"
#include "host/devices/vendors.h"
#include "host/devices/wifi_stations.h"
#include "host/network/ipv4.h"
#include "host/network/names.h"
#include "host/utility/atomic_file.h"
#include "host/utility/log.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/signalfd.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <optional>
#include <set>

namespace vornhost {

namespace {

// The scanner's pulse and what it does at which interval, in milliseconds. docs/devices.md states what this costs.
constexpr int64_t kTick = 1000;
constexpr int64_t kLookInterval = 5000;
constexpr int64_t kFollowInterval = 30000;
constexpr int64_t kStationInterval = 10000;
constexpr int64_t kWriteInterval = 2000;
constexpr int64_t kAskAllInterval = 300000;
constexpr int64_t kAskNewInterval = 10000; // when there are new devices
// Hosts that have just got a network need some seconds for their addresses.
constexpr int64_t kAskNodesPauses[] = {0, 5000, 10000, 30000, kAskAllInterval};
constexpr int64_t kDescriptionAge = 3600000;
constexpr size_t kDescriptionLimit = 256;

constexpr char kTurnFile[] = "/run/vorn/devices.lock";

// Packets that come without end get this much time between two readings.
constexpr int kBreath = 20;

UniqueFd TakeScannerTurn() {
  mkdir(kRunFolder, 0755);
  UniqueFd file(open(kTurnFile, O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file.IsOpen() || flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
    throw std::runtime_error(std::string(kTurnFile) + ": " + std::strerror(errno));
  }
  return file;
}

UniqueFd OpenSignals() {
  sigset_t ends;
  sigemptyset(&ends);
  sigaddset(&ends, SIGTERM);
  sigaddset(&ends, SIGINT);
  sigprocmask(SIG_BLOCK, &ends, nullptr);
  return UniqueFd(signalfd(-1, &ends, SFD_CLOEXEC | SFD_NONBLOCK));
}

std::string HostName() {
  std::array<char, 256> name{};
  gethostname(name.data(), name.size() - 1);
  return name.data();
}

bool IsPast(int64_t since, int64_t interval) {
  return BootMillis() - since >= interval;
}

PresenceMap OldPresence() {
  std::string content;
  return ReadWholeFile(kPresenceFile, content) == 0 ? ParsePresence(content) : PresenceMap();
}

} // namespace

Scanner::Scanner()
    : turn_(TakeScannerTurn()), signals_(OpenSignals()), table_(HostName()),
      names_({[this](Source source, const std::string &netif, uint32_t ip, const Finding &finding) {
                table_.NoteFinding(source, netif, ip, finding);
              },
              [this](const std::string &netif, uint32_t ip, const std::string &url) {
                QueueDescription(netif, ip, url);
              }}) {
  storeVersion_ = store_.DataVersion();
  owner_ = store_.OwnerEntries();
  table_.Load(store_.Devices(), OldPresence(), Now());
}

Moment Scanner::Now() {
  return {time(nullptr), BootMillis()};
}

// Evidence, questions and answers go round once a tick at most, whatever comes in.
void Scanner::Run() {
  while (Wait()) {
    names_.Receive();
    const NeighbourTable::Changes changes = neighbours_.TakeChanges();
    neighboursStirred_ = neighboursStirred_ || changes.neighbours;
    linksStirred_ = linksStirred_ || changes.links;
    if (IsPast(ticked_, kTick)) {
      ticked_ = BootMillis();
      try {
        Tick();
      } catch (const DamagedDatabase &) { // whoever opens it says so
        storeDamaged_ = true;
      } catch (const std::exception &error) { // such as a full disk: the next tick tries again
        LogError("devices: %s", LogText(error.what()).c_str());
        ticked_ += kLookInterval;
      }
    }
  }
  Write(true);
}

bool Scanner::Wait() {
  std::vector<pollfd> entries = {{signals_.Get(), POLLIN, 0}, {neighbours_.EventFd(), POLLIN, 0}};
  for (const int fd : names_.Fds()) {
    entries.push_back({fd, POLLIN, 0});
  }
  const int64_t left = std::clamp<int64_t>(ticked_ + kTick - BootMillis(), 0, kTick);
  poll(entries.data(), 1, static_cast<int>(std::min<int64_t>(left, kBreath)));
  poll(entries.data(), entries.size(), static_cast<int>(std::max<int64_t>(left - kBreath, 0)));
  return (entries[0].revents & POLLIN) == 0;
}

void Scanner::Tick() {
  if (linksStirred_ || IsPast(followed_, kFollowInterval)) {
    FollowBridges();
  }
  if (neighboursStirred_ || IsPast(looked_, kLookInterval)) {
    LookAtNeighbours();
  }
  LookAtLeases();
  if (IsPast(stationsRead_, kStationInterval)) {
    LookAtStations();
  }
  AskForQuietHosts();
  AskForPresence();
  AskForNames();
  FetchOneDescription();
  if (IsPast(wrote_, kWriteInterval)) {
    wrote_ = BootMillis();
    FollowStore();
    Write(false);
  }
}

void Scanner::FollowBridges() {
  linksStirred_ = false;
  followed_ = BootMillis();
  std::vector<Bridge> bridges = ReadBridges(netlink_);
  if (bridges != bridges_) {
    nodeQuestions_ = 0;
  }
  bridges_ = std::move(bridges);
  names_.Follow(bridges_);
}

void Scanner::LookAtNeighbours() {
  neighboursStirred_ = false;
  looked_ = BootMillis();
  const std::vector<DeviceNeighbour> neighbours = neighbours_.Read(bridges_);
  const Moment now = Now();
  for (const DeviceNeighbour &neighbour : neighbours) {
    table_.NoteNeighbour(neighbour, now);
  }
}

std::string Scanner::NetifOf(const std::string &ip) const {
  const std::optional<uint32_t> address = ParseIpv4(ip.c_str());
  const auto bridge = std::find_if(bridges_.begin(), bridges_.end(),
                                   [&address](const Bridge &each) { return address && each.Covers(*address); });
  return bridge == bridges_.end() ? std::string() : bridge->name;
}

void Scanner::LookAtLeases() {
  struct stat info {};
  if (stat(kLeaseFile, &info) != 0 ||
      (info.st_mtim.tv_sec == leasesChanged_.tv_sec && info.st_mtim.tv_nsec == leasesChanged_.tv_nsec)) {
    return;
  }
  std::string content;
  if (ReadWholeFile(kLeaseFile, content) == 0) {
    leasesChanged_ = info.st_mtim;
    const Moment now = Now();
    for (const Lease &lease : ParseLeases(content)) {
      table_.NoteLease(lease, NetifOf(lease.ip), now);
    }
  }
}

void Scanner::LookAtStations() {
  stationsRead_ = BootMillis();
  const std::optional<std::vector<WifiStation>> stations = ReadStations();
  if (stations) {
    table_.NoteStations(*stations, Now());
  }
}

void Scanner::AskForPresence() {
  for (const Probe &probe : table_.TakeProbes(Now())) {
    const auto bridge = std::find_if(bridges_.begin(), bridges_.end(),
                                     [&probe](const Bridge &each) { return each.name == probe.netif; });
    if (bridge != bridges_.end()) {
      probes_.Send(probe, *bridge);
    }
  }
}

void Scanner::AskForQuietHosts() {
  const Moment now = Now();
  for (const DeviceNeighbour &neighbour : allNodes_.Receive(bridges_, now.boot)) {
    table_.NoteNeighbour(neighbour, now);
  }
  if (IsPast(askedNodes_, kAskNodesPauses[std::min(nodeQuestions_, std::size(kAskNodesPauses) - 1)])) {
    askedNodes_ = now.boot;
    ++nodeQuestions_;
    allNodes_.Ask(bridges_, now.boot);
  }
}

void Scanner::AskForNames() {
  const std::vector<Inquiry> inquiries = table_.TakeInquiries(Now());
  names_.Ask(inquiries);
  const bool hasNew = !inquiries.empty() && IsPast(askedAll_, kAskNewInterval);
  if (hasNew || IsPast(askedAll_, kAskAllInterval)) {
    askedAll_ = BootMillis();
    names_.AskAll();
  }
}

void Scanner::QueueDescription(const std::string &netif, uint32_t ip, const std::string &url) {
  if (!table_.Knows(netif, ip) || descriptions_.size() >= kDescriptionLimit) {
    return;
  }
  std::erase_if(described_, [](const auto &entry) { return IsPast(entry.second, kDescriptionAge); });
  // One description an address and hour: a device cannot keep the router fetching.
  if (described_.size() < kDeviceLimit && described_.try_emplace(netif + ' ' + Ipv4Text(ip), BootMillis()).second) {
    descriptions_.push_back({netif, ip, url});
  }
}

// One a tick: a device that does not answer holds the loop up for a second.
void Scanner::FetchOneDescription() {
  if (descriptions_.empty()) {
    return;
  }
  const Description next = std::move(descriptions_.front());
  descriptions_.pop_front();
  const std::string content = FetchDescription(next.url, next.netif);
  table_.NoteFinding(Source::kUpnp, next.netif, next.ip, ParseDescription(content));
}

// What was written is in another file now, which may be a new one.
void Scanner::OpenStoreAnew() {
  DeviceStore fresh;
  if (store_.IsCurrent()) {
    LogError("devices: the store fails, and yet there is nothing wrong with its form");
  }
  store_ = std::move(fresh);
  storeDamaged_ = false;
  storeVersion_ = store_.DataVersion();
  owner_ = store_.OwnerEntries();
  table_.NoteAllUnwritten();
}

// The owner's edits come from other processes, and so does a new store in the place of one that was damaged.
void Scanner::FollowStore() {
  if (storeDamaged_ || !store_.IsCurrent()) {
    OpenStoreAnew();
  }
  const int64_t version = store_.DataVersion();
  if (version == storeVersion_) {
    return;
  }
  storeVersion_ = version;
  owner_ = store_.OwnerEntries();
  std::set<std::string> stored;
  for (const Device &device : store_.Devices()) {
    stored.insert(device.mac);
  }
  table_.ForgetMissing(stored);
}

void Scanner::Write(bool isLast) {
  const std::vector<std::string> asked = table_.WithoutVendor();
  if (!asked.empty()) {
    table_.SetVendors(asked, VendorsOf(asked));
  }
  const Moment now = Now();
  const std::vector<std::string> forgotten = table_.Shrink(owner_, now);
  const std::vector<Device> changes = table_.TakeChanges(now, isLast);
  if (!changes.empty() || !forgotten.empty()) {
    try {
      store_.Write(changes, forgotten);
    } catch (const DatabaseError &) {
      table_.NoteUnwritten(changes);
      throw;
    }
  }
  PresenceMap presence = table_.Presences();
  if (presence != presence_ && WritePresence(presence)) {
    presence_ = std::move(presence);
  }
}

} // namespace vornhost
