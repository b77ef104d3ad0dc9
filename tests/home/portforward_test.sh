#!/bin/bash
# Port forwards and the DMZ on the wire: from the provider's side, and from inside by the outside address.
. "${0%/*}/checks.sh"

use_home forward
need "the home is up" home up
need "the server answers" start_server
wan=$(addresses_of router eth0)
seen=$(mktemp -d) # what programs in the background said

traffic() { # HOST COMMAND...
  at "$1" perl "$root/tests/home/traffic.pl" "${@:2}"
}

serve_traffic() { # HOST COMMAND...: in the background, until the home goes
  local said=$seen/$1-$2
  traffic "$@" >"$said" &
  eventually 5 grep -q ready "$said"
}

rule() { # SOURCE-PORT PROTOCOL TARGET-IP TARGET-PORT [ENABLED [NAME]]: prints a rule as JSON
  jq -nc --arg r "$1" --arg p "$2" --arg i "$3" --arg t "$4" --argjson e "${5:-true}" --arg n "${6:-test}" \
    '{sourcePort: $r, protocol: $p, targetIP: $i, targetPort: $t, enabled: $e, service: $n}'
}

set_rules() { # RULE...: prints the answer
  call PortForward 1 set "$(printf '%s\n' "$@" | jq -sc '{rules: tojson}')" | sed -n 1p
}

rules_are_set() { succeeded "$(set_rules "$@")"; }
set_dmz() { succeeded "$(call DMZ 1 set "$1" | sed -n 1p)"; }
page() { at "$1" curl --silent --noproxy '*' --max-time "${3:-3}" "$2"; }
answer_is() { # TEXT HOST PROTOCOL PORT
  same "$1" "$(traffic "$2" ask "$3" "$wan" "$4")"
}
no_answer() { ! traffic "$1" ask "$2" "$wan" "$3" >/dev/null; } # HOST PROTOCOL PORT
status_says() { at router /etc/rc.network status | grep -qF -- "$1"; }
as_stored() { at router /etc/rc.network status >/dev/null; }

readonly LAPTOP=192.168.1.110 PRINTER=192.168.1.111 CAMERA=192.168.1.112
need "the laptop's servers run" serve_traffic laptop answer laptop tcp:7000 tcp:7001 tcp:7002 udp:7000 udp:7001 udp:7002
need "the printer's servers run" serve_traffic printer answer printer tcp:9100 udp:9100 tcp:5353
need "the camera's servers run" serve_traffic camera answer camera tcp:7000 udp:4000 tcp:8443
need "the laptop's streams run" serve_traffic laptop stream 1 tcp:6000 udp:6000
need "the printer's streams run" serve_traffic printer stream 1000000 udp:6000

# ---- what goes where

web=$(rule 8081 tcp $LAPTOP 80 true Web)
shifted=$(rule 5000-5002 both $LAPTOP 7000-7002 true Shifted)
kept=$(rule 7000-7001 udp $LAPTOP 7000-7001 true Kept)
raw=$(rule 9100-9110 tcp $PRINTER 9100 true Raw)
check "nothing is forwarded before a rule" not page isp "http://$wan:8081/" 1
need "the rules are set" rules_are_set "$web" "$shifted" "$kept" "$raw"
check "the kernel has what is stored" as_stored
check "the provider's side gets the laptop's page" same "page of laptop" "$(page isp "http://$wan:8081/")"
for offset in 0 1 2; do
  for protocol in tcp udp; do
    check "$protocol $((5000 + offset)) is shifted" answer_is "laptop $protocol $((7000 + offset))" isp $protocol $((5000 + offset))
  done
done
check "a range without a shift" answer_is "laptop udp 7001" isp udp 7001
check "the port behind its end is not open" no_answer isp udp 7002
check "many ports to one" answer_is "printer tcp 9100" isp tcp 9107
check "UDP is not forwarded by a rule for TCP" no_answer isp udp 9107
check "the LAN cannot be reached past the rules" not page isp "http://$LAPTOP/" 1

# ---- from inside

for host in laptop printer phone router; do
  [ $host = router ] || check "the $host gets the page by the outside address" \
    same "page of laptop" "$(page $host "http://$wan:8081/")"
done
check "the router's own page is not forwarded: the LAN address stays the router's" \
  not page printer "http://192.168.1.1:8081/" 1
check "the laptop's web is still its own" same "page of laptop" "$(page printer "http://$LAPTOP/")"

# ---- the DMZ

check "without a DMZ the rest goes nowhere" no_answer isp tcp 7000
need "the DMZ is set" set_dmz "{\"enable\": true, \"ip\": \"$CAMERA\"}"
check "the kernel has what is stored" as_stored
check "the rest goes to the DMZ host" answer_is "camera tcp 7000" isp tcp 7000
check "UDP too" answer_is "camera udp 4000" isp udp 4000
check "the DMZ host's page" same "page of camera" "$(page isp "http://$wan/")"
check "a forward goes before the DMZ" same "page of laptop" "$(page isp "http://$wan:8081/")"
check "the management port does not go to the DMZ host" no_answer isp tcp 8443
check "the DMZ host is reached from inside by the outside address" same "page of camera" "$(page printer "http://$wan/")"
check "the router renews its address" at router sh -c 'kill -USR1 "$(pidof udhcpc)"; sleep 1; ip -4 -o addr show eth0 | grep -q 203.0.113'
need "the DMZ is switched off" set_dmz '{"enable": false}'
check "then the rest goes nowhere" no_answer isp tcp 7000
check "and the forwards stay" same "page of laptop" "$(page isp "http://$wan:8081/")"

