# shellcheck shell=bash
# install_packages GROUP...: installs the Debian packages of those groups of scripts/packages that are missing.
# Nothing is asked, nothing is started, and nothing happens at all when every package is there.
#
# A package that brings a daemon would start it at once and at every boot; the machine wanted a program, not a server.
# Starting is prevented with policy-rc.d (Debian's own switch for that; one that the machine already has is left to
# decide), and the services of what was newly installed are disabled.

readonly VORN_PACKAGE_LIST="${BASH_SOURCE[0]%/*}/../packages"
readonly VORN_START_POLICY=/usr/sbin/policy-rc.d

packages_of() { # GROUP...
  local group
  for group in "$@"; do
    if ! grep -q "^$group " "$VORN_PACKAGE_LIST"; then
      echo "scripts/packages has no group \"$group\"" >&2
      return 1
    fi
    sed -n "s/^$group \([^ ]*\).*/\1/p" "$VORN_PACKAGE_LIST"
  done
}

missing_of() { # PACKAGE...
  local package
  for package in "$@"; do
    [ "$(dpkg-query -W -f '${db:Status-Abbrev}' "$package" 2>/dev/null)" = "ii " ] || echo "$package"
  done
}

apt_get() {
  DEBIAN_FRONTEND=noninteractive apt-get -o DPkg::Lock::Timeout=300 -o Acquire::Retries=3 -y -q "$@"
}

# Both kinds of start at boot: init scripts, and units where there is systemd.
disable_services_of() { # PACKAGE...
  local name
  for name in $(dpkg-query -L "$@" | sed -n 's,^/etc/init\.d/,,p'); do
    update-rc.d "$name" disable 2>/dev/null || true
  done
  command -v systemctl >/dev/null || return 0
  for name in $(dpkg-query -L "$@" | sed -n 's,^\(/usr\)\?/lib/systemd/system/\([^/@]*\.\(service\|socket\)\)$,\2,p'); do
    systemctl disable --quiet "$name" 2>/dev/null || true
  done
}

# A subshell, so that its exit always takes the policy away again.
install_without_starting() ( # PACKAGE...
  if [ ! -e "$VORN_START_POLICY" ]; then
    trap 'rm -f "$VORN_START_POLICY"' EXIT
    trap 'exit 1' INT TERM HUP
    printf '#!/bin/sh\nexit 101\n' >"$VORN_START_POLICY"
    chmod 755 "$VORN_START_POLICY"
  fi
  apt_get install --no-install-recommends "$@"
)

install_packages() { # GROUP...
  local listed missing
  listed=$(packages_of "$@") || return 1
  # shellcheck disable=SC2086  # package names are words
  mapfile -t missing < <(missing_of $listed | sort -u)
  [ "${#missing[@]}" -gt 0 ] || return 0
  if [ "$(id -u)" != 0 ]; then
    echo "missing packages, and only root can install them: ${missing[*]}" >&2
    return 1
  fi
  echo "installing: ${missing[*]}" >&2
  apt_get update >&2 && install_without_starting "${missing[@]}" >&2 && disable_services_of "${missing[@]}" >&2
}
