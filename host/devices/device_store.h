// The devices on disk: /var/lib/vorn/devices.db, an SQLite database in WAL mode.
//
// Its writers are the scanner, which writes what it found, and the owner's edits, which come from any process. They
// have tables of their own: no finding ever touches the owner's name and type. An edit is durable when the call
// returns; a finding survives the writer's death at once and the machine's within seconds, and is found again
// otherwise.
//
// A store that is damaged is put aside by whoever opens it, and a new one begun with what can be read of it; see
// damaged_store.h. To open it, to edit it and to put it aside are done in turn (a lock file), so no edit goes into a
// store that is on its way out, and no connection takes one store's journal for another's.
//
//   device   a row a device          finding  a row a device and source          owner  a row a device that was edited
#ifndef HOST_DEVICES_DEVICE_STORE_H
#define HOST_DEVICES_DEVICE_STORE_H

#include "host/devices/database.h"
#include "host/devices/device.h"
#include "host/utility/unique_fd.h"

#include <sys/stat.h>

#include <map>
#include <string>
#include <vector>

namespace vornhost {

constexpr char kStateFolder[] = "/var/lib/vorn";            // mode 0700
constexpr char kDeviceStore[] = "/var/lib/vorn/devices.db"; // mode 0600

/// One connection; it belongs to one thread at a time. Operations throw DatabaseError; DamagedDatabase says that the
/// store has been damaged since, and opening it anew helps.
class DeviceStore {
public:
  /// Makes the store when there is none. A link in its place, what is no file and what is somebody else's is refused.
  DeviceStore();

  /// Whether the file at the store's path is still the one that this connection has.
  bool IsCurrent() const;

  /// Rows that no device can have, by a damage that SQLite does not see, are passed over; so are owner's entries.
  std::vector<Device> Devices();
  std::map<std::string, OwnerEntry> OwnerEntries();
  int64_t DataVersion() { return opened_.database.DataVersion(); }

  /// Writes findings, all or none. Forgotten devices lose nothing of the owner's.
  void Write(const std::vector<Device> &changed, const std::vector<std::string> &forgotten);

  /// Keeps the owner's name and type, durably.
  /// @return false when there are as many as devices can be
  bool SetOwner(const std::string &mac, const OwnerEntry &entry);

  /// Forgets a device and what the owner said of it, durably.
  /// @return false when neither was there
  bool Forget(const std::string &mac);

private:
  struct Opened {
    Database database;
    dev_t device; // of the file
    ino_t node;
  };

  static Opened Open();
  static Opened OpenInTurn();
  UniqueFd TakeTurnForEdit();

  Opened opened_;
};

} // namespace vornhost

#endif
