# shellcheck shell=bash
# To be sourced by the tests in this folder.

# fail TEXT...: ends the test.
fail() {
  echo "FAILED: $*" >&2
  exit 1
}

# The prefix that a build was configured with.
prefix_of() {
  sed -n 's/^CMAKE_INSTALL_PREFIX:[A-Z]*=//p' "$1/CMakeCache.txt"
}
