#!/bin/bash
# Parental time control as a family lives with it: set over the web API, kept by cron at the full hour, seen on the wire.
# The router's clock stands in the evening of a Monday in 2030: a library that moves it is preloaded into all of its
# programs but the server, whose own clock is the real one.
. "${0%/*}/checks.sh"

fake_time=$(dpkg -L libfaketime 2>/dev/null | grep '/libfaketime.so.1$') || { echo "SKIP: package libfaketime"; exit 77; }
laptop=d4:3d:7e:11:22:33

use_home timecontrol
need "the home is up" home up
need "the server answers" start_server

# ---- what a person asks for

week() { # MARK SLOT...: a schedule with that mark in these slots and '0' elsewhere; in all of them without a SLOT
  local mark=$1 slots slot
  printf -v slots '%0168d' 0
  shift
  [ "$#" -gt 0 ] || slots=${slots//0/$mark}
  for slot in "$@"; do slots=${slots:0:slot}$mark${slots:slot+1}; done
  echo "$slots"
}

rule() { # MAC SCHEDULE [ENABLED]
  echo "{\"mac\": \"$1\", \"clientname\": \"one of us\", \"schedule\": \"$2\", \"tcenable\": ${3:-true}}"
}

set_rules() { # RULES: succeeds when the router does
  call ParentalControl 1 set "$(jq -nc --arg rules "$1" '{rules: $rules}')" | sed -n 1p | jq -e .success >/dev/null
}

rules() { call ParentalControl 1 get | sed -n 1p | jq -c .data.rules; }
statuses() { rules | jq -c 'map(.status)'; }

# ---- what the router has

cut() { at router nft -j list set inet vorn_timecontrol cut | jq -c '[.nftables[].set.elem[]?]'; }
has_table() { at router nft list table inet vorn_timecontrol >/dev/null 2>&1; }
cron_files() { at router sh -c 'grep -ls vorntimecontrol /etc/cron.d/*' | wc -l; }
copies() { at router sh -c 'ls /tmp | grep -c timec'; }

nothing_is_enforced() {
  fact "no table" not has_table && fact "no cron file" same 0 "$(cron_files)" && fact "no copies" same 0 "$(copies)"
}

is_enforced() { # CUT
  fact "the table" same "$1" "$(cut)" && fact "a cron file" same 1 "$(cron_files)" && fact "copies" same 2 "$(copies)"
}

# ---- the clock and cron

set_clock() { # "2030-03-04 19:59:50", as the clocks on the wall show it
  local now
  at router sh -c "echo '$fake_time' >/etc/ld.so.preload"
  now=$(date -d "TZ=\"Europe/Berlin\" $1" +%s)
  at router sh -c "echo '+$((now - EPOCHSECONDS))' >/etc/faketimerc"
}

cut_is() { [ "$(cut)" = "$1" ]; }

# Cron lives through a full hour, which comes within some seconds. Then it is stopped: a moved clock would not wake it.
pass_hour() { # "2030-03-04 20:00" CUT: succeeds when those devices are cut after it
  local reached=0
  set_clock "$(date -u -d "$1 UTC - 6 seconds" '+%F %T')"
  at router sh -c 'mkdir -p /var/spool/cron/crontabs; exec cron -f' 2>/dev/null &
  eventually 20 cut_is "$2" || reached=1
  at router sh -c 'kill "$(cat /run/crond.pid)"'
  wait "$!" 2>/dev/null
  return "$reached"
}

# ---- the wire

downloads=/tmp/download
download() { # HOST FAMILY URL
  at "$1" sh -c "exec curl --silent --no-buffer --noproxy '*' '$3' >$downloads.$2" 2>/dev/null &
}
size() { at "$1" stat -c %s "$downloads.$2"; } # HOST FAMILY
runs() { # HOST FAMILY
  local before
  before=$(size "$1" "$2")
  sleep 0.5
  [ "$(size "$1" "$2")" -gt "$before" ]
}
laptops_sizes() { at laptop stat -c %s "$downloads".{v4,v6,udp} | xargs; }
opens() { # HOST URL: whether a new download gets its first bytes
  [ "$(at "$1" sh -c "curl --silent --no-buffer --noproxy '*' --max-time 2 '$2' | head -c 100 | wc -c")" = 100 ]
}
v4="http://203.0.113.1:9000/" v6="http://[2001:db8:1::1]:9000/"

at isp perl "$root/tests/home/pour.pl" 9000 2>/dev/null &
at router cp /usr/share/zoneinfo/Europe/Berlin /etc/localtime.new
at router mv /etc/localtime.new /etc/localtime
set_clock "2030-03-04 19:30:00"

# ---- an evening

check "there are no rules at first" same '[]' "$(rules)"
monday_20=$((24 + 20))
need "the laptop is to go to bed at 20:00" set_rules "[$(rule "$laptop" "$(week 1 $monday_20)"), $(rule 3c:2a:f4:11:22:44 "$(week 1)" false)]"
check "until then nobody is cut" is_enforced '[]'
check "the rules are told as they were set" same '["d4:3d:7e:11:22:33","3c:2a:f4:11:22:44"]' "$(rules | jq -c 'map(.mac)')"

for host in laptop printer; do
  need "the $host has IPv6" eventually 20 opens "$host" "$v6" # the router's advertisement may take its time
  download "$host" v4 "$v4"
  download "$host" v6 "$v6"
done
# A stream that asks for nothing: nobody but the router can stop it.
at isp perl "$root/tests/home/traffic.pl" stream 0 udp:9001 &>/dev/null &
at laptop sh -c "exec perl '$root/tests/home/traffic.pl' receive udp 203.0.113.1 9001 120 >$downloads.udp" 2>/dev/null &

for host in laptop printer; do
  for family in v4 v6; do need "the $host downloads over IP$family" eventually 5 runs "$host" "$family"; done
done

need "the laptop receives a stream over UDP" eventually 5 runs laptop udp

check "the hour comes" pass_hour "2030-03-04 20:00" "[\"$laptop\"]"
sleep 0.5
at_half=$(laptops_sizes)
sleep 0.5
check "half a second later nothing comes to the laptop any more: IPv4, IPv6, the stream" same "$at_half" "$(laptops_sizes)"
for family in v4 v6; do check "the printer's goes on" runs printer "$family"; done
check "the laptop cannot begin another one" not opens laptop "$v4"
check "nor over IPv6" not opens laptop "$v6"
check "nor with another address" at laptop ip addr add 192.168.1.77/24 dev eth0
check "which it does not get out with" not at laptop curl --silent --noproxy '*' --max-time 2 --interface 192.168.1.77 "$v4" -o /dev/null
check "it still reaches the router" at laptop busybox ping -c 1 -W 2 192.168.1.1 >/dev/null
check "a person is told" eventually 5 at router sh -c "/tmp/vorntimecontrol --status | grep -q '^$laptop  cut until Monday 21:00'"

check "the hour passes" pass_hour "2030-03-04 21:00" '[]'
for url in "$v4" "$v6"; do check "the laptop is back: $url" opens laptop "$url"; done
check "its stream over UDP goes on" eventually 5 runs laptop udp
for family in v4 v6; do check "its download over IP$family goes on" eventually 20 runs laptop "$family"; done

# ---- switching it off and on

need "the laptop is cut at all hours" set_rules "[$(rule "$laptop" "$(week 1)")]"
check "it is" is_enforced "[\"$laptop\"]"
check "and \"get\" says so" same '[1]' "$(statuses)"
check "nothing comes through" not opens laptop "$v4"
need "all rules are removed" set_rules '[]'
check "nothing of it is left" nothing_is_enforced
check "nor the rule file" at router test ! -e /etc/parental/timectrl.ui.conf
check "the laptop is back at once" opens laptop "$v4"

need "a rule that is switched off is stored" set_rules "[$(rule "$laptop" "$(week 1)" false)]"
check "it is told" same '[false]' "$(rules | jq -c 'map(.tcenable)')"
check "and not enforced" nothing_is_enforced

# ---- rules that cannot be kept

odd="$(rule 01:00:5e:00:00:01 "$(week 1)"), $(rule nonsense "$(week 1)"), $(rule D4-3D-7E-11-22-33 111), $(rule "$laptop" "$(week 1)")"
need "a bad rule among good ones is taken" set_rules "[$odd]"
check "and left out, with the others kept" is_enforced "[\"$laptop\"]"
for bad in "01:00:5e:00:00:01" nonsense D4-3D-7E-11-22-33; do check "the log names it" home_log_has "rule [$bad]"; done
before=$(at router md5sum /etc/parental/timectrl.ui.conf)
check "a text with a NUL in it is refused" not set_rules '[{"mac": "a", "clientname": "b\u0000c", "schedule": "1", "tcenable": true}]'
check "so is a name with a line end in it" not set_rules '[{"mac": "a", "clientname": "b\nc", "schedule": "1", "tcenable": true}]'
check "so is one without its texts" not set_rules '[{}]'
check "so is what is no array" not set_rules '{}'
check "and the rules stand" same "$before" "$(at router md5sum /etc/parental/timectrl.ui.conf)"
check "and are enforced" is_enforced "[\"$laptop\"]"

# ---- a restart of the router, and of the server in the middle of its work

restart_router() { # what of it matters here
  at router sh -c 'rm -rf /tmp/* /run/vorntimecontrol.state; nft delete table inet vorn_timecontrol'
  at router /usr/vorn/sbin/vorntimecontrol --restore
}
check "after a restart" restart_router
check "the stored rules are enforced" is_enforced "[\"$laptop\"]"
check "and can be removed" set_rules '[]'
check "with nothing left" nothing_is_enforced

# Rules for all hours need no moved clock any more, and a server that starts with the library that moves it would hang:
# the library and the server's allocator wait for one another.
at router rm /etc/ld.so.preload
for delay in 0.00 0.02 0.04 0.06 0.08 0.10 0.13 0.16 0.20 0.25; do
  set_rules "[$(rule "$laptop" "$(week 1)")]" &
  setting=$!
  sleep "$delay"
  need "the server is killed after $delay s" kill_server
  wait "$setting"
  sleep 0.5 # the program that it was running ends
  need "and started again" start_server
  check "killed after $delay s: setting again succeeds" set_rules "[$(rule "$laptop" "$(week 1)")]"
  check "and the state is right" is_enforced "[\"$laptop\"]"
  check "removing succeeds" set_rules '[]'
  check "and leaves nothing" nothing_is_enforced
done
finish
