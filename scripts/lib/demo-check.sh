# The demonstration's road, walked with curl. Sourced by demo-inside.sh, whose `link`, `fail`,
# `address`, `work`, `sample` and `links` it uses.

step() { echo "ok      $*"; }

# visit JAR ADDRESS PATH [CURL ARGUMENT...]: one request from a loopback address of its own with the
# cookies of JAR; prints the status and leaves the body in $work/body.
visit() {
  local jar=$work/$1 from=$2 path=$3
  shift 3
  curl --silent --max-time 60 --interface "$from" --cookie "$jar" --cookie-jar "$jar" \
    --output "$work/body" --write-out '%{http_code}' "$@" "$address$path"
}

# expect STATUS GOT WHAT
expect() { [ "$2" = "$1" ] || fail "$3: status $2 instead of $1: $(head -c 2000 "$work/body")"; }

file_arrived() {
  cmp --silent "$work/body" "$sample" || fail "$1: what arrived is not the file"
}

session_of() { awk '$6 == "sharing_sid" { print $7 }' "$work/$1"; }

check_open() {
  local path
  path=$(link open)
  expect 200 "$(visit ann 127.0.0.1 "$path")" "looking at the open link"
  grep -q '<button type="submit"' "$work/body" || fail "the open link has no button"
  expect 303 "$(visit ann 127.0.0.1 "$path" --data '')" "opening the open link"
  expect 200 "$(visit ann 127.0.0.1 "$path")" "the open link once opened"
  file_arrived "the open link"
  step "the open link gives the file, byte for byte"
  expect 206 "$(visit ann 127.0.0.1 "$path" --range 1000-1999)" "a part of the file"
  cmp --silent "$work/body" <(tail -c +1001 "$sample" | head -c 1000) || fail "the wrong part"
  step "a part of the file, for whoever goes on with a broken download"
}

check_password() {
  local path
  path=$(link password)
  expect 200 "$(visit ben 127.0.0.1 "$path")" "looking at the password link"
  ! cmp --silent "$work/body" "$sample" || fail "the password link gives its file away"
  expect 403 "$(visit ben 127.0.0.1 "$path" --data '')" "opening the password link without one"
  step "the password link is closed without a password"
  expect 403 "$(visit ben 127.0.0.1 "$path" --data 'password=coffee')" "a wrong password"
  expect 200 "$(visit ben 127.0.0.1 "$path")" "the password link after a wrong password"
  ! cmp --silent "$work/body" "$sample" || fail "a wrong password opens the link"
  step "a wrong password is refused"
  expect 303 "$(visit ben 127.0.0.1 "$path" --data 'password=tea and biscuits')" "the password"
  expect 200 "$(visit ben 127.0.0.1 "$path")" "the password link once opened"
  file_arrived "the password link"
  step "the right password is admitted"
}

# try_account JAR NAME PASSWORD: prints the status of a login.
try_account() {
  visit "$1" 127.0.0.1 "$(link accounts)" --data-urlencode "zor_username=$2" \
    --data-urlencode "zor_password=$3"
}

check_accounts() {
  local path
  path=$(link accounts)
  expect 303 "$(try_account cat alice alice-secret)" "alice, who is listed"
  expect 200 "$(visit cat 127.0.0.1 "$path")" "the account link, as alice"
  file_arrived "the account link"
  step "the account link admits alice, who is listed"
  expect 303 "$(try_account dan carol carol-secret)" "carol, whose group is listed"
  expect 200 "$(visit dan 127.0.0.1 "$path")" "the account link, as carol"
  file_arrived "the account link"
  step "it admits carol, whose group is listed"
  expect 403 "$(try_account eve bob bob-secret)" "bob, who is not listed"
  step "it refuses bob, who is not"
  expect 403 "$(try_account eve alice guess)" "alice with a wrong password"
  expect 403 "$(try_account eve nobody-here guess)" "an account that does not exist"
  expect 200 "$(visit eve 127.0.0.1 "$path")" "the account link after the refusals"
  ! cmp --silent "$work/body" "$sample" || fail "a refused account opens the link"
  step "it refuses a wrong account password"
}

