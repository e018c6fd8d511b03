# secpolicy --root: all verbs keep below it, for ordinary users too, and services beside it.

load helper

# Lets every user reach the test and the command, of which a build in somebody's home takes a copy.
share_command() {
  chmod 755 "$BATS_RUN_TMPDIR" "$(dirname "$BATS_TEST_TMPDIR")" "$BATS_TEST_TMPDIR"
  as_nobody "$SECPOLICY" --version >/dev/null 2>&1 && return
  cmake --install "$BUILD_DIR" --prefix "$BATS_TEST_TMPDIR/prefix" >/dev/null
  SECPOLICY=$BATS_TEST_TMPDIR/prefix/bin/secpolicy
}

# as_nobody COMMAND...: runs the command as a user without any privilege.
as_nobody() {
  setpriv --reuid=65534 --regid=65534 --clear-groups --inh-caps=-all --bounding-set=-all "$@"
}

@test "a root that is not there is named" {
  root=$BATS_TEST_TMPDIR/missing
  secpolicy display
  exits 1
  [[ $stderr == "secpolicy: display: cannot enter the root $root: No such file or directory" ]]
}

@test "an empty root is not the machine's own" {
  root=
  secpolicy display
  exits 1
  [[ -z $output ]]
  [[ $stderr == "secpolicy: display: cannot enter the root : No such file or directory" ]]
}

@test "everything stays below the root" {
  boot
  [[ -f $root/run/secpolicy/host.db && -d $root/usr/bin ]]
  [[ ! -e $root/$root ]]
}

@test "an ordinary user boots and shows a root of its own" {
  [[ $(id -u) -eq 0 ]] || skip "all tests run as an ordinary user already"
  as_nobody unshare --user true || skip "this machine allows no user namespaces"
  share_command
  chown -R 65534:65534 "$root"
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" boot
  exits 0
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" display
  exits 0
  shows "/tardisks/monitor.tgz (monitorImage)"
  # Drawing takes a program of the system, which is not below the root.
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" graph --format svg
  exits 0
  [[ $output == *"<title>sshDom</title>"* ]]
  [[ $(stat -c %u "$root/usr/sbin/sshd") == 65534 ]]
}

