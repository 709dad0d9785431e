#!/usr/bin/env bash
# Compares a shared library's binary interface with the one that was kept: symbols, types, layouts,
# the order of virtual functions. Any difference fails, an addition too, so that the interface only
# ever changes on purpose.
#
#   abi_test.sh LIBRARY PUBLIC_HEADERS ARCHITECTURE [--write]
#
# With --write the kept one, abi/<library's name>.<architecture>.abi, is written anew. ARCHITECTURE
# is as CMake names it. Exits with 77 ("skipped") where nothing was kept or cannot be compared.
set -eu
library=$1 headers=$2
. "$(dirname "$0")/common.sh"

skip() {
  echo "skipped: $*" >&2
  exit 77
}

case $3 in
  x86_64) architecture=amd64 ;;
  i?86) architecture=i386 ;;
  *) skip "no binary interface is kept for $3" ;;
esac
command -v abidw >/dev/null || skip "the package abigail-tools is missing"
readelf --sections --wide "$library" | grep -q '\.debug_info' ||
  skip "this build has no debug information, which tells the types"
name=$(basename "$library")
kept=$(dirname "$0")/abi/${name%%.*}.$architecture.abi

# Types that no public header declares are left out, and so are names of parameters, and of sources
# all but folder and file. With ids made of the types' names, everything else stays where it was when
# one type changes.
write_interface() {
  abidw --headers-dir "$headers" --drop-private-types --exported-interfaces-only \
    --no-corpus-path --no-comp-dir-path --no-show-locs --no-parameter-names --no-elf-needed \
    --type-id-style hash "$library" | sed "s|\(<abi-instr .*path='\)[^']*/\([^/']*/\)|\1\2|" >"$1"
}

if [ "${4:-}" = --write ]; then
  mkdir -p "$(dirname "$kept")"
  write_interface "$kept"
  exit
fi
current=$(mktemp)
trap 'rm -f "$current"' EXIT
write_interface "$current"
# Two texts are compared, not text and library: a text no longer tells which types were private.
abidiff "$kept" "$current" ||
  fail "the binary interface is not the kept one; see CONTRIBUTING.md before changing that"
