#!/bin/bash
# Installs what was built, in a view of the machine of its own (private_view), and asks systemd what it thinks of the units there: every
# key known, every program where a unit says, nothing that waits for itself.
set -uo pipefail

build=${1:?"units_test.sh BUILD"}
[ -n "${VORN_PRIVATE_VIEW:-}" ] || { echo "Run it as: private_view -- units_test.sh BUILD" >&2; exit 2; } # it installs
if ! command -v systemd-analyze >/dev/null; then
  echo "SKIP: systemd-analyze is not installed"
  exit 77 # CTest's mark of a skipped test
fi

wrong() {
  echo "FAIL $*"
  exit 1
}

cmake --install "$build" --prefix /usr >/tmp/installed || wrong "cmake --install"
mapfile -t units < <(sed -n 's,^-- [^:]*: \(.*/systemd/system/.*\)$,\1,p' /tmp/installed)
[ "${#units[@]}" -ge 7 ] || wrong "the units are not installed: ${units[*]}"
said=$(systemd-analyze verify --man=no "${units[@]}" 2>&1) || wrong "systemd-analyze verify: $said"
[ -z "$said" ] || wrong "systemd-analyze verify: $said"

# What an administrator is told to enable is there, and can be enabled.
for unit in "${units[@]}"; do
  case ${unit##*/} in
    vorn-timecontrol-hour.service) ;; # the timer's
    *) grep -q '^WantedBy=' "$unit" || wrong "$unit cannot be enabled" ;;
  esac
done
echo "PASS ${#units[@]} units"
