#!/usr/bin/env bash
# What others build against the packages, in a fresh Debian with compilers, where scripts/test-packages
# runs this as root: programs outside of the project, through pkg-config and through CMake; each public
# header alone; and how the packages' own programs were built.
#
#   programs_test.sh ARCHITECTURE
set -eu
width=$1
packages=/project/build/packages
session=/usr/tuvo/etc/private/session

step() { echo "ok      $*"; }
fail() {
  echo "FAILED  $*"
  exit 1
}
trap 'echo "FAILED  line $LINENO: $BASH_COMMAND" >&2' ERR
set -E

apt-get -qq --yes --no-install-recommends install \
  "$packages"/{libtuvosharing7,libtuvoplatform1,libtuvosharing-dev,tuvosharing}_*_"$width".deb \
  </dev/null
libraries=/usr/lib/$(gcc -print-multiarch)
[ -f "$libraries/libtuvosharing.so.7" ] || fail "the library is not in $libraries"

outside=/root/outside
mkdir "$outside"
cd "$outside"
cp /project/tests/install/consumer/* .
/project/tests/install/readme_example cpp </project/README.md >example.cpp
/project/tests/install/readme_example console </project/README.md | grep -v '^\$ ' >expected
[ -s example.cpp ] && [ -s expected ]
warnings=(-Wall -Wextra -Wpedantic -Wconversion -Wshadow -Werror)

# options PACKAGE: what pkg-config says, which is to name none of the places that are looked at anyway.
options() {
  local text
  text=$(pkg-config --cflags --libs "$1")
  case " $text " in
    *rpath* | *" -L"* | *" -I/usr/include "*) fail "pkg-config --cflags --libs $1: $text" ;;
  esac
  echo "$text"
}
[ "$(pkg-config --modversion tuvosharing tuvoplatform | sort -u)" = \
  "$(dpkg-query -W -f='${Version}' libtuvosharing-dev)" ] || fail "version for pkg-config"
[ "$(pkg-config --variable=prefix tuvosharing)" = /usr ] || fail "prefix for pkg-config"
[ "$(pkg-config --variable=libdir tuvosharing)" = "$libraries" ] || fail "libdir for pkg-config"

# run PROGRAM: from no database, with nothing of this shell in the environment.
run() {
  rm -f $session/sharing.db*
  env -i PATH=/usr/bin:/bin REMOTE_ADDR=192.0.2.7 "$@" || fail "$* ended with $?"
}
check_programs() {
  run "./$1/c_program"
  run "./$1/cpp_program"
  run "./$1/platform_program"
  run "./$1/example" >"$1/output"
  diff expected "$1/output" || fail "$1/example wrote something else"
  [ "$(stat -c %u:%g:%a $session/sharing.db)" = 1:1:660 ] || fail "owner or mode of the database"
  local program used
  for program in c_program cpp_program example; do
    used=$(ldd "$1/$program")
    grep -q " ${libraries#/usr}/libtuvosharing.so.7 " <<<"$used" || fail "$1/$program: $used"
    ! readelf --dynamic "$1/$program" | grep -E 'RPATH|RUNPATH' || fail "$1/$program has a run path"
  done
  step "$2: programs in C and C++ are built and run"
}

read -ra sharing <<<"$(options tuvosharing)"
read -ra platform <<<"$(options tuvoplatform)"
for compilers in "gcc g++" "clang clang++"; do
  read -r c cpp <<<"$compilers"
  mkdir "pkg-config-$c"
  "$c" -std=c99 "${warnings[@]}" c_program.c -o "pkg-config-$c/c_program" "${sharing[@]}"
  for name in cpp_program example; do
    "$cpp" -std=c++17 "${warnings[@]}" $name.cpp -o "pkg-config-$c/$name" "${sharing[@]}"
  done
  "$cpp" -std=c++17 "${warnings[@]}" platform_program.cpp -o "pkg-config-$c/platform_program" \
    "${platform[@]}"
  check_programs "pkg-config-$c" "pkg-config, $c"
  CC=$c CXX=$cpp cmake -S . -B "cmake-$c" -G Ninja -DWANTED_VERSION="$(pkg-config --modversion tuvosharing)" >cmake.log 2>&1 ||
    { cat cmake.log && fail "find_package, $c"; }
  cmake --build "cmake-$c" >cmake.log 2>&1 || { cat cmake.log && fail "find_package, $c"; }
  check_programs "cmake-$c" "find_package, $c"
done

mapfile -t headers < <(cd /usr/include && find tuvosharing tuvoplatform -type f | sort)
diff <(printf '%s\n' "${headers[@]}") \
  <(cd /project && find include/tuvosharing platform/include/tuvoplatform -type f |
    sed 's|.*include/||' | sort) || fail "the packaged headers are not the public ones"
read -ra flags <<<"$(pkg-config --cflags tuvosharing tuvoplatform)"
# From a copy: compilers do not warn of what is in the system's folders.
mkdir copy
cp -r /usr/include/tuvosharing /usr/include/tuvoplatform copy
flags+=("-I$PWD/copy")
echo 'inline int Narrow(long long wide) { return wide; }' >copy/faulty.h
for compiler in g++ clang++; do
  ! $compiler -fsyntax-only "${warnings[@]}" "${flags[@]}" -x c++ - <<<'#include <faulty.h>' 2>/dev/null ||
    fail "$compiler has nothing to say about a faulty header"
done
# shellcheck disable=SC2016 # the inner shell's arguments
printf '%s\n' "${headers[@]}" | xargs -P "$(nproc)" -I{} bash -eu -c '
  header=$1
  shift
  for compiler in g++ clang++; do
    for standard in c++17 c++20; do
      $compiler -std=$standard -fsyntax-only "$@" -x c++ - <<<"#include <$header>" ||
        { echo "FAILED  $header, $compiler, $standard" && exit 1; }
    done
  done' - {} "${warnings[@]}" "${flags[@]}" ||
  fail "see above"
step "${#headers[@]} headers, each alone, in C++17 and C++20, by g++ and clang++, without a warning"
for compiler in gcc clang; do
  for standard in c99 c11; do
    $compiler -std=$standard -fsyntax-only "${warnings[@]}" "-I$PWD/copy" -x c - <<<'#include <tuvosharing/login.h>' ||
      fail "login.h, $compiler, $standard"
  done
done
step "login.h in C99 and C11, by gcc and clang, without a warning"

for file in "$libraries"/libtuvo*.so.* /usr/tuvo/bin/* /usr/tuvo/libexec/*; do
  dynamic=$(readelf --dynamic --wide "$file")
  ! grep -E 'RPATH|RUNPATH' <<<"$dynamic" || fail "$file has a run path"
  grep -q 'BIND_NOW\|Flags:.* NOW' <<<"$dynamic" || fail "$file: not bound at the start"
  readelf --program-headers --wide "$file" | grep -q GNU_RELRO || fail "$file: no RELRO"
  readelf --file-header "$file" | grep -q 'Type: *DYN' || fail "$file: not position-independent"
  readelf --dyn-syms --wide "$file" | grep -q __stack_chk_fail || fail "$file: no stack protector"
  readelf --dyn-syms --wide "$file" | grep -qE '_chk(@|$)' || fail "$file: not fortified"
done
step "no run path in the packages' programs and libraries, and the hardening is there"
trap - ERR
echo "ok      all of it"
