# secpolicy why: the rules and lines that decide, or what is missing, for every question.

load helper

# at FILE TEXT: the place of the line of the policy that begins with the text, and what follows a
# place in an answer.
at() { printf '%s/%s:%s: ' "$policy" "$1" "$(grep -nE -- "^$2" "$policy/$1" | tail -n 1 | cut -d : -f 1)"; }

@test "yes, with the rules and the label of a file" {
  boot
  secpolicy why sshDom read /etc/ssh/host_key
  answers 0 "yes: sshDom may read /etc/ssh/host_key" \
    "$(at domains/sshDom '-r /etc/ssh')-r /etc/ssh r" \
    "$(at domains/sshDom '-a sshKey +read')-a sshKey read grant" \
    "label: sshKey" \
    "$(at fileLabels/base /etc/ssh/host_key)/etc/ssh/host_key sshKey"
  [[ -z $stderr ]]
}

@test "no, with every rule that refuses and what to write instead" {
  boot
  secpolicy why sshDom write /etc/ssh/host_key
  answers 1 "no: sshDom may not write /etc/ssh/host_key" \
    "$(at domains/sshDom '-r /etc/ssh')-r /etc/ssh r" \
    "  instead: -r /etc/ssh rw" \
    "$(at domains/sshDom '-a sshKey +write')-a sshKey write revoke" \
    "  instead: -a sshKey write grant" \
    "label: sshKey" \
    "$(at fileLabels/base /etc/ssh/host_key)/etc/ssh/host_key sshKey"
}

@test "no, with the rules of which one is missing" {
  boot
  secpolicy why sshDom read /etc/services.conf/
  answers 1 "no: sshDom may not read /etc/services.conf/" \
    "missing in $policy/domains/sshDom, one of:" \
    "  -r /etc/services.conf r" \
    "  -a hostConfig read grant" \
    "label: hostConfig" \
    "$(at fileLabels/base '/etc/[*]')/etc/* hostConfig"
}

@test "what is missing can be pasted, and what stands instead replaced" {
  boot
  local domain question rule line
  while IFS='|' read -r domain question; do
    secpolicy why "$domain" $question
    exits 1
    rule=$(sed -n 's/^  instead: //p; s/^  \(-\)/\1/p' <<<"$output" | head -n 1)
    [[ -n $rule ]]
    line=$(sed -n "2s|^$policy/domains/$domain:\([0-9]*\): .*|\1|p" <<<"$output")
    # The file stays the same one, with its label.
    { sed "${line:-999}d" "$policy/domains/$domain"; echo "$rule"; } >"$BATS_TEST_TMPDIR/edited"
    cat "$BATS_TEST_TMPDIR/edited" >"$policy/domains/$domain"
    "$SECPOLICY" --root "$root" load 2>/dev/null
    secpolicy why "$domain" $question
    exits 0
    shows "yes: $domain may $question"
    shows "$policy/domains/$domain:$(wc -l <"$policy/domains/$domain"): $rule"
  done <<'END'
sshDom|read /etc/services.conf
monitorDom|exec /opt/monitor/spool
appDom|call mount
appDom|call umount2
appDom|use cap_kill
sshDom|access sshKey write
sshDom|access hostConfig list
appDom|enter sshDom
globalVMDom|create vmDisk vmDisk symlink
globalVMDom|create vmDisk vmDisk fifo
appDom|create-socket vmSocket dgram
appDom|create-socket vmSocket stream
appDom|pass bind_port 80
appDom|pass socket_family 0x10
END
}

@test "the nearest path rule decides alone" {
  boot
  secpolicy why monitorDom write /opt/monitor/spool/README
  exits 0
  shows "$(at domains/monitorDom '-r /opt/monitor/spool')-r /opt/monitor/spool rw"
  [[ $output != *"-r /opt/monitor rx"* ]]
  secpolicy why monitorDom exec /opt/monitor/spool/README
  answers 1 "no: monitorDom may not exec /opt/monitor/spool/README" \
    "$(at domains/monitorDom '-r /opt/monitor/spool')-r /opt/monitor/spool rw" \
    "  instead: -r /opt/monitor/spool rwx" \
    "label: monitorSpool" \
    "$(at fileLabels/monitor /opt/monitor/spool)/opt/monitor/spool/* monitorSpool"
  secpolicy why monitorDom read /opt/monitors
  exits 1
  [[ $output != *"-r /opt/monitor rx"* ]]
}

