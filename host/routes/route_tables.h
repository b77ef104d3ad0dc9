// The names of the kernel's routing tables.
#ifndef HOST_ROUTES_ROUTE_TABLES_H
#define HOST_ROUTES_ROUTE_TABLES_H

#include <cstdint>
#include <map>
#include <string>

namespace vornhost {

/// The tables that have a name, as ip(8) knows them: "main", "default" and "local", then what /etc/iproute2/rt_tables
/// and the *.conf files in rt_tables.d beside it say, in the order of their names; of two names of a table the last
/// counts. A line that is none is passed over, and so is table 0, which stands for all of them.
std::map<uint32_t, std::string> ReadRouteTables();

} // namespace vornhost

#endif
