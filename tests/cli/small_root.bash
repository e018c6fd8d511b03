# Small roots for programs that are confined, and who works there; a test file loads helper first.

# An ordinary user, for root to become.
ordinary=(/usr/bin/setpriv --reuid 65534 --regid 65534 --clear-groups)

# copy_programs FILE...: the command, its launcher and these files are in $programs, where anybody can
# reach them.
copy_programs() {
  export programs=$BATS_FILE_TMPDIR/bin
  chmod 755 "$BATS_RUN_TMPDIR" "$BATS_FILE_TMPDIR"
  mkdir "$programs" "$BATS_FILE_TMPDIR/lib"
  cp "$SECPOLICY" "$(dirname "$SECPOLICY")/secpolicy-run" "$@" "$programs"
  # Which boot unpacks tardisks with.
  cp -P "$BUILD_DIR"/lib/libsecpolicyhost-archive.so.* "$BATS_FILE_TMPDIR/lib"
}

# works_as USER: from here on programs are those of this user, or of whoever runs the tests where it is
# empty; the array $as makes them so.
works_as() {
  user=$1
  as=()
  [[ -z $user ]] && return
  [[ $(id -u) -eq 0 ]] || skip "only root can become another user"
  as=("${ordinary[@]//65534/$user}")
}

# lay_out_root DIRECTORY...: a root with these, and with the domains that every policy has.
lay_out_root() {
  local name
  root=$BATS_TEST_TMPDIR/root
  policy=$root/etc/zorvan/secpolicy
  mkdir -p "$policy"/{objects,domains/plugins,fileLabels,early/domains} "$root/tardisks" "${@/#/$root/}"
  chmod 755 "$BATS_TEST_TMPDIR"
  for name in globalVMDom ioFilterDom appDom daemonFrameworkDom; do : >"$policy/domains/$name"; done
  echo '-s @start grant' >"$policy/domains/hostDom"
}

# has_places PLACE...: for who works in it, the root has these directories of this machine, without their
# leading slashes.
has_places() { places=("$@"); }

# comes_after COMMAND...: this starts all that works in the root.
comes_after() { before=("$@"); }

# lay_out_two_places: /t/public and /t/secret, each with a file, a program and its own label.
lay_out_two_places() {
  local place
  for place in public secret; do
    mkdir -p "$root/t/$place"
    echo content >"$root/t/$place/file"
    cp "$PROBE" "$root/t/$place/program"
  done
  cp "$PROBE" "$root/probe"
  printf '%s\n' public secret >"$policy/objects/all"
  printf '/t/%s/* %s\n' public public secret secret >"$policy/fileLabels/all"
}

# boot_root: boots the root, all of which is whose programs work there.
boot_root() {
  [[ -z $user ]] || chown -R "$user:$user" "$root"
  secpolicy boot
  exits 0
}

# refuses_nothing DOMAIN: so that what else may fail is seen there.
refuses_nothing() {
  secpolicy settings enforcement "$1" disabled
  exits 0
  secpolicy restore
  exits 0
}

# inside COMMAND...: where $root is a mount point.
inside() {
  among_mounts : "$@"
}

# on_machine COMMAND...: where $root is that of a machine, with $programs in /programs.
on_machine() {
  # shellcheck disable=SC2016
  among_mounts 'mount --bind "$programs" "$0/programs"; cd "$0"; pivot_root . .; umount -l .' "$@"
}

# among_mounts SCRIPT COMMAND...: after SCRIPT, which is in a mount namespace of its own as COMMAND is.
# What root could label in /usr cannot be written there.
among_mounts() {
  local place script='mount --rbind "$0" "$0"' namespace=(unshare --mount)
  [[ $(id -u) -eq 0 ]] || namespace+=(--map-current-user --keep-caps)
  for place in "${places[@]}"; do
    script+="; mount --rbind /$place \"\$0/$place\""
    [[ $place != usr || $(id -u) -ne 0 ]] || script+='; mount -o remount,bind,ro "$0/usr"'
  done
  "${before[@]}" "${namespace[@]}" sh -ec "$script; $1; exec \"\$@\"" "$root" "${as[@]}" "${@:2}"
}
