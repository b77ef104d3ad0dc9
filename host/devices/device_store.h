// The devices on disk: /var/lib/vorn/devices.db, an SQLite database in WAL mode.
//
// Its writers are the scanner, which writes what it found, and the owner's edits, which come from any process. They
// have tables of their own: no finding ever touches the owner's name and type. An edit is durable when the call
// returns; a finding survives the writer's death at once and the machine's within seconds, and is found again
// otherwise.
//
//   device   a row a device          finding  a row a device and source          owner  a row a device that was edited
#ifndef HOST_DEVICES_DEVICE_STORE_H
#define HOST_DEVICES_DEVICE_STORE_H

#include "host/devices/database.h"
#include "host/devices/device.h"

#include <map>
#include <string>
#include <vector>

namespace vornhost {

constexpr char kStateFolder[] = "/var/lib/vorn";            // mode 0700
constexpr char kDeviceStore[] = "/var/lib/vorn/devices.db"; // mode 0600

/// One connection; it belongs to one thread at a time. Operations throw DatabaseError.
class DeviceStore {
public:
  /// Makes the store when there is none.
  DeviceStore();

  std::vector<Device> Devices();
  std::map<std::string, OwnerEntry> OwnerEntries();
  int64_t DataVersion() { return database_.DataVersion(); }

  /// Writes findings, all or none. Forgotten devices lose nothing of the owner's.
  void Write(const std::vector<Device> &changed, const std::vector<std::string> &forgotten);

  /// Keeps the owner's name and type, durably.
  /// @return false when there are as many as devices can be
  bool SetOwner(const std::string &mac, const OwnerEntry &entry);

  /// Forgets a device and what the owner said of it, durably.
  /// @return false when neither was there
  bool Forget(const std::string &mac);

private:
  void Prepare();

  Database database_;
};

} // namespace vornhost

#endif
