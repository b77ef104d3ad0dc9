# shellcheck shell=bash
# Looks at a home from the machine outside, for the tour and the tests: through its web API, and on its hosts.
# REQUIRES: lab/lib/state.sh; $home_command, an array: lab/home with its options; $state: where that home is recorded;
# $api: where the server answers, such as 127.0.0.1:8080.
# shellcheck disable=SC2154,SC2034  # set and read by who sources this

at() { # HOST COMMAND...
  "${home_command[@]}" exec "$@"
}

# Prints the body of an answer and then, on a line of its own, the HTTP status.
call() { # API VERSION METHOD [BODY [CURL-OPTION...]]
  local path=/webapi/VORN.Core.Network.Router.$1/$2/$3 body=${4:-}
  curl --silent --noproxy '*' --max-time 40 --write-out '\n%{http_code}\n' --header 'Content-Type: application/json' \
    --header "Authorization: Bearer $(cat "$state/token")" \
    --data-binary "$body" "${@:5}" "http://$api$path"
}

topology_answer() { # prints the data of "get", version 2
  call Topology 2 get | sed -n 1p | jq -c .data
}

eventually() { # SECONDS COMMAND...: tries until it succeeds, for at least SECONDS
  local limit=$((SECONDS + $1))
  shift
  until "$@"; do
    [ "$SECONDS" -le "$limit" ] || return 1 # SECONDS is whole: it may be about to turn
    sleep 0.1
  done
}

switch_ended() {
  [ "$(topology_answer | jq .switching)" = false ]
}

ports_of() { # BRIDGE: prints its ports in order, nothing when there is no such bridge
  at router ip -j link show | jq -r --arg bridge "$1" '[.[] | select(.master == $bridge) | .ifname] | sort | join(" ")'
}

addresses_of() { # HOST INTERFACE: prints its IPv4 addresses
  at "$1" ip -j -4 address show dev "$2" 2>/dev/null | jq -r '[.[].addr_info[]? | .local] | join(" ")'
}

interface_exists() { # HOST INTERFACE
  at "$1" test -e "/sys/class/net/$2"
}

wan_slave() { # prints what the WAN port's file says
  at router sed -n 's/^SLAVE=//p' /etc/sysconfig/network-scripts/ifcfg-eth0
}

reads_web() { # HOST: the provider's page, by name
  [ "$(at "$1" curl --silent --noproxy '*' --max-time 3 http://www.isp.test/)" = "page of isp" ]
}

# The LAN device as a person meets it: plugged in anew it gets an address of the network (a pattern) and reads the web.
laptop_is_served() { # PATTERN
  "${home_command[@]}" plug laptop || return 1
  # shellcheck disable=SC2053  # a pattern
  [[ $(addresses_of laptop eth0) == $1 ]] && reads_web laptop
}

# Each fact of a topology; a fact that does not hold is named on the standard error stream.
fact() { # NAME COMMAND...
  local name=$1
  shift
  "$@" || { echo "not so: $name" >&2; return 1; }
}

same() { # WANTED GOT
  [ "$1" = "$2" ] || { echo "wanted \"$1\", got \"$2\"" >&2; return 1; }
}

not() { ! "$@"; }

no_switch_under_way() { at router test ! -e /tmp/topology.lock; }

is_whole_router() {
  fact "no lock" no_switch_under_way &&
    fact "lbr0 has the LAN ports" same "lan1 lan2 lan3" "$(ports_of lbr0)" &&
    fact "there is no br0" not interface_exists router br0 &&
    fact "eth0 is nobody's port" same null "$(at router ip -j link show eth0 | jq -r '.[0].master')" &&
    fact "lbr0 has the LAN address" same 192.168.1.1 "$(addresses_of router lbr0)" &&
    fact "ifcfg-eth0 says SLAVE=no" same no "$(wan_slave)" &&
    fact "the laptop is on the LAN and reads the web" laptop_is_served "192.168.1.*" &&
    fact "the guest's phone reads the web" reads_web phone
}

