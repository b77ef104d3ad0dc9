#!/usr/bin/env bash
# Runs as root in the emulator: a third network of the adapter, whose stations a RADIUS server knows by name (WPA-Enterprise),
# under the same MAC filter. Who comes in must please both.
. "${BASH_SOURCE[0]%/*}/frame.sh"

readonly OFFICE=xwlan0

add_office() {
  cat >>/etc/hostapd/wlan0.conf <<CONF

bss=$OFFICE
bridge=lbr0
ctrl_interface=/run/hostapd
ssid=office
ieee8021x=1
wpa=2
wpa_key_mgmt=WPA-EAP
rsn_pairwise=CCMP
own_ip_addr=127.0.0.1
auth_server_addr=127.0.0.1
auth_server_port=1812
auth_server_shared_secret=radius-secret-1
CONF
}

# The RADIUS server that hostapd has in itself: of a network that is on no radio.
start_radius() {
  cat >"$work/radius.conf" <<CONF
interface=radius0
driver=none
eap_server=1
eap_user_file=$work/radius.users
radius_server_clients=$work/radius.clients
radius_server_auth_port=1812
CONF
  echo '127.0.0.1/32 radius-secret-1' >"$work/radius.clients"
  echo '"laptop" PWD "word-of-laptop"' >"$work/radius.users"
  hostapd -B -t -P "$work/radius.pid" -f "$work/radius.log" "$work/radius.conf"
}

stop_radius() {
  kill -KILL "$(cat "$work/radius.pid")"
}

start_office_supplicant() { # PASSWORD
  cat >"$work/supplicant$LAPTOP.conf" <<CONF
ctrl_interface=$work/supplicant$LAPTOP
network={
  ssid="office"
  key_mgmt=WPA-EAP
  eap=PWD
  identity="laptop"
  password="$1"
  scan_freq=2437
}
CONF
  run_supplicant "$LAPTOP"
}

joins_office() { # PASSWORD
  start_office_supplicant "$1"
  eventually 40 is_authorized "$LAPTOP" "$OFFICE"
}

is_refused_by_radius() { # PASSWORD
  start_office_supplicant "$1"
  eventually 40 grep -q CTRL-EVENT-EAP-FAILURE "$work/supplicant$LAPTOP.log" && ! is_authorized "$LAPTOP" "$OFFICE"
}

end_supplicant() {
  kill "$(cat "$work/supplicant$LAPTOP.pid")"
  eventually 10 not test -e "$work/supplicant$LAPTOP/wlan$LAPTOP"
  : >"$work/supplicant$LAPTOP.log"
}

entries() { # STATION...
  local station
  for station in "$@"; do
    jq -n --arg mac "$(station_mac "$station")" '{mac: $mac, desc: "", mac_filter_enabled: true}'
  done | jq -sc .
}

need "the router comes up" prepare_router
add_office
need "the RADIUS server runs" start_radius
need "hostapd has its networks on the air" start_hostapd
need "the server answers" start_server

check "with a wrong word the laptop does not come in" is_refused_by_radius wrong-word
end_supplicant
need "with its own it does" joins_office word-of-laptop
check "it is listed in that network" same "$(macs_of "$LAPTOP")" "$(listed "$OFFICE")"

need "only the phone is allowed" set_filter allow "$(entries "$PHONE")"
check "the laptop loses its link" eventually 5 not is_linked "$LAPTOP"
check "and does not come back, whatever RADIUS says of it" is_rejected "$LAPTOP"

need "the laptop is allowed" set_filter allow "$(entries "$LAPTOP")"
check "it comes back" rejoins "$LAPTOP" "$OFFICE"

stop_radius
: >"$work/supplicant$LAPTOP.log"
need "without the RADIUS server the filter is changed" set_filter allow "$(entries "$LAPTOP" "$PHONE")"
check "the laptop has kept its link" has_kept_link "$LAPTOP"
need "the RADIUS server runs again" start_radius

need "the laptop is denied" set_filter deny "$(entries "$LAPTOP")"
check "it loses its link" eventually 5 not is_linked "$LAPTOP"
check "and does not come back" is_rejected "$LAPTOP"

need "the filter is switched off" set_filter disable "$(entries "$LAPTOP")"
check "the laptop comes back" rejoins "$LAPTOP" "$OFFICE"
end_supplicant
check "with a wrong word it still does not come in" is_refused_by_radius wrong-word
check "no sanitizer has something to say" not grep -hE 'Sanitizer|runtime error' "$work"/*.log
finish