@test "a path rule without letters and one for the root of everything" {
  printf -- '-r / r\n-r /etc\n' >>"$policy/domains/sshDom"
  boot
  secpolicy why sshDom read /usr/bin
  exits 0
  shows "$(at domains/sshDom '-r / r')-r / r"
  secpolicy why sshDom read /etc/services.conf
  exits 1
  shows "  instead: -r /etc r"
}

@test "a path counts as written and as it resolves" {
  boot
  mkdir "$root/opt/secret"
  touch "$root/opt/secret/file"
  ln -s /opt/secret "$root/usr/sbin/link"
  printf -- '-r /opt/secret r\n-r /usr/sbin rx\n' >>"$policy/domains/sshDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy why sshDom exec /usr/sbin/link/file
  answers 1 "no: sshDom may not exec /usr/sbin/link/file" \
    "$(at domains/sshDom '-r /opt/secret')-r /opt/secret r" \
    "  instead: -r /opt/secret rx" \
    "file: leads to /opt/secret/file" \
    "label: unlabeled (inherited)"
  secpolicy why sshDom read /usr/sbin/link/file
  exits 0
}

@test "a file inherits its label from above where it lies, not from above a link to it" {
  boot
  printf '%s\n' '/etc/ssh vmDisk' '/usr/sbin vmDisk' >>"$policy/fileLabels/monitor"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  touch "$root/etc/ssh/new"
  ln -s /etc/ssh/new "$root/usr/sbin/link"
  secpolicy why sshDom read /usr/sbin/link
  shows "file: leads to /etc/ssh/new"
  shows "label: vmDisk (inherited)"
  shows "$(at fileLabels/monitor '/etc/ssh vmDisk')/etc/ssh vmDisk"
}

@test "what lies in the root inherits the label of the root" {
  boot
  echo '/ vmDisk' >>"$policy/fileLabels/monitor"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  touch "$root/new"
  secpolicy why sshDom read /new
  shows "label: vmDisk (inherited)"
  shows "$(at fileLabels/monitor '/ vmDisk')/ vmDisk"
}

@test "the label that a file inherits, with the line that its directory has it from" {
  boot
  echo '/etc/ssh vmDisk' >>"$policy/fileLabels/monitor"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  touch "$root/etc/ssh/new"
  secpolicy why sshDom read /etc/ssh/new
  exits 0
  shows "label: vmDisk (inherited)"
  shows "$(at fileLabels/monitor '/etc/ssh vmDisk')/etc/ssh vmDisk"
  secpolicy why --format json sshDom read /etc/ssh/new
  fits_schema why
  jq -e '.question.file | .label == "vmDisk" and .labelInherited' <<<"$output"
  secpolicy why --format json sshDom read /etc/ssh
  jq -e '.question.file | has("labelInherited") | not' <<<"$output"
}

@test "what a transition leads to can be executed" {
  boot
  secpolicy why globalVMDom exec /usr/lib/io-filters/cache
  answers 0 "yes: globalVMDom may exec /usr/lib/io-filters/cache" \
    "$(at domains/globalVMDom '-d filterProgram')-d filterProgram ioFilterDom exec grant" \
    "label: filterProgram" \
    "$(at fileLabels/base /usr/lib/io-filters)/usr/lib/io-filters/* filterProgram"
}

@test "a domain that is not enforcing may do everything, and the answer says so" {
  boot
  secpolicy why hostDom call mount
  answers 0 "yes: hostDom may call mount: it is permissive, so nothing is refused to it; its rules would refuse this" \
    "missing in $policy/domains/hostDom:" "  -s mount grant"
  "$SECPOLICY" --root "$root" settings enforcement sshDom disabled
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  secpolicy why sshDom use cap_setuid
  answers 0 "yes: sshDom may use cap_setuid: it is disabled, so nothing is refused to it" \
    "$(at domains/sshDom '-c cap_setuid')-c cap_setuid grant"
}

@test "a file that is not there, and one without a label of the policy" {
  boot
  secpolicy why sshDom read /etc/ssh/none
  answers 0 "yes: sshDom may read /etc/ssh/none" \
    "$(at domains/sshDom '-r /etc/ssh')-r /etc/ssh r" \
    "file: there is nothing at /etc/ssh/none under this root"
  secpolicy why sshDom read /opt
  answers 1 "no: sshDom may not read /opt" "missing in $policy/domains/sshDom:" "  -r /opt r" "label: unlabeled"
}

