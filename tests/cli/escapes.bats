# Ways out of a domain, by the commands as they are typed: hunts for one that is open. Each is tried in
# narrowDom, which has to refuse it, and beside it in wideDom, whose rules grant it, or in openDom, which
# refuses nothing: there the same act has to work. Numbers that are left out stand in docs/enforcement.md.
#
# ESCAPE_AS is the number of an ordinary user whose programs try it, when root starts this.

load helper
load small_root

# ---- A root, and domains in it

setup_file() {
  copy_programs "$PROBE" "$PRELOADED"
}

setup() {
  needs_landlock
  works_as "$ESCAPE_AS"
  is_machine=
  options=()
  victims=()
  lay_out_root proc run usr programs t/{public,secret}/directory
  has_places proc
  ln -s usr/bin usr/lib usr/lib64 "$root"
  lay_out_two_places
  domain openDom
}

teardown() {
  local process
  for process in "${victims[@]}"; do kill -KILL "$process" 2>/dev/null || true; done
}

# A domain that cannot start the probe says nothing.
start=('-r /probe rx' '-r /proc r' '-s @start grant')
# So that it is not for its call that an act upon a file is refused.
calls=('-s @file grant' '-s @io grant' '-s @process grant' '-s @memory grant' '-s @signal grant')

# domain NAME RULE...: a domain with these rules besides what the probe needs.
domain() {
  printf '%s\n' "${start[@]}" "${@:2}" >"$policy/domains/$1"
}

# boots: the root, in which openDom refuses nothing; a test without that domain calls boot_root.
boots() {
  boot_root
  refuses_nothing openDom
}

secpolicy() {
  if [[ $is_machine ]]; then
    run --separate-stderr on_machine /programs/secpolicy "$@"
  else
    run --separate-stderr inside "$programs/secpolicy" --root "$root" "$@"
  fi
}

# ---- What becomes of an operation of the probe

# tries DOMAIN OPERATION...: the answers are in $output, a line each.
tries() {
  secpolicy run "$1" "${options[@]}" -- /probe "${@:2}"
}

