# shellcheck shell=bash
# What the checks over simulated radios are made of. REQUIRES: lab/lib/look.sh, $root, $build, $api, tests/wifi/outside.sh.
# shellcheck disable=SC2154,SC2034

readonly PHONE=1 LAPTOP=2 TABLET=3 # the numbers of their radios
readonly work=/tmp/radio
readonly state=$work # where lab/lib/look.sh takes the token from
hostapd=
server=

station_mac() { # STATION: as mac80211_hwsim numbers them
  printf '02:00:00:00:%02x:00' "$1"
}

macs_of() { # STATION...: in order, a blank between
  local station macs=()
  for station in "$@"; do
    macs+=("$(station_mac "$station")")
  done
  echo "${macs[*]}"
}

# ---- the router

prepare_router() {
  local station
  mkdir -p "$work" /etc/hostapd /etc/sysconfig/network-scripts /var/lib/misc /usr/vorn/{sbin,share}
  ip link set lo up
  rm -rf /etc/hostapd/*.conf /etc/vorn/wireless /var/lib/misc/dnsmasq.leases /var/lib/vorn
  install -d -m 700 /var/lib/vorn
  busybox syslogd -n -O "$work/system.log" &
  # The country would need a database of regulations; without one, the kernel has the channels that all countries permit.
  sed '/^country_code=/d; /^ieee80211d=/d' "$root/packaging/hostapd-wlan0.conf" >/etc/hostapd/wlan0.conf
  cp "$build/programs/vorntopology" "$root/programs/udhcpc.script" /usr/vorn/sbin/
  cp "$root/programs/base-firewall.nft" /usr/vorn/share/
  cp "$root"/packaging/ifcfg-* /etc/sysconfig/network-scripts/
  sed -i 's/^PORTS=.*//' /etc/sysconfig/network-scripts/ifcfg-*
  prepare_provider
  /usr/vorn/sbin/vorntopology start || return
  dnsmasq --conf-file="$root/packaging/dnsmasq.conf" --no-ping --user=root --no-resolv --log-facility="$work/dnsmasq.log"
  for station in "$PHONE" "$LAPTOP" "$TABLET"; do
    ip netns add "station$station"
    iw phy "phy$station" set netns name "station$station" # the radio moves; an interface alone could not
    in_station "$station" ip link set lo up
  done
}

start_hostapd() {
  hostapd -t -f "$work/hostapd.log" /etc/hostapd/wlan0.conf &
  hostapd=$!
  eventually 20 networks_are_on
}

networks_are_on() {
  hostapd_cli -p /run/hostapd -i gwlan0 status 2>/dev/null | grep -q '^state=ENABLED'
}

start_server() {
  [ -s "$state/token" ] || (umask 077 && "$build/webapi/vornwebd" --make-token radio >"$state/token") || return
  "$build/webapi/vornwebd" --module "$build/router/router.so" --listen "$api" 2>>"$work/server.log" &
  server=$!
  eventually 20 server_answers
}

server_answers() {
  call MacFilter 1 get | sed -n 1p | jq -e .success >/dev/null 2>&1
}

restart_hostapd() {
  kill -KILL "$hostapd"
  wait "$hostapd" 2>/dev/null
  start_hostapd
}

restart_everything() {
  kill -KILL "$server"
  wait "$server" 2>/dev/null
  restart_hostapd && start_server
}

# What sees the devices of the home and keeps them.
start_scanner() {
  "$build/programs/vorndevices" watch 2>>"$work/scanner.log" &
}

# ---- stations

in_station() { # STATION COMMAND...
  ip netns exec "station$1" "${@:2}"
}

supplicant() { # STATION COMMAND...
  in_station "$1" wpa_cli -p "$work/supplicant$1" -i "wlan$1" "${@:2}"
}

# One frequency, so that nobody has to look at all the others first.
start_supplicant() { # STATION SSID PASSPHRASE
  cat >"$work/supplicant$1.conf" <<CONF
ctrl_interface=$work/supplicant$1
network={
  ssid="$2"
  psk="$3"
  key_mgmt=WPA-PSK
  scan_freq=2437
}
CONF
  run_supplicant "$1"
}

