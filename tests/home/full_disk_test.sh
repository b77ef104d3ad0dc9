#!/bin/bash
# A full disk under each folder that the web API writes to: the call answers with its documented failure, nothing is half
# written, what was set before still counts, and the next call works once there is room again.
. "${0%/*}/checks.sh"

use_home fulldisk
need "the home is up" home up
work=$(mktemp -d)
trap 'rm -rf "$work"; take_all_down' EXIT

# ---- disks of a few pages

small_disk() { # FOLDER PAGES: with what is in the folder
  at router sh -c 'mkdir -p "$1" /tmp/kept && mount -t tmpfs -o size="$2"k,mode=755 tmpfs /tmp/kept && cp -a "$1"/. /tmp/kept/ &&
    chmod --reference="$1" /tmp/kept && mount --move /tmp/kept "$1"' - "$1" $(($2 * 4))
}
fill() { # FOLDER PAGES-LEFT
  at router sh -c 'dd if=/dev/zero of="$1/filler" bs=4k 2>/dev/null
    size=$(stat -c %s "$1/filler") && truncate -s $((size - $2 * 4096)) "$1/filler"' - "$1" "$2"
}
make_room() { at router rm "$1/filler"; } # FOLDER
content() { # FOLDER: each file with its mode and digest
  at router sh -c 'cd "$1" && find . -type f ! -name filler -exec stat -c "%n %a" {} + -exec sha256sum {} + | sort' - "$1"
}

answer() { call "$@" | sed -n 1p; }
code() { answer "$@" | jq .error.code; }

# What a row does on the full disk; $wanted is what "get" tells before, during and after.
fails_whole() { # ROW FOLDER PARAMETERS GET-PARAMETERS PAGES-LEFT...
  local row=$1 folder=$2 before files left
  before=$(answer "$row" 1 get "$4") files=$(content "$folder")
  need "$row: get tells something" succeeded "$before"
  for left in "${@:5}"; do
    fill "$folder" "$left"
    check "$row with $left pages left: refused with 4300" same 4300 "$(code "$row" 1 set "$3")"
    check "$row with $left pages left: get tells what it told" same "$before" "$(answer "$row" 1 get "$4")"
    make_room "$folder"
    check "$row with $left pages left: every file is as it was" same "$files" "$(content "$folder")"
  done
}
then_works() { # ROW PARAMETERS
  check "$1: works once there is room" succeeded "$(answer "$1" 1 set "$2")"
}

# Eight thousand bytes of text, so that its file ends in the third page: a disk with one left takes the beginning.
long=$(printf 'x%.0s' $(seq 8000))
forward() { # PORT NAME
  jq -nc --arg port "$1" --arg name "$2" '{rules: ([{enabled: true, service: $name, protocol: "tcp", sourcePort: $port,
    targetIP: "192.168.1.110", targetPort: "80"}] | tojson)}'
}
route() { # NETWORK...
  jq -nc '{type: "ipv4", rules: [$ARGS.positional[] | {ip: ., mask: "255.255.255.0", gateway: "192.168.1.110", ifname: "lbr0",
    enable: true}]}' --args "$@"
}
week() { # NAME MAC...
  jq -nc --arg name "$1" '{rules: ([$ARGS.positional[] | {mac: ., clientname: $name, schedule: ("0" * 168), tcenable: true}] |
    tojson)}' --args "${@:2}"
}
filter() { # MAC...
  jq -nc '{mac_filter_policy: "deny", mac_filter_list: ([$ARGS.positional[] | {mac: .}] | tojson)}' --args "$@"
}

# ---- the state of the server and the device store: before either is opened

need "the device scanner ends" at router sh -c 'kill "$(pidof vorndevices)"'
scanner_ended() { not at router pidof vorndevices >/dev/null; }
need "it has ended" eventually 5 scanner_ended
at router mkdir -m 700 -p /var/lib/vorn
need "a small disk for the state" small_disk /var/lib/vorn 128
at router sh -c '/usr/vorn/sbin/vorndevices watch </dev/null >/dev/null 2>&1 &'
need "the server answers" start_server

name_device() { answer ConnectionList 1 set "{\"mac\": \"02:00:00:00:00:$1\", \"hostname\": \"$2\", \"type\": \"nas\"}"; }
names() {
  answer ConnectionList 1 get '{"scannertype": "all"}' |
    jq -c '[.data.stations[] | select(.mac | startswith("02:00:00:00:00:")) | [.mac, .hostname]] | sort'
}
need "a device is named" succeeded "$(name_device 01 first)"
fill /var/lib/vorn 0
# The database may have room in pages that it has already: it takes names until there is none.
refused='' last=first
for number in $(seq 200); do
  given=$(name_device 01 "$long-$number")
  succeeded "$given" || { refused=$given; break; }
  last=$long-$number
done
check "a name beyond the disk is refused with 4300 (try $number)" same 4300 "$(jq .error.code <<<"$refused")"
check "the device has the last name that was acknowledged" test "[[\"02:00:00:00:00:01\",\"$last\"]]" = "$(names)"