@test "a rule that no file brought, and partner and early domains" {
  boot
  secpolicy why daemonFrameworkDom enter appDom
  answers 0 "yes: daemonFrameworkDom may enter appDom" "(no policy file): -d tardiskDefault appDom tardisk_exec grant"
  secpolicy why plugin-cache call mount
  shows "missing in $policy/domains/plugins/cache:"
  secpolicy why bootDom call mount
  shows "missing in $policy/early/domains/bootDom:"
}

@test "entering a domain that nobody enters names the place for an object" {
  : >"$policy/domains/lonelyDom"
  boot
  secpolicy why sshDom enter lonelyDom
  answers 1 "no: sshDom may not enter lonelyDom" "missing in $policy/domains/sshDom:" "  -d OBJECT lonelyDom exec grant"
}

@test "one transition is enough, and a revoked one alone is not" {
  echo "-d vmProgram hostDom exec revoke" >>"$policy/domains/sshDom"
  echo "-d sshProgram sshDom exec revoke" >>"$policy/domains/appDom"
  boot
  secpolicy why sshDom enter hostDom
  answers 0 "yes: sshDom may enter hostDom" "$(at domains/sshDom '-d hostProgram')-d hostProgram hostDom exec grant"
  secpolicy why appDom enter sshDom
  answers 1 "no: appDom may not enter sshDom" \
    "$(at domains/appDom '-d sshProgram')-d sshProgram sshDom exec revoke" "  instead: -d sshProgram sshDom exec grant"
}

@test "misspelt words are wrong usage" {
  boot
  while IFS='|' read -r question message; do
    secpolicy why $question
    wrong_usage why "why: $message"
  done <<'END'
sshdom read /etc|there is no domain 'sshdom'; did you mean 'sshDom'?
sshDom raed /etc|there is no question 'raed'; did you mean 'read'?
sshDom fly|there is no question 'fly'; there are read, write, exec, list, remove, truncate, make, make-socket, call, use, access, enter, create, create-socket, pass
sshDom read etc|'etc' is no path from the root on: it begins with a slash
sshDom read /a /b|write: read PATH
sshDom create vmDisk regular|write: create OBJECT NEWOBJECT KIND
sshDom call reed|there is no system call 'reed'; did you mean 'read'?
sshDom use cap_kil|there is no capability 'cap_kil'; did you mean 'cap_kill'?
sshDom access sshKye read|there is no object 'sshKye'; did you mean 'sshKey'?
sshDom access sshKey fly|there is no kind of access 'fly'; there are execute, list, read, remove, truncate, write
sshDom enter appDon|there is no domain 'appDon'; did you mean 'appDom'?
sshDom create vmDisk vmDisk regluar|there is no kind of file 'regluar'; did you mean 'regular'?
sshDom create-socket vmSocket strean|there is no kind of socket 'strean'; did you mean 'stream'?
sshDom pass bind_prot 1|there is no parameter check 'bind_prot'; did you mean 'bind_port'?
sshDom pass bind_port -1|'-1' is not an unsigned number, decimal or hexadecimal with 0x
sshDom pass bind_port 8x|'8x' is not an unsigned number, decimal or hexadecimal with 0x
END
  secpolicy why sshDom
  wrong_usage why "why: WHAT is required"
  secpolicy why
  wrong_usage why "why: DOMAIN is required"
  secpolicy why --last-refusal sshDom read /
  wrong_usage why "why: with --last-refusal no WHAT is asked"
}

@test "--format json" {
  boot
  secpolicy why sshDom write /etc/ssh/host_key --format json
  exits 1
  fits_schema why
  jq -e --argjson rule "$(grep -nE '^-a sshKey +write' "$policy/domains/sshDom" | cut -d : -f 1)" \
    --argjson written "$(grep -n '^/etc/ssh/host_key' "$policy/fileLabels/base" | cut -d : -f 1)" '
    .schema == "secpolicy.why/1" and .domain == "sshDom" and .level == "enforcing" and
    (.allowed or .granted | not) and .missing == [] and
    .policyFile == "/etc/zorvan/secpolicy/domains/sshDom" and
    .question == {action: "write", words: ["/etc/ssh/host_key"], file: {exists: true,
      paths: ["/etc/ssh/host_key"], label: "sshKey",
      labelFile: "/etc/zorvan/secpolicy/fileLabels/base", labelLine: $written}} and
    .rules[1] == {text: "-a sshKey write revoke", keyword: "-a", words: ["sshKey", "write"],
      grant: false, file: "/etc/zorvan/secpolicy/domains/sshDom", line: $rule,
      instead: "-a sshKey write grant"} and .rules[0].instead == "-r /etc/ssh rw"' <<<"$output"
  secpolicy why hostDom call mount --format json
  exits 0
  fits_schema why
  jq -e '.allowed and (.granted | not) and .rules == [] and .missing == ["-s mount grant"]' <<<"$output"
}

