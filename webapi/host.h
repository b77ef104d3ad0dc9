// The Host field: a page of another site must not reach this server under a name of its own (DNS rebinding).
#ifndef WEBAPI_HOST_H
#define WEBAPI_HOST_H

#include <string>
#include <string_view>
#include <vector>

namespace vornwebapi {

enum class HostVerdict { kOwn, kForeign, kMalformed };

/// @param[in] value       host or host:port; the port may be any, as a forwarder before the server has its own
/// @param[in] names       names of this server, lower case
/// @param[in] ownAddress  the connection's own address, as text; any loopback address is own too
HostVerdict CheckHostValue(std::string_view value, const std::vector<std::string> &names, std::string_view ownAddress);

} // namespace vornwebapi

#endif
