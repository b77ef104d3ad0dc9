#!/bin/bash
# The switching process dies in the middle: the network is whole afterwards, in the old topology or in the new one.
. "${0%/*}/checks.sh"

use_home killed
need "the home is up" home up
need "the server answers" start_server

switch_pid() { at router pidof vorntopology; }
under_way() { at router test -e /tmp/topology.lock && switch_pid >/dev/null; }
settled() { switch_ended && ! switch_pid >/dev/null; }

kill_switch() {
  local pid
  pid=$(switch_pid) && at router sh -c "kill -KILL $pid"
}

back_to_router() {
  [ "$(topology_answer | jq -r .net_topology)" = router ] || set_topology router >/dev/null
  eventually 30 settled && is_whole_router
}

# Waits inside the router, so that the delay counts from the moment at which the lock is there.
kill_after_lock() { # DELAY
  at router timeout 20 sh -c 'until [ -e /tmp/topology.lock ]; do :; done; sleep "$0"; kill -KILL $(pidof vorntopology)' "$1"
}

hits=0
delays=(0 0.01 0.02 0.04 0.07 0.11)
for delay in "${delays[@]}"; do
  kill_after_lock "$delay" 2>/dev/null &
  killer=$!
  need "a switch is asked for" succeeded "$(set_topology bridge)"
  ! wait "$killer" || hits=$((hits + 1)) # it may have been through before
  need "killed after $delay s: the switch ends" eventually 30 settled
  check "killed after $delay s: the network is whole" is_whole
  need "and can be switched again" back_to_router
done
check "switches were hit ($hits of ${#delays[@]})" test "$hits" -gt 0

# Without the provider's DHCP server a switch waits for a lease, with all ports moved already.
stop_provider_dhcp
set_topology bridge >/dev/null
need "the switch begins" eventually 5 under_way
sleep 1
check "it is in the middle: eth0 is in br0" same "eth0 lan1 lan2 lan3" "$(ports_of br0)"
check "and it is killed there" kill_switch
start_provider_dhcp
need "the switch ends" eventually 30 settled
check "the network is whole in the old topology" is_whole_router

for way in "vorntopology recover" "vorntopology start" "the server's next start"; do
  stop_provider_dhcp
  set_topology bridge >/dev/null
  need "the switch begins" eventually 5 under_way
  sleep 1
  need "the server is killed in the middle of it" kill_server
  check "and the switching process too" kill_switch
  start_provider_dhcp
  check "the lock is left" at router test -e /tmp/topology.lock
  [[ $way != vorntopology* ]] || check "$way ends well" at router sh -c "/usr/vorn/sbin/$way"
  need "the server answers again" start_server
  check "after $way the network is whole" is_whole_router
  need "and can be switched" eventually 10 succeeded "$(set_topology bridge)"
  need "which ends" eventually 30 settled
  check "in \"bridge\"" is_whole_bridge
  need "and back" back_to_router
done
finish
