# The README's commands show what the README says.

load helper

# Runs every line "$ secpolicy ..." of the console blocks and writes the blocks as they really are.
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
  done <"$SOURCE/README.md"
}

written_blocks() {
  sed -n '/^```console$/,/^```$/{/^```/d;p}' "$SOURCE/README.md"
}

@test "the examples of the README are real" {
  needs_landlock
  cp -r "$SOURCE/examples/broken" "$root/broken"
  ln -s "$root" "$BATS_TEST_TMPDIR/r"
  boot
  cd "$BATS_TEST_TMPDIR"
  run_blocks >shown
  written_blocks >written
  [[ $(grep -c '^\$ secpolicy' written) -ge 3 ]]
  diff -u written shown
}