@test "a tab is part of a word" {
  printf 'tab\tbed\n' >"$policy/objects/odd"
  printf -- '-u tab\tbed stream grant\n' >>"$policy/domains/appDom"
  boot
  secpolicy why appDom create-socket $'tab\tbed' stream
  exits 0
}

@test "what lies in a directory is made and removed by its own path" {
  boot
  secpolicy why sshDom make /etc/ssh/new regular
  answers 1 "no: sshDom may not make /etc/ssh/new regular" \
    "$(at domains/sshDom '-r /etc/ssh')-r /etc/ssh r" \
    "  instead: -r /etc/ssh rw" \
    "label of the directory: hostConfig" \
    "$(at fileLabels/base '/etc/[*]')/etc/* hostConfig"
  secpolicy why globalVMDom make /var/lib/vms/link symlink
  answers 1 "no: globalVMDom may not make /var/lib/vms/link symlink" \
    "$(at domains/globalVMDom '-f vmDisk vmDisk symlink')-f vmDisk vmDisk symlink revoke" \
    "  instead: -f vmDisk vmDisk symlink grant" \
    "label of the directory: vmDisk" \
    "$(at fileLabels/base '/var/lib/vms/[*]')/var/lib/vms/* vmDisk"
  secpolicy why monitorDom make /nowhere/x fifo --format json
  exits 1
  fits_schema why
  [[ $(jq -r '.question.directory.exists' <<<"$output") == false ]]
  secpolicy why monitorDom make-socket /opt/monitor/spool/s stream
  exits 0
  secpolicy why globalVMDom remove /var/lib/vms/demo/disk
  exits 1
}

@test "a link's own path has no say" {
  boot
  ln -s /var/lib "$root/opt/elsewhere"
  printf '%s\n' '-r /opt rw' '-r /var/lib r' >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy why appDom write /opt/elsewhere
  exits 1
  shows "  instead: -r /var/lib rw"
  shows "file: leads to /var/lib"
}

@test "a check of which no value is granted passes what none revokes" {
  boot
  secpolicy why appDom pass bind_port 8080
  answers 0 "yes: appDom may pass bind_port 8080" \
    "no rule of appDom grants a value of bind_port, so all pass that none revokes"
  secpolicy why appDom pass bind_port 80
  exits 1
  secpolicy why appDom pass set_uid 0 --format json
  exits 0
  fits_schema why
  [[ $(jq .open <<<"$output") == true ]]
  secpolicy who-can pass bind_port 8080
  exits 0
  shows "appDom: no rule refuses it"
}

@test "a set of system calls speaks for its members" {
  boot
  secpolicy why appDom call mmap
  answers 0 "yes: appDom may call mmap" "$(at domains/appDom '-s @start')-s @start grant"
  echo "-s mmap revoke" >>"$policy/domains/appDom"
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy why appDom call mmap
  exits 1
  shows "  instead: -s mmap grant"
}

@test "domains and objects are named by their numbers, too" {
  boot
  local ssh host key
  ssh=$(domain_id sshDom) host=$(domain_id hostDom)
  key=$("$SECPOLICY" --root "$root" display 2>/dev/null | sed -n 's/^sshKey (\([0-9]*\))$/\1/p')
  secpolicy why hostDom enter sshDom
  local answer=$output
  secpolicy why "$host" enter "$ssh"
  [[ $answer == *sshDom* && $output == "$answer" ]]
  secpolicy who-can access sshKey read
  answer=$output
  secpolicy who-can access "$key" read
  [[ $output == "$answer" && $stderr == *" may access sshKey read" ]]
  secpolicy features --for sshDom
  answer=$output
  secpolicy features --for "$ssh"
  [[ -n $answer && $output == "$answer" ]]
  secpolicy run "$ssh" --explain
  exits 0
}

