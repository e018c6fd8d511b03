# Shared by the tests of the command. SECPOLICY names the command to test.

bats_require_minimum_version 1.5.0

SOURCE=$(cd "$BATS_TEST_DIRNAME/../.." && pwd)

# Every test has a root of its own, with the example host in it.
setup() { make_root; }

make_root() {
  root=$BATS_TEST_TMPDIR/root
  policy=$root/etc/zorvan/secpolicy
  lay_out_example "$root"
}

# lay_out_example DIR: copies the example host, which is packed once for each file of tests.
lay_out_example() {
  local packed=$BATS_FILE_TMPDIR/example
  [[ -d $packed ]] || "$SOURCE/scripts/pack-example" "$packed"
  mkdir -p "$1"
  cp -a "$packed/." "$1"
}

# boot_beside_copy: boots the example, with a copy of its policy in /new for the test to change.
boot_beside_copy() {
  make_root
  boot
  cp -r "$policy" "$root/new"
  policy=$root/new
}

# secpolicy ARGUMENT...: runs the command below $root and keeps $status, $output and $stderr.
secpolicy() {
  run --separate-stderr "$SECPOLICY" --root "$root" "$@"
}

boot() {
  "$SECPOLICY" --root "$root" boot 2>"$BATS_TEST_TMPDIR/boot.err"
}

# needs_landlock: skips the test where the kernel cannot confine anybody. Each file of tests asks once.
needs_landlock() {
  local told=$BATS_FILE_TMPDIR/landlock found
  [[ -f $told ]] || "$SECPOLICY" features --format json | jq .features.landlock >"$told"
  found=$(<"$told")
  ((found >= 3)) || skip "this kernel's Landlock cannot refuse what a domain may not do (version $found)"
}

# exits STATUS: the latest command ended with it.
exits() {
  [[ $status -eq $1 ]] && return
  printf 'exit status %s instead of %s\n%s\n%s\n' "$status" "$1" "$output" "$stderr"
  return 1
}

# answers STATUS LINE...: the latest command ended with it and wrote these lines, and no others, to
# standard output.
answers() {
  exits "$1" || return
  shift
  diff <(printf '%s\n' "$@") - <<<"$output"
}

# fails_with VERB TEXT: the latest command, of this verb, failed, wrote nothing to standard output, and
# ended with this.
fails_with() {
  exits 1 || return
  [[ -z $output ]] || return
  ends_with "secpolicy: $1: $2"
}

# says LINE: the latest command wrote this whole line to standard error.
says() { has_line "$stderr" "$1"; }

# shows LINE: the latest command wrote this whole line to standard output.
shows() { has_line "$output" "$1"; }

has_line() {
  local text=$1 line=$2
  [[ $'\n'$text$'\n' == *$'\n'"$line"$'\n'* ]] && return
  printf 'no line: %s\nin:\n%s\n' "$line" "$text"
  return 1
}

# ends_with LINE: the last line that the latest command wrote to standard error.
ends_with() {
  [[ ${stderr##*$'\n'} == "$1" ]] && return
  printf 'the last line is not: %s\nin:\n%s\n' "$1" "$stderr"
  return 1
}

# wrong_usage VERB MESSAGE: the latest command was typed in a way that VERB does not take, said so, and
# did nothing else. The VERB of what is wrong before any is "".
wrong_usage() {
  exits 2 || return
  [[ -z $output && $stderr == "secpolicy: $2
'secpolicy ${1:+$1 }--help' explains the usage." ]] && return
  printf 'not just the usage of %s and: %s\nbut:\n%s\n%s\n' "$1" "$2" "$output" "$stderr"
  return 1
}

# ends_done VERB: the last line to standard error says that all was done, and counts what is
# installed.
ends_done() {
  [[ ${stderr##*$'\n'} =~ ^"secpolicy: $1: done ("[0-9]+" domains, "[0-9]+" rules, "[0-9]+" objects)"$ ]] && return
  printf 'the last line is not that of a %s that was done:\n%s\n' "$1" "$stderr"
  return 1
}

# is_done VERB: that line is all that the latest command wrote to standard error.
is_done() {
  [[ $stderr != *$'\n'* ]] && ends_done "$1"
}

# until_true CONDITION: waits for it, ten seconds at most.
until_true() {
  local _
  for _ in {1..100}; do
    eval "$1" && return
    sleep 0.1
  done
  printf 'never true: %s\n' "$1"
  return 1
}

# domain_id NAME: the identifier that display gives the domain.
domain_id() {
  "$SECPOLICY" --root "$root" display 2>/dev/null |
    sed -n "s/^Domain Name: $1 Domain ID :\([0-9]*\) .*/\1/p"
}

# fits_schema NAME: the latest command wrote a JSON document that docs/schema/NAME.json describes.
fits_schema() {
  python3 -c '
import json, sys, jsonschema
schema = json.load(open(sys.argv[1]))
jsonschema.Draft202012Validator.check_schema(schema)
jsonschema.Draft202012Validator(schema).validate(json.load(sys.stdin))' \
    "$SOURCE/docs/schema/$1.json" <<<"$output"
}

# complete_line WORD...: sets COMPREPLY to what bash offers for the last word of this command line.
complete_line() {
  # shellcheck source=completions/secpolicy.bash
  source "$SOURCE/completions/secpolicy.bash"
  compopt() { :; }
  COMP_WORDS=("$@")
  COMP_CWORD=$(($# - 1))
  COMP_LINE="$*"
  COMP_POINT=${#COMP_LINE}
  _secpolicy "$SECPOLICY" "${*: -1}"
}

# on_terminal ARGUMENT...: runs the verb with both outputs on a terminal of $size, after which $keys are
# typed, and keeps in `screen` what came there. Ends as the verb does.
on_terminal() {
  TERM=xterm timeout 60 python3 "$SOURCE/tests/cli/on_terminal.py" "$BATS_TEST_TMPDIR/screen" "${size-0x0}" "${keys-}" \
    "$SECPOLICY" --root "$root" "$@"
}

# without_colors FILE: what is in it beside colors.
without_colors() {
  sed $'s/\e\\[[0-9;]*m//g' "$1"
}

# make_keys_and_policy: what bundles are made of, in the working directory: two keys that sign, their public
# halves, and the policy web.
make_keys_and_policy() {
  openssl genpkey -algorithm ed25519 -out key.pem
  openssl genpkey -algorithm ed25519 -out other.pem
  chmod 600 ./*.pem
  openssl pkey -in key.pem -pubout -out public.pem
  openssl pkey -in other.pem -pubout -out other-public.pem
  cp -r "$SOURCE/examples/host/etc/zorvan/secpolicy" web
}