# ---- connections that are open

# The outer and the inner port are the same, so that a translation made anew for the host's packets would look alike.
stream=$(rule 6000 both $LAPTOP 6000 true Stream)

start_receiving() { # NAME HOST PROTOCOL SECONDS [OWN-PORT]
  traffic "$2" receive "$3" "$wan" 6000 "$4" ${5:+"$5"} >"$seen/$1" &
  received=$!
  eventually 5 test -s "$seen/$1"
}

last_number() { grep -v closed "$seen/$1" | tail -n 1 | cut -d ' ' -f 1; }
last_ms() { grep -v closed "$seen/$1" | tail -n 1 | cut -d ' ' -f 2; }
without_gap() { # NAME
  grep -v closed "$seen/$1" | cut -d ' ' -f 1 |
    awk 'NR > 1 && $1 != last + 1 { print "gap from " last " to " $1 >"/dev/stderr"; gap = 1 } { last = $1 } END { exit gap || NR < 500 }'
}

for protocol in tcp udp; do
  need "the stream's rule is set" rules_are_set "$web" "$stream"
  start_receiving kept isp $protocol 5
  for round in $(seq 10); do
    check "round $round: another rule is changed" rules_are_set "$web" "$(rule $((7000 + round)) tcp $LAPTOP 80)" "$stream"
  done
  wait "$received"
  check "$protocol: no line of the stream was lost meanwhile" without_gap kept
done

for protocol in tcp udp; do
  for who in isp printer; do
    need "the stream's rule is set" rules_are_set "$web" "$stream"
    start_receiving cut $who $protocol 4
    sleep 0.5
    start=$(now_ms)
    need "it is disabled" rules_are_set "$web" "$(rule 6000 both $LAPTOP 6000 false Stream)"
    took=$(($(now_ms) - start))
    wait "$received"
    check "$protocol from $who: the open connection is cut at once ($(last_ms cut) ms)" test "$(last_ms cut)" -lt $((1500 + took))
    check "and new ones are not let in" no_answer $who $protocol 6000
  done
done

need "the stream's rule is set" rules_are_set "$stream"
start_receiving moved isp udp 4 33333
need "it is given to the printer" rules_are_set "$(rule 6000 udp $PRINTER 6000)"
wait "$received"
check "a client that goes on sending from the same port reaches the new host" test "$(last_number moved)" -gt 1000000
check "to the end" test "$(last_ms moved)" -gt 3500
need "it is given back" rules_are_set "$stream"
start_receiving back isp udp 2 33333
wait "$received"
check "and the old one when it has the port again" test "$(last_number back)" -lt 1000000
check "to the end" test "$(last_ms back)" -gt 1500

# ---- what is left out, and what is refused

need "a list with bad rules is stored" rules_are_set "$web" "$(rule 0 tcp $LAPTOP 80 true Zero)" \
  "$(rule 65536 tcp $LAPTOP 80 true High)" "$(rule 100-50 tcp $LAPTOP 80 true Backwards)" \
  "$(rule 90 tcp 203.0.113.1 80 true Outside)" "$(rule 8443 tcp $LAPTOP 80 true Own)" \
  "$(rule 8000-8090 tcp $LAPTOP 80 true Overlap)" "$(rule 91 'tcp; drop' $LAPTOP 80 true Shell)" "$raw"
check "the good ones work" same "page of laptop" "$(page isp "http://$wan:8081/")"
check "the last one too" answer_is "printer tcp 9100" isp tcp 9100
for line in 'rule 1 "Zero" left out: sourcePort "0": no port' 'rule 2 "High" left out: sourcePort "65536": no port' \
  'rule 3 "Backwards" left out: sourcePort "100-50": no port' \
  'rule 4 "Outside" left out: targetIP "203.0.113.1": in no LAN of this router' \
  "rule 5 \"Own\" left out: sourcePort \"8443\": has the router's management port 8443" \
  'rule 7 "Shell" left out: protocol "tcp; drop": not tcp, udp or both'; do
  check "the log says: $line" test "$(log_lines "$line")" -ge 1
  check "rc.network status says so too" status_says "${line/ left out/: left out}"
done

