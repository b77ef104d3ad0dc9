#!/bin/bash
# The hosts of the home are what they are said to be, seen on the wire.
. "${0%/*}/checks.sh"

use_home hosts
need "the home is up" home up

lease_names() { at router awk '{ print $4 }' /var/lib/misc/dnsmasq.leases | sort | xargs; }
netbios_name() { at router timeout 2 nmblookup -A 192.168.1.110 2>/dev/null | grep -q '^[[:space:]]*LAPTOP-ANNA '; }
page() { at "$1" curl --silent --noproxy '*' --max-time 3 "$2"; }
player_description() { page router http://192.168.1.113:8200/rootDesc.xml | grep -q '<friendlyName>Living Room<'; }
announced() { # SERVICE NAME
  at laptop perl "$root/tests/home/mdns_query.pl" 192.168.1.110 "$1.local" | grep -q "$2"
}
sensor_reads_web() { [ "$(page sensor 'http://[2001:db8:1::1]/')" = "page of isp" ]; }
no_ipv4() { [ -z "$(addresses_of "$1" eth0)" ]; }

check "the devices have leases under their names" same "camera laptop phone player printer" "$(lease_names)"
check "the laptop reads the provider's page by name" reads_web laptop
check "the guest's phone does too" reads_web phone
check "the phone does not reach the LAN" not page phone http://192.168.1.110/
check "the provider does not reach the LAN" not page isp http://192.168.1.110/
check "the router reaches the laptop" same "page of laptop" "$(page router http://192.168.1.110/)"
check "the laptop has a NetBIOS name" eventually 5 netbios_name
check "the printer announces itself" eventually 5 announced _ipp._tcp BRW3C2AF4112244
check "the camera announces itself" eventually 5 announced _axis-video._tcp axis-00408c112255
check "the player describes itself" eventually 5 player_description
check "the sensor has no IPv4 address" no_ipv4 sensor
# A solicitation that comes before the router has its prefix is repeated after 4 s (RFC 4861, RTR_SOLICITATION_INTERVAL);
# the router advertises by itself within 7 s of its start.
check "the sensor reads the provider's page over IPv6" eventually 20 sensor_reads_web
# A router that boots in topology "bridge" has no lbr0 yet when dnsmasq starts.
switch_to() { at router /usr/vorn/sbin/vorntopology switch "$1"; }
restart_dnsmasq() {
  at router sh -c 'pid=$(cat /run/dnsmasq.pid); kill -KILL "$pid"; while kill -0 "$pid"; do sleep 0.01; done' 2>/dev/null
  at router dnsmasq --conf-file=/etc/dnsmasq.d/vorn.conf --dhcp-hostsfile=/etc/vorn/addresses --no-ping
}
need "the router goes to \"bridge\"" switch_to bridge
check "which is whole" is_whole_bridge
check "dnsmasq starts without lbr0" restart_dnsmasq
need "the router goes back to \"router\"" switch_to router
check "which is whole: the LAN is served again" is_whole_router

check "the router's log is readable" at router logger -t hosts_test "a line of the test"
check "and has what was logged" eventually 5 home_log_has "hosts_test: a line of the test"
finish
