#!/bin/bash
# The list of client devices as an owner meets it over the web API: at once from the store, and as a listing that is polled
# while names are looked up.
. "${0%/*}/checks.sh"

use_home list
need "the home is up" home up
need "the server answers" start_server

readonly LAPTOP=d4:3d:7e:11:22:33 PRINTER=3c:2a:f4:11:22:44 PHONE=f8:e4:3b:11:22:66
readonly ALL=6 LOCAL=5 GUESTS=1
readonly IPV4=5 IPV4_LOCAL=4 # a listing is of the ARP table: the sensor speaks IPv6 alone

list() { # METHOD [BODY [CURL-OPTION...]]: prints the answer
  call ConnectionList 1 "$@" | sed -n 1p
}
poll() { list get; }
at_once() { list get '{"scannertype": "all"}'; }
station() { # MAC: its record on the standard input
  jq -c --arg mac "$1" '.data.stations[]? | select(.mac == $mac)'
}
member() { # MAC KEY: of the store's record
  at_once | station "$1" | jq -r --arg key "$2" '.[$key]'
}
count() { # NETRANGE
  list getcount "{\"netrange\": \"$1\"}" | jq .data.devicecount
}
counts_are() { [ "$(count all) $(count local) $(count guest)" = "$1" ]; }
is_shown() { # MAC KEY VALUE
  [ "$(member "$1" "$2")" = "$3" ]
}

# ---- at once

check "all devices are counted" eventually 20 counts_are "$ALL $LOCAL $GUESTS"
check "all are listed" same "$ALL" "$(at_once | jq '.data.stations | length')"
check "the guests are one" same "$PHONE" \
  "$(list get '{"scannertype": "all", "netrange": "guest"}' | jq -r '.data.stations[].mac')"
check "the local ones are the others" same "$LOCAL" \
  "$(list get '{"scannertype": "all", "netrange": "local"}' | jq '.data.stations | length')"
check "an unknown range keeps nobody" same "[]" \
  "$(list get '{"scannertype": "all", "netrange": "elsewhere"}' | jq -c '.data.stations')"
check "the laptop is there, on a cable, in the LAN" same '["lbr0","ethernet",true]' \
  "$(at_once | station $LAPTOP | jq -c '[.netif, .connection, .status]')"
check "and its address" matches "192.168.1.*" "$(member $LAPTOP ip)"
check "the maker of the printer is told" same "Brother Industries, LTD." "$(member $PRINTER brand)"

# ---- a listing, and what another user sees of it

make_other() { mkdir "$state/other" && (umask 077 && at router /usr/sbin/vornwebd --make-token other >"$state/other/token"); }
need "somebody else has a token" make_other
others_poll() { state=$state/other poll; }

started=$(poll)
check "the first get starts a listing" same '["finish","id"]' "$(jq -c '.data | keys' <<<"$started")"
check "another user's get starts one of his own" same '["finish","id"]' "$(others_poll | jq -c '.data | keys')"
named=0 underway=0 finished=''
deadline=$((SECONDS + 120))
while [ "$SECONDS" -lt "$deadline" ] && [ -z "$finished" ]; do
  answer=$(poll)
  if [ "$(jq .data.finish <<<"$answer")" = true ]; then
    finished=$answer
  elif [ "$(jq '.data.stations | length' <<<"$answer")" = $IPV4 ]; then
    underway=$((underway + 1))
    [ "$(station $LAPTOP <<<"$answer" | jq -r .hostname)" != LAPTOP-ANNA ] || named=$((named + 1))
  fi
  sleep 0.5
done
check "the listing finishes" test -n "$finished"
check "long before, its answers have all devices ($underway times)" test "$underway" -gt 5
check "and the laptop's name as soon as it is known ($named times)" test "$named" -gt 0
check "in the end all devices are listed" same "$IPV4" "$(jq '.data.stations | length' <<<"$finished")"
check "with the laptop's name" same LAPTOP-ANNA "$(station $LAPTOP <<<"$finished" | jq -r .hostname)"
check "the names are kept for root alone" same 600 "$(at router stat -c %a /tmp/connectionlist.txt)"
again=$(poll)
check "the next get starts anew" same '["finish","id"]' "$(jq -c '.data | keys' <<<"$again")"
check "and not the one that was" not same "$(jq .data.id <<<"$started")" "$(jq .data.id <<<"$again")" 2>/dev/null
his_has_ended() { [ "$(others_poll | jq .data.finish)" = true ]; }
check "the other user's listing is there until he has read its end" eventually 60 his_has_ended
# The guest's phone has a cable here, and a refresh asks on the LAN bridge alone: it is back when it next says something.
first_with_stations() { answer=$(poll) && [ "$(jq '.data.stations | length' <<<"$answer")" -ge "$IPV4_LOCAL" ]; }
need "the new listing has its stations" eventually 5 first_with_stations
check "with the name of the last time, long before anybody was asked" same LAPTOP-ANNA \
  "$(station $LAPTOP <<<"$answer" | jq -r .hostname)"

