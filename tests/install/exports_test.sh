#!/usr/bin/env bash
# Compares what a shared library exports, weak symbols included, with a kept list, and sees that
# nothing it uses is missing.
#
#   exports_test.sh LIBRARY LIST [--write]
#
# With --write the list is written anew. The list has one line for each symbol, demangled, with
# "string" for the standard string; constructors and destructors stand there once for each variant.
set -eu
library=$1 list=$2
. "$(dirname "$0")/common.sh"

exported() {
  nm --dynamic --defined-only --format=posix "$library" | cut -d ' ' -f 1 | c++filt |
    sed 's/std::__cxx11::basic_string<char, std::char_traits<char>, std::allocator<char> >/string/g' |
    LC_ALL=C sort
}

if [ "${3:-}" = --write ]; then
  exported >"$list"
  exit
fi
diff "$list" <(exported) || fail "the exports differ from $list ('<': missing, '>': not wanted)"

missing=$(ldd -r "$library" 2>&1 | grep -E 'undefined symbol|not found' || true)
[ -z "$missing" ] || fail "$missing"
echo "$(wc -l <"$list") symbols"
