#!/bin/bash
# Two administrators change the same thing at the same time over the web API: what stands afterwards is one of the two
# changes and whole, what was set for another device is not lost, and nobody reads a mixture meanwhile.
. "${0%/*}/checks.sh"

readonly ROUNDS=20 SIZE=12 # changes by each of the two; rules in a list

use_home writers
need "the home is up" home up
need "the server answers" start_server
work=$(mktemp -d)
trap 'rm -rf "$work"; take_all_down' EXIT

answer() { call "$@" | sed -n 1p; }

forwards() { # WHOSE ROUND: a list of SIZE rules, all of which bear the mark
  jq -nc --arg mark "$1-$2" --argjson size "$SIZE" '{rules: ([range($size) | {enabled: true, service: $mark, protocol: "tcp",
    sourcePort: "\(9000 + .)", targetIP: "192.168.1.110", targetPort: "80"}] | tojson)}'
}
week() {
  jq -nc --arg mark "$1-$2" --argjson size "$SIZE" '{rules: ([range($size) | {mac: "02:00:00:00:00:\(. + 10)",
    clientname: $mark, schedule: ("0" * 168), tcenable: true}] | tojson)}'
}
routes() {
  local network=$((($1 == 1 ? 100 : 150) + $2))
  jq -nc --arg network "$network" --argjson size "$SIZE" '{type: "ipv4", rules: [range($size) |
    {ip: "10.\($network).\(.).0", mask: "255.255.255.0", gateway: "192.168.1.110", ifname: "lbr0", enable: true}]}'
}
filter() {
  jq -nc --arg mark "$(printf '%02d' "$2")" --arg who "$1" --argjson size "$SIZE" '{mac_filter_policy: "deny",
    mac_filter_list: ([range($size) | {mac: "02:0\($who):00:00:\($mark):\(. + 10)"}] | tojson)}'
}

# Prints a mark for each rule of an answer: one mark, SIZE times, when the list is whole.
marks() { # ROW
  case $1 in
    PortForward) jq -r '.data.rules[].service' ;;
    ParentalControl) jq -r '.data.rules[].clientname' ;;
    Static.Route) jq -r '.data.rules[].ip | split(".")[1]' ;;
    MacFilter) jq -r '.data.mac_filter_list[].mac[0:14]' ;;
  esac
}
is_whole() { # ROW ANSWER
  [ "$(marks "$1" <<<"$2" | sort | uniq -c | awk '{ print $1 }')" = "$SIZE" ]
}

write_often() { # ROW MAKE WHOSE: leaves the answers that were no success
  local round
  for round in $(seq "$ROUNDS"); do
    given=$(answer "$1" 1 set "$("$2" "$3" "$round")")
    succeeded "$given" || echo "$given"
  done >"$work/refused-$3"
}
read_often() { # ROW GET-PARAMETERS: until $work/over is there; leaves the answers that are no whole list
  local given count=0
  while [ ! -e "$work/over" ]; do
    given=$(answer "$1" 1 get "$2")
    is_whole "$1" "$given" || echo "$given"
    count=$((count + 1))
  done >"$work/torn"
  echo "$count" >"$work/read"
}

both_write() { # ROW MAKE GET-PARAMETERS
  local reader last
  rm -f "$work/over"
  need "$1: the first list is set" succeeded "$(answer "$1" 1 set "$("$2" 1 0)")"
  read_often "$1" "$3" &
  reader=$!
  write_often "$1" "$2" 1 &
  write_often "$1" "$2" 2
  wait "$!"
  touch "$work/over"
  wait "$reader"
  check "$1: every change was taken" test ! -s "$work/refused-1" -a ! -s "$work/refused-2"
  head -n 2 "$work"/refused-*
  check "$1: who read meanwhile ($(cat "$work/read") times) got whole lists" test ! -s "$work/torn"
  head -n 1 "$work/torn" | cut -c 1-400
  last=$(answer "$1" 1 get "$3")
  check "$1: what stands is whole" is_whole "$1" "$last"
  check "$1: and the last change of one of the two" same "$(marks "$1" <<<"$last" | uniq)" \
    "$(marks "$1" <<<"$last" | uniq | grep -xE "[12]-$ROUNDS|1[27]0|02:0[12]:00:00:$ROUNDS")"
}

both_write PortForward forwards '{}'
kernel_has_what_is_stored() { at router /etc/rc.network status >/dev/null; }
check "PortForward: the kernel has what is stored" kernel_has_what_is_stored
both_write ParentalControl week '{}'
both_write Static.Route routes '{"type": "ipv4"}'
stored=$(answer Static.Route 1 get '{"type": "ipv4"}' | jq -r '.data.rules[] | select(.installed) | .ip' | sort)
check "Static.Route: the kernel has what is stored" same "$stored" \
  "$(at router ip -j -4 route show proto 86 | jq -r '.[].dst | split("/")[0]' | sort)"
at router sh -c 'mkdir -p /etc/hostapd /run/hostapd; printf "interface=none0\ndriver=none\nctrl_interface=/run/hostapd\nssid=x
hw_mode=g\nchannel=1\n" >/etc/hostapd/none0.conf; hostapd -B /etc/hostapd/none0.conf >/dev/null'
hostapd_answers() { at router hostapd_cli -p /run/hostapd -i none0 ping >/dev/null 2>&1; }
need "hostapd runs" eventually 5 hostapd_answers
both_write MacFilter filter '{}'
check "MacFilter: hostapd has what is told" same \
  "$(answer MacFilter 1 get | jq -r '.data.mac_filter_list[].mac' | sort)" \
  "$(at router hostapd_cli -p /run/hostapd -i none0 deny_acl SHOW | cut -d ' ' -f 1 | sort)"
at router rm -f /etc/hostapd/none0.conf

# ---- names: each of the two gives those of its own devices

name_often() { # WHOSE
  local round
  for round in $(seq 50); do
    succeeded "$(answer ConnectionList 1 set \
      "{\"mac\": \"02:00:00:00:0$1:$((round + 10))\", \"hostname\": \"name $1-$round\", \"type\": \"nas\"}")" || echo "$round"
  done >"$work/refused-$1"
}
name_often 1 &
name_often 2
wait "$!"
check "ConnectionList: every name was taken" test ! -s "$work/refused-1" -a ! -s "$work/refused-2"
check "ConnectionList: none was lost" same 100 "$(answer ConnectionList 1 get '{"scannertype": "all"}' | jq '[.data.stations[] |
  select(.hostname == ((.mac | capture("0(?<who>[12]):(?<round>..)$")) as $of | "name \($of.who)-\(($of.round | tonumber) - 10)")?)] |
  length')"

# ---- the DMZ: its two texts belong together

dmz_often() { # LAST-BYTE
  local round
  for round in $(seq "$ROUNDS"); do
    succeeded "$(answer DMZ 1 set "{\"enable\": true, \"ip\": \"192.168.1.$1\"}")" || echo "$round"
    succeeded "$(answer DMZ 1 set '{"enable": false}')" || echo "$round off"
  done >"$work/refused-$1"
}
dmz_often 110 &
dmz_often 111
wait "$!"
check "DMZ: every change was taken" test ! -s "$work/refused-110" -a ! -s "$work/refused-111"
check "DMZ: it is off in the end" same null "$(answer DMZ 1 get | jq .data)"
check "DMZ: the kernel has what is stored" kernel_has_what_is_stored
finish
