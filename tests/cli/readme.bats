# The commands of the README and of the documents show what these say.

load helper

# run_blocks FILE: runs every line "$ secpolicy ..." of its console blocks and writes the blocks as they
# really are.
run_blocks() {
  local line inside=
  while IFS= read -r line; do
    case $line in
      '```console') inside=1 ;;
      '```') inside= ;;
      '$ secpolicy '*)
        [[ -n $inside ]] || continue
        printf '%s\n' "$line"
        eval "\"\$SECPOLICY\" ${line#'$ secpolicy '}" 2>&1 || true
        ;;
    esac
  done <"$SOURCE/$1"
}

written_blocks() {
  sed -n '/^```console$/,/^```$/{/^```/d;p}' "$SOURCE/$1"
}

# are_real FILE: so they are, on the example.
are_real() {
  ln -s "$root" "$BATS_TEST_TMPDIR/r"
  boot
  cd "$BATS_TEST_TMPDIR" || return
  run_blocks "$1" >shown
  written_blocks "$1" >written
  [[ $(grep -c '^\$ secpolicy' written) -ge 3 ]]
  diff -u written shown
}

@test "the examples of the README are real" {
  needs_landlock
  cp -r "$SOURCE/examples/broken" "$root/broken"
  are_real README.md
}

@test "the session of docs/runtime.md is real" {
  are_real docs/runtime.md
}
