#!/bin/bash
# Looks at a freshly installed router from inside, while it runs: started at each boot by the unit that scripts/try-install adds,
# once multi-user.target stands. First boot: everything is up, the web API configures it, each unit is restarted. Second boot: the
# configuration is still there, and the topology is switched there and back. Prints PASS or FAIL a line on the second serial
# port, and after "OUTSIDE" waits there for a word from outside.
set -uo pipefail
exec >/dev/ttyS1 2>&1 </dev/ttyS1
stty -F /dev/ttyS1 raw -echo

readonly UNITS="vorn-timecontrol vorn-network vorn-watch vorn-routes vorn-devices vornwebd dnsmasq cron"
readonly API=https://127.0.0.1:8443
readonly MEMORY=/var/lib/try-install # what the first boot tells the second
readonly PASSWORD="correct horse battery"

check() { # DESCRIPTION COMMAND...
  local description=$1 said
  shift
  if said=$("$@" 2>&1); then
    echo "PASS $description"
  else
    echo "FAIL $description"
    [ -z "$said" ] || printf '     %s\n' "${said//$'\n'/$'\n     '}"
  fi
}

same() { # WANTED GOT
  [ "$1" = "$2" ] || { echo "wanted \"$1\", got \"$2\""; return 1; }
}

eventually() { # SECONDS COMMAND...
  local limit=$((SECONDS + $1))
  shift
  until "$@" >/dev/null 2>&1; do
    [ "$SECONDS" -le "$limit" ] || { "$@"; return; }
    sleep 0.2
  done
}

not() { ! "$@"; }

tells() { # PATTERN COMMAND...: it is in what the command prints
  local said
  said=$("${@:2}" 2>&1)
  grep -q -- "$1" <<<"$said" || { echo "no \"$1\" in: $said"; return 1; }
}

# ---- the web API, as a person uses it

ask() { # PATH [BODY [CURL-OPTION...]]
  curl --silent --insecure --noproxy '*' --max-time 30 --header 'Content-Type: application/json' --cookie "$MEMORY/cookies" \
    --cookie-jar "$MEMORY/cookies" --header "X-CSRF-Token: $(cat "$MEMORY/csrf" 2>/dev/null)" --data "${2:-}" "${@:3}" "$API$1"
}

call() { # API VERSION METHOD [BODY]
  ask "/webapi/VORN.Core.Network.Router.$1/$2/$3" "${4:-}"
}

set_so() { # API BODY
  local answer
  answer=$(call "$1" 1 set "$2")
  jq -e .success <<<"$answer" >/dev/null || { echo "$1: $answer"; return 1; }
}

log_in() { # PASSWORD
  local answer
  answer=$(ask /webapi/login "$(jq -nc --arg password "$1" '{user: "admin", password: $password}')")
  jq -er .data.csrf <<<"$answer" >"$MEMORY/csrf" || { echo "$answer"; return 1; }
}

change_password() {
  local first
  first=$(cat /var/lib/vorn/first-password) && log_in "$first" &&
    ask /webapi/password "$(jq -nc --arg old "$first" --arg new "$PASSWORD" '{old: $old, new: $new}')" | jq -e .success &&
    log_in "$PASSWORD"
}

answers() { # over TLS, with the page or at least with JSON
  [ "$(curl --silent --insecure --noproxy '*' --max-time 5 --output /dev/null --write-out '%{http_code}' \
    -X POST "$API/webapi/VORN.Core.Network.Router.Topology/2/get")" = 401 ]
}

serves_page() {
  curl --silent --insecure --noproxy '*' --max-time 5 "$API/" | grep -q '<script type="module"'
}

# ---- the machine

nothing_failed() {
  local failed
  failed=$(systemctl --failed --plain --no-legend)
  [ -z "$failed" ] || { echo "$failed"; systemctl status --no-pager --lines 20 "${failed%% *}"; return 1; }
}

