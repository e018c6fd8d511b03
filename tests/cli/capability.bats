# secpolicy capability: a domain has what was granted last, and no capability is taken for another.

load helper

setup() {
  make_root
  boot
  secpolicy domain create job7
}

# has RULE: the one rule for capabilities that the domain has.
has() {
  secpolicy domain show job7
  [[ $(grep '^-c' <<<"$output") == "$1" ]]
}

@test "a capability is granted and revoked" {
  secpolicy capability grant job7 cap_net_raw
  exits 0
  [[ -z $output && $stderr == "secpolicy: capability grant: done" ]]
  has "-c cap_net_raw grant"
  secpolicy why job7 use cap_net_raw
  exits 0
  secpolicy capability revoke 10 cap_net_raw
  exits 0
  [[ -z $output && $stderr == "secpolicy: capability revoke: done" ]]
  has "-c cap_net_raw revoke"
  secpolicy why job7 use cap_net_raw
  exits 1
}

@test "a capability may be named as other tools do, without what they all begin with" {
  secpolicy capability grant job7 net_raw
  exits 0
  has "-c cap_net_raw grant"
  secpolicy why job7 use net_raw
  answers 0 "yes: job7 may use cap_net_raw
(no policy file): -c cap_net_raw grant"
  secpolicy rules --capability net_raw
  answers 0 "job7: (no policy file): -c cap_net_raw grant"
  secpolicy capability revoke job7 net_raw
  exits 0
  has "-c cap_net_raw revoke"
}

@test "each capability that can be granted is the one that was named" {
  local names capability
  names=$(sed -n 's/^| capabilities | \(.*\) |$/\1/p' "$SOURCE/docs/linux-host.md")
  [[ $(wc -w <<<"$names") -eq 19 ]]
  for capability in $names; do secpolicy capability grant job7 "$capability"; done
  secpolicy domain show job7
  diff <(printf -- '-c %s grant\n' $names) <(grep '^-c' <<<"$output")
}

@test "what the interface does not know is said, with where it can be granted" {
  secpolicy capability grant job7 cap_bpf
  exits 1
  ends_with "secpolicy: capability grant: Capability is not in range. Only a policy file can name cap_bpf: write '-c cap_bpf grant' into $root/etc/zorvan/secpolicy/domains/job7 and load it"
  has ""
  secpolicy capability revoke job7 cap_bpf
  ends_with "secpolicy: capability revoke: Capability is not in range. Only a policy file can name cap_bpf: write '-c cap_bpf revoke' into $root/etc/zorvan/secpolicy/domains/job7 and load it"
}

@test "an unknown word is refused with the nearest" {
  secpolicy capability grant job7 cap_net_rwa
  wrong_usage "capability grant" "capability grant: there is no capability 'cap_net_rwa'; did you mean 'cap_net_raw'?"
  secpolicy capability grant job7 net_rwa
  wrong_usage "capability grant" "capability grant: there is no capability 'net_rwa'; did you mean 'net_raw'?"
  secpolicy capability revoke 11 cap_kill
  exits 2
  [[ $stderr == "secpolicy: capability revoke: there is no domain '11'; "* ]]
  secpolicy capability drop job7 cap_kill
  exits 2
}

@test "what a policy file says comes back with the next load" {
  secpolicy capability revoke sshDom cap_net_bind_service
  secpolicy capability grant sshDom cap_sys_boot
  secpolicy why sshDom use cap_net_bind_service
  exits 1
  secpolicy load
  exits 0
  secpolicy why sshDom use cap_net_bind_service
  exits 0
  secpolicy why sshDom use cap_sys_boot
  exits 0
}
