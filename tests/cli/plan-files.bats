# Ordinary users in domains of a machine's own root, which they enter by the plans that root has made:
# what they get, when the plans are made anew, and what is said where there is none.

load helper
load small_root

setup_file() {
  copy_programs
}

setup() {
  [[ $(id -u) -eq 0 ]] || skip "only root can lay out a machine"
  needs_landlock
  make_root
  chmod 755 "$BATS_TEST_TMPDIR"
  mkdir -p "$root"/{proc,dev,usr,programs,tmp}
  chmod 1777 "$root/tmp"
  ln -s usr/lib usr/lib64 "$root"
  has_places proc dev usr
  boot
  plans=$root/run/secpolicy/plans
}

# by_root WORDS...: the command, as root types it; it ends well.
by_root() {
  secpolicy "$@"
  exits 0
}

# by_user WORDS...: the same of an ordinary user.
by_user() {
  run --separate-stderr on_machine "${ordinary[@]}" /programs/secpolicy "$@"
}

# by_user_in DOMAIN WORDS: what the shell of the example makes of WORDS in the domain, for that user.
by_user_in() {
  by_user run "$1" -- /bin/sh -c "$2"
}

# not_started WORDS: nothing was, and the only line says why.
not_started() {
  exits 126 && [[ -z $output && $stderr == "secpolicy: run: $1; nothing was started" ]] && return
  printf 'not just: %s\nbut:\n%s\n%s\n' "$1" "$output" "$stderr"
  return 1
}

# shellcheck disable=SC2016
by_load='There are no plans of the policy as it is in /run/secpolicy/plans. Let root run "secpolicy load", which makes them'

@test "after a boot an ordinary user runs domains, with the rights of their rules" {
  by_user_in monitorDom 'cat /opt/monitor/etc/agent.conf'
  exits 0
  [[ -n $output && -z $stderr ]]
  by_user_in monitorDom 'cat /var/lib/vms/demo/disk'
  exits 1
  [[ $stderr == *"/var/lib/vms/demo/disk': Permission denied"* ]]
  by_user run "$(domain_id monitorDom)" -- /bin/sh -c 'echo started'
  answers 0 started
  by_user run 4711 -- /bin/sh
  exits 126
  [[ $stderr == "secpolicy: run: there is no domain '4711'; there are "* ]]
  # As the user that it is.
  chmod 600 "$root/opt/monitor/etc/agent.conf"
  by_user_in monitorDom 'cat /opt/monitor/etc/agent.conf'
  exits 1
  by_root run monitorDom -- /bin/sh -c 'cat /opt/monitor/etc/agent.conf'
}

@test "who may not read the state cannot read it, nor the label index" {
  [[ $(stat --format=%a "$root/run/secpolicy") == 711 ]]
  local file
  for file in host.db labels.index; do
    [[ $(stat --format=%a "$root/run/secpolicy/$file") == 600 ]]
  done
  [[ $(stat --format='%a %U' "$plans" "$plans/monitorDom") == $'755 root\n644 root' ]]
}

@test "a rule about what this user cannot reach takes nothing from the others" {
  mkdir -m 700 "$root/locked"
  mkdir "$root/locked/in" "$root/goes"
  printf '%s\n' '-r /locked/in r' '-r /goes r' >>"$policy/domains/monitorDom"
  by_root load
  rmdir "$root/goes"
  by_user_in monitorDom 'cat /opt/monitor/etc/agent.conf'
  exits 0
}

@test "what changes the policy makes the plans anew" {
  local words=(-- /bin/sh -c 'cat /etc/services.conf')
  by_user run monitorDom "${words[@]}"
  exits 1
  by_root label set monitorConfig /etc/services.conf
  by_user run monitorDom "${words[@]}"
  exits 0
  by_root label relabel /etc/services.conf
  by_user run monitorDom "${words[@]}"
  exits 1
  by_root save before
  echo '-r /etc/services.conf r' >>"$policy/domains/monitorDom"
  by_root load
  by_user run monitorDom "${words[@]}"
  exits 0
  by_root rollback before
  by_user run monitorDom "${words[@]}"
  exits 1
  by_root load-early
  by_user run monitorDom "${words[@]}"
  exits 1
  [[ $stderr == *"Permission denied"* ]]
}

