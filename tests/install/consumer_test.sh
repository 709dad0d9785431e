#!/usr/bin/env bash
# Runs under scripts/private-root, whose /usr/tuvo is private: installs the build there, as on the
# appliance, then builds and runs programs in C and C++ and the example of README.md against it,
# outside the project, once through pkg-config and once through the CMake package.
#
#   consumer_test.sh BUILD_FOLDER PROJECT_FOLDER
set -eu
build=$1 project=$2
here=$project/tests/install
. "$here/common.sh"

[ -n "${TUVO_PRIVATE_ROOT:-}" ] || fail "run this under scripts/private-root"
prefix=$(prefix_of "$build")
[ "$prefix" = /usr/tuvo ] || {
  echo "skipped: this build was given the prefix $prefix, which is not private here" >&2
  exit 77
}

# As far away from the project as a program can be.
outside=/tmp/outside
mkdir "$outside"
cp "$here"/consumer/* "$outside"
"$here/readme_example" cpp <"$project/README.md" >"$outside/example.cpp"
"$here/readme_example" console <"$project/README.md" | grep -v '^\$ ' >"$outside/expected"
[ -s "$outside/example.cpp" ] && [ -s "$outside/expected" ] || fail "no example in README.md"
cmake --install "$build" >/dev/null

# run PROGRAM...: starts from no database, with nothing of the build in the environment.
run() {
  rm -f /usr/tuvo/etc/private/session/sharing.db*
  env -i PATH=/usr/bin:/bin "$@"
}

check_programs() {
  run REMOTE_ADDR=192.0.2.7 "$1/c_program" || fail "$1/c_program"
  run REMOTE_ADDR=192.0.2.7 "$1/cpp_program" || fail "$1/cpp_program"
  run "$1/platform_program" || fail "$1/platform_program"
  run REMOTE_ADDR=192.0.2.7 "$1/example" >"$1/output" || fail "$1/example ended with $?"
  diff "$outside/expected" "$1/output" || fail "$1/example wrote something else"
  [ "$(stat -c %u:%g:%a /usr/tuvo/etc/private/session/sharing.db)" = 1:1:660 ] ||
    fail "owner or mode of the database file"
  uses=$(sqlite3 /usr/tuvo/etc/private/session/sharing.db 'SELECT use_count FROM entry')
  [ "$uses" = 1 ] || fail "the example left use counts '$uses'"
  libraries=$(ldd "$1/example")
  grep -q '/usr/tuvo/lib/libtuvosharing.so.7 ' <<<"$libraries" || fail "another libtuvosharing"
  grep -q '/usr/tuvo/lib/libtuvoplatform.so.1 ' <<<"$libraries" || fail "another libtuvoplatform"
}

cd "$outside"
export PKG_CONFIG_PATH=$prefix/lib/pkgconfig
version=$(sed -n 's/^CMAKE_PROJECT_VERSION:[A-Z]*=//p' "$build/CMakeCache.txt")
[ "$(pkg-config --modversion tuvosharing)" = "$version" ] || fail "version in tuvosharing.pc"
warnings="-Wall -Wextra -Wpedantic -Werror"
mkdir with_pkg_config
# shellcheck disable=SC2046,SC2086
cc -std=c99 $warnings c_program.c -o with_pkg_config/c_program $(pkg-config --cflags --libs tuvosharing)
for name in cpp_program example; do
  # shellcheck disable=SC2046,SC2086
  c++ -std=c++17 $warnings $name.cpp -o with_pkg_config/$name \
    $(pkg-config --cflags --libs tuvosharing)
done
# shellcheck disable=SC2046,SC2086
c++ -std=c++17 $warnings platform_program.cpp -o with_pkg_config/platform_program \
  $(pkg-config --cflags --libs tuvoplatform)
check_programs "$outside/with_pkg_config"

# through_cmake FOLDER VERSION: configures and builds the project there, asking for that version.
through_cmake() {
  cmake -S . -B "$1" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" -DWANTED_VERSION="$2" &&
    cmake --build "$1"
}
through_cmake with_cmake "$version" >cmake.log 2>&1 || { cat cmake.log && fail "find_package"; }
check_programs "$outside/with_cmake"

# Before 1.0 a package of another minor version is no replacement.
IFS=. read -r major minor _ <<<"$version"
! through_cmake newer "$major.$((minor + 1))" >cmake.log 2>&1 || fail "a newer version was found"
grep -q 'compatible with requested version' cmake.log || { cat cmake.log && fail "other reason"; }
