# secpolicy observe, and run of permissive domains: what a program was seen to do becomes a policy by
# which it runs, and what rules would refuse is told and not refused.

load helper
load small_root

setup() {
  needs_landlock
  make_root
}

# A service that the example has no rules for: it keeps a journal and reads its settings.
make_service() {
  mkdir -p "$root/opt/journal/bin" "$root/srv/journal"
  for name in mkdir rm mv; do ln -s busybox "$root/bin/$name"; done
  echo 'lines=3' >"$root/opt/journal/settings"
  cat >"$root/opt/journal/bin/journal" <<'SCRIPT'
#!/bin/sh
. /opt/journal/settings
mkdir -p /srv/journal/old
for line in $(cat /etc/services.conf | cut -d ' ' -f 1); do echo "$line" >>/srv/journal/new; done
mv /srv/journal/new "/srv/journal/old/$lines"
[ -z "$1" ] || cat "$1"
SCRIPT
  chmod +x "$root/opt/journal/bin/journal"
}

domain=/etc/zorvan/secpolicy/domains/journalDom

secpolicy_in_time() {
  run --separate-stderr timeout 60 "$SECPOLICY" --root "$root" "$@"
}

# The steps of docs/confine-a-service.md.
@test "from nothing to enforcing" {
  boot
  make_service
  secpolicy_in_time observe --write "$domain" -- /opt/journal/bin/journal
  exits 0
  [[ -z $output && $stderr == "secpolicy: observe: "*" lines proposed in $root$domain" ]]
  [[ $(head -n 1 "$root$domain") == "# Proposed from one run of /opt/journal/bin/journal" ]]
  grep -qx -- '-s @start grant   # what every program needs to start' "$root$domain"
  grep -qx -- '-a hostConfig read grant   # 1 file, first /etc/services.conf' "$root$domain"
  grep -qx -- '-r /opt/journal/settings r   # first by /bin/busybox' "$root$domain"
  grep -qx -- '-r /srv/journal w   # first by /bin/busybox' "$root$domain"

  # Nothing leads into it yet.
  echo '-d journalProgram journalDom exec grant' >>"$policy/domains/hostDom"
  echo journalProgram >"$policy/objects/journal"
  echo '/opt/journal/bin/journal journalProgram' >"$policy/fileLabels/journal"
  secpolicy check --werror
  exits 0
  secpolicy load
  exits 0

  # The program has a label now, and the domain has no rule for it.
  secpolicy settings enforcement journalDom permissive
  secpolicy restore
  rm -r "$root/srv/journal/old"
  secpolicy_in_time exec -- /opt/journal/bin/journal /etc/ssh/host_key
  exits 0
  [[ $output == "not a real key"* ]]
  [[ $stderr == "secpolicy: exec: journalDom would be refused: read /etc/ssh/host_key" ]]

  secpolicy settings enforcement journalDom enforcing
  secpolicy restore
  rm -r "$root/srv/journal/old"
  secpolicy_in_time exec -- /opt/journal/bin/journal
  exits 0
  grep -q sshd "$root/srv/journal/old/3"
  secpolicy_in_time exec -- /opt/journal/bin/journal /etc/ssh/host_key
  exits 1
  [[ -z $output && $stderr == *"/etc/ssh/host_key': Permission denied"* ]]
}

