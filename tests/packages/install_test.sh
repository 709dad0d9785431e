#!/usr/bin/env bash
# The life of the packages in a fresh Debian, where scripts/test-packages runs this as root: installed,
# used behind the packaged configuration of lighttpd, upgraded, removed, installed again, purged.
#
#   install_test.sh ARCHITECTURE
set -eu
width=$1
version=$(sed -n '1s/.*(\(.*\)).*/\1/p' /project/packaging/debian/changelog)
packages=/project/build/packages
previous=$packages/previous
address=http://localhost
session=/usr/tuvo/etc/private/session
work=/root/work
mkdir -p "$work"

step() { echo "ok      $*"; }
fail() {
  echo "FAILED  $*"
  exit 1
}
trap 'echo "FAILED  line $LINENO: $BASH_COMMAND" >&2' ERR
set -E

# There is no network: what comes from the mirror has been fetched before.
apt() { apt-get -qq --yes --no-install-recommends "$@" </dev/null; }
# install FOLDER PACKAGE...: from files.
install() {
  local folder=$1 package
  local -a files=()
  shift
  for package; do
    files+=("$(echo "$folder"/"${package}"_*_"$width".deb)")
  done
  echo "-- install ${files[*]}"
  apt install "${files[@]}"
}

# visit JAR PATH [CURL ARGUMENT...]: prints the status; leaves body and headers in the work folder.
visit() {
  local jar=$work/$1 path=$2
  shift 2
  curl --silent --max-time 60 --cookie "$jar" --cookie-jar "$jar" --output "$work/body" \
    --dump-header "$work/headers" --write-out '%{http_code}' "$@" "$address$path" || true
}
expect() { [ "$2" = "$1" ] || fail "$3: $2 instead of $1: $(head -c 1000 "$work/body")"; }
file_arrived() { cmp "$work/body" /srv/share/report.txt || fail "$1: what came is not the file"; }
ours() { grep -qi '^x-robots-tag: noindex' "$work/headers"; }
# call USER PASSWORD JSON: the owners' web API.
call() {
  curl --silent --max-time 60 --user "$1:$2" --header 'Content-Type: application/json' --data "$3" \
    --output "$work/body" --write-out '%{http_code}' "$address/webapi/entry.cgi"
}

looks() {
  [ "$(stat -c '%U:%G %a' "$2")" = "$1" ] || fail "$2 is $(stat -c '%U:%G %a' "$2") and not $1"
}

check_files() {
  local folder
  for folder in /usr/tuvo /usr/tuvo/bin /usr/tuvo/libexec /usr/tuvo/etc /usr/tuvo/share \
    /usr/tuvo/share/tuvosharing /usr/tuvo/share/tuvosharing/db_schema \
    /usr/tuvo/share/tuvosharing/web /etc/tuvosharing /usr/share/tuvosharing; do
    looks 'root:root 755' "$folder"
  done
  looks 'root:root 711' /usr/tuvo/etc/private
  looks 'daemon:daemon 711' "$session"
  looks 'root:www-data 4750' /usr/tuvo/bin/sharing.cgi
  looks 'root:www-data 4750' /usr/tuvo/bin/entry.cgi
  looks 'root:root 4755' /usr/tuvo/bin/tuvowebapi
  looks 'root:root 755' /usr/tuvo/libexec/sharing.cgi
  looks 'root:root 755' /usr/tuvo/bin/tuvosharing
  looks 'root:root 755' /usr/tuvo/bin/tuvosharingurl
  looks 'root:root 644' /usr/tuvo/share/tuvosharing/db_schema/1.sql
  looks 'root:root 644' /usr/tuvo/share/tuvosharing/db_schema/2.sql
  looks 'root:root 644' /usr/tuvo/share/tuvosharing/web/index.html
  looks 'root:root 644' /etc/pam.d/webui
  for name in tuvosharing autoblock; do
    looks 'root:root 644' "/etc/tuvosharing/$name.conf"
    [ "$(readlink "/usr/tuvo/etc/$name.conf")" = "/etc/tuvosharing/$name.conf" ] ||
      fail "/usr/tuvo/etc/$name.conf does not lead to /etc"
  done
  local odd
  odd=$(dpkg -L tuvosharing libtuvosharing7 libtuvoplatform1 | grep . | while read -r path; do
    [ -L "$path" ] || find "$path" -maxdepth 0 -perm /022 -o -maxdepth 0 -perm /7000
  done | sort | tr '\n' ' ')
  [ "$odd" = "/usr/tuvo/bin/entry.cgi /usr/tuvo/bin/sharing.cgi /usr/tuvo/bin/tuvowebapi " ] ||
    fail "writable by others, or with a special bit: $odd"
  for name in tuvosharing tuvosharingurl tuvowebapi; do
    [ "$(realpath "$(command -v $name)")" = "/usr/tuvo/bin/$name" ] || fail "$name on the PATH"
    [ -f "/usr/share/man/man1/$name.1.gz" ] || fail "the manual page of $name"
  done
  conffiles=$(dpkg-query -W -f='${Conffiles}' tuvosharing | awk 'NF { print $1 }' | sort)
  [ "$conffiles" = "$(printf '%s\n' /etc/lighttpd/conf-available/49-tuvosharing-owner.conf \
    /etc/lighttpd/conf-available/50-tuvosharing.conf /etc/nginx/sites-available/tuvosharing \
    /etc/pam.d/webui /etc/tuvosharing/autoblock.conf /etc/tuvosharing/tuvosharing.conf)" ] ||
    fail "configuration files: $conffiles"
  step "folders, programs and configuration files have their owners, modes and places"
}

