// NetBIOS node status (RFC 1002 section 4.2.17 and 4.2.18), UDP port 137.
#ifndef HOST_DEVICES_NODE_STATUS_H
#define HOST_DEVICES_NODE_STATUS_H

#include <cstdint>
#include <string>
#include <string_view>

namespace vornhost {

/// @param[in] id  comes back in the answer
std::string NodeStatusRequest(uint16_t id);

/// The name that a host gives itself: the first active one of its own (no group's), its workstation name (suffix 00)
/// before its file server's (20). What is malformed gives none.
/// @param[in] id  that of the request; another one's answer gives no name
std::string ParseNodeStatus(std::string_view message, uint16_t id);

} // namespace vornhost

#endif
