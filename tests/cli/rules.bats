# secpolicy rules and path: every rule that speaks of something is found, with where it was written, and
# the shortest way by transitions.

load helper

setup() {
  make_root
  domains=$policy/domains
  boot
}

# places DOMAIN PATTERN...: the lines of its policy file that match, as they are told.
places() {
  local domain=$1 pattern
  shift
  for pattern; do
    grep -nE -- "$pattern" "$policy/domains/$domain" | sed -E 's/ +#.*//; s/ +/ /g' |
      sed "s|^\([0-9]*\):|$domain: $domains/$domain:\1: |"
  done
}

@test "rules for a label are found, by its name and its number" {
  local expected
  expected=$(for domain in "$policy"/domains/*Dom; do places "$(basename "$domain")" '^-[adfu].* sshKey '; done)
  [[ $(wc -l <<<"$expected") -ge 2 ]]
  secpolicy rules --label sshKey
  exits 0
  diff <(sort <<<"$expected") <(sort <<<"$output")
  [[ $stderr == "secpolicy: rules: $(wc -l <<<"$expected") rules" ]]
  local found=$output number
  number=$("$SECPOLICY" --root "$root" display 2>/dev/null | sed -n 's/^sshKey (\([0-9]*\))$/\1/p')
  secpolicy rules --label "$number"
  [[ $output == "$found" ]]
  secpolicy rules --label sshDom
  diff <(places hostDom ' sshDom '; places daemonFrameworkDom ' sshDom ') - <<<"$output"
}

@test "rules for a path are those above it, and those for its label" {
  secpolicy rules --path /etc/ssh/host_key
  exits 0
  while IFS= read -r line; do shows "$line"; done < <(places sshDom '^-r /etc/ssh +' '^-a sshKey +')
  [[ $output != *" -r /usr"* && $output != *"hostConfig"* ]]
  secpolicy rules --path /etc/ssh/host_key/
  [[ $output == *"-r /etc/ssh r"* ]]
  secpolicy rules --path /nowhere
  exits 1
  [[ -z $output && $stderr == "secpolicy: rules: 0 rules" ]]
  ln -s host_key "$root/etc/ssh/link"
  secpolicy rules --path /etc/ssh/link
  shows "$(places sshDom '^-a sshKey +read')"
}

@test "rules for a system call are those for its sets too, and those for a capability its own" {
  secpolicy rules --call mount
  exits 0
  shows "appDom: $domains/appDom:$(grep -n '^-s mount' "$policy/domains/appDom" | cut -d: -f1): -s mount revoke"
  secpolicy rules --call openat --format json
  exits 0
  fits_schema rules
  jq -e '.rules | length > 3 and all(.words[0] | . == "@start" or . == "@file")' <<<"$output"
  jq -e '.rules[] | select(.domain == "sshDom") | .line > 0 and (.file | endswith("domains/sshDom"))' <<<"$output"
  secpolicy rules --capability cap_net_bind_service
  answers 0 "$(places sshDom '^-c cap_net_bind_service')"
}

@test "a rule that no file has is found as well" {
  secpolicy domain create job7
  secpolicy capability revoke job7 cap_kill
  secpolicy rules --capability cap_kill
  shows "job7: (no policy file): -c cap_kill revoke"
}

@test "what rules cannot speak of is wrong usage" {
  for words in "" "--label sshKey --call mount"; do
    # shellcheck disable=SC2086
    secpolicy rules $words
    wrong_usage rules "rules: give one of --label, --path, --call and --capability"
  done
  secpolicy rules --label sshKye
  wrong_usage rules "rules: there is no object 'sshKye'; did you mean 'sshKey'?"
  secpolicy rules --call muont
  wrong_usage rules "rules: there is no system call 'muont'; did you mean 'mount'?"
  secpolicy rules --path etc
  wrong_usage rules "rules: 'etc' is no path from the root on: it begins with a slash"
}

@test "path prints each transition of the shortest way with its rule" {
  secpolicy path hostDom sshDom
  answers 0 "hostDom -> sshDom: $domains/hostDom:$(grep -n sshDom "$policy/domains/hostDom" | cut -d: -f1): -d sshProgram sshDom exec grant"
  [[ $stderr == "secpolicy: path: 1 transition" ]]
  echo "-d vmProgram globalVMDom exec grant" >>"$policy/domains/sshDom"
  echo "-d vmDisk plugin-cache enter grant" >>"$policy/domains/globalVMDom"
  sed -i '/plugin-cache/d' "$policy"/domains/{hostDom,ioFilterDom}
  secpolicy load
  secpolicy path "$(domain_id sshDom)" plugin-cache
  answers 0 \
    "sshDom -> globalVMDom: $domains/sshDom:$(wc -l <"$policy/domains/sshDom"): -d vmProgram globalVMDom exec grant" \
    "globalVMDom -> plugin-cache: $domains/globalVMDom:$(wc -l <"$policy/domains/globalVMDom"): -d vmDisk plugin-cache enter grant"
  secpolicy path sshDom plugin-cache --format json
  exits 0
  fits_schema path
  jq -e '.reachable and ([.steps[] | .from, .to] == ["sshDom", "globalVMDom", "globalVMDom", "plugin-cache"]) and
    .steps[1].rule.text == "-d vmDisk plugin-cache enter grant"' <<<"$output"
}

@test "path says when there is no way, and takes no step where none is needed" {
  secpolicy path globalVMDom hostDom
  exits 1
  [[ -z $output && $stderr == "secpolicy: path: no transitions lead from globalVMDom to hostDom" ]]
  secpolicy path globalVMDom hostDom --format json
  exits 1
  fits_schema path
  jq -e '.reachable == false and .steps == []' <<<"$output"
  secpolicy path sshDom sshDom
  exits 0
  [[ -z $output && $stderr == "secpolicy: path: 0 transitions" ]]
  secpolicy path sshDom hostDmo
  wrong_usage path "path: there is no domain 'hostDmo'; did you mean 'hostDom'?"
}
