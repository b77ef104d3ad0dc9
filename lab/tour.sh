# shellcheck shell=bash
# The tour of the API in a home: asks, shows what came back, and checks it. The first wrong answer ends it.
# REQUIRES: lab/lib/look.sh and its variables; a server that answers at $api.

wrong() {
  echo "WRONG: $*" >&2
  exit 1
}

heading() {
  printf '\n== %s\n' "$*"
}

# Shows an answer and holds it against the HTTP status and a jq condition.
ask() { # STATUS CONDITION API VERSION METHOD [BODY [CURL-OPTION...]]
  local status=$1 condition=$2 answer body got
  shift 2
  echo "POST /webapi/VORN.Core.Network.Router.$1/$2/$3 ${4:-}"
  answer=$(call "$@") || wrong "$1 $3: the server does not answer"
  got=${answer##*$'\n'}
  body=${answer%$'\n'*}
  echo "$got $body"
  [ "$got" = "$status" ] || wrong "$1 version $2 $3: HTTP status $got, not $status"
  jq -e "$condition" <<<"$body" >/dev/null || wrong "$1 version $2 $3: not so: $condition"
}

tour_get() {
  heading "the topology, version 1 and 2"
  ask 200 '.success and (.data | keys) == ["has_wifi_dongle", "net_topology", "support_net_topology", "switching"] and
    .data.net_topology == "router" and .data.switching == false and .data.support_net_topology' Topology 1 get
  ask 200 '.success and (.data | length) == 6 and .data.net_topology == "router" and
    (.data.supported_mode | contains("router") and contains("bridge")) and .data.bridge_mode_forbidden == false' \
    Topology 2 get
}

show_ports() {
  echo "ports on the router (ip link):"
  at router ip -br link show type veth | sed 's/^/  /'
  echo "  br0: $(ports_of br0)"
  echo "  lbr0: $(ports_of lbr0)"
  echo "laptop: $(addresses_of laptop eth0), reads the provider's page: $(reads_web laptop && echo yes || echo no)"
}

tour_switch() { # TARGET
  heading "the switch to \"$1\""
  ask 200 '.success and (.data | has("redirect") and has("secure") and has("port") and has("auth_key") and
    (.ip_list | type) == "array")' Topology 1 set "{\"net_topology\": \"$1\"}"
  eventually 30 switch_ended || wrong "the switch does not end"
  ask 200 ".data.net_topology == \"$1\" and .data.bridge_mode_forbidden == $2" Topology 2 get
  "is_whole_$1" || wrong "the network is not in topology \"$1\""
  show_ports
}

tour_packages() {
  heading "recommended packages, from the provider's HTTPS server, in two languages"
  ask 200 '.success and .data.packages[0].name == "Media Server"' PkgList 1 get "" --header "Accept-Language: en"
  ask 200 '.success and .data.packages[0].name == "Medienserver"' PkgList 1 get "" --header "Accept-Language: de"
}

tour_refusals() {
  heading "requests that are refused"
  ask 400 '.success == false' Topology 1 set '{"net_topology": "bri'
  ask 404 '.success == false' Topology 2 set '{"net_topology": "bridge"}'
  ask 200 '.success == false and .error.code == 4302 and .error.data == null' Topology 1 set '{}'
  ask 200 '.data.net_topology == "router"' Topology 1 get
}

tour() {
  tour_get
  tour_switch bridge true
  tour_switch router false
  tour_packages
  tour_refusals
}
