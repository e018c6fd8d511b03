# A state that is damaged: every verb ends and says so, and a boot mends it.

load helper

setup() {
  make_root
  boot
  state=$root/run/secpolicy/host.db
  "$SECPOLICY" --root "$root" save good
}

# damage SQL: changes the state behind the back of the host.
damage() { sqlite3 "$state" "$1"; }

# is_damaged HOW: the latest command ended with this, of the state, also where it has worked with a copy.
is_damaged() {
  [[ ${stderr##*$'\n'} == "secpolicy: "*"Unable to use the host state /run/secpolicy/host.db: it is damaged or no such thing ($1). Remove the file and run \"secpolicy boot\", which makes a new one" ]] && return
  printf 'no damage (%s) in:\n%s\n' "$1" "$stderr"
  return 1
}

@test "a state without the row that counts its versions is told by every verb, in time" {
  damage "DELETE FROM state"
  local verb
  for verb in status display load "load --plan" load-early "label relabel" "rollback good" \
    "why sshDom read /etc/ssh" "load --all-or-nothing" graph check; do
    # shellcheck disable=SC2086
    run --separate-stderr timeout 60 "$SECPOLICY" --root "$root" $verb
    exits 1
    is_damaged "the table state is empty"
  done
}

@test "a state with other tables is told" {
  damage "DROP TABLE world"
  secpolicy status
  exits 1
  is_damaged "its tables are not those of this program"
}

@test "a boot moves a state aside that cannot be used" {
  local mended="secpolicy: boot: the host state could not be used, so a new one is made; what was there is now /run/secpolicy/host.db.damaged"
  local change
  for change in "DELETE FROM state" "DROP TABLE rule" "PRAGMA user_version = 1" "PRAGMA application_id = 1"; do
    damage "$change"
    secpolicy boot
    exits 0
    says "$mended"
    ends_done boot
    secpolicy status
    exits 0
  done
  echo garbage >"$state"
  secpolicy boot
  exits 0
  says "$mended"
  [[ $(cat "$state.damaged") == garbage ]]
  secpolicy boot
  exits 0
  is_done boot
}

@test "a boot that moves a state aside keeps nothing of a load that was going on" {
  ((EUID == 0)) || skip "only the superuser keeps the labels of a load that did not end"
  echo "what files carried" >"$root/run/secpolicy/labels.undo"
  damage "DROP TABLE rule"
  secpolicy boot
  exits 0
  ends_done boot
  [[ ! -e $root/run/secpolicy/labels.undo ]]
  secpolicy load
  exits 0
}

@test "what an older version has left is refused, and a boot moves on to this one's labels" {
  ((EUID == 0)) || skip "only the superuser writes attributes of the system"
  local program=$root/usr/sbin/sshd
  damage "PRAGMA user_version = 3"
  setfattr --name security.zorvan --value 0x0b000000 "$program"
  setfattr --remove security.bpf.zorvan "$program"
  secpolicy label get /usr/sbin/sshd
  exits 1
  ends_with 'secpolicy: label get: Unable to use the host state /run/secpolicy/host.db: it has schema 3, this program works with schema 6: it was made by another version of it. Remove the file and run "secpolicy boot", which makes a new one'
  secpolicy boot
  exits 0
  secpolicy label get /usr/sbin/sshd
  [[ $output == "/usr/sbin/sshd: sshProgram" ]]
  run getfattr --dump --match=- --absolute-names "$program"
  [[ $output == *security.bpf.zorvan=* && $output != *security.zorvan=* ]]
}