stored() { at router sha256sum /etc/portforward/routerpf/rule.conf; }
before=$(stored)
as_before() { same "$before" "$(stored)" && same "page of laptop" "$(page isp "http://$wan:8081/")"; }
code_of() { jq -r .error.code <<<"$1"; }
for name in $'a\nb' $'a\rb' $'\x01\n'; do
  check "a name that the file cannot hold is refused: $(printf %q "$name")" \
    same 4300 "$(code_of "$(set_rules "$(rule 9000 tcp $LAPTOP 80 true "$name")")")"
  check "and nothing has changed" as_before
done
for rules in 5 true null '{}' '[]' '"no json"' '"{}"' '"[[]]"' '"[{}]"' '"[1,2]"' '""' '"[{\"service\":\"a\\u0000b\"}]"'; do
  check "\"rules\" as $rules is refused" same 4300 "$(code_of "$(call PortForward 1 set "{\"rules\": $rules}" | sed -n 1p)")"
  check "and nothing has changed" as_before
done
check "no \"rules\" is refused" same 4300 "$(code_of "$(call PortForward 1 set '{}' | sed -n 1p)")"
deep=$(printf '[%.0s' $(seq 2000))
check "rules nested 2,000 deep are refused" same 4300 "$(code_of "$(call PortForward 1 set "{\"rules\": \"$deep\"}" | sed -n 1p)")"
check "a DMZ outside the LAN is refused" same 4300 "$(code_of "$(call DMZ 1 set '{"enable": true, "ip": "203.0.113.9"}' | sed -n 1p)")"
check "and nothing has changed" as_before

odd='a "quoted" [x] = # \ é <b>$(id)</b>'
need "a rule with an odd name is stored" rules_are_set "$web" "$(rule 9000 tcp $LAPTOP 80 true "$odd")" \
  "$(rule 9001 tcp $LAPTOP 80 true "$(printf 'x%.0s' $(seq 65536))")"
names=$(call PortForward 1 get | sed -n 1p)
check "and comes back as it was" same "$odd" "$(jq -r '.data.rules[1].service' <<<"$names")"
check "so does one of 64 KiB" same 65536 "$(jq -r '.data.rules[2].service | length' <<<"$names")"
check "the ids are the places" same "0 1 2" "$(jq -r '[.data.rules[].id] | join(" ")' <<<"$names")"

# ---- failure

need "the rules are set" rules_are_set "$web"
at router sh -c 'mv /etc/rc.network /etc/rc.network.away'
check "a set that cannot be applied is answered with 4300" same 4300 "$(code_of "$(set_rules "$raw")")"
check "and the old rules work" same "page of laptop" "$(page isp "http://$wan:8081/")"
at router sh -c 'mv /etc/rc.network.away /etc/rc.network'
check "the status tells that the table is not what is stored" not as_stored
check "start-dnat makes it so" at router /etc/rc.network start-dnat
check "the new rule works" answer_is "printer tcp 9100" isp tcp 9100
check "the old one does not" not page isp "http://$wan:8081/" 1

# ---- many rules

many() { # COUNT
  jq -nc --argjson n "$1" '[range($n) | {enabled: true, protocol: "tcp", service: "rule \(.)", targetIP: "192.168.1.110",
    sourcePort: "\(10000 + .)", targetPort: "80"}] | {rules: tojson}' >"$seen/body"
}
set_many() { succeeded "$(call PortForward 1 set @"$seen/body" | sed -n 1p)"; }
many 5000
check "5,000 rules are set" set_many
check "the last one works" same "page of laptop" "$(page isp "http://$wan:14999/")"
check "all of them are listed" same 5000 "$(call PortForward 1 get | sed -n 1p | jq '.data.rules | length')"
many 1000
check "1,000 rules are set" set_many
best=9999
for _ in 1 2 3 4 5; do
  start=$(now_ms)
  need "1,000 rules are set again" set_many
  took=$(($(now_ms) - start))
  [ "$took" -ge "$best" ] || best=$took
done
check "1,000 rules, from the request to the answer: under 250 ms ($best ms)" test "$best" -lt 250

# ---- local LAN

check "the LAN interfaces are those of the kernel" \
  same "gbr0 192.168.2.1 255.255.255.0, lbr0 192.168.1.1 255.255.255.0" \
  "$(call LocalLan 1 get | sed -n 1p | jq -r '[.data.local_lan[] | "\(.netif) \(.ip) \(.mask)"] | sort | join(", ")')"
# ---- another topology

need "the rules are set" rules_are_set "$web"
need "the DMZ is set" set_dmz "{\"enable\": true, \"ip\": \"$CAMERA\"}"
set_topology bridge >/dev/null
need "the switch to \"bridge\" ends" eventually 40 switch_ended
check "the rule's device is in no LAN now" eventually 5 status_says 'left out: targetIP "192.168.1.110": in no LAN'
check "and nothing but what is stored is installed" as_stored
set_topology router >/dev/null
need "the switch back ends" eventually 40 switch_ended
check "the rule is installed again" eventually 5 status_says 'rule 0 "Web": installed'
wan=$(addresses_of router eth0)
laptop_has_page() { page isp "http://$wan:8081/" >/dev/null; }
check "the laptop is plugged in anew" home plug laptop
check "and serves its page to the provider's side" eventually 5 laptop_has_page
rm -rf "$seen"
finish
