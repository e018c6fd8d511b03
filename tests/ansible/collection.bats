# The collection for Ansible on twenty hosts: changes that are told and not made, or made and not told,
# and hosts that are left with half a policy, or reached after one that failed.

bats_require_minimum_version 1.5.0
load ../cli/helper
load fleet

fleet=${BATS_FILE_TMPDIR-}

hosts=(h{01..20})

setup_file() {
  command -v ansible-playbook >/dev/null || return 0
  lay_out_fleet 20
}

setup() {
  needs_ansible
  rollout=$BATS_TEST_DIRNAME/rollout.yml
  each=$BATS_TEST_DIRNAME/each.yml
}

# bring LINE...: a new policy lies on each host, with a domain webDom of these lines.
bring() {
  local host
  for host in "${hosts[@]}"; do
    rm -rf "$fleet/$host/new"
    cp -r "$fleet/h01/etc/zorvan/secpolicy" "$fleet/$host/new"
    printf '%s\n' "$@" >"$fleet/$host/new/domains/webDom"
  done
}

# has_rule HOST RULE: it is installed in webDom.
has_rule() {
  "$SECPOLICY" --root "$fleet/$1" display --format json webDom 2>/dev/null |
    jq -e --arg rule "$2" '.domains[0].rules | any(.text == $rule)' >/dev/null
}

@test "check mode tells files and rules, and touches nothing" {
  bring '-r /srv r'
  everything h01 >"$BATS_TEST_TMPDIR/before"
  play "$each" --check --diff --limit h01,h02
  exits 0
  recap changed=1 h01 h02
  shows '+domain webDom'
  shows '+webDom: -r /srv r'
  [[ $output == *$'\n+'????????????????' domains/webDom'$'\n'* ]]
  [[ $(result h01 .changes.rules_added) == 1 && $(result h01 .changes.policy_files) == 1 ]]
  everything h01 | diff "$BATS_TEST_TMPDIR/before" -
}

@test "twenty hosts get a policy, and then nothing is left to do" {
  local host
  bring '-r /srv r'
  play "$rollout"
  exits 0
  recap changed=1 "${hosts[@]}"
  [[ $(result h20 .changes.domains_created) == '["webDom"]' ]]
  for host in h01 h20; do
    has_rule "$host" '-r /srv r'
    diff -r "$fleet/$host/new" "$fleet/$host/etc/zorvan/secpolicy"
    "$SECPOLICY" --root "$fleet/$host" status --format json 2>/dev/null | jq -e '.latestLoad.verb == "load"'
  done
  play "$rollout"
  exits 0
  recap changed=0 "${hosts[@]}"
}

@test "a host that fails on the way keeps its policy, and those after it are not touched" {
  bring '-r /srv r' '-r /var r'
  # The load of this host cannot write what it installs: its disk is full.
  mkdir -p "$fleet/full"
  cat >"$fleet/full/secpolicy" <<END
#!/bin/bash
[[ " \$* " != *" --all-or-nothing "* ]] || { trap '' XFSZ; ulimit -f 40; }
exec "$SECPOLICY" "\$@"
END
  chmod +x "$fleet/full/secpolicy"
  printf 'environment_of_host: {PATH: "%s:%s"}\n' "$fleet/full" "$PATH" >"$fleet/host_vars/h04"
  everything h04 >"$BATS_TEST_TMPDIR/h04"
  everything h07 >"$BATS_TEST_TMPDIR/h07"
  play "$rollout"
  rm "$fleet/host_vars/h04"
  [[ $status -eq 2 ]]
  recap changed=1 h01 h02 h03 h05 h06
  recap failed=1 h04
  result h04 .problems
  [[ $(result h04 '.problems[-1]') == *"disk I/O error"*"nothing was installed"* ]]
  [[ ! -e $fleet/results/h07 ]]
  has_rule h03 '-r /var r'
  everything h04 | diff "$BATS_TEST_TMPDIR/h04" -
  everything h07 | diff "$BATS_TEST_TMPDIR/h07" -
}

@test "errors, runs that were killed, tardisks, and the usual place" {
  local killed=$fleet/h18/etc/zorvan/secpolicy tardisk=$fleet/h19 policy=etc/zorvan/secpolicy/tardisks/clock
  bring '-r /srv r'
  # One was killed when it had replaced a policy, by one that cannot be loaded.
  cp -r "$fleet/h18/new/." "$killed"
  mv "$killed" "$killed.replaced"
  cp -r "$fleet/h18/new" "$killed.next"
  cp -r "$fleet/h18/new" "$killed"
  echo '-s opne grant' >"$killed/domains/webDom"
  # One has a tardisk that brings a policy.
  mkdir -p "$fleet/clock/${policy%/*}"
  echo '-E policyFile appDom' >"$fleet/clock/$policy"
  tar -C "$fleet/clock" --owner=0 --group=0 --mode=go-w -czf "$tardisk/tardisks/clock.tgz" etc
  "$SECPOLICY" --root "$tardisk" boot
  bring '-r /srv rw'
  echo '-s opne grant' >"$fleet/h17/new/domains/webDom"
  echo '-r /opt r' >"$fleet/h20/etc/zorvan/secpolicy/domains/webDom"
  echo 'src: /etc/zorvan/secpolicy' >"$fleet/host_vars/h20"
  everything h17 >"$BATS_TEST_TMPDIR/h17"

  play "$each" --limit h17,h18,h19,h20
  [[ $status -eq 2 ]]
  recap failed=1 h17
  recap changed=1 h18 h19 h20
  [[ $(result h17 '.problems[0]') == *"webDom"*"unknown system call 'opne'"* ]]
  [[ $(result h17 .msg) == '"the policy in /new has errors, and nothing was changed"' ]]
  everything h17 | diff "$BATS_TEST_TMPDIR/h17" -
  diff -r "$fleet/h18/new" "$killed"
  grep -qx -e '-r /srv r' "$killed.previous/domains/webDom"
  [[ $(cd "$killed/.." && echo *) == 'secpolicy secpolicy.previous' ]]
  has_rule h19 '-r /srv rw'
  diff "$fleet/clock/$policy" "$tardisk/$policy"
  has_rule h20 '-r /opt r'

  play "$each" --limit h18,h19,h20
  exits 0
  recap changed=0 h18 h19 h20
}

