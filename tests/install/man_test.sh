#!/usr/bin/env bash
# Every manual page renders without a warning, under its own name and section, and is installed.
#
#   man_test.sh PROJECT_FOLDER
set -eu
project=$1
. "$(dirname "$0")/common.sh"

command -v man >/dev/null || {
  echo "skipped: man-db is not installed" >&2
  exit 77
}
cd "$project/packaging/man"
pages=(*.[1-8])
[ -f "${pages[0]}" ] || fail "no manual pages"
for page in "${pages[@]}"; do
  name=${page%.*} section=${page##*.}
  warnings=$(LC_ALL=C.UTF-8 MANWIDTH=80 man --warnings -l "$page" 2>&1 >/dev/null)
  [ -z "$warnings" ] || fail "$page: $warnings"
  text=$(LC_ALL=C.UTF-8 MANWIDTH=80 man -l "$page")
  grep -q "^${name^^}($section) .* ${name^^}($section)$" <<<"$text" || fail "$page: another title"
  for heading in NAME SYNOPSIS DESCRIPTION; do
    grep -qx "$heading" <<<"$text" || fail "$page: no section $heading"
  done
  grep -qE "^ +$name (-|–|‐|−) " <<<"$text" || fail "$page: not found by what it is about"
  grep -qx "share/man/man$section/$page" "$project/tests/install/installed_files.txt" ||
    fail "$page is not among the installed files"
done
echo "${#pages[@]} pages"