@test "a change that nobody has made plans of is not passed over" {
  by_user_in monitorDom 'echo started'
  answers 0 started
  # As a service does it, whatever it is.
  SECPOLICY_HOST_STATE=$root/run/secpolicy/host.db "$RUNTIME_EXAMPLE" >/dev/null 2>&1 || true
  [[ ! -e $plans/.current ]]
  by_user_in monitorDom 'echo started'
  not_started "$by_load"
  by_root run monitorDom -- /bin/sh -c 'echo started'
  [[ $output == started ]]
  by_user_in monitorDom 'echo started'
  not_started "$by_load"
  by_root load
  by_user_in monitorDom 'echo started'
  answers 0 started
}

@test "a domain that there is not, or that this kernel cannot keep to" {
  local advice="Let root run \"secpolicy features --for"
  by_user_in nowhereDom true
  not_started "There is no plan of a domain 'nowhereDom'. $advice nowhereDom\", which tells whether there is such a domain and what of its rules this kernel cannot keep to"
  echo '-p connect_port 25 revoke' >"$policy/domains/appDom"
  by_root load
  by_user_in appDom true
  not_started "There is no plan of a domain 'appDom'. $advice appDom\", which tells whether there is such a domain and what of its rules this kernel cannot keep to"
  by_user run appDom --best-effort -- /bin/sh -c true
  exits 126
  printf '%s\n' '-s @file grant' '-r / rx' >"$policy/domains/appDom"
  by_root load
  [[ -f $plans/appDom ]]
  by_user_in appDom true
  exits 126
  [[ $stderr == "secpolicy-run: no program can end in the domain appDom, "* ]]
  rm "$policy/domains/appDom"
}

@test "a host that nobody has booted" {
  rm -r "$root/run/secpolicy"
  by_user run monitorDom -- /bin/sh -c true
  exits 126
  [[ -z $output && $stderr == *"run 'secpolicy boot' first"* ]]
}

@test "levels are those of the plans: permissive tells, disabled only records" {
  local words=(-- /bin/sh -c 'cat /var/lib/vms/demo/disk')
  by_root settings enforcement monitorDom permissive
  by_user run monitorDom "${words[@]}"
  exits 1
  by_root restore
  by_user run monitorDom "${words[@]}"
  exits 0
  says "secpolicy: run: monitorDom would be refused: read /var/lib/vms/demo/disk"
  by_root settings enforcement monitorDom disabled
  by_root restore
  by_user run monitorDom "${words[@]}"
  exits 0
  [[ -n $output && -z $stderr ]]
  [[ -z $(ls "$root/tmp") ]]
}

# copies: the copies of the state that users have beside their records.
copies() {
  find "$root/run/secpolicy/worlds" -mindepth 2 -type d
}

@test "the copy of the state of who was killed goes with the next entry, and that of who runs stays" {
  by_root settings enforcement monitorDom permissive
  by_root restore
  # shellcheck disable=SC2016
  by_user_in monitorDom 'kill -9 $PPID'
  exits 137
  [[ $(copies | wc -l) -eq 1 ]]
  local killed
  killed=$(copies)
  # shellcheck disable=SC2016
  on_machine "${ordinary[@]}" /programs/secpolicy run monitorDom -- \
    /bin/sh -c 'echo $$ >/tmp/started; exec sleep 60' 2>/dev/null 3>&- &
  until_true '[[ -s $root/tmp/started ]]'
  [[ ! -e $killed && $(copies | wc -l) -eq 1 ]]
  by_user_in monitorDom 'echo started'
  exits 0
  [[ $(copies | wc -l) -eq 1 ]]
  kill "$(<"$root/tmp/started")"
  wait
  [[ -z $(copies) ]]
}

@test "exec of an ordinary user enters the domain that the label leads to" {
  mkdir "$root/srv"
  printf '%s\n' '#!/bin/sh' 'cat /opt/monitor/etc/agent.conf' >"$root/srv/look"
  chmod 755 "$root/srv/look"
  echo '-a filterProgram read grant' >>"$policy/domains/ioFilterDom"
  by_root load
  by_root label set filterProgram /srv/look
  # What is judged lies nowhere where domains may be granted to write as a matter of course.
  chmod 755 "$root/tmp"
  by_user exec -- /srv/look
  exits 1
  [[ $stderr == *"/opt/monitor/etc/agent.conf': Permission denied"* ]]
  [[ $(find "$root/run/secpolicy/worlds" -mindepth 2 -type d) == "" ]]
}

