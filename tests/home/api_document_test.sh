#!/bin/bash
# docs/api.md is true: each of its commands is run where it says, in its order, and does what it is said to do.
. "${0%/*}/checks.sh"

use_home apidoc
need "the home is up" home up
work=$(mktemp -d)
trap 'rm -rf "$work"; take_all_down' EXIT

# The server as its unit starts it, with the configuration as it is installed.
at router sh -c '/usr/vorn/sbin/vorntopology recover; exec /usr/sbin/vornwebd </dev/null' >"$work/console" 2>&1 &
listens() { at laptop bash -c 'exec 3<>/dev/tcp/192.168.1.1/8443' 2>/dev/null; }
first_password_stands() { at router test -s /var/lib/vorn/first-password; }
need "it has made an administrator" eventually 10 first_password_stands
first=$(at router cat /var/lib/vorn/first-password)
need "it answers in the home" eventually 10 listens
wan=$(at router ip -brief -4 address show eth0 | awk '{ sub("/.*", "", $3); print $3 }')
reaches() { at "$1" timeout 2 bash -c "exec 3<>/dev/tcp/$2/8443" 2>/dev/null; } # HOST ADDRESS
check "the provider's side does not reach it" not reaches isp "$wan"
check "guests do not reach it" not reaches phone 192.168.2.1
check "the console says the password" grep -qF "\"$first\"" "$work/console"

# The blocks of the document, one file each: 01.client, 02.router, ...
awk -v folder="$work" '
  /^```sh on the (router|client)$/ { file = sprintf("%s/%02d.%s", folder, ++number, $NF); next }
  /^```/ { file = "" }
  file != "" { print > file }' "$root/docs/api.md"
check "the document has its blocks" same 11 "$(find "$work" -name '??.router' -o -name '??.client' | wc -l)"

at laptop mkdir -p /tmp/apidoc
address=192.168.1.1
run_block() { # FILE: prints what its commands say
  local host=laptop
  [[ $1 != *.router ]] || host=router
  sed "s/FIRST-PASSWORD/$first/g; s/CHOSEN-PASSWORD/correct horse battery/g; s/NEW-ADDRESS/$address/g" "$1" |
    at "$host" bash -c 'mkdir -p /tmp/apidoc && cd /tmp/apidoc && set -euo pipefail && . /dev/stdin' 2>"$1.errors" >"$1.out"
  local status=$?
  cat "$1.out"
  [ "$status" = 0 ] || { echo "$1 ended with $status: $(tail -n 3 "$1.errors")" >&2; return 1; }
}
need_block() { # NUMBER DESCRIPTION: its output is in $said
  said=$(run_block "$work"/"$1".*[rt])
  need "$2" test "$?" = 0
}

need_block 01 "the router tells password and fingerprint"
check "the password is the one" same "$first" "$(sed -n 1p <<<"$said")"
fingerprint=$(sed -n 2p <<<"$said")
check "the fingerprint is the one of the console" grep -qi "${fingerprint#*=}" "$work/console"
need_block 02 "the client takes the certificate"
check "its fingerprint is the router's" same "$fingerprint" "$said"
need_block 03 "the client pins the key"
need_block 04 "it logs in and changes the password"
check "the change succeeds" succeeded "$said"
check "the first password is gone" not first_password_stands
need_block 05 "it logs in with the new one"
need_block 06 "it asks for the topology, the rows and the counters"
check "the topology is told" test "$(sed -n 1p <<<"$said" | jq -r .data.net_topology 2>/dev/null)" = router
check "every row is listed" same 23 "$(grep -c '^/webapi/VORN' <<<"$said")"
check "the login is counted" grep -qE '^vornwebd_requests_total\{row="/webapi/login",outcome="done"\} 2$' <<<"$said"
need_block 07 "it makes a token"
need_block 08 "it changes the topology with it"
check "the change is under way" succeeded "$said"

has_lan_address() { at router ip -brief -4 address show br0 2>/dev/null | grep -q '203\.0\.113\.'; }
need "the router is a bridge with an address" eventually 30 has_lan_address
need_block 09 "the router tells its address"
address=$(awk '{ sub("/.*", "", $3); print $3 }' <<<"$said")
need "the client asks for an address" home plug laptop
is_bridge() { said=$(run_block "$work/10.client") && [ "$(jq -r .data.net_topology <<<"$said")" = bridge ]; }
need "the topology has changed, says the router at $address" eventually 20 is_bridge
need_block 11 "the token is taken back"
check "the revocation and the logout succeed" same 2 "$(grep -o '"success":true' <<<"$said" | wc -l)"
check "the token opens nothing any more" not is_bridge
check "another key at that address is refused" not at laptop curl --silent --insecure --output /dev/null \
  --pinnedpubkey sha256//AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA= "https://$address:8443/"
finish
