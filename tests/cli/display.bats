# secpolicy display: all that is installed, or one domain of it, as text and as JSON.

load helper

@test "display shows domains with all eight kinds of rule" {
  boot
  secpolicy display
  exits 0
  [[ $stderr == "secpolicy: display: done" ]]
  shows "Policy set in the kernel"
  for kind in a c d f p r s u; do
    grep -q "^-$kind " <<<"$output"
  done
  shows "-d vmProgram globalVMDom exec grant"
  shows "-p connect_port 1024 65535 grant"
  shows "-r /usr/sbin/sshd rx"
}

@test "display shows objects with their identifiers and tardisks with their labels" {
  boot
  secpolicy display
  shows "Objects Defined: Name (Kernel Id)"
  grep -qE '^sshProgram \([0-9]+\)$' <<<"$output"
  shows "Tardisk Path (label)"
  shows "/tardisks/base.tgz (tardiskDefault)"
  shows "/tardisks/monitor.tgz (monitorImage)"
}

@test "display of one domain shows only that one" {
  boot
  secpolicy display "$(domain_id sshDom)"
  exits 0
  [[ $(grep -c '^Domain Name: ' <<<"$output") -eq 1 ]]
  [[ $output == *"Domain Name: sshDom "* ]]
}

@test "a domain is named by its name or its number" {
  boot
  secpolicy display sshDom
  exits 0
  local by_name=$output
  [[ $(grep '^Domain Name: ' <<<"$output") == "Domain Name: sshDom "* ]]
  secpolicy display "$(domain_id sshDom)"
  [[ $output == "$by_name" ]]
  secpolicy display --format json sshDom
  [[ $(jq -c '.domains | map(.name)' <<<"$output") == '["sshDom"]' ]]
  for word in 3x 0x3 -3 +3 " 3" "" 400 4294967295 4294967296; do
    secpolicy display -- "$word"
    exits 2
    [[ -z $output && $stderr == "secpolicy: display: there is no domain '$word'"* ]]
  done
  secpolicy display sshDmo
  wrong_usage display "display: there is no domain 'sshDmo'; did you mean 'sshDom'?"
}

@test "display where nothing was booted says what to do" {
  secpolicy display sshDom
  exits 1
  [[ $stderr == "secpolicy: display: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first." ]]
  boot
  rm -r "$root/tardisks"
  secpolicy display
  exits 1
  ends_with "secpolicy: display: Could not open tardisk dir /tardisks/. There is no directory /tardisks/ below this root: name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
}

# late_tardisk: an image that came after the boot, with a label that no object has.
late_tardisk() {
  echo new >"$root/tardisks/late.tgz"
  python3 - "$root/tardisks" <<'END'
import os, sys
name = next(name for name in os.listxattr(sys.argv[1]) if "zorvan" in name)
os.setxattr(sys.argv[1] + "/late.tgz", name, b"\xfe\xff\xff\x7f")
END
}

@test "a tardisk whose label cannot be read fails the display" {
  boot
  late_tardisk
  secpolicy display
  exits 1
  [[ $stderr == *"Error: Error in reading tardisk label: (/tardisks/late.tgz): "* ]]
  ends_with "secpolicy: display: failed (1 error above)"
}

@test "--format json has the same domains, rules, objects and tardisks" {
  boot
  local text
  text=$("$SECPOLICY" --root "$root" display 2>/dev/null)
  secpolicy display --format json
  exits 0
  [[ $stderr == "secpolicy: display: done" ]]
  fits_schema display
  [[ $(jq -r .schema <<<"$output") == secpolicy.display/1 ]]
  diff <(jq -r '.domains[] | "Domain Name: \(.name) Domain ID :\(.id) Enforcement Level: \(.level)"' <<<"$output") \
    <(grep '^Domain Name: ' <<<"$text")
  diff <(jq -r '.domains[] | "State: \(.state) RefCount: \(.references) WorldRefCount: \(.worldReferences) defaultDom: \(.defaultRules)"' <<<"$output") \
    <(grep '^State: ' <<<"$text")
  diff <(jq -r '.domains[].rules[].text' <<<"$output") <(grep '^-[a-z] ' <<<"$text")
  diff <(jq -r '.objects[] | "\(.name) (\(.id))"' <<<"$output") <(grep -E '^[A-Za-z]+ \([0-9]+\)$' <<<"$text")
  diff <(jq -r '.tardisks[] | "\(.path) (\(.label))"' <<<"$output") <(grep '^/tardisks/' <<<"$text" | sort)
}

@test "--format json takes rules apart" {
  boot
  secpolicy display --format json "$(domain_id appDom)"
  exits 0
  fits_schema display
  [[ $(jq -c '.domains | map(.name)' <<<"$output") == '["appDom"]' ]]
  jq -e '.domains[0].rules | map({keyword, words, grant}) |
    index({keyword: "-p", words: ["connect_port", "1024", "65535"], grant: true}) != null and
    index({keyword: "-s", words: ["mount"], grant: false}) != null' <<<"$output"
  secpolicy display --format json "$(domain_id sshDom)"
  jq -e '.domains[0].rules | any(.keyword == "-r" and .words == ["/etc/ssh", "r"] and (has("grant") | not))' <<<"$output"
}

@test "--format json keeps a path of any letters as one word" {
  printf -- '-r /odd\tpath\n-r /none\n' >>"$policy/domains/appDom"
  boot
  secpolicy display --format json
  exits 0
  jq -e '[.domains[].rules[] | select(.keyword == "-r") | .words] |
    any(. == ["/odd\tpath", ""]) and any(. == ["/none", ""])' <<<"$output"
  # A program can make rules that no file can hold.
  sqlite3 "$root/run/secpolicy/host.db" \
    "UPDATE file_policy SET path = '/two' || char(10) || 'lines' || char(10) WHERE path = '/none'"
  secpolicy display --format json
  jq -e '[.domains[].rules[] | select(.keyword == "-r") | .words] | any(. == ["/two\nlines\n", ""])' <<<"$output"
}

@test "--format json of a tardisk whose label cannot be read" {
  boot
  late_tardisk
  secpolicy display --format json
  exits 0
  fits_schema display
  [[ $(jq -c '.tardisks[] | select(.path == "/tardisks/late.tgz") | .label' <<<"$output") == null ]]
}

@test "--format json where the tardisks have gone says what to do, and an unknown format is wrong usage" {
  boot
  rm -r "$root/tardisks"
  secpolicy display --format json
  exits 1
  [[ -z $output ]]
  ends_with "secpolicy: display: Could not open tardisk dir /tardisks/. There is no directory /tardisks/ below this root: name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
  secpolicy display --format xml
  wrong_usage display "--format: there is no 'xml'; there are text and json"
}
