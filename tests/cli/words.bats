# secpolicy words: every word that a rule may use, and the members of sets.

load helper

@test "without a kind the kinds are listed" {
  secpolicy words
  answers 0 objects accesses capabilities transitions files checks calls sockets
}

@test "only the labels of a policy have to be installed to be listed" {
  secpolicy words checks
  exits 0
  shows bind_port
  secpolicy words objects
  fails_with words "nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first."
  [[ ! -e $root/run/secpolicy ]]
}

@test "the words of each kind" {
  boot
  secpolicy words accesses
  answers 0 execute list read remove truncate write
  secpolicy words sockets
  answers 0 dgram seqpacket stream
  secpolicy words objects
  shows sshKey
  secpolicy words capabilities
  [[ ${#lines[@]} -eq 41 ]]
}

@test "a set of system calls stands with its members" {
  secpolicy words calls
  shows "@signal: sending and handling signals"
  [[ $output == *"@start: what a dynamically linked program needs from execve to exit"$'\n  access arch_prctl brk '* ]]
  shows ptrace
  secpolicy words calls --format json
  exits 0
  fits_schema words
  [[ $(jq -r '.words[] | select(.word == "@clock").members | index("nanosleep") != null' <<<"$output") == true ]]
  [[ $(jq '[.words[] | select(.members)] | length' <<<"$output") -eq 12 ]]
}

@test "a kind that there is not" {
  secpolicy words call
  wrong_usage words "words: there is no kind of words 'call'; did you mean 'calls'?"
}

@test "every word of the list is taken by a rule" {
  boot
  local word
  : >"$policy/domains/wordsDom"
  for word in $("$SECPOLICY" --root "$root" words calls --format json | jq -r '.words[].word'); do
    echo "-s $word grant" >>"$policy/domains/wordsDom"
  done
  secpolicy load
  exits 0
  secpolicy why wordsDom call ptrace
  exits 0
}