# looks_by_broker: monitorDom may ask for /srv/look, which looks at files in ioFilterDom and, if it is
# told to, for someone.
looks_by_broker() {
  mkdir "$root/srv"
  printf '%s\n' '#!/bin/sh' 'cat /opt/monitor/etc/agent.conf' 'cat /var/lib/vms/demo/disk && echo disk' \
    '[ -z "$1" ] || { echo $$; exec sleep "$1"; }' >"$root/srv/look"
  chmod 755 "$root/srv/look"
  printf '%s\n' '-s sendmsg grant' '-s pipe2 grant' '-r /programs rx' '-r /tmp rw' \
    '-d filterProgram ioFilterDom exec grant' >>"$policy/domains/monitorDom"
  printf '%s\n' '-a filterProgram read grant' '-s @clock grant' >>"$policy/domains/ioFilterDom"
  by_root load
  by_root label set filterProgram /srv/look
}

@test "from within a domain an ordinary user enters another by the broker" {
  looks_by_broker
  by_user_in monitorDom 'cat /opt/monitor/etc/agent.conf && echo agent; cat /var/lib/vms/demo/disk'
  exits 1
  [[ $output == *agent ]]
  by_user_in monitorDom '/programs/secpolicy-run --ask -- /srv/look'
  exits 0
  [[ $output == *disk && $stderr == *"/opt/monitor/etc/agent.conf': Permission denied"* ]]
  by_user_in monitorDom '/srv/look'
  exits 126
  by_user_in monitorDom '/programs/secpolicy-run --ask -- /opt/monitor/bin/agent'
  exits 126
  [[ -z $output && $stderr == *"no rule leads from monitorDom to another domain by /opt/monitor/bin/agent"* ]]
  # Whom the broker has started has a domain for others to see, and is the user's.
  # shellcheck disable=SC2016
  run --separate-stderr on_machine /bin/sh -c '
    "$@" /programs/secpolicy run monitorDom -- /bin/sh -c "exec /programs/secpolicy-run --ask -- /srv/look 60" >/tmp/look &
    waited=0
    while [ "$(/usr/bin/wc -l </tmp/look)" != 2 ] && [ $((waited += 1)) -lt 100 ]; do sleep 0.1; done
    /programs/secpolicy status
    kill $!' - "${ordinary[@]}"
  exits 0
  shows "             $(tail -n 1 "$root/tmp/look") ioFilterDom enforcing"
}

@test "a broker of an ordinary user asks the plans as they are by then" {
  looks_by_broker
  # asks_again: what becomes of it when it asks once more.
  asks_again() {
    local turn=$1
    touch "$root/tmp/go$turn"
    until_true '[[ -s $root/tmp/end'"$turn"' ]]'
    output=$(<"$root/tmp/out$turn")
  }
  # shellcheck disable=SC2016
  by_user_in monitorDom '
    for turn in 1 2 3 4; do
      waited=0
      while [ ! -e /tmp/go$turn ] && [ $((waited += 1)) -lt 100 ]; do sleep 0.1; done
      /programs/secpolicy-run --ask -- /srv/look >/tmp/out$turn 2>&1
      echo $? >/tmp/end$turn
    done' 3>&- &
  asks_again 1
  [[ $output == *disk ]]
  SECPOLICY_HOST_STATE=$root/run/secpolicy/host.db "$RUNTIME_EXAMPLE" >/dev/null 2>&1 || true
  [[ ! -e $plans/.current ]]
  asks_again 2
  [[ $output == "secpolicy: exec: $by_load; nothing was started" ]]
  sed -i '/^-a vmDisk *read/d' "$policy/domains/ioFilterDom"
  by_root load
  asks_again 3
  [[ $output != *disk && $output == *"/var/lib/vms/demo/disk': Permission denied" ]]
  echo '-p connect_port 25 revoke' >>"$policy/domains/ioFilterDom"
  by_root load
  asks_again 4
  [[ $output == "secpolicy: exec: There is no plan of a domain 'ioFilterDom'. "*"; nothing was started" ]]
  wait
}

@test "root sees who runs in which domain, and at which level" {
  # shellcheck disable=SC2016
  run --separate-stderr on_machine /bin/sh -c '
    /usr/bin/setpriv --reuid 65534 --regid 65534 --clear-groups /programs/secpolicy run monitorDom -- \
      /bin/sh -c "echo \$\$; exec sleep 60" >/tmp/world 2>&1 &
    for turn in 1 2 3 4 5 6 7 8 9 10; do [ -s /tmp/world ] || sleep 1; done
    /programs/secpolicy status
    /programs/secpolicy settings enforcement monitorDom permissive
    /programs/secpolicy restore
    kill $!'
  exits 0
  shows "             $(<"$root/tmp/world") monitorDom enforcing"
  says "still at the level of the entry: 1 world; 'secpolicy status' lists each, and a new start takes the new level"
}
