// Client of the network daemon: the device store and the gateway records.
//
// A client is cheap, lives on the stack for one call and belongs to one thread; several clients may be used at once.
#ifndef PLATFORM_NETCLIENT_H
#define PLATFORM_NETCLIENT_H

#include <json/value.h>

#include <string>

namespace vornnetwork::dbus {

class NetClient {
public:
  NetClient();
  ~NetClient();
  NetClient(const NetClient &) = delete;
  NetClient &operator=(const NetClient &) = delete;

  /// The devices that a kind of scanner has seen.
  /// @param[in]  scannerType  "all", or one source: "arp", "dhcp", "mdns", "upnp", "netbios", "wifi"
  /// @param[out] result       object; its member "ClientList" is an array of device entries. Members of an entry, each
  ///                          left out when unknown: "macAddr" (lower case, colons), "asso_time" (local time,
  ///                          "%T %Y/%m/%d"), "ipAddr", "userdef_displayName", "displayName", "userdef_deviceType",
  ///                          "deviceType", "manufacturer", "modelName", "connection" ("ethernet" or "wifi"), "netif",
  ///                          "transferRX", "transferTX" (bytes), "signalstrength" (number)
  /// @retval 0         done
  /// @retval non-zero  unknown scanner type, or the store cannot be read; `result` is left as it was
  int GetDeviceListData(const std::string &scannerType, Json::Value &result);

  /// Stores a user's name and type with a device. Repeating it is harmless.
  /// @param[in] record  object of three texts: "macAddr", "userdef_displayName", "userdef_deviceType"
  /// @retval 0         stored, durably
  /// @retval non-zero  no MAC address, a text that cannot be kept, or the store cannot be written; nothing is changed
  int SetDeviceListData(const Json::Value &record);

  /// Forgets a device, with the name and the type that a user gave it.
  /// @param[in] mac  its MAC address; letter case and separator do not matter
  /// @retval 0         forgotten
  /// @retval non-zero  no such device, no MAC address, or the store cannot be written
  int DelDeviceListData(const std::string &mac);

  /// @param[in]  request  object with "type": "GTYPE_V4" or "GTYPE_V6"; null: both families
  /// @param[out] list     array of gateway records in order of priority
  /// @retval >=0  done
  /// @retval <0   unknown type, or the records cannot be read
  int GetGatewayListData(const Json::Value &request, Json::Value &list);

  /// Stores one gateway record; one that exists for the same type and interface is replaced, and those from its place
  /// on move back. Of two who store an order at once neither is refused; the last to speak of an interface is right.
  /// @param[in] record  object: "type", "priority" (0 = first), "ifname", "gateway", "dns"; the text "NULL" in the last
  ///                    two means: as the interface's own configuration says
  /// @retval >=0  stored
  /// @retval <0   unknown type; no name of an interface that routes may name; a priority that is no number, behind the
  ///              end of the order, or no place in the longest order (64); a "gateway" or "dns" other than "NULL"; or
  ///              the records cannot be written. The records are as they were, and as no refresh may follow, the
  ///              kernel's default routes are made to agree with them. The log says which it was.
  int AddGatewayData(const Json::Value &record);

  /// Makes the kernel's default routes agree with the stored records. An interface whose link came back a moment ago is
  /// left behind the others.
  /// @param[in] request  object with "type", as above
  /// @retval >=0  done
  /// @retval <0   unknown type, or the kernel refused; the routes are as before
  int RefreshGateway(const Json::Value &request);
};

} // namespace vornnetwork::dbus

#endif
