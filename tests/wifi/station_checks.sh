#!/usr/bin/env bash
# Runs as root in the emulator: stations, the MAC filter, and switches to "client" that fail. Six radios: the access point's, three stations', each in a network namespace of its own, the
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
need "begins to list them as they are now" begins_to_list
check "keeps those of the home" eventually 20 store_lists local lbr0 "$PHONE" "$LAPTOP"
check "and the guest" eventually 20 store_lists guest gbr0 "$TABLET"
check "and all" eventually 20 store_lists all 'gbr0 lbr0' "$PHONE" "$LAPTOP" "$TABLET"
check "a station with a wrong key is not listed" wrong_key_is_not_listed

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
need "a switch with a wrong key begins" begins_to_switch_to client

# Switches that fail take their time, and the home goes on meanwhile.
filter='[{"mac":"02:00:00:00:01:00","desc":"phone","mac_filter_enabled":true}]'
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

check "with a wrong key the switch has failed" has_failed_to_switch_to client "is the key right?"
check "and is undone" unchanged
check "the list is whole, as it was when it was asked for" eventually 60 lists_stations

configure_upstream outside-key-1
stop_serving outside

need "a switch begins to a network without a DHCP server" begins_to_switch_to client
: >"$work/supplicant$LAPTOP.log"
: >"$work/supplicant$TABLET.log"
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

check "without an address from outside the switch has failed" has_failed_to_switch_to client "no DHCP lease on $UPLINK"
check "and is undone" unchanged

need "everything is started again" restart_everything
check "what was set is what get tells" filter_is deny "$filter"
check "the laptop comes back" rejoins "$LAPTOP" wlan0
check "the phone is still kept out" is_rejected "$PHONE"
check "the laptop alone is listed" same "$(macs_of "$LAPTOP")" "$(listed wlan0)"

need "the filter is switched off again" set_filter disable "$filter"
check "the phone comes back" rejoins "$PHONE" wlan0
check "the laptop comes back" rejoins "$LAPTOP" wlan0
check "the guest comes back" rejoins "$TABLET" gwlan0

kill -STOP "$hostapd"
start=$SECONDS
check "a hostapd that hangs gives no list" gives_no_list wlan0
check "and holds nobody up" test $((SECONDS - start)) -le 4
kill -CONT "$hostapd"
check "no sanitizer has something to say" not grep -hE 'Sanitizer|runtime error' "$work"/*.log
finish
