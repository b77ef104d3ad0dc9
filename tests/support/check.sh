# shellcheck shell=bash
# What programs of checks count with: a line for each thing that is checked.
failures=0

check() { # DESCRIPTION COMMAND...
  local description=$1
  shift
  if "$@"; then
    echo "PASS $description"
  else
    echo "FAIL $description"
    failures=$((failures + 1))
  fi
}
