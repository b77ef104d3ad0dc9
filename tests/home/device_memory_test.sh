#!/bin/bash
# Listing devices a thousand times takes no more memory than listing them ten times.
. "${0%/*}/checks.sh"

readonly DEVICES=250 LISTINGS=1000 TOLERANCE=256 # KiB: a listing that kept as much as one record would add four times that
readonly url=/webapi/VORN.Core.Network.Router.ConnectionList/1

use_home devmemory
need "the home is up" home up
need "the server answers" start_server

# Names devices that nobody has seen: they are listed all the same.
name_devices() {
  local number
  for ((number = 0; number < DEVICES; number++)); do
    printf 'next\nurl = "http://%s%s/set"\n' "$api" "$url"
    printf 'data = "{\\"mac\\": \\"3c:2a:f4:99:%02x:%02x\\", \\"hostname\\": \\"Living-Room-%d\\", \\"type\\": \\"nas\\"}"\n' \
      $((number / 256)) $((number % 256)) "$number"
    printf 'header = "Content-Type: application/json"\nheader = "Authorization: Bearer %s"\noutput = /dev/null\n' "$token"
  done | sed 1d | curl --silent --no-progress-meter --noproxy '*' --max-time 60 --config -
}
list_often() { # COUNT [CURL-OPTION...]: prints how many answers had the last device
  local number folder
  folder=$(mktemp -d) || return
  for ((number = 0; number < $1; number++)); do
    printf 'url = "http://%s%s/get"\noutput = "%s/%s"\n' "$api" "$url" "$folder" "$number"
  done | curl --silent --no-progress-meter --noproxy '*' --max-time 200 --header 'Content-Type: application/json' \
    --header "Authorization: Bearer $token" --data-binary '{"scannertype": "all"}' "${@:2}" --config -
  grep -l "Living-Room-$((DEVICES - 1))\"" "$folder"/* | wc -l
  rm -rf "$folder"
}
resident() { # prints the server's resident memory of its own, in KiB
  at router sh -c 'awk "/^RssAnon/ { print \$2 }" "/proc/$(pidof vornwebd)/status"'
}

token=$(cat "$state/token")
need "$DEVICES devices are named" name_devices
check "ten listings, eight at once, tell them all" same 10 "$(list_often 10 --parallel --parallel-max 8)"
sleep 4 # what is free goes back within three seconds
before=$(resident)
check "the other listings too" same $((LISTINGS - 10)) "$(list_often $((LISTINGS - 10)))"
sleep 4
after=$(resident)
echo "$before KiB after 10 listings, $after KiB after $LISTINGS"
check "the resident memory is the same" test "$after" -le $((before + TOLERANCE))
finish
