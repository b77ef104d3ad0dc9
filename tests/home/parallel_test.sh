#!/bin/bash
# Three homes side by side do not know of each other.
. "${0%/*}/checks.sh"

labels=(one two three)
for label in "${labels[@]}"; do
  use_home "$label"
  home up &
done
for _ in "${labels[@]}"; do
  need "a home comes up beside the others" wait -n
done

mark() { # LABEL: writes a file of that text in the router, and one on the laptop's page
  at router sh -c "echo $1 >/tmp/mark" && at laptop sh -c "echo $1 >/var/www/index.html"
}

laptop_page() { at router curl --silent --noproxy '*' --max-time 3 http://192.168.1.110/; }

for label in "${labels[@]}"; do
  use_home "$label"
  check "home $label takes its mark" mark "$label"
done
for label in "${labels[@]}"; do
  use_home "$label"
  check "home $label is whole" is_whole_router
  check "home $label has its own files" same "$label" "$(at router cat /tmp/mark)"
  check "home $label has its own network" same "$label" "$(laptop_page)"
done
use_home two
remember_home "$state"
check "one of them goes" home down
check "and nothing of it is left" nothing_is_left
for label in one three; do
  use_home "$label"
  check "home $label stays whole" is_whole_router
done
exit "$((failures > 0))"