# gets DOMAIN ERRORS OPERATION...: each ends with one of the errors, such as "EACCES|EXDEV".
gets() {
  local operation answers=
  tries "$1" "${@:3}"
  for operation in "${@:3}"; do answers+="$operation ($2)"$'\n'; done
  # A terminal has ends of lines of its own.
  [[ $status -eq 0 && ${output//$'\r'}$'\n' =~ ^$answers$ ]] && return
  printf 'in %s not %s:\n%s\n%s\n' "$1" "$2" "$output" "$stderr"
  return 1
}

# refuses ERRORS OPERATION...: narrowDom does, and wideDom does not.
refuses() {
  gets narrowDom "$@" && gets wideDom ok "${@:2}"
}

is_root() { [[ -z $ESCAPE_AS && $(id -u) -eq 0 ]]; }

# What others cannot do anyhow is nothing to refuse them.
only_root() {
  is_root || skip "only root could do it outside"
}

# From here on the commands run where the root is that of a machine.
as_machine() {
  [[ $(id -u) -eq 0 ]] || skip "only root can lay out a machine"
  is_machine=yes
  has_places proc usr
}

# in_background COMMAND...: $process runs until the test ends; its output is in $told.
in_background() {
  told=$BATS_TEST_TMPDIR/told.${#victims[@]}
  "$@" >"$told" 2>&1 3>&- &
  process=$!
  victims+=("$process")
}

# a_victim: $process is one of who tries it, in no domain.
a_victim() {
  in_background "${as[@]}" sleep 60
  until_true '[[ $(tr "\0" " " <"/proc/$process/cmdline") == "sleep 60 " ]]'
}

# ---- Files

@test "1 reading what has a label that is not granted" {
  domain narrowDom "${calls[@]}" '-a public read grant'
  domain wideDom "${calls[@]}" '-a public read grant' '-a secret read grant'
  boot_root
  refuses EACCES read=/t/secret/file
  gets narrowDom ok read=/t/public/file
}

@test "2 writing to what may only be read" {
  domain narrowDom "${calls[@]}" '-r /t r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses EACCES write=/t/secret/file
  gets narrowDom ok read=/t/secret/file
}

emptying=({open,read,ioctl}-truncate=/t/secret/file {,f}truncate=/t/secret/file)

@test "3 emptying what may only be read, in a domain that writes nothing" {
  domain narrowDom "${calls[@]}" '-r /t r' '-r /dev/null rw'
  domain wideDom "${calls[@]}" '-r /t rw'
  domain namingDom "${calls[@]}" '-r /t r' '-s openat2 grant'
  mkdir "$root/dev"
  : >"$root/dev/null"
  has_places proc dev/null
  boot_root
  refuses EACCES "${emptying[@]}"
  refuses ENOSYS openat2-truncate=/t/secret/file
  gets namingDom EACCES "${emptying[@]}" openat2-truncate=/t/secret/file
  gets narrowDom ok read=/t/secret/file open-truncate=/dev/null pipe-truncate
}

@test "3 emptying what may only be read, where that is all there is" {
  domain narrowDom "${calls[@]}" '-r / rx'
  domain wideDom "${calls[@]}" '-r / rwx'
  boot_root
  as_machine
  refuses EACCES "${emptying[@]}" write=/t/secret/file create=/t/secret/new unlink=/t/secret/file
  gets narrowDom ok read=/t/public/file list=/t/secret pipe-truncate
}

@test "3 emptying what may only be read, beside what may be written" {
  domain narrowDom "${calls[@]}" '-r /t r' '-r /t/public rw'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses EACCES "${emptying[@]}" openat2-truncate=/t/secret/file
  gets narrowDom ok "${emptying[@]//secret/public}" openat2-truncate=/t/public/file
}

@test "3 emptying what may be written but not truncated" {
  domain narrowDom "${calls[@]}" '-a secret read grant' '-a secret write grant'
  domain wideDom "${calls[@]}" '-a secret read grant' '-a secret write grant' '-a secret truncate grant'
  boot_root
  refuses EACCES "${emptying[@]}" openat2-truncate=/t/secret/file
  gets narrowDom ok write=/t/secret/file
}

@test "4 making a file where nothing may be written" {
  domain narrowDom "${calls[@]}" '-r /t r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses EACCES create=/t/secret/new link-nameless=/t/secret,/t/secret/linked
}

@test "4 linking a file without a name from where files may be made" {
  domain narrowDom "${calls[@]}" '-r /t/public rw' '-r /t/secret r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses "EACCES|EXDEV" link-nameless=/t/public,/t/secret/linked
  gets narrowDom ok link-nameless=/t/public,/t/public/linked
}

# makes_only KIND OPERATION...: who may make one kind makes it, and none of the others.
makes_only() {
  local kind=$1 operation
  shift
  gets "$kind" ok "$1=/t/public/new_$kind" || return
  for operation in mknod-file mkdir symlink mkfifo mknod-socket mknod-character mknod-block; do
    [[ $operation == "$1" ]] || gets "$kind" "EACCES|EPERM" "$operation=/t/public/$operation" || return
  done
}

@test "5 making another kind of file than is granted" {
  local kind devices=()
  ! is_root || devices=(char_device block_device)
  for kind in regular directory symlink fifo "${devices[@]}"; do
    domain "$kind" "${calls[@]}" "-f public public $kind grant" '-c cap_mknod grant'
  done
  domain stream "${calls[@]}" '-u public stream grant' '-p socket_type 1 grant'
  boot_root
  makes_only regular mknod-file
  makes_only directory mkdir
  makes_only symlink symlink
  makes_only fifo mkfifo
  makes_only stream mknod-socket
  ! is_root || makes_only char_device mknod-character
  ! is_root || makes_only block_device mknod-block
}

@test "6 removing an entry of a directory that may only be read" {
  domain narrowDom "${calls[@]}" '-r /t rw' '-r /t/secret r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses EACCES unlink=/t/secret/file rmdir=/t/secret/directory
}

@test "6 removing the directory itself" {
  domain narrowDom "${calls[@]}" '-r /t rw' '-r /t/secret/directory r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses "EACCES|EXDEV" rmdir=/t/secret/directory rename=/t/secret,/t/other
}

@test "7 moving or linking a file to where it may be read" {
  domain narrowDom "${calls[@]}" '-r /t/public rw' '-r /t/secret w'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses "EACCES|EXDEV" link=/t/secret/file,/t/public/linked rename=/t/secret/file,/t/public/moved
}

@test "8 exchanging a file with one that may be read" {
  domain narrowDom "${calls[@]}" '-r /t/public rw' '-r /t/secret w'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  refuses "EACCES|EXDEV" exchange=/t/public/file,/t/secret/file exchange=/t/secret/file,/t/public/file
}

@test "9 listing" {
  domain narrowDom "${calls[@]}" '-a secret read grant'
  domain wideDom "${calls[@]}" '-a secret read grant' '-a secret list grant'
  boot_root
  refuses EACCES list=/t/secret list=/t/secret/directory
}

@test "9 watching, which tells names as well" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t/public r' '-s inotify_add_watch grant'
  boot_root
  refuses EPERM watch=/t/secret watch=/t/public
}

@test "10 by the links of processes" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t r'
  boots
  refuses EACCES read=/proc/self/root/t/secret/file read=/proc/thread-self/cwd/t/secret/file
  gets narrowDom ok read=/proc/self/root/t/public/file
  in_background "${as[@]}" sh -c 'cd "$0/t/secret" && exec sleep 60 7<file' "$root"
  until_true '[[ $(readlink "/proc/$process/fd/7") == */t/secret/file ]]'
  # A user namespace would keep it from processes outside.
  as_machine
  gets openDom ok "read=/proc/$process/cwd/file" "read=/proc/$process/root$root/t/secret/file" "read=/proc/$process/fd/7"
  gets narrowDom EACCES "read=/proc/$process/cwd/file" "read=/proc/$process/root$root/t/secret/file" "read=/proc/$process/fd/7"
}

@test "11 a link in place of a file while the domain is entered" {
  domain narrowDom "${calls[@]}" '-r /t/public/data r'
  domain wideDom "${calls[@]}" '-r /t r'
  boot_root
  echo content >"$root/t/data"
  cp "$root/t/data" "$root/t/public/data"
  in_background python3 -c '
import os, sys
os.chdir(sys.argv[1])
while True:
    os.symlink("/t/secret/file", "public/new")
    os.rename("public/new", "public/data")
    os.link("data", "public/new")
    os.rename("public/new", "public/data")' "$root/t"
  local _
  for _ in {1..20}; do
    tries narrowDom read=/t/secret/file read=/t/public/data
    [[ $output != *"read=/t/secret/file ok"* ]]
  done
  kill "$process"
  wait "$process" || true
  ln -sfn /t/secret/file "$root/t/public/data"
  refuses EACCES read=/t/public/data
}

@test "11 a link to another program while a domain is entered by it" {
  local _
  # Each tells which program it is: the probe has no such operation, and the launcher a version.
  cp "$programs/secpolicy-run" "$root/t/secret/program"
  printf '%s\n' '-d public openDom exec grant' '-d secret silentDom exec grant' >>"$policy/domains/hostDom"
  domain openDom
  domain silentDom "${calls[@]}" '-r /t rx' '-s write revoke'
  boots
  ln -s /t/public/program "$root/t/one"
  ln -s /t/secret/program "$root/t/other"
  ln -s /t/public/program "$root/t/link"
  secpolicy exec -- /t/one --version
  [[ $output == "--version is no operation" ]]
  secpolicy exec -- /t/other --version
  [[ -z $output ]]
  # Where it says its version it is not in its own domain.
  secpolicy run openDom -- /t/other --version
  [[ $output == "secpolicy-run "* ]]
  in_background python3 -c '
import itertools, os, sys
os.chdir(sys.argv[1])
for kind in itertools.cycle(("public", "secret")):
    os.symlink(f"/t/{kind}/program", "new")
    os.rename("new", "link")' "$root/t"
  for _ in {1..30}; do
    secpolicy exec -- /t/link --version
    [[ -z $output || $output == "--version is no operation" ]]
  done
}

@test "12 by the directory above" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t r'
  boot_root
  refuses EACCES read=/t/public/../secret/file read=/t/public/directory/../../secret/file list=/t/public/..
}

@test "13 all that may be done above a narrower part" {
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret'
  domain wideDom "${calls[@]}" '-r /t rwx'
  boot_root
  refuses "EACCES" run=/t/secret/program map-executable=/t/secret/program write=/t/secret/file read=/t/secret/file list=/t/secret create=/t/secret/new
  gets narrowDom ok run=/t/public/program map-executable=/t/public/program write=/t/public/file list=/t/public
}

@test "13 a narrower part that is made later" {
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/new'
  domain wideDom "${calls[@]}" '-r /t rwx'
  boot_root
  refuses EACCES mkdir=/t/new rename=/t/secret,/t/new
  mkdir -p "$root/t/new"
  gets narrowDom EACCES list=/t/new create=/t/new/other
  gets narrowDom ok list=/t/public create=/t/public/created
}

# too_many: entries of /t, so that it is not taken apart.
too_many() {
  touch "$root"/t/entry{1..65}
}

# is_masked PLACE: narrowDom is kept from /t/secret by a mask, which is shown as PLACE.
is_masked() {
  secpolicy run narrowDom --explain
  exits 0
  shows "$1"
}

@test "13 all that may be done above a part that is hidden" {
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret'
  domain wideDom "${calls[@]}" '-r /t rwx'
  boot_root
  is_masked "hidden by a mount: /t/secret"
  refuses EACCES run=/t/secret/program map-executable=/t/secret/program write=/t/secret/file read=/t/secret/file list=/t/secret create=/t/secret/new
  gets narrowDom EBUSY rmdir=/t/secret rename=/t/secret,/t/moved rename=/t/public,/t/secret exchange=/t/public,/t/secret
  gets narrowDom ok run=/t/public/program write=/t/public/file list=/t create=/t/new rename=/t/public,/t/other
}

@test "13 executing in a part that is masked" {
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret rw'
  domain wideDom "${calls[@]}" '-r /t rwx'
  boot_root
  is_masked "mounted so that nothing is executed: /t/secret"
  refuses "EACCES|EPERM" run=/t/secret/program map-executable=/t/secret/program run-by-descriptor=/t/secret/program run=/proc/self/root/t/secret/program
  gets narrowDom ok run=/t/public/program read=/t/secret/file write=/t/secret/file create=/t/secret/new
}

@test "13 files of a label that is not granted, hidden one by one" {
  only_root
  too_many
  echo content >"$root/t/key"
  mkdir "$root/dev"
  mknod "$root/dev/null" c 1 3
  domain narrowDom "${calls[@]}" '-a public read grant' '-a public list grant' '-a public write grant'
  domain wideDom "${calls[@]}" '-a public read grant' '-a secret read grant' '-a secret write grant'
  printf '/t/* public\n/t/key secret\n/t/secret/* secret\n' >"$policy/fileLabels/all"
  boot_root
  is_masked "hidden by a mount: /t/key"
  refuses EACCES read=/t/key write=/t/key read=/t/secret/file
  gets narrowDom ok read=/t/entry1 list=/t read=/t/public/file
}

mounting=('-s mount grant' '-s umount2 grant' '-s open_tree grant' '-s move_mount grant' '-s mount_setattr grant')

@test "14 mounts over and around a narrower part" {
  only_root
  local part=('-r /t rwx' '-r /t/secret' '-c cap_sys_admin grant')
  domain narrowDom "${calls[@]}" "${part[@]}"
  domain wideDom "${calls[@]}" "${part[@]}" "${mounting[@]}"
  boots
  local acts=("bind-mount=/t/secret,/t/public" "move-mount=/t/secret,/t/public" remount=/proc unmount=/proc)
  # With its calls as well nothing is mounted. Where nothing is refused all of it works.
  gets narrowDom EPERM set-mount=/proc "${acts[@]}"
  gets wideDom EPERM "${acts[@]}"
  gets openDom ok set-mount=/proc "${acts[@]}"
}

@test "14 mounts over and around a part that is masked" {
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret' "${mounting[@]}"
  boots
  is_masked "hidden by a mount: /t/secret"
  local acts=(unmount=/t/secret remount=/t/secret set-mount=/t/secret "move-mount=/t/secret,/t/public" "bind-mount=/t/public,/t/secret")
  gets narrowDom EPERM "${acts[@]}"
  gets narrowDom EACCES read=/t/secret/file
  # Where nothing is refused, and these rights are there, all that is no mount yet can be one.
  ! is_root || gets openDom ok bind-mount=/t/public,/t/secret remount=/t/secret set-mount=/t/secret unmount=/t/secret
}

@test "14 a part that a domain with these rights could uncover is not masked" {
  only_root
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret' "${mounting[@]}" '-c cap_sys_admin grant'
  boot_root
  secpolicy run narrowDom --explain
  exits 0
  [[ $output != *"hidden by a mount"* ]]
  gets narrowDom EACCES read=/t/secret/file read-in-clone=/t,secret/file read-in-one-mount=/t,secret/file read=/t/entry1
}

@test "15 uncovering a masked part in a user namespace of its own" {
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret' '-s unshare grant' "${mounting[@]}" '-p clone_flags 0x10020000 grant'
  boots
  as_machine
  is_masked "hidden by a mount: /t/secret"
  tries narrowDom unshare-user unmount=/t/secret remount=/t/secret set-mount=/t/secret bind-mount=/t/public,/t/secret read=/t/secret/file
  answers 0 'unshare-user ok' 'unmount=/t/secret EINVAL' 'remount=/t/secret EPERM' 'set-mount=/t/secret EPERM' \
    'bind-mount=/t/public,/t/secret EPERM' 'read=/t/secret/file EACCES'
  tries openDom unshare-user bind-mount=/t/public,/t/secret unmount=/t/secret read=/t/secret/file
  answers 0 'unshare-user ok' 'bind-mount=/t/public,/t/secret ok' 'unmount=/t/secret ok' 'read=/t/secret/file ok'
}

@test "15 mounting in a user namespace of its own" {
  local part=('-r /t rwx' '-r /t/secret' '-s unshare grant')
  domain narrowDom "${calls[@]}" "${part[@]}"
  domain wideDom "${calls[@]}" "${part[@]}" "${mounting[@]}" '-p clone_flags 0x10020000 grant'
  boots
  # Below a root that is not the machine's nobody is given a user namespace.
  as_machine
  tries narrowDom unshare-user
  answers 0 'unshare-user EPERM'
  tries wideDom unshare-user bind-mount=/t/secret,/t/public read=/t/secret/file
  answers 0 'unshare-user ok' 'bind-mount=/t/secret,/t/public EPERM' 'read=/t/secret/file EACCES'
  tries openDom unshare-user bind-mount=/t/secret,/t/public read=/t/public/file
  answers 0 'unshare-user ok' 'bind-mount=/t/secret,/t/public ok' 'read=/t/public/file ok'
}

@test "16 entering a namespace of others" {
  only_root
  local can=('-c cap_sys_admin grant' '-c cap_sys_chroot grant')
  domain narrowDom "${calls[@]}" "${can[@]}"
  domain wideDom "${calls[@]}" "${can[@]}" '-s setns grant'
  boots
  refuses EPERM setns
  a_victim
  gets narrowDom "EPERM|EACCES" "setns-of=$process"
  gets wideDom "EACCES" "setns-of=$process"
  tries openDom "setns-of=$process" read=/etc/passwd
  answers 0 "setns-of=$process ok" 'read=/etc/passwd ok'
  # Whose mounts it enters, its rules stay.
  tries wideDom setns read=/etc/passwd "read=$root/t/secret/file"
  answers 0 'setns ok' 'read=/etc/passwd EACCES' "read=$root/t/secret/file EACCES"
}

@test "17 opening by a handle" {
  only_root
  local can=('-c cap_dac_read_search grant' '-r /t/public r' '-s name_to_handle_at grant')
  domain narrowDom "${calls[@]}" "${can[@]}"
  domain wideDom "${calls[@]}" "${can[@]}" '-s open_by_handle_at grant'
  boots
  refuses EPERM open-by-handle=/t/public/file,/t/public
  gets wideDom EACCES open-by-handle=/t/secret/file,/t/public handle-truncate=/t/public/file,/t/public
  gets openDom ok open-by-handle=/t/secret/file,/t/public handle-truncate=/t/public/file,/t/public
}

@test "18 inherited descriptors" {
  domain narrowDom "${calls[@]}"
  boots
  exec 7<"$root/t/secret/file" 18<"$root"
  gets narrowDom EBADF is-open=7 is-open=18
  gets openDom ok is-open=7 is-open=18
  exec 7<&- 18<&-
  # Nor is one left of what the command and the launcher use.
  gets narrowDom EBADF is-open={3..24}
}

@test "18 reopening what was inherited" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  exec 7<&0 <"$root/t/secret/file"
  refuses EACCES read=/proc/self/fd/0 write=/proc/self/fd/0
  exec <"$root"
  refuses EACCES read=/proc/self/fd/0/t/secret/file
  exec <&7 7<&-
}

