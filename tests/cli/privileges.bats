# The command with more rights than its user: what it finds in the environment counts for nothing.

load helper

# Every test has a booted root of an ordinary user, and copies of the command that this user may run
# with more rights.
setup() {
  [[ $EUID -eq 0 ]] || skip "only root can give rights away"
  root=$BATS_TEST_TMPDIR/root
  policy=$root/new
  lay_out_example "$root"
  boot
  "$SECPOLICY" --root "$root" save good
  cp -r "$root/etc/zorvan/secpolicy" "$policy"
  echo "newObject" >>"$policy/objects/base"
  mkdir "$root/tmp"
  chown -R 65534:65534 "$root"
  chmod 755 "$BATS_RUN_TMPDIR" "$(dirname "$BATS_TEST_TMPDIR")" "$BATS_TEST_TMPDIR"
  export SECPOLICY_HOST_STATE=/elsewhere/host.db SECPOLICY_HOST_CONFIG=/elsewhere/config.db
}

as_nobody() {
  run --separate-stderr setpriv --reuid=65534 --regid=65534 --clear-groups --inh-caps=-all \
    "$BATS_TEST_TMPDIR/secpolicy" --root "$root" "$@"
}

content() { sqlite3 "$root/run/secpolicy/host.db" .dump; }

# looks_only: the verbs that only look leave the installed state as it is.
looks_only() {
  as_nobody status
  exits 0
  local before verb
  before=$(content)
  for verb in check "check --fresh" "check /new" "load --plan" "load --plan /new" \
    "diff installed /new" "diff /new installed" "diff /new good" "diff good installed" history; do
    # shellcheck disable=SC2086
    as_nobody $verb
    [[ $status -le 1 ]] || exits 1
    [[ $(content) == "$before" ]] || {
      echo "$verb has changed the installed state"
      return 1
    }
  done
  as_nobody diff /new installed
  answers 1 "--- /new" "+++ installed" "@@ objects" "- newObject"
  [[ ! -e $root/elsewhere ]]
}

@test "with capabilities of its file, what only looks changes nothing that is installed" {
  cp "$SECPOLICY" "$BATS_TEST_TMPDIR/secpolicy"
  setcap cap_sys_chroot+ep "$BATS_TEST_TMPDIR/secpolicy" || skip "files take no capabilities here"
  looks_only
}

@test "with the user of its file, what only looks changes nothing that is installed" {
  cp "$SECPOLICY" "$BATS_TEST_TMPDIR/secpolicy"
  chown -R 0:0 "$root"
  chmod u+s "$BATS_TEST_TMPDIR/secpolicy"
  looks_only
}