installed() { [ "$(dpkg-query -W -f='${db:Status-Abbrev}${Version}' "$1" 2>/dev/null)" = "ii $2" ]; }

# A file that another version left behind, or that was put back from a copy before anything else.
check_older_database() {
  apt install sqlite3
  mkdir -m 711 -p /usr/tuvo/etc/private/session
  sqlite3 $session/sharing.db </project/tests/db/golden/1.sql
  chown -R daemon:daemon $session
  chmod 660 $session/sharing.db
  sha256sum $session/sharing.db >"$work/older"
  install "$packages" libtuvosharing7 libtuvoplatform1 tuvosharing
  sha256sum --quiet --check "$work/older" || fail "the packages have touched the database"
  check_files
  for hash in Zk3AbcDe9 pAssw0rd1 longData1 bigNumber; do
    tuvosharing show $hash >/dev/null || fail "the link $hash is missing"
  done
  [ "$(sqlite3 $session/sharing.db 'PRAGMA user_version')" = 2 ] || fail "it is of its version still"
  purge_asking yes
  [ ! -e /usr/tuvo ] || fail "after a yes there is left: $(find /usr/tuvo)"
  apt purge libtuvosharing7 libtuvoplatform1 sqlite3
  step "installed over a database of an older version: untouched, then migrated by its first use"
}

check_first_install() {
  [ ! -e /usr/tuvo ] || fail "this system is not fresh"
  install "$previous" libtuvosharing7 libtuvoplatform1 tuvosharing
  installed tuvosharing "$version~previous" || fail "the previous version is not installed"
  ! command -v lighttpd >/dev/null || fail "a web server has come along"
  step "the previous version is installed, with what it depends on and no more"
  check_files
  [ "$(tuvosharing --version | grep -c .)" -ge 1 ] || fail "tuvosharing --version"
  ! runuser -u nobody -- tuvosharing list 2>"$work/body" || fail "nobody may list the links"
  [ "$(tuvosharing list --json | grep -c '"total" *: *0')" = 1 ] || fail "links in a new database"
  looks 'daemon:daemon 660' $session/sharing.db
  step "tuvosharing makes the database, uid 1's, and lists no link"
  # The digests' libraries are in no program's list of libraries, only in the packages' dependencies.
  printf 'a password\n' | tuvosharing create --owner root --project other --password-stdin \
    --quiet >"$work/hash"
  printf 'an older one\n' | tuvosharing create --owner root --project other --password-stdin \
    --quiet >>"$work/hash"
  xargs tuvosharing delete --yes <"$work/hash" >/dev/null
  step "a password is digested with nothing but the packages' dependencies"
}

