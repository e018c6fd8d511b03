# bash completion for secpolicy(8): the command itself says what can stand at the cursor, since it
# knows its verbs and options, and what is installed.

# Fills `typed` with the words up to the cursor. Readline also splits at signs that belong to words of
# the command, as those in @start and --format=json.
_secpolicy_words() {
  local line=${COMP_LINE:0:COMP_POINT} part blanks
  typed=()
  for part in "${COMP_WORDS[@]:0:COMP_CWORD+1}"; do
    blanks=${line%%[![:blank:]]*}
    line=${line#"$blanks"}
    [[ ${#part} -le ${#line} ]] || part=$line
    line=${line#"$part"}
    if [[ ${#typed[@]} -eq 0 || -n $blanks ]]; then typed+=("$part"); else typed[-1]+=$part; fi
  done
  typed=("${typed[@]//[\"\'\\]/}")
}

_secpolicy() {
  local -a typed answer
  local current kept word
  _secpolicy_words
  current=${typed[-1]}
  kept=${current%"$2"}
  mapfile -t answer < <("$1" __complete "${typed[@]:1}" 2>/dev/null)
  COMPREPLY=()
  for word in "${answer[@]:1}"; do
    word=${word%%$'\t'*}
    [[ $word != "$current"* ]] || COMPREPLY+=("$(printf %q "${word#"$kept"}")")
  done
  case ${answer[0]-} in
    files) compopt -o default ;;
    directories) compopt -o plusdirs ;;
    programs) mapfile -t COMPREPLY < <(compgen -c -- "$2") ;;
  esac
  [[ ${#COMPREPLY[@]} -ne 1 || ${COMPREPLY[0]} != */ ]] || compopt -o nospace
}

complete -F _secpolicy secpolicy