run_supplicant() { # STATION
  in_station "$1" wpa_supplicant -B -t -f "$work/supplicant$1.log" -P "$work/supplicant$1.pid" -D nl80211 -i "wlan$1" \
    -c "$work/supplicant$1.conf" >/dev/null
}

is_authorized() { # STATION NETWORK
  hostapd_cli -p /run/hostapd -i "$2" sta "$(station_mac "$1")" 2>/dev/null | grep -qF '[AUTHORIZED]'
}

join() { # STATION SSID PASSPHRASE NETWORK
  start_supplicant "$1" "$2" "$3"
  eventually 40 is_authorized "$1" "$4"
}

is_linked() { # STATION: as the station itself sees it
  supplicant "$1" status | grep -q '^wpa_state=COMPLETED'
}

has_kept_link() { # STATION
  is_linked "$1" && ! grep -q CTRL-EVENT-DISCONNECTED "$work/supplicant$1.log"
}

# After a refusal a station waits for a while before it tries again; this one is told to try now.
try_again() { # STATION
  supplicant "$1" bssid_ignore clear >/dev/null
  supplicant "$1" select_network 0 >/dev/null
}

rejoins() { # STATION NETWORK
  is_authorized "$1" "$2" && is_linked "$1" && return 0
  try_again "$1"
  eventually 40 is_authorized "$1" "$2"
}

# The access point says no to a try that is made now.
is_rejected() { # STATION
  : >"$work/supplicant$1.log"
  try_again "$1"
  eventually 40 grep -q CTRL-EVENT-AUTH-REJECT "$work/supplicant$1.log" && ! is_linked "$1"
}

take_address() { # STATION ADDRESS-PATTERN
  cat >"$work/udhcpc.script" <<'SCRIPT'
#!/bin/sh
[ "$1" = bound ] || exit 0
ip -4 address flush dev "$interface"
ip address add "$ip/$mask" dev "$interface"
ip route replace default via "$router"
SCRIPT
  chmod 755 "$work/udhcpc.script"
  in_station "$1" busybox udhcpc -i "wlan$1" -n -q -t 10 -T 2 -x "hostname:device$1" -s "$work/udhcpc.script" \
    >/dev/null 2>&1 || return 1
  in_station "$1" ip -4 -o address show dev "wlan$1" | grep -q "inet $2"
}

reaches() { # STATION ADDRESS
  in_station "$1" busybox ping -q -c 2 -W 3 "$2" >/dev/null
}

# For a second: who is reached answers in a few hundredths of one.
hears_nothing() { # STATION ADDRESS
  ! in_station "$1" busybox ping -q -c 1 -W 1 "$2" >/dev/null
}

# The laptop of a neighbour, who guesses.
wrong_key_is_not_listed() {
  local result
  kill "$(cat "$work/supplicant$LAPTOP.pid")"
  eventually 10 not is_authorized "$LAPTOP" wlan0 || return 1
  start_supplicant "$LAPTOP" home wrong-secret-9
  eventually 40 grep -q "POSSIBLE-PSK-MISMATCH $(station_mac "$LAPTOP")" "$work/hostapd.log" &&
    same "$(macs_of "$PHONE")" "$(listed wlan0)"
  result=$?
  kill "$(cat "$work/supplicant$LAPTOP.pid")"
  eventually 10 not test -e "$work/supplicant$LAPTOP/wlan$LAPTOP"
  : >"$work/supplicant$LAPTOP.log"
  join "$LAPTOP" home change-this-1 wlan0 && return "$result"
}

# ---- what the platform and the API tell

probe() { # stations NETWORK | config ADAPTER
  "$build/tests/wifi/wifi_probe" "$@" 2>>"$work/probe.log"
}

stations() { # NETWORK
  probe stations "$1"
}

gives_no_list() { # NETWORK
  ! stations "$1" >/dev/null
}

listed() { # NETWORK: the MAC addresses, in order
  stations "$1" | jq -r '[.[].mac] | sort | join(" ")'
}

