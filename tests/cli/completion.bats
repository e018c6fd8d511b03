# What a shell offers for a command line, and that it does not disturb who types.

load helper

# Sets COMPREPLY, and fails when it is not these words in any order.
offers() {
  diff <(printf '%s\n' "$@" | sort) <(printf '%s\n' "${COMPREPLY[@]}" | sort)
}

# The same lines for all shells, and what a tab makes of each.
setup_lines() {
  boot
  "$SECPOLICY" --root "$root" save scratch-night
  lines=("secpolicy rollb" "secpolicy lo" "secpolicy settings en" "secpolicy check --err"
    "secpolicy display --format=j" "secpolicy graph --format s"
    "secpolicy --root $root/tar" "secpolicy --root $root why ss" "secpolicy why noSuch"
    "secpolicy --root $root rollback scratch-n" "secpolicy rollback scratch-n"
    "secpolicy --root $root why sshDom call @st" "secpolicy --root $root label get /etc/zor"
    "secpolicy run --root $root iof" "secpolicy run --root $root ioF")
  completed=("secpolicy rollback " "secpolicy load" "secpolicy settings enforcement " "secpolicy check --errors-only "
    "secpolicy display --format=json " "secpolicy graph --format svg "
    "secpolicy --root $root/tardisks/" "secpolicy --root $root why sshDom " "secpolicy why noSuch"
    "secpolicy --root $root rollback scratch-night " "secpolicy rollback scratch-n"
    "secpolicy --root $root why sshDom call @start " "secpolicy --root $root label get /etc/zorvan/"
    "secpolicy run --root $root iof" "secpolicy run --root $root ioFilterDom ")
}

# shell_completes SHELL: a tab in the shell completes the lines as it should.
shell_completes() {
  setup_lines
  local bin=$BATS_TEST_TMPDIR/bin
  mkdir "$bin"
  ln -s "$SECPOLICY" "$bin/secpolicy"
  diff <(printf '%s\n' "${completed[@]}") \
    <(timeout 60 python3 "$SOURCE/tests/cli/press_tab.py" "$1" "$SOURCE/completions" "$bin" "${lines[@]}")
}

# fish_offers LINE: what fish offers for the last word.
fish_offers() {
  HOME=$BATS_TEST_TMPDIR PATH=$(dirname "$SECPOLICY"):$PATH \
    fish --no-config -c 'source $argv[1]; complete -C $argv[2]' "$SOURCE/completions/secpolicy.fish" "$1"
}

@test "a tab in bash completes verbs, options and what is installed below the root" {
  shell_completes bash
}

@test "a tab in zsh completes verbs, options and what is installed below the root" {
  shell_completes zsh
}

@test "fish offers verbs, options and what is installed below the root, with what they mean" {
  setup_lines
  [[ $(fish_offers "secpolicy lo") == $'load\tInstall the full policy\nload-early\tInstall the small policy that early boot needs' ]]
  [[ $(fish_offers "secpolicy check --err") == $'--errors-only\tShow no warnings' ]]
  [[ $(fish_offers "secpolicy display --format=j") == "--format=json" ]]
  [[ $(fish_offers "secpolicy --root $root rollback ") == scratch-night ]]
  [[ $(fish_offers "secpolicy --root $root run ioF") == ioFilterDom ]]
  [[ $(fish_offers "secpolicy --root $root why sshDom call @st") == $'@start\t'* ]]
  [[ $(fish_offers "secpolicy --root $root label get /etc/zor") == /etc/zorvan/ ]]
  [[ $(fish_offers "secpolicy --root $root/tar") == "$root/tardisks/"* ]]
}

@test "words of rules, questions, codes and kinds are offered where they belong" {
  boot
  complete_line secpolicy why sshDom c
  offers call create create-socket
  complete_line secpolicy --root "$root" why sshDom use cap_sys_b
  offers cap_sys_boot
  complete_line secpolicy --root "$root" who-can access sshKey re
  offers read remove
  complete_line secpolicy --root "$root" label set sshK
  offers sshKey
  complete_line secpolicy words ca
  offers capabilities calls
  complete_line secpolicy settings enforcement appDom ""
  offers enforcing permissive disabled
  complete_line secpolicy --root "$root" label set sshD
  [[ ${#COMPREPLY[@]} -eq 0 ]]
  secpolicy settings enforcement appDom permissive
  complete_line secpolicy --root "$root" settings unset enforcement ""
  offers appDom
  complete_line secpolicy --root "$root" settings unset option /
  offers /UserVars/CheckAccessTemplateEnabled
  complete_line secpolicy --root "$root" boot --policy-from b
  offers base.tgz
  complete_line secpolicy help rol
  offers rollback
  local warnings
  mapfile -t warnings < <(sed -n '/^## Warnings/,$s/^### `\(.*\)`$/\1/p' "$SOURCE/docs/diagnostics.md")
  complete_line secpolicy check --disable ""
  offers "${warnings[@]}"
}

@test "what is on the line already is not offered again, but what may be repeated" {
  complete_line secpolicy check --werror --only tab --w
  [[ ${#COMPREPLY[@]} -eq 0 ]]
  complete_line secpolicy check --werror --only tab --on
  offers --only
}

@test "before the first boot, the domains of the policy files are offered" {
  complete_line secpolicy --root "$root" settings enforcement mon
  offers monitorDom
  complete_line secpolicy --root "$root" capability grant monitorDom cap_sys_b
  offers cap_sys_boot
  [[ ! -e $root/var/run && ! -e $root/run/secpolicy ]]
}

@test "where nothing can be said, nothing is: neither words nor a message" {
  local words
  for words in "rollback" "--root $BATS_TEST_TMPDIR/none rollback" "nonsense" "nonsense rollback" "why one two three four" "load --nonsense x"; do
    run --separate-stderr "$SECPOLICY" __complete $words ""
    [[ -z $stderr && $output != *scratch-night* ]]
  done
  chmod 0 "$root"
  run --separate-stderr "$SECPOLICY" __complete --root "$root" run ""
  chmod 755 "$root"
  [[ -z $stderr ]]
}

@test "behind a word that is no verb, another one is none either" {
  boot
  run --separate-stderr "$SECPOLICY" __complete --root "$root" nonsense run ""
  exits 0
  [[ $output != *monitorDom* ]]
}

@test "a root in the home directory may be written with a tilde" {
  boot
  # shellcheck disable=SC2088
  HOME=$BATS_TEST_TMPDIR run --separate-stderr "$SECPOLICY" __complete --root '~/root' run ioF
  exits 0
  shows ioFilterDom
}

@test "names that cannot be typed as they are shown are left out" {
  : >"$policy/domains/"$'bad\e[31m'
  : >"$policy/domains/"$'two\nlines'
  run --separate-stderr "$SECPOLICY" __complete --root "$root" run ""
  exits 0
  [[ $output == $'words\n'*monitorDom* && $output != *bad* && $output != *lines* ]]
}