check_web_server() {
  apt install lighttpd lighttpd-mod-authn-pam curl
  for name in alice bob; do
    useradd --no-create-home "$name"
    echo "$name:$name-secret" | chpasswd
  done
  mkdir -p /srv/share
  seq 1 20000 | sed 's/$/ sunny days on the balcony/' >/srv/share/report.txt
  /etc/init.d/lighttpd start
  expect 404 "$(visit none /sharing/no-such-link)" "a link before links are enabled"
  ! ours || fail "links are served before they are enabled"
  step "the web server runs, and serves no links before it is told to"
  lighttpd-enable-mod tuvosharing >/dev/null
  /etc/init.d/lighttpd reload
  expect 404 "$(visit none /sharing/no-such-link)" "a link that does not exist"
  ours || fail "links are not served after they are enabled"
  expect 404 "$(visit none /owner/)" "the owner's page before it is enabled"
  step "lighttpd-enable-mod tuvosharing turns the visitors' side on"
}

make_links() {
  cat >>/etc/tuvosharing/tuvosharing.conf <<CONF
external_address = $address
share_folder = /srv/share
CONF
  password_link=/sharing/$(printf 'tea and biscuits\n' | tuvosharing create --owner alice \
    --project file --path /srv/share/report.txt --expire +7d --password-stdin --quiet)
  account_link=/sharing/$(tuvosharing create --owner alice --project file \
    --path /srv/share/report.txt --users alice --quiet)
  [ "$(tuvosharingurl "${password_link#/sharing/}" 2>/dev/null | grep -c "^$address/sharing/")" = 1 ] ||
    tuvosharing show "${password_link#/sharing/}" | grep -q "$address$password_link" ||
    fail "the configured address is not in the link's"
  step "tuvosharing makes links of a file, at the configured address"
}

walk_visitors_road() {
  expect 200 "$(visit ben "$password_link")" "looking at the link"
  grep -q '<form' "$work/body" || fail "no form"
  ! cmp -s "$work/body" /srv/share/report.txt || fail "the file is given away"
  expect 403 "$(visit ben "$password_link" --data 'password=coffee')" "a wrong password"
  expect 200 "$(visit ben "$password_link")" "the link after a wrong password"
  ! cmp -s "$work/body" /srv/share/report.txt || fail "a wrong password opens the link"
  expect 303 "$(visit ben "$password_link" --data 'password=tea and biscuits')" "the password"
  expect 200 "$(visit ben "$password_link")" "the link once opened"
  file_arrived "the link once opened"
  step "a visitor is refused with a wrong password, and gets the file with the right one"
  expect 403 "$(visit cat "$account_link" --data 'zor_username=alice&zor_password=guess')" "a guess"
  expect 403 "$(visit cat "$account_link" --data 'zor_username=bob&zor_password=bob-secret')" "bob"
  expect 303 "$(visit cat "$account_link" --data 'zor_username=alice&zor_password=alice-secret')" \
    "alice"
  expect 200 "$(visit cat "$account_link")" "the account link once opened"
  file_arrived "the account link"
  step "an account's login goes through PAM: alice is let in, bob and a guess are not"
  expect 200 "$(visit dan "$password_link" --data 'password=tea and biscuits' --location)" "dan"
  expect 200 "$(visit dan "$password_link/logout" --data '')" "logging out"
  expect 403 "$(visit dan "$password_link")" "the link after the logout"
  step "a logout ends the access"
}

walk_owners_road() {
  lighttpd-enable-mod tuvosharing-owner >/dev/null
  usermod --append --groups shadow www-data
  /etc/init.d/lighttpd restart
  expect 401 "$(visit none /owner/)" "the owner's page without an account"
  expect 401 "$(visit none /owner/ --user alice:guess)" "the owner's page with a wrong password"
  expect 200 "$(visit none /owner/ --user alice:alice-secret)" "the owner's page"
  grep -q '<title>' "$work/body" || fail "the owner's page is none"
  expect 401 "$(call alice guess '{}')" "the web API with a wrong password"
  expect 200 "$(call alice alice-secret '{"api": "TUVO.Sharing.Link", "version": 1,
    "method": "create", "project_name": "file", "app": {"path": "/srv/share/report.txt"},
    "protect_password": "honey"}')" "alice's link"
  owners_link=$(sed -n 's|.*"url" *: *"'"$address"'\(/sharing/[^"]*\)".*|\1|p' "$work/body")
  [ -n "$owners_link" ] || fail "no address in the web API's answer: $(cat "$work/body")"
  expect 303 "$(visit eve "$owners_link" --data 'password=honey')" "alice's link"
  expect 200 "$(call bob bob-secret '{"api": "TUVO.Sharing.Link", "version": 1,
    "method": "list"}')" "bob's list"
  ! grep -q "${owners_link#/sharing/}" "$work/body" || fail "bob sees alice's link"
  step "an owner signs in, makes a link by the web API, and a visitor opens it"
  runuser -u alice -- tuvowebapi --exec api=TUVO.Sharing.Link version=1 method=list >"$work/body"
  grep -q "${owners_link#/sharing/}" "$work/body" || fail "tuvowebapi, run by alice"
  runuser -u bob -- tuvowebapi --exec api=TUVO.Sharing.Link version=1 method=list >"$work/body"
  ! grep -q "${owners_link#/sharing/}" "$work/body" || fail "tuvowebapi, run by bob"
  step "tuvowebapi does the same for whoever runs it"
}