@test "an ordinary user without a root is told what to do" {
  [[ $(id -u) -eq 0 ]] || skip "needs root to become an ordinary user without a state"
  share_command
  run --separate-stderr as_nobody "$SECPOLICY" settings enforcement appDom permissive
  exits 1
  [[ ${stderr##*$'\n'} == *"You are not root: run it as root, or give --root DIR to work below a directory of yours." ]]
}

@test "an ordinary user below another user's root is told that once, and nothing else" {
  [[ $(id -u) -eq 0 ]] || skip "needs root to own the root"
  as_nobody unshare --user true || skip "this machine allows no user namespaces"
  boot
  share_command
  local verb words unreadable="Unable to use the host state /run/secpolicy/host.db: unable to open database file"
  local cause="This root is another user's: run it as that user, or as root."
  while IFS='|' read -r verb words; do
    # shellcheck disable=SC2086
    run --separate-stderr as_nobody "$SECPOLICY" --root "$root" $verb $words
    exits 1
    [[ -z $output && $stderr == "secpolicy: $verb: $unreadable. $cause" ]] || ends_with "that of $verb"
  done <<END
status|
graph|
why|sshDom read /etc
domain list|
rules|--call mount
path|hostDom sshDom
file-policy list|sshDom
domain show|sshDom
restore|
display|
domain create|job7
label get|/etc
boot|
boot|--plan
END
  local policy=/etc/zorvan/secpolicy
  unreadable="there is no place for a copy of the policy to work with: /tmp, /var/tmp, /run and / below this root cannot be written; TMPDIR can name another: Permission denied"
  while IFS='|' read -r verb words code; do
    # shellcheck disable=SC2086
    TMPDIR='' run --separate-stderr as_nobody "$SECPOLICY" --root "$root" $verb $words
    exits "$code"
    [[ -z $output && $stderr == "secpolicy: $verb: $unreadable. $cause" ]] || ends_with "that of $verb"
  done <<END
check||1
load|--plan|1
diff|installed $policy|2
diff|$policy $policy|2
END
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" domain of 1
  exits 1
  [[ $stderr == "secpolicy: domain of: Unable to get domain ID: "*". $cause" ]]
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" new domain webDom
  ends_with "secpolicy: new domain: cannot make /etc/zorvan/secpolicy/domains/webDom: Permission denied. $cause"
  # A root of the user's own that was never booted is no matter of rights.
  mkdir -p "$BATS_TEST_TMPDIR/own/run"
  chown -R 65534:65534 "$BATS_TEST_TMPDIR/own"
  for verb in restore "domain list" graph; do
    # shellcheck disable=SC2086
    run --separate-stderr as_nobody "$SECPOLICY" --root "$BATS_TEST_TMPDIR/own" $verb
    exits 1
    [[ $stderr == "secpolicy: $verb: nothing is installed below this root. "* && $stderr != *"not root"* ]]
  done
  run --separate-stderr as_nobody "$SECPOLICY" --root "$root" settings unset enforcement appDom
  [[ $stderr != *"nothing is stored"*"user's"* ]]
}

@test "SECPOLICY_HOST_STATE moves the state" {
  export SECPOLICY_HOST_STATE=/elsewhere/state.db
  boot
  [[ -f $root/elsewhere/state.db && ! -e $root/run/secpolicy/host.db ]]
  secpolicy display
  exits 0
  shows "/tardisks/monitor.tgz (monitorImage)"
}

@test "a relative SECPOLICY_HOST_STATE is refused by every verb, and makes nothing" {
  boot
  cd "$BATS_TEST_TMPDIR"
  export SECPOLICY_HOST_STATE=run/secpolicy/host.db
  local verb
  for verb in boot load load-early restore "load --plan" "load --all-or-nothing" check "diff installed /etc/zorvan/secpolicy" \
    display status graph "why sshDom read /etc" "who-can read /etc" "save good" "label get /etc"; do
    # shellcheck disable=SC2086
    secpolicy $verb
    exits $((status == 2 ? 2 : 1))
    [[ $stderr$'\n' == *': The host state needs the absolute path of a file, not "run/secpolicy/host.db"'$'\n'* ]] ||
      ends_with "$verb refuses it"
  done
  [[ ! -e $BATS_TEST_TMPDIR/run ]]
}

@test "a service uses the runtime interface" {
  local state=$BATS_TEST_TMPDIR/state/host.db
  SECPOLICY_HOST_STATE=$state run --separate-stderr "$RUNTIME_EXAMPLE"
  exits 0
  [[ $output == "This service runs in hostDom
job7: /srv/jobs/7 0x3
job7: /usr/bin/convert 0x11


-----------------------------------------------------------
Domain Name: job7 Domain ID :2 Enforcement Level: enforcing
State: 8 RefCount: 0 WorldRefCount: 0 defaultDom: 0
-----------------------------------------------------------
-c cap_net_bind_service grant


-p bind_port 80 grant


-r /srv/jobs/7 rw
-r /usr/bin/convert rx" ]]
}

@test "where nothing is installed, the verbs that look say what to do and make nothing" {
  mkdir -p "$BATS_TEST_TMPDIR/empty/run"
  for verb in "why sshDom read /etc" "who-can read /etc" graph display; do
    run --separate-stderr "$SECPOLICY" --root "$BATS_TEST_TMPDIR/empty" $verb
    exits 1
    ends_with "secpolicy: ${verb%% *}: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $BATS_TEST_TMPDIR/empty boot' first."
    [[ -z $(ls "$BATS_TEST_TMPDIR/empty/run") ]]
  done
  run --separate-stderr "$SECPOLICY" --root "$BATS_TEST_TMPDIR/empty" status
  exits 1
  ends_with "secpolicy: status: no policy is loaded. 'secpolicy --root $BATS_TEST_TMPDIR/empty boot' loads one"
  [[ -z $(ls "$BATS_TEST_TMPDIR/empty/run") ]]
}

@test "a path that begins with the root is told from there" {
  cd "$BATS_TEST_TMPDIR"
  local name=etc/zorvan/secpolicy found="Did you mean /etc/zorvan/secpolicy? Paths begin at the root."
  for root in ./root root/ "$PWD/root"; do
    secpolicy check "$root/$name"
    exits 1
    ends_with "secpolicy: check: there is no policy at $root/$name below this root. Name the directory of the policy or a file in it, or the root that it is in (--root DIR). $found"
  done
  root=root
  secpolicy load "root/$name"
  exits 1
  [[ $stderr == *"(--root DIR). $found" ]]
  secpolicy diff "root/$name" "./$name"
  exits 2
  ends_with "secpolicy: diff: there is no directory root/$name below this root. Name a policy directory, a saved state, or 'installed'. $found"
  secpolicy check root/no/such
  ends_with "secpolicy: check: there is no policy at root/no/such below this root. Name the directory of the policy or a file in it, or the root that it is in (--root DIR)."
}

@test "a load before the first boot tells of that" {
  local unbooted="nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
  rmdir "$root/run"
  for verb in load load-early "load --all-or-nothing"; do
    # shellcheck disable=SC2086
    secpolicy $verb
    fails_with "${verb%% *}" "$unbooted"
  done
  [[ ! -e $root/run ]]
  mkdir "$root/run"
  secpolicy load
  exits 1
  [[ ${stderr##*$'\n'} == "secpolicy: load: There were some problems encountered in setting the policy ("*" problems above). This root was not booted: 'secpolicy --root $root boot' labels its files and loads the policy" ]]
}

@test "output that cannot be written is an error of every verb" {
  boot
  "$SECPOLICY" --root "$root" save good
  for verb in status "status --format json" display "display --format json" graph \
    "label get -R /etc" "why sshDom read /etc/ssh" "who-can read /etc" history; do
    # shellcheck disable=SC2016
    run --separate-stderr bash -c '"$SECPOLICY" --root "$1" $2 >/dev/full' - "$root" "$verb"
    exits 1
    ends_with "secpolicy: standard output could not be written, so it is not complete"
  done
}
