# Where installed rules were written, as display --format json tells it.

load helper

# origins_of DOMAIN: "FILE:LINE: RULE" of each rule of the domain that has an origin.
origins_of() {
  "$SECPOLICY" --root "$root" display --format json 2>/dev/null | jq -r --arg name "$1" \
    '.domains[] | select(.name == $name) | .rules[] | select(.file) | "\(.file):\(.line): \(.text)"'
}

# comes_from DOMAIN ORIGIN: the domain has a rule with this origin.
comes_from() { has_line "$(origins_of "$1")" "$2"; }

# line_of FILE TEXT: the number of the last line of a policy file that begins with the text.
line_of() { grep -nF -- "$2" "$policy/$1" | tail -n 1 | cut -d : -f 1; }

@test "every rule of the example comes from the line that says it, but for the default of tardisks" {
  boot
  "$SECPOLICY" --root "$root" display --format json 2>/dev/null |
    jq -r '.domains[].rules[] | [.file // "", .line // 0, .text] | @tsv' >"$BATS_TEST_TMPDIR/rules"
  local file line text found=0
  while IFS=$'\t' read -r file line text; do
    if [[ $file == */tardisks/* ]]; then
      [[ $text == "-d monitorImage monitorDom tardisk_exec grant" ]]
      [[ $(sed -n "${line}p" "$root$file") =~ ^-E\ +monitorImage\ +monitorDom ]]
      continue
    fi
    # The example's /usr/bin/vm is a link to vm-run: its rule is installed for both.
    [[ $(sed -n "${line}p" "$root$file" | sed 's/#.*//' | xargs) == @("$text"|"${text/vm-run/vm}") ]]
    found=$((found + 1))
  done < <(grep -v "^[[:space:]]*0" "$BATS_TEST_TMPDIR/rules")
  [[ $found -gt 100 ]]
  diff <(grep "^[[:space:]]*0" "$BATS_TEST_TMPDIR/rules" | cut -f 3) - <<END
-d tardiskDefault appDom tardisk_exec grant
-d tardiskDefault appDom tardisk_exec grant
END
}

@test "a partner domain and an early domain have theirs" {
  boot
  comes_from plugin-cache "/etc/zorvan/secpolicy/domains/plugins/cache:$(line_of domains/plugins/cache '-s @start'): -s @start grant"
  comes_from bootDom "/etc/zorvan/secpolicy/early/domains/bootDom:$(line_of early/domains/bootDom '-s init_module'): -s init_module grant"
}

@test "a rule that moved to another line comes from there after a load" {
  boot
  local before
  before=$(line_of domains/sshDom "-s listen")
  { echo "# a new first line"; cat "$policy/domains/sshDom"; } >"$BATS_TEST_TMPDIR/sshDom"
  cat "$BATS_TEST_TMPDIR/sshDom" >"$policy/domains/sshDom"
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$before: -s listen grant"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$((before + 1)): -s listen grant"
}

@test "of a rule that is written twice the later line counts" {
  boot
  echo "-s listen grant" >>"$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$(wc -l <"$policy/domains/sshDom"): -s listen grant"
}

@test "another directory is the origin of what was loaded from it" {
  boot
  cp -r "$policy" "$root/other"
  rm "$root"/other/fileLabels/*
  "$SECPOLICY" --root "$root" load /other 2>/dev/null
  comes_from sshDom "/other/domains/sshDom:$(line_of domains/sshDom '-s listen'): -s listen grant"
  comes_from plugin-cache "/etc/zorvan/secpolicy/domains/plugins/cache:$(line_of domains/plugins/cache '-s @start'): -s @start grant"
}

@test "a rule about a link comes from its line under both names" {
  boot
  mkdir "$root/real"
  ln -s real "$root/link"
  echo "-r /link xr" >>"$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null || true
  local line
  line=$(wc -l <"$policy/domains/sshDom")
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$line: -r /link rx"
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$line: -r /real rx"
}

@test "a load with errors tells where the rest was written" {
  boot
  printf -- '-s bind revoke\n-s reed grant\n-s accept4 revoke\n' >>"$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null || true
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$(($(wc -l <"$policy/domains/sshDom") - 2)): -s bind revoke"
  comes_from sshDom "/etc/zorvan/secpolicy/domains/sshDom:$(line_of domains/sshDom '-s accept4  grant'): -s accept4 grant"
}

@test "a rule that a program made comes from no file" {
  boot
  sqlite3 "$root/run/secpolicy/host.db" "UPDATE rule SET word1 = 'cap_kill', load = 0 WHERE word1 = 'cap_sys_chroot'"
  run --separate-stderr origins_of sshDom
  [[ $output != *cap_sys_chroot* && $output != *cap_kill* && $output == *cap_setgid* ]]
}
