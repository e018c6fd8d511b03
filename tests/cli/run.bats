# secpolicy run, exec and features: programs of the example in their domains, what they get and what
# they do not, and what is said before anything starts.

load helper

setup() {
  needs_landlock
  make_root
}

# in_domain DOMAIN WORDS: what the shell of the example makes of WORDS in the domain.
in_domain() {
  secpolicy run "$1" -- /bin/sh -c "$2"
}

# not_confined VERB: the latest command started nothing, and its last line says so.
not_confined() {
  exits 126 || return
  [[ -z $output && $stderr == *"secpolicy: $1: "*"nothing was started"* ]]
}

@test "a program of the example does its work in its domain" {
  boot
  secpolicy run monitorDom -- /opt/monitor/bin/agent
  exits 0
  [[ $(<"$root/opt/monitor/spool/machines") == demo ]]
  run --separate-stderr "$SECPOLICY" --root "$root" run ioFilterDom -- /usr/lib/io-filters/cache <<<"blocks"
  exits 0
  [[ $output == blocks && $(<"$root/var/cache/io-filters/blocks") == blocks ]]
  secpolicy run globalVMDom -- /usr/bin/vm-run /var/lib/vms/demo/settings
  exits 0
  [[ $output == "running demo with 512 MiB from /var/lib/vms/demo/disk" ]]
}

@test "what why refuses fails, and what it grants works" {
  boot
  in_domain monitorDom 'cat /opt/monitor/etc/agent.conf'
  exits 0
  in_domain monitorDom 'cat /var/lib/vms/demo/disk'
  exits 1
  [[ $stderr == *"/var/lib/vms/demo/disk': Permission denied"* ]]
  in_domain monitorDom 'ls /var/lib/vms'
  exits 0
  in_domain monitorDom 'echo spoilt >/opt/monitor/bin/agent'
  exits 1
  grep -q '^while' "$root/opt/monitor/bin/agent"
  in_domain globalVMDom 'cat /var/lib/vms/demo/disk >/dev/null; echo more >>/var/lib/vms/demo/disk'
  [[ $(tail -n 1 "$root/var/lib/vms/demo/disk") == more ]]
}

@test "the children of a confined program are confined" {
  boot
  in_domain monitorDom '(cat /var/lib/vms/demo/disk) || sh -c "exec cat /var/lib/vms/demo/disk"'
  exits 1
  [[ -z $output ]]
}

@test "the exit status is that of the program" {
  boot
  in_domain monitorDom 'exit 5'
  exits 5
  secpolicy run monitorDom -- /bin/cat /nowhere
  exits 1
}

@test "a program that is not there, and one that the domain may not execute" {
  boot
  run -127 --separate-stderr "$SECPOLICY" --root "$root" run monitorDom -- /nowhere/program
  [[ $stderr == *"/nowhere/program"* ]]
  secpolicy run monitorDom -- /usr/sbin/sshd
  not_confined run
  [[ $stderr == "secpolicy: run: monitorDom may not execute /usr/sbin/sshd: '-r /usr/sbin/sshd rx' is missing in $policy/domains/monitorDom; nothing was started" ]]
  # Of what is no program, no rule is missing.
  secpolicy run monitorDom -- /etc/services.conf
  exits 126
  [[ $stderr == "secpolicy-run: cannot execute /etc/services.conf: it is not executable; 'chmod +x' makes it so" ]]
}

# grant_app LINE...: these are the rules of appDom.
grant_app() {
  printf '%s\n' "$@" >"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
}

@test "what a program is executed by has to be allowed as well" {
  boot
  printf '#!/bin/sh\n' >"$root/script"
  cp /bin/true "$root/true"
  chmod +x "$root/script"
  grant_app '-s @start grant' '-s @io grant' '-r /script rx' '-r /bin r' '-r /true rx'
  secpolicy run appDom -- /script
  not_confined run
  [[ $stderr == *": appDom may not execute /bin/busybox, the interpreter of /script: $policy/domains/appDom:4: -r /bin r; '-r /bin rx' in its place would let it; "* ]]
  local loader
  loader=$(readelf -lW "$root/true" | sed -n 's/.*interpreter: \(.*\)\]/\1/p')
  mkdir -p "$root${loader%/*}"
  cp "$loader" "$root$loader"
  secpolicy run appDom -- /true
  not_confined run
  [[ $stderr == *": appDom may not execute $(readlink -f "$root$loader" | sed "s|^$root||"), the loader of /true: "* ]]
  # What is given up for is not asked about.
  without_landlock "$SECPOLICY" --root "$root" run appDom --best-effort -- /script
  exits 0
}

