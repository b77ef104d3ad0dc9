# shellcheck shell=bash
# The networks outside: the provider's at the WAN port, and a wireless one that the router can join, both in network
# namespaces of their own. And how the router stands to them. REQUIRES: tests/wifi/radio.sh.
# shellcheck disable=SC2154

readonly UPLINK=wlan4  # the router's second radio
readonly OUTSIDE_RADIO=5
readonly upstream=/etc/vorn/wireless/$UPLINK.upstream

prepare_provider() {
  ip netns add provider
  ip link add eth0 type veth peer name isp0 netns provider
  ip -n provider link set lo up
  ip -n provider link set isp0 up
  ip -n provider address add 203.0.113.1/24 dev isp0
  serve_addresses provider isp0 203.0.113
}

# The DHCP server of a network outside, and of nobody else's: with the pid file that belongs to it.
serve_addresses() { # NAMESPACE INTERFACE NETWORK
  ip netns exec "$1" dnsmasq --conf-file=/dev/null --user=root --no-resolv --no-hosts --port=0 --interface="$2" \
    --bind-interfaces --except-interface=lo --dhcp-range="$3.100,$3.150,1h" --no-ping --dhcp-authoritative \
    --dhcp-leasefile="$work/$1.leases" --pid-file="$work/$1.pid" --log-facility="$work/$1.log"
}

stop_serving() { # NAMESPACE
  kill "$(cat "$work/$1.pid")" && eventually 5 not test -e "$work/$1.pid"
}

start_outside() { # [NETWORK]
  ip netns add outside
  iw phy "phy$OUTSIDE_RADIO" set netns name outside
  ip -n outside link set lo up
  cat >"$work/outside.conf" <<CONF
interface=wlan$OUTSIDE_RADIO
driver=nl80211
ctrl_interface=$work/outside
hw_mode=g
channel=1
ssid=outside
wpa=2
wpa_key_mgmt=WPA-PSK
rsn_pairwise=CCMP
wpa_passphrase=outside-key-1
CONF
  ip netns exec outside hostapd -B -t -f "$work/outside-hostapd.log" "$work/outside.conf" || return
  use_outside_network "${1:-10.77.0}"
}

use_outside_network() { # NETWORK
  ip -n outside address flush dev "wlan$OUTSIDE_RADIO"
  ip -n outside address add "$1.1/24" dev "wlan$OUTSIDE_RADIO"
  serve_addresses outside "wlan$OUTSIDE_RADIO" "$1"
}

# What root writes to have the router join it; one frequency, so that nobody has to look at all the others first.
configure_upstream() { # PASSPHRASE
  mkdir -p "${upstream%/*}"
  (umask 077 && printf 'network={\n\tssid="outside"\n\tpsk="%s"\n\tscan_freq=2412\n}\n' "$1" >"$upstream")
}

# ---- the router

modes() {
  topology_answer | jq -r .supported_mode
}

topology() {
  topology_answer | jq -r .net_topology
}

ask_for() { # TOPOLOGY
  call Topology 1 set "{\"net_topology\": \"$1\"}" | sed -n 1p | jq -e .success >/dev/null
}

ends_up_in() { # TOPOLOGY
  eventually 90 switch_ended && same "$1" "$(topology)"
}

# A switch that begins at once and may end soon: what it says at its end is the sign.
says() { # TEXT: since the last switch that was asked for
  tail -n "+$said" "$work/system.log" | grep -qF -- "$1"
}

# The lock is looked at without a process, because the emulator has one slow processor, and the switch needs it.
no_lock() { [ ! -e /tmp/topology.lock ]; }

begins_to_switch_to() { # TOPOLOGY
  said=$(($(wc -l <"$work/system.log") + 1))
  ask_for "$1" && eventually 20 test -e /tmp/topology.lock
}

# A starved machine takes longer for a lease than a switch waits, which is then undone, and tried again.
switch_to() { # TOPOLOGY
  local try
  : >"$work/supplicant$PHONE.log" # for has_kept_link
  for try in 1 2 3; do
    begins_to_switch_to "$1" && eventually 90 no_lock && eventually 10 switch_has_ended_as_told || return
    ! says "switched from" || { ends_up_in "$1"; return; }
    echo "# $1: try $try failed"
  done
  return 1
}

switch_has_ended_as_told() {
  says "switched from" || says "Failed to SwitchTopology"
}

has_failed_to_switch_to() { # TOPOLOGY REASON
  eventually 90 no_lock && eventually 10 says "switch from router to $1 failed" && says "$2" && eventually 20 switch_ended ||
    { tail -n "+$said" "$work/system.log" >&2; return 1; }
}

fails_to_switch_to() { # TOPOLOGY REASON
  begins_to_switch_to "$1" && has_failed_to_switch_to "$1" "$2"
}

is_refused() { # TOPOLOGY REASON
  said=$(($(wc -l <"$work/system.log") + 1))
  ask_for "$1" && eventually 20 says "switch to \"$1\" refused: $2"
}

# What must be as before after a switch that was undone or that was gone back from.
network() {
  ip -j link | jq -c '.[] | [.ifname, .master, (.flags | contains(["UP"]))]' | sort
  ip -j -4 address | jq -c '.[] | [.ifname, (.addr_info | map(.local))]' | sort
  ip -4 route | sed 's/ linkdown//' # a link that has just come up
  grep -v '^BRIDGE=$' /etc/sysconfig/network-scripts/ifcfg-eth0
  grep -H ^bridge= /etc/hostapd/*.conf
  pgrep -x -a wpa_supplicant | grep -F /run/vorn | cut -d ' ' -f 2-
  pgrep -a -f '/udhcpc -i ' | grep -o -- '-i [^ ]*'
}

network_is() { # WHAT-NETWORK-PRINTED: names what differs
  echo "$1" >"$work/wanted"
  network | diff "$work/wanted" - >&2
}

unchanged() {
  network_is "$before"
}

has_address() { # INTERFACE PATTERN
  ip -4 -o address show dev "$1" | grep -q "inet $2" || { ip -4 -o address show dev "$1" >&2; return 1; }
}

address_of() { # INTERFACE
  ip -j -4 address show dev "$1" | jq -r '.[0].addr_info[0].local'
}

# Whether the router's port 7777 can be had from there: any answer counts.
serves() { # COMMAND... ADDRESS: what brings a command there
  "${@:1:$#-1}" curl --silent --noproxy '*' --max-time 3 --output /dev/null "http://${*: -1}:7777/"
}

port_of() { # INTERFACE: prints the bridge
  ip -j link show "$1" | jq -r '.[0].master'
}

# hostapd, told to leave the air and come back, puts its networks where it believes they belong.
on_air_again() {
  hostapd_cli -p /run/hostapd -i wlan0 disable >/dev/null
  hostapd_cli -p /run/hostapd -i wlan0 enable >/dev/null
  eventually 20 networks_are_on
}

# A station is in the network of this address: with a link, an address from there, and an answer from its gateway.
is_bridged_to() { # STATION NETWORK
  rejoins "$1" wlan0 && take_address "$1" "$2\\." && reaches "$1" "$2.1"
}
