#!/usr/bin/env bash
# Runs as root in the emulator. Six radios: the access point's, three stations', each in a network namespace of its own, the
# router's second one, and that of a network outside. The router is the real one: hostapd with the example configuration,
# dnsmasq, the topology's program, the scanner, the server with the module.
. "${BASH_SOURCE[0]%/*}/frame.sh"

need "the router comes up" prepare_router
need "hostapd has both networks on the air" start_hostapd
need "the server answers" start_server
start_scanner

check "without stations both lists are empty" same "[]/[]" "$(stations wlan0)/$(stations gwlan0)"
check "both networks are told to be on" same "true true" "$(probe config wlan0 | jq -r '"\(.enabled) \(.guest_enabled)"')"

need "the phone joins the home" join "$PHONE" home change-this-1 wlan0
need "the laptop joins the home" join "$LAPTOP" home change-this-1 wlan0
need "the tablet joins the guests" join "$TABLET" guests change-this-2 gwlan0
for station in "$PHONE" "$LAPTOP"; do
  check "$station has an address by DHCP" take_address "$station" '192\.168\.1\.'
done
check "the guest too" take_address "$TABLET" '192\.168\.2\.'

check "the home's list has both, and no guest" same "$(macs_of "$PHONE" "$LAPTOP")" "$(listed wlan0)"
check "the guest is in the guest network's list" same "$(macs_of "$TABLET")" "$(listed gwlan0)"
check "the phone with its signal, traffic, address, name and time" told_whole wlan0 "$PHONE" '192\.168\.1\.'
check "the guest too" told_whole gwlan0 "$TABLET" '192\.168\.2\.'
before=$(member_of wlan0 "$PHONE" transferTX)
check "pings through the air" reaches "$PHONE" 192.168.1.1
check "are counted" test "$(member_of wlan0 "$PHONE" transferTX)" -gt "$before"
check "the API counts three devices, two at home, one guest" eventually 30 are_counted 3 2 1
check "lists them as they are now" lists_stations
check "keeps those of the home" eventually 20 store_lists local lbr0 "$PHONE" "$LAPTOP"
check "and the guest" eventually 20 store_lists guest gbr0 "$TABLET"
check "and all" eventually 20 store_lists all 'gbr0 lbr0' "$PHONE" "$LAPTOP" "$TABLET"
check "a station with a wrong key is not listed" wrong_key_is_not_listed

filter='[{"mac":"02:00:00:00:01:00","desc":"phone","mac_filter_enabled":true}]'
need "the phone is denied" set_filter deny "$filter"
check "it loses its link" eventually 5 not is_linked "$PHONE"
check "and is not listed any more" same "$(macs_of "$LAPTOP")" "$(listed wlan0)"
check "it cannot associate again" is_rejected "$PHONE"
check "the laptop has kept its link" has_kept_link "$LAPTOP"
check "the guest too" has_kept_link "$TABLET"
check "what was set is what get tells" filter_is deny "$filter"

bad='[{"mac":"01:00:5e:00:00:01","desc":"","mac_filter_enabled":true}]'
check "a group address is refused" not set_filter deny "$bad"
check "a policy that is none is refused" not set_filter reject "$filter"
check "and the filter is as it was" filter_is deny "$filter"

need "everything is started again" restart_everything
check "what was set is what get tells" filter_is deny "$filter"
check "the laptop comes back" rejoins "$LAPTOP" wlan0
check "the phone is still kept out" is_rejected "$PHONE"
check "the laptop alone is listed" same "$(macs_of "$LAPTOP")" "$(listed wlan0)"

need "only the phone is allowed" set_filter allow "$filter"
check "the laptop loses its link" eventually 5 not is_linked "$LAPTOP"
check "the guest, in the guest network, too" eventually 5 not is_linked "$TABLET"
check "the phone comes in" rejoins "$PHONE" wlan0
check "the laptop does not" is_rejected "$LAPTOP"
check "nor does the guest" is_rejected "$TABLET"
check "the phone alone is listed" same "$(macs_of "$PHONE")/" "$(listed wlan0)/$(listed gwlan0)"

: >"$work/supplicant$PHONE.log"
both='[{"mac":"02:00:00:00:01:00","desc":"","mac_filter_enabled":true},{"mac":"02:00:00:00:02:00","desc":"","mac_filter_enabled":true}]'
need "the laptop is allowed too" set_filter allow "$both"
check "the phone has kept its link" has_kept_link "$PHONE"
check "the laptop comes in" rejoins "$LAPTOP" wlan0
need "and is not any more" set_filter allow "$filter"
check "it loses its link" eventually 5 not is_linked "$LAPTOP"
check "the phone has kept its link" has_kept_link "$PHONE"

need "no list is complete" hostapd_cli -p /run/hostapd -i wlan0 set macaddr_acl 2
check "who is in none does not come in" is_rejected "$LAPTOP"
check "who is in has kept its link" has_kept_link "$PHONE"

off='[{"mac":"02:00:00:00:01:00","desc":"phone","mac_filter_enabled":false}]'
need "an entry that is off permits nobody" set_filter allow "$off"
check "the phone loses its link" eventually 5 not is_linked "$PHONE"

need "the filter is switched off" set_filter disable "$filter"
check "the phone comes back" rejoins "$PHONE" wlan0
check "the laptop comes back" rejoins "$LAPTOP" wlan0
check "the guest comes back" rejoins "$TABLET" gwlan0

need "there is a network outside" start_outside
before=$(network)
check "without a configuration the router can be router and bridge" same router,bridge "$(modes)"
check "a client it cannot be, and says why" is_refused client "no upstream network is configured"
configure_upstream wrong-secret-9
chmod 644 "$upstream"
check "a key that others can read is no configuration" same router,bridge "$(modes)"
check "and says why" is_refused client "$upstream: its configuration must be a file that root owns"
chmod 600 "$upstream"
mv "$upstream" "${upstream/$UPLINK/wlan0}"
check "the access point's radio joins nobody" is_refused client "/etc/vorn/wireless/wlan0.upstream: its radio is an access"
mv "${upstream/$UPLINK/wlan0}" "$upstream"
check "with a configuration and a radio it can be client too" same router,bridge,client "$(modes)"
check "with a wrong key the switch fails" fails_to_switch_to client "is the key right?"
check "and is undone" unchanged
configure_upstream outside-key-1
stop_serving outside
check "without an address from outside the switch fails" fails_to_switch_to client "no DHCP lease on $UPLINK"
check "and is undone" unchanged
use_outside_network 192.168.1
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
check "the guest does not: it is somebody's home" not reaches "$TABLET" 10.77.0.1
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

kill -STOP "$hostapd"
start=$SECONDS
check "a hostapd that hangs gives no list" gives_no_list wlan0
check "and holds nobody up" test $((SECONDS - start)) -le 4
kill -CONT "$hostapd"
check "no sanitizer has something to say" not grep -hE 'Sanitizer|runtime error' "$work"/*.log
finish