@test "a program whose label leads elsewhere is not started where it leads away from" {
  boot
  grant_app '-s @start grant' '-r / rx' '-d sshProgram sshDom exec grant'
  secpolicy run appDom -- /usr/sbin/sshd
  not_confined run
  [[ $stderr == *": appDom may not execute /usr/sbin/sshd itself: its label sshProgram leads to sshDom, where 'secpolicy --root $root run sshDom -- /usr/sbin/sshd' starts it; "* ]]
}

@test "where nothing can start, what is missing is told and nothing is started" {
  boot
  cp /bin/true "$root/true"
  grant_app '-s @file grant' '-s @io grant' '-r / rx'
  secpolicy run appDom -- /bin/sh -c 'echo started'
  exits 126
  [[ -z $output && $stderr == "secpolicy-run: no program can end in the domain appDom, which may call neither exit nor exit_group; '-s @start grant' grants both where no rule revokes them" ]]
  secpolicy run appDom --best-effort -- /bin/sh
  exits 126
  grant_app '-s @start grant' '-s mmap revoke' '-r / rx'
  secpolicy run appDom -- /true
  exits 126
  [[ $stderr == "secpolicy-run: /true cannot start in the domain appDom, as its loader "*" needs mmap, which the domain may not call; '-s @start grant' grants it where no rule revokes it" ]]
  printf '#!/true\n' >"$root/script"
  chmod +x "$root/script"
  secpolicy run appDom -- /script
  exits 126
  [[ $stderr == "secpolicy-run: /script cannot start in the domain appDom, as its loader "*" needs mmap, "* ]]
  # What is linked statically starts without.
  secpolicy run appDom -- /bin/sh -c 'echo started'
  answers 0 started
  grant_app '-s @file grant'
  secpolicy settings enforcement appDom permissive
  secpolicy restore
  secpolicy run appDom -- /bin/sh -c 'echo started'
  exits 0
  [[ $output == started ]]
}

@test "what fails when all is taken away is told as well" {
  boot
  echo text >"$root/text"
  chmod +x "$root/text"
  grant_app '-s exit grant' '-r / rx'
  secpolicy run appDom -- /text
  exits 126
  [[ -z $output && $stderr == "secpolicy-run: cannot execute /text in the domain appDom: Exec format error" ]]
}

@test "a domain that there is not, and no program" {
  boot
  secpolicy run monitordom -- /bin/sh
  not_confined run
  [[ $stderr == "secpolicy: run: there is no domain 'monitordom'; did you mean 'monitorDom'?; nothing was started" ]]
  secpolicy run monitorDom
  wrong_usage run "run: CMD is required, behind --"
}

@test "without a state nothing is started" {
  secpolicy run monitorDom -- /bin/sh
  exits 126
  [[ -z $output && $stderr == *"run 'secpolicy --root $root boot' first"* ]]
  secpolicy exec -- /bin/sh
  exits 126
  [[ -z $output && $stderr == *"run 'secpolicy --root $root boot' first"* ]]
}

@test "a permissive domain refuses nothing" {
  boot
  secpolicy settings enforcement monitorDom permissive
  secpolicy restore
  in_domain monitorDom 'cat /var/lib/vms/demo/disk'
  exits 0
}

@test "what this kernel cannot refuse stops the entry, with file and line, unless it is given up" {
  boot
  echo "-p connect_port 25 revoke" >>"$policy/domains/appDom"
  printf '%s\n' '-s @process grant' '-r /bin rx' >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  sed -i '/connect_port  1024/d' "$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy run appDom -- /bin/sh -c 'echo started'
  not_confined run
  [[ $stderr == "notExpressible: $policy/domains/appDom:"*": -p connect_port 25 revoke (Landlock is told each port"* ]]
  secpolicy run appDom --best-effort -- /bin/sh -c 'echo started'
  exits 0
  [[ $output == started && $stderr == "notExpressible: "* ]]
}

