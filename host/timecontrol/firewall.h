// The table of the time control in the kernel's packet filter, "inet vorn_timecontrol". Nothing else is touched.
//
//   set cut           the devices that are cut now, by MAC address; what the rules say, and what Read gives back
//   set cut4, cut6    the addresses that these devices have: those of the kernel's neighbour table when the table is
//                     loaded, and those that are seen in their packets. A packet on its way to a device does not show
//                     its MAC address yet where it is forwarded, so that this direction is cut by address. An address
//                     stays for longer than a week's schedule can cut without the table being loaded anew.
//   chain learn       keeps cut4 and cut6. An address counts when it is routed back to where the packet came from, so
//                     that a device cannot have a server cut for everybody; another device that uses it takes it out.
//   chain forward     drops what the cut devices send beyond the router and what is sent to them. It comes before the
//                     rules of others, which let open connections pass.
//
// What a device exchanges with the router itself is not forwarded and not touched. The table is loaded whole, in one
// transaction: it is there as it was, or as it is to be.
#ifndef HOST_TIMECONTROL_FIREWALL_H
#define HOST_TIMECONTROL_FIREWALL_H

#include "host/timecontrol/rules.h"

#include <optional>
#include <string>
#include <vector>

namespace vornhost {

/// @param[in] addresses  of the devices, IPv4 and IPv6, as text
/// @return the commands, in nft's language, that put the table in place of one that may be there
std::string RenderTable(const MacSet &cut, const std::vector<std::string> &addresses);

/// @retval 0   the table stands
/// @retval <0  with the cause in the log; the table is as it was
int LoadTable(const MacSet &cut);

/// @return the devices that the kernel cuts; nothing when the table, or a rule of it, is not there
std::optional<MacSet> ReadTable();

/// @retval 0   there is no table any more
/// @retval <0  with the cause in the log
int RemoveTable();

} // namespace vornhost

#endif