check_limit() {
  local path reader
  path=$(link limited)
  for reader in fay gus hal; do
    expect 303 "$(visit $reader 127.0.0.1 "$path" --data '')" "reader $reader of three"
    expect 200 "$(visit $reader 127.0.0.1 "$path")" "the file for $reader"
    file_arrived "the link of three uses"
  done
  expect 410 "$(visit ian 127.0.0.1 "$path" --data '')" "the fourth reader"
  expect 200 "$(visit fay 127.0.0.1 "$path")" "the first reader, once more"
  step "the link of three uses admits three visitors, again and again, and no fourth"
  [ "$("$links" show "${path#/sharing/}")" = "uses 3, admitted 3" ] ||
    fail "another process sees: $("$links" show "${path#/sharing/}")"
  step "another process sees its three uses and three visitors"
}

check_theft() {
  local path hash session
  path=$(link password)
  hash=${path#/sharing/}
  session=$(session_of ben)
  cp "$work/ben" "$work/thief"
  expect 403 "$(visit thief 127.0.0.2 "$path")" "a stolen cookie"
  expect 200 "$(visit ben 127.0.0.1 "$path")" "the cookie's owner"
  step "a stolen cookie opens nothing from another address"
  [ "$("$links" authorized "$hash" "$session" 127.0.0.1)" = 1 ] ||
    fail "another process does not know the visitor"
  [ "$("$links" authorized "$hash" "$session" 127.0.0.2)" = -8 ] ||
    fail "another process admits the thief"
  step "another process knows the visitor, and refuses the thief"
}

check_logout() {
  local path
  path=$(link password)
  expect 200 "$(visit ben 127.0.0.1 "$path/logout")" "the logout page"
  expect 200 "$(visit ben 127.0.0.1 "$path")" "the link after a look at the logout page"
  file_arrived "the link after a look at the logout page"
  expect 200 "$(visit ben 127.0.0.1 "$path/logout" --data '')" "logging out"
  expect 403 "$(visit ben 127.0.0.1 "$path")" "the link after the logout"
  step "a logout ends the access"
  [ "$("$links" show "${path#/sharing/}")" = "uses 1, admitted 0" ] ||
    fail "another process sees: $("$links" show "${path#/sharing/}")"
  step "another process sees it, too"
}

check_others() {
  expect 404 "$(visit jim 127.0.0.1 "$(link ended)")" "the link that has ended"
  expect 404 "$(visit jim 127.0.0.1 /sharing/no-such-link)" "a link that does not exist"
  step "a link that has ended looks like one that never was"
  expect 303 "$(visit jim 127.0.0.1 "$(link timed)" --data '')" "the link until tomorrow"
  step "a link that ends tomorrow is open"
  expect 303 "$(visit jim 127.0.0.1 "$(link redirect)" --data '')" "the link that leads on"
  expect 302 "$(visit jim 127.0.0.1 "$(link redirect)")" "the link that leads on, once opened"
  step "the link that leads elsewhere does so once opened"
  expect 303 "$(visit jim 127.0.0.1 "$(link other)" --data '')" "another application's link"
  expect 200 "$(visit jim 127.0.0.1 "$(link other)")" "another application's link, once opened"
  grep -q 'another application' "$work/body" || fail "another application's link has no page"
  step "another application's link says so"
}

# From an address of its own: the others are to stay welcome.
check_block() {
  local path
  path=$(link password)
  for _ in $(seq 10); do
    expect 403 "$(visit kim 127.0.0.10 "$path" --data 'password=guess')" "one of ten guesses"
  done
  expect 429 "$(visit kim 127.0.0.10 "$path" --data 'password=tea and biscuits')" \
    "the right password after ten wrong ones"
  step "ten wrong passwords block the address, even with the right one"
  expect 303 "$(visit leo 127.0.0.11 "$path" --data 'password=tea and biscuits')" \
    "another address meanwhile"
  step "other addresses are let in meanwhile"
}

# ask NAME PASSWORD [CURL ARGUMENT...]: a request to the web API; prints the status.
ask() {
  local who=$1:$2
  shift 2
  curl --silent --max-time 60 --user "$who" --output "$work/body" --write-out '%{http_code}' "$@"
}

# call NAME JSON [CURL ARGUMENT...]: the same by POST.
call() {
  local name=$1 body=$2
  shift 2
  ask "$name" "$name-secret" --header 'Content-Type: application/json' --data "$body" "$@" \
    "$address/webapi/entry.cgi"
}

# member NAME: what the last answer says, by its path within "data".
member() {
  python3 -c 'import json, sys
value = json.load(open(sys.argv[1]))["data"]
for name in sys.argv[2].split("."):
    value = value[int(name)] if isinstance(value, list) else value[name]
print(value)' "$work/body" "$1"
}

check_owner_login() {
  expect 401 "$(curl --silent --output "$work/body" --write-out '%{http_code}' "$address/owner/")" \
    "the owner's page without an account"
  expect 401 "$(ask alice guess "$address/owner/")" "the owner's page with a wrong password"
  expect 401 "$(ask alice guess "$address/webapi/entry.cgi")" "the web API with a wrong password"
  step "the owner's page and the web API ask for an account"
  expect 200 "$(ask alice alice-secret "$address/owner/")" "the owner's page"
  grep -q '<title>' "$work/body" || fail "the owner's page is none"
  step "the owner's page opens for alice"
}

check_owner_link() {
  local id path
  expect 200 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "create",
    "project_name": "file", "app": {"path": "'"$sample"'"}, "protect_title": "From alice",
    "protect_password": "honey", "expire_at": "+7d", "expire_times": 5}')" "making a link"
  id=$(member link.id)
  path=$(member url)
  [ "${path#"$address"}" != "$path" ] || fail "the link's address is $path"
  path=${path#"$address"}
  step "alice makes a link with a password for five uses"
  expect 403 "$(visit max 127.0.0.1 "$path" --data 'password=jam')" "her link, a wrong password"
  expect 303 "$(visit max 127.0.0.1 "$path" --data 'password=honey')" "her link, the password"
  expect 200 "$(visit max 127.0.0.1 "$path")" "her link, once opened"
  file_arrived "alice's link"
  step "a visitor is refused without its password, and gets the file with it"
  call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "get", "id": '"$id"'}' >/dev/null
  [ "$(member link.use_count)" = 1 ] || fail "the use is not counted"
  call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "sessions", "id": '"$id"'}' \
    >/dev/null
  [ "$(member sessions.0.ip)" = 127.0.0.1 ] || fail "alice does not see her visitor"
  step "alice sees the use and the visitor"
  expect 404 "$(call bob '{"api": "TUVO.Sharing.Link", "version": 1, "method": "delete",
    "id": '"$id"'}')" "bob deleting alice's link"
  step "bob can neither see nor delete it"
  expect 403 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "delete",
    "id": '"$id"'}' --header 'Origin: https://elsewhere.example')" "another site deleting it"
  step "a page of another site cannot do it in alice's name"
  expect 200 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "set",
    "id": '"$id"', "enabled": false}')" "switching the link off"
  expect 404 "$(visit max 127.0.0.1 "$path")" "the link that is switched off"
  step "switched off, it looks like one that never was, even to who was in"
  expect 200 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "delete",
    "id": '"$id"'}')" "deleting the link"
  step "alice deletes it"
}

check_owner_file() {
  expect 403 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "create",
    "project_name": "file", "app": {"path": "/etc/passwd"}}')" "a file outside of the folders"
  expect 403 "$(call alice '{"api": "TUVO.Sharing.Link", "version": 1, "method": "create",
    "project_name": "file", "app": {"path": "'"$share"'/../../../etc/passwd"}}')" "a way out"
  step "no link is made for a file outside of the shared folders"
}

