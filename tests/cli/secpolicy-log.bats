# secpolicy-log as it is typed: an option that is taken for another, and a claim where no module runs. What
# it tells of refusals is tested where a module can run.

load helper

setup() {
  LOG=$BUILD_DIR/bin/secpolicy-log
  [[ -x $LOG ]] || skip "it is built with the module alone"
}

log() {
  run --separate-stderr "$LOG" "$@"
}

# wrong TEXT OPTION...: these are refused with the text.
wrong() {
  log "${@:2}"
  exits 2 && [[ -z $output && $stderr == "secpolicy-log: $1. 'secpolicy-log --help' explains the usage" ]]
}

@test "it says what it is, and the manual page and the shells say the same" {
  local option
  log --version
  answers 0 "secpolicy-log $(sed -n 's/^project(secpolicy VERSION \([^ ]*\).*/\1/p' "$SOURCE/CMakeLists.txt")"
  log --help
  exits 0
  [[ $output == "Usage: secpolicy-log [--once] [--format FORMAT]"* && -z $stderr ]]
  for option in $(grep -oE '^  --[a-z]+' <<<"$output"); do
    grep -qF -- "Fl Fl ${option#--}" "$SOURCE/docs/man/secpolicy-log.8"
    grep -qF -- "$option" "$SOURCE/completions/secpolicy-log.bash"
    grep -qF -- "$option" "$SOURCE/completions/_secpolicy-log"
    grep -qF -- " -l ${option#--}" "$SOURCE/completions/secpolicy-log.fish"
  done
  # shellcheck disable=SC2016
  run bash -c '"$1" --help >/dev/full' - "$LOG"
  exits 1
}

@test "wrong usage" {
  wrong "there is no option '--all'" --all
  wrong "there is no option 'sshDom'" --once sshDom
  wrong "--format needs a value" --format
  wrong "there is no format 'xml'; there are text and json" --format xml
}

@test "where no module runs it says so" {
  [[ ! -e /sys/fs/bpf/secpolicy ]] || skip "a module runs on this machine"
  log --once
  exits 1
  [[ -z $output && $stderr == "secpolicy-log: the module: it does not run, so it refuses nothing" ]]
}
