# The command explains itself, and refuses what it does not understand.

load helper

@test "--help shows every verb and the exit status" {
  run --separate-stderr "$SECPOLICY" --help
  exits 0
  for verb in boot check load load-early restore status display why who-can graph diff save history rollback label settings; do
    [[ $output == *"  $verb "* ]]
    [[ $output == *"secpolicy --root ./r $verb"* ]]
  done
  [[ $output == *"Exit status: 0 all well, 1 something failed, 2 wrong usage, 3 stopped"* ]]
}

@test "--help of every verb has an example" {
  for verb in boot check load load-early restore status display why who-can graph diff save history rollback label settings; do
    run --separate-stderr "$SECPOLICY" "$verb" --help
    exits 0
    [[ $output == *"Example"*"secpolicy "*"$verb"* ]]
  done
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

@test "no verb, an unknown verb and an unknown option are wrong usage" {
  run --separate-stderr "$SECPOLICY"
  exits 2
  [[ $stderr == "secpolicy: A subcommand is required
'secpolicy --help' explains the usage." ]]
  [[ -z $output ]]
  run --separate-stderr "$SECPOLICY" lod
  exits 2
  [[ $stderr == "secpolicy: there is no verb or option 'lod'; did you mean 'load'?
'secpolicy --help' explains the usage." ]]
  run --separate-stderr "$SECPOLICY" load --rot /x
  exits 2
  [[ $stderr == *"--rot
'secpolicy load --help' explains the usage." ]]
}

@test "a word too many and a word too few are wrong usage" {
  run --separate-stderr "$SECPOLICY" load a b
  exits 2
  run --separate-stderr "$SECPOLICY" settings
  exits 2
  run --separate-stderr "$SECPOLICY" settings enforcement
  exits 2
  run --separate-stderr "$SECPOLICY" --root
  exits 2
}

@test "wrong usage changes nothing" {
  secpolicy boot extra
  exits 2
  [[ ! -e $root/usr ]]
}

@test "the completions of bash know the verbs and the directories" {
  complete_line secpolicy --root "$root" lo
  [[ ${COMPREPLY[*]} == "load load-early" ]]
  complete_line secpolicy --root "$root/ta"
  [[ ${COMPREPLY[*]} == "$root/tardisks" ]]
  complete_line secpolicy settings enforcement appDom p
  [[ ${COMPREPLY[*]} == permissive ]]
  complete_line secpolicy why sshDom c
  [[ ${COMPREPLY[*]} == "call create create-socket" ]]
  complete_line secpolicy who-can r
  [[ ${COMPREPLY[*]} == read ]]
}

@test "every verb is in the manual page and in both completions" {
  local verbs
  verbs=$("$SECPOLICY" --help | sed -n '/^Subcommands:/,/^$/s/^  \([a-z-]*\) .*/\1/p')
  [[ $(wc -w <<<"$verbs") -ge 6 ]]
  for verb in $verbs; do
    grep -q "^.It Cm $verb" "$SOURCE/docs/man/secpolicy.8"
    grep -q "verbs=.*\<$verb\>" "$SOURCE/completions/secpolicy.bash"
    grep -q "'$verb:" "$SOURCE/completions/_secpolicy"
  done
}