# without_landlock WORD...: what the kernel says to the command if it has no Landlock.
without_landlock() {
  run --separate-stderr python3 - "$@" <<'END'
import ctypes, os, struct, sys

class Program(ctypes.Structure):
    _fields_ = [("length", ctypes.c_ushort), ("instructions", ctypes.c_char_p)]

LANDLOCK_CREATE_RULESET, ENOSYS = 444, 38
filter = b"".join(struct.pack("HBBI", *instruction) for instruction in [
    (0x20, 0, 0, 0), (0x15, 0, 1, LANDLOCK_CREATE_RULESET), (0x06, 0, 0, 0x50000 | ENOSYS),
    (0x06, 0, 0, 0x7fff0000)])
PR_SET_SECCOMP, PR_SET_NO_NEW_PRIVS = 22, 38
prctl = ctypes.CDLL(None).prctl
assert prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0
assert prctl(PR_SET_SECCOMP, 2, ctypes.byref(Program(4, filter))) == 0
os.execv(sys.argv[1], sys.argv[1:])
END
}

@test "a kernel without Landlock confines no domain, also one that has no rule about files" {
  boot
  printf '%s\n' '-s @start grant' '-s @file grant' '-s @io grant' >"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  without_landlock "$SECPOLICY" --root "$root" run appDom -- /bin/cat /etc/services.conf
  not_confined run
  says "notExpressible: files and calls beyond the rules (this kernel's Landlock cannot refuse what no rule grants (version 3 or newer can))"
  without_landlock "$SECPOLICY" --root "$root" features --for appDom
  exits 1
  without_landlock "$SECPOLICY" --root "$root" run appDom --best-effort -- /bin/cat /etc/services.conf
  exits 0
  [[ $output == *sshd* ]]
}

@test "exec enters the domain that the label leads to" {
  boot
  secpolicy exec -- /usr/lib/io-filters/cache </dev/null
  exits 0
  # In hostDom, which is permissive, it could have written anywhere.
  echo 'echo spoilt >/etc/services.conf' >>"$root/usr/lib/io-filters/cache"
  secpolicy exec -- /usr/lib/io-filters/cache </dev/null
  [[ $stderr == *"/etc/services.conf: Permission denied"* ]]
  grep -q sshd "$root/etc/services.conf"
}

@test "exec refuses what the domain of the caller may not execute" {
  boot
  secpolicy settings enforcement hostDom enforcing
  secpolicy restore
  secpolicy exec -- /opt/monitor/bin/agent
  not_confined exec
  [[ $stderr == *": hostDom may not execute /opt/monitor/bin/agent: '-r /opt/monitor/bin/agent rx' is missing in $policy/domains/hostDom; "* ]]
}

@test "features tells what becomes of every rule" {
  boot
  secpolicy features --for monitorDom
  exits 0
  local rules
  rules=$(grep -c '^-' "$policy/domains/monitorDom")
  [[ $(grep -cE "^(enforced|narrowed): $policy/domains/monitorDom:[0-9]+: -" <<<"$output") -eq $rules ]]
  shows "enforced: $policy/domains/monitorDom:$(grep -n -- '-s @file' "$policy/domains/monitorDom" | cut -d : -f 1): -s @file grant"
  secpolicy features --for monitorDom --format json
  exits 0
  fits_schema features
  [[ $(jq '.rules | length' <<<"$output") -eq $rules ]]
  [[ $(jq -r '.rules[0].file' <<<"$output") == /etc/zorvan/secpolicy/domains/monitorDom ]]
}

@test "features says of a domain without rules that it has none" {
  boot
  grant_app
  secpolicy features --for appDom
  exits 0
  [[ -z $output && $stderr == "secpolicy: features: appDom has no rules, so it is granted nothing" ]]
}

@test "a domain is known by its number, too" {
  boot
  local number
  number=$(domain_id monitorDom)
  secpolicy run "$number" -- /bin/sh -c 'echo started'
  answers 0 started
  secpolicy run "$number" --explain
  shows "connect_port: 6514"
  secpolicy features --for "$number" --format json
  [[ $(jq -r .domain <<<"$output") == monitorDom ]]
  secpolicy run 4711 -- /bin/sh
  not_confined run
  [[ $stderr == *"there is no domain '4711'"* ]]
}