@test "18 reading outside of a root, all of which may be read" {
  domain narrowDom "${calls[@]}" '-r / r'
  boots
  mkdir "$BATS_TEST_TMPDIR/outside"
  echo content >"$BATS_TEST_TMPDIR/outside/file"
  exec 7<&0 <"$BATS_TEST_TMPDIR/outside"
  gets narrowDom EACCES read=/proc/self/fd/0/file
  gets openDom ok read=/proc/self/fd/0/file
  exec <&7 7<&-
  gets narrowDom ok read=/t/secret/file
}

@test "20 attributes by ioctl" {
  domain narrowDom "${calls[@]}" '-r /t r'
  domain wideDom "${calls[@]}" '-r /t r' '-p ioctl_request 0x80086601 grant' '-p ioctl_request 0x40086602 grant'
  boots
  tries openDom set-flags=/t/secret/file
  [[ $output != *@(ENOTTY|EOPNOTSUPP) ]] || skip "this file system has no such attributes"
  refuses EPERM set-flags=/t/secret/file
}

@test "20 modes, owners, times and labels" {
  domain narrowDom "${calls[@]}" '-r /t rwx'
  domain wideDom "${calls[@]}" '-r /t rwx' '-s @attributes grant' '-c cap_sys_admin grant'
  boot_root
  local label=user.zorvan.security
  ! is_root || label=security.bpf.zorvan
  refuses EPERM chmod=/t/secret/file chown=/t/secret/file utime=/t/secret/file "setxattr=/t/secret/file,$label"
}

