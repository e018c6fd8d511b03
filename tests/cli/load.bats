# secpolicy load and secpolicy load-early

load helper

@test "load installs the policy again" {
  boot
  secpolicy load
  exits 0
  [[ -z $output ]]
  [[ $stderr == "secpolicy: load: done" ]]
}

@test "load installs what was added to a file" {
  boot
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  secpolicy load
  exits 0
  secpolicy display "$(domain_id appDom)"
  shows "-c cap_net_raw grant"
}

@test "load of another directory takes objects, domains and labels from there" {
  boot
  cp -r "$policy" "$root/new-policy"
  echo "extraObject" >"$root/new-policy/objects/extra"
  echo "-c cap_chown grant" >"$root/new-policy/domains/extraDom"
  secpolicy load /new-policy
  exits 0
  secpolicy display
  shows "-c cap_chown grant"
  [[ $output == *$'\n'"extraObject ("* ]]
}

@test "a bad line is reported as the library says it, and the rest is loaded" {
  boot
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  echo "-c cap_net_raw grant" >>"$policy/domains/sshDom"
  secpolicy load
  exits 1
  local line
  line=$(wc -l <"$policy/domains/appDom")
  [[ $stderr == *"Error: Error in parsing policy for domain: appDom: $line : "*no_such_call* ]]
  says "Error: Error in parsing the policy for some domains"
  says "Error: Failure in domain policy"
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (3 errors above)"
  secpolicy display "$(domain_id sshDom)"
  shows "-c cap_net_raw grant"
}

@test "an error that the library only reports is a failure all the same" {
  boot
  mkdir "$root/tardisks/lost+found"
  secpolicy load
  exits 1
  says "Error: Skipping directory lost+found"
  ends_with "secpolicy: load: failed (1 error above)"
}

@test "load stops when a domain that every host needs is missing" {
  cp -r "$root" "$BATS_TEST_TMPDIR/other"
  root=$BATS_TEST_TMPDIR/other
  rm "$root/etc/zorvan/secpolicy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$root/etc/zorvan/secpolicy/domains/"*Dom
  secpolicy load
  exits 3
  says "Error: Failed to fetch domainID for IOFilter domain"
  ends_with "secpolicy: load: stopped: there is no domain ioFilterDom, so the load ended before tardisks and file labels. Put a policy file named ioFilterDom into /etc/zorvan/secpolicy/domains and run it again."
}

@test "load of a directory that is not there changes nothing and says what to do" {
  secpolicy load /no/such
  exits 1
  [[ $stderr == "secpolicy: load: there is no directory /no/such below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR)." ]]
  [[ ! -e $root/run/secpolicy ]]
}

@test "load in a root without a policy says what to do" {
  rm -r "$policy"
  secpolicy load
  exits 1
  ends_with "secpolicy: load: there is no directory /etc/zorvan/secpolicy below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR)."
}

@test "-v shows the progress on standard error, before and after the verb" {
  boot
  secpolicy -v load
  exits 0
  says "Using policy dir /etc/zorvan/secpolicy"
  says "Domain policies set"
  says "System security policy has been set successfully"
  ends_with "secpolicy: load: done"
  secpolicy load -v
  says "Using policy dir /etc/zorvan/secpolicy"
}

@test "-v leaves the log of the host as it is" {
  boot
  [[ ! -e $root/dev/kmsg ]] || skip "the root has a kernel log device"
  rm "$root/run/secpolicy/kernel.log"
  secpolicy load
  mv "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
  secpolicy -v load
  cmp "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
  grep -q "System security policy has been set successfully" "$BATS_TEST_TMPDIR/quiet.log"
}

@test "load-early installs the early domains, and no others" {
  secpolicy load-early
  [[ -n $(domain_id bootDom) && -z $(domain_id sshDom) ]]
}

@test "load-early after a boot ends well" {
  boot
  secpolicy load-early
  exits 0
  [[ $stderr == "secpolicy: load-early: done" ]]
}

@test "load-early fails although the library returns normally" {
  boot
  rm -r "$policy/early/domains"
  secpolicy load-early
  exits 1
  [[ $stderr == "Error: Unable to open policy directory /etc/zorvan/secpolicy/early/domains
secpolicy: load-early: failed (1 error above)" ]]
}

@test "two loads at once both end well" {
  boot
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/one" &
  local other=$!
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/two"
  wait "$other"
  [[ $(cat "$BATS_TEST_TMPDIR/one") == "secpolicy: load: done" ]]
  [[ $(cat "$BATS_TEST_TMPDIR/two") == "secpolicy: load: done" ]]
}
