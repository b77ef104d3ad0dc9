# shellcheck shell=bash
# Makes what the emulator boots, once: Debian's kernel and a small first file system with the modules that it needs. The
# kernel is downloaded and unpacked, not installed: the machine itself boots another one. REQUIRES: $here, this folder.
# shellcheck disable=SC2154

# The modules: the machine's files (9p) under a layer of memory (overlay), bridges and cables, the firewall, ciphers of WPA2,
# simulated radios.
readonly GUEST_MODULES="virtio_pci 9pnet_virtio 9p overlay bridge veth nf_tables nft_ct nft_masq nft_chain_nat ccm cmac ctr
  mac80211_hwsim"

kernel_package() { # the archive drops old ones, so that no version is named here
  apt-cache depends linux-image-amd64 2>/dev/null | awk '/Depends: linux-image-/ { print $2; exit }'
}

unpack_kernel() { # PACKAGE FOLDER
  local package=$1 folder=$2 deb version image offset
  (cd "$folder" && apt-get -o APT::Sandbox::User=root download "$package" >apt.log 2>&1) || return 1
  deb=$(find "$folder" -name "${package}_*.deb")
  mkdir "$folder/files"
  dpkg-deb --fsys-tarfile "$deb" | tar -xf - -C "$folder/files" --wildcards './boot/vmlinuz-*' './lib/modules/*/modules.*' \
    './lib/modules/*/kernel/net/*' './lib/modules/*/kernel/drivers/virtio/*' './lib/modules/*/kernel/fs/9p/*' \
    './lib/modules/*/kernel/drivers/net/wireless/mac80211_hwsim.ko' './lib/modules/*/kernel/drivers/net/veth.ko' './lib/modules/*/kernel/fs/netfs/*' \
    './lib/modules/*/kernel/fs/fscache/*' './lib/modules/*/kernel/fs/overlayfs/*' './lib/modules/*/kernel/crypto/*' \
    './lib/modules/*/kernel/lib/*' './lib/modules/*/kernel/arch/*' || return 1
  rm "$deb"
  version=$(ls "$folder/files/lib/modules")
  depmod -b "$folder/files" "$version" 2>/dev/null
  image=$folder/files/boot/vmlinuz-$version
  # The kernel unpacked boots some seconds sooner than it would unpack itself in the emulator.
  offset=$(LC_ALL=C grep -aobP -m1 '\xfd7zXZ\x00' "$image" | head -n 1 | cut -d: -f1)
  tail -c "+$((offset + 1))" "$image" | xz -dc >"$folder/vmlinux" 2>/dev/null # what follows the payload is no xz
  [ "$(head -c 4 "$folder/vmlinux" | tail -c 3)" = ELF ]
}

make_first_file_system() { # FOLDER
  local folder=$1 root=$1/root version module busybox name library
  version=$(ls "$folder/files/lib/modules")
  busybox=$(command -v busybox)
  mkdir -p "$root"/{bin,dev,proc,sys,modules,host,memory,new}
  cp "$busybox" "$root/bin/"
  for name in sh mount insmod mkdir cat poweroff chroot; do
    ln -s busybox "$root/bin/$name"
  done
  ldd "$busybox" 2>/dev/null | grep -o '/lib[^ ]*' | while read -r library; do
    mkdir -p "$root${library%/*}"
    cp -L "$library" "$root$library"
  done
  for module in $GUEST_MODULES; do
    modprobe -d "$folder/files" -S "$version" --show-depends "$module" | awk '$1 == "insmod" { print $2 }'
  done | awk '!seen[$0]++' | while read -r module; do
    cp "$module" "$root/modules/"
    echo "${module##*/}" >>"$root/modules/order"
  done
  install -m 755 "$here/init.sh" "$root/init"
  (cd "$root" && find . | cpio -o -H newc --quiet | gzip -1) >"$folder/initrd.gz"
}

# Prints the folder that holds vmlinux and initrd.gz.
prepare_kernel() { # CACHE
  local cache=$1 package key folder
  package=$(kernel_package)
  [ -n "$package" ] || return 1
  key=$(cat "$here/kernel.sh" "$here/init.sh" | sha256sum | cut -c 1-16)
  folder=$cache/$package-$key
  if [ ! -e "$folder/ready" ]; then
    rm -rf "$cache"
    mkdir -p "$folder"
    unpack_kernel "$package" "$folder" && make_first_file_system "$folder" || return 1
    rm -rf "$folder/files" "$folder/root"
    : >"$folder/ready"
  fi
  echo "$folder"
}
