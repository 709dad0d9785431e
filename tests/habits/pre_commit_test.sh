#!/usr/bin/env bash
# Commits to a repository in which the hook is enabled as CONTRIBUTING.md says.
#
#   pre_commit_test.sh PROJECT_FOLDER
set -eu
project=$(cd "$1" && pwd)
. "$(dirname "$0")/common.sh"
command -v clang-format >/dev/null || {
  echo "skipped: clang-format is not installed" >&2
  exit 77
}

cp -r "$project/.githooks" "$project/.clang-format" "$scratch"
cd "$scratch"
git init -q
enable=$(grep -o 'git config core\.hooksPath .*' "$project/CONTRIBUTING.md" | sed 's/ *#.*//')
[ -n "$enable" ] || fail "CONTRIBUTING.md does not say how the hook is enabled"
eval "$enable"

good='int main() {
  return 0;
}'
mkdir "a folder"
printf '%s\n' "$good" >"a folder/good.cpp"
echo 'int   ugly;' >not-staged.cpp
echo 'int   ugly;' >text.txt
git add .githooks .clang-format "a folder" text.txt
git commit -q -m "Formatted" || fail "a formatted file is refused"

printf 'int main( ){return 0;}\n' >"a folder/bad.cpp"
git add "a folder/bad.cpp"
! git commit -q -m "Not formatted" 2>out || fail "an ill-formatted file is committed"
grep -q '^  a folder/bad.cpp$' out || { cat out && fail "the file is not named"; }
! grep -q 'good.cpp\|not-staged' out || { cat out && fail "other files are named"; }

# What counts is what is staged, not what lies in the folder.
printf '%s\n' "$good" >"a folder/bad.cpp"
! git commit -q -m "Not formatted" 2>/dev/null || fail "the folder's file was looked at"
git add "a folder/bad.cpp"
printf 'int main( ){return 0;}\n' >"a folder/bad.cpp"
git commit -q -m "Formatted, as staged" || fail "the staged file is formatted"

# A file that goes is not looked at.
git rm -q --force "a folder/bad.cpp"
git commit -q -m "Without it" || fail "a removal is refused"
echo "ok"