check_fastcgi() {
  local conf=/etc/lighttpd/conf-available/50-tuvosharing.conf
  cp -p $conf "$work/50.conf"
  sed -i -e 's/^include/#include/' -e 's/^#\(var.*\)/\1/' -e 's/^#\(include.*fastcgi\)/\1/' $conf
  /etc/init.d/lighttpd restart
  expect 200 "$(visit ben "$password_link")" "the link by FastCGI"
  file_arrived "the link by FastCGI"
  cp -p "$work/50.conf" $conf
  /etc/init.d/lighttpd restart
  step "the lines for FastCGI in the packaged configuration work as well"
}

# What systemd's units start, under their identities and capabilities.
check_units() {
  local unit=/lib/systemd/system/tuvosharing body
  apt install systemd
  systemd-analyze verify $unit-*@.socket $unit-*@.service >"$work/body" 2>&1 &&
    [ ! -s "$work/body" ] || fail "systemd-analyze: $(cat "$work/body")"
  grep -qx 'ExecStart=/usr/tuvo/libexec/sharing.cgi' $unit-visitors@.service || fail "visitors' unit"
  setpriv --reuid=1 --regid=1 --clear-groups --no-new-privs --inh-caps=-all --bounding-set=-all \
    env -i REQUEST_METHOD=GET PATH_INFO="${password_link#/sharing}" REMOTE_ADDR=127.0.0.9 \
    /usr/tuvo/libexec/sharing.cgi </dev/null >"$work/body"
  grep -q '<form' "$work/body" || fail "the visitors' program as uid 1: $(head -c 300 "$work/body")"
  body='{"api": "TUVO.Sharing.Link", "version": 1, "method": "create", "project_name": "file",
    "app": {"path": "/srv/share/report.txt"}}'
  grep -qx 'CapabilityBoundingSet=CAP_SETUID CAP_SETGID CAP_KILL' $unit-webapi@.service ||
    fail "the web API's unit"
  setpriv --reuid=www-data --regid=www-data --init-groups --inh-caps=-all \
    --bounding-set=-all,+setuid,+setgid,+kill \
    env -i REQUEST_METHOD=POST CONTENT_TYPE=application/json CONTENT_LENGTH=${#body} \
    REMOTE_ADDR=127.0.0.1 REMOTE_USER=alice SERVER_NAME=localhost SERVER_PORT=80 \
    /usr/tuvo/bin/entry.cgi <<<"$body" >"$work/body"
  grep -q '"success" *: *true' "$work/body" || fail "the web API: $(head -c 600 "$work/body")"
  step "the units' programs do their work with the units' identities and capabilities"
}

# The links as they are, and how many visitors are in: their times move on with every visit.
database_text() {
  tuvosharing export
  tuvosharing sessions --json | grep -o '"total" *: *[0-9]*'
}