is_up() { # UNIT
  systemctl is-active "$1" >/dev/null || { systemctl status --no-pager --lines 20 "$1"; return 1; }
}

reached() { # UNIT: microseconds from the kernel's start to when it was up
  systemctl show -P ActiveEnterTimestampMonotonic "$1"
}

began() { # UNIT
  systemctl show -P InactiveExitTimestampMonotonic "$1"
}

came_before() { # UNIT UNIT: the first was up when the second began
  local up begin
  up=$(reached "$1") begin=$(began "$2")
  ((up > 0 && up <= begin)) || { echo "$1 up at $up us, $2 began at $begin us"; return 1; }
}

ports_of() { # BRIDGE
  ip -j link show master "$1" | jq -r 'map(.ifname) | sort | join(" ")'
}

has_address() { # INTERFACE ADDRESS
  ip -4 -o address show dev "$1" | grep -q "inet $2/" || { ip -br address; return 1; }
}

topology() { call Topology 2 get | jq -r .data.net_topology; }

# What a program of ours wanted to do and was not let: a unit's hardening that is too narrow shows here.
nothing_was_denied() {
  ! journalctl --boot --no-pager --unit 'vorn*' --unit dnsmasq --unit cron --identifier vorntopology --identifier vorntimecontrol \
    --identifier rc.network --identifier udhcpc --grep 'denied|not permitted|read-only file system|no such file' --quiet
}

no_error_is_logged() {
  ! journalctl --boot --no-pager --unit 'vorn*' --priority err --quiet --grep .
}

is_a_router() {
  check "eth0 has a lease of the provider's" eventually 20 has_address eth0 10.0.2.15
  check "its name server is asked" grep -q '^nameserver 10.0.2.3$' /etc/resolv.conf
  check "lbr0 has its address" has_address lbr0 192.168.1.1
  check "and the LAN's ports, with the card that comes late" same "eth2 eth3" "$(ports_of lbr0)"
  check "the guest network has its address" has_address gbr0 192.168.2.1
  check "the default route leads to the provider" tells 'via 10.0.2.2 dev eth0' ip -4 route show default
  check "IPv4 is forwarded" same 1 "$(cat /proc/sys/net/ipv4/ip_forward)"
  check "the base firewall stands" nft list chain inet vorn_base from_wan
  check "dnsmasq serves the LAN" eventually 10 tells '192.168.1.1:53 ' ss -lnut
  check "and listens for DHCP" tells ':67 ' ss -lnu
}

units_are_up() {
  local unit
  systemctl is-system-running --wait >/dev/null
  check "no unit has failed" nothing_failed
  for unit in $UNITS vorn-timecontrol-hour.timer; do
    check "$unit is up" is_up "$unit"
  done
  for unit in vorn-routes vorn-devices vornwebd dnsmasq; do
    check "$unit came after the network" came_before vorn-network "$unit"
  done
  check "the network came after the time control" came_before vorn-timecontrol vorn-network
  check "the web server answers on loopback" eventually 20 answers
}

# ---- what is configured, and how it is seen again

readonly MAC=02:00:00:00:77:01
readonly FORWARD='[{"sourcePort": "8022", "protocol": "tcp", "targetIP": "192.168.1.50", "targetPort": "22", "enabled": true, "service": "try"}]'
readonly ROUTE='{"type": "ipv4", "rules": [{"ip": "10.77.0.0", "mask": "255.255.0.0", "prefix_length": "255.255.0.0",
  "gateway": "192.168.1.50", "ifname": "lbr0", "enable": true}]}'

cut_always() {
  jq -nc --arg mac "$MAC" '[{mac: $mac, clientname: "try", schedule: ("1" * 168), tcenable: true}] | {rules: tojson}'
}