# ---- System calls

@test "21 calls that no rule grants, or one revokes" {
  domain narrowDom '-s getppid revoke'
  domain wideDom '-s getpgid grant'
  boot_root
  refuses EPERM getppid getpgid
}

@test "22 by the numbers of another table" {
  [[ $(uname -m) == x86_64 ]] || skip "only x86_64 has other tables"
  domain narrowDom "${calls[@]}"
  boots
  local operation bad_call=159
  for operation in call-int80 call-x32; do
    tries narrowDom "$operation"
    exits "$bad_call"
    [[ -z $output ]]
    # Whether a kernel has these tables is its own affair.
    tries openDom "$operation"
    [[ $status -ne $bad_call ]]
  done
}

@test "23 numbers that no call has, or that nobody can look into" {
  domain narrowDom "${calls[@]}" '-s clone3 grant'
  boots
  gets narrowDom ENOSYS call=9999 call=4294967295 clone3=0
  gets openDom ok clone3=0
}

@test "24 families with high bits" {
  domain narrowDom '-s socket grant' '-p socket_family 2 grant'
  boots
  gets narrowDom EPERM socket=0x100000010,3 socket=0x10,3
  gets narrowDom ok socket=0x100000002,1 socket=2,1
  gets openDom ok socket=0x100000010,3 socket=0x10,3
}

@test "25 types with flags and high bits" {
  domain narrowDom '-s socket grant' '-p socket_type 1 grant'
  boots
  gets narrowDom EPERM socket=2,2 socket=2,0x80002 socket=2,0x800 socket=2,0x100000002
  gets narrowDom ok socket=2,1 socket=2,0x80001 socket=2,0x80801
  gets openDom ok socket=2,2 socket=2,0x80002 socket=2,0x100000002
}

# ---- Networks

# a_server KIND NAME: a server of another that says where it listens: $at, a port or NAME.
a_server() {
  in_background python3 -uc '
import socket, sys, time
kind, name = sys.argv[1:]
families = {"tcp": (socket.AF_INET, socket.SOCK_STREAM), "stream": (socket.AF_UNIX, socket.SOCK_STREAM),
            "datagram": (socket.AF_UNIX, socket.SOCK_DGRAM)}
server = socket.socket(*families[kind])
server.bind(("127.0.0.1", 0) if kind == "tcp" else name.replace("@", "\0"))
if kind != "datagram": server.listen(64)
print(server.getsockname()[1] if kind == "tcp" else "ready")
time.sleep(60)' "$@"
  until_true '[[ -s $told ]]'
  at=$(<"$told")
}

