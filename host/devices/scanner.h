// The scanner: one loop in one thread that keeps store and presence file true to what is in the home.
#ifndef HOST_DEVICES_SCANNER_H
#define HOST_DEVICES_SCANNER_H

#include "host/devices/all_nodes.h"
#include "host/devices/device_store.h"
#include "host/devices/device_table.h"
#include "host/devices/name_search.h"
#include "host/devices/neighbours.h"
#include "host/devices/probe_sender.h"
#include "host/utility/unique_fd.h"

#include <ctime>
#include <deque>
#include <string>
#include <unordered_map>
#include <vector>

namespace vornhost {

class Scanner {
public:
  /// Throws std::exception when the store cannot be had, the network not be listened to, or another scanner runs.
  Scanner();

  /// Until SIGTERM or SIGINT.
  void Run();

private:
  struct Description {
    std::string netif;
    uint32_t ip = 0;
    std::string url;
  };

  static Moment Now();
  bool Wait(); // false: it is to end
  void Tick();
  void FollowBridges();
  void LookAtNeighbours();
  void LookAtLeases();
  void LookAtStations();
  void AskForPresence();
  void AskForQuietHosts();
  void AskForNames();
  void QueueDescription(const std::string &netif, uint32_t ip, const std::string &url);
  void FetchOneDescription();
  void FollowStore();
  void OpenStoreAnew();
  void Write(bool isLast);
  std::string NetifOf(const std::string &ip) const;

  UniqueFd turn_; // held as long as it runs
  UniqueFd signals_;
  DeviceStore store_;
  Netlink netlink_;
  NeighbourTable neighbours_;
  ProbeSender probes_;
  AllNodesEcho allNodes_;
  DeviceTable table_;
  NameSearch names_;
  std::vector<Bridge> bridges_;
  std::map<std::string, OwnerEntry> owner_;
  std::deque<Description> descriptions_;
  std::unordered_map<std::string, int64_t> described_; // "NETIF IP" to when it was fetched
  PresenceMap presence_;                               // as written
  timespec leasesChanged_{};
  int64_t storeVersion_ = 0;
  bool storeDamaged_ = false;
  size_t nodeQuestions_ = 0;
  bool neighboursStirred_ = true;
  bool linksStirred_ = true;
  // BootMillis of what was done last
  int64_t ticked_ = 0;
  int64_t looked_ = 0;
  int64_t followed_ = 0;
  int64_t stationsRead_ = 0;
  int64_t askedAll_ = 0;
  int64_t askedNodes_ = 0;
  int64_t wrote_ = 0;
};

} // namespace vornhost

#endif
