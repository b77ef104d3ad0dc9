#!/bin/bash
# Requests for a switch that meet.
. "${0%/*}/checks.sh"

use_home race
need "the home is up" home up
need "the server answers" start_server

# Both at once. Either is taken or told that a switch is under way.
race() { # TARGET TARGET
  local answers
  answers=$(set_topology "$1" & set_topology "$2" & wait)
  same "true true" "$(jq -s -r 'map(.success or .error.code == 4340) | join(" ")' <<<"$answers")"
}

settled() { switch_ended && at router test ! -e /tmp/topology.lock; }

for round in 1 2 3; do
  need "round $round: two requests for \"bridge\" are both answered" race bridge bridge
  need "round $round: the switch ends" eventually 30 settled
  check "round $round: exactly one switch was made" same "$round" "$(log_lines 'switched from router to bridge')"
  check "round $round: the network is whole in \"bridge\"" is_whole_bridge
  need "round $round: requests for \"router\" and \"bridge\" are both answered" race router bridge
  need "round $round: the switch ends" eventually 30 settled
  check "round $round: the network is whole in one of them" is_whole
  [ "$(topology_answer | jq -r .net_topology)" = router ] || set_topology router >/dev/null
  need "round $round: back in \"router\"" eventually 30 is_whole_router
done

set_while_locked() {
  at router touch /tmp/topology.lock
  set_topology bridge
  at router rm /tmp/topology.lock
}
check "while a switch is under way, another is refused with 4340" \
  same 4340 "$(set_while_locked | jq .error.code)"
finish
