#!/usr/bin/env bash
# run.sh CHECKS...: the wireless platform over simulated radios: boots Debian's kernel in emulators, without KVM, one for each
# of these programs of this folder, which runs there as root on a view of this machine's files. As many at a time as there are
# processors. Needs no root. Prints a line for each check.
# VORN_RADIO_REQUIRED=1: what is missing here is a failure instead of a skipped test.
set -uo pipefail

here=$(cd "${BASH_SOURCE[0]%/*}" && pwd -P)
. "$here/kernel.sh"
: "${1:?"which programs of checks?"}"
build=${VORN_BUILD:?"set VORN_BUILD to the build folder"}
readonly SECONDS_LIMIT=${VORN_RADIO_SECONDS:-900} # a loaded machine needs several times the minutes of an idle one

skip() { # REASON
  echo "SKIP: $1"
  [ "${VORN_RADIO_REQUIRED:-}" = 1 ] && exit 1
  exit 77 # CTest's mark of a skipped test
}

for program in qemu-system-x86_64 cpio busybox depmod xz hostapd wpa_supplicant iw dnsmasq jq curl; do
  PATH=$PATH:/usr/sbin:/sbin command -v "$program" >/dev/null || skip "$program is not installed"
done
export PATH=$PATH:/usr/sbin:/sbin

kernel=$(prepare_kernel "$build/radio-kernel") || skip "Debian's kernel cannot be had"
out=$(mktemp -d "$build/radio-out.XXXXXX")
trap 'rm -rf "$out"' EXIT

memory=384
grep -q '^VORN_SANITIZE:[A-Z]*=.' "$build/CMakeCache.txt" && memory=1024

# Not "-machine microvm", whose boot hangs now and then, and not KVM, which is not to be had everywhere.
emulate() { # CHECKS FOLDER
  timeout -k 5 "$SECONDS_LIMIT" qemu-system-x86_64 -nodefaults -no-user-config -display none -no-reboot -machine q35 \
    -accel tcg,tb-size=128 -cpu max -smp 1 -m "$memory" -kernel "$kernel/vmlinux" -initrd "$kernel/initrd.gz" \
    -append "console=ttyS0 quiet panic=-1 mitigations=off radios=6 checks=$here/$1 build=$build" -serial stdio \
    -fsdev local,id=host,path=/,security_model=none,readonly=on,multidevs=remap -device virtio-9p-pci,fsdev=host,mount_tag=host \
    -fsdev local,id=out,path="$2",security_model=none -device virtio-9p-pci,fsdev=out,mount_tag=out </dev/null |
    sed -u "s/\r//g; s/^/${1%_checks.sh}: /"
}

for checks in "$@"; do
  while [ "$(jobs -pr | wc -l)" -ge "$(nproc)" ]; do
    wait -n
  done
  mkdir "$out/$checks"
  emulate "$checks" "$out/$checks" &
done
wait

result=0
for checks in "$@"; do
  status=$(cat "$out/$checks/status" 2>/dev/null) || { echo "FAIL $checks did not come to its end"; status=1; }
  [ "$status" = 0 ] || result=1
done
exit "$result"