network=("${calls[@]}" '-s @network grant' '-p socket_family 2 grant')

@test "26 MPTCP past the rules for ports" {
  [[ $(cat /proc/sys/net/mptcp/enabled) == 1 ]] || skip "this kernel has no MPTCP"
  domain narrowDom "${network[@]}" '-p connect_port 1 grant'
  domain wideDom "${network[@]}"
  boot_root
  refuses EPERM socket-mptcp
}

@test "27 fast open past the rules for ports" {
  a_server tcp any
  domain narrowDom "${network[@]}" '-p connect_port 1 grant'
  domain wideDom "${network[@]}"
  boot_root
  refuses "EACCES|EPERM" "connect-tcp=$at" "send-fast=$at" "send-message-fast=$at" "connect-fast=$at"
}

@test "28 other protocols, and listening without a port" {
  domain narrowDom "${network[@]}" '-p connect_port 53 grant' '-p bind_port 53 grant'
  domain wideDom "${network[@]}"
  boot_root
  refuses EPERM socket=2,2 listen-unbound
}

@test "29 another port, and port 0" {
  a_server tcp any
  domain narrowDom "${network[@]}" '-p connect_port 1 grant' '-p bind_port 7391 grant'
  domain wideDom "${network[@]}" "-p connect_port $at grant" '-p bind_port 0 grant' '-p bind_port 7392 grant'
  boot_root
  refuses EACCES "connect-tcp=$at" bind-tcp=7392 bind-tcp=0
  gets narrowDom ok bind-tcp=7391
}

# reaches NAME OPERATION: refused with and without a family of sockets; where that is not expressible
# nothing starts.
reaches() {
  gets narrowDom EPERM "$1"
  gets openDom ok "$1"
  tries wideDom "$1"
  exits 126
  [[ -z $output && $stderr == *"notExpressible: "*" -p socket_family 1 grant ("* ]]
  options=(--best-effort)
  gets wideDom ok "$1"
  options=()
}

@test "30 unix sockets of others that have a name" {
  domain narrowDom "${calls[@]}" '-s @network grant' '-r /run r'
  domain wideDom "${calls[@]}" '-s @network grant' '-r /run r' '-p socket_family 1 grant'
  boots
  # Outside of the root such a name would be too long.
  cd "$root/run"
  a_server stream stream
  a_server datagram datagram
  chmod 777 stream datagram
  reaches connect-unix=/run/stream
  reaches send-unix=/run/datagram
}

@test "31 abstract unix sockets of others" {
  domain narrowDom "${calls[@]}" '-s @network grant' '-p socket_family 1 grant'
  boots
  a_server stream "@secpolicy-$$"
  gets openDom ok "connect-abstract=secpolicy-$$"
  options=(--best-effort)
  gets narrowDom EPERM "connect-abstract=secpolicy-$$"
}

@test "32 unix sockets elsewhere, or of another kind" {
  domain narrowDom '-s socket grant' '-s bind grant' '-u public stream grant' '-p socket_type 1 grant'
  domain wideDom '-s socket grant' '-s bind grant' '-r /t rw'
  boot_root
  refuses EACCES bind-unix=/t/secret/socket
  refuses EPERM bind-unix-datagram=/t/public/datagram
  gets narrowDom ok bind-unix=/t/public/socket
}

# ---- Terminals, processes, identities

@test "33 typing into the terminal" {
  domain narrowDom "${calls[@]}"
  domain wideDom "${calls[@]}" '-p ioctl_request 0x5412 grant' '-p ioctl_request 0x541c grant' '-c cap_sys_admin grant'
  boot_root
  comes_after python3 -c 'import os, pty, sys; sys.exit(os.waitstatus_to_exitcode(pty.spawn(sys.argv[1:])))'
  # TIOCSTI, and TIOCLINUX, which only consoles have. Without rights a kernel may refuse the first anyhow.
  gets narrowDom EPERM ioctl=0x5412 ioctl=0x100005412 ioctl=0x541c ioctl=0x10000541c
  local reaches=ok
  is_root || reaches="ok|EIO"
  tries wideDom ioctl=0x5412 ioctl=0x100005412
  [[ $output =~ "ioctl=0x5412 "($reaches)$'\r\n'.*"ioctl=0x100005412 "($reaches) ]]
  gets wideDom ENOTTY ioctl=0x541c
}

@test "34 options of prctl" {
  domain narrowDom "${calls[@]}" '-p prctl_option 15 grant'
  domain wideDom "${calls[@]}"
  boot_root
  # PR_SET_DUMPABLE; then PR_SET_NAME, without a name.
  refuses EPERM prctl=4,1 prctl=0x100000004,1
  gets narrowDom EFAULT prctl=15,0
}

@test "34 PR_SET_MM" {
  domain narrowDom "${calls[@]}"
  domain wideDom "${calls[@]}" '-p prctl_option 35 grant'
  boot_root
  # PR_SET_MM_MAP_SIZE, which any user may ask for, without a place for the answer.
  gets narrowDom EPERM prctl=35,15 prctl=0x100000023,15
  gets wideDom EFAULT prctl=35,15 prctl=0x100000023,15
}

@test "35 namespaces by clone, unshare and clone3" {
  domain narrowDom "${calls[@]}" '-s unshare grant' '-r /probe rx'
  domain wideDom "${calls[@]}" '-s unshare grant' '-p clone_flags 0x10000000 grant' '-p clone_flags 0 grant'
  boots
  as_machine
  local user=0x10000000
  tries narrowDom clone=$user unshare=$user clone3=$user clone=0
  answers 0 "clone=$user EPERM" "unshare=$user EPERM" "clone3=$user ENOSYS" "clone=0 ok"
  tries wideDom clone=$user unshare=$user clone3=$user
  answers 0 "clone=$user ok" "unshare=$user ok" "clone3=$user ENOSYS"
  tries openDom clone3=$user
  answers 0 "clone3=$user ok"
}