@test "a domain is named by its name or its number, and what was written by its place in the root" {
  boot
  secpolicy why "$(domain_id sshDom)" use cap_net_bind_service
  answers 0 "yes: sshDom may use cap_net_bind_service" \
    "$root/etc/zorvan/secpolicy/domains/sshDom:$(grep -n cap_net_bind "$policy/domains/sshDom" | cut -d: -f1): -c cap_net_bind_service grant"
}

# note LINE...: these are the latest refusals, each what is asked of a domain, and what else is to be said.
note() {
  local line
  for line; do
    jq -cn --argjson noted "$line" '{schema: "secpolicy.refusal/1", time: "2026-11-22T15:00:00Z", count: 1, refused: true,
      ofNoRule: false, act: "", asked: [], path: null, label: null,
      process: {id: 812, user: 33, program: "sshd", path: "/usr/sbin/sshd", parent: 1, parentPath: null}} + $noted'
  done >"$root/run/secpolicy/refusals"
  chmod 600 "$root/run/secpolicy/refusals"
}

@test "--last-refusal explains the newest one, as it is asked" {
  boot
  note '{"domain": "sshDom", "asked": ["write", "/etc/ssh/host_key"], "label": "hostConfig", "count": 3}' \
    '{"domain": "monitorDom", "asked": ["call", "ptrace"], "refused": false}'
  secpolicy why --last-refusal
  exits 1
  [[ ${lines[0]} == "2026-11-22 15:00:00 UTC: monitorDom would be refused: call ptrace, by /usr/sbin/sshd, process 812 of user 33" ]]
  [[ $(tail -n +2 <<<"$output") == "$("$SECPOLICY" --root "$root" why monitorDom call ptrace)" ]]
  secpolicy why --last-refusal sshDom
  exits 1
  [[ ${lines[0]} == "2026-11-22 15:00:00 UTC: sshDom was refused: write /etc/ssh/host_key, by /usr/sbin/sshd, process 812 of user 33, 3 times" ]]
  [[ $(tail -n +2 <<<"$output" | head -n -1) == "$("$SECPOLICY" --root "$root" why sshDom write /etc/ssh/host_key)" ]]
  [[ ${lines[-1]} == "label when it was refused: hostConfig" ]]
  secpolicy why --last-refusal "$(domain_id sshDom)" --format json
  exits 1
  fits_schema why
  jq -e '.question.action == "write" and .refusal.process.id == 812 and .refusal.count == 3' <<<"$output"
  # What the rules grant by now is told so.
  note '{"domain": "sshDom", "asked": ["read", "/etc/ssh/host_key"]}'
  secpolicy why --last-refusal
  exits 0
  shows "yes: sshDom may read /etc/ssh/host_key"
}

@test "--last-refusal tells of what no rule grants, and of what cannot be asked" {
  boot
  note '{"domain": "sshDom", "act": "reach what enforces the policy", "ofNoRule": true}'
  secpolicy why --last-refusal
  answers 1 "2026-11-22 15:00:00 UTC: sshDom was refused: reach what enforces the policy, by /usr/sbin/sshd, process 812 of user 33" \
    "no: no rule grants to reach what enforces the policy"
  secpolicy why --last-refusal --format json
  exits 1
  fits_schema why
  note '{"domain": "sshDom", "act": "use a file"}'
  secpolicy why --last-refusal
  exits 1
  shows "which rule decides is not known"
}

@test "--last-refusal without any says what to do" {
  boot
  secpolicy why --last-refusal
  exits 1
  [[ -z $output && $stderr == "secpolicy: why: no refusal is known: secpolicy-log notes them while it runs, which 'systemctl enable --now secpolicy-log' sees to" ]]
  note '{"domain": "sshDom", "asked": ["read", "/"]}'
  secpolicy why --last-refusal monitorDom
  exits 1
  [[ -z $output && $stderr == "secpolicy: why: no refusal in monitorDom is among the latest, which are in $root/run/secpolicy/refusals" ]]
  # What is no refusal is passed over.
  printf '%s\n' '{"domain": 7}' 'text' '' >>"$root/run/secpolicy/refusals"
  secpolicy why --last-refusal
  [[ ${lines[0]} == *": sshDom was refused: read /, by "* ]]
  secpolicy why --last-refusal sshDon
  exits 2
  chmod 666 "$root/run/secpolicy/refusals"
  secpolicy why --last-refusal
  exits 1
  [[ -z $output && $stderr == "secpolicy: why: Refusing the latest refusals: other users may write /run/secpolicy/refusals. "* ]]
}
