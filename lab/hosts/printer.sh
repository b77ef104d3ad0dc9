# shellcheck shell=bash
# A network printer that announces itself by multicast DNS.

start() {
  ask_address
  announce BRW3C2AF4112244 "$LAB/hosts/printer/ipp.service"
}
