// What the scanner knows at the moment: who was seen when, what is new, who is to be asked next.
//
// It touches neither network nor disk, and time is what it is told. Evidence that a device is there is an answer that
// the kernel had from it, or its association with a wireless network. Addresses of the link alone (fe80::/10,
// 169.254.0.0/16) are none: a device that sleeps or has no address of the home keeps answering by them for others.
#ifndef HOST_DEVICES_DEVICE_TABLE_H
#define HOST_DEVICES_DEVICE_TABLE_H

#include "host/devices/device.h"
#include "host/devices/device_list.h"
#include "host/devices/lease_file.h"
#include "host/devices/neighbours.h"
#include "host/devices/presence_file.h"

#include <map>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <vector>

namespace vornhost {

struct WifiStation {
  std::string mac;
  std::string network; ///< of the wireless daemon's
  std::string ip;      ///< checked; empty: not known
  std::string name;    ///< clean
  RadioFigures radio;
};

/// A device that is to show that it is there.
struct Probe {
  std::string mac;
  std::string netif;
  std::string ip;         ///< IPv4; empty: none
  std::string address;    ///< IPv6; empty: not to be asked by it
  bool broadcast = false; ///< it did not answer to its own MAC address
};

/// A device that is to be asked its names.
struct Inquiry {
  std::string netif;
  uint32_t ip = 0; ///< IPv4, in host order
};

class DeviceTable {
public:
  /// @param[in] ownName  the router's: no device's name
  explicit DeviceTable(const std::string &ownName);

  void Load(std::vector<Device> devices, const PresenceMap &presence, const Moment &now);

  void NoteNeighbour(const DeviceNeighbour &neighbour, const Moment &now);
  /// @param[in] netif  the bridge that has the lease's network; empty: none has
  void NoteLease(const Lease &lease, const std::string &netif, const Moment &now);
  /// All stations that are associated now, of a wireless daemon that answers.
  void NoteStations(const std::vector<WifiStation> &stations, const Moment &now);
  /// What a device said when it was asked, or by itself. One that is not known by its address is passed over.
  void NoteFinding(Source source, const std::string &netif, uint32_t ip, const Finding &finding);

  bool Knows(const std::string &netif, uint32_t ip) const;

  /// Who is to be probed or asked now; each counts as done.
  std::vector<Probe> TakeProbes(const Moment &now);
  std::vector<Inquiry> TakeInquiries(const Moment &now);

  /// Devices whose builder has not been looked up.
  std::vector<std::string> WithoutVendor() const;
  void SetVendors(const std::vector<std::string> &asked, const std::map<std::string, std::string> &vendors);

  /// What has to be written; it counts as written.
  /// @param[in] isLast  the scanner ends: the times are written as well
  std::vector<Device> TakeChanges(const Moment &now, bool isLast = false);

  /// These could not be written after all.
  void NoteUnwritten(const std::vector<Device> &changes);
  /// There is another store.
  void NoteAllUnwritten();

  /// Forgets those written devices that are not in the store any more.
  void ForgetMissing(const std::set<std::string> &stored);
  /// Forgets so many devices that no more are left than there may be.
  /// @return those of them that are in the store
  std::vector<std::string> Shrink(const std::map<std::string, OwnerEntry> &owner, const Moment &now);

  PresenceMap Presences() const;
  size_t Size() const { return records_.size(); }

private:
  struct Record {
    Device device;
    std::optional<Device> written;
    int64_t created = 0;         // times are BootMillis
    std::optional<int64_t> seen; // last evidence
    int64_t placeSeen = 0;       // last evidence of netif and ip
    std::optional<int64_t> stationSeen;
    std::optional<int64_t> probed;
    bool stirred = false;               // something came from it that is no evidence
    std::string candidate;              // IPv4: it seems to have moved there, and is asked
    std::vector<std::string> addresses; // IPv6, beside the link's own; the last one confirmed first
    std::string guess;                  // IPv6: asked where nothing else is known
    std::string guessNetif;
    std::optional<RadioFigures> radio;
    int inquiries = 0;
    int64_t nextInquiry = 0;
    bool vendorAsked = false;
    int64_t writesSince = 0;
    int writes = 0;
  };

  Record *Get(const std::string &mac, const Moment &now);
  void NoteGuess(const DeviceNeighbour &neighbour, const Moment &now);
  void See(Record &record, int64_t when);
  void Place(Record &record, const std::string &netif, const std::string &ip, int64_t when);
  void SetFinding(Record &record, Source source, const Finding &finding);
  void NoteStation(const WifiStation &station, const Moment &now);
  void Erase(const std::string &mac);
  static bool IsProbeDue(const Record &record, int64_t now);
  static Probe NextProbe(const std::string &mac, Record &record, int64_t now);
  static bool MayWrite(Record &record, int64_t now);

  std::string ownName_;
  std::unordered_map<std::string, Record> records_;     // by MAC address
  std::unordered_map<std::string, std::string> places_; // "NETIF IP" to MAC address
  int64_t minute_ = 0;                                  // when the counting of new devices began
  int newInMinute_ = 0;
};

} // namespace vornhost

#endif
