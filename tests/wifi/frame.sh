# shellcheck shell=bash
# What each program of checks in the emulator begins with. It prints PASS or FAIL for each thing that it checks, a line each,
# and fails when one of them failed.
# shellcheck disable=SC2154
set -uo pipefail
export PATH=/usr/sbin:/usr/bin:/sbin:/bin LC_ALL=C

root=$(cd "${BASH_SOURCE[0]%/*}/../.." && pwd -P)
build=${VORN_BUILD:?}
api=127.0.0.1:8080
. "$root/lab/lib/look.sh"
. "$root/tests/support/check.sh"
. "$root/tests/wifi/radio.sh"
. "$root/tests/wifi/outside.sh"

# A pause without a process, for the loops that wait: nobody writes to the pipe.
mkfifo /run/nobody
exec {nobody}<>/run/nobody
sleep() { # SECONDS
  read -r -t "$1" -u "$nobody" || true
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