member_of() { # NETWORK STATION MEMBER
  stations "$1" | jq -r --arg mac "$(station_mac "$2")" --arg member "$3" '.[] | select(.mac == $mac) | .[$member]'
}

told_whole() { # NETWORK STATION ADDRESS-PATTERN
  stations "$1" | jq -e --arg mac "$(station_mac "$2")" --arg ip "^$3" --arg name "device$2" \
    --arg today "$(date +%Y/%m/%d)" 'map(select(.mac == $mac)) | length == 1 and (.[0] |
      (.ip | test($ip)) and .hostname == $name and .signalstrength < 0 and .signalstrength > -100 and
      .transferRX > 100 and .transferTX > 100 and (.asso_time | test("^[0-9:]{8} " + $today + "$")))' >/dev/null ||
    { stations "$1" >&2; return 1; }
}

set_filter() { # POLICY LIST
  local body answer
  body=$(jq -nc --arg policy "$1" --arg list "$2" '{mac_filter_policy: $policy, mac_filter_list: $list}')
  answer=$(call MacFilter 1 set "$body" | sed -n 1p)
  jq -e .success <<<"$answer" >/dev/null || { echo "# set: $answer" >&2; return 1; }
}

filter_is() { # POLICY LIST
  local answer
  answer=$(call MacFilter 1 get | sed -n 1p)
  jq -e --arg policy "$1" --argjson list "$2" \
    '.success and .data == {mac_filter_policy: $policy, mac_filter_list: $list}' <<<"$answer" >/dev/null ||
    { echo "# get: $answer" >&2; return 1; }
}

# ---- what the API tells of them

online() { # NETRANGE
  call ConnectionList 1 getcount "{\"scannertype\": \"all\", \"netrange\": \"$1\"}" | sed -n 1p | jq .data.devicecount
}

are_counted() { # ALL LOCAL GUEST
  [ "$1 $2 $3" = "$(online all) $(online local) $(online guest)" ]
}

# The task that looks at the network now reads the air first. Then it asks each station for a name, which none has here, with
# ten seconds' patience: that is left to itself meanwhile.
begins_to_list() {
  eventually 20 listing_has 3
}

listing_has() { # STATIONS
  call ConnectionList 1 get | sed -n 1p | jq -e --argjson count "$1" '.data.stations | length == $count' >/dev/null 2>&1
}

lists_stations() {
  listing=$(call ConnectionList 1 get | sed -n 1p)
  jq -e '.data.finish' <<<"$listing" >/dev/null &&
    told_over_api "$listing" '192\.168\.1\.' '192\.168\.2\.' "$PHONE" "$LAPTOP" "$TABLET"
}

# An answer of "get" lists these stations and no others, each with what the air tells of it.
told_over_api() { # ANSWER HOME-PATTERN GUEST-PATTERN STATION...
  local wanted
  wanted=$(macs_of "${@:4}")
  jq -e --arg wanted "$wanted" --arg home "^$2" --arg guest "^$3" --arg tablet "$(station_mac "$TABLET")" '
    .success and ([.data.stations[].mac] | sort | join(" ")) == $wanted and
    (.data.stations | all(.connection == "wifi" and .status and .signalstrength < 0 and .signalstrength > -100 and
      .transferRX > 100 and .transferTX > 100 and (.hostname | test("^device[123]$")) and
      (.mac as $mac | .ip | test(if $mac == $tablet then $guest else $home end))))' <<<"$1" >/dev/null ||
    { echo "$1" >&2; return 1; }
}

# What the scanner has found and kept, one kind of network at a time; each station under the bridge of its network.
store_lists() { # NETRANGE BRIDGE STATION...
  local answer
  answer=$(call ConnectionList 1 get "{\"scannertype\": \"all\", \"netrange\": \"$1\"}" | sed -n 1p)
  told_over_api "$answer" '192\.168\.1\.' '192\.168\.2\.' "${@:3}" &&
    same "$2" "$(jq -r '[.data.stations[].netif] | unique | join(" ")' <<<"$answer")"
}
