# secpolicy status --format prometheus, secpolicy drift: metrics that collectors cannot read, that tell
# other than the host is, or that are half written.

load ../cli/helper

metrics() { secpolicy status --format prometheus; }

# has SAMPLE...: these lines are among the metrics that were written.
has() {
  local sample
  for sample; do shows "$sample" || return; done
}

# value NAME: of the one sample of this metric.
value() { sed -n "s/^$1\({.*}\)\? //p" <<<"$output"; }

# are_clean: the metrics that were written are, for promtool. Comes last, since promtool may be missing.
are_clean() {
  command -v promtool >/dev/null || skip "promtool, which knows what metrics should be, is not installed"
  local told
  told=$(promtool check metrics <<<"$output" 2>&1) && [[ -z $told ]] && return
  printf '%s\n' "$told"
  return 1
}

@test "metrics of a host tell what the screen tells" {
  boot
  local json keyword kind
  json=$("$SECPOLICY" --root "$root" status --format json 2>/dev/null)
  metrics
  exits 0
  [[ $stderr == "secpolicy: status: done" ]]
  has "secpolicy_booted 1" "secpolicy_state_readable 1" "secpolicy_policy_loaded 1" \
    "secpolicy_last_load_outcome{outcome=\"done\"} 1" "secpolicy_last_load_outcome{outcome=\"failed\"} 0" \
    "secpolicy_last_load_info{verb=\"boot\"} 1" "secpolicy_last_load_errors 0" "secpolicy_tardisks 2" \
    "secpolicy_domains{level=\"enforcing\"} 8" "secpolicy_domains{level=\"permissive\"} 1" \
    "secpolicy_domains{level=\"disabled\"} 0" "secpolicy_rules_without_file 0" \
    "secpolicy_objects $(jq .objects <<<"$json")" \
    "secpolicy_last_load_timestamp_seconds $(jq '.latestLoad.time | fromdate' <<<"$json")"
  while read -r keyword kind; do
    has "secpolicy_rules{kind=\"$kind\"} $(jq --arg keyword "$keyword" '.rulesByKeyword[$keyword]' <<<"$json")"
  done <<'END'
-a object access
-c capability
-d domain transition
-f file creation
-p parameter check
-r file path
-s system call
-u unix socket creation
END
  are_clean
}

