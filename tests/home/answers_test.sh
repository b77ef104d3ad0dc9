#!/bin/bash
# /openapi.json is true of a router at work: requests and answers of every row are of its schemas.
. "${0%/*}/checks.sh"

use_home answers
need "the home is up" home up
at router sh -c 'mkdir -p /etc/hostapd /run/hostapd; printf "interface=none0\ndriver=none\nctrl_interface=/run/hostapd\nssid=x
hw_mode=g\nchannel=1\n" >/etc/hostapd/none0.conf; hostapd -B /etc/hostapd/none0.conf >/dev/null'
hostapd_answers() { at router hostapd_cli -p /run/hostapd -i none0 ping >/dev/null 2>&1; }
need "hostapd runs" eventually 5 hostapd_answers
need "the server answers" start_server
devices() { call ConnectionList 1 get '{"scannertype": "all"}' | sed -n 1p | jq '.data.stations | length'; }
some_devices() { [ "$(devices)" -ge 4 ]; }
need "devices have been seen" eventually 30 some_devices
check "requests and answers are as described" "$root/tests/home/answers_check.py" "http://$api" "$(cat "$state/token")"
need "the switch has ended" eventually 40 switch_ended
finish
