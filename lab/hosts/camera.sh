# shellcheck shell=bash
# A surveillance camera: a web page, and an announcement by multicast DNS.

start() {
  ask_address
  web_page "page of camera"
  announce axis-00408c112255 "$LAB/hosts/camera/rtsp.service"
}
