#!/usr/bin/env bash
# Configures the project afresh and checks where it would be installed: in /usr/tuvo when nothing is
# said, else where it was told.
#
#   prefix_test.sh PROJECT_FOLDER WORK_FOLDER
set -eu
project=$1 work=$2
. "$(dirname "$0")/common.sh"

configure() {
  cmake -S "$project" -B "$work/$1" -G Ninja -DTUVOSHARING_BUILD_TESTS=OFF "${@:2}" >"$work/$1.log" ||
    { cat "$work/$1.log" && fail "configuring"; }
}

rm -rf "$work"
mkdir -p "$work"
configure default
[ "$(prefix_of "$work/default")" = /usr/tuvo ] || fail "default prefix"
grep -qx 'prefix=/usr/tuvo' "$work/default/tuvosharing.pc" || fail "prefix in tuvosharing.pc"
configure other -DCMAKE_INSTALL_PREFIX=/opt/other
[ "$(prefix_of "$work/other")" = /opt/other ] || fail "given prefix"
grep -qx 'prefix=/opt/other' "$work/other/tuvosharing.pc" || fail "given prefix in tuvosharing.pc"
grep -q 'libdir=/opt/other/lib' "$work/other/tuvosharing.pc" || fail "libdir in tuvosharing.pc"
rm -rf "$work"
