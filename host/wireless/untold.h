// The debt to a running hostapd: networks that may have a part of a MAC filter, or another one than their files say.
//
// A change notes the networks before it touches anything, and strikes out each one that has the whole of a filter: the
// new one, or the old one after a failure. What is left was told to nobody who answers, or by a process that died. The
// files say what is right, so a note is only a name: an empty file /run/vorn/untold/<network>. A restart of the machine
// needs none, for a hostapd that starts reads its files.
#ifndef HOST_WIRELESS_UNTOLD_H
#define HOST_WIRELESS_UNTOLD_H

#include <string>
#include <vector>

namespace vornhost {

constexpr char kUntoldFolder[] = "/run/vorn/untold";

/// REQUIRES: hostapd's turn. Throws std::runtime_error when a network cannot be noted.
/// @return those that were not noted before
std::vector<std::string> NoteUntold(const std::vector<std::string> &networks);

/// A network that is not noted, or cannot be struck out, is no error: it is told once more.
void StrikeOutUntold(const std::string &network);

/// The networks that are noted, by name.
std::vector<std::string> UntoldNetworks();

/// Gives every noted network whose hostapd answers the lists and the policy that its file says. One without a hostapd,
/// or in no file any more, is struck out. Waits a second for each network that does not answer. Throws
/// std::runtime_error when it cannot have hostapd's turn.
void TellUntold();

} // namespace vornhost

#endif
