#!/bin/bash
# init.sh STATE TREE BUILD: the first process of a home. Builds the home, says "ready" on descriptor 8 and stays.
# Descriptor 9 holds the lock that keeps "down" from looking before there is something to see.
#
# The machine's /proc stays mounted here: hosts are found by the numbers that the machine gives their processes.
set -euo pipefail
lib=${0%/*}
. "$lib/state.sh"
. "$lib/view.sh"
. "$lib/network.sh"
readonly TREE=$2 BUILD=$3
readonly STATE=$GROUND/state # the same folder as $1, which the home's own /run hides

record_self "$1/init"
flock --unlock 9
exec 9>&-

start_host() { # HOST
  mkfifo "$GROUND/go/$1"
  unshare --mount --net --uts --ipc --pid --fork --kill-child \
    bash "$GROUND/tree/lab/lib/host.sh" "$1" "$TREE" "$BUILD" <>/dev/null >"$STATE/log/$1" 2>&1 8>&- {events}>&- &
}

# Waits until every named host has said WORD ("made" or "up").
await() { # WORD HOST...
  local word=$1 left=" ${*:2} " said host
  while [ "$left" != " " ]; do
    read -r -t 30 -u "$events" said host || { echo "no word from:$left" >&2; return 1; }
    if [ "$said" = failed ]; then
      echo "$host failed:" >&2
      tail -n 10 "$STATE/log/$host" >&2
      return 1
    fi
    [ "$said" = "$word" ] || { echo "$host said $said, not $word" >&2; return 1; }
    left=${left/ $host / }
  done
}

let_go() { # HOST...
  local host
  for host in "$@"; do echo go >"$GROUND/go/$host"; done
  await up "$@"
}

make_ground "$1" "$TREE" "$BUILD"
mkfifo "$GROUND/events"
exec {events}<>"$GROUND/events"
for host in "${HOSTS[@]}"; do start_host "$host"; done
await made "${HOSTS[@]}"
name_networks
lay_wires
let_go isp
let_go router
let_go "${DEVICES[@]}"
echo ready >&8
exec 8>&-
sleep infinity &
wait "$!" # the shell collects ended orphans meanwhile
