#!/usr/bin/env bash
# Runs scripts/soak with programs that only say what they would have found: what it adds up, and when it
# fails.
#
#   soak_test.sh PROJECT_FOLDER BUILD_FOLDER
set -eu
project=$1
scratch=$2/Testing/soak_test # /tmp is another one inside scripts/private-root
if [ "$(id -u)" -ne 0 ]; then
  echo "skipped: needs root"
  exit 77
fi
rm -rf "$scratch"
trap 'rm -rf "$scratch"' EXIT
mkdir -p "$scratch/tests/concurrency" "$scratch/tests/crash"

fail() {
  echo "FAILED: $*"
  cat "$scratch/out"
  exit 1
}

# program NAME SCRIPT: what one of the tests is to be.
program() {
  printf '#!/bin/sh\n%s\n' "$2" >"$scratch/tests/$1"
  chmod 0755 "$scratch/tests/$1"
}

good() {
  program concurrency/use_limit_test 'echo "[ OK ]"
echo "tally: requests 100 failures 0 lost 0 kills 0 over-admissions 0"'
  program concurrency/many_processes_test \
    'echo "tally: requests 20 failures 0 lost 0 kills 0 over-admissions 0"'
  program crash/random_kills_test 'echo "tally: requests 3 failures 0 lost 0 kills 7 over-admissions 0"'
  program crash/power_loss_test 'echo "tally: requests 0 failures 0 lost 0 kills 0 over-admissions 0"'
  program crash/log_damage_test "$(printf 'echo "tally: requests %s failures 0 lost 0 kills 0 over-admissions 0"\n' 4 5)"
}

# soak STATUS FIGURES: runs it, and sees how it ends.
soak() {
  local status=0
  "$project/scripts/soak" --build "$scratch" 0 >"$scratch/out" 2>&1 || status=$?
  [ $status -eq "$1" ] || fail "status $status and not $1"
  [[ "$(tail -n 1 "$scratch/out")" =~ ^[0-9]+\ s,\ 5\ turns:\ $2$ ]] || fail "not the figures: $2"
}

good
soak 0 '132 requests, 0 failures, 0 lost rows, 7 kills, 0 over-admissions'
[ -z "$(ls "$scratch/soak")" ] || fail "logs of turns in which nothing failed"
echo "ok  the figures are added up"

program crash/random_kills_test \
  'echo "tally: requests 3 failures 1 lost 2 kills 7 over-admissions 0"; exit 1'
soak 1 '132 requests, 1 failures, 2 lost rows, 7 kills, 0 over-admissions'
[ -s "$scratch/soak/3-random_kills_test.log" ] || fail "no log of what failed"
grep -q 'FAILED  TUVO_SEED=[0-9]* TUVO_ROUNDS=12 scripts/private-root .*/tests/crash/random_kills_test: ' \
  "$scratch/out" || fail "not told how to run it again"
echo "ok  a lost row fails, and what was written is kept"

good
program concurrency/use_limit_test \
  'echo "tally: requests 100 failures 0 lost 0 kills 0 over-admissions 4"'
soak 1 '132 requests, 0 failures, 0 lost rows, 7 kills, 4 over-admissions'
echo "ok  an admission beyond a limit fails, whatever the test's own status"

good
program crash/log_damage_test 'exit 1'
soak 1 '123 requests, 1 failures, 0 lost rows, 7 kills, 0 over-admissions'
echo "ok  a test that fails for another reason is a failure"

good
program concurrency/many_processes_test 'kill -SEGV $$'
soak 1 '112 requests, 1 failures, 0 lost rows, 7 kills, 0 over-admissions'
echo "ok  so is one that dies"

good
program concurrency/many_processes_test 'true'
soak 1 '112 requests, 1 failures, 0 lost rows, 7 kills, 0 over-admissions'
echo "ok  and one that says nothing of what it has found"

good
program crash/power_loss_test 'exit 77'
soak 1 '132 requests, 1 failures, 0 lost rows, 7 kills, 0 over-admissions'
echo "ok  a skip has shown nothing"

! "$project/scripts/soak" --build "$scratch" soon >"$scratch/out" 2>&1 || fail "minutes that are no number"
grep -q 'sudo scripts/soak' "$scratch/out" || fail "no help"
echo "ok  minutes are a number"
