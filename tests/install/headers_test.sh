#!/usr/bin/env bash
# Every public header compiles alone, and none gives away what the library is made of.
#
#   headers_test.sh PROJECT_FOLDER
set -eu
project=$1
. "$(dirname "$0")/common.sh"

read -ra json < <(pkg-config --cflags jsoncpp)
options=(-fsyntax-only -D_FILE_OFFSET_BITS=64 -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Werror
  "-I$project/include" "-I$project/platform/include" "${json[@]}")

# The library's and the platform's, several at a time.
mapfile -t headers < <(cd "$project/include" && find tuvosharing -name '*.h')
mapfile -t platform_headers < <(cd "$project/platform/include" && find tuvoplatform -name '*.h')
[ ${#headers[@]} -gt 0 ] || fail "no headers found"
[ ${#platform_headers[@]} -gt 0 ] || fail "no headers of the platform found"
# shellcheck disable=SC2016 # the inner shell's arguments
printf '%s\n' "${headers[@]}" "${platform_headers[@]}" |
  xargs -P "$(nproc)" -I{} bash -c '
    header=$1; shift
    "$@" -x c++ - <<<"#include <$header>" || { echo "does not compile alone: $header"; exit 1; }
  ' - {} "${CXX:-c++}" -std=c++17 "${options[@]}" || fail "see above"

# What C programs use.
"${CC:-cc}" -std=c99 "${options[@]}" -x c - <<<"#include <tuvosharing/login.h>" ||
  fail "login.h is not C99"

# A program that uses the library needs neither SQLite's headers nor the private ones nor the
# platform's.
cd "$project/include/tuvosharing"
! grep -nE '^ *# *include.*(sqlite3\.h|internal/|tuvoplatform/|gcrypt|openssl)' -- *.h ||
  fail "a public header includes a private one"
! grep -nE 'sqlite3\.h|include/internal' -- *.h || fail "a public header mentions a private one"

# The header for everything has everything.
for header in *.h; do
  if [ "$header" != tuvosharing.h ]; then
    grep -qx "#include <tuvosharing/$header>" tuvosharing.h ||
      fail "tuvosharing.h leaves out $header"
  fi
done