@test "what an installed domain is granted is left out" {
  boot
  secpolicy_in_time observe monitorDom -- /bin/sh -c 'cat /opt/monitor/etc/agent.conf /var/lib/vms/demo/disk'
  exits 0
  [[ ${output##*$'\n'} == "-a vmDisk read grant   # 1 file, first /var/lib/vms/demo/disk" ]]
  [[ $(grep -c '^-' <<<"$output") -eq 1 ]]
  secpolicy_in_time observe "$(domain_id monitorDom)" -- /bin/sh -c 'cat /opt/monitor/etc/agent.conf'
  exits 0
  ! grep -q '^-' <<<"$output" || return
  secpolicy observe monitordom -- /bin/sh
  wrong_usage observe "observe: there is no domain 'monitordom'; did you mean 'monitorDom'?"
}

@test "what stands before -- is a domain, and what stands behind it a program" {
  boot
  secpolicy_in_time observe -- sh -c 'exit 3' --
  exits 3
  [[ ${output%%$'\n'*} == "# Proposed from one run of sh -c exit 3 --" ]]
  secpolicy observe monitorDom
  wrong_usage observe "observe: CMD is required, behind --"
  secpolicy observe
  wrong_usage observe "observe: CMD is required, behind --"
}

@test "a root that was not booted, and one of another user" {
  secpolicy observe -- /bin/sh
  exits 126
  ends_with "secpolicy: observe: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
  [[ $(id -u) -eq 0 ]] || skip "only root can become another user"
  boot
  copy_programs
  chmod 755 "$BATS_TEST_TMPDIR" "$root"
  local user="This root is another user's: run it as that user, or as root."
  run --separate-stderr "${ordinary[@]}" "$programs/secpolicy" --root "$root" observe -- /bin/sh
  exits 126
  [[ $stderr == "secpolicy: observe: Unable to use the host state "*". $user" ]]
  run --separate-stderr "${ordinary[@]}" "$programs/secpolicy" --root "$root" run monitorDom -- /bin/sh
  exits 126
  [[ $stderr == "secpolicy: run: "*"; nothing was started. $user" ]]
  run --separate-stderr "${ordinary[@]}" "$programs/secpolicy" --root "$root" features
  shows "mounts of one's own: in a user namespace"
}

@test "ports and what binds them" {
  boot
  secpolicy_in_time observe -- /bin/sh -c 'nc 127.0.0.1 9 || true'
  exits 0
  shows "-p socket_family 2 grant   # 1 time, first by /bin/busybox"
  shows "-p connect_port 9 grant   # 1 time, first by /bin/busybox"
  mkdir "$root/dev" && : >"$root/dev/null"
  local port=$((20000 + BASHPID % 20000))
  # One that is told of the other's end before it has read what to send sends nothing.
  secpolicy_in_time observe -- /bin/sh -c "until [ -s /out ]; do
    nc -l -p $port >/out & until echo hello | nc 127.0.0.1 $port; do sleep 0.1; done; wait
  done"
  exits 0
  [[ $(<"$root/out") == hello ]]
  grep -qE -- "^-p bind_port $port grant   # [0-9]+ times?, first by /bin/busybox$" <<<"$output"
  grep -qE -- "^-p bind_port 0 grant   # [0-9]+ times?, first by /bin/busybox$" <<<"$output"
}

@test "the exit status is that of the program" {
  boot
  secpolicy_in_time observe -- /bin/sh -c 'exit 5'
  exits 5
  secpolicy_in_time observe -- /bin/sh -c 'kill -9 $$'
  exits 137
  run -127 --separate-stderr "$SECPOLICY" --root "$root" observe -- /nowhere/program
  says "secpolicy: observe: cannot start /nowhere/program: No such file or directory"
  secpolicy observe -- /etc/services.conf
  exits 126
  says "secpolicy: observe: cannot start /etc/services.conf: Permission denied"
}

@test "what cannot be started is proposed nothing" {
  boot
  run -127 --separate-stderr "$SECPOLICY" --root "$root" observe -- nothing
  [[ -z $output && $stderr == "secpolicy: observe: cannot start nothing: No such file or directory" ]]
  secpolicy observe --write "$domain" -- /etc/services.conf
  exits 126
  [[ $stderr == "secpolicy: observe: cannot start /etc/services.conf: Permission denied" && ! -e $root$domain ]]
  run -127 --separate-stderr "$SECPOLICY" --root "$root" observe --write "$domain" -- nothing
  [[ $stderr == "secpolicy: observe: cannot start nothing: No such file or directory" && ! -e $root$domain ]]
}

@test "a proposal never takes the place of a file" {
  boot
  secpolicy observe --write /etc/zorvan/secpolicy/domains/sshDom -- /bin/sh -c 'echo started'
  exits 126
  [[ -z $output && $stderr == "secpolicy: observe: $policy/domains/sshDom is there already, and stays as it is: name a new file, or leave --write out and copy the lines that are printed" ]]
  cmp "$policy/domains/sshDom" "$SOURCE/examples/host/etc/zorvan/secpolicy/domains/sshDom"
}

@test "a permissive domain is told once of all that it would be refused" {
  boot
  secpolicy settings enforcement monitorDom permissive
  secpolicy restore
  secpolicy_in_time run monitorDom -- /bin/sh -c 'for i in 1 2 3; do cat /var/lib/vms/demo/disk; done; nc 127.0.0.1 9; exit 4'
  exits 4
  [[ $(grep -c 'would be refused: read /var/lib/vms/demo/disk$' <<<"$stderr") -eq 1 ]]
  says "secpolicy: run: monitorDom would be refused: pass connect_port 9"
  [[ $(grep -c 'block of a disk' <<<"$output") -eq 3 ]]
  grep -q 'monitorDom would be refused: pass connect_port 9$' "$root/run/secpolicy/kernel.log"
}

@test "a permissive domain is told of nothing that it is granted" {
  boot
  secpolicy settings enforcement monitorDom permissive
  secpolicy restore
  secpolicy_in_time run monitorDom -- /opt/monitor/bin/agent
  exits 0
  [[ -z $stderr && $(<"$root/opt/monitor/spool/machines") == demo ]]
}

@test "a disabled domain is only recorded" {
  boot
  secpolicy settings enforcement monitorDom disabled
  secpolicy restore
  secpolicy_in_time run monitorDom -- /bin/sh -c 'cat /var/lib/vms/demo/disk'
  exits 0
  [[ -z $stderr && $output == *"block of a disk" ]]
}

@test "when the supervisor of a permissive domain is killed, nothing more can be done there" {
  boot
  secpolicy settings enforcement monitorDom permissive
  secpolicy restore
  "$SECPOLICY" --root "$root" run monitorDom -- /bin/sh -c \
    'cat /var/lib/vms/demo/disk >/seen; echo $$ >/pid; while [ ! -e /go ]; do :; done; read -r line </etc/ssh/host_key; echo "$line" >/after' \
    3>&- 2>/dev/null &
  local supervisor=$!
  until_true "[[ -s $root/pid ]]"
  # It could read what its rules refuse, as long as somebody told of it.
  grep -q 'block of a disk' "$root/seen"
  kill -9 "$supervisor"
  wait "$supervisor" || true
  touch "$root/go"
  until_true "[[ ! -d /proc/$(<"$root/pid") ]]"
  [[ ! -e $root/after ]]
}

@test "when the supervisor is killed, noticed calls end with ENOSYS" {
  boot
  "$SECPOLICY" --root "$root" observe -- /bin/sh -c \
    'echo $$ >/pid; while [ ! -e /go ]; do :; done; echo made >/after' 3>&- 2>/dev/null &
  local supervisor=$!
  until_true "[[ -s $root/pid ]]"
  kill -9 "$supervisor"
  wait "$supervisor" || true
  touch "$root/go"
  until_true "[[ ! -d /proc/$(<"$root/pid") ]]"
  [[ ! -e $root/after ]]
}
