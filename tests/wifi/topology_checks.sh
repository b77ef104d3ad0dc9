#!/usr/bin/env bash
# Runs as root in the emulator, with the same router, stations and networks outside as station_checks.sh: the switches between
# all topologies, seen by stations that keep their links.
. "${BASH_SOURCE[0]%/*}/frame.sh"

need "the router comes up" prepare_router
need "hostapd has both networks on the air" start_hostapd
need "the server answers" start_server
start_scanner
need "the phone joins the home" join "$PHONE" home change-this-1 wlan0
check "it has an address by DHCP" take_address "$PHONE" '192\.168\.1\.'
need "the tablet joins the guests" join "$TABLET" guests change-this-2 gwlan0
check "it has an address too" take_address "$TABLET" '192\.168\.2\.'
need "there is a network outside" start_outside 192.168.1
configure_upstream outside-key-1
before=$(network)

check "into a network with the home's addresses too" fails_to_switch_to client "has the addresses of our own, 192.168.1.1/24"
check "and is undone" unchanged
stop_serving outside
use_outside_network 10.77.0

need "the router becomes a client" switch_to client
check "has an address from outside" has_address "$UPLINK" '10\.77\.0\.'
check "and none from the provider" not has_address eth0 .
check "the WAN port is one of the home's" same lbr0 "$(port_of eth0)"
check "the phone has kept its link" has_kept_link "$PHONE"
check "and reaches the network outside" reaches "$PHONE" 10.77.0.1
check "the guest does not: it is somebody's home" hears_nothing "$TABLET" 10.77.0.1
busybox httpd -p 7777 -h "$work"
check "the home reaches what the router serves" serves in_station "$PHONE" 192.168.1.1
check "the network outside does not" not serves ip netns exec outside "$(address_of "$UPLINK")"
kill -KILL "$(cat /run/vorn/wpa_supplicant.pid)"
check "started again it is a client again" /usr/vorn/sbin/vorntopology start
check "and reaches the network outside" eventually 40 reaches "$PHONE" 10.77.0.1
need "it becomes a bridge" switch_to bridge
check "without a trace of the network outside" not pgrep -f -- '-P /run/vorn/wpa_supplicant.pid'
need "and a client" switch_to client
check "the phone reaches the network outside" reaches "$PHONE" 10.77.0.1
need "and a router again" switch_to router
check "as it was" eventually 10 unchanged

need "the router becomes a bridge" switch_to bridge
check "the phone has kept its link" has_kept_link "$PHONE"
check "and is in the provider's network" is_bridged_to "$PHONE" 203.0.113
check "the access point is in the bridge" same br0 "$(port_of wlan0)"
check "the guests' is where it was" same gbr0 "$(port_of gwlan0)"
check "so it is after the network was off the air" on_air_again
check "for the phone" is_bridged_to "$PHONE" 203.0.113
need "so it is after hostapd was started again" restart_hostapd
check "for the phone" is_bridged_to "$PHONE" 203.0.113
check "the LAN's bridge does not come back" not ip link show lbr0
need "the router is a router again" switch_to router
check "the phone has kept its link" has_kept_link "$PHONE"
check "and is in the home" is_bridged_to "$PHONE" 192.168.1
check "so it is after the network was off the air" on_air_again
check "for the phone" is_bridged_to "$PHONE" 192.168.1
check "and the network is as it was" unchanged
check "no sanitizer has something to say" not grep -hE 'Sanitizer|runtime error' "$work"/*.log
finish
