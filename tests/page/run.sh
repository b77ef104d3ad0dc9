#!/usr/bin/env bash
# run.sh NAME: tests/page/NAME_check.mjs, a browser that uses the page of the real server in a home of its own. What it may use
# stands in browser.mjs. Screenshots go to the build folder's page-screenshots.
. "${BASH_SOURCE[0]%/*}/../home/checks.sh"

name=${1:?"run.sh NAME"}
use_home "page$name"
need "the home comes up" home up
need "the server starts" start_server 0

password=$(at router cat /var/lib/vorn/first-password)
need "there is a first password" test -n "$password"
export VORN_PAGE="http://$api/" VORN_FIRST_PASSWORD=$password VORN_SCREENSHOTS=$build/page-screenshots
export VORN_SERVER_PID=$server_pid VORN_HOME="${home_command[*]}"
mkdir -p "$VORN_SCREENSHOTS"
check "the page does its work: $name" node "${BASH_SOURCE[0]%/*}/${name}_check.mjs"
finish
