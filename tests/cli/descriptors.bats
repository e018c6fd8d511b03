# The command with descriptors that are closed, or with too few of them.

load helper

setup() {
  make_root
  boot
  "$SECPOLICY" --root "$root" save good
}

# There is no /dev/null below the root.
@test "a closed standard descriptor keeps no verb from its work" {
  local verb
  for verb in status "load" "check" "load --plan" "save --force good" "rollback good" history; do
    # shellcheck disable=SC2086
    "$SECPOLICY" --root "$root" $verb <&- >/dev/null 2>"$BATS_TEST_TMPDIR/err"
    # shellcheck disable=SC2086
    "$SECPOLICY" --root "$root" $verb 2>&- >/dev/null
    # shellcheck disable=SC2086
    "$SECPOLICY" --root "$root" $verb <&- 2>&- >/dev/null
  done
  run --separate-stderr "$SECPOLICY" --root "$root" status <&-
  exits 0
  shows "policy       loaded"
}

@test "output to a closed descriptor is an error, and goes into no file" {
  run --separate-stderr bash -c '"$SECPOLICY" --root "$1" status >&-' - "$root"
  exits 1
  ends_with "secpolicy: standard output could not be written, so it is not complete"
  [[ $(sqlite3 "$root/run/secpolicy/host.db" "PRAGMA integrity_check") == ok ]]
}

# with_descriptors LIMIT VERB: the command, with none of those that the tests hold open.
with_descriptors() {
  # shellcheck disable=SC2016
  run --separate-stderr bash -c '
    for fd in {3..63}; do eval "exec $fd>&-"; done
    ulimit -n "$1" && exec "$SECPOLICY" --root "$2" $3' - "$1" "$root" "$2"
}

@test "too few descriptors are told, and not as damage" {
  local limit verb told=0
  for verb in "rollback good" history status load "load --plan" check "save --force other"; do
    for limit in {6..24}; do
      with_descriptors "$limit" "$verb"
      [[ $status -eq 0 ]] && break
      [[ -n $output$stderr && $output$stderr != *damage* ]] || exits 0
      [[ $output$stderr != *"Too many open files"* ]] || told=$((told + 1))
    done
    exits 0
  done
  [[ $told -gt 0 ]]
}