@test "features without a domain needs no state" {
  secpolicy features
  exits 0
  [[ $output == "Landlock: version "[1-9]* ]]
  secpolicy features --format json
  fits_schema features
}

@test "--explain shows what the kernel is told, and starts nothing" {
  boot
  secpolicy run monitorDom --explain
  exits 0
  shows "connect_port: 6514"
  [[ $output == *$'\n'"enforced: $policy/domains/monitorDom:"* ]]
  shows "capabilities: cap_dac_read_search"
  [[ $output == *$'\n'"  /opt/monitor/spool: write-file "* ]]
}

@test "the labels are those of now, also after a change" {
  boot
  in_domain monitorDom 'cat /etc/services.conf'
  exits 1
  secpolicy label set monitorConfig /etc/services.conf
  in_domain monitorDom 'cat /etc/services.conf'
  exits 0
  # Where the index of labels is gone, a new one is made.
  rm "$root/run/secpolicy/labels.index"
  in_domain monitorDom 'cat /etc/services.conf'
  exits 0
}

@test "who is confined and cannot be placed is not taken for one of the start domain" {
  boot
  run --separate-stderr setpriv --no-new-privs "$SECPOLICY" --root "$root" exec -- /usr/lib/io-filters/cache
  not_confined exec
  [[ $stderr == *"the domain of this process is not known"* ]]
}

@test "exec starts the very program that it asked about" {
  boot
  # Another by the same name, which PATH has later; the first is passed over, as it cannot be executed.
  printf '%s\n' '#!/bin/sh' 'echo another' 'echo more >>/etc/services.conf' >"$root/bin/cache"
  chmod +x "$root/bin/cache"
  chmod -x "$root/usr/lib/io-filters/cache"
  PATH=/usr/lib/io-filters:$PATH secpolicy exec -- cache
  exits 0
  # It is started in the domain of its own label, which may write there.
  [[ $output == another && $(tail -n 1 "$root/etc/services.conf") == more ]]
}

@test "exec finds programs by names, paths and from the working directory" {
  boot
  secpolicy exec -- ls
  exits 0
  secpolicy exec -- bin/ls
  exits 0
  secpolicy exec -- /bin/ls
  exits 0
  secpolicy exec -- nothing
  exits 127
  [[ $stderr == "secpolicy: exec: there is no program 'nothing' in PATH; nothing was started" ]]
  local path
  for path in /bin/nothing /bin/ls/nothing; do
    secpolicy exec -- "$path"
    exits 127
    [[ $stderr == "secpolicy: exec: there is no program $path: No"*"; nothing was started" || $stderr == *"Not a directory"* ]]
  done
  secpolicy exec -- /etc/services.conf
  not_confined exec
  [[ $stderr == "secpolicy: exec: cannot execute /etc/services.conf: it is not executable; 'chmod +x' makes it so; nothing was started" ]]
  secpolicy exec -- /etc
  not_confined exec
}

@test "status lists who runs in a domain, and restore who keeps an older level" {
  boot
  "$SECPOLICY" --root "$root" run monitorDom -- /bin/sleep 60 3>&- &
  local world=$!
  local tries=0
  until secpolicy status && [[ $output == *" monitorDom enforcing"* ]]; do
    sleep 0.1
    ((++tries < 100))
  done
  shows "worlds       1"
  shows "             $world monitorDom enforcing"
  secpolicy status --format json
  fits_schema status
  [[ $(jq -c .worlds <<<"$output") == "[{\"id\":$world,\"domain\":\"monitorDom\",\"level\":\"enforcing\"}]" ]]
  secpolicy settings enforcement monitorDom permissive
  secpolicy restore
  says "still at the level of the entry: 1 world; 'secpolicy --root $root status' lists each, and a new start takes the new level"
  secpolicy status
  shows "             $world monitorDom enforcing, now permissive"
  kill "$world"
  wait "$world" || true
  secpolicy status
  shows "worlds       0"
}
