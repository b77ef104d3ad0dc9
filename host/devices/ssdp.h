// SSDP and the device description of UPnP (UPnP Device Architecture 1.1, sections 1 and 2.3).
#ifndef HOST_DEVICES_SSDP_H
#define HOST_DEVICES_SSDP_H

#include "host/devices/device.h"

#include <optional>
#include <string>
#include <string_view>

namespace vornhost {

/// The search for root devices, an answer each.
std::string SearchMessage();

/// Where a device describes itself: the LOCATION of an answer or an announcement. It counts only when it is plain HTTP
/// on the very host that sent the message: nobody makes the router ask somebody else.
/// @param[in] sender  IPv4 text
std::optional<std::string> ParseLocation(std::string_view message, const std::string &sender);

/// What a description says of its root device.
Finding ParseDescription(std::string_view xml);

} // namespace vornhost

#endif
