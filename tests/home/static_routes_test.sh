#!/bin/bash
# Static routes through the web API, seen on the wire. The networks 10.77.0.0/16 and fd77::/16 are behind the laptop, or
# behind the printer, as the rules say.
. "${0%/*}/checks.sh"

use_home static_routes
need "the home is up" home up
need "the server answers" start_server

routes() { # METHOD PARAMETERS: prints the answer
  call Static.Route 1 "$1" "$2" | sed -n 1p
}
rule() { # NETWORK MASK GATEWAY [INTERFACE]
  jq -nc --arg ip "$1" --arg mask "$2" --arg gateway "$3" --arg ifname "${4:-lbr0}" \
    '{ip: $ip, mask: $mask, prefix_length: $mask, gateway: $gateway, ifname: $ifname, enable: true}'
}
list() { # RULE...
  local IFS=,
  echo "[$*]"
}
set_rules() { # FAMILY LIST: prints the answer
  routes set "{\"type\": \"$1\", \"rules\": $2}"
}
are_set() { succeeded "$(set_rules "$@")"; }
page() { # ADDRESS: what the router finds there
  at router curl --silent --noproxy '*' --max-time 2 "http://$1/"
}
own_routes() { at router sh -c 'ip -4 route show proto 86; ip -6 route show proto 86' | sed 's/ *$//'; }
files_and_routes() {
  at router sh -c 'cat /etc/iproute2/config/static-route* 2>/dev/null; ip -4 route; ip -6 route | grep -v expires'
}

readonly LAPTOP=192.168.1.110 PRINTER=192.168.1.111
at laptop sh -c 'ip addr add 10.77.0.1/32 dev lo; ip addr add 10.79.0.1/32 dev lo; ip addr add fd77::1/128 dev lo
  ip addr add 2001:db8:2::110/64 dev eth0 nodad'
at printer sh -c 'ip addr add 10.77.0.1/32 dev lo; mkdir -p /var/page; echo "page of printer" >/var/page/index.html
  busybox httpd -p 80 -h /var/page'

need "a rule is taken" are_set ipv4 "$(list "$(rule 10.77.0.0 255.255.0.0 $LAPTOP)")"
check "a packet takes its gateway" same "page of laptop" "$(page 10.77.0.1)"
need "one by another gateway is taken" are_set ipv4 "$(list "$(rule 10.77.0.0 255.255.0.0 $PRINTER)")"
check "the packet takes that one" same "page of printer" "$(page 10.77.0.1)"
need "the first is taken again" are_set ipv4 "$(list "$(rule 10.77.0.0 255.255.0.0 $LAPTOP)")"
need "an IPv6 rule is taken" are_set ipv6 "$(list "$(rule fd77:: 16 2001:db8:2::110)")"
check "an IPv6 packet takes its gateway" same "page of laptop" "$(page '[fd77::1]')"
check "get tells that it is installed" same '[["10.77.0.0",true]]' \
  "$(routes get '{"type": "ipv4"}' | jq -c '[.data.rules[] | [.ip, .installed]]')"
check "tablesget shows main as main-table" same '["default","main-table","local"]' \
  "$(routes tablesget '{"type": "ipv4"}' | jq -c '[.data.tables[].name] - ["wan2"]')"
test_of() { routes test "{\"type\": \"ipv4\", \"rule\": $1}" | jq -c 'if .success then .data else .error.code end'; }
check "test finds a good rule good" same '{"valid":true}' "$(test_of "$(rule 10.90.0.0 255.255.0.0 $LAPTOP)")"
check "and a bad one bad" same 4300 "$(test_of "$(rule 10.90.0.1 255.255.0.0 $LAPTOP)")"

at router ip route add 10.78.0.0/16 dev lbr0 proto static # in the way of a rule
before=$(files_and_routes)
refused() { # CODE FAMILY LIST
  same "$1" "$(set_rules "$2" "$3" | jq .error.code)" && same "$before" "$(files_and_routes)"
}
check "a list that the kernel refuses half-way changes nothing" refused 4300 ipv4 \
  "$(list "$(rule 10.77.0.0 255.255.0.0 $PRINTER)" "$(rule 10.79.0.0 255.255.0.0 $LAPTOP)" \
    "$(rule 10.78.0.0 255.255.0.0 $LAPTOP)")"
