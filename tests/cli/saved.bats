# secpolicy save, history and rollback: what was saved comes back whole, and what is damaged, foreign
# or open to others never does.

load helper

setup() {
  boot_beside_copy
  saved=$root/var/lib/secpolicy/saved
}

# What is installed, without the numbers of objects.
installed() { "$SECPOLICY" --root "$root" display 2>/dev/null | sed 's/^\([A-Za-z]*\) ([0-9]*)$/\1/'; }

no_state() { echo "secpolicy: $1: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."; }

@test "what was saved comes back" {
  secpolicy settings enforcement appDom permissive
  secpolicy restore
  installed >"$BATS_TEST_TMPDIR/before"
  secpolicy save good
  exits 0
  [[ -z $output && $stderr == "secpolicy: save: done" ]]

  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  sed -i 's/^\(-c cap_net_bind_service\) grant/\1 revoke/' "$policy/domains/sshDom"
  touch "$policy/domains/newDom"
  sed -i '/monitorSocket/d' "$policy/domains/monitorDom" "$policy/objects/monitor"
  echo "newObject" >>"$policy/objects/base"
  secpolicy load /new
  secpolicy settings enforcement appDom enforcing
  secpolicy restore
  secpolicy diff good installed
  exits 1

  secpolicy rollback good
  exits 0
  [[ -z $output ]]
  [[ $stderr == "secpolicy: rollback: done; the policy files were not changed, and files keep the labels that they have: 'secpolicy --root $root label verify' compares them with the policy" ]]
  installed | diff "$BATS_TEST_TMPDIR/before" -
  secpolicy diff good installed
  exits 0
}

@test "after a rollback a load works as before" {
  secpolicy save good
  echo "newObject" >>"$policy/objects/base"
  secpolicy load /new
  secpolicy rollback good
  secpolicy load
  exits 0
  secpolicy diff good installed
  exits 0
}

