#!/bin/sh
# The first program in the emulator: this machine's files, read-only, under a layer of memory, and then the checks in
# them. What the guest writes is gone with it, but for /out.
export PATH=/bin
mount -t proc proc /proc
mount -t devtmpfs dev /dev
mount -t sysfs sys /sys
read -r words </proc/cmdline
for word in $words; do
  case $word in
    radios=*) radios=${word#*=} ;;
    checks=*) checks=${word#*=} ;;
    build=*) build=${word#*=} ;;
  esac
done
while read -r module; do
  set --
  [ "$module" = mac80211_hwsim.ko ] && set -- "radios=$radios"
  insmod "/modules/$module" "$@" || echo "insmod $module failed"
done </modules/order
share=trans=virtio,version=9p2000.L,msize=512000
mount -t 9p -o "$share,cache=loose,ro" host /host
mount -t tmpfs memory /memory
mkdir /memory/upper /memory/work
mount -t overlay -o lowerdir=/host,upperdir=/memory/upper,workdir=/memory/work overlay /new
mount -t proc proc /new/proc
mount -t sysfs sys /new/sys
mount -t devtmpfs dev /new/dev
mkdir -p /new/dev/pts /new/dev/shm /new/out
mount -t devpts pts /new/dev/pts
mount -t tmpfs shm /new/dev/shm
mount -t tmpfs run /new/run
mkdir -p /new/run/netns
mount -t tmpfs tmp /new/tmp
mount -t 9p -o "$share,cache=none" out /new/out
VORN_BUILD=$build chroot /new "$checks"
echo $? >/new/out/status
poweroff -f
