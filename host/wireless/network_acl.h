// Who may connect to a network, as hostapd is told it: the lines macaddr_acl, accept_mac_file and deny_mac_file of its
// configuration (hostapd.conf(5)), and the requests of the same names on its control socket.
//
// hostapd's rules: who is in an accept list may connect, else who is in a deny list may not, else macaddr_acl decides
// (0: may, 1: may not, 2: a RADIUS server decides; without one, may not). Its configuration is not read again when it
// is told to RELOAD, so that a change of it has to be told in these requests.
#ifndef HOST_WIRELESS_NETWORK_ACL_H
#define HOST_WIRELESS_NETWORK_ACL_H

#include "host/wireless/control_socket.h"

#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

struct NetworkAcl {
  std::string macaddrAcl = "0"; ///< what hostapd takes when there is no line
  std::vector<std::string> acceptFiles;
  std::vector<std::string> denyFiles;
};

/// @param[in] content  of a configuration file
/// @param[in] network  one of those in it
NetworkAcl ParseNetworkAcl(std::string_view content, const std::string &network);

/// hostapd's configuration with the three lines of the filter in every network, in the place of any that were there.
/// @param[in] macaddrAcl  0 or 1
std::string WithFilterLines(std::string_view content, const std::string &acceptFile, const std::string &denyFile,
                            int macaddrAcl);

/// Whether a hostapd is at the other end that takes requests now. What is sent to one that hangs is carried out when it
/// goes on, which nobody knows.
bool Answers(ControlSocket &control);

/// Gives a running hostapd new lists and a new policy in the place of all that it had. Nobody comes in meanwhile who is
/// in no list; nobody is thrown out but those whom the new lists forbid.
/// @return false when it refuses, or does not answer: it has a part of it then, and lets in nobody new who is in no
/// list, or has all of it
bool TellAcl(ControlSocket &control, const NetworkAcl &acl);

/// The last word to a hostapd that did not take a whole TellAcl.
bool TellPolicy(ControlSocket &control, const NetworkAcl &acl);

} // namespace vornhost

#endif
