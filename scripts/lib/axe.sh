# shellcheck shell=bash
# To be sourced, after packages.sh. install_axe: puts axe-core, the accessibility checker that the browser tests load
# into the pages, under build/tools, unless it is there already. It is in no package of Debian's, so
# it comes through npm, which is installed for that, from the registry that npm is configured with. Where
# it cannot be had, or is not the file that it was when this was written, this says why and returns
# 1; the tests that need it are skipped then. It is used by tests alone: nothing of it is built,
# installed or handed out.

# Where it is, from the project's folder.
tuvo_axe=build/tools/node_modules/axe-core/axe.min.js
tuvo_axe_version=4.14.1
tuvo_axe_sha256=29348999450cdf2849a8e70b7912fc2da85a849da39c0d0d5394f51d4a9ed95c

# It runs with root's browser: another file, whoever sent it, is taken away.
is_axe_genuine() {
  echo "$tuvo_axe_sha256  $tuvo_axe" | sha256sum --check --status && return 0
  echo "No accessibility tests: $tuvo_axe is not that of axe-core $tuvo_axe_version" >&2
  rm -f "$tuvo_axe"
  return 1
}

install_axe() {
  if [ -s "$tuvo_axe" ]; then
    is_axe_genuine
    return
  fi
  # Many packages, which nothing else here needs.
  if ! command -v npm >/dev/null && [ "$(id -u)" -eq 0 ]; then
    tuvo_apt_install npm || true
  fi
  if ! command -v npm >/dev/null; then
    echo "No accessibility tests: npm, which would fetch axe-core, is not on this machine" >&2
    return 1
  fi
  local log
  if ! log=$(npm install --prefix build/tools --ignore-scripts --no-audit --no-fund --no-save \
    "axe-core@$tuvo_axe_version" </dev/null 2>&1) || [ ! -s "$tuvo_axe" ]; then
    echo "No accessibility tests: npm could not fetch axe-core:" >&2
    echo "$log" >&2
    return 1
  fi
  is_axe_genuine
}