check "the old route carries traffic still" same "page of laptop" "$(page 10.77.0.1)"
many_rules() { # FIRST COUNT
  jq -nc --argjson first "$1" --argjson count "$2" '[range($first; $first + $count) | {ip:
    "10.\(128 + . / 256 | floor).\(. % 256).0", mask: "255.255.255.0", gateway: "192.168.1.110", ifname: "lbr0", enable: true}]'
}
set_many() { # COUNT: prints the answer; the list is too long for a command line
  echo "{\"type\": \"ipv4\", \"rules\": $(many_rules 0 "$1")}" >"$state/log/many"
  routes set "@$state/log/many"
}
check "10,000 rules are refused by the server" same 400 "$(set_many 10000 | jq .error.code)"
check "2,000 by the platform" same 4300 "$(set_many 2000 | jq .error.code)"
check "and change nothing" same "$before" "$(files_and_routes)"
check "1,000 are taken" succeeded "$(set_many 1000)"
check "and are in the kernel" same 1000 "$(at router ip -4 route show proto 86 | wc -l)"
need "the one is taken again" are_set ipv4 "$(list "$(rule 10.77.0.0 255.255.0.0 $LAPTOP)")"
good=$(rule 10.79.0.0 255.255.0.0 $LAPTOP)
check "a text in place of a boolean is refused" refused 4300 ipv4 "$(list "$good" "${good/true/\"true\"}")"
check "host bits are" refused 4300 ipv4 "$(list "$good" "$(rule 10.80.0.1 255.255.0.0 $LAPTOP)")"
check "a duplicate is" refused 4300 ipv4 "$(list "$good" "$good")"
check "a gateway off the link is" refused 4300 ipv4 "$(list "$(rule 10.80.0.0 255.255.0.0 203.0.113.1)")"
for length in 129 -1 64x; do
  check "the prefix length $length is" refused 4300 ipv6 "$(list "$(rule fd78:: $length 2001:db8:2::110)")"
done
for name in 'eth0;id' ../x -x sixteencharacters lo nosuch0 ''; do
  check "the interface \"$name\" is" refused 4300 ipv4 "$(list "$(jq -nc --argjson r "$good" --arg n "$name" '$r + {ifname: $n}')")"
done
check "\"type\" in capitals is" refused 4302 IPV4 "$(list "$good")"
check "a list that is none is" refused 4302 ipv4 '{"0": 1}'
check "the same server still answers" eval '[ "$(at router pidof vornwebd | wc -w)" = 1 ]'

at router ip link set lbr0 down
at router ip link set lbr0 up
is_back() { same "page of laptop" "$(page 10.77.0.1)" 2>/dev/null; }
check "a rule comes back with its interface" eventually 5 is_back

at router ip route delete 10.78.0.0/16 dev lbr0 2>/dev/null
port=${api##*:}
one=$(many_rules 0 200)
other=$(many_rules 200 150)
set_order() { # NAMES
  succeeded "$(call Gateway.List 1 set "{\"iptype\": \"ipv4\", \"ifnames\": $1}" | sed -n 1p)"
}
agree() { # the file's rules are the kernel's routes, no more and no fewer; the ways out are in the file's order
  local stored
  stored=$(at router cat /etc/iproute2/config/static-route | jq -r '.[] | "\(.ip)/24"' | sort)
  same "$stored" "$(at router ip -4 route show proto 86 | awk '{ print $1 }' | sort)" &&
    same "$(at router cat /etc/iproute2/config/gateway-order | xargs)" \
      "$(at router ip -4 route show default | sed -n 's/.* dev \([^ ]*\) .*metric \([0-9]*\).*/\2 \1/p' | sort -n |
        sed 's/.* //' | xargs)"
}
agree_quietly() { agree 2>/dev/null; }
need "the router brings its second way out up" bring_second_up
agreed=0
for round in 1 2 3 4 5; do
  (while set_rules ipv4 "$one" && set_rules ipv4 "$other"; do :; done) >/dev/null 2>&1 &
  rules_writer=$!
  (while set_order '["eth0", "eth1"]' && set_order '["eth1", "eth0"]'; do :; done) >/dev/null 2>&1 &
  order_writer=$!
  sleep "0.3$round"
  kill_server || echo "the server was not killed"
  wait "$rules_writer" "$order_writer"
  need "started again (round $round)" start_server "$port"
  if eventually 5 agree_quietly; then agreed=$((agreed + 1)); else agree; fi
done
check "files and kernel agree after each of 5 kills of the server" same 5 "$agreed"
check "and it takes rules as ever" are_set ipv4 '[]'
check "the last route is gone" same "" "$(at router ip -4 route show proto 86)"
finish
