#!/bin/bash
# The server in the router, reached from the machine outside.
. "${0%/*}/checks.sh"

use_home server
need "the home is up" home up
need "the server answers" start_server

answers() { topology_answer | jq -e '.net_topology == "router"' >/dev/null; }
status_of() { call "$@" | tail -n 1; }

check "it tells the topology" answers
check "it holds no socket in the router's own network" not at router curl --silent --noproxy '*' --max-time 1 "http://$api/"
check "an unknown row: 404" same 404 "$(status_of Topology 2 set '{}')"

port=${api##*:}
stop_server() { kill -TERM "$server_pid" && wait_for_end "$server_pid"; }
wait_for_end() { eventually 10 not kill -0 "$1" 2>/dev/null; }
need "it stops when told" stop_server
start=$(now_ms)
need "started again on the same port" start_server "$port"
check "it answers" answers
took=$(($(now_ms) - start))
check "within 2 s of its start ($took ms)" test "$took" -lt 2000

no_server() { not at router pidof vornwebd >/dev/null; }
need "what holds it outside is killed" kill -KILL "$server_pid"
check "it ends too" eventually 10 no_server
need "started again on the same port" start_server "$port"
need "it is killed" kill_server
need "started again on the same port" start_server "$port"
check "it answers" answers
check "no sanitizer has something to say" no_sanitizer_report
remember_home "$state"
check "down ends the server too" home down
check "and leaves nothing" nothing_is_left
exit "$((failures > 0))"