own() { # PATH PARAMETERS: prints the answer's status; the answer is in $work/answer
  curl --silent --noproxy '*' --max-time 20 --cookie "$work/cookies" --cookie-jar "$work/cookies" --output "$work/answer" \
    --write-out '%{http_code}' --header 'Content-Type: application/json' --header "X-CSRF-Token: $csrf" \
    --data-binary "$2" "http://$api/webapi/$1"
}
login() { # PASSWORD
  rm -f "$work/cookies"
  same 200 "$(own login "{\"user\": \"admin\", \"password\": \"$1\"}")" && csrf=$(jq -r .data.csrf "$work/answer")
}
csrf='' first=$(at router cat /var/lib/vorn/first-password)
state_files() { content /var/lib/vorn | grep -v devices.db; }
need "the administrator logs in on the full disk" login "$first"
files=$(state_files)
check "a new password is not taken" same 500 "$(own password "{\"old\": \"$first\", \"new\": \"correct horse\"}")"
check "the state is as it was" same "$files" "$(state_files)"
check "the old password still lets in" login "$first"
make_room /var/lib/vorn
check "it is taken once there is room" same 200 "$(own password "{\"old\": \"$first\", \"new\": \"correct horse\"}")"
need "it lets in" login "correct horse"
fill /var/lib/vorn 0
files=$(state_files)
check "no token is made" same 500 "$(own tokens/make '{"name": "t", "access": "read", "days": 1}')"
check "the tokens are as they were" same "$files" "$(state_files)"
check "and none of that name is listed" same '200 ["lab"]' \
  "$(own tokens/list '{}') $(jq -c '[.data[].name]' "$work/answer")"
make_room /var/lib/vorn
check "one is made once there is room" same 200 "$(own tokens/make '{"name": "t", "access": "read", "days": 1}')"
check "a device is named once there is room" succeeded "$(name_device 01 second)"
check "and has that name" same '[["02:00:00:00:00:01","second"]]' "$(names)"

# ---- port forwards and the DMZ

folder=/etc/portforward/routerpf
at router mkdir -p "$folder"
need "a small disk for the port forwards" small_disk "$folder" 16
wan=$(addresses_of router eth0)
page() { at isp curl --silent --noproxy '*' --max-time 3 "http://$wan:8081/"; }
need "a forward is set" succeeded "$(answer PortForward 1 set "$(forward 8081 Web)")"
need "it works" same "page of laptop" "$(page)"
fails_whole PortForward "$folder" "$(forward 8082 "$long")" '{}' 0 1
check "the forward that was set still works" same "page of laptop" "$(page)"
then_works PortForward "$(forward 8081 "$long")"

# ---- static routes and the order of the ways out

folder=/etc/iproute2/config
at router mkdir -p "$folder"
need "a small disk for the routes" small_disk "$folder" 16
need "a route is set" succeeded "$(answer Static.Route 1 set "$(route 10.77.0.0)")"
mapfile -t networks < <(printf '10.78.%s.0\n' $(seq 60))
kernel_routes() { at router ip -4 route show proto 86; }
routes=$(kernel_routes)
fails_whole Static.Route "$folder" "$(route 10.77.0.0 "${networks[@]}")" '{"type": "ipv4"}' 0 1
check "the kernel has the route that was set, and no other" same "$routes" "$(kernel_routes)"
then_works Static.Route "$(route 10.77.0.0 "${networks[@]}")"

# ---- the MAC filter

at router sh -c 'mkdir -p /etc/hostapd /run/hostapd /etc/vorn/wireless; printf "interface=none0\ndriver=none
ctrl_interface=/run/hostapd\nssid=x\nhw_mode=g\nchannel=1\n" >/etc/hostapd/none0.conf; hostapd -B /etc/hostapd/none0.conf >/dev/null'
hostapd_answers() { at router hostapd_cli -p /run/hostapd -i none0 ping >/dev/null 2>&1; }
need "hostapd runs" eventually 5 hostapd_answers
folder=/etc/vorn/wireless
need "a small disk for its lists" small_disk "$folder" 64
need "a filter is set" succeeded "$(answer MacFilter 1 set "$(filter 02:00:00:00:01:00)")"
mapfile -t macs < <(printf '02:00:00:00:%s\n' {10..29}:{10..34})
hostapd_has() { at router hostapd_cli -p /run/hostapd -i none0 deny_acl SHOW | cut -d ' ' -f 1; }
fails_whole MacFilter "$folder" "$(filter "${macs[@]}")" '{}' 0 1 4 # four take the daemon's list and not our record of it
check "hostapd has the entry that was set, and no other" same 02:00:00:00:01:00 "$(hostapd_has)"
then_works MacFilter "$(filter "${macs[@]}")"
check "hostapd has the last of them too" same OK \
  "$(at router hostapd_cli -p /run/hostapd -i none0 deny_acl DEL_MAC 02:00:00:00:29:34 | tail -n 1)"
at router rm -f /etc/hostapd/none0.conf

# ---- time rules: a set begins by ending the old ones, which needs room for all that may follow

folder=/etc/parental
at router mkdir -p "$folder"
need "a small disk for the time rules" small_disk "$folder" 80
need "a rule is set" succeeded "$(answer ParentalControl 1 set "$(week before 02:00:00:00:00:01)")"
fails_whole ParentalControl "$folder" "$(week after 02:00:00:00:00:0{1,2,3,4})" '{}' 0 1 40
then_works ParentalControl "$(week after 02:00:00:00:00:0{1,2,3,4})"
check "ParentalControl: get tells all of them" same 4 "$(answer ParentalControl 1 get | jq '.data.rules | length')"

# ---- the topology

folder=/etc/sysconfig/network-scripts
need "a small disk for the interfaces' files" small_disk "$folder" 8
fill "$folder" 0
files=$(content "$folder")
set_topology bridge >/dev/null
need "the switch ends" eventually 40 switch_ended
check "the router is whole" eventually 15 is_whole_router
check "its files are as they were" same "$files" "$(content "$folder")"
make_room "$folder"
set_topology bridge >/dev/null
need "the switch with room ends" eventually 40 switch_ended
check "the bridge is whole" eventually 15 is_whole_bridge
check "the server is the one that was started" kill -0 "$server_pid"
finish
