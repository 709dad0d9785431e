#!/usr/bin/env bash
# The file for hosted integration does what .ci/run does, and nothing else: it runs that, and .ci/run
# is a program without faults of syntax, whose steps are there.
#
#   ci_test.sh PROJECT_FOLDER
set -eu
cd "$1"
fail() {
  echo "FAILED: $*" >&2
  exit 1
}

runs=$(sed -n 's/^ *\(- \)\{0,1\}run: *//p' .github/workflows/*.yml)
[ "$runs" = .ci/run ] || fail "the workflow runs: $runs"
[ "$(ls .github/workflows)" = ci.yml ] || fail "another workflow: $(ls .github/workflows)"
# Nothing else is called but the step that fetches the sources.
uses=$(sed -n 's/^ *\(- \)\{0,1\}uses: *//p' .github/workflows/ci.yml)
[[ $uses =~ ^actions/checkout@v[0-9]+$ ]] || fail "the workflow uses: $uses"
[ -x .ci/run ] || fail ".ci/run is no program"
bash -n .ci/run

steps=$(sed -n 's/^step \([^ ]*\).*/\1/p' .ci/run)
[ -n "$steps" ] || fail ".ci/run has no steps"
for step in $steps; do
  [ -x "$step" ] || fail "$step is no program"
done
echo "$(wc -w <<<"$steps") steps"
