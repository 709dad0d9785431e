#!/usr/bin/env bash
# The API reference can be made without a warning, and what lacks a contract is noticed.
#
#   reference_test.sh PROJECT_FOLDER WORK_FOLDER
set -eu
project=$1
work=$2
. "$(dirname "$0")/common.sh"

command -v doxygen >/dev/null || {
  echo "skipped: doxygen is not installed" >&2
  exit 77
}
rm -rf "$work"
mkdir -p "$work"

"$project/scripts/reference" "$work/reference" >"$work/log" 2>&1 || {
  cat "$work/log" >&2
  fail "there are warnings"
}
for page in index.html login_8h.html cgi_8h.html md_result_codes.html; do
  [ -s "$work/reference/$page" ] || fail "no page $page"
done
grep -q 'href="md_result_codes.html"' "$work/reference/index.html" || fail "no way to the codes"
# A contract that only a shared comment gives, one behind a declaration, and one of C's.
for text in 'Id to name' 'session identifier, from the cookie' 'Frees a user record'; do
  grep -rqF "$text" "$work/reference" || fail "not there: $text"
done
grep -rqE "(/usr/local/|$project)" "$work/reference" && fail "the pages name this machine's folders"

# Replaced is only what is a reference.
mkdir "$work/other"
touch "$work/other/file"
! "$project/scripts/reference" "$work/other" 2>/dev/null || fail "took a folder of somebody else"
[ -f "$work/other/file" ] || fail "deleted somebody else's file"

# made_of HEADER: doxygen's status for a header of that text, under the project's settings.
made_of() {
  mkdir -p "$work/headers"
  printf '// A file.\n#ifndef X_H_\n#define X_H_\n%s\n#endif  // X_H_\n' "$1" >"$work/headers/x.h"
  (cd "$project" && {
    cat docs/reference/Doxyfile
    printf '%s\n' "INPUT = $work/headers" "USE_MDFILE_AS_MAINPAGE =" "OUTPUT_DIRECTORY = $work/made"
  } | doxygen - >"$work/log" 2>&1)
}
made_of $'// One.\nint One();\nint Two();' || fail "a shared contract is no contract"
made_of $'// One.\nclass One {\n public:\n  One(const One&) = delete;\n  ~One();\n};' ||
  fail "what is deleted needs a contract"
made_of $'// One.\nstruct One {\n  int two;  // Two.\n};' || fail "a contract behind is no contract"
made_of $'// See \\ref nothing, @nothing and <nothing>.\nint One();' || fail "a comment is a command"
! made_of $'// One.\nint One();\n\nint Two();' || fail "a function without a contract is not noticed"
! made_of $'int One();' || fail "a file's comment is taken for a function's"
! made_of $'class One {\n public:\n  // Two.\n  int Two();\n};' || fail "a class without one, neither"
! made_of $'// One.\nclass One {\n public:\n  int Two();\n};' || fail "a member without one, neither"
! made_of $'// One.\nstruct One {\n  int two;\n};' || fail "a struct's member without one, neither"
! made_of $'#define ONE 1' || fail "a macro without a contract is not noticed"

# A namespace without a description is left out without a warning: the names are looked for.
cat >"$work/names.tag" <<'TAGS'
<tagfile><compound kind="namespace"><name>A</name><member kind="function"><name>B</name>
<anchor>1</anchor><arglist>()</arglist></member></compound></tagfile>
TAGS
names() {
  printf '%s\n' "$@" >"$work/symbols"
  "$project/docs/reference/check_names.py" "$work/names.tag" "$work/symbols" >/dev/null
}
names 'A::B()' || fail "a described name is missing"
! names 'A::B()' 'A::C()' || fail "a name that is not described is not noticed"
! names 'A::B()' 'A::B(int)' || fail "one of two parameter lists is not noticed"
! names 'B()' || fail "a name in another namespace is taken for it"
