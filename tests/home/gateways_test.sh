#!/bin/bash
# Two ways out: the order of the gateways, seen on the wire. The provider's web server is behind both and tells whose a
# request is.
. "${0%/*}/checks.sh"

use_home gateways
need "the home is up" home up
need "the server answers" start_server

gateways() { # METHOD PARAMETERS: prints the answer
  call Gateway.List 1 "$1" "$2" | sed -n 1p
}
facts_of() { # FAMILY FILTER: prints the records, short
  gateways get "{\"iptype\": \"$1\", \"type\": \"$2\"}" |
    jq -c '[.data.configs[] | [.priority, .ifname, .gateway, .dns, .state, .active]]'
}
source_of() { # HOST ADDRESS: whose the host's request is, seen by the provider
  at "$1" curl --silent --noproxy '*' --max-time 1 "http://$2/address"
}
laptop_leaves_by() { matches "$1" "$(source_of laptop 192.0.2.80)"; }
router_leaves_by() { matches "$1" "$(source_of router '[2001:db8:80::80]')"; }
sensor_reaches_web() { matches "2001:db8:2:*" "$(source_of sensor '[2001:db8:80::80]')"; }
set_order() { # FAMILY NAMES
  succeeded "$(gateways set "{\"iptype\": \"$1\", \"ifnames\": $2}")"
}
files_and_routes() {
  at router sh -c 'cat /etc/iproute2/config/* 2>/dev/null; ip -4 route; ip -6 route show default proto 87'
}

readonly FIRST='203.0.113.*' SECOND='198.51.100.*' FIRST6='2001:db8:1:*' SECOND6='2001:db8:9:*'

need "the router brings its second way out up" bring_second_up
check "the traffic leaves by the first all the same" laptop_leaves_by "$FIRST"

need "the order eth1, eth0 is taken" set_order ipv4 '["eth1", "eth0"]'
check "the laptop's traffic leaves by eth1" laptop_leaves_by "$SECOND"
check "default-gateway names it" same DEVICE=eth1 "$(at router cat /etc/iproute2/config/default-gateway)"
need "the order eth0, eth1 is taken" set_order ipv4 '["eth0", "eth1"]'
check "it leaves by eth0 again" laptop_leaves_by "$FIRST"
check "default-gateway names it" same DEVICE=eth0 "$(at router cat /etc/iproute2/config/default-gateway)"
check "get tells of both, with what the leases say" same \
  '[[0,"eth0","203.0.113.1","203.0.113.1","ready",true],[1,"eth1","198.51.100.1","198.51.100.1","ready",false]]' \
  "$(facts_of ipv4 all)"
check "the filter \"active\" leaves the one" same '[[0,"eth0","203.0.113.1","203.0.113.1","ready",true]]' \
  "$(facts_of ipv4 active)"

need "the IPv6 order eth1, eth0 is taken" set_order ipv6 '["eth1", "eth0"]'
check "the router's own IPv6 traffic leaves by eth1" eventually 20 router_leaves_by "$SECOND6"
need "the IPv6 order eth0, eth1 is taken" set_order ipv6 '["eth0", "eth1"]'
# A way out counts for good when its link has been up for 5 seconds, and the home is young.
check "it leaves by eth0 again" eventually 10 router_leaves_by "$FIRST6"
check "the sensor reaches the web" eventually 20 sensor_reaches_web

at isp ip link set eth0 down
started=$(now_ms)
check "the first way's cable is pulled: the laptop reaches the web by eth1" eventually 3 laptop_leaves_by "$SECOND"
echo "after $(($(now_ms) - started)) ms"
check "IPv6 leaves by eth1" eventually 5 router_leaves_by "$SECOND6"
check "the sensor reaches the web" eventually 5 sensor_reaches_web
by_name() { matches "page of isp" "$(at laptop curl --silent --noproxy '*' --max-time 3 http://both.isp.test/)"; }
check "names are found by eth1, too" eventually 5 by_name
check "get tells so" same '[["eth0","no-link",false],["eth1","ready",true]]' \
  "$(gateways get '{"iptype": "ipv4", "type": ""}' | jq -c '[.data.configs[] | [.ifname, .state, .active]]')"

flaps() { # what the laptop's requests are while the cable is put in and pulled out
  for _ in 1 2 3; do
    at isp ip link set eth0 up
    sleep 0.5
    source_of laptop 192.0.2.80
    at isp ip link set eth0 down
    sleep 0.2
    source_of laptop 192.0.2.80
  done | sed 's/\.[0-9]*$//' | sort | uniq -c | xargs
}
check "a loose cable does not move it to and fro" same "6 198.51.100" "$(flaps)"
at isp sh -c 'ip link set eth0 up && ip addr add 2001:db8:1::1/64 dev eth0'
check "the cable is back for good: so is the traffic" eventually 10 laptop_leaves_by "$FIRST"

at router ip link set eth0 down
check "eth0 is switched off: the laptop reaches the web by eth1" eventually 3 laptop_leaves_by "$SECOND"
at router ip link set eth0 up
check "switched on again it carries the traffic again" eventually 10 laptop_leaves_by "$FIRST"

before=$(files_and_routes)
refused() { # CODE PARAMETERS
  local got
  got=$(gateways set "$2" | jq .error.code)
  same "$1" "$got" && same "$before" "$(files_and_routes)"
}
check "a number among the names is refused" refused 4302 '{"iptype": "ipv4", "ifnames": ["eth1", 5]}'
check "a null among them is" refused 4302 '{"iptype": "ipv4", "ifnames": ["eth1", null]}'
check "a text in place of the list is" refused 4302 '{"iptype": "ipv4", "ifnames": "eth1"}'
check "a name that is none is" refused 4300 '{"iptype": "ipv4", "ifnames": ["eth1;id"]}'
check "the loopback is" refused 4300 '{"iptype": "ipv4", "ifnames": ["lo"]}'
check "an unknown family is" refused 4300 '{"iptype": "IPv4", "ifnames": ["eth1"]}'
check "a missing family is" refused 4302 '{"ifnames": ["eth1"]}'
check "a name given twice is" refused 4302 '{"iptype": "ipv4", "ifnames": ["eth1", "eth1"]}'
check "and the traffic leaves as before" laptop_leaves_by "$FIRST"

# A later name that the platform refuses ends the order there. What was taken before it stands, and all say the same.
need "the order eth1 is taken" set_order ipv4 '["eth1"]'
half=$(files_and_routes)
need "the order eth0, eth1 is taken" set_order ipv4 '["eth0", "eth1"]'
need "files and routes are as before" same "$before" "$(files_and_routes)"
check "a later name that is none is refused" same 4300 \
  "$(gateways set '{"iptype": "ipv4", "ifnames": ["eth1", "eth0;id"]}' | jq .error.code)"
check "files and kernel agree on what was taken before it" same "$half" "$(files_and_routes)"
check "and the traffic leaves so" laptop_leaves_by "$SECOND"
finish
