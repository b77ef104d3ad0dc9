# shellcheck shell=bash
# The files that the home sees. Only the home's own mount namespaces change; the machine's root is read-only in them.
#
# /mnt in the home is a tmpfs that holds everything the hosts write:
#   tree/ build/ state/   the project, its build and the home's record on the machine (bind mounts)
#   dev/                  a /dev with the usual nodes; /dev/log leads to the host's own /run
#   hosts/HOST/           upper layers of /etc (and /usr), and /tmp, /var, /run
#   events, go/HOST       how the hosts' start is kept in order (pipes)

readonly GROUND=/mnt

# Makes $GROUND and closes the rest of the machine. REQUIRES: an own mount namespace.
make_ground() { # STATE TREE BUILD
  local state=$1 tree=$2 build=$3 root=$1/root
  mkdir "$root"
  mount -t tmpfs -o mode=755 home "$root"
  mkdir "$root"/{tree,build,state,dev,hosts,go}
  mount --bind "$tree" "$root/tree"
  mount --bind "$build" "$root/build"
  mount --bind "$state" "$root/state"
  mount --bind "$tree" "$tree" # stays writable: programs under test write beside themselves
  mount --move "$root" "$GROUND"
  make_devices "$GROUND/dev"
  mount --rbind "$GROUND/dev" /dev
  mount -o remount,bind,ro /
  mount -t tmpfs -o mode=755 run /run
}

make_devices() { # FOLDER
  local node
  for node in null zero full random urandom tty; do
    : >"$1/$node"
    mount --bind "/dev/$node" "$1/$node"
  done
  mkdir "$1"/{pts,shm}
  mount --bind /dev/pts "$1/pts"
  mount -t tmpfs -o mode=1777 shm "$1/shm"
  ln -s pts/ptmx "$1/ptmx"
  ln -s /proc/self/fd "$1/fd"
  ln -s fd/0 "$1/stdin"
  ln -s fd/1 "$1/stdout"
  ln -s fd/2 "$1/stderr"
  ln -s /run/dev-log "$1/log"
}

# Gives the calling host its own writable /etc, /tmp, /var and /run, and what shows its own network and processes.
own_view() { # HOST
  local own=$GROUND/hosts/$1
  mkdir -p "$own"/{etc,etc.work,tmp,var/lib/misc,var/log,var/cache,var/spool,run/lock}
  chmod 1777 "$own/tmp"
  mount -t overlay overlay -o "lowerdir=/etc,upperdir=$own/etc,workdir=$own/etc.work" /etc
  mount --bind "$own/tmp" /tmp
  mount --bind "$own/var" /var
  mount --bind "$own/run" /run
  ln -s /run /var/run
  mount -t proc proc /proc
  mount -t sysfs sysfs /sys
  rm -f /etc/resolv.conf # may be a link into the machine's /run
  : >/etc/resolv.conf
}

# A writable /usr, for a host that gets the product installed.
own_programs() { # HOST
  local own=$GROUND/hosts/$1
  mkdir -p "$own"/{usr,usr.work}
  mount -t overlay overlay -o "lowerdir=/usr,upperdir=$own/usr,workdir=$own/usr.work" /usr
}

# Puts the project back at its place where the host's own folders hide it.
keep_visible() { # TREE BUILD
  [ -e "$1/lab/home" ] || { mkdir -p "$1" && mount --bind "$GROUND/tree" "$1"; }
  [ -e "$2/CMakeCache.txt" ] || { mkdir -p "$2" && mount --bind "$GROUND/build" "$2"; }
}
