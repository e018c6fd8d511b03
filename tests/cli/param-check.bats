# secpolicy param-check: rules are about the numbers that were typed, and no others.

load helper

setup() {
  make_root
  boot
  secpolicy domain create job7
}

fails() { fails_with "param-check $1" "$2"; }

# has RULE...: the rules for parameter checks that the domain has.
has() {
  secpolicy domain show job7
  diff <(printf '%s\n' "$@") <(grep '^-p' <<<"$output")
}

@test "rules are set and removed" {
  secpolicy param-check set job7 bind_port 80 grant
  exits 0
  [[ -z $output && $stderr == "secpolicy: param-check set: done" ]]
  secpolicy param-check set 10 bind_port 0x1f40 8099 grant
  secpolicy param-check set job7 kill_signal 9 revoke
  secpolicy param-check set job7 clone_flags 0x10000000 revoke
  has "-p bind_port 80 grant" "-p bind_port 8000 8099 grant" "-p kill_signal 9 revoke" "-p clone_flags 268435456 revoke"
  secpolicy why job7 pass bind_port 8080
  exits 0
  secpolicy why job7 pass bind_port 81
  exits 1
  secpolicy param-check set job7 bind_port 80 revoke
  secpolicy why job7 pass bind_port 80
  exits 1
  secpolicy param-check remove job7 bind_port 80
  exits 0
  [[ -z $output && $stderr == "secpolicy: param-check remove: done" ]]
  secpolicy param-check remove job7 bind_port 8000 0x1fa3
  exits 0
  has "-p kill_signal 9 revoke" "-p clone_flags 268435456 revoke"
}

@test "each check that can be set is the one that was named" {
  local checks check
  checks=$("$SECPOLICY" --root "$root" words checks)
  [[ $(wc -w <<<"$checks") -eq 10 ]]
  for check in $checks; do secpolicy param-check set job7 "$check" 1 grant; done
  diff <(printf -- '-p %s 1 grant\n' $checks) \
    <("$SECPOLICY" --root "$root" domain show job7 2>/dev/null | grep '^-p' | sort)
}

@test "the largest numbers are taken, and none that is larger" {
  secpolicy param-check set job7 ioctl_request 0 18446744073709551615 grant
  exits 0
  has "-p ioctl_request 0 18446744073709551615 grant"
  secpolicy param-check set job7 ioctl_request 18446744073709551616 grant
  wrong_usage "param-check set" "param-check set: parameter '18446744073709551616' is too large"
}

@test "what is no rule is refused, and nothing is set" {
  secpolicy param-check set job7 bind_port 8099 8000 grant
  wrong_usage "param-check set" "param-check set: parameter range 8099 to 8000 is empty"
  secpolicy param-check set job7 bind_port eighty grant
  wrong_usage "param-check set" "param-check set: parameter 'eighty' is not an unsigned number"
  secpolicy param-check set job7 bind_port 80 Grant
  wrong_usage "param-check set" "param-check set: 'Grant' is neither grant nor revoke"
  for numbers in "" "1 2 3"; do
    # shellcheck disable=SC2086
    secpolicy param-check set job7 bind_port $numbers grant
    wrong_usage "param-check set" "param-check set: write: DOMAIN CHECK FIRST [LAST] grant, or revoke"
  done
  secpolicy param-check set job7 clone_flags 1 2 revoke
  wrong_usage "param-check set" "param-check set: clone_flags takes one number, of all bits that it is about"
  secpolicy param-check set job7 bind_prt 80 grant
  wrong_usage "param-check set" "param-check set: there is no parameter check 'bind_prt'; did you mean 'bind_port'?"
  secpolicy param-check remove job7 bind_port 1 2 3
  wrong_usage "param-check remove" "param-check remove: write: DOMAIN CHECK FIRST [LAST]"
  secpolicy param-check remove job7 bind_port 1 grant
  wrong_usage "param-check remove" "param-check remove: a rule is removed by its numbers alone, without 'grant'"
  secpolicy domain show job7
  [[ $output != *$'\n-p'* ]]
}

@test "what is not there cannot be removed, and what is there is told" {
  secpolicy param-check remove job7 bind_port 80
  fails remove "Failed to remove parameter check rule for domain :: 10:No such file or directory. job7 has no rule for bind_port"
  secpolicy param-check set job7 bind_port 80 grant
  secpolicy param-check set job7 bind_port 8000 8099 revoke
  secpolicy param-check remove job7 bind_port 8000
  fails remove "Failed to remove parameter check rule for domain :: 10:No such file or directory. A rule is removed by its very numbers; job7 has '-p bind_port 80 grant' and '-p bind_port 8000 8099 revoke'"
}

@test "what a policy file says comes back with the next load, and what was set stays" {
  secpolicy domain show sshDom
  local before
  before=$(grep '^-p bind_port' <<<"$output")
  [[ $before == "-p bind_port 22 grant
-p bind_port 0 grant" ]]
  secpolicy param-check set sshDom bind_port 22 revoke
  secpolicy param-check set sshDom bind_port 23 grant
  secpolicy load
  exits 0
  secpolicy domain show sshDom
  [[ $(grep '^-p bind_port' <<<"$output" | sort) == "-p bind_port 0 grant
-p bind_port 22 grant
-p bind_port 23 grant" ]]
}
