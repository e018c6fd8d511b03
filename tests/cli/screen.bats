# What a person sees on a terminal: colors, lines that fit, and a pager; and that nobody else does.

load helper

setup() {
  make_root
  boot
}

@test "on a terminal, answers, severities, marks, levels and changes are colored" {
  local bad=$'\e[1;31m' doubtful=$'\e[1;33m' good=$'\e[32m' place=$'\e[36m' plain=$'\e[0m' size=200x500
  on_terminal why sshDom read /etc/ssh
  grep -qF "${good}yes$plain: sshDom may read" "$BATS_TEST_TMPDIR/screen"
  on_terminal why sshDom call mount || true
  grep -qF "${bad}no$plain: sshDom may not call" "$BATS_TEST_TMPDIR/screen"
  on_terminal status
  grep -qF "${good}enforcing$plain, 1 ${doubtful}permissive$plain" "$BATS_TEST_TMPDIR/screen"
  printf '%s\n' "-c cap_chwon grant" "-s mount grant" >"$policy/domains/appDom"
  on_terminal check || true
  grep -qF "appDom:1:4: ${bad}error$plain: unknown" "$BATS_TEST_TMPDIR/screen"
  grep -qF "    $good   ^~~~~~~~~$plain" "$BATS_TEST_TMPDIR/screen"
  grep -qF " ${doubtful}warning$plain: " "$BATS_TEST_TMPDIR/screen"
  echo "-s acct grant" >"$policy/domains/appDom"
  on_terminal load --plan
  grep -qF "$good  appDom: -s acct grant$plain" "$BATS_TEST_TMPDIR/screen"
  on_terminal diff installed /etc/zorvan/secpolicy || true
  grep -qF "$place@@ domain appDom$plain" "$BATS_TEST_TMPDIR/screen"
  grep -qF "$good+ -s acct grant$plain" "$BATS_TEST_TMPDIR/screen"
  grep -qF "$bad- -" "$BATS_TEST_TMPDIR/screen"
}

@test "--color, NO_COLOR and CLICOLOR_FORCE choose, and JSON and SARIF have no colors" {
  # colors WORD...: how many lines of this call are colored.
  colors() { { env "$@" 2>&1 || true; } | grep -c $'\e' || true; }
  local why=("$SECPOLICY" --root "$root" why sshDom read /etc/ssh)
  [[ $(colors "${why[@]}") -eq 0 ]]
  [[ $(colors "${why[@]}" --color always) -eq 1 ]]
  [[ $(colors NO_COLOR=1 "${why[@]}" --color always) -eq 1 ]]
  [[ $(colors CLICOLOR_FORCE=1 "${why[@]}") -eq 1 ]]
  [[ $(colors CLICOLOR_FORCE=0 "${why[@]}") -eq 0 ]]
  [[ $(colors CLICOLOR_FORCE=1 NO_COLOR=1 "${why[@]}") -eq 0 ]]
  [[ $(colors CLICOLOR_FORCE=1 "${why[@]}" --color never) -eq 0 ]]
  [[ $(colors "${why[@]}" --color always --format json) -eq 0 ]]
  [[ $(colors "$SECPOLICY" --root "$root" check --color always --format sarif) -eq 0 ]]
  on_terminal why sshDom read /etc/ssh --color never
  ! grep -q $'\e' "$BATS_TEST_TMPDIR/screen" || false
  run --separate-stderr "$SECPOLICY" why --color sometimes
  exits 2
}

@test "help and lists fit the terminal, and 80 columns where it does not tell" {
  local size columns words
  for size in 60x500 0x0; do
    columns=${size%x*}
    [[ $columns -gt 0 ]] || columns=80
    for words in "check --help" "help" "explain" "explain cannot-start" "status"; do
      SECPOLICY_PAGER='' on_terminal --color never $words || true
      # Texts of one word are not broken, nor is the last line, which tells how it went.
      run ! grep -nE "^.{$((columns + 1))}" <(sed '/^secpolicy: /d; s/  secpolicy .*//' "$BATS_TEST_TMPDIR/screen")
    done
  done
  grep -q '^                              ' <(size=60x500 on_terminal check --help; cat "$BATS_TEST_TMPDIR/screen")
}

@test "what is longer than the terminal goes to the pager, and nothing else" {
  local size=80x24 all
  all=$("$SECPOLICY" --root "$root" display 2>&1 | wc -l)
  SECPOLICY_PAGER="sed s/^/paged:/" on_terminal display
  [[ $(grep -c '^paged:' "$BATS_TEST_TMPDIR/screen") -eq $all ]]
  [[ $(tail -n 1 "$BATS_TEST_TMPDIR/screen") == "paged:secpolicy: display: done" ]]
  PAGER="sed s/^/other:/" on_terminal display
  [[ $(grep -c '^other:' "$BATS_TEST_TMPDIR/screen") -eq $all ]]
  SECPOLICY_PAGER="sed s/^/paged:/" on_terminal --help
  [[ $(grep -vc '^paged:' "$BATS_TEST_TMPDIR/screen") -eq 0 ]]
  local long plain
  "$SECPOLICY" --root "$root" save good
  for long in "words calls" "saved show good" "rules --call read"; do
    SECPOLICY_PAGER="sed s/^/paged:/" size=80x4 on_terminal $long
    [[ $(grep -vc '^paged:' "$BATS_TEST_TMPDIR/screen") -eq 0 ]]
  done
  for plain in "--no-pager display" history "explain tab" "graph"; do
    SECPOLICY_PAGER="sed s/^/paged:/" on_terminal $plain
    [[ $(grep -c '^paged:' "$BATS_TEST_TMPDIR/screen") -eq 0 && -s $BATS_TEST_TMPDIR/screen ]]
  done
  SECPOLICY_PAGER="sed s/^/paged:/" "$SECPOLICY" --root "$root" display >"$BATS_TEST_TMPDIR/out" 2>&1
  [[ $(grep -c '^paged:' "$BATS_TEST_TMPDIR/out") -eq 0 ]]
}

@test "the exit status is that of the verb, whatever the pager does" {
  local size=80x5 status
  printf '%s\n' "-c cap_chwon grant" "-s nothing grant" >"$policy/domains/appDom"
  for pager in "head -n 1" false no-such-pager "" cat; do
    status=0
    SECPOLICY_PAGER=$pager on_terminal check || status=$?
    [[ $status -eq 1 ]]
    SECPOLICY_PAGER=$pager on_terminal display
  done
  SECPOLICY_PAGER=no-such-pager on_terminal display
  [[ $(tail -n 1 "$BATS_TEST_TMPDIR/screen") == "secpolicy: display: done" ]]
}

@test "less shows the text, is left with q, and starts no shell" {
  size=80x24 keys=q on_terminal display
  grep -q 'Domain Name: ' "$BATS_TEST_TMPDIR/screen"
  ! grep -q 'secpolicy: display: done' "$BATS_TEST_TMPDIR/screen" || false
  size=80x24 SECPOLICY_PAGER="env" on_terminal display
  grep -qx LESSSECURE=1 "$BATS_TEST_TMPDIR/screen"
}

@test "less shows colors also where it is named without a word of them" {
  size=80x24 PAGER=env on_terminal display
  grep -qx LESS=FRX "$BATS_TEST_TMPDIR/screen"
  size=80x24 PAGER=env LESS=M on_terminal display
  grep -qx LESS=M "$BATS_TEST_TMPDIR/screen"
}