@test "metrics of a host that was not booted say so, and nothing else" {
  metrics
  exits 0
  ends_with "secpolicy: status: nothing is installed below this root, and the metrics say so"
  [[ $(grep -v '^#\|_build_info' <<<"$output") == "secpolicy_booted 0
secpolicy_state_readable 0
secpolicy_policy_loaded 0" && ! -e $root/run/secpolicy ]]
  are_clean
}

@test "metrics of a host whose state cannot be read say so, and nothing else" {
  boot
  chmod o+w "$root/run/secpolicy/host.db"
  metrics
  exits 0
  ends_with "secpolicy: status: Refusing the host state: other users may write /run/secpolicy/host.db. Take that right from them (chmod go-w), or choose another place"
  [[ $(grep -v '^#\|_build_info' <<<"$output") == "secpolicy_booted 1
secpolicy_state_readable 0" ]]
  are_clean
}

@test "metrics tell how a load ended that did not end well" {
  boot
  echo "-s reed grant" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/load.err" || true
  metrics
  exits 0
  has "secpolicy_last_load_outcome{outcome=\"failed\"} 1" "secpolicy_last_load_outcome{outcome=\"done\"} 0" \
    "secpolicy_last_load_info{verb=\"load\"} 1" \
    "secpolicy_last_load_errors $(grep -c '^Error: ' "$BATS_TEST_TMPDIR/load.err")"
  rm "$policy/domains/ioFilterDom"
  find "$policy/domains" -type f -exec sed -i '/ioFilterDom\|reed/d' {} +
  "$SECPOLICY" --root "$root" boot 2>/dev/null || true
  metrics
  exits 0
  has "secpolicy_last_load_outcome{outcome=\"stopped\"} 1" "secpolicy_last_load_outcome{outcome=\"failed\"} 0"
  are_clean
}

digest() {
  metrics
  grep '^secpolicy_policy_info' <<<"$output"
}

@test "the digest is that of the policy, whatever else becomes of the host" {
  boot
  local first
  first=$(digest)
  [[ $first =~ ^secpolicy_policy_info\{digest=\"[0-9a-f]{64}\"\}\ 1$ ]]
  "$SECPOLICY" --root "$root" load 2>/dev/null
  [[ $(digest) == "$first" ]]
  "$SECPOLICY" --root "$root" settings enforcement sshDom permissive 2>/dev/null
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  "$SECPOLICY" --root "$root" domain create job7 2>/dev/null
  [[ $(digest) == "$first" ]]
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  [[ $(digest) != "$first" ]]
  echo "-s listen grant" >>"$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  [[ $(digest) == "$first" ]]
}

@test "metrics count the processes in domains by their level" {
  needs_landlock
  boot
  "$SECPOLICY" --root "$root" settings enforcement appDom disabled 2>/dev/null
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  "$SECPOLICY" --root "$root" run appDom -- /bin/sleep 30 3>&- &
  until_true '"$SECPOLICY" --root "$root" status 2>/dev/null | grep -q "^worlds  *1$"'
  metrics
  kill "$!"
  has "secpolicy_worlds{level=\"disabled\"} 1" "secpolicy_worlds{level=\"enforcing\"} 0"
}

@test "--output puts metrics in place of a file in one step, for all to read" {
  boot
  mkdir "$root/metrics"
  echo old >"$root/metrics/host.prom"
  ln "$root/metrics/host.prom" "$BATS_TEST_TMPDIR/old"
  (umask 077 && "$SECPOLICY" --root "$root" status --format prometheus -o /metrics/host.prom)
  [[ $(stat -c %a "$root/metrics/host.prom") == 644 && $(<"$BATS_TEST_TMPDIR/old") == old ]]
  grep -qx 'secpolicy_booted 1' "$root/metrics/host.prom"
  [[ $(ls -A "$root/metrics") == host.prom ]]
}

@test "--output that cannot be written fails and leaves nothing" {
  boot
  secpolicy status --format prometheus --output /nowhere/host.prom
  exits 1
  ends_with "secpolicy: status: cannot write /nowhere/host.prom: there is no directory /nowhere"
  mkdir -p "$root/metrics/host.prom"
  secpolicy status --format prometheus --output /metrics/host.prom
  exits 1
  ends_with "secpolicy: status: cannot write /metrics/host.prom: Is a directory"
  [[ $(ls -A "$root/metrics") == host.prom ]]
  secpolicy status --format json --output /host.prom
  exits 2
  ends_with "secpolicy: status: --output is for --format prometheus"
}

# ---- Drift

@test "a host that was just booted has no drift" {
  boot
  secpolicy drift --output /drift.prom
  exits 0
  [[ -z $output && $stderr == *"secpolicy: drift: none (46 files, and what is installed, are as the policy says)" ]]
  output=$(<"$root/drift.prom")
  has "secpolicy_drift_check_success 1" "secpolicy_drift_checked_files 46" \
    "secpolicy_drift_files{has=\"other_label\"} 0" "secpolicy_drift_files{has=\"no_label\"} 0" \
    "secpolicy_drift_domains 0" "secpolicy_drift_rules 0" "secpolicy_drift_objects 0"
  (($(value secpolicy_drift_check_timestamp_seconds) > $(date +%s) - 60))
  are_clean
}

@test "drift names each difference, counts them, and repairs none" {
  boot
  "$SECPOLICY" --root "$root" label set sshKey /etc/services.conf 2>/dev/null
  "$SECPOLICY" --root "$root" capability grant sshDom cap_sys_boot 2>/dev/null
  "$SECPOLICY" --root "$root" domain create job7 2>/dev/null
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  echo newObject >>"$policy/objects/base"
  local _
  for _ in 1 2; do
    secpolicy drift --output /drift.prom
    exits 1
    shows "/etc/services.conf: has sshKey, the policy says hostConfig (/etc/zorvan/secpolicy/fileLabels/base:7)"
    shows "@@ domain sshDom"
    shows "+ -c cap_sys_boot grant"
    shows "+ -s listen grant"
    shows "- newObject"
    [[ $output != *job7* ]]
    ends_with "secpolicy: drift: 1 of 46 files, 1 domain and 1 object are not as the policy says; nothing was changed"
  done
  output=$(<"$root/drift.prom")
  has "secpolicy_drift_files{has=\"other_label\"} 1" "secpolicy_drift_domains 1" "secpolicy_drift_rules 2" \
    "secpolicy_drift_objects 1"
}

@test "a level that was changed is drift" {
  boot
  "$SECPOLICY" --root "$root" settings enforcement sshDom permissive 2>/dev/null
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  secpolicy drift
  exits 1
  shows "+ level permissive"
  ends_with "secpolicy: drift: 1 domain is not as the policy says; nothing was changed"
}

@test "drift that cannot be told of everything is told as such" {
  secpolicy drift --output /drift.prom
  exits 2
  grep -qx 'secpolicy_drift_check_success 0' "$root/drift.prom"
  run ! grep '^secpolicy_drift_files' "$root/drift.prom"
  boot
  echo "-s reed grant" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" label set sshKey /etc/services.conf 2>/dev/null
  secpolicy drift --output /drift.prom
  exits 2
  shows "/etc/services.conf: has sshKey, the policy says hostConfig (/etc/zorvan/secpolicy/fileLabels/base:7)"
  says "secpolicy: drift: the policy in /etc/zorvan/secpolicy has errors (above), so it was not compared. 'secpolicy --root $root check /etc/zorvan/secpolicy' shows every one with its place."
  ends_with "secpolicy: drift: not everything could be compared (above)"
  output=$(<"$root/drift.prom")
  has "secpolicy_drift_check_success 0"
  [[ $output != *secpolicy_drift_files* ]]
  are_clean
}