@test "36 signals to others" {
  domain narrowDom "${calls[@]}" '-s @network grant' '-p socket_family 1 grant'
  boots
  a_victim
  gets openDom ok "kill=$process" "tgkill=$process" "sigqueue=$process" "pidfd=$process"
  options=(--best-effort)
  gets narrowDom EPERM "kill=$process" "tgkill=$process" "sigqueue=$process" "pidfd=$process"
  # It may be named as who is to be told, and is not.
  tries narrowDom "input-signal=$process"
  kill -0 "$process"
  options=()
  gets openDom ok "input-signal=$process"
  until_true '! kill -0 "$process"'
}

@test "36 other signals than are granted" {
  domain narrowDom "${calls[@]}" '-s @network grant' '-p socket_family 1 grant' '-p kill_signal 15 grant'
  boots
  a_victim
  options=(--best-effort)
  gets narrowDom EPERM "kill=$process" "input-signal=$process"
  kill -0 "$process"
  options=()
  gets openDom ok "kill=$process"
}

@test "37 other users" {
  only_root
  local can=('-s @identity grant' '-c cap_setuid grant' '-c cap_setgid grant')
  domain narrowDom "${calls[@]}" "${can[@]}" '-p set_uid 7 grant' '-p set_gid 7 grant'
  domain wideDom "${calls[@]}" "${can[@]}"
  boot_root
  refuses EPERM setuid=8 setfsuid=8 setgroups
  gets narrowDom ok setuid=7 setfsuid=7
}

@test "38 regaining capabilities" {
  only_root
  domain narrowDom "${calls[@]}" '-s capset grant'
  domain wideDom "${calls[@]}" '-s capset grant' '-c cap_dac_override grant'
  boots
  refuses EPERM has-capability=1 has-bounding=1 raise-capability=1 raise-ambient=1
  gets narrowDom EPERM flip-securebit=0 flip-securebit=2 keep-capabilities
  gets openDom ok flip-securebit=0
  chmod 4755 "$root/probe"
  tries narrowDom run=/probe,has-capability=1
  shows "has-capability=1 EPERM"
  tries wideDom run=/probe,has-capability=1
  shows "has-capability=1 ok"
}

@test "39 the files of others without the capability to" {
  only_root
  domain narrowDom "${calls[@]}" '-r /t r'
  domain wideDom "${calls[@]}" '-r /t r' '-c cap_dac_override grant'
  boot_root
  chown 65534:65534 "$root/t/secret/file"
  chmod 600 "$root/t/secret/file"
  refuses EACCES read=/t/secret/file
}

# ---- Programs

@test "40 a second program" {
  local rules=('-s @file grant' '-s @io grant' '-s clone grant' '-s wait4 grant' '-s memfd_create grant' '-r /t rx')
  domain narrowDom "${rules[@]}"
  domain wideDom "${rules[@]}" '-s execve grant' '-s execveat grant'
  boot_root
  refuses EPERM run=/t/public/program run-by-secret=/t/public/program,{0,1,0xffffffffffffffff} run-by-descriptor=/t/public/program \
    run-from-memory=/t/public/program
}

@test "40 a program from memory" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t/public r' '-s memfd_create grant'
  boot_root
  refuses EPERM run-from-memory=/t/public/program
}

@test "41 by the loader, and by a script" {
  cp "$(ldd /bin/true | sed -n 's/.*=> \(.*libc\.so\.6\) .*/\1/p')" "$root/t/public"
  cp "$(ldd /bin/true | sed -n 's/^[[:blank:]]*\(\/.*ld-linux[^ ]*\) .*/\1/p')" "$root/t/public/loader"
  cp /bin/true "$root/t/secret/true"
  printf '#!/t/public/program\n' >"$root/t/public/script"
  printf '#!/t/secret/program\n' >"$root/t/public/other"
  chmod +x "$root"/t/public/{script,other}
  domain narrowDom "${calls[@]}" '-r /t r' '-r /t/public/script rx' '-r /t/public/other rx' '-r /t/public/program rx'
  domain wideDom "${calls[@]}" '-r /t rx'
  domain loaderDom "${calls[@]}" '-r /t r' '-r /t/public/loader rx'
  boot_root
  refuses EACCES run-by-loader=/t/public/loader,/t/secret/true run=/t/secret/program
  gets narrowDom EACCES run=/t/public/other
  tries wideDom run=/t/public/other
  shows "run=/t/public/other ok"
  tries narrowDom run=/t/public/script
  shows "run=/t/public/script ok"
  # Reading is enough for a loader that may be executed.
  tries loaderDom run-by-loader=/t/public/loader,/t/secret/true run=/t/secret/true
  answers 0 "run-by-loader=/t/public/loader,/t/secret/true ok" "run=/t/secret/true EACCES"
}

@test "42 executing what enters another domain" {
  local rules=('-r /t rx' '-f secret secret regular revoke')
  domain narrowDom "${calls[@]}" "${rules[@]}" '-d secret openDom exec grant'
  domain wideDom "${calls[@]}" "${rules[@]}"
  boots
  refuses EACCES run=/t/secret/program read=/t/secret/program map-executable=/t/secret/program run-by-descriptor=/t/secret/program
  gets narrowDom ok run=/t/public/program
  printf '#!/t/secret/program\n' >"$root/t/public/script"
  chmod +x "$root/t/public/script"
  gets narrowDom EACCES run=/t/public/script
  tries wideDom run=/t/public/script
  shows "run=/t/public/script ok"
}

@test "42 executing what is masked as it enters another domain" {
  too_many
  local rules=('-r /t rx')
  domain narrowDom "${calls[@]}" "${rules[@]}" '-d secret openDom exec grant'
  domain wideDom "${calls[@]}" "${rules[@]}"
  boots
  is_masked "mounted so that nothing is executed: /t/secret"
  refuses "EACCES|EPERM" run=/t/secret/program map-executable=/t/secret/program run-by-descriptor=/t/secret/program
  gets narrowDom ok run=/t/public/program list=/t
}

