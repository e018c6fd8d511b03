# Runs what the pages of the documentation say that one can type.

# runs_as_written PAGE: in this directory, each command of the page's `console` blocks shows what stands
# below it, where "[...]" is for lines that are left out. A block behind "`FILE`:" is what FILE holds.
runs_as_written() {
  local line before='' block='' file='' command='' written=''
  commands=0
  while IFS= read -r line; do
    case $block:$line in
      :'```console') block=console ;;
      :'```'*)
        block=other
        if [[ $before =~ \`([^\`]+)\`:$ ]]; then
          block='file'
          file=${BASH_REMATCH[1]}
          : >"$file"
        fi
        ;;
      *:'```')
        shows_as_written || return
        block=''
        ;;
      console:'$ '*)
        shows_as_written || return
        command=${line#'$ '}
        ;;
      console:'> '*) command+=$'\n'${line#'> '} ;;
      console:*) written+=$line$'\n' ;;
      file:*) printf '%s\n' "$line" >>"$file" ;;
      *) [[ -z $line ]] || before=$line ;;
    esac
  done <"$1"
  [[ $commands -gt 0 ]]
}

# Runs the command that was read, if one was. What it changes in this shell, the next ones find.
shows_as_written() {
  [[ -n $command ]] || return 0
  local shown pattern
  eval "$command" >"$BATS_TEST_TMPDIR/shown" 2>&1 </dev/null || true
  shown=$(cat "$BATS_TEST_TMPDIR/shown" && echo .)
  pattern=$(pattern_of "$written" && echo .)
  # shellcheck disable=SC2053
  if [[ $shown != $pattern ]]; then
    printf '$ %s\n' "$command"
    diff -u --label written --label shown <(printf '%s' "$written") "$BATS_TEST_TMPDIR/shown"
    return 1
  fi
  commands=$((commands + 1))
  command=''
  written=''
}

# pattern_of LINES: what matches these lines, and any in place of "[...]".
pattern_of() {
  printf '%s' "$1" |
    awk '$0 == "[...]" { printf "*"; next } { gsub(/[][*?\\]/, "\\\\&"); print }'
}
