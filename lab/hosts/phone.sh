# shellcheck shell=bash
# A guest's phone, on the guest network.

start() {
  ask_address
}
