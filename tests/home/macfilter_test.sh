#!/bin/bash
# The MAC filter through the web API: the request's limits, the files, and Debian's hostapd, without a radio.
. "${0%/*}/checks.sh"

use_home macfilter
need "the home is up" home up
need "the server answers" start_server

filter() { call MacFilter 1 "$@" | sed -n 1p; } # METHOD [PARAMETERS]: prints the answer
parameters() { # POLICY COUNT
  jq -nc --arg policy "$1" --argjson count "$2" '
    def byte: . as $byte | [16, 1] | map($byte / . | floor % 16 | . as $at | "0123456789abcdef"[$at:$at + 1]) | add;
    {mac_filter_policy: $policy,
     mac_filter_list: ([range($count) | {mac: "02:00:00:01:\(. / 256 | floor | byte):\(. % 256 | byte)"}] | tojson)}'
}
is_told() { # ANSWER COUNT
  jq -e --argjson count "$2" '.success and .data.mac_filter_policy == "allow" and
    (.data.mac_filter_list | length == $count and .[-1] ==
      {mac: "02:00:00:01:07:cf", desc: null, mac_filter_enabled: null})' <<<"$1" >/dev/null
}
hostapd_says() { at router hostapd_cli -p /run/hostapd -i none0 "$@"; }

check "without an adapter it fails" same '{"mac_filter_list":[]}' "$(filter get | jq -c '.error.data // .data')"
at router sh -c 'mkdir -p /etc/hostapd /run/hostapd; printf "interface=none0\ndriver=none\nctrl_interface=/run/hostapd\nssid=x
hw_mode=g\nchannel=1\n" >/etc/hostapd/none0.conf; hostapd -B /etc/hostapd/none0.conf >/dev/null'
need "hostapd runs" eventually 5 hostapd_says ping

start=$(now_ms)
check "two thousand entries are taken" succeeded "$(filter set "$(parameters allow 2000)")"
took=$(($(now_ms) - start))
check "within 2 s ($took ms)" test "$took" -lt 2000
check "they are what get tells" is_told "$(filter get)" 2000
check "hostapd has them" same 02:00:00:01:00:00 "$(hostapd_says accept_acl SHOW | sed -n 's/ VLAN_ID=0$//p' | head -n 1)"
check "all of them" same 02:00:00:01:07:cf "$(at router tail -n 1 /etc/vorn/wireless/none0.accept)"
check "hostapd has removed the last" same OK "$(hostapd_says accept_acl DEL_MAC 02:00:00:01:07:cf | tail -n 1)"
at router rm -f /etc/hostapd/none0.conf
finish
