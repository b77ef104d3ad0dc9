# shellcheck shell=bash
# What the tests of the home share. Each test is a program: it prints PASS or FAIL for each thing that it checks, a line
# each, and fails when one of them failed. Homes have the test's own process number in their name, so that tests can run
# side by side.
set -uo pipefail

root=$(cd "${BASH_SOURCE[0]%/*}/../.." && pwd -P)
. "$root/lab/lib/state.sh"
. "$root/lab/lib/look.sh"
. "$root/tests/support/check.sh"

if [ "$(id -u)" != 0 ]; then
  echo "SKIP: network namespaces need root"
  exit 77 # CTest's mark of a skipped test
fi

build=${VORN_BUILD:?"set VORN_BUILD to the build folder"}
homes=()

# Chooses the home that the other functions speak of; every one is taken down at the end.
use_home() { # LABEL
  local name
  name="$1-$$"
  # shellcheck disable=SC2034  # look.sh and the tests read them
  home_command=("$root/lab/home" --name "$name" --build "$build") state=$(state_of "$name")
  homes+=("$name")
}

home() {
  "${home_command[@]}" "$@"
}

take_all_down() {
  local name
  for name in "${homes[@]}"; do
    "$root/lab/home" --name "$name" down
  done
}
trap take_all_down EXIT
trap 'exit 130' INT TERM

# What a test cannot go on without.
need() { # DESCRIPTION COMMAND...
  local before=$failures
  check "$@"
  if [ "$failures" != "$before" ]; then
    echo "--- the home's system log:"
    home log 30
    exit 1
  fi
}

# A sanitizer's report, of a build that has them: of the server, of the router's other programs, of those that they run.
no_sanitizer_report() {
  ! grep -E 'Sanitizer|runtime error' "$state"/log/* 2>/dev/null
}

# REQUIRES: the home is up.
finish() {
  check "no sanitizer has something to say" no_sanitizer_report
  [ "$failures" = 0 ] || { echo "--- the home's system log:"; home log 60; }
  exit "$((failures > 0))"
}

now_ms() {
  local stamp=${EPOCHREALTIME/[.,]/}
  echo "${stamp%???}"
}

# ---- what the tests of the switch share

set_topology() { # TARGET: prints the answer
  call Topology 1 set "{\"net_topology\": \"$1\"}" | sed -n 1p
}

succeeded() { # ANSWER. No answer is no success; jq -e alone takes it for one.
  [ "$(jq .success <<<"$1")" = true ]
}

log_lines() { # PATTERN: how many lines of the router's log have it
  home log | grep -c -- "$1"
}

# The router's links, ports, addresses, routes and WAN file, without what changes by itself.
network_state() {
  at router sh -c 'ip -o link show; ip -o -4 address show; ip -4 route show
    cat /etc/sysconfig/network-scripts/ifcfg-eth0' | sed 's/valid_lft.*//; s/ state [A-Z]* / /'
}

stop_provider_dhcp() {
  at isp sh -c 'kill -KILL "$(cat /run/dnsmasq.pid)"'
}

start_provider_dhcp() {
  at isp dnsmasq --conf-file=/mnt/tree/lab/hosts/isp/dnsmasq.conf
}

is_whole() { # in the old topology or in the new one
  case $(topology_answer | jq -r .net_topology) in
    router) is_whole_router ;;
    bridge) is_whole_bridge ;;
    *) echo "in no topology" >&2; return 1 ;;
  esac
}

# Counts as done when the server is gone. A child of it that has not yet become another program bears its name too, and
# may have ended by itself before its turn comes.
kill_server() {
  local programs
  programs=$(at router pidof vornwebd) || return
  at router sh -c "kill -KILL $programs" 2>/dev/null
  eventually 5 not kill -0 "$server_pid" 2>/dev/null
}

has_first_lease() { [ -n "$(addresses_of router eth0)" ]; }

has_second_lease() { [ -n "$(addresses_of router eth1)" ]; }

bring_second_up() { # the router's second way out
  at router sh -c 'printf "DEVICE=eth1\nBOOTPROTO=dhcp\n" >/etc/sysconfig/network-scripts/ifcfg-eth1
    /usr/vorn/sbin/vorntopology start' && eventually 5 has_second_lease
}

home_log_has() { # TEXT
  home log | grep -qF -- "$1"
}
