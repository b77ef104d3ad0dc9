// Port forwarding: the rules, the DMZ host, and the LAN interfaces that both may point into.
#ifndef ROUTER_PORTFORWARD_H
#define ROUTER_PORTFORWARD_H

#include "platform/portforward.h"
#include "router/export.h"

#include <json/value.h>

/// Makes the record of one rule.
/// @param[in] rule   object: "enabled" (boolean) and the texts "service", "sourcePort", "protocol", "targetIP",
///                   "targetPort"
/// @param[in] index  its place in the list, which becomes the record's name
/// @return a new record, the caller's to free with VORNPFConfFree; null when a text is missing, is no text or cannot be
///         kept whole, or there is no memory
ROUTER_EXPORT VORNPFRecord *CreateRuleRecord(const Json::Value &rule, int index);

class ROUTER_EXPORT PortForward {
public:
  PortForward();
  ~PortForward();

  /// @param[out] out  object: "rules", an array in the order of the rule file; empty when that cannot be read
  /// @return true
  bool GetPortForward(Json::Value &out);
  bool LoadData(Json::Value &out);
  /// @param[out] rules  the array
  bool LoadRules(Json::Value &rules);

  /// Replaces every rule and rebuilds the firewall's address translation.
  /// @param[in] data  object with "rules", an array
  /// @return false when nothing was written, or the rules were written but could not be applied
  bool SetPortForward(Json::Value &data);
  bool ApplyRules(const Json::Value &data);

  /// @param[out] out  object: "ip", left out when no LAN subnet holds it, and "enable"; null when there is no DMZ file
  /// @return true
  bool GetDMZ(Json::Value &out);
  bool LoadDmz(Json::Value &out);

  /// Switches the DMZ off, or on with a host, and rebuilds the firewall's address translation.
  /// @param[in] data  object: "enable" and, to switch on, "ip"
  bool SetDMZ(Json::Value &data);
  bool ApplyDmz(const Json::Value &data);
  /// @return whether one of the LAN interfaces has `ip` in its subnet
  bool IsValidDmzIp(const char *ip);

  /// @param[out] out  object: "local_lan", an array of objects "netif", "ip", "mask"
  /// @return false when there is no LAN interface
  bool GetLocalLan(Json::Value &out);
};

#endif
