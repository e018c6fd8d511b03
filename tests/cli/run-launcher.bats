# The launcher as it is typed: hunts for a command line that is taken for another, and for a program
# that is started as another or although something is wrong. What a plan does is tested elsewhere.

load helper

# The plan of a domain that is disabled: it starts what it is told to.
setup() {
  LAUNCHER=$BUILD_DIR/bin/secpolicy-run
  plan=$BATS_TEST_TMPDIR/plan
  cp "$SOURCE/fuzz/corpus/plan_file/disabled" "$plan"
  chmod 644 "$plan"
}

launch() {
  run --separate-stderr "$LAUNCHER" "$@"
}

# misses NAME: there is no such program.
misses() {
  run -127 --separate-stderr "$LAUNCHER" --plan "$plan" -- "$1"
  refuses "there is no program ${2-$1}" 127
}

# refuses MESSAGE [STATUS]: nothing was started, and this line says why.
refuses() {
  exits "${2-126}" && [[ -z $output && $stderr == "secpolicy-run: $1" ]] && return
  printf 'not just: %s\nbut:\n%s\n%s\n' "$1" "$output" "$stderr"
  return 1
}

@test "it needs no library and no loader" {
  run readelf -lW "$LAUNCHER"
  exits 0
  [[ $output != *INTERP* ]]
  run readelf -dW "$LAUNCHER"
  [[ $output != *NEEDED* ]]
}

@test "what is no broker is not asked" {
  SECPOLICY_BROKER=0 launch --ask -- true </dev/null
  refuses "cannot ask the broker of this domain: Socket operation on non-socket"
}

@test "--help and --version print and start nothing" {
  launch --version
  answers 0 "secpolicy-run $(sed -n 's/^project(secpolicy VERSION \([^ ]*\).*/\1/p' "$SOURCE/CMakeLists.txt")"
  launch --help --plan "$plan" -- /bin/echo started
  exits 0
  [[ $output == "Usage: secpolicy-run --plan PLAN "* && $output != *started ]]
}

@test "what it prints and nobody gets is a failure" {
  run --separate-stderr bash -c '"$0" --help >/dev/full' "$LAUNCHER"
  refuses "cannot write to standard output: No space left on device"
}

@test "a command gets its arguments and its environment, and its exit status is passed on" {
  # shellcheck disable=SC2016
  COLOUR=blue launch --plan "$plan" -- sh -c 'echo "$0 $1 $COLOUR"; exit 7' --plan ' two words'
  answers 7 "--plan  two words blue"
}

@test "a command is looked up in PATH as a shell does" {
  mkdir "$BATS_TEST_TMPDIR/first" "$BATS_TEST_TMPDIR/second" "$BATS_TEST_TMPDIR/third"
  cd "$BATS_TEST_TMPDIR/third"
  printf '#!/bin/sh\necho second\n' >../second/tool
  printf '#!/bin/sh\necho here\n' >tool
  touch ../first/tool
  mkdir ../first/directory
  run --separate-stderr env PATH=$BATS_TEST_TMPDIR/first: "$LAUNCHER" --plan "$plan" -- tool
  refuses "cannot execute tool: it is not executable; 'chmod +x' makes it so"
  chmod +x tool ../second/tool
  run --separate-stderr env PATH=$BATS_TEST_TMPDIR/first:$BATS_TEST_TMPDIR/second: "$LAUNCHER" --plan "$plan" -- tool
  answers 0 second
  run --separate-stderr env PATH=$BATS_TEST_TMPDIR/first::$BATS_TEST_TMPDIR/second "$LAUNCHER" --plan "$plan" -- tool
  answers 0 here
  run --separate-stderr env PATH=$BATS_TEST_TMPDIR/first "$LAUNCHER" --plan "$plan" -- directory
  refuses "cannot execute directory: Permission denied"
  launch --plan "$plan" -- ./tool
  answers 0 here
  run --separate-stderr env -u PATH "$LAUNCHER" --plan "$plan" -- echo usual
  answers 0 usual
}

@test "a command that is not there ends it with 127" {
  misses no-such-program
  misses /no/such/program
  misses /etc/passwd/program
  run -127 --separate-stderr "$LAUNCHER" --plan "$plan" -- ""
  [[ $stderr =~ ^"secpolicy-run: there is no program"\ ?$ ]]
}

@test "what is no program ends it with 126" {
  launch --plan "$plan" -- /etc/passwd
  refuses "cannot execute /etc/passwd: it is not executable; 'chmod +x' makes it so"
  launch --plan "$plan" -- /etc
  refuses "cannot execute /etc: Permission denied"
  printf 'neither\n' >"$BATS_TEST_TMPDIR/text"
  chmod +x "$BATS_TEST_TMPDIR/text"
  launch --plan "$plan" -- "$BATS_TEST_TMPDIR/text"
  refuses "cannot execute $BATS_TEST_TMPDIR/text: Exec format error"
}

@test "what is wrong with the command line is said" {
  usage=". 'secpolicy-run --help' explains the usage"
  launch
  refuses "no plan is named$usage"
  launch -- true
  refuses "no plan is named$usage"
  launch --plan
  refuses "--plan needs a value$usage"
  launch --plan "$plan"
  refuses "no command is named$usage"
  launch --plan "$plan" --
  refuses "no command is named$usage"
  launch --plan "$plan" true
  refuses "there is no option true; the command stands behind --$usage"
  launch --plan "$plan" --keep-fd -- true
  refuses "--keep-fd needs the number of a descriptor, not --$usage"
  launch --plan "$plan" --keep-fd -1 -- true
  refuses "--keep-fd needs the number of a descriptor, not -1$usage"
  launch --plan "$plan" --keep-fd 4294967296 -- true
  refuses "--keep-fd needs the number of a descriptor, not 4294967296$usage"
  launch --plan "$plan" --keep-fd 77 -- true
  refuses "descriptor 77 of --keep-fd is not open"
  launch --plan "$plan" --program 77 -- true
  refuses "descriptor 77 of --program is not open"
  launch --plan "$plan" --module 77 -- true
  refuses "descriptor 77 of --module is not open"
  launch --plan "$plan" --module 0 --keep-fd 0 -- true
  refuses "--module takes no --keep-fd$usage"
  launch --module 0 -- true
  refuses "no plan is named$usage"
  launch --ask --module 0 -- true
  refuses "--ask takes no other option$usage"
}

@test "a name commands no terminal" {
  misses $'no\e[2Jprogram\n' "no^[[2Jprogram^J"
}

@test "it takes no rights that its caller does not have" {
  [[ $(id -u) -eq 0 ]] || skip "only root can make such a program"
  chmod 755 "$BATS_TEST_TMPDIR" "$BATS_RUN_TMPDIR" "$(dirname "$BATS_TEST_TMPDIR")"
  cp "$LAUNCHER" "$BATS_TEST_TMPDIR/launcher"
  chmod 755 "$BATS_TEST_TMPDIR/launcher"
  run --separate-stderr setpriv --reuid 65534 --clear-groups "$BATS_TEST_TMPDIR/launcher" --plan "$plan" -- id -u
  answers 0 65534
  chmod 4755 "$BATS_TEST_TMPDIR/launcher"
  run --separate-stderr setpriv --reuid 65534 --clear-groups "$BATS_TEST_TMPDIR/launcher" --plan "$plan" -- id -u
  refuses "this program gives rights up and may not be installed so that it gets some (chmod u-s,g-s)"
}
