# shellcheck shell=bash
# To be sourced. install_axe: puts axe-core, the accessibility checker that the browser tests load
# into the pages, under build/tools, unless it is there already. It is in no package of Debian's, so
# it comes through npm where the machine has that, from the registry that npm is configured with. Where
# it cannot be had this says why and returns 1; the tests that need it are skipped then. It is used by
# tests alone: nothing of it is built, installed or handed out.

# Where it is, from the project's folder.
tuvo_axe=build/tools/node_modules/axe-core/axe.min.js

install_axe() {
  [ -s "$tuvo_axe" ] && return 0
  if ! command -v npm >/dev/null; then
    echo "No accessibility tests: npm, which would fetch axe-core, is not on this machine" >&2
    return 1
  fi
  local log
  if ! log=$(npm install --prefix build/tools --ignore-scripts --no-audit --no-fund --no-save \
    axe-core@4.14.1 </dev/null 2>&1) || [ ! -s "$tuvo_axe" ]; then
    echo "No accessibility tests: npm could not fetch axe-core:" >&2
    echo "$log" >&2
    return 1
  fi
}
