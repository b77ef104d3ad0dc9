// One client device, as the scanner learns of it and the store keeps it.
#ifndef HOST_DEVICES_DEVICE_H
#define HOST_DEVICES_DEVICE_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace vornhost {

/// Where knowledge of a device comes from.
enum class Source : uint8_t { kArp, kDhcp, kMdns, kUpnp, kNetbios, kWifi };

constexpr size_t kSourceCount = 6;

/// In the order of Source.
constexpr std::array<std::string_view, kSourceCount> kSourceNames = {"arp", "dhcp", "mdns", "upnp", "netbios", "wifi"};

constexpr unsigned BitOf(Source source) {
  return 1U << static_cast<unsigned>(source);
}

/// No home has more. Of more, those that were not seen for the longest time, and that have no name of the owner's, are
/// forgotten.
constexpr size_t kDeviceLimit = 4096;

/// A device that was seen no longer ago is online.
constexpr int64_t kOnlineSeconds = 60;

/// What one source says of a device. Clean texts; empty: nothing.
struct Finding {
  std::string name;
  std::string type; ///< such as "Printer", "Network Camera", "Media Player", "nas", "computer"
  std::string model;

  bool IsEmpty() const { return name.empty() && type.empty() && model.empty(); }
  bool operator==(const Finding &) const = default;
};

/// The facts that last. Whether the device is there now is none of them (PresenceFile).
struct Device {
  std::string mac;          ///< as ParseDeviceMac gives it
  std::string ip;           ///< IPv4, checked; empty: none
  std::string netif;        ///< the bridge, or the wireless network, where it was seen last
  std::string connection;   ///< "ethernet" or "wifi"
  std::string manufacturer; ///< clean; empty: not known
  unsigned sources = 0;     ///< BitOf(...) of each source that has seen it
  int64_t lastSeen = 0;     ///< seconds since 1970, as of when it was last written; 0: never
  std::array<Finding, kSourceCount> findings;

  bool operator==(const Device &) const = default;
};

/// What the owner says of a device.
struct OwnerEntry {
  std::string name;
  std::string type;
};

} // namespace vornhost

#endif
