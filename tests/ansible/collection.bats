# The collection for Ansible on eight hosts: changes that are told and not made, or made and not told,
# and hosts that are left with half a policy, or reached after one that failed.

bats_require_minimum_version 1.5.0
load ../cli/helper
load fleet

fleet=${BATS_FILE_TMPDIR-}

hosts=(h{01..08})

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
  [[ $(result h08 .changes.domains_created) == '["webDom"]' ]]
  local host
  for host in h01 h08; do
    has_rule "$host" '-r /srv r'
    has_bundle "$host" 1
  done
  play "$BATS_TEST_DIRNAME/rollout.yml" -e bundle=/1.bundle --limit h01,h08
  exits 0
  recap changed=0 h01 h08
  [[ $(result h08 .replaced) == false ]]
}

@test "a host that fails on the way keeps its policy, and those after it are not touched" {
  # The load of this host cannot write what it installs: its disk is full.
  cat >"$fleet/h02.command" <<END
#!/bin/bash
[[ " \$* " == *" --plan "* ]] || { trap '' XFSZ; ulimit -f 40; }
exec "$SECPOLICY" "\$@"
END
  chmod +x "$fleet/h02.command"
  everything h02 >"$BATS_TEST_TMPDIR/h02"
  everything h04 >"$BATS_TEST_TMPDIR/h04"
  play "$BATS_TEST_DIRNAME/rollout.yml" -e bundle=/2.bundle
  rm "$fleet/h02.command"
  [[ $status -eq 2 ]]
  recap changed=1 h01 h03
  recap failed=1 h02
  [[ $(result h02 '.problems | any(contains("disk"))') == true && $(result h02 .replaced) == false ]]
  [[ ! -e $fleet/results/h04 ]]
  has_rule h03 '-r /srv rw'
  everything h02 | diff "$BATS_TEST_TMPDIR/h02" -
  everything h04 | diff "$BATS_TEST_TMPDIR/h04" -
}

@test "a host takes no older bundle, gives up its edits, and takes another of the same serial when told to" {
  local domains=etc/zorvan/secpolicy/domains
  echo '-r /opt r' >>"$fleet/h04/$domains/webDom"
  everything h03 >"$BATS_TEST_TMPDIR/h03"
  mv "$fleet/h05/etc/secpolicy/bundle-keys/fleet.pem" "$fleet/h05/public.pem"
  printf 'bundle: /other.bundle\nkey: [/public.pem]\nallow_older: true\n' >"$fleet/host_vars/h05"
  printf 'bundle: /1.bundle\n' | tee "$fleet/host_vars/"h0{3,4,6} >/dev/null
  printf 'bundle: /2.bundle\ndigest: %064d\n' 0 >"$fleet/host_vars/h07"
  play "$each" --limit h03,h04,h05,h06,h07
  rm "$fleet/host_vars/"*
  [[ $status -eq 2 ]]
  recap changed=0 h03 h06 h07
  recap changed=1 h04 h05
  recap failed=1 h03 h07
  [[ $(result h04 '[.changes.edits_replaced, .before.edited, .replaced]') == '[1,1,true]' ]]
  [[ $(result h05 '[.changes.rules_added, .replaced]') == '[0,true]' ]]
  has_bundle h04 1
  has_bundle h05 1
  [[ $(result h03 .msg) == *"'secpolicy load --bundle=/1.bundle "*"older"* ]]
  everything h03 | diff "$BATS_TEST_TMPDIR/h03" -
  [[ $(result h07 .msg) == '"/2.bundle is another bundle, and nothing was changed: its digest is '* ]]
  has_bundle h07 1
}

