// The nftables table of the port forwards, as text for nft(8).
//
// Table "ip vorn_dnat":
//   prerouting   what comes for one of the router's addresses that is no LAN's goes to "inbound", whichever side it
//   comes
//                from: a LAN device reaches a forwarded service by the WAN address too
//   inbound      the forwards by protocol, then the DMZ host for what is left but the router's own: ICMP, management
//   ports, DHCP postrouting  a forwarded connection that stays within one LAN gets the router's address, so that the
//   answers come
//                back through the router
//   forward      ends what a removed forward had open, see below
// "vorn_base" lets translated connections through.
//
// When a connection's tracking entry is deleted, the next packet of the LAN host would open an outgoing one in its
// place, and the outside host's packets would be taken for its answers: with the same port number on both sides the
// removed forward would live on. So the set "cut" holds the LAN host's side of each deleted connection; what goes out
// from there anew is reset or dropped until it has been silent for five minutes. A port that is forwarded again is not
// concerned: the host's packets are answers then. The set outlives the rules' replacement.
#ifndef HOST_PORTFORWARD_TABLE_TEXT_H
#define HOST_PORTFORWARD_TABLE_TEXT_H

#include "host/portforward/plan.h"

#include <set>
#include <string>
#include <vector>

namespace vornhost {

/// Replaces every rule of the table, and makes it when it is not there. One transaction for nft.
std::string RenderTable(const Plan &plan);

/// The comment by which a forward's rule for one protocol is known in the table.
std::string RuleComment(size_t number, const Forward &forward, const char *protocol);
std::string DmzComment(const Plan &plan);

/// The comments of the installed rules: as many as the plan has forwards, one for each protocol, and one for the DMZ.
std::set<std::string> RuleComments(const Plan &plan);

/// One side of a connection, from a LAN host's port.
struct CutFlow {
  uint32_t source = 0; ///< in host order
  int protocol = 0;    ///< IPPROTO_TCP or IPPROTO_UDP
  uint16_t sourcePort = 0;
  uint32_t destination = 0;
  uint16_t destinationPort = 0;
};

/// Adds to the set "cut". REQUIRES: `flows` is not empty.
std::string RenderCuts(const std::vector<CutFlow> &flows);

} // namespace vornhost

#endif
