# The command explains itself, and refuses what it does not understand.

load helper

@test "--help shows every verb and the exit status" {
  run --separate-stderr "$SECPOLICY" --help
  exits 0
  for verb in init new explain lsp bundle boot check load load-early restore status display drift domain file-policy capability param-check run exec observe features why who-can rules path words graph diff save history saved rollback label settings module; do
    [[ $output == *"  $verb "* ]]
    grep --quiet --extended-regexp "^  secpolicy( --root r)? $verb( |$)" <<<"$output"
  done
  [[ $output == *"Exit status: 0 all well, 1 something failed, 2 wrong usage, 3 stopped"* ]]
}

@test "the example of --help runs as it is typed" {
  cd "$BATS_TEST_TMPDIR"
  mkdir bin
  ln -s "$SECPOLICY" bin/secpolicy
  local line count=0
  while IFS= read -r line; do
    run --separate-stderr env PATH="$PWD/bin:$PATH" bash -c "$line"
    # That two policies differ is no failure.
    [[ $line == *" diff "* ]] && status=$((status == 1 ? 0 : 1))
    exits 0 || { echo "of: $line" && return 1; }
    ((++count))
  done < <("$SECPOLICY" --help | sed -n '/^For example/,/^$/s/^  //p')
  ((count > 25))
}

@test "--help of every verb has an example" {
  for verb in init new explain lsp bundle boot check load load-early restore status display drift domain file-policy capability param-check run exec observe features why who-can rules path words graph diff save history saved rollback label settings module; do
    run --separate-stderr "$SECPOLICY" "$verb" --help
    exits 0
    [[ $output == *"Example"*"secpolicy "*"$verb"* ]]
  done
}

# words_at WORD...: what is offered behind these words.
words_at() { "$SECPOLICY" __complete "$@" "" | tail -n +2 | cut -f 1; }

# every_help: what --help tells of the command, of each verb and of each kind, and 'explain' of each code.
every_help() {
  local verb kind
  "$SECPOLICY" --help
  "$SECPOLICY" explain
  for verb in $(words_at); do
    "$SECPOLICY" "$verb" --help
    "$SECPOLICY" "$verb" --help | grep -q '^Usage: .* SUBCOMMAND$' || continue
    for kind in $(words_at "$verb"); do "$SECPOLICY" "$verb" "$kind" --help; done
  done
}

words_of() { tr -cs "A-Za-z_'" '\n' | tr '[:upper:]' '[:lower:]' | sed "s/^'*//; s/'*$//" | sort -u; }

@test "no word of the help is misspelt: the documentation has it, too" {
  every_help | words_of >"$BATS_TEST_TMPDIR/help"
  [[ $(wc -l <"$BATS_TEST_TMPDIR/help") -gt 750 ]]
  { find "$SOURCE"/README.md "$SOURCE"/docs "$SOURCE"/{host,policy,secpolicy,tools} -name '*.md' -o -name '*.[0-9]' -o -name '*.h' &&
    echo "$BATS_TEST_TMPDIR/names"; } >"$BATS_TEST_TMPDIR/files"
  echo "aligns attaching clipboard detach ioFilterData my NEW_KEY newly nightly pdf Positionals skeleton Subcommands Tpdf" >"$BATS_TEST_TMPDIR/names"
  xargs cat <"$BATS_TEST_TMPDIR/files" | words_of >"$BATS_TEST_TMPDIR/known"
  diff /dev/null <(comm -23 "$BATS_TEST_TMPDIR/help" "$BATS_TEST_TMPDIR/known")
}

@test "help and the version need no arguments of the verb" {
  for verb in why label; do
    for words in "--help $verb" "$verb --help"; do
      run --separate-stderr "$SECPOLICY" $words
      exits 0
      [[ $output == *"Usage: secpolicy $verb "* ]]
    done
  done
  run --separate-stderr "$SECPOLICY" why --version
  exits 0
  [[ $output == "secpolicy "[0-9]* ]]
}

@test "--version names the version" {
  run --separate-stderr "$SECPOLICY" --version
  exits 0
  [[ $output =~ ^secpolicy\ [0-9]+\.[0-9]+\.[0-9]+$ ]]
}

@test "the command alone and help show the verbs by group, and help VERB explains one" {
  run --separate-stderr "$SECPOLICY"
  exits 0
  local all=$output
  [[ $all == *$'\n\nWrite a policy:\n  init '*$'\n\nInstall it:\n  boot '*$'\n\nGo back:\n  save '* ]]
  for words in help --help; do
    run --separate-stderr "$SECPOLICY" $words
    exits 0
    [[ $output == "$all" ]]
  done
  run --separate-stderr "$SECPOLICY" why --help
  local one=$output
  run --separate-stderr "$SECPOLICY" help why
  exits 0
  [[ $output == "$one" ]]
  for words in "--root / help why" "--no-pager --color never help why" "--root=/ help why"; do
    run --separate-stderr "$SECPOLICY" $words
    answers 0 "$one"
  done
  run --separate-stderr "$SECPOLICY" --root / help
  answers 0 "$all"
  run --separate-stderr "$SECPOLICY" help nothing
  wrong_usage "" "there is no verb or option 'nothing'"
}

@test "no verb, an unknown verb and an unknown option are wrong usage" {
  secpolicy
  wrong_usage "" "a verb is required"
  run --separate-stderr "$SECPOLICY" lod
  wrong_usage "" "there is no verb or option 'lod'; did you mean 'load'?"
  run --separate-stderr "$SECPOLICY" load --rot /x
  wrong_usage load "there is no option '--rot'; did you mean '--root'?"
}

@test "a word too many and a word too few are wrong usage" {
  run --separate-stderr "$SECPOLICY" load a b
  wrong_usage load "'b' is one word too many"
  run --separate-stderr "$SECPOLICY" settings
  wrong_usage settings "one of list, unset, option, enforcement is required"
  run --separate-stderr "$SECPOLICY" settings enforcement
  wrong_usage "settings enforcement" "DOMAIN is required"
  run --separate-stderr "$SECPOLICY" --root
  wrong_usage "" "--root needs a value"
}

@test "wrong usage changes nothing" {
  secpolicy boot extra
  wrong_usage boot "'extra' is one word too many"
  [[ ! -e $root/usr ]]
}

@test "the manual page, --help and the completions agree" {
  boot
  secpolicy save good
  python3 "$SOURCE/tests/cli/described.py" "$SECPOLICY" "$SOURCE/docs/man/secpolicy.8" "$root"
}
