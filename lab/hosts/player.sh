# shellcheck shell=bash
# A media player: a UPnP media server, found by SSDP.

start() {
  ask_address
  mkdir -p /var/media /var/dlna
  cat >/etc/minidlna.conf <<CONF
network_interface=eth0
port=8200
friendly_name=Living Room
model_name=Media Player
model_number=7
media_dir=/var/media
db_dir=/var/dlna
log_dir=/var/dlna
inotify=no
CONF
  launch minidlna minidlnad -S -f /etc/minidlna.conf -P /run/minidlna.pid
}
