# secpolicy who-can: each domain that may, and no other, as why answers for it.

load helper

# at FILE TEXT: the place of the line of the policy that begins with the text.
at() { printf '%s/%s:%s: ' "$policy" "$1" "$(grep -nE -- "^$2" "$policy/$1" | tail -n 1 | cut -d : -f 1)"; }

@test "the domains that may, each with its rule" {
  boot
  secpolicy who-can enter sshDom
  answers 0 "hostDom: $(at domains/hostDom '-d sshProgram')-d sshProgram sshDom exec grant" \
    "daemonFrameworkDom: $(at domains/daemonFrameworkDom '-d sshProgram')-d sshProgram sshDom exec grant"
  [[ $stderr == "secpolicy: who-can: 2 domains may enter sshDom" ]]
}

@test "a domain that is not enforcing may, without a rule" {
  boot
  secpolicy who-can use cap_sys_module
  answers 0 "hostDom: permissive, so nothing is refused to it" \
    "bootDom: $(at early/domains/bootDom '-c cap_sys_module')-c cap_sys_module grant"
}

@test "who may write a file" {
  boot
  secpolicy who-can write /var/cache/io-filters/README
  answers 0 "hostDom: permissive, so nothing is refused to it" \
    "ioFilterDom: $(at domains/ioFilterDom '-r /var/cache')-r /var/cache/io-filters rw" \
    "plugin-cache: $(at domains/plugins/cache '-r /var/cache')-r /var/cache/io-filters rw"
}

@test "nobody may" {
  boot
  "$SECPOLICY" --root "$root" settings enforcement hostDom enforcing
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  secpolicy who-can call kexec_load
  exits 1
  [[ -z $output ]]
  [[ $stderr == "secpolicy: who-can: 0 domains may call kexec_load" ]]
}

@test "every answer is that of why" {
  boot
  local domain
  while read -r question; do
    secpolicy who-can $question --format json
    fits_schema who-can
    local listed
    listed=$(jq -r '.domains[].domain' <<<"$output")
    for domain in $("$SECPOLICY" --root "$root" display --format json 2>/dev/null | jq -r '.domains[].name'); do
      if "$SECPOLICY" --root "$root" why "$domain" $question >/dev/null; then
        has_line "$listed" "$domain"
      else
        [[ $'\n'$listed$'\n' != *$'\n'"$domain"$'\n'* ]]
      fi
    done
  done <<'END'
read /etc/ssh/host_key
exec /usr/lib/io-filters/cache
access vmDisk list
pass kill_signal 9
END
}

@test "misspelt words are wrong usage" {
  boot
  secpolicy who-can call reed
  wrong_usage who-can "who-can: there is no system call 'reed'; did you mean 'read'?"
  secpolicy who-can
  wrong_usage who-can "WHAT is required"
}

@test "--format json" {
  boot
  secpolicy who-can enter sshDom --format json
  exits 0
  fits_schema who-can
  jq -e '.schema == "secpolicy.who-can/1" and .question == {action: "enter", words: ["sshDom"]} and
    (.domains | map(.domain)) == ["hostDom", "daemonFrameworkDom"] and
    .domains[1].rules[0].text == "-d sshProgram sshDom exec grant"' <<<"$output"
}
