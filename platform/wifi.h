// The wireless daemon and the operating topology.
//
// Topology texts: "router" (WAN port of its own, LAN behind it), "bridge" (every port in one bridge, another router
// serves the network), "client" (a station of another wireless network is the way out).
#ifndef PLATFORM_WIFI_H
#define PLATFORM_WIFI_H

#include <json/value.h>

#include <string>

namespace vornwireless::dbus {

/// Client of the wireless daemon "vornwifid". A client is cheap, lives on the stack for one call and belongs to one
/// thread; several clients may be used at once.
class WifiClient {
public:
  WifiClient();
  ~WifiClient();
  WifiClient(const WifiClient &) = delete;
  WifiClient &operator=(const WifiClient &) = delete;

  /// @return true when the daemon side can take calls
  bool IsServerReady();

  /// @param[out] adapters  array of adapter names (interface names), sorted; empty when there is no adapter
  /// @retval >=0  done
  /// @retval <0   cannot be read
  int GetAdapterList(Json::Value &adapters);

  /// @param[in]  adapter  an adapter's name
  /// @param[out] config   object: the adapter's whole configuration; among its members "enabled", "guest_enabled"
  ///                      (booleans: the network is on the air now), "mac_filter_policy" (text), "mac_filter_list"
  ///                      (array)
  /// @retval >=0  done
  /// @retval <0   no such adapter, or its configuration cannot be read
  int GetAdapterConfig(const std::string &adapter, Json::Value &config);

  /// Writes an adapter's whole configuration and applies it. "enabled" and "guest_enabled" tell what is and are passed
  /// over. "mac_filter_policy" is "disable" (everyone may connect), "allow" (only the list's entries) or "deny" (all
  /// but them), for the main and the guest network; an entry is an object: "mac" (a station's MAC address), "desc" (a
  /// text or null), "mac_filter_enabled" (a boolean; null or missing: true). A station that the filter forbids loses
  /// its connection at once. Waits for the daemon at most 4 seconds: 2 for the change, 2 to take it back when it fails.
  /// @retval >=0  stored, durably, and applied
  /// @retval <0   no such adapter, a value that is not acceptable or a daemon that does not answer (nothing is
  /// changed),
  ///              or it could not be applied (what is stored is as it was; the daemon too, if it lets itself be told)
  int ApplyAdapter(const std::string &adapter, const Json::Value &config);

  /// The stations of one wireless network.
  /// @param[in]  network   an adapter's name for its main network, "g" + that name for its guest network
  /// @param[out] stations  array of objects: "mac" (lower case, colons) and, where known, "ip", "hostname",
  ///                       "signalstrength" (dBm), "transferRX" and "transferTX" (bytes that the station received
  ///                       and sent since it associated), "asso_time" (when it was last seen associated, local time as
  ///                       "%T %Y/%m/%d"). An "ip" is always an IPv4 address, dotted decimal. Only stations that were
  ///                       let in.
  /// @retval >=0  done
  /// @retval <0   no such network, or the daemon gives no whole list within 2 seconds
  int GetConnectionList(const std::string &network, Json::Value &stations);

  /// Switches the operating topology and waits for the end of the switch. While it runs, "/tmp/topology.lock" exists.
  /// @param[in] target  a topology text
  /// @retval >=0  the network is in the topology `target` (also when it was before)
  /// @retval <0   unknown topology, one that this device cannot have, a switch already under way, or a step failed: the
  ///              network is as it was, and the cause is in the system log
  int SwitchTopology(const std::string &target);
};

} // namespace vornwireless::dbus

/// Facts of the device. Each may be called from several threads at once.
namespace vornwireless::wifi::utils {

/// @param[out] topology  the topology that the network is in now
/// @retval >=0  done
/// @retval <0   the network is in none; `topology` is left as it was
int GetTopologyString(std::string &topology);

/// @param[out] mode  the topologies that this device can have, joined with commas, such as "router,bridge"
/// @retval >=0  done
/// @retval <0   cannot be read
int GetSupportedMode(std::string &mode);

/// @return whether the topology of this device can be changed at all
bool IsSupportTopology();

/// @return whether a USB wireless adapter is present
bool HasWifiDongle();

} // namespace vornwireless::wifi::utils

namespace vornwireless::utils {

/// An IPv4 or IPv6 address, or none. A plain value.
class IPAddress {
public:
  IPAddress();
  /// Takes over `text`; one that is no address (dotted decimal of four parts, or RFC 4291 section 2.2 without a zone)
  /// makes the value invalid, and is kept as text.
  IPAddress &operator=(const std::string &text);

  /// @return AF_INET, AF_INET6, or AF_UNSPEC when the text is no address
  int GetFamily() const;
  bool IsValid() const;
  /// @return the text as it was assigned
  const std::string &GetText() const;
  /// @return the address in network order, 4 or 16 bytes; null when the value is invalid. Valid as long as the value is
  ///         neither changed nor destroyed.
  const unsigned char *GetBytes() const;

private:
  std::string text_;
  int family_ = 0;
  unsigned char bytes_[16] = {};
};

} // namespace vornwireless::utils

#endif
