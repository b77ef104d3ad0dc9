#!/bin/bash
# holder.sh STATE TREE BUILD: carries a home. Its end, however it comes, ends the home's first process (--kill-child) and
# with that every process, mount and network of the home.
set -euo pipefail
. "${0%/*}/state.sh"
record_self "$1/holder"
exec unshare --mount --net --uts --ipc --pid --fork --kill-child bash "${0%/*}/init.sh" "$@"
