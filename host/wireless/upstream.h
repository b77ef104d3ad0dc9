// The wireless network outside that the router joins in "client" topology.
//
// Each file /etc/vorn/wireless/<interface>.upstream is the configuration of wpa_supplicant (wpa_supplicant.conf(5)) for
// one interface: the network's name and key, and that this interface is the one to join it over. It holds a key, and
// could name a library for wpa_supplicant to load: it must be root's, and nobody else may read or write it.
#ifndef HOST_WIRELESS_UPSTREAM_H
#define HOST_WIRELESS_UPSTREAM_H

#include <string>

namespace vornhost {

std::string UpstreamFileOf(const std::string &interface);

/// The interface that "client" topology would join a network over: the first by name that is configured and can. Its
/// radio must be able to be a station and have no access point of ours: hostapd's channel and the channel outside would
/// be at odds, and taking the access point down would lock out an owner who has no cable.
/// @param[out] why  in words when there is none
/// @return its name; empty when there is none
std::string FindUpstream(std::string &why);

/// @return the interface over which the router has joined a network, or was about to; empty when there is none here
std::string JoinedUpstream();

} // namespace vornhost

#endif
