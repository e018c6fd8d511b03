# secpolicy status: how the latest load ended, whichever it was, and what is installed now.

load helper

# rules_of KEYWORD: how many lines of the kind display shows.
rules_of() {
  "$SECPOLICY" --root "$root" display 2>/dev/null | grep -c "^$1 "
}

@test "status tells on one screen what is installed" {
  boot
  secpolicy status
  exits 0
  [[ $stderr == "secpolicy: status: the policy is loaded" ]]
  shows "policy       loaded"
  [[ $output =~ (^|$'\n')latest\ load\ \ boot\ from\ /etc/zorvan/secpolicy\ at\ [0-9]{4}-[0-9]{2}-[0-9]{2}\ [0-9:]{8}\ UTC:\ done($'\n'|$) ]]
  shows "domains      9: 8 enforcing, 1 permissive (hostDom)"
  shows "objects      17"
  shows "tardisks     2"
  shows "             /tardisks/base.tgz tardiskDefault"
  shows "             /tardisks/monitor.tgz monitorImage"
  [[ $(wc -l <<<"$output") -le 24 ]]
}

@test "status counts the rules of each kind" {
  boot
  secpolicy status
  for keyword in -a -c -d -f -p -r -s -u; do
    [[ $(awk -v keyword="$keyword" '$1 == keyword { print $2 }' <<<"$output") == "$(rules_of "$keyword")" ]]
  done
  shows "rules        $(rules_of '-[a-z]')"
}

@test "status names the domains that do not enforce" {
  boot
  "$SECPOLICY" --root "$root" settings enforcement appDom permissive
  "$SECPOLICY" --root "$root" settings enforcement sshDom disabled
  "$SECPOLICY" --root "$root" restore
  secpolicy status
  exits 0
  shows "domains      9: 6 enforcing, 2 permissive (hostDom appDom), 1 disabled (sshDom)"
}

@test "status shows the problems of the latest load" {
  boot
  echo "-s reed grant" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/load.err" || true
  secpolicy status
  exits 1
  [[ $stderr == "secpolicy: status: the latest load did not end well. 'secpolicy --root $root check' shows every problem of the files" ]]
  shows "policy       loaded"
  [[ $output =~ latest\ load\ \ load\ from\ /etc/zorvan/secpolicy\ at\ [0-9:\ -]+UTC:\ failed,\ [0-9]+\ errors ]]
  while IFS= read -r message; do
    shows "             $message"
  done < <(sed -n 's/^Error: //p' "$BATS_TEST_TMPDIR/load.err")
}

@test "a load that ends well takes the place of one that did not" {
  boot
  cp "$policy/domains/appDom" "$BATS_TEST_TMPDIR"
  echo "-s reed grant" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null || true
  cat "$BATS_TEST_TMPDIR/appDom" >"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy status
  exits 0
  [[ $output != *reed* ]]
}

@test "status of a load that was stopped" {
  rm "$policy/domains/ioFilterDom"
  find "$policy/domains" -type f -exec sed -i /ioFilterDom/d {} +
  "$SECPOLICY" --root "$root" boot 2>/dev/null || true
  secpolicy status
  exits 1
  [[ $output =~ latest\ load\ \ boot\ from\ /etc/zorvan/secpolicy\ at\ [0-9:\ -]+UTC:\ stopped,\ [0-9]+\ error ]]
  shows "             Failed to fetch domainID for IOFilter domain"
}

@test "of very many errors the first ones are shown" {
  boot
  for number in {1..30}; do
    echo "-x" >"$policy/domains/bad$number"
  done
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/load.err" || true
  local errors
  errors=$(grep -c '^Error: ' "$BATS_TEST_TMPDIR/load.err")
  secpolicy status
  exits 1
  [[ $(grep -c 'invalid policy rule type' <<<"$output") -eq 10 ]]
  shows "             and $((errors - 10)) more"
}

@test "status before anything was loaded" {
  secpolicy status
  exits 1
  [[ $stderr == "secpolicy: status: no policy is loaded. 'secpolicy --root $root boot' loads one" ]]
  shows "policy       not loaded"
  shows "latest load  none by this command"
  shows "domains      1: 1 permissive (hostDom)"
}

@test "a boot that fails leaves its message" {
  echo garbage >"$root/tardisks/broken.tgz"
  "$SECPOLICY" --root "$root" boot 2>"$BATS_TEST_TMPDIR/boot.err" || true
  secpolicy status
  exits 1
  shows "policy       not loaded"
  shows "             Unable to unpack tardisk broken.tgz: Unrecognized archive format"
}

@test "status names the saved state that was put back" {
  boot
  "$SECPOLICY" --root "$root" save before 2>/dev/null
  "$SECPOLICY" --root "$root" rollback before 2>/dev/null
  secpolicy status
  exits 0
  [[ $output =~ latest\ load\ \ rollback\ from\ before\ at\ [0-9:\ -]+UTC:\ done ]]
  secpolicy status --format json
  fits_schema status
}

@test "--format json" {
  boot
  secpolicy status --format json
  exits 0
  fits_schema status
  local total
  total=$(rules_of '-[a-z]')
  jq -e --argjson total "$total" '
    .schema == "secpolicy.status/1" and .loaded and .domains == 9 and .rules == $total and
    ([.rulesByKeyword[]] | add) == $total and .domainsByLevel.permissive == ["hostDom"] and
    .latestLoad.verb == "boot" and .latestLoad.ending == "done" and .latestLoad.errors == [] and
    (.latestLoad.time | fromdate) > 1700000000 and
    .tardisks[1] == {path: "/tardisks/monitor.tgz", label: "monitorImage"}' <<<"$output"
}

@test "--format json of a failed load, and of none" {
  secpolicy status --format json
  exits 1
  fits_schema status
  jq -e '.loaded == false and .latestLoad == null' <<<"$output"
  boot
  echo "-s reed grant" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null || true
  secpolicy status --format json
  exits 1
  fits_schema status
  jq -e '.latestLoad | .ending == "failed" and .errorCount == (.errors | length) and
    (.errors[0] | endswith("unknown system call '"'reed'"'"))' <<<"$output"
}

@test "control characters of a message do not reach the terminal" {
  boot
  printf -- '-s \033[2J grant\n' >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null || true
  secpolicy status
  exits 1
  [[ $output != *$'\033'* && $output == *"'^[[2J'"* ]]
}

@test "status tells what no file has any more, and what a load has removed of it" {
  boot
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  echo "-s read grant" >"$policy/domains/newDom"
  secpolicy load --keep
  rm "$policy/domains/newDom"
  secpolicy load --keep
  secpolicy status
  exits 0
  shows "left over    2 rules"
  shows "left over    domain newDom"
  secpolicy status --format json
  fits_schema status
  jq -e '.inNoFile == {domains: ["newDom"], rules: 2}' <<<"$output"
  secpolicy load
  secpolicy status
  [[ $output != *"left over"* ]]
  secpolicy status --format json
  jq -e '.latestLoad.removed == {domains: 1, rules: 2}' <<<"$output"
}