kept() { at router jq -c '[.stations[].hostname] | map(select(. != "")) | sort' /tmp/connectionlist.txt; }
names=$(kept)
check "names are kept" same '["LAPTOP-ANNA"]' "$names"
need "the server is killed in the middle of a listing" kill_server
need "and started again" start_server
check "the names are there" same "$names" "$(kept)"
check "a new listing can be started" same '["finish","id"]' "$(poll | jq -c '.data | keys')"

# ---- the owner's names

rename() { # MAC NAME TYPE: succeeds when the router does
  list set "$(jq -nc --arg mac "$1" --arg name "$2" --arg type "$3" '{mac: $mac, hostname: $name, type: $type}')" |
    jq -e .success >/dev/null
}
restart_all() { # server, scanner, and all that does not outlive a restart
  kill_server || return 1
  at router sh -c 'kill -KILL "$(pidof vorndevices)"; rm -rf /tmp/* /run/vorn
    /usr/vorn/sbin/vorndevices watch </dev/null >/dev/null 2>&1 &'
  start_server 0
}
name='Annas Laptop <i>"1"</i> $(id) ä'
check "the laptop is renamed" rename $LAPTOP "$name" computer
check "it is shown so" is_shown $LAPTOP hostname "$name"
need "everything is restarted" restart_all
check "the name stands" eventually 10 is_shown $LAPTOP hostname "$name"
check "so does its type" is_shown $LAPTOP type computer

# ---- killed in the middle

rename_without_end() { # the last name that the router has said yes to stands in the file "named"
  local number=0
  while rename $PRINTER "printer $number" printer; do
    echo "printer $number" >"$state/named"
    number=$((number + 1))
  done
}
for delay in 0.20 0.33 0.47 0.61; do
  rename_without_end &
  renaming=$!
  sleep "$delay"
  need "the server is killed while it stores a name" kill_server
  wait "$renaming"
  need "and started again" start_server
  said=$(<"$state/named")
  got=$(member $PRINTER hostname)
  check "the last name that it had said yes to is there, or the one under way ($said: $got)" \
    test "$got" = "$said" -o "$got" = "printer $((${said#printer } + 1))"
  check "and the laptop's" is_shown $LAPTOP hostname "$name"
done

# ---- forgotten, unplugged

forget() { list delete "{\"mac\": \"$1\"}" | jq -e .success >/dev/null; }
check "the player goes" home exec player ip link set eth0 down
check "it is no longer counted" eventually 61 counts_are "$((ALL - 1)) $((LOCAL - 1)) $GUESTS"
check "but listed, as gone" same false "$(member b0:a7:37:11:22:77 status)"
check "it is forgotten" forget b0:a7:37:11:22:77
check "and listed no more" same "" "$(member b0:a7:37:11:22:77 mac)"
check "what is not known cannot be forgotten" not forget b0:a7:37:11:22:77

# ---- memory

listings() { # NUMBER: as many in one connection
  local more=() i
  for ((i = 1; i < $1; i++)); do
    more+=(--output /dev/null "http://$api/webapi/VORN.Core.Network.Router.ConnectionList/1/get")
  done
  [ "$(call ConnectionList 1 get '{"scannertype": "all"}' --output /dev/null "${more[@]}" | grep -c 200)" = "$1" ]
}
resident() { # of the server, in kB
  at router sh -c 'awk "/^VmRSS/ { print \$2 }" "/proc/$(pidof vornwebd)/status"'
}
check "10 listings" listings 10
after_10=$(resident)
check "and 1,000" listings 1000
after_1000=$(resident)
check "1,000 listings hold no more memory than 10 ($after_10 kB, then $after_1000 kB)" test "$((after_1000 - after_10))" -le 256
finish