@test "files keep the labels that they carry" {
  secpolicy save good
  echo "/etc/services.conf sshKey" >"$policy/fileLabels/zz"
  secpolicy load /new
  secpolicy rollback good
  secpolicy load --plan
  [[ $output == "files to label anew (1):
  /etc/services.conf: sshKey -> hostConfig" ]]
}

@test "history lists the saved states, the oldest first" {
  secpolicy history
  exits 0
  [[ -z $output && $stderr == "secpolicy: history: nothing is saved" ]]
  secpolicy save later
  secpolicy save a
  touch -d '2026-01-02 03:04:05 UTC' "$saved/later.db"
  touch -d '2025-12-31 23:59:59 UTC' "$saved/a.db"
  touch "$saved/notes" "$saved/.a.db.XXXXXX"
  secpolicy history
  exits 0
  local rules
  secpolicy display
  rules=$(grep -c '^-[a-z] ' <<<"$output")
  domains=$(grep -c '^Domain Name' <<<"$output")
  secpolicy history
  [[ $output == "a      2025-12-31 23:59:59 UTC  $domains domains, $rules rules
later  2026-01-02 03:04:05 UTC  $domains domains, $rules rules" ]]
  [[ $stderr == "secpolicy: history: 2 saved states" ]]
}

@test "a saved state is for its owner alone, and outlives the state" {
  secpolicy save good
  [[ $(stat -c '%a' "$saved") == 700 && $(stat -c '%a' "$saved/good.db") == 600 ]]
  [[ $(ls -A "$saved") == good.db ]]
  boot
  secpolicy rollback good
  exits 0
}

@test "a rollback that cannot be recorded is done all the same" {
  secpolicy save good
  echo "newObject" >>"$policy/objects/base"
  secpolicy load /new
  sqlite3 "$root/run/secpolicy/host.db" \
    "CREATE TRIGGER breakage BEFORE INSERT ON load_record BEGIN SELECT RAISE(ABORT, 'no'); END"
  secpolicy rollback good
  exits 0
  says "secpolicy: rollback: this rollback cannot be recorded for 'status': Unable to use the host state /run/secpolicy/host.db: no"
  ends_with "secpolicy: rollback: done; the policy files were not changed, and files keep the labels that they have: 'secpolicy --root $root label verify' compares them with the policy"
  secpolicy diff good installed
  exits 0
}

@test "a saved state comes before a directory of its name" {
  secpolicy save new
  echo "newObject" >>"$policy/objects/base"
  secpolicy diff new installed
  exits 0
  [[ $stderr == "secpolicy: diff: the same" ]]
  secpolicy diff ./new installed
  exits 1
  rm "$saved/new.db"
  secpolicy diff new installed
  exits 1
  [[ $output == "--- new"$'\n'* ]]
}

@test "a taken name is refused without --force" {
  secpolicy save good
  echo "newObject" >>"$policy/objects/base"
  secpolicy load /new
  secpolicy save good
  exits 1
  [[ $stderr == "secpolicy: save: there is a saved state 'good' already. Give --force to replace it, or choose another name." ]]
  secpolicy diff good installed
  exits 1
  secpolicy save --force good
  exits 0
  secpolicy diff good installed
  exits 0
}

@test "what cannot be a name is wrong usage" {
  local name verb
  for verb in save rollback; do
    for name in .hidden a/b 'a b' '' 'ü' "$(printf 'x%.0s' {1..65})"; do
      secpolicy "$verb" "$name"
      wrong_usage "$verb" "NAME: '$name' cannot be a name: it takes 1 to 64 of A-Z a-z 0-9 . _ -, and begins with neither . nor -"
    done
    secpolicy "$verb" installed
    wrong_usage "$verb" "NAME: 'installed' means what is installed now"
  done
  [[ ! -e $saved ]]
  secpolicy save A-z.0_9
  exits 0
}

@test "what there is not" {
  secpolicy rollback good
  exits 1
  [[ $stderr == "secpolicy: rollback: there is no saved state 'good'. 'secpolicy --root $root history' lists what is saved." ]]
  secpolicy save good
  rm -r "$root/run/secpolicy/"*
  secpolicy save other
  exits 1
  [[ $stderr == "$(no_state save)" ]]
  secpolicy rollback good
  exits 1
  [[ $stderr == "$(no_state rollback)" ]]
  [[ ! -e $root/run/secpolicy/host.db ]]
}

@test "a damaged saved state, and one of another version, change nothing" {
  installed >"$BATS_TEST_TMPDIR/before"
  secpolicy save bad
  secpolicy save old
  echo garbage >"$saved/bad.db"
  sqlite3 "$saved/old.db" 'PRAGMA user_version = 1'
  touch -d '2025-01-01 UTC' "$saved/bad.db"
  secpolicy rollback bad
  exits 1
  [[ $stderr == "secpolicy: rollback: the saved state 'bad' cannot be put back, so nothing was changed: Unable to copy the saved state /var/lib/secpolicy/saved/bad.db: file is not a database" ]]
  secpolicy rollback old
  exits 1
  [[ $stderr =~ ^"secpolicy: rollback: the saved state 'old' cannot be put back, so nothing was changed: it has schema 1, this program works with schema "[0-9]+": it was saved by another version"$ ]]
  installed | diff "$BATS_TEST_TMPDIR/before" -
  secpolicy history
  exits 1
  [[ $output == "bad  2025-01-01 00:00:00 UTC  Unable to copy the saved state /var/lib/secpolicy/saved/bad.db: file is not a database
old  "*" UTC  Unable to use the host state /var/lib/secpolicy/saved/old.db: it has schema 1, "* ]]
}

# refuses REASON: no verb uses the saved state 'good', and all say why.
refuses() {
  installed >"$BATS_TEST_TMPDIR/before"
  secpolicy rollback good
  exits 1
  ends_with "secpolicy: rollback: the saved state 'good' cannot be put back, so nothing was changed: $1"
  installed | diff "$BATS_TEST_TMPDIR/before" -
  secpolicy diff good installed
  exits 2
  ends_with "secpolicy: diff: $1"
  secpolicy history
  exits 1
  [[ $output == "good  "*"  $1" ]]
}

@test "a saved state that others may have written is refused" {
  local anew="Take that right from them (chmod go-w), and make it anew"
  secpolicy save good
  chmod 777 "$saved"
  refuses "Refusing the saved state: other users may write /var/lib/secpolicy/saved. $anew"
  chmod 700 "$saved"
  chmod 666 "$saved/good.db"
  refuses "Refusing the saved state: other users may write /var/lib/secpolicy/saved/good.db. $anew"
  chmod 600 "$saved/good.db"
  mv "$saved/good.db" "$saved/elsewhere"
  ln -s elsewhere "$saved/good.db"
  refuses "Refusing the saved state: /var/lib/secpolicy/saved/good.db is not a regular file. Remove it, and make it anew"
}

@test "a saved state that somebody else owns is refused" {
  [[ $EUID -eq 0 ]] || skip "only root can give files away"
  secpolicy save good
  chown 65534 "$saved/good.db"
  refuses "Refusing the saved state: /var/lib/secpolicy/saved/good.db belongs to another user. Remove it, and make it anew"
}

@test "what is empty is no saved state" {
  secpolicy save good
  for size in 1 0; do
    truncate -s "$size" "$saved/good.db"
    refuses "Unable to copy the saved state /var/lib/secpolicy/saved/good.db: it is no saved state"
  done
}

@test "a saved state in which a rule was turned round is refused" {
  secpolicy save good
  sqlite3 "$saved/good.db" "UPDATE rule SET granted = 1 - granted WHERE id = 1"
  refuses "Unable to copy the saved state /var/lib/secpolicy/saved/good.db: it is damaged"
}

# The state is in use by none, and is read while another one is put in its place.
@test "what is saved while the state changes is the one or the other" {
  secpolicy save one
  echo "-s ptrace grant" >>"$policy/domains/appDom"
  secpolicy load
  secpolicy save two
  (while [[ ! -e $BATS_TEST_TMPDIR/end ]]; do
    for name in one two; do "$SECPOLICY" --root "$root" rollback "$name" 2>/dev/null || exit 1; done
  done) &
  local flipper=$!
  for _ in {1..20}; do
    secpolicy save --force third
    exits 0
    secpolicy diff third one
    [[ $status -eq 0 ]] || secpolicy diff third two
    exits 0
    secpolicy check
    exits 0
    [[ $stderr != *"after a boot"* ]]
  done
  touch "$BATS_TEST_TMPDIR/end"
  wait "$flipper"
}

@test "a rollback that would leave a process without its domain is refused" {
  secpolicy save good
  touch "$policy/domains/lateDom"
  secpolicy load /new
  sleep 1000 &
  local world=$! start
  start=$(sed 's/.*) //' "/proc/$world/stat" | cut -d' ' -f20)
  sqlite3 "$root/run/secpolicy/host.db" "INSERT INTO world VALUES ($world, $start, $(domain_id lateDom), '')"
  mkdir -p "$root/proc"
  if ! mount -t proc proc "$root/proc"; then
    kill "$world"
    skip "/proc cannot be mounted here"
  fi
  secpolicy rollback good
  umount "$root/proc"
  kill "$world"
  exits 1
  [[ $stderr == "secpolicy: rollback: the saved state 'good' cannot be put back, so nothing was changed: worlds run in the domain 'lateDom', which it does not have. End them, and run it again" ]]
  [[ -n $(domain_id lateDom) ]]
}

@test "saved states that this user may not see are not taken for missing ones" {
  [[ $EUID -eq 0 ]] || skip "only root can become somebody else"
  setpriv --reuid=65534 --clear-groups test -x "$SECPOLICY" -a -r "$SOURCE" ||
    skip "others may not read this place"
  mkdir -m 755 "$BATS_TEST_TMPDIR/var"
  mkdir -p "$BATS_TEST_TMPDIR/var/secpolicy/saved"
  chmod 700 "$BATS_TEST_TMPDIR/var/secpolicy"
  touch "$BATS_TEST_TMPDIR/host.db"
  local problem="Permission denied. You are not root: run it as root, or give --root DIR to work below a directory of yours."
  local command
  for command in "rollback good" "save good" "history" "diff good installed"; do
    run --separate-stderr unshare --mount bash -c "mount --bind '$BATS_TEST_TMPDIR/var' /var/lib &&
      SECPOLICY_HOST_STATE='$BATS_TEST_TMPDIR/host.db' \
      setpriv --reuid=65534 --regid=65534 --clear-groups '$SECPOLICY' $command"
    [[ $stderr != *"unshare failed"* && $stderr != *"mount:"* ]] || skip "no mounts here"
    [[ $status -ne 0 && ${#lines[@]} -eq 0 ]]
    [[ $stderr == "secpolicy: ${command%% *}: cannot look for /var/lib/secpolicy/saved"*": $problem" ]]
  done
}

@test "a state that belongs to somebody else is not taken for none" {
  [[ $EUID -eq 0 ]] || skip "only root can become somebody else"
  setpriv --reuid=65534 --clear-groups test -x "$SECPOLICY" -a -r "$SOURCE" ||
    skip "others may not read this place"
  chmod 700 "$root/run/secpolicy"
  run --separate-stderr setpriv --reuid=65534 --clear-groups env SECPOLICY_HOST_STATE="$root/run/secpolicy/host.db" \
    "$SECPOLICY" save good
  exits 1
  [[ $stderr == "secpolicy: save: "*". You are not root: run it as root, or give --root DIR to work below a directory of yours." ]]
  run --separate-stderr setpriv --reuid=65534 --clear-groups env SECPOLICY_HOST_STATE="$root/run/secpolicy/host.db" \
    "$SECPOLICY" diff installed "$SOURCE/examples/host/etc/zorvan/secpolicy"
  exits 2
  [[ $stderr == "secpolicy: diff: Unable to examine $root/run/secpolicy: Permission denied. You are not root: run it as root, or give --root DIR to work below a directory of yours." ]]
}

@test "history tells as JSON what is saved, and what cannot be used" {
  secpolicy history --format json
  exits 0
  fits_schema history
  jq -e '.states == []' <<<"$output"
  secpolicy save good
  touch -d '2026-01-02 03:04:05 UTC' "$saved/good.db"
  echo broken >"$saved/bad.db"
  secpolicy history --format json
  exits 1
  fits_schema history
  jq -e '.states | length == 2 and (.[0] | .name == "good" and .time == "2026-01-02T03:04:05Z" and .rules > 100) and
    (.[1] | .name == "bad" and (.problem | startswith("Unable to copy the saved state")))' <<<"$output"
}

@test "saved show shows what was saved, as display does what is installed" {
  secpolicy display
  local before=$output
  secpolicy display --format json
  local document=$output
  secpolicy save good
  secpolicy domain create job7
  secpolicy saved show good
  exits 0
  [[ $stderr == "secpolicy: saved show: done" && $output != *job7* ]]
  diff <(sed '/^Tardisk Path/,$d; /^-*$/d' <<<"$before") <(sed '/^-*$/d' <<<"$output")
  secpolicy saved show good --format json
  exits 0
  fits_schema saved
  diff <(jq '{domains, objects}' <<<"$document") <(jq '{domains, objects}' <<<"$output")
  [[ $(jq -r .name <<<"$output") == good ]]
  secpolicy display
  [[ $output == *job7* ]]
}

@test "saved delete deletes one saved state, and no other" {
  secpolicy save good
  secpolicy save other
  secpolicy saved delete good
  exits 0
  [[ -z $output && $stderr == "secpolicy: saved delete: done" ]]
  [[ ! -e $saved/good.db && -f $saved/other.db ]]
  for verb in delete show; do
    secpolicy saved "$verb" good
    exits 1
    [[ $stderr == "secpolicy: saved $verb: there is no saved state 'good'. 'secpolicy --root $root history' lists what is saved." ]]
    secpolicy saved "$verb" ../config
    wrong_usage "saved $verb" "NAME: '../config' cannot be a name: it takes 1 to 64 of A-Z a-z 0-9 . _ -, and begins with neither . nor -"
  done
  secpolicy saved show othre
  fails_with "saved show" "there is no saved state 'othre'. Did you mean 'other'?"
  ln -s other.db "$saved/link.db"
  secpolicy saved delete link
  exits 0
  [[ ! -L $saved/link.db && -f $saved/other.db ]]
  mkdir "$saved/dir.db"
  secpolicy saved delete dir
  exits 1
  ends_with "secpolicy: saved delete: cannot delete /var/lib/secpolicy/saved/dir.db: Is a directory"
}

@test "a saved state that cannot be used is shown as little as put back, and can be deleted" {
  mkdir -p "$saved"
  echo broken >"$saved/bad.db"
  secpolicy saved show bad
  exits 1
  [[ -z $output ]]
  ends_with "secpolicy: saved show: Unable to copy the saved state /var/lib/secpolicy/saved/bad.db: file is not a database"
  secpolicy saved delete bad
  exits 0
}
