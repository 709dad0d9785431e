#!/usr/bin/env bash
# Sees that the library loads beside a platform that lacks what only this project's own has.
#
#   optional_symbols_test.sh LIBRARY
set -eu
library=$1
. "$(dirname "$0")/common.sh"

for symbol in TUVODBForgetRows; do
  type=$(nm --dynamic --undefined-only --format=posix "$library" | sed -n "s/^$symbol //p")
  [ "${type%% *}" = w ] || fail "$symbol is '$type', not a reference that may stay empty"
done
