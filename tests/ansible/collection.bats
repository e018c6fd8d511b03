# The collection for Ansible on twenty hosts: changes that are told and not made, or made and not told,
# and hosts that are left with half a policy, or reached after one that failed.

bats_require_minimum_version 1.5.0
load ../cli/helper
load fleet

fleet=${BATS_FILE_TMPDIR-}

hosts=(h{01..20})

setup_file() {
  command -v ansible-playbook >/dev/null || return 0
  lay_out_fleet "${#hosts[@]}"
  (umask 077 && openssl genpkey -algorithm ed25519 -out "$fleet/key.pem")
  local host
  for host in "${hosts[@]}"; do
    mkdir -p "$fleet/$host/etc/secpolicy/bundle-keys"
    openssl pkey -in "$fleet/key.pem" -pubout -out "$fleet/$host/etc/secpolicy/bundle-keys/fleet.pem"
  done
  cp -r "$fleet/h01/etc/zorvan/secpolicy" "$fleet/policy"
  sign 1 1 '-r /srv r'
  sign 2 2 '-r /srv rw'
  sign 3 3 '-r /usr r'
  : >"$fleet/policy/domains/lateDom"
  sign 4 4 '-r /usr r'
  sign other 1 '-r /srv r' '# as it was'
}

# sign NAME SERIAL LINE...: the hosts have the bundle /NAME.bundle, with a domain webDom of these lines.
sign() {
  local host
  printf '%s\n' "${@:3}" >"$fleet/policy/domains/webDom"
  "$SECPOLICY" bundle create "$fleet/policy" -o "$fleet/$1.bundle" --key "$fleet/key.pem" --name web --serial "$2"
  for host in "${hosts[@]}"; do ln "$fleet/$1.bundle" "$fleet/$host"; done
}

setup() {
  needs_ansible
  each=$BATS_TEST_DIRNAME/each.yml
}

# roll_out NAME ARGUMENT...: the role, with the bundle NAME.
roll_out() { play secpolicy.secpolicy.rollout -e "secpolicy_rollout_bundle=$fleet/$1.bundle" "${@:2}"; }

# on HOST WORD...: the command there.
on() { "$SECPOLICY" --root "$fleet/$1" "${@:2}" 2>/dev/null; }

# has_rule HOST RULE: it is installed in webDom.
has_rule() { on "$1" display --format json webDom | jq -e --arg rule "$2" '.domains[0].rules | any(.text == $rule)' >/dev/null; }

# level HOST DOMAIN: its installed level.
level() { on "$1" display --format json "$2" | jq -r '.domains[0].level'; }

# has_bundle HOST SERIAL: it is what the host has, in its files and installed.
has_bundle() {
  on "$1" status --format json | jq -e --argjson serial "$2" \
    '.bundle | .serial == $serial and .edited == [] and .installed' >/dev/null
  on "$1" load --plan --format json | jq -e .changesNothing >/dev/null
}

@test "check mode tells bundle and rules, and touches nothing" {
  everything h01 >"$BATS_TEST_TMPDIR/before"
  play "$each" --check --diff --limit h01 -e bundle=/1.bundle
  exits 0
  recap changed=1 h01
  shows '+domain webDom'
  shows '+webDom: -r /srv r'
  [[ $output == *$'\n-none\n+web, serial 1, signed by '* ]]
  [[ $(result h01 '[.changes.rules_added, .replaced, .before]') == '[1,true,null]' ]]
  everything h01 | diff "$BATS_TEST_TMPDIR/before" -
}

@test "all hosts get a policy, and then nothing is left to do" {
  play "$BATS_TEST_DIRNAME/rollout.yml" -e bundle=/1.bundle
  exits 0
  recap changed=1 "${hosts[@]}"
  [[ $(result h20 .changes.domains_created) == '["webDom"]' ]]
  local host
  for host in h01 h20; do
    has_rule "$host" '-r /srv r'
    has_bundle "$host" 1
  done
  play "$BATS_TEST_DIRNAME/rollout.yml" -e bundle=/1.bundle
  exits 0
  recap changed=0 "${hosts[@]}"
  [[ $(result h20 .replaced) == false ]]
}

