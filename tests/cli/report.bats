# secpolicy report: one file with everything in it, whole or not at all; what the page shows of it is tested in
# tests/report.

load helper

# data_of FILE: the data of a page.
data_of() { sed -n 's|^<script type="application/json" id="data">\(.*\)</script>$|\1|p' "$1"; }

@test "the same policy makes the same page, which loads nothing" {
  boot
  secpolicy report -o /first.html
  exits 0
  ends_with 'secpolicy: report: done (9 domains, 159 rules)'
  [[ -z $output ]]
  "$SECPOLICY" --root "$root" report installed -o - >"$BATS_TEST_TMPDIR/second.html" 2>/dev/null
  cmp "$root/first.html" "$BATS_TEST_TMPDIR/second.html"
  [[ $(stat -c %a "$root/first.html") == 644 ]]
  run ! grep -E 'src=|https?:' <(sed 's|http://www.w3.org/2000/svg||' "$root/first.html")
  [[ $(data_of "$root/first.html" | jq '[.domains[].count] | add') == 159 ]]
}

@test "what the data names is what the script reads" {
  boot
  printf -- '-s ptrace grant\n' >>"$policy/domains/sshDom"
  secpolicy report /etc/zorvan/secpolicy --against installed -o /page.html
  secpolicy report -o /installed.html
  exits 0
  local names name
  # The names of tables of words are those of kinds, and a comparison is that of 'diff'.
  names=$(for page in page installed; do data_of "$root/$page.html"; done | jq -sr 'del(.[].words, .[].against.schema) | [.. | objects | keys[]] | unique[]')
  [[ $names == *strings* ]]
  for name in $names; do
    grep -qw "$name" "$SOURCE"/tools/secpolicy/report/page/*.js || { echo "nothing reads $name" && false; }
  done
}

@test "labels and checks have their columns" {
  boot
  secpolicy report -o /page.html
  local labels checks
  labels=$(data_of "$root/page.html" | jq -c '.strings as $s | .labels[] | [$s[.[0]], .[1], $s[.[2]], $s[.[3]], .[4]]')
  [[ $labels == *'["/usr/bin",1,"hostProgram","/etc/zorvan/secpolicy/fileLabels/base",5]'* ]]
  checks=$(data_of "$root/page.html" | jq -c '.strings as $s | .domains[] | select($s[.name] == "sshDom").checks[] |
    [$s[.[0]], (.[1][] | .[:4])]')
  [[ $checks == '["bind_port",["0","0",1,0],["1","21",0,0],["22","22",1,0],["23","18446744073709551615",0,0]]' ]]
}

@test "rules whose line is gone are marked" {
  boot
  sed -i '/^-c cap_setgid /d' "$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load --keep 2>/dev/null
  secpolicy report -o /page.html
  [[ $(data_of "$root/page.html" | jq -c '.strings as $s | .rules as $r | [$r.gone[] | [$r.kind[.], $s[$r.words[3 * .]]]]') == \
    "[[$(data_of "$root/page.html" | jq '[.kinds[].keyword] | index("-c")'),\"cap_setgid\"]]" ]]
}

@test "each question has what is missing, those about files for each kind of file" {
  boot
  secpolicy report -o /page.html
  local questions
  questions=$(data_of "$root/page.html" | jq .questions)
  [[ $(jq -c 'map(has("files") != has("missing")) | unique' <<<"$questions") == '[true]' ]]
  [[ $(jq -c '.[] | select(.action == "read").files | map(.missing)' <<<"$questions") == '[["-r {0} r"]]' ]]
  [[ $(jq -c '.[] | select(.action == "call").missing' <<<"$questions") == '["-s {0} grant"]' ]]
}

@test "only its own script and style may run" {
  boot
  secpolicy report -o /page.html
  local part name hash
  for part in script style; do
    name=$part-src
    hash=$(python3 -c '
import base64, hashlib, re, sys
text = re.findall(f"<{sys.argv[2]}>(.*?)</{sys.argv[2]}>", open(sys.argv[1]).read(), re.DOTALL)
assert len(text) == 1
print(base64.b64encode(hashlib.sha256(text[0].encode()).digest()).decode())' "$root/page.html" "$part")
    grep -F "$name 'sha256-$hash'" "$root/page.html"
  done
  grep -F "default-src 'none'" "$root/page.html"
}

@test "a directory, a saved state and a comparison" {
  boot
  secpolicy save good
  secpolicy report good -o - --title 'Sword & shield'
  exits 0
  shows '<title>Sword &amp; shield</title>'
  printf -- '-s ptrace grant\n' >>"$policy/domains/sshDom"
  secpolicy report /etc/zorvan/secpolicy --against installed -o /page.html
  exits 0
  [[ $(data_of "$root/page.html" | jq -c '.against.domains[0] | [.name, .rules.added]') == '["sshDom",["-s ptrace grant"]]' ]]
}

@test "what cannot be made leaves what there was" {
  secpolicy report -o /page.html
  fails_with report "nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
  boot
  echo old >"$root/page.html"
  echo '-a nothing read grant' >>"$policy/domains/sshDom"
  secpolicy report ./etc/zorvan/secpolicy -o /page.html
  exits 1
  ends_with "secpolicy: report: the policy in ./etc/zorvan/secpolicy has errors (above), so no report was made. 'secpolicy --root $root check ./etc/zorvan/secpolicy' shows every one with its place."
  [[ $(<"$root/page.html") == old ]]
  secpolicy report /none -o /page.html
  fails_with report "there is no directory /none below this root. Name a policy directory, a saved state, or 'installed'."
  secpolicy report -o /none/page.html
  fails_with report 'cannot write /none/page.html: there is no directory /none'
  secpolicy report -o ''
  fails_with report 'cannot write a file without a name'
  secpolicy report -o .
  fails_with report 'cannot write .: Is a directory'
  secpolicy report
  exits 2
}

@test "what is no file is written into, and stays" {
  boot
  secpolicy report -o /page.html
  mkfifo "$root/pipe"
  ln -s pipe "$root/link"
  local name
  for name in pipe link; do
    cat "$root/pipe" >"$BATS_TEST_TMPDIR/read.html" 3>&- &
    secpolicy report -o "/$name"
    exits 0
    wait $!
    cmp "$root/page.html" "$BATS_TEST_TMPDIR/read.html"
  done
  [[ -p $root/pipe && -L $root/link ]]
}

@test "standard output is written on, whatever it is called" {
  boot
  secpolicy report -o /page.html
  echo before >"$root/output"
  "$SECPOLICY" --root "$root" report -o /output >>"$root/output" 2>/dev/null
  cmp <(echo before && cat "$root/page.html") "$root/output"
}
