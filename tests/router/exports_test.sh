#!/bin/sh
# exports_test.sh MODULE LIST: the symbols that the module defines for others are those of the list, no more and no fewer.
set -eu
nm -D --defined-only "$1" | awk '{print $3}' | c++filt | LC_ALL=C sort > exports.seen
LC_ALL=C sort "$2" | diff -u - exports.seen
echo "the module shows its $(wc -l < exports.seen) symbols and nothing else"
