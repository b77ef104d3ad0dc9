# shellcheck shell=bash
# A guest's phone, on the guest network; it answers who asks for its name.

start() {
  ask_address
  announce phone "$LAB/hosts/phone/device.service"
}
