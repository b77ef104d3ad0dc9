#!/bin/bash
# host.sh HOST TREE BUILD: the first process of one host. Prepares the host, waits for its wires, starts its services
# (lab/hosts/HOST.sh) and stays.
set -euo pipefail
readonly HOST=$1 TREE=$2 BUILD=$3
# shellcheck disable=SC2034  # LOG: services.sh and the hosts' files
readonly LAB=/mnt/tree/lab LOG=/mnt/state/log
lib=$LAB/lib
. "$lib/state.sh"
. "$lib/view.sh"
. "$lib/services.sh"

say() { # WORD
  echo "$1 $HOST" >"$GROUND/events"
}
trap 'say failed' EXIT

record_self "$GROUND/state/hosts/$HOST"
own_view "$HOST"
keep_visible "$TREE" "$BUILD"
hostname "$HOST"
ip link set lo up
sysctl -qw net.ipv6.conf.default.accept_dad=0 # addresses serve at once, without the second of duplicate detection
# shellcheck source=/dev/null
. "$LAB/hosts/$HOST.sh"
prepare
say made
read -r _ <"$GROUND/go/$HOST"
start
trap - EXIT
say up
sleep infinity &
wait "$!" # the shell collects ended orphans meanwhile
