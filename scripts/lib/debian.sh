# shellcheck shell=bash
# To be sourced, after packages.sh: Debian systems of their own, made from the mirror that this
# machine's apt is configured with and kept in /var/cache/tuvosharing.

debian_release=bookworm
debian_cache=/var/cache/tuvosharing

# Where apt fetches this release from. The release alone does, without its updates: what they mend
# is nothing to tests, and a mirror whose updates for 32-bit x86 lag behind must not stop them.
configured_mirror() {
  # shellcheck disable=SC2016 # apt's own variables
  apt-get indextargets --format '$(RELEASE) $(REPO_URI)' 'Created-By: Packages' 'Component: main' |
    sed -n "s/^$debian_release //p" | head -n 1
}

# How apt gets there (proxies, tries, checks): the new system's apt is to go the same way.
transport_settings() { apt-config dump | grep -E '^Acquire::(ftp|https?|Retries|Check-)' || true; }

no_mirror() {
  echo "apt knows no mirror of Debian 12 ($debian_release) on this machine" >&2
  return 1
}

# make_debian ARCHITECTURE FOLDER: a Debian 12 with what every Debian has and nothing else, made once.
make_debian() {
  local architecture=$1 root=$2 partial=$2.partial mirror
  [ ! -d "$root" ] || return 0
  mirror=$(configured_mirror)
  [ -n "$mirror" ] || no_mirror || return
  command -v debootstrap >/dev/null || tuvo_apt_install debootstrap
  echo "Making a Debian 12 ($architecture) in $root, once"
  mkdir -p "$debian_cache"
  rm -rf --one-file-system "$partial" # left by a run that was interrupted
  debootstrap --variant=minbase --arch="$architecture" --include=ca-certificates \
    "$debian_release" "$partial" "$mirror" >"$root.log" || {
    tail -n 20 "$root.log" >&2
    return 1
  }
  echo "127.0.0.1 localhost" >"$partial/etc/hosts"
  mv "$partial" "$root"
}

# configure_debian ROOT: its apt fetches from where this machine's apt does now.
configure_debian() {
  local mirror
  mirror=$(configured_mirror)
  [ -n "$mirror" ] || no_mirror || return
  echo "deb $mirror $debian_release main" >"$1/etc/apt/sources.list"
  transport_settings >"$1/etc/apt/apt.conf.d/90host"
  cp -L /etc/resolv.conf "$1/etc/resolv.conf" 2>/dev/null || true
}
