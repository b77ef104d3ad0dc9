#!/usr/bin/env bash
# Runs as root in the emulator. A switch to or from the topology "client" is killed in the middle: afterwards the network is
# whole in the topology before, with the way out that it had, or in the one that was asked for.
. "${BASH_SOURCE[0]%/*}/frame.sh"

# Kills a switch as soon as a condition holds, of builtin commands alone so that it is soon seen. Fails when the switch was
# through before.
kill_switch_when() { # TOPOLOGY CONDITION...
  local switch
  rm -f "$outside_lease" # an earlier one's
  /usr/vorn/sbin/vorntopology switch "$1" 2>>"$work/switch.log" &
  switch=$!
  until [ -e /tmp/topology.lock ] && "${@:2}"; do
    kill -0 "$switch" 2>/dev/null || break
  done
  kill -KILL "$switch" 2>/dev/null
  wait "$switch" 2>/dev/null
  [ -e /tmp/topology.lock ]
}

absent() { [ ! -e "$1" ]; }
begun() { true; }

runs_once() { # PROGRAM: of those that the platform has started
  same 1 "$(pgrep -c -f -- "^[^ ]*/$1 .*/run/vorn/")"
}

is_joined() {
  wpa_cli -p /run/vorn/upstream -i "$UPLINK" status 2>/dev/null | grep -q '^wpa_state=COMPLETED'
}

reaches_outside() {
  busybox ping -q -c 1 -W 2 10.77.0.1 >/dev/null
}

is_whole_client() {
  fact "no lock" no_lock && fact "it is let in" eventually 30 is_joined &&
    fact "the network is the client's" network_is "$client" &&
    fact "one wpa_supplicant" runs_once wpa_supplicant && fact "one DHCP client" runs_once udhcpc &&
    fact "the network outside answers" eventually 10 reaches_outside
}

reaches_provider() {
  busybox ping -q -c 1 -W 2 203.0.113.1 >/dev/null
}

is_whole_router() {
  fact "no lock" no_lock && fact "the network is the router's" unchanged &&
    fact "no wpa_supplicant" not pgrep -f -- '-P /run/vorn/wpa_supplicant.pid' &&
    fact "one DHCP client" runs_once udhcpc && fact "the provider answers" eventually 10 reaches_provider
}

vorntopology() {
  /usr/vorn/sbin/vorntopology "$@" 2>>"$work/switch.log"
}

# The control socket of a supplicant, the DHCP clients' files and the ports of the bridge are there, or gone, in the order of
# the steps.
readonly upstream_socket=/run/vorn/upstream/$UPLINK
readonly outside_client=/run/vorn/udhcpc.$UPLINK.pid
readonly outside_lease=/run/vorn/lease.$UPLINK
readonly provider_client=/run/vorn/udhcpc.eth0.pid
readonly wan_port=/sys/class/net/lbr0/brif/eth0

killed_on_the_way_to_client() { # REMEDY MOMENT CONDITION...
  need "the switch to \"client\" is killed $2" kill_switch_when client "${@:3}"
  # shellcheck disable=SC2086  # its words
  check "and vorntopology $1 ends well" vorntopology $1
  if [ "$1" = "switch client" ]; then
    check "then it is a client, wholly" is_whole_client
    need "and can be a router again" vorntopology switch router
  fi
  check "then it is a router, wholly" is_whole_router
}

killed_on_the_way_back() { # TOPOLOGY REMEDY MOMENT CONDITION...
  need "the switch to \"$1\" is killed $3" kill_switch_when "$1" "${@:4}"
  # shellcheck disable=SC2086
  check "and vorntopology $2 ends well" vorntopology $2
  if [ "$2" = "switch router" ]; then
    check "then it is a router, wholly" is_whole_router
    need "and can be a client again" vorntopology switch client
  fi
  check "then it is a client, wholly" is_whole_client
}

need "the router comes up" prepare_router
need "there is a network outside" start_outside
configure_upstream outside-key-1
need "the router can be a client" vorntopology switch client
client=$(network)
need "and a router again" vorntopology switch router
before=$(network)

killed_on_the_way_to_client recover "at its begin" begun
killed_on_the_way_to_client start "while wpa_supplicant starts" test -e /run/vorn/wpa_supplicant.pid
killed_on_the_way_to_client recover "while it waits to be let in" test -S "$upstream_socket"
killed_on_the_way_to_client start "when the provider's address is given up" absent "$provider_client"
killed_on_the_way_to_client recover "when the WAN port is in the bridge" test -e "$wan_port"
killed_on_the_way_to_client "switch client" "while it asks for an address" test -e "$outside_client"
killed_on_the_way_to_client recover "when it has an address" test -e "$outside_lease"

need "the router becomes a client" vorntopology switch client
killed_on_the_way_back router recover "at its begin" begun
killed_on_the_way_back router start "when the address outside is given up" absent "$outside_client"
killed_on_the_way_back router recover "when the WAN port is out of the bridge" absent "$wan_port"
killed_on_the_way_back router "switch router" "when the provider is asked for an address" test -e "$provider_client"
killed_on_the_way_back bridge recover "when the one bridge is there" test -e /sys/class/net/br0
killed_on_the_way_back bridge start "when the WAN port is in it" test -e /sys/class/net/br0/brif/eth0

# From here on with the watcher, which starts again what dies by itself.
pid_of() { # PROGRAM: of the one that the platform has started
  pgrep -f -- "^[^ ]*/$1 .*/run/vorn/"
}

is_another() { # PROGRAM PID
  local now
  now=$(pid_of "$1") && [ "$now" != "$2" ] && runs_once "$1"
}

dies_and_runs_again() { # PROGRAM
  local old
  old=$(pid_of "$1") && kill -KILL "$old" && eventually 20 is_another "$1" "$old"
}

system_log_has() { # TEXT
  grep -qF -- "$1" "$work/system.log"
}

"$build/programs/vornwatch" 2>>"$work/watch.log" &
check "wpa_supplicant dies and runs again" dies_and_runs_again wpa_supplicant
check "it is a client as before" is_whole_client
check "the DHCP client dies and runs again" dies_and_runs_again udhcpc
check "it is a client as before" is_whole_client
mv "$upstream" "$work/upstream"
kill -KILL "$(pid_of wpa_supplicant)"
check "what is missing for a start is told" eventually 20 system_log_has "start \"wpa_supplicant on $UPLINK\" failed"
mv "$work/upstream" "$upstream"
check "and when it is there, it is a client as before" eventually 40 is_whole_client
kill -KILL "$(pid_of udhcpc)" "$(pid_of wpa_supplicant)"
need "both die, and the router is switched away at once" vorntopology switch router
sleep 3 # longer than the watcher waits before it looks again
check "then it is a router, wholly" is_whole_router
check "its DHCP client dies and runs again" dies_and_runs_again udhcpc
check "it is a router as before" is_whole_router
check "no sanitizer has something to say" not grep -hE 'Sanitizer|runtime error' "$work"/*.log
finish