configure() {
  check "the first password is changed" change_password
  check "a port forward is set" set_so PortForward "$(jq -nc --arg rules "$FORWARD" '{rules: $rules}')"
  check "a static route is set" set_so Static.Route "$ROUTE"
  check "a device is cut off" set_so ParentalControl "$(cut_always)"
  check "a device gets a name" set_so ConnectionList \
    "$(jq -nc --arg mac "$MAC" '{mac: $mac, hostname: "Try", type: "phone"}')"
}

configuration_holds() { # WHEN
  check "the port forward is in the firewall $1" eventually 10 tells '8022.*192.168.1.50' nft list ruleset
  check "the static route is in the kernel $1" eventually 10 tells '10.77.0.0/16 via 192.168.1.50' ip -4 route
  check "the device is cut off $1" tells "$MAC" nft list set inet vorn_timecontrol cut
  check "the time control's task is in cron $1" grep -qs vorntimecontrol /etc/cron.d/*
  check "the device has its name $1" tells Try /usr/vorn/sbin/vorndevices list
}

restart_each() {
  local unit client
  client=$(cat /run/vorn/udhcpc.eth0.pid)
  for unit in $UNITS; do
    check "$unit is restarted" systemctl restart "$unit"
    check "and is up" eventually 5 is_up "$unit"
    check "the web server answers after it" eventually 20 answers
  done
  check "the password is still the owner's" log_in "$PASSWORD"
  check "the DHCP client of the WAN port is one that runs" test -e "/proc/$(cat /run/vorn/udhcpc.eth0.pid)"
  echo "# DHCP client: $client, now $(cat /run/vorn/udhcpc.eth0.pid)"
}

outside() { # WHAT: asks for it from outside, and waits until it is done
  echo "OUTSIDE $1"
  read -r _
}

# The provider's side does reach the server when no firewall stands: what keeps it out otherwise is the firewall.
firewall_counts() {
  outside lan-only
  check "the firewall is taken away" nft delete table inet vorn_base
  outside everybody
  check "the network's start brings it back" systemctl restart vorn-network
  outside lan-only
}

switch_topology() {
  check "the topology is set to bridge" set_so Topology '{"net_topology": "bridge"}'
  check "br0 is the network" eventually 40 same "bridge" "$(topology)"
  check "with all ports" eventually 10 same "eth0 eth2 eth3" "$(ports_of br0)"
  check "the switch ends" eventually 40 not test -e /tmp/topology.lock
  check "vornwebd restarts in it" systemctl restart vornwebd
  check "and answers" eventually 20 answers
  check "the owner logs in" log_in "$PASSWORD"
  check "the topology is set to router" set_so Topology '{"net_topology": "router"}'
  check "the switch back ends" eventually 40 not test -e /tmp/topology.lock
}

first_boot() {
  check "nothing of it runs before it is enabled" not is_up vornwebd
  check "the units start as packaging/README.md says" sh /root/enable
  units_are_up
  is_a_router
  [ ! -e /usr/share/vorn/page/index.html ] || check "the page is served" serves_page
  firewall_counts
  configure
  configuration_holds "at once"
  restart_each
  is_a_router
  configuration_holds "after all restarts"
  check "no unit has logged an error" no_error_is_logged
}

second_boot() {
  units_are_up
  is_a_router
  check "the password is the one that was chosen" log_in "$PASSWORD"
  configuration_holds "after the reboot"
  check "no unit has logged an error" no_error_is_logged # a forward to a network that a bridge has not is logged as one
  switch_topology
  is_a_router
  configuration_holds "after the switch there and back"
  outside lan-only
}

install -d -m 700 "$MEMORY"
if [ ! -e "$MEMORY/booted" ]; then
  first_boot
  next=reboot
else
  second_boot
  next=poweroff
fi
check "nothing was denied to a unit" nothing_was_denied
check "no unit has failed" nothing_failed
systemd-analyze critical-chain --no-pager vornwebd.service 2>/dev/null | sed 's/^/# /'
echo "DONE $next"
: >"$MEMORY/booted"
systemctl --no-block "$next"