@test "a host that fails on the way keeps its policy, and those after it are not touched" {
  # The load of this host cannot write what it installs: its disk is full.
  cat >"$fleet/h04.command" <<END
#!/bin/bash
[[ " \$* " == *" --plan "* ]] || { trap '' XFSZ; ulimit -f 40; }
exec "$SECPOLICY" "\$@"
END
  chmod +x "$fleet/h04.command"
  everything h04 >"$BATS_TEST_TMPDIR/h04"
  everything h07 >"$BATS_TEST_TMPDIR/h07"
  play "$BATS_TEST_DIRNAME/rollout.yml" -e bundle=/2.bundle
  rm "$fleet/h04.command"
  [[ $status -eq 2 ]]
  recap changed=1 h01 h02 h03 h05 h06
  recap failed=1 h04
  [[ $(result h04 '.problems | any(contains("disk"))') == true && $(result h04 .replaced) == false ]]
  [[ ! -e $fleet/results/h07 ]]
  has_rule h03 '-r /srv rw'
  everything h04 | diff "$BATS_TEST_TMPDIR/h04" -
  everything h07 | diff "$BATS_TEST_TMPDIR/h07" -
}

@test "a host takes no older bundle, gives up its edits, and takes another of the same serial when told to" {
  local domains=etc/zorvan/secpolicy/domains
  echo '-r /opt r' >>"$fleet/h14/$domains/webDom"
  everything h03 >"$BATS_TEST_TMPDIR/h03"
  mv "$fleet/h15/etc/secpolicy/bundle-keys/fleet.pem" "$fleet/h15/public.pem"
  printf 'bundle: /other.bundle\nkey: [/public.pem]\nallow_older: true\n' >"$fleet/host_vars/h15"
  printf 'bundle: /1.bundle\n' | tee "$fleet/host_vars/"h{03,14} >/dev/null
  printf 'bundle: /2.bundle\ndigest: %064d\n' 0 >"$fleet/host_vars/h17"
  play "$each" --limit h03,h14,h15,h17
  rm "$fleet/host_vars/"*
  [[ $status -eq 2 ]]
  recap changed=0 h03 h17
  recap changed=1 h14 h15
  recap failed=1 h03 h17
  [[ $(result h14 '[.changes.edits_replaced, .before.edited, .replaced]') == '[1,1,true]' ]]
  [[ $(result h15 '[.changes.rules_added, .replaced]') == '[0,true]' ]]
  has_bundle h14 1
  has_bundle h15 1
  [[ $(result h03 .msg) == *"'secpolicy load --bundle=/1.bundle "*"older"* ]]
  everything h03 | diff "$BATS_TEST_TMPDIR/h03" -
  [[ $(result h17 .msg) == '"/2.bundle is another bundle, and nothing was changed: its digest is '* ]]
  has_bundle h17 1
}

@test "a directory is installed as it is: the host's own, or one elsewhere until the next load" {
  local host domains=etc/zorvan/secpolicy/domains
  for host in h14 h17; do cp -r "$fleet/$host/etc/zorvan/secpolicy" "$fleet/$host/-new"; done
  echo '-s opne grant' >"$fleet/h17/-new/domains/webDom"
  echo '-r /opt r' | tee "$fleet/h18/$domains/webDom" >"$fleet/h14/-new/domains/webDom"
  printf 'src: -new\n' | tee "$fleet/host_vars/"h{14,17} >/dev/null
  everything h17 >"$BATS_TEST_TMPDIR/h17"

  play "$each" --limit h14,h17,h18
  [[ $status -eq 2 ]]
  recap failed=1 h17
  recap changed=1 h14 h18
  [[ $(result h17 '.problems[0]') == *"webDom"*"unknown system call 'opne'"* ]]
  [[ $(result h17 .msg) == '"the policy in -new has errors, and nothing was changed"' ]]
  everything h17 | diff "$BATS_TEST_TMPDIR/h17" -
  has_rule h18 '-r /opt r'
  has_rule h14 '-r /opt r'
  grep -qx -e '-r /srv r' "$fleet/h14/$domains/webDom"

  play "$each" --limit h14,h18
  exits 0
  recap changed=0 h14 h18
  rm "$fleet/host_vars/"*
  on h14 load
  has_bundle h14 1
}

@test "labels and levels are set once, and facts tell them" {
  touch "$fleet/h15/etc/zorvan/file"
  play "$BATS_TEST_DIRNAME/modules.yml" --limit h15
  exits 0
  [[ $(on h15 label get /etc/zorvan/file) == *": policyFile" ]]
}

