#!/usr/bin/env bash
# Runs scripts/release in small repositories: each reason to refuse alone, and a release.
#
#   release_test.sh PROJECT_FOLDER
set -eu
project=$(cd "$1" && pwd)
. "$(dirname "$0")/common.sh"

# fresh NAME: goes into a new repository that could be released as 1.2.0.
fresh() {
  mkdir -p "$scratch/$1/scripts" "$scratch/$1/packaging/debian"
  cd "$scratch/$1"
  cp "$project/scripts/release" scripts/
  printf 'project(\n  tuvosharing\n  VERSION 1.2.0\n  LANGUAGES CXX)\n' >CMakeLists.txt
  printf '# Changes\n\n## 1.2.0 – 2026-12-31\n\n### Added\n\n- A thing.\n\n## 1.1.0 – 2026-01-01\n\n- Old.\n' \
    >CHANGELOG.md
  printf 'tuvosharing (1.2.0-1) unstable; urgency=medium\n\n  * News.\n' >packaging/debian/changelog
  git init -q
  commit
}

commit() {
  git add .
  git commit -q -m "A state"
}

# refused REASON: neither the check nor the release itself lets this through, and there is this reason
# alone; the state of the repository stays as it is.
refused() {
  local argument before
  before=$(git for-each-ref; git status --porcelain)
  for argument in --check ''; do
    # shellcheck disable=SC2086
    ! scripts/release $argument >"$scratch/out" 2>&1 || fail "$PWD: released in spite of: $1"
    grep -q "$1" "$scratch/out" || { cat "$scratch/out" && fail "not the reason: $1"; }
    [ "$(grep -c '^  ' "$scratch/out")" = 1 ] || { cat "$scratch/out" && fail "more than: $1"; }
  done
  [ "$(git for-each-ref; git status --porcelain)" = "$before" ] || fail "$PWD: something changed"
  echo "ok  refused: $1"
}

fresh good
scripts/release --versions >/dev/null || fail "the versions agree"
scripts/release --check >/dev/null || fail "there is nothing against it"
[ -z "$(git tag)" ] || fail "--check makes a tag"
scripts/release >/dev/null || fail "no release"
[ "$(git tag)" = v1.2.0 ] || fail "the tag"
[ "$(git cat-file -t v1.2.0)" = tag ] || fail "the tag has no message"
git cat-file tag v1.2.0 | grep -q '^### Added$' || fail "the changes are not in the tag's message"
! git cat-file tag v1.2.0 | grep -q Old || fail "changes of another release are in it"
[ -z "$(git status --porcelain)" ] || fail "the release changes files"
echo "ok  released"
refused 'the tag v1.2.0 is there already'

fresh project_version
sed -i 's/VERSION 1.2.0/VERSION 1.3.0/' CMakeLists.txt
commit
! scripts/release --versions 2>"$scratch/out" || fail "two faults"
grep -q 'newest heading' "$scratch/out" || fail "CHANGELOG.md is behind"
grep -q 'debian/changelog' "$scratch/out" || fail "the packages are behind"
echo "ok  refused: another version in CMakeLists.txt"

fresh changelog_version
sed -i 's/^## 1.2.0/## 1.2.1/' CHANGELOG.md
commit
refused 'the newest heading of CHANGELOG.md is "## 1.2.1'

fresh package_version
sed -i 's/(1.2.0-1)/(1.1.0-1)/' packaging/debian/changelog
commit
refused 'packaging/debian/changelog begins with "tuvosharing (1.1.0-1)'

fresh no_version
sed -i 's/1\.2\.0/1.2/' CMakeLists.txt CHANGELOG.md packaging/debian/changelog
commit
refused 'no MAJOR.MINOR.PATCH'

fresh no_date
sed -i 's/^## 1.2.0.*/## 1.2.0 – unreleased/' CHANGELOG.md
commit
refused 'has no date'

fresh no_changes
sed -i '/A thing/d' CHANGELOG.md
commit
refused 'says nothing about 1.2.0'

fresh unreleased_package
sed -i 's/unstable/UNRELEASED/' packaging/debian/changelog
commit
refused 'says UNRELEASED'

fresh changed
echo '# another line' >>CMakeLists.txt
refused 'not committed:  M CMakeLists.txt'

fresh untracked
touch forgotten.cpp
refused 'not committed: ?? forgotten.cpp'

fresh older
git tag v1.10.0
refused '1.10.0 has been released, which is later than 1.2.0'

fresh after
git tag v1.1.9
scripts/release >/dev/null || fail "1.2.0 comes after 1.1.9"
echo "ok  released after 1.1.9"
