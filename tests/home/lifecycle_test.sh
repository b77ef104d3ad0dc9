#!/bin/bash
# A home comes up, and "down" leaves nothing of it, whatever happened to it.
. "${0%/*}/checks.sh"

facts=$(machine_facts)

machine_is_as_before() {
  diff <(echo "$facts") <(machine_facts)
}

down_leaves_nothing() {
  home down && nothing_is_left && machine_is_as_before
}

kill_recorded() { # FILE
  kill -KILL "$(recorded_pid "$1")"
}

use_home life
need "a home comes up" home up
remember_home "$state"
check "its record is root's alone" same 700 "$(stat -c %a "$state")"
check "a second one of that name is refused" not home up
check "and the first one is not harmed by it" reads_web laptop
check "every host is there" same 8 "$(home status | grep -c '^[a-z]')"
check "a command's status comes through" same 7 "$(home exec laptop sh -c 'exit 7'; echo $?)"
check "a host does not see the machine's processes" not at router test -e "/proc/$$/ns"
check "the machine's root cannot be written from inside" not at router touch /vorn-lab-was-here 2>/dev/null
check "what the router writes to /etc and /tmp stays inside" at router sh -c 'echo x >/etc/vorn-inside; echo x >/tmp/vorn-inside'
check "down leaves nothing" down_leaves_nothing
check "down of a home that is not up succeeds" home down

for part in holder init hosts/router hosts/laptop; do
  need "up again" home up
  remember_home "$state"
  kill_recorded "$state/$part"
  check "after kill -9 of its $part, down leaves nothing" down_leaves_nothing
done

need "up again" home up
remember_home "$state"
sleep 60 &
stranger=$!
echo "$stranger 1" >"$state/server"
check "down with a stranger's process number in its record leaves nothing" down_leaves_nothing
check "and does not end the stranger" kill -0 "$stranger"
kill "$stranger"

for delay in 0.01 0.03 0.1 0.2 0.4; do
  "${home_command[@]}" up &
  starting=$!
  sleep "$delay"
  remember_home "$state"
  kill -KILL "$starting" 2>/dev/null # it may be through
  wait "$starting" 2>/dev/null
  check "after kill -9 of \"up\" $delay s after its start, down leaves nothing" down_leaves_nothing
done

for delay in 0.03 0.1 0.3; do
  "${home_command[@]}" up 2>/dev/null &
  starting=$!
  sleep "$delay"
  remember_home "$state"
  check "down $delay s after the start of \"up\" leaves nothing" down_leaves_nothing
  check "and that \"up\" fails" not wait "$starting"
done

check "a command runs as the router, in the folder that it was given in" \
  same "router $PWD" "$(home run sh -c 'echo "$(hostname) $PWD"')"
check "its status comes through" same 3 "$(home run sh -c 'exit 3'; echo $?)"
check "nothing is left of that home" machine_is_as_before
exit "$((failures > 0))"
