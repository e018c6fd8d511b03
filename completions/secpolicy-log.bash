# bash completion for secpolicy-log(8).

_secpolicy_log() {
  local words='--once --format --help --version'
  [[ $3 != --format ]] || words='text json'
  mapfile -t COMPREPLY < <(compgen -W "$words" -- "$2")
}

complete -F _secpolicy_log secpolicy-log
