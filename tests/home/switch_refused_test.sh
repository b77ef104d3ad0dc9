#!/bin/bash
# Switches that cannot be made leave the network as it was.
. "${0%/*}/checks.sh"

use_home refused
need "the home is up" home up
need "the server answers" start_server

log_has() { home log | grep -q -- "$1"; }
unchanged() { diff <(echo "$before") <(network_state); }

before=$(network_state)
check "\"set\" to an unknown topology is answered with success" succeeded "$(set_topology mesh)"
check "the switch is refused with a log line" eventually 5 log_has 'no such topology: "mesh"'
check "the network is as it was" unchanged
check "\"set\" to \"client\" is answered with success" succeeded "$(set_topology client)"
check "without a wireless adapter it is refused with a log line" eventually 5 log_has 'no wireless adapter'
check "the network is as it was" unchanged
check "and whole" is_whole_router

before=$(network_state)
stop_provider_dhcp
check "without a DHCP server outside, \"set\" to \"bridge\" is answered with success" succeeded "$(set_topology bridge)"
check "the switch begins" eventually 5 at router test -e /tmp/topology.lock
need "and ends" eventually 40 switch_ended
check "it is undone" unchanged
check "with a log line" log_has 'switch from router to bridge failed'
start_provider_dhcp
check "the network is whole" is_whole_router
finish
