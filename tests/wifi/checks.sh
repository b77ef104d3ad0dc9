#!/usr/bin/env bash
# Runs as root in the emulator. Four radios: the access point's, and three stations each in a network namespace of its own.
# The router is the real one: hostapd with the example configuration, dnsmasq, the server with the module.
set -uo pipefail
export PATH=/usr/sbin:/usr/bin:/sbin:/bin LC_ALL=C

root=$(cd "${BASH_SOURCE[0]%/*}/../.." && pwd -P)
build=${VORN_BUILD:?}
api=127.0.0.1:8080
failures=0
. "$root/lab/lib/look.sh"
. "$root/tests/wifi/radio.sh"

check() { # DESCRIPTION COMMAND...
  local description=$1
  shift
  if "$@"; then
    echo "PASS $description"
  else
    echo "FAIL $description"
    failures=$((failures + 1))
  fi
}

need() { # as check; without it nothing that follows makes sense
  local before=$failures
  check "$@"
  [ "$failures" = "$before" ] || finish
}

finish() {
  if [ "$failures" != 0 ]; then
    tail -n 40 "$work"/*.log
  fi
  exit "$((failures > 0))"
}

prepare_router
need "hostapd has both networks on the air" start_hostapd
need "the server answers" start_server

check "without stations both lists are empty" same "[]/[]" "$(stations wlan0)/$(stations gwlan0)"
check "both networks are told to be on" same "true true" "$(probe config wlan0 | jq -r '"\(.enabled) \(.guest_enabled)"')"

need "the phone joins the home" join "$PHONE" home change-this-1 wlan0
need "the laptop joins the home" join "$LAPTOP" home change-this-1 wlan0
need "the tablet joins the guests" join "$TABLET" guests change-this-2 gwlan0
for station in "$PHONE" "$LAPTOP" "$TABLET"; do
  check "$station has an address by DHCP" take_address "$station"
done

check "the home's list has both, and no guest" same "$(macs_of "$PHONE" "$LAPTOP")" "$(listed wlan0)"
check "the guest is in the guest network's list" same "$(macs_of "$TABLET")" "$(listed gwlan0)"
check "the phone with its signal, traffic, address, name and time" told_whole wlan0 "$PHONE" '192\.168\.1\.'
check "the guest too" told_whole gwlan0 "$TABLET" '192\.168\.2\.'
before=$(member_of wlan0 "$PHONE" transferTX)
check "pings through the air" ping_router "$PHONE"
check "are counted" test "$(member_of wlan0 "$PHONE" transferTX)" -gt "$before"
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

off='[{"mac":"02:00:00:00:01:00","desc":"phone","mac_filter_enabled":false}]'
need "an entry that is off permits nobody" set_filter allow "$off"
check "the phone loses its link" eventually 5 not is_linked "$PHONE"

need "the filter is switched off" set_filter disable "$filter"
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