@test "42 exec of a program that the domain which it leads to has a mask over" {
  too_many
  # Where rules cannot be kept to they are not asked beforehand: it is the mask that refuses.
  domain narrowDom "${calls[@]}" '-r /t rx' '-r /t/secret r' '-p connect_port 25 revoke'
  domain wideDom "${calls[@]}" '-r /t rx'
  printf '%s\n' '-d secret narrowDom exec grant' '-d public wideDom exec grant' >>"$policy/domains/hostDom"
  boot_root
  as_machine
  is_masked "mounted so that nothing is executed: /t/secret"
  secpolicy exec --best-effort -- /t/secret/program read=/t/public/file
  exits 126
  [[ -z $output && $stderr == *"cannot execute /t/secret/program in the domain narrowDom: Permission denied"* ]]
  secpolicy exec -- /t/public/program read=/t/public/file
  answers 0 'read=/t/public/file ok'
}

@test "42 a broker starts what is masked for who asks" {
  too_many
  cp "$programs/secpolicy-run" "$root/t/public/ask"
  domain narrowDom "${calls[@]}" '-s sendmsg grant' '-r /t rx' '-d secret secretDom exec grant'
  domain secretDom "${calls[@]}" '-r /t/secret rx'
  boot_root
  as_machine
  is_masked "mounted so that nothing is executed: /t/secret"
  secpolicy run narrowDom -- /t/public/ask --ask -- /t/secret/program read=/t/secret/file read=/t/public/file
  answers 0 'read=/t/secret/file ok' 'read=/t/public/file EACCES'
}

# ---- What others hold

@test "44 the memory of others" {
  domain narrowDom "${calls[@]}" '-s ptrace grant' '-s process_vm_readv grant' '-c cap_sys_ptrace grant'
  boots
  a_victim
  as_machine
  gets openDom ok "trace=$process" "read-memory=$process" "read=/proc/$process/environ" "write=/proc/$process/mem"
  gets narrowDom "EPERM|EACCES" "trace=$process" "read-memory=$process" "read=/proc/$process/environ" "write=/proc/$process/mem"
}

@test "45 rings" {
  domain narrowDom "${calls[@]}" '-s io_uring_setup grant'
  boots
  gets narrowDom EPERM set-up-ring
  gets openDom ok set-up-ring
}

@test "46 a plan that others may have changed" {
  local plan=$BATS_TEST_TMPDIR/plan kind
  start_by() {
    run --separate-stderr "${as[@]}" "$programs/secpolicy-run" --plan "$plan" -- /bin/echo started
  }
  cp "$SOURCE/fuzz/corpus/plan_file/disabled" "$plan"
  chmod 644 "$plan"
  start_by
  answers 0 started
  refuses_plan() {
    start_by
    exits 126 && [[ -z $output && $stderr == "secpolicy-run: "*"plan $plan"* ]]
  }
  chmod 666 "$plan"
  refuses_plan
  mv "$plan" "$plan.own"
  chmod 644 "$plan.own"
  ln -s "$plan.own" "$plan"
  refuses_plan
  for kind in truncated flipped_bit; do
    rm "$plan"
    cp "$SOURCE/fuzz/corpus/plan_file/$kind" "$plan"
    chmod 644 "$plan"
    refuses_plan
  done
  [[ $(id -u) -eq 0 ]] || return 0
  mv -f "$plan.own" "$plan"
  chown 7 "$plan"
  refuses_plan
}

# on_a_machine: from here on the root is a machine's, which root has booted, and $ordinary starts what an
# ordinary user does there.
on_a_machine() {
  only_root
  boots
  as_machine
  plans=$root/run/secpolicy/plans
}

# user_tries DOMAIN OPERATION: what becomes of it when the ordinary user enters the domain.
user_tries() {
  run --separate-stderr on_machine "${ordinary[@]}" /programs/secpolicy run "$1" -- /probe "$2"
}

# no_plan WORDS: nothing was started, by the plan of narrowDom, and WORDS say why.
no_plan() {
  user_tries narrowDom getpgid
  exits 126 && [[ -z $output && $stderr == "secpolicy: run: "*"$1"*". Let root run \"secpolicy load\", which makes "*"; nothing was started" ]] && return
  printf 'not just: %s\n%s\n%s\n' "$1" "$output" "$stderr"
  return 1
}

@test "46 a plan of a domain that another may have made, or of another time" {
  domain narrowDom "${calls[@]}" '-r /t/public r'
  domain wideDom "${calls[@]}" '-r /t r'
  on_a_machine
  local kept=$BATS_TEST_TMPDIR/kept
  cp --archive "$plans" "$kept"
  put_back() {
    rm -rf "$plans"
    cp --archive "$kept" "$plans"
    user_tries narrowDom read=/t/secret/file
    answers 0 "read=/t/secret/file EACCES"
  }
  put_back
  user_tries wideDom read=/t/secret/file
  answers 0 "read=/t/secret/file ok"
  # Of another domain, that of another user, one that others may write, and a link.
  cp "$plans/wideDom" "$plans/narrowDom"
  no_plan "it is of another domain"
  put_back
  chown 7 "$plans/narrowDom"
  no_plan "it belongs to another user"
  put_back
  chmod 666 "$plans/narrowDom"
  no_plan "other users may write it"
  put_back
  mv "$plans/narrowDom" "$plans/narrowDom.aside"
  ln -s narrowDom.aside "$plans/narrowDom"
  no_plan "Too many levels of symbolic links"
  # One that is not whole, and one of which a bit is another.
  put_back
  truncate --size=-1 "$plans/narrowDom"
  no_plan "it is damaged"
  put_back
  printf '\1' | dd of="$plans/narrowDom" bs=1 seek=200 conv=notrunc status=none
  cmp --silent "$plans/narrowDom" "$kept/narrowDom" && return 1
  no_plan "it is damaged"
  # One of before a change.
  put_back
  domain narrowDom "${calls[@]}" '-r /t r'
  secpolicy load
  exits 0
  user_tries narrowDom read=/t/secret/file
  answers 0 "read=/t/secret/file ok"
  cp --archive "$kept/narrowDom" "$plans/narrowDom"
  no_plan "it is of another policy, or for another kernel"
  rm -rf "$plans"
  cp --archive "$kept" "$plans"
  rm "$plans/.current"
  no_plan "There are no plans of the policy as it is in /run/secpolicy/plans"
  # Root does not need any.
  tries narrowDom read=/t/secret/file
  answers 0 "read=/t/secret/file ok"
}

