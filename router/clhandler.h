// Client devices from the network daemon's device store: listed, counted, named and forgotten.
#ifndef ROUTER_CLHANDLER_H
#define ROUTER_CLHANDLER_H

#include "router/export.h"

#include <json/value.h>

#include <string>
#include <vector>

/// One object serves one request. The members that return an integer give 0 on success and -1 on failure.
class ROUTER_EXPORT ConnectionListHandler {
public:
  ConnectionListHandler();
  ~ConnectionListHandler();

  /// @param[in]  scannerType  a scanner type of the network daemon
  /// @param[out] result       object: "stations", the records of what that scanner knows; an empty array when the
  ///                          daemon's list is none, untouched when it cannot be had
  int GetScannerData(const std::string &scannerType, Json::Value &result);

  /// @param[in]     entries   the daemon's device list: an array, or anything empty
  /// @param[in,out] stations  one record an entry is appended, none is skipped; made an array first when it is none
  int ValueMapping(Json::Value entries, Json::Value &stations);

  /// @return the name to show for an entry of the device list: the user's, else the scanners', else a fixed one
  std::string GetHostName(const Json::Value &entry);

  /// @return the device type of an entry, one of seven texts: by what the user says, else by what the scanners say
  std::string GetDeviceType(const Json::Value &entry);

  /// @param[in] assoTime  local time as "%T %Y/%m/%d"
  /// @return whether that is at most 60 seconds ago, or yet to come
  bool IsOnline(const std::string &assoTime);

  /// Gives a device its owner's name and type; both are stored as they are.
  int SetDevice(const std::string &mac, const std::string &displayName, const std::string &deviceType);
  /// Has the daemon forget a device.
  int DelDevice(const std::string &mac);

  // A net range is "all", "local" (not on a guest interface, and in the subnet of a bridge) or "guest" (on an interface
  // with a "g" in its name). To any other text no station belongs.

  /// @param[out] result  object: "devicecount", how many stations of the net range are online; untouched on failure
  int GetOnlineDeviceNumber(const std::string &scannerType, const std::string &netRange, Json::Value &result);
  /// @param[in] data  object: "stations"
  unsigned CountOnlineDevice(const std::string &netRange, const Json::Value &data);

  /// @param[out] result  object: "stations", those of the net range, online or not; untouched on failure
  int GetList(const std::string &scannerType, const std::string &netRange, Json::Value &result);
  /// @param[in]  data    object: "stations"
  /// @param[out] result  object: "stations", those of the net range in their order
  void FilterNetRange(Json::Value data, const std::string &netRange, Json::Value &result);

  /// Appends address and netmask of every interface with a "br" in its name to the lists of IsMatchAnyBridge.
  int GetAllBridgeIP();
  /// @return whether an address lies in the subnet of a bridge; one that is not known yet (empty) does
  bool IsMatchAnyBridge(const std::string &ip);

private:
  std::vector<std::string> bridgeAddresses_; // IPv4, dotted decimal
  std::vector<std::string> bridgeNetmasks_;  // of the same interfaces, in the same order
};

#endif
