// What rc.network does: the kernel's port forwards are made what the rule file and the DMZ file say.
#ifndef HOST_PORTFORWARD_DNAT_H
#define HOST_PORTFORWARD_DNAT_H

#include <ostream>

namespace vornhost {

/// Reads the files, replaces the table in one transaction, and ends the connections that are forwarded no more. Calls
/// take turns across processes, and each reads the files in its turn: the last one installs what stands in them.
/// Repeating it is harmless.
/// @return false, with the cause in the system log, when a file cannot be read or the kernel refuses; the table is then
/// as
///         it was
bool StartDnat();

/// Writes what is installed, what is left out and why, held against the kernel's table.
/// @return whether the table is what the files say
bool ShowDnatStatus(std::ostream &out);

} // namespace vornhost

#endif
