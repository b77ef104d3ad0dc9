# shellcheck shell=bash
# The hosts of the home and the cables between them.
#
#   isp eth0 ── eth0 router ┬ lan1 ── laptop             203.0.113.0/24, 2001:db8:1::/64   WAN
#                           ├ lan2 ── printer            192.168.1.0/24, 2001:db8:2::/64   LAN, bridge lbr0
#                           ├ lan3 ── switch ┬ camera    192.168.2.0/24                    guest network, bridge gbr0
#                           │                ├ player
#                           │                └ sensor    (IPv6 only)
#                           └ guest1 ── phone
#   isp eth1 ── eth1 router                            198.51.100.0/24, 2001:db8:9::/64  second WAN, down until asked for
# Every host calls its end eth0. The switch is an ordinary one without address, in the first process's own network.

readonly DEVICES=(laptop printer camera player sensor phone)
# shellcheck disable=SC2034  # read by init.sh and home
readonly HOSTS=(isp router "${DEVICES[@]}")

# The makers' prefixes are real ones, so that a vendor look-up finds them.
declare -Ar MAC=(
  [isp]=02:00:5e:10:00:fe [router]=02:00:5e:10:00:01
  [laptop]=d4:3d:7e:11:22:33 [printer]=3c:2a:f4:11:22:44 [camera]=00:40:8c:11:22:55
  [player]=b0:a7:37:11:22:77 [sensor]=24:0a:c4:11:22:88 [phone]=f8:e4:3b:11:22:66
)

# Names each host's network for ip(8). A link does where `ip netns attach` would add a mount.
name_networks() {
  local host pid
  mkdir -p /run/netns
  for host in "${HOSTS[@]}"; do
    pid=$(recorded_pid "$STATE/hosts/$host")
    ln -s "/proc/$pid/ns/net" "/run/netns/$host"
  done
}

# Prints the ip(8) commands of a cable between a router port and a device, or of one into the switch.
cable() { # PORT DEVICE
  echo "link add eth0 netns $2 address ${MAC[$2]} type veth peer name $1 netns router"
}

switch_cable() { # DEVICE
  echo "link add to-$1 type veth peer name eth0 netns $1 address ${MAC[$1]}"
  echo "link set to-$1 master switch addrgenmode none up"
}

lay_wires() {
  sysctl -qw net.ipv6.conf.all.disable_ipv6=1 # the switch takes no part in what it carries
  ip -b - <<COMMANDS
link add eth0 netns router address ${MAC[router]} type veth peer name eth0 netns isp address ${MAC[isp]}
link add eth1 netns router address 02:00:5e:10:00:02 type veth peer name eth1 netns isp address 02:00:5e:10:00:fd
$(cable lan1 laptop)
$(cable lan2 printer)
$(cable guest1 phone)
link add switch type bridge
link set switch up
link add to-router type veth peer name lan3 netns router
link set to-router master switch addrgenmode none up
$(for device in camera player sensor; do switch_cable "$device"; done)
COMMANDS
}
