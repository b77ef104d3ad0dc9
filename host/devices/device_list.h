// The device list as the contract gives it: store, owner's entries and presence put together.
#ifndef HOST_DEVICES_DEVICE_LIST_H
#define HOST_DEVICES_DEVICE_LIST_H

#include "host/devices/device.h"
#include "host/devices/presence_file.h"

#include <json/value.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace vornhost {

/// The store's content as of one moment.
struct StoredDevices {
  std::vector<Device> devices; ///< by MAC address
  std::map<std::string, OwnerEntry> owner;
};

struct Moment {
  int64_t wall = 0; ///< seconds since 1970
  int64_t boot = 0; ///< BootMillis
};

/// The sources that a scanner type of the contract stands for: a bit each; 0 for an unknown type.
unsigned SourcesOf(const std::string &scannerType);

/// The array "ClientList" of the devices that one of the sources has seen. A single source gives the names that it has
/// found itself where it has some; otherwise, and with "all", the best that any has found. Devices that only the owner
/// has named belong to "all".
Json::Value RenderDevices(const StoredDevices &stored, const PresenceMap &presence, unsigned sources,
                          const Moment &now);

/// What is now in the store. It is read again only when it has changed; any thread may ask.
/// @throws DatabaseError
std::shared_ptr<const StoredDevices> CurrentDevices();

/// The same list of what is in the store and in the presence file now, empty when there is none. It is made again only
/// when one of them, the clock or the time zone has changed; any thread may ask.
/// @throws DatabaseError
std::shared_ptr<const Json::Value> CurrentList(unsigned sources);

} // namespace vornhost

#endif
