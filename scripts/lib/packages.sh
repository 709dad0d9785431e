# shellcheck shell=bash
# To be sourced. install_packages [--demo] [PACKAGE...]: makes sure that everything that the build, the
# tests and the demonstration need is on this machine, and the packages named besides, as packages of
# Debian 12; nothing else is ever installed. With --demo what only tests need is left out, a browser
# above all. Quick, and without need of root or a network, when nothing is missing.

# One package a line, and the reason for it; "tests:" when nothing but a test needs it.
# tuvo_packages [--demo]
tuvo_packages() {
  local left_out='^$'
  [ "${1:-}" != --demo ] || left_out='# tests:'
  grep -v "$left_out" <<'LIST' | sed 's/ *#.*//'
g++                 # the compiler
cmake               # configures the build
ninja-build         # runs it
pkg-config          # tells where the libraries are
libsqlite3-dev      # the database
libjsoncpp-dev      # JSON in the "data" column and in the records' JSON form
libgcrypt20-dev     # salted SHA-1 of link passwords
libssl-dev          # MD5 of link passwords
libpam0g-dev        # account logins
libcgicc-dev        # request parameters of the CGI programs
libcli11-dev        # options of the command-line programs
libfcgi-dev         # the web programs as long-lived FastCGI programs
libqrencode-dev     # QR codes of links' addresses
libgtest-dev        # tests: what they are written with
clang-format        # tests: the sources' format
python3             # the programs as a browser meets them; the demonstration reads JSON with it
python3-selenium    # tests: drives a real browser
chromium            # tests: that browser
chromium-driver     # tests: what selenium drives it through
strace              # tests: in which order the programs give up root and read the request
procps              # tests: ps, which processes a program leaves
iproute2            # tests: network interfaces of their own, for what the machine is called
sqlite3             # the database file looked at from outside
abigail-tools       # tests: compare the binary interface with the kept one
openssl             # the passwords of the private accounts
util-linux          # unshare: the private namespaces that tests and demonstration run in
mount               # lays those out
lighttpd            # the web server in front of the programs
lighttpd-mod-authn-pam # its logins of owners, against PAM
nginx-light         # tests: another web server in front of the programs
libnginx-mod-http-auth-pam # tests: the same of that one
zbar-tools          # tests: a QR code read as a camera would
man-db              # tests: the manual pages
doxygen             # tests: the API reference, which scripts/reference makes with it
bash-completion     # tests: the shell's completion
git                 # tests: the release script and the hook, in small repositories
media-types         # /etc/mime.types, from which the programs name a file's type
curl                # the demonstration's visitor
LIST
}

# install_packages [--demo] [PACKAGE...]: returns 0 when everything is there, else says why not and returns 1.
install_packages() {
  if ! command -v apt-get >/dev/null || ! command -v dpkg-query >/dev/null; then
    echo "This is no Debian system: install the counterparts of these packages yourself:" >&2
    tuvo_packages | sed 's/^/  /' >&2
    return 1
  fi
  local -a missing
  mapfile -t missing < <(tuvo_missing_packages "$@")
  [ ${#missing[@]} -eq 0 ] && return 0
  if [ "$(id -u)" -ne 0 ]; then
    echo "These packages are missing, and installing them needs root (sudo): ${missing[*]}" >&2
    return 1
  fi
  echo "Installing, with what they need (minutes, the first time): ${missing[*]}"
  tuvo_apt_install "${missing[@]}"
}

tuvo_missing_packages() {
  local package kind=
  if [ "${1:-}" = --demo ]; then
    kind=--demo
    shift
  fi
  for package in $(tuvo_packages "$kind") "$@"; do
    case $(dpkg-query -W -f='${db:Status-Abbrev}' "$package" 2>/dev/null) in
      ?i*) ;;
      *) echo "$package" ;;
    esac
  done
}

# A subshell, so that the guard goes away however this ends. The guard: a package that brings
# a service starts it at once unless policy-rc.d says no, and the host asked for no web server. What
# apt says on the way, about services that it may not start for one, is shown only when it fails.
tuvo_apt_install() (
  set -e
  export DEBIAN_FRONTEND=noninteractive
  guard=/usr/sbin/policy-rc.d
  guarded=
  log=$(mktemp)
  trap 'rm -f "$log" ${guarded:+"$guard"}' EXIT
  if [ ! -e "$guard" ]; then
    guarded=yes
    printf '#!/bin/sh\nexit 101\n' >"$guard"
    chmod 0755 "$guard"
  fi
  options=(-qq -o DPkg::Lock::Timeout=300 -o Acquire::Retries=3)
  { apt-get "${options[@]}" update &&
    apt-get "${options[@]}" install --yes --no-install-recommends "$@"; } </dev/null >"$log" 2>&1 || {
    cat "$log" >&2
    exit 1
  }
  for service in lighttpd:lighttpd nginx-light:nginx; do  # nor at the next boot
    case " $* " in
      *" ${service%:*} "*) update-rc.d "${service#*:}" disable >/dev/null ;;
    esac
  done
)
