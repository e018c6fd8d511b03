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
  exits 126
  [[ $stderr == *"/usr/sbin/sshd"* ]]
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
  [[ $stderr == "notExpressible: /etc/zorvan/secpolicy/domains/appDom:"*": -p connect_port 25 revoke (Landlock is told each port"* ]]
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
  [[ $stderr == *"hostDom may not execute /opt/monitor/bin/agent: 'secpolicy --root $root why hostDom exec /opt/monitor/bin/agent' says which rule would grant it"* ]]
}

@test "features tells what becomes of every rule" {
  boot
  secpolicy features --for monitorDom
  exits 0
  local rules
  rules=$(grep -c '^-' "$policy/domains/monitorDom")
  [[ $(grep -cE '^(enforced|narrowed): /etc/zorvan/secpolicy/domains/monitorDom:[0-9]+: -' <<<"$output") -eq $rules ]]
  shows "enforced: /etc/zorvan/secpolicy/domains/monitorDom:$(grep -n -- '-s @file' "$policy/domains/monitorDom" | cut -d : -f 1): -s @file grant"
  secpolicy features --for monitorDom --format json
  exits 0
  fits_schema features
  [[ $(jq '.rules | length' <<<"$output") -eq $rules ]]
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
  exits 126
  [[ $stderr == "secpolicy: exec: there is no program 'nothing' in PATH; nothing was started" ]]
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