@test "48 the record of another user's process, and of one that is gone" {
  domain narrowDom "${calls[@]}" '-s @clock grant' '-r /t/public r'
  domain wideDom "${calls[@]}"
  on_a_machine
  # worlds: what root is told of who is in which domain.
  worlds() {
    secpolicy status
    exits 0
    sed -n '/^worlds /,/^tardisks /{/^tardisks /d;s/^worlds *[0-9]*//;s/^ *//;/./p}' <<<"$output"
  }
  in_background on_machine "${ordinary[@]}" /programs/secpolicy run narrowDom -- /probe getpgid wait-for=/t/public/go
  until_true '[[ $(<"$told") == "getpgid ok" ]]'
  local users
  users=$(worlds)
  users=${users%% *}
  [[ $(stat --format=%u "/proc/$users") == 65534 && $(worlds) == "$users narrowDom enforcing" ]]
  in_background sleep 60
  local roots=$process
  started() { cut -d ')' -f 2 "/proc/$1/stat" | cut -d ' ' -f 21; }
  # claim PROCESS START: the ordinary user says that it is in wideDom.
  claim() {
    # shellcheck disable=SC2016
    "${ordinary[@]}" sh -c 'cd "$0"/65534.* && printf "%s enforcing wideDom" "$2" >"$1"' "$root/run/secpolicy/worlds" "$@"
  }
  claim "$roots" "$(started "$roots")"
  [[ $(worlds) == "$users narrowDom enforcing" ]]
  # Of a process that had the number before.
  claim "$users" 1
  [[ -z $(worlds) ]]
  # The domain that confines it cannot: there it may not write.
  claim "$users" "$(started "$users")"
  [[ $(worlds) == "$users wideDom enforcing" ]]
  user_tries narrowDom "create=/run/secpolicy/worlds/$users"
  answers 0 "create=/run/secpolicy/worlds/$users EACCES"
  # What root has placed stays there, whatever its user says.
  in_background on_machine /programs/secpolicy run narrowDom -- /probe getpgid wait-for=/t/public/go
  until_true '[[ $(<"$told") == "getpgid ok" ]]'
  kill "$users"
  until_true '[[ $(worlds) != *wideDom* ]]'
  roots=$(worlds)
  roots=${roots%% *}
  claim "$roots" "$(started "$roots")"
  [[ $(worlds) == "$roots narrowDom enforcing" ]]
}

@test "49 a level that changes while a program runs" {
  domain narrowDom "${calls[@]}" '-s @clock grant' '-r /t/public r'
  boot_root
  in_background inside "$programs/secpolicy" --root "$root" run narrowDom -- /probe getpgid wait-for=/t/public/go read=/t/secret/file
  until_true '[[ $(<"$told") == "getpgid ok" ]]'
  secpolicy settings enforcement narrowDom permissive
  secpolicy restore
  exits 0
  touch "$root/t/public/go"
  until_true '[[ $(<"$told") == *read=* ]]'
  [[ $(<"$told") == *"wait-for=/t/public/go ok"$'\n'"read=/t/secret/file EACCES" ]]
  gets narrowDom ok read=/t/secret/file
}

@test "50 what the caller puts into the environment" {
  [[ -z $SANITIZER ]] || skip "the sanitizers' runtime has to be loaded first"
  domain narrowDom "${calls[@]}"
  boot_root
  local library variable
  library=$programs/$(basename "$PRELOADED")
  for variable in LD_PRELOAD LD_AUDIT; do
    run --separate-stderr env "$variable=$library" "$programs/secpolicy" --version
    [[ $stderr == *loaded* ]]
    run --separate-stderr env "$variable=$library" "$programs/secpolicy-run" --version
    exits 0
    [[ $stderr != *loaded* ]]
  done
}

# ---- Paths of rules, and mounts

@test "51 a copy of the mounts" {
  only_root
  local part=('-r /t r' '-r /t/secret' '-c cap_sys_admin grant' '-s open_tree grant')
  domain narrowDom "${calls[@]}" "${part[@]}"
  domain wideDom "${calls[@]}" '-r /t r' '-c cap_sys_admin grant' '-s open_tree grant'
  boots
  gets narrowDom EACCES read-in-clone=/t,secret/file read-in-clone=/t/secret,file read-in-clone=/,t/secret/file
  gets openDom ok read-in-clone=/t,secret/file read-in-clone=/t/secret,file
}

@test "51 a copy of the mounts without the masks" {
  too_many
  local part=('-r /t rw' '-r /t/secret' '-s unshare grant' '-s open_tree grant' '-p clone_flags 0x10020000 grant')
  domain narrowDom "${calls[@]}" "${part[@]}"
  boots
  as_machine
  is_masked "hidden by a mount: /t/secret"
  gets narrowDom EPERM read-in-clone=/t,secret/file read-in-one-mount=/t,secret/file
  # It may copy mounts in a namespace of its own, and the masks with them.
  tries narrowDom unshare-user read-in-clone=/t,secret/file read-in-clone=/t,public/file read-in-one-mount=/t,secret/file
  answers 0 'unshare-user ok' 'read-in-clone=/t,secret/file EACCES' 'read-in-clone=/t,public/file ok' 'read-in-one-mount=/t,secret/file EINVAL'
  tries openDom unshare-user read-in-clone=/t,secret/file read-in-one-mount=/t,secret/file
  answers 0 'unshare-user ok' 'read-in-clone=/t,secret/file ok' 'read-in-one-mount=/t,secret/file ok'
}

@test "53 a directory from before the masks" {
  too_many
  domain narrowDom "${calls[@]}" '-r /t rwx' '-r /t/secret'
  boots
  is_masked "hidden by a mount: /t/secret"
  exec 7<&0 <"$root/t"
  tries narrowDom read=/t/public/file
  exits 126
  [[ $stderr == "secpolicy-run: descriptor 0 is a directory, which leads past the masks of the domain; start the program without it" ]]
  gets openDom ok read=/t/public/file
  exec <&7 7<&-
  gets narrowDom ok read=/t/public/file
}

@test "52 a link in place of a rule's path" {
  domain narrowDom "${calls[@]}" '-r /t/public/directory rw'
  domain wideDom "${calls[@]}" '-r /t rw'
  boot_root
  rmdir "$root/t/public/directory"
  ln -s /t/secret "$root/t/public/directory"
  refuses EACCES read=/t/secret/file read=/t/public/directory/file create=/t/public/directory/new
}
