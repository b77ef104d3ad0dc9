# shellcheck shell=bash
# What the hosts' files (lab/hosts) share. prepare() runs before the cables are there, start() after.

prepare() { :; }

# Starts a program that stays in the foreground by itself; what it says goes to the home's log folder.
launch() { # NAME COMMAND...
  local log=$LOG/$HOST-$1
  shift
  "$@" </dev/null >"$log" 2>&1 &
}

# Asks for an IPv4 address once, as a device does when it is plugged in.
ask_address() {
  udhcpc -i eth0 -n -q -f -t 5 -T 1 -x "hostname:$HOST" >"$LOG/$HOST-udhcpc" 2>&1
}

web_page() { # TEXT
  mkdir -p /var/www
  echo "$1" >/var/www/index.html
  launch httpd busybox httpd -f -p 80 -h /var/www
}

# Announces a service by multicast DNS without a D-Bus: avahi-daemon serves what lies in /etc/avahi/services.
announce() { # HOSTNAME SERVICE-FILE
  mkdir -p /run/avahi-daemon /etc/avahi/services
  cp "$2" /etc/avahi/services/
  cat >/etc/avahi/lab.conf <<CONF
[server]
host-name=$1
use-ipv6=no
allow-interfaces=eth0
enable-dbus=no
[publish]
publish-workstation=no
[wide-area]
enable-wide-area=no
CONF
  launch avahi avahi-daemon -f /etc/avahi/lab.conf --no-rlimits --no-drop-root --no-chroot
}
