# What may come out of names and arguments, and what of it reaches a terminal.

load helper

# An escape, the same as one character of the second set, as a byte that is no text, and a mark that
# turns the direction of the text.
ESCAPE=$'\033]0;x\a'
SECOND=$'\xc2\x9b31m'
BYTE=$'\x9b31m'
TURN=$'\xe2\x80\xae'

setup() {
  root=$BATS_TEST_TMPDIR/root
  policy=$root/etc/zorvan/secpolicy
  lay_out_example "$root"
  printf '%s\n' "o$ESCAPE" "o$SECOND" "o$BYTE" "o$TURN" >"$policy/objects/odd"
  printf '%s\n' "-r /x$ESCAPE r" "-r /x$SECOND r" "-r /x$BYTE r" "-r /x$TURN r" >"$policy/domains/d$SECOND"
  boot
}

# is_safe FILE...: none of them holds what commands a terminal.
is_safe() {
  python3 - "$@" <<'END'
import re, sys
for name in sys.argv[1:]:
    data = open(name, "rb").read()
    text = data.decode("utf-8", "surrogateescape")
    found = re.search("[\x00-\x08\x0b-\x1f\x7f-\x9f\u061c\u200e\u200f\u2028-\u202e\u2066-\u2069\udc80-\udcff]", text)
    if found:
        sys.exit(f"{name}: {found.group()!r} in {text[max(0, found.start() - 60):found.end() + 20]!r}")
END
}

# is_quiet ARGUMENT...: what this verb writes is safe, also where it does not go to a terminal.
is_quiet() {
  "$SECPOLICY" --root "$root" "$@" >"$BATS_TEST_TMPDIR/out" 2>"$BATS_TEST_TMPDIR/err" || true
  [[ -s $BATS_TEST_TMPDIR/out || -s $BATS_TEST_TMPDIR/err ]]
  is_safe "$BATS_TEST_TMPDIR/out" "$BATS_TEST_TMPDIR/err"
}

@test "display keeps every byte where it does not go to a terminal" {
  "$SECPOLICY" --root "$root" display >"$BATS_TEST_TMPDIR/out" 2>/dev/null
  for bytes in "$ESCAPE" "$SECOND" "$BYTE" "$TURN"; do
    LC_ALL=C grep -qaF -- "-r /x$bytes r" "$BATS_TEST_TMPDIR/out"
  done
}

@test "on a terminal, display shows them" {
  on_terminal --no-pager display
  is_safe "$BATS_TEST_TMPDIR/screen"
  for shown in '^[]0;x^G' '<U+009B>31m' '<9B>31m' '<U+202E>'; do
    grep -qF -- "-r /x$shown r" "$BATS_TEST_TMPDIR/screen"
  done
}

@test "on a terminal, the errors and the progress of a load show them" {
  printf '%s\n' "/nope$SECOND unlabeled" "/nope$ESCAPE unlabeled" >"$policy/fileLabels/odd"
  echo "-s x$TURN grant" >>"$policy/domains/appDom"
  on_terminal -v load || true
  is_safe "$BATS_TEST_TMPDIR/screen"
  grep -qF 'for file /nope<U+009B>31m' "$BATS_TEST_TMPDIR/screen"
  grep -qF "x<U+202E>" "$BATS_TEST_TMPDIR/screen"
}

@test "on a terminal that is wide enough, everything else is as elsewhere but colored" {
  local verb
  for verb in "who-can use cap_net_bind_service" status "why sshDom read /etc/ssh" --help "check --format json" check; do
    size=200x500 on_terminal $verb || true
    "$SECPOLICY" --root "$root" $verb >"$BATS_TEST_TMPDIR/out" 2>&1 || true
    diff "$BATS_TEST_TMPDIR/out" <(without_colors "$BATS_TEST_TMPDIR/screen")
    size=200x500 NO_COLOR=1 on_terminal $verb || true
    diff "$BATS_TEST_TMPDIR/out" "$BATS_TEST_TMPDIR/screen"
  done
}

@test "colored or not, a name commands no terminal" {
  on_terminal why "sshDom" read "/x$ESCAPE$SECOND" || true
  is_safe <(without_colors "$BATS_TEST_TMPDIR/screen")
  "$SECPOLICY" --root "$root" --color always check >"$BATS_TEST_TMPDIR/out" 2>&1 || true
  grep -q $'\e' "$BATS_TEST_TMPDIR/out"
  is_safe <(without_colors "$BATS_TEST_TMPDIR/out")
}

@test "what the verbs write themselves is safe everywhere" {
  is_quiet status
  is_quiet graph
  is_quiet graph --domain "d$SECOND"
  is_quiet who-can read "/x$SECOND"
  is_quiet why "d$SECOND" read "/x$ESCAPE"
  is_quiet why "d$ESCAPE" read "/x$BYTE"
  is_quiet why appDom call "x$TURN"
  is_quiet diff installed "/$TURN"
  is_quiet save "a$ESCAPE"
  is_quiet rollback "z$SECOND"
  is_quiet load "/z$ESCAPE"
  is_quiet settings enforcement "a$TURN"
  is_quiet label get "/nix$ESCAPE"
  is_quiet label set "x$SECOND" /etc
  is_quiet "st$ESCAPE"
  is_quiet check "/$BYTE"
}

@test "so is where the root is not" {
  run --separate-stderr "$SECPOLICY" --root "/z$ESCAPE$SECOND" status
  exits 1
  [[ $stderr == *'/z^[]0;x^G<U+009B>31m'* && $stderr != *$'\033'* ]]
}

@test "JSON says the same in a safe way" {
  is_quiet display --format json
  "$SECPOLICY" --root "$root" display --format json 2>/dev/null |
    jq -e --arg second "o$SECOND" --arg turn "o$TURN" --arg escape "o$ESCAPE" \
      '[.objects[].name] | index($second) and index($turn) and index($escape)'
}
