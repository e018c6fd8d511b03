# bash completion for secpolicy(8)

# The names of the saved states below the root $1.
_secpolicy_saved() {
  local file
  for file in "$1"/var/lib/secpolicy/saved/*.db; do
    [[ -f $file ]] && basename "$file" .db
  done
}

# The domains that policy files below the root $1 define.
_secpolicy_domains() {
  local file
  for file in "$1"/etc/zorvan/secpolicy/domains/*; do
    [[ -f $file ]] && basename "$file"
  done
}

# The names of the tardisks below the root $1.
_secpolicy_tardisks() {
  local file
  for file in "$1"/tardisks/*; do
    [[ -f $file ]] && basename "$file"
  done
}

_secpolicy() {
  local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  local verbs='help init new explain boot check load load-early restore status display domain file-policy capability param-check run exec observe features why who-can words graph diff save history rollback label settings'
  local questions='read write exec list remove truncate make make-socket call use access enter create create-socket pass'
  local verb='' kind='' root='' word index positional=0
  for ((index = 1; index < COMP_CWORD; index++)); do
    word=${COMP_WORDS[index]}
    if [[ $word == --root || $word == --format || $word == --domain || $word == --disable || $word == --policy || $word == --policy-from || $word == --for || $word == --write ]]; then
      index=$((index + 1))
      [[ $word == --root ]] && root=${COMP_WORDS[index]}
    elif [[ $word == -* ]]; then
      continue
    elif [[ -z $verb ]]; then
      verb=$word
    elif [[ ($verb == settings || $verb == label || $verb == domain || $verb == file-policy || $verb == capability || $verb == param-check) && -z $kind ]]; then
      kind=$word
    else
      positional=$((positional + 1))
    fi
  done

  COMPREPLY=()
  if [[ $previous == --root || $previous == --policy ]]; then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -d -- "$current")
  elif [[ $verb == check && $previous == --format ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'text json sarif' -- "$current")
  elif [[ ($verb == display || $verb == why || $verb == who-can || $verb == words || $verb == features || $verb == status || $verb == diff || $verb == load || $verb == boot) && $previous == --format ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'text json' -- "$current")
  elif [[ $verb == graph && $previous == --format ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'dot svg' -- "$current")
  elif [[ $verb == graph && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--domain --format --root --help -h' -- "$current")
  elif [[ $verb == run && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--best-effort --explain --root --help -h' -- "$current")
  elif [[ $verb == exec && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--best-effort --root --help -h' -- "$current")
  elif [[ $verb == observe && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--write --root --help -h' -- "$current")
  elif [[ $verb == features && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--for --format --root --help -h' -- "$current")
  elif [[ $verb == check && $previous == --disable ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'byte-order-mark cannot-start carriage-return contradicting-rule duplicate-object
      duplicate-rule editor-copy installed-only long-line missing-path nul-byte relative-path skipped-entry
      star-in-path tab two-labels unreachable-domain untyped-entries unused-object' -- "$current")
  elif [[ $verb == check && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--fresh --format --stdin --errors-only --only --max --werror --disable --root --help -h' -- "$current")
  elif [[ $verb == save && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--force --root --help -h' -- "$current")
  elif [[ $verb == boot && $previous == --policy-from ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$(_secpolicy_tardisks "$root")" -- "$current")
  elif [[ $verb == boot && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--plan --policy-from --timing --format --root --verbose --help -v -h' -- "$current")
  elif [[ $verb == load-early && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--keep --timing --root --verbose --help -v -h' -- "$current")
  elif [[ $verb == load && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--keep --timing --plan --all-or-nothing --format --root --verbose --help -v -h' -- "$current")
  elif [[ ($verb == display || $verb == why || $verb == who-can || $verb == words || $verb == status || $verb == diff) && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--format --root --help -h' -- "$current")
  elif [[ $kind == relabel && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--dry-run --policy --root --help -n -h' -- "$current")
  elif [[ $kind == verify && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--policy --root --help -h' -- "$current")
  elif [[ $verb == label && $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--recursive --root --help -R -h' -- "$current")
  elif [[ $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--root --verbose --help --version -v -h' -- "$current")
  elif [[ -z $verb ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$verbs" -- "$current")
  elif [[ $verb == help ]] && ((positional == 0)); then
    mapfile -t COMPREPLY < <(compgen -W "$verbs" -- "$current")
  elif [[ $verb == new && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'domain' -- "$current")
  elif [[ $verb == explain ]] && ((positional == 0)); then
    mapfile -t COMPREPLY < <(compgen -W "$("$(type -P secpolicy)" explain 2>/dev/null | cut -d' ' -f1)" -- "$current")
  elif [[ $verb == init ]] && ((positional == 0)); then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -d -- "$current")
  elif [[ $verb == check || $verb == load || $verb == load-early ]] && ((positional == 0)); then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -d -- "$current")
  elif [[ ($verb == why && $positional -eq 1) || ($verb == who-can && $positional -eq 0) ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$questions" -- "$current")
  elif [[ ($verb == why || $verb == who-can) && $previous == @(read|write|exec|list|remove|truncate|make|make-socket) ]]; then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  elif [[ $verb == diff ]] && ((positional < 2)); then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -W "installed $(_secpolicy_saved "$root")" -- "$current"; compgen -d -- "$current")
  elif [[ $verb == words ]] && ((positional == 0)); then
    mapfile -t COMPREPLY < <(compgen -W 'objects accesses capabilities transitions files checks calls sockets' -- "$current")
  elif [[ $verb == features && $previous == --for ]] || [[ ($verb == run || $verb == observe) && $positional -eq 0 && $current != -* && $previous != -- ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$(_secpolicy_domains "$root")" -- "$current")
  elif [[ $verb == run || $verb == exec || $verb == observe ]]; then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  elif [[ $verb == rollback ]] && ((positional == 0)); then
    mapfile -t COMPREPLY < <(compgen -W "$(_secpolicy_saved "$root")" -- "$current")
  elif [[ $verb == label && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'get set verify relabel' -- "$current")
  elif [[ $verb == label ]] && [[ $kind != set || $positional -gt 0 ]]; then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  elif [[ $verb == domain && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'create destroy list show leaked add-service of' -- "$current")
  elif [[ $verb == file-policy && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'add remove update list replace' -- "$current")
  elif [[ $verb == capability && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'grant revoke' -- "$current")
  elif [[ $verb == param-check && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'set remove' -- "$current")
  elif [[ $verb == domain || $verb == file-policy || $verb == capability || $verb == param-check ]] && ((positional == 0)) && [[ $kind != @(create|list|leaked|of|replace) || $verb == file-policy && $kind == list ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$(_secpolicy_domains "$root")" -- "$current")
  elif [[ $verb == settings && -z $kind ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'list unset option enforcement' -- "$current")
  elif [[ $kind == option ]] && ((positional == 0)); then
    mapfile -t COMPREPLY < <(compgen -W '/UserVars/CheckAccessTemplateEnabled' -- "$current")
  elif [[ $kind == enforcement ]] && ((positional == 1)); then
    mapfile -t COMPREPLY < <(compgen -W 'enforcing permissive disabled' -- "$current")
  fi
}

complete -F _secpolicy secpolicy
