// The files that the connection list opens itself, put in place in the test's private view.
#ifndef TESTS_ROUTER_NETWORK_FILES_H
#define TESTS_ROUTER_NETWORK_FILES_H

#include <string>
#include <vector>

namespace scripted {

inline const std::string kNeighbourTitle =
    "IP address       HW type     Flags       HW address            Mask     Device\n";

/// A complete line of the kernel's table.
std::string NeighbourLine(const std::string &ip, const std::string &mac, const std::string &netif,
                          const std::string &flags = "0x2");

/// Makes "/proc/net/arp" say this.
void PutNeighbours(const std::string &text);
/// Makes "/proc/net" an empty folder.
void RemoveNeighbours();

/// Puts a program in the place of nmblookup that prints what PutNetBiosReply gave it and notes its arguments.
void PutNmblookup();
/// @param[in] text  what it prints for `-A ip`
void PutNetBiosReply(const std::string &ip, const std::string &text);
/// @return its arguments, a line a call; what was noted is forgotten
std::vector<std::string> TakeNmblookupCalls();

inline const std::string kNameFile = "/tmp/connectionlist.txt";
void PutNameFile(const std::string &text);
/// @return what the file says; empty when there is none
std::string ReadNameFile();
void RemoveNameFile();

} // namespace scripted

#endif
