# shellcheck shell=bash
# To be sourced by the tests in this folder, which work in git repositories of their own.

fail() {
  echo "FAILED: $*" >&2
  exit 1
}

command -v git >/dev/null || {
  echo "skipped: git is not installed" >&2
  exit 77
}

# Nobody's own settings, and a name for the commits.
export GIT_CONFIG_GLOBAL=/dev/null GIT_CONFIG_NOSYSTEM=1
export GIT_AUTHOR_NAME=Tester GIT_AUTHOR_EMAIL=tester@example.org
export GIT_COMMITTER_NAME=Tester GIT_COMMITTER_EMAIL=tester@example.org
unset GIT_DIR GIT_WORK_TREE GIT_INDEX_FILE

scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