@test "labels and levels are set once, and facts tell them" {
  touch "$fleet/h16/etc/zorvan/file"
  play "$BATS_TEST_DIRNAME/modules.yml" --limit h16
  exits 0
  [[ $("$SECPOLICY" --root "$fleet/h16" label get /etc/zorvan/file 2>/dev/null) == *": policyFile" ]]
}

# level HOST DOMAIN: its installed level.
level() { "$SECPOLICY" --root "$fleet/$1" display --format json "$2" 2>/dev/null | jq -r '.domains[0].level'; }

# sign SERIAL LINE...: three hosts have the bundle /SERIAL.bundle, with a domain newDom of these lines and a
# domain lateDom, and its key.
sign() {
  local signed=$BATS_TEST_TMPDIR/signed key=$fleet/key.pem host
  [[ -f $key ]] || (umask 077 && openssl genpkey -algorithm ed25519 -out "$key")
  rm -rf "$signed"
  cp -r "$fleet/h11/new" "$signed"
  printf '%s\n' "${@:2}" >"$signed/domains/newDom"
  : >"$signed/domains/lateDom"
  "$SECPOLICY" bundle create "$signed" -o "$fleet/$1.bundle" --key "$key" --name web --serial "$1"
  for host in h{11..13}; do
    cp "$fleet/$1.bundle" "$fleet/$host"
    openssl pkey -in "$key" -pubout -out "$fleet/$host/public.pem"
  done
}

@test "signed policies are taken once, and older ones never" {
  local domains=etc/zorvan/secpolicy/domains
  bring '-r /srv r'
  sign 1 '-r /srv r'
  sign 2 '-r /srv rw'
  play "$each" --limit h11,h12 -e '{"bundle": "/1.bundle", "key": ["/public.pem"]}' --diff
  exits 0
  recap changed=1 h11 h12
  [[ $output == *$'\n-none\n+web, serial 1, signed by '* ]]
  [[ $(level h11 newDom) == enforcing ]]

  play secpolicy.secpolicy.rollout --limit h13 -e "secpolicy_rollout_bundle=$fleet/2.bundle" \
    -e '{"secpolicy_rollout_key": ["/public.pem"], "secpolicy_rollout_enforcing": ["newDom"]}'
  exits 0
  [[ $(level h13 newDom) == enforcing && $(level h13 lateDom) == permissive ]]

  # One has it, one has it edited, and one has a newer one.
  echo '-r /opt r' >>"$fleet/h12/$domains/newDom"
  everything h13 >"$BATS_TEST_TMPDIR/h13"
  play "$each" --limit h11,h12,h13 -e '{"bundle": "/1.bundle", "key": ["/public.pem"]}'
  [[ $status -eq 2 ]]
  recap changed=0 h11 h13
  recap changed=1 h12
  recap failed=1 h13
  [[ $(result h12 .changes.policy_files) == 1 ]]
  diff "$fleet/h11/$domains/newDom" "$fleet/h12/$domains/newDom"
  [[ $(result h13 .msg) == *"'secpolicy load --bundle /1.bundle "*"older"* ]]
  everything h13 | diff "$BATS_TEST_TMPDIR/h13" -
}

@test "a role begins at the canary, and puts back what is not well" {
  local policy=$fleet/h12/etc/zorvan/secpolicy
  sign 3 '-r /usr r'
  printf '[canary]\nh12\n' >"$fleet/canary"
  everything h11 >"$BATS_TEST_TMPDIR/h11"
  cp -r "$policy" "$BATS_TEST_TMPDIR/before"
  play secpolicy.secpolicy.rollout -i "$fleet/hosts" -i "$fleet/canary" --limit h11,h12 \
    -e "secpolicy_rollout_bundle=$fleet/3.bundle" -e '{"secpolicy_rollout_key": ["/public.pem"]}' \
    -e "secpolicy_rollout_check=$BATS_TEST_DIRNAME/unwell.yml"
  [[ $status -eq 2 ]]
  recap failed=1 h12
  recap rescued=1 h12
  [[ $(result h12 .msg) == *"The host has the policy that it had, since this failed: Ask the service: The service does not answer"* ]]
  grep -qx -e '-r /usr r' "$policy.previous/domains/newDom"
  diff -r "$BATS_TEST_TMPDIR/before" "$policy"
  "$SECPOLICY" --root "$fleet/h12" load --plan --format json 2>/dev/null | jq -e .changesNothing
  "$SECPOLICY" --root "$fleet/h12" status --format json 2>/dev/null | jq -e '.bundle.serial == 1 and .bundle.installed'
  everything h11 | diff "$BATS_TEST_TMPDIR/h11" -
}