@test "a role begins at the canary, and puts policy and levels back where it is not well" {
  printf '[canary]\nh16\n' >"$fleet/canary"
  roll_out 2 --limit h16 -e '{"secpolicy_rollout_enforcing": ["webDom"]}'
  exits 0
  has_bundle h16 2
  [[ $(level h16 webDom) == enforcing && ! -e $fleet/h16/var/cache/secpolicy-rollout/unfinished ]]
  on h16 settings enforcement webDom permissive
  on h16 restore
  [[ $(level h16 hostDom) == permissive ]]
  on h16 settings list >"$BATS_TEST_TMPDIR/settings"
  everything h15 >"$BATS_TEST_TMPDIR/h15"

  roll_out 4 -i "$fleet/hosts" -i "$fleet/canary" --limit h15,h16 \
    -e '{"secpolicy_rollout_enforcing": ["hostDom", "lateDom", "webDom"]}' \
    -e "secpolicy_rollout_check=$BATS_TEST_DIRNAME/unwell.yml"
  [[ $status -eq 2 ]]
  recap failed=1 h16
  recap rescued=1 h16
  recap ignored=0 h16
  [[ $(result h16 .msg) == *"Ask the service: The service does not answer. The host has now web, serial 2; latest load: "* ]]
  has_bundle h16 2
  [[ $(level h16 hostDom) == permissive && $(level h16 webDom) == permissive ]]
  run ! on h16 display lateDom
  on h16 settings list | diff "$BATS_TEST_TMPDIR/settings" -
  grep -qx -e '-r /usr r' "$fleet/h16/etc/zorvan/secpolicy.previous/domains/webDom"
  everything h15 | diff "$BATS_TEST_TMPDIR/h15" -
}

@test "a role that cannot put a bundle back says what the host has" {
  local policy=/etc/zorvan/secpolicy until_boot
  until_boot="The host has now web, serial 4, which is not what is installed; latest load: load of $policy.previous, done"
  # One had this bundle, and something else installed; one installs, and says that it has failed; one is killed
  # when it has installed. A service of the first two does not restart.
  on h01 save good
  on h01 load --bundle /4.bundle
  on h01 rollback good
  echo 'secpolicy_rollout_restart: [no-such-service]' | tee "$fleet/host_vars/"h0{1,3} >/dev/null
  cat >"$fleet/h03.command" <<END
#!/bin/bash
"$SECPOLICY" "\$@" || exit
[[ " \$* " != *" --bundle="* || " \$* " == *" --plan "* ]] || { echo "secpolicy: no words" >&2; exit 1; }
END
  sed '3s/.*/[[ " $* " != *" --bundle="* || " $* " == *" --plan "* ]] || kill -KILL "$PPID"/' "$fleet/h03.command" >"$fleet/h05.command"
  chmod +x "$fleet/"h0{3,5}.command
  roll_out 4 --limit h01,h03,h05 -e '{"secpolicy_steps": ["100%"]}'
  rm "$fleet/host_vars/"* "$fleet/"h0{3,5}.command
  [[ $status -eq 2 ]]
  recap failed=1 h03 h05
  recap failed=2 h01
  recap ignored=2 h03
  [[ $(result h01 .msg) == *"Restart services now: failed. The host has now web, serial 4; latest load: load of $policy, done"* ]]
  has_bundle h01 4
  [[ $(result h03 .msg) == *"Install it: "*": secpolicy: no words. $until_boot"* ]]
  has_rule h03 '-r /srv rw'
  has_bundle h05 4
  [[ $(level h05 lateDom) == enforcing ]]

  # The next run does what was left to do, and knows what there was before.
  roll_out 4 --limit h05 -e "secpolicy_rollout_check=$BATS_TEST_DIRNAME/resumed.yml"
  exits 0
  recap changed=2 h05
  [[ $(level h05 lateDom) == permissive && ! -e $fleet/h05/var/cache/secpolicy-rollout/unfinished ]]
}

@test "a role finds what is misspelt before it changes anything" {
  echo 'secpolicy_rollout_restrat: [sshd]' >"$fleet/host_vars/h08"
  echo 'secpolicy_rollout_check: /no/such.yml' >"$fleet/host_vars/h09"
  ANSIBLE_STRATEGY=free roll_out 4 --limit h08,h09 -e '{"secpolicy_steps": ["100%"]}'
  rm "$fleet/host_vars/"*
  [[ $status -eq 2 ]]
  [[ $(result h08 .msg) == '"The role has no variable secpolicy_rollout_restrat"' ]]
  [[ $(result h09 .) == *'/no/such.yml'* ]]
  [[ $output != *'Install it]'* ]]
}
