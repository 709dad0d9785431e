#!/usr/bin/env bash
# What a newcomer does first, in a fresh Debian, where scripts/test-packages runs this as root: takes the
# sources and runs the demonstration. It installs what it needs, works, and says nothing that looks as if
# something were wrong.
set -eu

step() { echo "ok      $*"; }
fail() {
  echo "FAILED  $*"
  exit 1
}

cd /root
mkdir sharing
tar -C /project --exclude=./build --exclude=./.git --exclude=./.cache -cf - . | tar -C sharing -xf -
cd sharing

# demonstrate: as somebody types it who has just logged in.
demonstrate() {
  env -i HOME=/root PATH="$PATH" LANG=C.UTF-8 TERM=dumb scripts/demo --check >../said 2>&1 </dev/null ||
    { cat ../said && fail "the demonstration"; }
  # What apt, dpkg and compilers say when something is odd; what was demonstrated tells of its own
  # refusals.
  ! grep -v '^ok ' ../said |
    grep -E '^[EWN]: |^(debconf|dpkg|invoke-rc.d|perl|update-alternatives): |[Ww]arning|[Ee]rror:|[Ff]ailed|FAILED|[Cc]annot|[Nn]ot found|No such' ||
    fail "what a newcomer would wonder at: see above"
  grep -q '^ok ' ../said || { cat ../said && fail "nothing was demonstrated"; }
}

! command -v g++ >/dev/null || fail "this system is not fresh"
demonstrate
cat ../said
step "with nothing there but Debian, the demonstration installs what it needs and works"
before=$(date +%s)
demonstrate
step "once more, in $(($(date +%s) - before)) seconds"
echo "ok      all of it"
