#!/bin/bash
# The devices of the home, as the scanner finds them: names, makers, kinds, and who is there.
. "${0%/*}/checks.sh"

use_home devices
need "the home is up" home up

readonly LAPTOP=d4:3d:7e:11:22:33 PRINTER=3c:2a:f4:11:22:44 CAMERA=00:40:8c:11:22:55 PLAYER=b0:a7:37:11:22:77
readonly PHONE=f8:e4:3b:11:22:66 SENSOR=24:0a:c4:11:22:88

vorndevices() { at router /usr/vorn/sbin/vorndevices "$@"; }
entry() { # MAC TYPE: prints the device's entry, or nothing
  vorndevices json "$2" | jq -c --arg mac "$1" '.ClientList[]? | select(.macAddr == $mac)'
}
says() { # MAC TYPE KEY VALUE: whether the entry's member is so
  same "$4" "$(entry "$1" "$2" | jq -r --arg key "$3" '.[$key]')" 2>/dev/null
}
state_of_device() { # MAC: online, "-", or nothing; as a person reads it
  vorndevices list | awk -v mac="$1" '$2 == mac { print $1 }'
}
is_online() { same online "$(state_of_device "$1")" 2>/dev/null; }
is_gone() { same - "$(state_of_device "$1")" 2>/dev/null; }
scanner_pid() { at router pidof vorndevices; }
all_online() { same 6 "$(vorndevices list | grep -c '^online')" 2>/dev/null; }

check "the bridges take an answer as news" same "1 1" \
  "$(at router sysctl -n net.ipv4.conf.lbr0.arp_accept net.ipv4.conf.gbr0.arp_accept | xargs)"
check "all devices are there" eventually 20 all_online
check "the sensor, which speaks IPv6 alone and says nothing, is in the LAN" says $SENSOR all netif lbr0
check "it has no IPv4 address" says $SENSOR all ipAddr null
check "the laptop has its NetBIOS name" eventually 60 says $LAPTOP netbios displayName LAPTOP-ANNA
check "and its name by DHCP" says $LAPTOP dhcp displayName laptop
check "of both, people see the first" says $LAPTOP all displayName LAPTOP-ANNA
check "the printer has its multicast DNS name" eventually 60 says $PRINTER all displayName BRW3C2AF4112244
check "it is a printer" says $PRINTER all deviceType Printer
check "of a model" says $PRINTER all modelName "Brother HL-L2350DW series"
check "of a maker" says $PRINTER all manufacturer "Brother Industries, LTD."
check "the camera is one" eventually 60 says $CAMERA mdns deviceType "Network Camera"
check "the player tells its name" eventually 60 says $PLAYER upnp displayName "Living Room"
check "and its kind" says $PLAYER upnp deviceType "Media Server"
check "the phone is a guest" says $PHONE all netif gbr0
check "the phone has its name by DHCP" says $PHONE all displayName phone
check "asked by multicast DNS it says its model" eventually 60 says $PHONE mdns modelName "Lumen 7"
check "the printer is nothing that NetBIOS knows" same "" "$(entry $PRINTER netbios)"
check "the store is root's alone" same "700 600" "$(at router stat -c %a /var/lib/vorn /var/lib/vorn/devices.db | xargs)"

# ---- the owner's name
need "the owner names the printer" vorndevices name 3C-2A-F4-11-22-44 "Drucker <oben>" nas
kill_scanner() {
  local pid
  pid=$(scanner_pid) && at router kill -KILL "$pid" && eventually 5 not scanner_pid >/dev/null
}
start_scanner() {
  at router sh -c '/usr/vorn/sbin/vorndevices watch </dev/null >>/mnt/state/log/router-vorndevices 2>&1 &' &&
    eventually 10 scanner_pid >/dev/null
}
check "the scanner is killed" kill_scanner
check "the list is there all the same" is_online $LAPTOP
check "with the owner's name" says $PRINTER all userdef_displayName "Drucker <oben>"
need "the scanner starts again" start_scanner
check "a second one does not" not at router /usr/vorn/sbin/vorndevices watch 2>/dev/null
check "nobody has gone meanwhile" all_online
check "the owner's name is there" says $PRINTER all userdef_displayName "Drucker <oben>"
check "and the type" says $PRINTER all userdef_deviceType nas
check "beside what the device says itself" says $PRINTER all displayName BRW3C2AF4112244

# ---- a damaged store
damage_store() { # while the scanner and whoever reads have it open
  at router sh -c 'dd if=/dev/urandom of=/var/lib/vorn/rubbish bs=4096 count=3 2>/dev/null &&
    mv /var/lib/vorn/rubbish /var/lib/vorn/devices.db && sha256sum </var/lib/vorn/devices.db'
}
rubbish=$(damage_store)
check "the store is damaged: all devices are there again" eventually 10 all_online
check "the damaged one is kept" same "$rubbish" "$(at router sh -c 'sha256sum </var/lib/vorn/devices.db.damaged')"
check "and the log says so, once" same 1 "$(log_lines "the device store was damaged")"
need "the owner names the printer again" vorndevices name $PRINTER "Drucker <oben>" nas