check_upgrade() {
  # What an administrator may have changed.
  echo 'failures = 20' >>/etc/tuvosharing/autoblock.conf
  dpkg-statoverride --update --add root root 0755 /usr/tuvo/bin/tuvowebapi
  sha256sum /etc/tuvosharing/* /etc/pam.d/webui /etc/lighttpd/conf-available/*tuvosharing* \
    >"$work/configuration"
  database_text >"$work/before"
  stat -c %i $session/sharing.db >"$work/inode"
  # A visitor goes on all the while.
  (
    set +eE
    until [ -e "$work/stop" ]; do visit_during; done
  ) >"$work/meanwhile" 2>/dev/null &
  local meanwhile=$!
  install "$packages" libtuvosharing7 libtuvoplatform1 tuvosharing
  touch "$work/stop"
  wait $meanwhile
  for package in libtuvosharing7 libtuvoplatform1 tuvosharing; do
    installed $package "$version" || fail "$package is not upgraded"
  done
  ! grep -v '^200 ' "$work/meanwhile" || fail "a visit during the upgrade"
  step "upgraded; $(wc -l <"$work/meanwhile") visits meanwhile, all served"
  sha256sum --quiet --check "$work/configuration" || fail "edited configuration has changed"
  ! compgen -G '/etc/tuvosharing/*.dpkg-*' >/dev/null || fail "dpkg left a second configuration"
  looks 'root:root 755' /usr/tuvo/bin/tuvowebapi
  step "edited configuration and overridden modes stay"
  dpkg-statoverride --remove /usr/tuvo/bin/tuvowebapi
  chmod 4755 /usr/tuvo/bin/tuvowebapi
  check_files
  database_text | diff "$work/before" - || fail "the database has changed"
  [ "$(stat -c %i $session/sharing.db)" = "$(cat "$work/inode")" ] || fail "another database file"
  tuvosharing check >/dev/null || fail "tuvosharing check: $(tuvosharing check)"
  expect 200 "$(visit ben "$password_link")" "the visitor's link after the upgrade"
  file_arrived "the visitor's link after the upgrade"
  expect 401 "$(visit none /owner/)" "the owner's page after the upgrade"
  step "links, sessions and the web server go on"
}

# One visit's status. A web server that reads its configuration anew takes no connection for a moment,
# which is no answer; every answer counts.
visit_during() {
  local status tries
  for tries in $(seq 100); do
    status=$(curl --silent --max-time 60 --cookie "$work/ben" --output /dev/null \
      --write-out '%{http_code}' "$address$password_link") && break
    [ $? -eq 7 ] || break
    sleep 0.1
  done
  echo "$status after $tries"
}

serves_no_links() {
  expect 404 "$(visit none "$password_link")" "a link after $1"
  ! ours || fail "links are served after $1"
  [ "$(lighttpd -tt -f /etc/lighttpd/lighttpd.conf 2>&1)" = "" ] ||
    fail "the web server's configuration after $1"
}

check_removal() {
  apt remove tuvosharing
  [ -s $session/sharing.db ] || fail "the database is gone"
  looks 'daemon:daemon 660' $session/sharing.db
  looks 'daemon:daemon 711' $session
  [ ! -e /usr/tuvo/bin ] || fail "programs are left"
  sha256sum --quiet --check "$work/configuration" || fail "configuration is gone"
  serves_no_links "the removal"
  step "removed: the database and the configuration stay, the web server goes on without links"
  install "$packages" tuvosharing
  check_files
  lighttpd-enable-mod tuvosharing tuvosharing-owner >/dev/null
  /etc/init.d/lighttpd reload
  expect 200 "$(visit ben "$password_link")" "the visitor's link"
  file_arrived "the visitor's link"
  step "installed again: the visitor is still in"
}

# purge_asking ANSWER: with somebody at a terminal, who gives it as soon as somebody listens.
purge_asking() {
  local asked
  asked=$(while sleep 0.5 && echo "$1"; do :; done 2>/dev/null |
    DEBIAN_FRONTEND=readline timeout 120 script --quiet --return \
      --command 'dpkg --purge tuvosharing' /dev/null 2>&1) || fail "the purge that asks: $asked"
  grep -q 'Remove all sharing links?' <<<"$asked" || fail "nothing was asked: $asked"
  [ "$(dpkg-query -W -f='${db:Status-Abbrev}' tuvosharing 2>/dev/null)" != "ii " ] ||
    fail "not purged: $asked"
}

check_nginx() {
  apt install nginx-light
  ln -s ../sites-available/tuvosharing /etc/nginx/sites-enabled/
  nginx -t -q || fail "nginx does not take its configuration"
  step "nginx takes the packaged configuration"
}

check_purge() {
  # As "systemctl enable" does it.
  local wants=/etc/systemd/system/sockets.target.wants
  mkdir -p $wants
  ln -s /lib/systemd/system/tuvosharing-visitors@.socket "$wants/tuvosharing-visitors@1.socket"
  apt purge tuvosharing
  [ -s $session/sharing.db ] || fail "a purge that nobody was asked about took the database"
  for gone in /etc/tuvosharing /etc/pam.d/webui /usr/share/tuvosharing /usr/tuvo/bin \
    /usr/tuvo/etc/tuvosharing.conf /usr/tuvo/etc/autoblock.conf \
    /etc/nginx/sites-enabled/tuvosharing "$wants/tuvosharing-visitors@1.socket" \
    /etc/lighttpd/conf-available/50-tuvosharing.conf; do
    if [ -e "$gone" ] || [ -L "$gone" ]; then fail "$gone is left after the purge"; fi
  done
  serves_no_links "the purge"
  step "purged without being asked: configuration gone, database kept"
  install "$packages" tuvosharing
  [ "$(tuvosharing list --json | grep -c "${password_link#/sharing/}")" -ge 1 ] ||
    fail "the links are not there again"
  step "installed again: the links are there"

  purge_asking no
  [ -s $session/sharing.db ] || fail "the answer no took the database"
  step "purged with somebody there: asked, and kept after a no"
  install "$packages" tuvosharing
  purge_asking yes
  [ ! -e /usr/tuvo ] || fail "after a yes there is left: $(find /usr/tuvo)"
  step "asked again: after a yes nothing is left below /usr/tuvo"

  install "$packages" tuvosharing
  check_files
  tuvosharing list --json >"$work/body"
  grep -q '"total" *: *0' "$work/body" || fail "links after all"
  [ -s $session/sharing.db ] || fail "no new database"
  echo 'tuvosharing tuvosharing/purge-database boolean true' | debconf-set-selections
  apt remove tuvosharing
  [ -s $session/sharing.db ] || fail "the removal took the database"
  apt purge tuvosharing
  [ ! -e /usr/tuvo ] || fail "after the answer given beforehand there is left: $(find /usr/tuvo)"
  step "removed, then purged with the answer given beforehand: nothing is left"
  apt purge libtuvosharing7 libtuvoplatform1
  left=$(dpkg-query -W -f='${db:Status-Abbrev}${Package}\n' '*tuvo*' 2>/dev/null | grep -v '^un' || true)
  [ -z "$left" ] || fail "dpkg still knows $left"
  left=$(find / -xdev \( -path /proc -o -path /project -o -path /root -o -path /var/cache/apt \) \
    -prune -o -name '*tuvo*' -print)
  [ -z "$left" ] || fail "files are left: $left"
  step "nothing is left of any of the packages"
}

# What the documentation's package holds, and that it goes with the others.
check_documentation() {
  apt install "$packages"/tuvosharing-doc_*_all.deb
  local guide
  for guide in README.md docs/packages.md docs/images/owner-page.png reference/index.html \
    reference/md_result_codes.html reference/classTUVO_1_1sharing_1_1record_1_1Entry.html; do
    [ -s "/usr/share/doc/tuvosharing/$guide" ] || fail "$guide is missing"
  done
  grep -o '](\([^)#:]*\))' /usr/share/doc/tuvosharing/README.md | sed 's/](\(.*\))/\1/' | sort -u |
    while read -r guide; do
      [ -e "/usr/share/doc/tuvosharing/$guide" ] || fail "README.md leads to $guide, which is missing"
    done
  apt purge tuvosharing-doc
  step "the guides are installed, and go"
}

check_older_database
check_first_install
check_web_server
make_links
walk_visitors_road
walk_owners_road
check_fastcgi
check_units
check_upgrade
check_nginx
check_removal
check_purge
check_documentation
/etc/init.d/lighttpd stop
trap - ERR
echo "ok      all of it"
