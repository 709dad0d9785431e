# The demonstration's inner half, run by scripts/demo inside scripts/private-root:
#
#   bash scripts/lib/demo-inside.sh run|check PORT BUILD-FOLDER
#
# Ends when its standard input does.
set -eu

mode=$1 port=$2 build=$PWD/$3
work=/tmp/demo
log=/tmp/lighttpd.log # where the web server may write under its own id
address=http://127.0.0.1:$port
share=$work/share
sample="$share/Sommer – summer report.txt"
links=$build/programs/demo/tuvosharing-demo-links
server=

finish() {
  if [ -n "$server" ]; then
    kill "$server" 2>/dev/null || true
    wait "$server" 2>/dev/null || true
  fi
}
trap finish EXIT
trap '[ "$mode" = run ] || exit 130; exit 0' TERM
exec 3<&0 </dev/null
{
  read -r _ <&3 || true
  kill -TERM $$
} &
watcher=$!

fail() {
  echo "FAILED  $*" >&2
  exit 1
}

lay_out() {
  mkdir -p "$share"
  cmake --install "$build" --prefix /usr/tuvo >"$work/install.log" 2>&1 || {
    cat "$work/install.log" >&2
    fail "the project could not be installed"
  }
  # Set-user-id root, for the web server alone: started by hand, by somebody who makes up the
  # client's address or the account, the programs would believe it.
  chown root:www-data /usr/tuvo/bin/sharing.cgi /usr/tuvo/bin/entry.cgi
  chmod 4750 /usr/tuvo/bin/sharing.cgi /usr/tuvo/bin/entry.cgi
  cat >/usr/tuvo/etc/tuvosharing.conf <<CONF
external_address = $address
share_folder = $share
CONF
  seq 1 40000 | sed 's/$/ sunny days on the balcony/' >"$sample"
}

start_server() {
  TUVO_PORT=$port TUVO_LOG=$log \
    /usr/sbin/lighttpd -D -f "$PWD/packaging/lighttpd/standalone.conf" 2>"$work/lighttpd.start" &
  server=$!
  for _ in $(seq 100); do
    if (: <"/dev/tcp/127.0.0.1/$port") 2>/dev/null; then return 0; fi
    kill -0 "$server" 2>/dev/null || break
    sleep 0.1
  done
  cat "$work/lighttpd.start" >&2
  fail "the web server does not start on port $port"
}

# link KIND: the path of the demonstration's link of that kind.
link() { awk -F'\t' -v kind="$1" '$1 == kind { print "/sharing/" $2 }' "$work/links"; }

show() {
  cat <<TEXT

Sharing links are open at $address until Ctrl-C. Try them in a browser:

  $address$(link open)
      open to everybody: press "Open"
  $address$(link password)
      protected by a password: tea and biscuits
  $address$(link accounts)
      for accounts: alice with alice-secret, or carol with carol-secret, who is one of the group
      "administrators"; bob with bob-secret is a good account and refused all the same
  $address$(link limited)
      for three readers: open it in four private windows
  $address$(link timed)
      open to everybody until tomorrow
  $address$(link ended)
      ended yesterday
  $address$(link redirect)
      sends you on to www.debian.org once you have opened it
  $address$(link other)
      belongs to another application, which would show its pictures

Links are made, changed and removed on the owner's page:

  $address/owner/
      log in as alice with alice-secret, or as carol with carol-secret, who is an administrator and
      sees everybody's links; a file to share: $sample

Add /logout to an address to leave that link again. Ten wrong passwords from one address lock that
address out for half an hour; starting the demonstration again forgets everything.

TEXT
}

lay_out
start_server
"$links" create "$sample" alice >"$work/links" || fail "the links could not be created"

if [ "$mode" = check ]; then
  . scripts/lib/demo-check.sh
  check_everything
  kill "$watcher" 2>/dev/null || true
  exit 0
fi
show
wait "$server" && server= || server=
fail "the web server ended by itself: $(cat "$log")"
