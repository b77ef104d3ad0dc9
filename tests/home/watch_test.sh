#!/bin/bash
# The DHCP client of the way out dies: it is started again and there is one, whatever the topology and whether the network is
# being switched.
. "${0%/*}/checks.sh"

use_home watch
need "the home is up" home up
need "the server answers" start_server

# One that is on its way into the background has a number that goes.
clients() { # prints the process numbers of the DHCP clients in the background
  at router sh -c 'for pid in $(pidof udhcpc); do [ "$(readlink "/proc/$pid/fd/1")" != /dev/null ] || echo "$pid"; done'
}

is_another() { # PID
  local now
  now=$(clients) && [ -n "$now" ] && [ "$now" != "$1" ] && same 1 "$(at router pidof udhcpc | wc -w)" 2>/dev/null
}

kill_client() {
  old=$(clients)
  [ -n "$old" ] && at router kill -KILL "$old"
}


back_in() { # TOPOLOGY
  [ "$(topology_answer | jq -r .net_topology)" = "$1" ] || { set_topology "$1" >/dev/null; eventually 30 switch_ended; }
  same "$1" "$(topology_answer | jq -r .net_topology)"
}

address=$(addresses_of router eth0)
need "the client is killed" kill_client
check "another runs, alone" eventually 10 is_another "$old"
check "the address has stayed" same "$address" "$(addresses_of router eth0)"
check "and the laptop reads the web" reads_web laptop
check "the log tells of it" home_log_has "udhcpc on eth0 does not run: it is started"

at router ip -4 address flush dev eth0
need "the client is killed with its address gone" kill_client
check "another runs, alone" eventually 10 is_another "$old"
check "and the lease comes back" eventually 20 has_first_lease
check "for the laptop too" reads_web laptop

need "the router becomes a bridge" back_in bridge
need "the bridge's client is killed" kill_client
check "another runs, alone" eventually 15 is_another "$old"
check "the network is whole" is_whole_bridge

need "a switch is asked for and the client is killed in it" succeeded "$(set_topology router)"
kill_client || true # the switch may have ended it by itself
need "the switch ends" eventually 30 switch_ended
need "the router is one" back_in router
check "one client runs" eventually 15 is_another none
check "the network is whole" is_whole_router

at router sh -c 'kill -KILL "$(pidof vornwatch)"'
need "the client is killed without a watcher" kill_client
at router sh -c '/usr/vorn/sbin/vornwatch </dev/null >/dev/null 2>&1 &'
check "the watcher's next start finds it missing" eventually 10 is_another "$old"
finish