@test "a directory is installed as it is: the host's own, or one elsewhere until the next load" {
  local host domains=etc/zorvan/secpolicy/domains
  for host in h04 h07; do cp -r "$fleet/$host/etc/zorvan/secpolicy" "$fleet/$host/-new"; done
  echo '-s opne grant' >"$fleet/h07/-new/domains/webDom"
  echo '-r /opt r' | tee "$fleet/h08/$domains/webDom" >"$fleet/h04/-new/domains/webDom"
  printf 'src: -new\n' | tee "$fleet/host_vars/"h0{4,7} >/dev/null
  everything h07 >"$BATS_TEST_TMPDIR/h07"

  play "$each" --limit h04,h07,h08
  [[ $status -eq 2 ]]
  recap failed=1 h07
  recap changed=1 h04 h08
  [[ $(result h07 '.problems[0]') == *"webDom"*"unknown system call 'opne'"* ]]
  [[ $(result h07 .msg) == '"the policy in -new has errors, and nothing was changed"' ]]
  everything h07 | diff "$BATS_TEST_TMPDIR/h07" -
  has_rule h08 '-r /opt r'
  has_rule h04 '-r /opt r'
  grep -qx -e '-r /srv r' "$fleet/h04/$domains/webDom"

  play "$each" --limit h04,h08
  exits 0
  recap changed=0 h04 h08
  rm "$fleet/host_vars/"*
  on h04 load
  has_bundle h04 1
}

@test "labels and levels are set once, and facts tell them" {
  touch "$fleet/h05/etc/zorvan/file"
  play "$BATS_TEST_DIRNAME/modules.yml" --limit h05
  exits 0
  [[ $(on h05 label get /etc/zorvan/file) == *": policyFile" ]]
}

@test "a role begins at the canary, and puts policy and levels back where it is not well" {
  printf '[canary]\nh06\n' >"$fleet/canary"
  roll_out 2 --limit h06 -e '{"secpolicy_rollout_enforcing": ["webDom"]}'
  exits 0
  has_bundle h06 2
  [[ $(level h06 webDom) == enforcing ]]
  on h06 settings enforcement webDom permissive
  on h06 restore
  [[ $(level h06 hostDom) == permissive ]]
  on h06 settings list >"$BATS_TEST_TMPDIR/settings"
  everything h05 >"$BATS_TEST_TMPDIR/h05"

  roll_out 4 -i "$fleet/hosts" -i "$fleet/canary" --limit h05,h06 \
    -e '{"secpolicy_rollout_enforcing": ["hostDom", "lateDom", "webDom"]}' \
    -e "secpolicy_rollout_check=$BATS_TEST_DIRNAME/unwell.yml"
  [[ $status -eq 2 ]]
  recap failed=1 h06
  recap rescued=1 h06
  recap ignored=0 h06
  [[ $(result h06 .msg) == *"Ask the service: The service does not answer. The host has now web, serial 2; latest load: "* ]]
  has_bundle h06 2
  [[ $(level h06 hostDom) == permissive && $(level h06 webDom) == permissive ]]
  run ! on h06 display lateDom
  on h06 settings list | diff "$BATS_TEST_TMPDIR/settings" -
  grep -qx -e '-r /usr r' "$fleet/h06/etc/zorvan/secpolicy.previous/domains/webDom"
  everything h05 | diff "$BATS_TEST_TMPDIR/h05" -
}

@test "a role that cannot put a bundle back says what the host has" {
  local policy=/etc/zorvan/secpolicy until_boot
  until_boot="The host has now web, serial 3, which is not what is installed; latest load: load of $policy.previous, done"
  # One had this bundle, and something else installed; one fails to restart; one installs, and says that it has failed.
  on h01 save good
  on h01 load --bundle /3.bundle
  on h01 rollback good
  echo 'secpolicy_rollout_restart: [no-such-service]' >"$fleet/host_vars/h02"
  cat >"$fleet/h03.command" <<END
#!/bin/bash
"$SECPOLICY" "\$@" || exit
[[ " \$* " != *" --bundle="* || " \$* " == *" --plan "* ]] || { echo "no words" >&2; exit 1; }
END
  chmod +x "$fleet/h03.command"
  roll_out 3 --limit h01,h02,h03 -e '{"secpolicy_steps": ["100%"]}' \
    -e "secpolicy_rollout_check=$BATS_TEST_DIRNAME/unwell.yml"
  rm "$fleet/host_vars/h02" "$fleet/h03.command"
  [[ $status -eq 2 ]]
  recap failed=1 h01 h03
  recap failed=2 h02
  [[ $(result h01 .msg) == *"does not answer. The host has now web, serial 3; latest load: load of $policy, done"* ]]
  has_bundle h01 3
  [[ $(result h02 .msg) == *"Restart services now: failed. $until_boot"* ]]
  has_rule h02 '-r /srv r'
  [[ $(result h03 .msg) == *"Install it: "*" no words. $until_boot"* ]]
  has_rule h03 '-r /srv rw'
}
