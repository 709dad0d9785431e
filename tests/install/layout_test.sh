#!/usr/bin/env bash
# Installs a build to a staging folder and checks where its files land and what they are.
#
#   layout_test.sh BUILD_FOLDER LISTED_FILES
set -eu
build=$1 listed=$2
. "$(dirname "$0")/common.sh"

stage=$build/tests/install/stage
rm -rf "$stage"
umask 022
DESTDIR=$stage cmake --install "$build" >/dev/null

prefix=$(prefix_of "$build")
[ "$prefix" = /usr/tuvo ] || {
  echo "skipped: this build was given the prefix $prefix" >&2
  exit 77
}

# Nothing outside the prefix; nothing missing inside; nothing that just anybody may write to.
outside=$(cd "$stage" && find . ! -type d ! -path './usr/tuvo/*')
[ -z "$outside" ] || fail "outside the prefix: $outside"
(cd "$stage/usr/tuvo" && find . ! -type d | sed 's|^\./||' | sort) >"$stage/files"
missing=$(grep -v '^#' "$listed" | sort | comm -23 - "$stage/files")
[ -z "$missing" ] || fail "not installed: $missing"
loose=$(find "$stage/usr" ! -type l -perm /022)
[ -z "$loose" ] || fail "writable by others: $loose"

# Every public header of the sources, and no private one.
project=$(cd "$(dirname "$0")/../.." && pwd)
diff <(cd "$project/include" && find tuvosharing -type f | sort) \
  <(cd "$stage/usr/tuvo/include" && find tuvosharing -type f | sort) ||
  fail "the installed headers are not those of include/tuvosharing"
[ ! -e "$stage/usr/tuvo/include/internal" ] || fail "private headers are installed"

# The names that programs record, and where the library looks for the platform's.
soname() { objdump -p "$stage/usr/tuvo/lib/$1" | sed -n 's/^ *SONAME *//p'; }
needed() { objdump -p "$stage/usr/tuvo/lib/$1" | sed -n 's/^ *NEEDED *//p'; }
runpath() { objdump -p "$stage/usr/tuvo/lib/$1" | sed -n 's/^ *RUNPATH *//p'; }
[ "$(soname libtuvosharing.so)" = libtuvosharing.so.7 ] || fail "SONAME of libtuvosharing"
[ "$(soname libtuvoplatform.so)" = libtuvoplatform.so.1 ] || fail "SONAME of libtuvoplatform"
needed libtuvosharing.so.7 | grep -qx libtuvoplatform.so.1 || fail "libtuvoplatform is not needed"
[ "$(runpath libtuvosharing.so.7)" = '$ORIGIN:$ORIGIN/../lib:/usr/tuvo/lib' ] || fail "run path of libtuvosharing"

# The scripts that a new database file is made with, unchanged.
for version in 1 2; do
  cmp "$project/schema/$version.sql" "$stage/usr/tuvo/share/tuvosharing/db_schema/$version.sql"
done
rm -rf "$stage"
echo "$(grep -vc '^#' "$listed") listed files are there"