check_command() {
  local tool=/usr/tuvo/bin/tuvosharing hash before
  before=$("$tool" list --json | python3 -c 'import json, sys; print(json.load(sys.stdin)["total"])')
  hash=$(printf 'from the shell\n' | "$tool" create --owner alice --project file --path "$sample" \
    --expire +7d --password-stdin --quiet) || fail "the command makes no link"
  "$tool" list --json | python3 -c 'import json, sys
answer = json.load(sys.stdin)
assert answer["total"] == int(sys.argv[1]) + 1
assert any(link["hash"] == sys.argv[2] and link["state"] == "live" for link in answer["links"])' \
    "$before" "$hash" || fail "the command does not list its link"
  step "the command tuvosharing makes a link and lists it"
  expect 303 "$(visit ned 127.0.0.1 "/sharing/$hash" --data 'password=from the shell')" "its link"
  "$tool" edit "$hash" --uses 1 --use-count 1 >/dev/null || fail "the command changes nothing"
  expect 410 "$(visit oli 127.0.0.1 "/sharing/$hash" --data 'password=from the shell')" "used up"
  step "a visitor opens it; the command ends its uses"
  "$tool" backup "$work/backup.db" >/dev/null || fail "no backup"
  "$tool" check >/dev/null || fail "the check of the database finds something: $("$tool" check)"
  "$tool" delete --yes "$hash" >/dev/null || fail "the command does not delete"
  [ "$(sqlite3 "$work/backup.db" "SELECT count(*) FROM entry WHERE hash = '$hash'")" = 1 ] ||
    fail "the backup lacks the link"
  step "it backs the database up, checks it, and deletes the link"
}

check_everything() {
  check_owner_login
  check_owner_link
  check_owner_file
  check_command
  check_open
  check_password
  check_accounts
  check_limit
  check_theft
  check_logout
  check_others
  check_block
}
