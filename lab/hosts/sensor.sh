# shellcheck shell=bash
# A thermometer that speaks IPv6 alone. The router's advertisement gives it its address.

start() {
  ip link set eth0 up
  web_page "page of sensor"
}
