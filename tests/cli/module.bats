# secpolicy module: what is refused before the kernel is asked for anything. That it works is tried in
# virtual machines, as nothing here may act on this machine's kernel: tests/vm/verbs.

load helper

elsewhere="the module is a part of the machine's kernel, which keeps the policy of the machine itself, and none below another root or in another state"

@test "the kernel keeps the policy of no other root" {
  for kind in start stop status; do
    secpolicy module "$kind"
    fails_with "module $kind" "$elsewhere"
  done
}

@test "nor of another state" {
  for kind in start stop status; do
    run --separate-stderr env SECPOLICY_HOST_STATE="$BATS_TEST_TMPDIR/host.db" "$SECPOLICY" module "$kind"
    fails_with "module $kind" "$elsewhere"
  done
  [[ ! -e $BATS_TEST_TMPDIR/host.db ]]
}

@test "only root may ask for it" {
  local as_user=()
  [[ $EUID -ne 0 ]] || as_user=(setpriv --reuid 65534 --regid 65534 --clear-groups)
  for kind in start stop status; do
    run --separate-stderr "${as_user[@]}" "$SECPOLICY" module "$kind"
    fails_with "module $kind" "only root may ask the kernel for that"
  done
}

@test "a machine whose state no module keeps tells nobody of its commits" {
  boot
  [[ ! -e $root/run/secpolicy/module && ! -e $root/run/secpolicy/module.published ]]
}

@test "who cannot tell the kernel says so, and the commit stays" {
  boot
  touch "$root/run/secpolicy/module"
  touch "$root/run/secpolicy/module.published"
  secpolicy file-policy add appDom r /srv/jobs
  exits 1
  # Below a root the library is out of sight, as it is for a machine's state in a mount of its own.
  says "secpolicy: file-policy add: done"
  [[ $stderr == *$'\n'"secpolicy: file-policy add: the policy is installed, and the kernel was not told of it: Unable to load what keeps a policy in the kernel: "*": install such a package of secpolicy, and libbpf" ]]
  [[ ! -e $root/run/secpolicy/module.published ]]
  secpolicy file-policy list appDom
  [[ $output == *"/srv/jobs"* ]]
}
