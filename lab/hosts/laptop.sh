# shellcheck shell=bash
# Anna's laptop: a web page, and a NetBIOS name.

prepare() {
  mkdir -p /run/samba /var/log/samba /var/lib/samba/private
}

start() {
  ask_address
  web_page "page of laptop"
  launch nmbd nmbd -F --no-process-group -s "$LAB/hosts/laptop/smb.conf" --debug-stdout
}