is_whole_bridge() {
  fact "no lock" no_switch_under_way &&
    fact "br0 has all ports" same "eth0 lan1 lan2 lan3" "$(ports_of br0)" &&
    fact "there is no lbr0" not interface_exists router lbr0 &&
    fact "ifcfg-eth0 says SLAVE=yes" same yes "$(wan_slave)" &&
    fact "the router has an address of the provider" matches "203.0.113.*" "$(addresses_of router br0)" &&
    fact "the laptop is on the provider's network and reads the web" laptop_is_served "203.0.113.*" &&
    fact "the guest's phone reads the web" reads_web phone
}

matches() { # PATTERN TEXT
  # shellcheck disable=SC2053  # a pattern
  [[ $2 == $1 ]] || { echo "wanted $1, got \"$2\"" >&2; return 1; }
}

# Starts the server; sets $api and $server_pid. What it says beside the system log goes to the home's log folder.
start_server() { # [PORT]
  local said line='' log=$state/log/server
  exec {said}< <(exec "${home_command[@]}" serve --port "${1:-0}" 2>>"$log")
  server_pid=$!
  read -r -t 10 line <&"$said" || true
  api=${line#listening on }
  [ "$api" != "$line" ] || { echo "the server did not start: $(tail -n 3 "$log")" >&2; return 1; }
}

# ---- what a home leaves behind

# What a home could change of the machine, in a form that can be compared. Other homes may come and go meanwhile.
machine_facts() {
  cut -d ' ' -f 4,5,6 /proc/self/mountinfo | sort
  ip -br link | awk '{ print $1 }'
  ip rule
  sysctl net.ipv4.ip_forward
  find /etc -xdev -printf '%p %T@ %s\n' 2>/dev/null | sort | md5sum
  ls -d /usr/vorn /tmp/topology.lock /run/vorn 2>/dev/null || true
}

# Prints the namespaces of a home's first processes, such as "net:[4026532600]".
home_namespaces() { # STATE
  local file pid
  for file in "$1"/init "$1"/hosts/*; do
    pid=$(recorded_pid "$file") || continue
    readlink "/proc/$pid/ns/"{mnt,net,pid,uts,ipc}
  done | sort -u
}

# Prints "PID STARTTIME" of each living process that is in one of the namespaces, one namespace a line on the standard input.
processes_in() {
  local inside pid facts
  inside=$(cat)
  [ -n "$inside" ] || return 0 # an empty pattern would fit every process
  for pid in $(find /proc/[0-9]*/ns -type l -printf '%h %l\n' 2>/dev/null | grep -wFf <(echo "$inside") |
    sed 's,/proc/\([0-9]*\)/.*,\1,' | sort -un); do
    facts=$(process_facts "$pid") || continue
    [[ $facts == Z* ]] || echo "$pid ${facts#* }"
  done
}

# Prints those of the processes, "PID STARTTIME" a line on the standard input, that live.
still_alive() {
  local pid start facts
  while read -r pid start; do
    facts=$(process_facts "$pid") || continue
    [[ $facts == Z* || ${facts#* } != "$start" ]] || echo "$pid"
  done
}

# Notes what a home that is up consists of, for nothing_is_left.
remember_home() { # STATE
  remembered_state=$1
  remembered_namespaces=$(home_namespaces "$1")
  remembered_processes=$(processes_in <<<"$remembered_namespaces")
}

# Whether all of the remembered home is gone. The numbers of ended namespaces are soon used again, so that a process in one
# of them counts only when it is older than this call.
nothing_is_left() {
  local alive older now
  now=$(awk -v hertz="$(getconf CLK_TCK)" '{ print int($1 * hertz) }' /proc/uptime)
  alive=$(still_alive <<<"$remembered_processes")
  older=$(processes_in <<<"$remembered_namespaces" | awk -v now="$now" '$2 < now - 100')
  [ -z "$alive" ] || { echo "processes are left: $alive" >&2; return 1; }
  ! pgrep -f "$remembered_state" || { echo "a process that names $remembered_state is left" >&2; return 1; }
  [ -z "$older" ] || { echo "namespaces are left, held by: $older" >&2; return 1; }
  [ ! -e "$remembered_state" ] || { echo "$remembered_state is left" >&2; return 1; }
}
