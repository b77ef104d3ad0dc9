#!/bin/bash
# Every method that stores something, on a disk that has become read-only: each is refused, with the old configuration in files and kernel,
# by a server that goes on; and each works again when the disk does.
. "${0%/*}/checks.sh"

use_home readonly
need "the home is up" home up
need "the server answers" start_server
readonly LAPTOP=d4:3d:7e:11:22:33 PRINTER=3c:2a:f4:11:22:44

code() { # API BODY: 0 for success
  call "$1" 1 set "$2" | sed -n 1p | jq 'if .success then 0 else .error.code end'
}

forwards() { # PORT
  jq -nc --arg port "$1" '{rules: ([{sourcePort: $port, protocol: "tcp", targetIP: "192.168.1.110", targetPort: "80", enabled: true,
    service: "test"}] | tojson)}'
}
dmz() { jq -nc --arg ip "$1" '{enable: true, ip: $ip}'; } # IP
routes() { # NETWORK
  jq -nc --arg ip "$1" '{type: "ipv4", rules: [{ip: $ip, mask: "255.255.0.0", prefix_length: "255.255.0.0", gateway: "192.168.1.110",
    ifname: "lbr0", enable: true}]}'
}
order() { jq -nc --argjson names "$1" '{iptype: "ipv4", ifnames: $names}'; } # NAMES
hours() { # MARK
  jq -nc --arg mac "$PRINTER" --arg mark "$1" '{rules: ([{mac: $mac, clientname: "printer", schedule: ($mark * 168), tcenable: true}] | tojson)}'
}
name() { jq -nc --arg mac "$LAPTOP" --arg name "$1" '{mac: $mac, hostname: $name, type: "laptop"}'; } # NAME

stored() { # every byte of the configuration, and what the kernel has of it; which addresses are cut is learnt from packets
  at router sh -c 'cd /etc && find iproute2 portforward parental cron.d sysconfig vorn -type f -exec md5sum {} + | sort
    ip -4 route; ip -4 rule; nft -s list ruleset' | sed '/counter packets/d; /^\tset cut[46] {/,/^\t}/d'
}
unchanged() { diff <(echo "$before") <(stored) >&2; }

all_are_stored() { # WHICH: of two configurations
  local port=8080 ip=192.168.1.110 network=10.77.0.0 names='["eth0", "eth1"]' mark=1 called=First
  if [ "$1" = second ]; then
    port=9090 ip=192.168.1.111 network=10.78.0.0 names='["eth1", "eth0"]' mark=0 called=Second
  fi
  same "0 0 0 0 0 0" "$(code PortForward "$(forwards "$port")") $(code DMZ "$(dmz "$ip")") $(code Static.Route "$(routes "$network")") $(
    code Gateway.List "$(order "$names")") $(code ParentalControl "$(hours "$mark")") $(code ConnectionList "$(name "$called")")"
}

name_is() { # NAME: which the owner gave the laptop
  at router /usr/vorn/sbin/vorndevices json | jq -e --arg mac "$LAPTOP" --arg name "$1" \
    '.ClientList[] | select(.macAddr == $mac).userdef_displayName == $name' >/dev/null
}

need "a configuration is stored" all_are_stored first
before=$(stored)
at router touch /tmp/since

# Nothing of the second configuration is taken where the first one stands.
at router sh -c 'mount -o remount,ro /etc && mount --bind /var/lib/vorn /var/lib/vorn && mount -o remount,bind,ro /var/lib/vorn'
check "a port forward is refused" same 4300 "$(code PortForward "$(forwards 9090)")"
check "a DMZ is" same 4300 "$(code DMZ "$(dmz 192.168.1.111)")"
check "a static route is" same 4300 "$(code Static.Route "$(routes 10.78.0.0)")"
check "an order of the ways out is" same 4300 "$(code Gateway.List "$(order '["eth1", "eth0"]')")"
check "a device's name is" same 4300 "$(code ConnectionList "$(name Second)")"
check "hours of a device are" same 4300 "$(code ParentalControl "$(hours 0)")"
check "all is as it was" unchanged
check "no file of a write that failed is left" same "" "$(at router find /etc -newer /tmp/since -type f)"
check "a switch of the topology is asked for" succeeded "$(set_topology bridge)"
check "it ends" eventually 40 switch_ended
check "it is undone" is_whole_router
check "all is as it was after the switch" unchanged

at router sh -c 'umount /var/lib/vorn && mount -o remount,rw /etc'
check "the device has the name that it had" name_is First
check "when the disk can be written again, the other configuration is stored" all_are_stored second
check "with the other name" name_is Second
check "and the first one" all_are_stored first
check "which gives what was there" unchanged

finish