# ---- names that are none, and bad ones
rename_laptop() { # NAME: the laptop asks for its address under another name
  at laptop udhcpc -i eth0 -n -q -f -t 5 -T 1 -x "hostname:$1" >/dev/null 2>&1
}
leased_as() { at router awk -v mac=$LAPTOP '$2 == mac { print $4 }' /var/lib/misc/dnsmasq.leases; }
is_text() { vorndevices json all | jq -e . >/dev/null && ! vorndevices list | LC_ALL=C grep -q $'[\x01-\x09\x0b-\x1f\x7f]'; }
for name in '<b>x</b>' 'a;id' localhost wpad '*'; do
  rename_laptop "$name"
  echo "leased as $(leased_as)"
  check "named \"$name\", the list is well formed" is_text
done
expiry=4102444800
bad_lease() { # NAME: a line as dnsmasq would write it, had it let the name through; before the IPv6 part
  expiry=$((expiry + 1))
  at router sh -c '{ printf "%s %s 192.168.1.110 %b *\n" '$expiry' '$LAPTOP' "$0"; cat /var/lib/misc/dnsmasq.leases; } \
    >/tmp/leases; cat /tmp/leases >/var/lib/misc/dnsmasq.leases' "$1"
}
bad_lease '<b>\001\033[31mMarke\377r</b>'
check "a name with control characters and half letters is cleaned" \
  eventually 10 says $LAPTOP dhcp displayName '<b>[31mMarker</b>'
# shellcheck disable=SC2016  # it is no command here either
bad_lease '$(id)'
# shellcheck disable=SC2016
check "a command is a name like any other" eventually 10 says $LAPTOP dhcp displayName '$(id)'
at router sh -c 'printf "4102444800 d4:3d:7e:11:22:33 192.168.1.1" >>/var/lib/misc/dnsmasq.leases'
sleep 3
check "a line that is cut short says nothing" says $LAPTOP all ipAddr 192.168.1.110

# ---- unplugged
stays_online() { # MAC SECONDS
  local end=$((SECONDS + $2))
  while [ "$SECONDS" -lt "$end" ]; do
    is_online "$1" || return 1
    sleep 1
  done
}
check "the sensor is there, though it says nothing by itself" is_online $SENSOR
at printer ip link set eth0 down
at sensor ip link set eth0 down
pulled=$(now_ms)
check "the printer is unplugged: it is gone within a minute" eventually 61 is_gone $PRINTER
echo "after $(($(now_ms) - pulled)) ms"
check "the others are there" stays_online $LAPTOP 5
check "the sensor, unplugged with it, is gone as well" eventually 10 is_gone $SENSOR
at router ip neigh replace 192.168.1.111 dev lbr0 lladdr $PRINTER nud stale
check "a stale entry of the kernel's does not bring it back" not is_online $PRINTER
check "the owner's name is there" says $PRINTER all userdef_displayName "Drucker <oben>"
at printer ip link set eth0 up
home plug printer
check "plugged in again it is there" eventually 15 is_online $PRINTER

at sensor sysctl -qw net.ipv6.icmp.echo_ignore_all=1 net.ipv6.conf.eth0.addr_gen_mode=0
at sensor ip link set eth0 up
check "plugged in again it is there, and answers no echo" eventually 20 is_online $SENSOR

# ---- an address that moves, a device that is forgotten
take_address() { # the camera takes the laptop's
  at laptop ip addr flush dev eth0 && at camera ip addr flush dev eth0 &&
    at camera ip addr add 192.168.1.110/24 dev eth0 &&
    at camera arping -q -U -c 2 -I eth0 192.168.1.110
}
check "the camera takes the laptop's address" take_address
check "it is the camera's then" eventually 90 says $CAMERA all ipAddr 192.168.1.110
check "and not the laptop's any more" says $LAPTOP all ipAddr null
check "the laptop's names stay its own" says $LAPTOP netbios displayName LAPTOP-ANNA
check "the laptop is forgotten" vorndevices forget $LAPTOP
check "and stays so" eventually 5 same "" "$(entry $LAPTOP all)"

# ---- its end, after which a sanitizer's build looks for leaks
end_scanner() {
  local pid
  pid=$(scanner_pid) && at router kill "$pid" && eventually 20 not scanner_pid >/dev/null
}
check "the scanner ends when it is told to" end_scanner
check "who was there is not forgotten with it" is_online $PLAYER
finish
