#!/usr/bin/env bash
# Every manual page renders without a warning, under its own name and section, and is installed; every
# program and every function for C has one.
#
#   man_test.sh PROJECT_FOLDER
set -eu
project=$1
. "$(dirname "$0")/common.sh"

command -v man >/dev/null || {
  echo "skipped: man-db is not installed" >&2
  exit 77
}
installed=$project/tests/install/installed_files.txt

# Laid out as they are installed, since a page may be another one's (".so").
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
pages=()
for page in "$project"/packaging/man/*.[1-8]; do
  page=${page##*/}
  pages+=("man${page##*.}/$page")
  mkdir -p "$tree/man${page##*.}"
  cp "$project/packaging/man/$page" "$tree/man${page##*.}/"
done
cd "$tree"
[ -f "${pages[0]}" ] || fail "no manual pages"

for page in "${pages[@]}"; do
  name=${page##*/} section=${page##*.}
  name=${name%.*}
  title=$name
  other=$(sed -n '1s|^\.so man[1-8]/\(.*\)\.[1-8]$|\1|p' "$page")
  [ -z "$other" ] || title=$other
  warnings=$(LC_ALL=C.UTF-8 MANWIDTH=80 man --warnings -l "$page" 2>&1 >/dev/null)
  [ -z "$warnings" ] || fail "$page: $warnings"
  text=$(LC_ALL=C.UTF-8 MANWIDTH=80 man -l "$page")
  grep -q "^${title^^}($section) .* ${title^^}($section)$" <<<"$text" || fail "$page: another title"
  for heading in NAME SYNOPSIS DESCRIPTION; do
    grep -qx "$heading" <<<"$text" || fail "$page: no section $heading"
  done
  lexgrog "$page" | grep -q "\"$name - " || fail "$page: not found by what it is about"
  grep -qx "share/man/$page" "$installed" || fail "$page is not among the installed files"
done

# The pages that a page refers to are there; two are of others.
while read -r reference; do
  [ -f "man${reference##*.}/$reference" ] || fail "no page $reference, which another one refers to"
done < <(cat man*/* | sed -n 's/^\.BR \([^ ]*\) (\([1-8]\)).*/\1.\2/p' | sort -u |
  grep -vE '^(crontab\.5|pam_unix\.8)$')

programs=$(sed -n 's|^bin/||p' "$installed")
[ -n "$programs" ] || fail "no programs"
for program in $programs; do
  [ -f "man1/$program.1" ] || [ -f "man8/$program.8" ] || fail "no page for the program $program"
done
functions=$(grep -E '^[A-Za-z]+$' "$project/tests/install/exported_symbols.txt")
[ -n "$functions" ] || fail "no functions for C"
for function in $functions; do
  [ -f "man3/$function.3" ] || fail "no page for the function $function"
done

# The synopsis declares the functions as the header does, and the example is a program in C.
compiles() {
  "${CC:-cc}" -std=c99 -fsyntax-only -Wall -Wextra -Wpedantic -Werror -D_FILE_OFFSET_BITS=64 \
    "-I$project/include" "$1" || fail "$1 does not compile"
}
{
  echo '#include <tuvosharing/login.h>'
  LC_ALL=C.UTF-8 MANWIDTH=120 man -l man3/TuvoSharingLogin.3 |
    sed -n '/^SYNOPSIS/,/^DESCRIPTION/p' | sed -n '/^ *int /,/^$/p'
} >synopsis.c
for function in $functions; do
  grep -q "int $function(" synopsis.c || fail "no synopsis of $function"
done
compiles synopsis.c
sed -n '/^\.SH EXAMPLES/,/^\.SH SEE/{/^\.EX$/,/^\.EE$/{/^\.E[XE]$/!p}}' man3/TuvoSharingLogin.3 |
  sed 's/\\-/-/g; s/\\e/\\/g' >example.c
[ -s example.c ] || fail "no example"
compiles example.c
echo "${#pages[@]} pages"
