# shellcheck shell=bash
# Where a home is recorded on this machine, and which processes it is.
#
# /run/vorn-lab.NAME (root's alone):
#   holder, init, server   the processes that carry the home, each as "PID STARTTIME"
#   hosts/HOST             the first process of each host, the same way
#   log/                   what the hosts and their services said
# A process is known by its number together with its start time (field 22 of /proc/PID/stat, see proc(5)): a number alone
# may belong to a stranger by the time it is used.

state_of() { # NAME
  echo "/run/vorn-lab.$1"
}

# Prints "STATE STARTTIME" of a process. Its own name, field 2, may hold blanks and brackets.
process_facts() { # PID
  local line fields
  { read -r line <"/proc/$1/stat"; } 2>/dev/null || return 1
  read -r -a fields <<<"${line##*) }"
  [ "${#fields[@]}" -gt 19 ] || return 1 # it ended while it was read
  echo "${fields[0]} ${fields[19]}"
}

# Records the shell that calls this, under the number that the mounted /proc gives it. No subshell may come between.
record_self() { # FILE
  local line fields
  read -r line </proc/self/stat
  read -r -a fields <<<"${line##*) }"
  echo "${line%% *} ${fields[19]}" >"$1"
}

# Prints the number of a recorded process; fails when that process has ended.
recorded_pid() { # FILE
  local pid start facts
  { read -r pid start <"$1"; } 2>/dev/null || return 1
  facts=$(process_facts "$pid") || return 1
  case $facts in
    "Z $start" | "X $start") return 1 ;;
    *" $start") echo "$pid" ;;
    *) return 1 ;;
  esac
}

end_recorded() { # FILE...
  local file pid
  for file in "$@"; do
    if pid=$(recorded_pid "$file"); then
      kill -KILL "$pid" 2>/dev/null || true
    fi
  done
}

# An init counts as ended only when the kernel has ended its whole process namespace, so nothing else needs watching.
await_end_of() { # SECONDS FILE...
  local limit=$((SECONDS + $1)) file
  shift
  for file in "$@"; do
    while recorded_pid "$file" >/dev/null; do
      [ "$SECONDS" -lt "$limit" ] || return 1
      sleep 0.01
    done
  done
}
