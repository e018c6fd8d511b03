# secpolicy domain: what it creates, destroys and tells is what the other verbs see, and what cannot be
# done is refused with its cause.

load helper

setup() {
  make_root
  boot
}

# fails VERB MESSAGE: the latest command failed with this summary and wrote nothing else.
fails() {
  exits 1
  [[ -z $output ]]
  [[ $stderr == "secpolicy: domain $1: $2" ]] || ends_with "secpolicy: domain $1: $2"
}

@test "a domain is created, shown, used and destroyed" {
  secpolicy domain create job7
  answers 0 10
  [[ $stderr == "secpolicy: domain create: done" ]]
  secpolicy domain show job7
  exits 0
  shows "Domain Name: job7 Domain ID :10 Enforcement Level: enforcing"
  shows "State: 8 RefCount: 0 WorldRefCount: 0 defaultDom: 0"
  secpolicy why job7 use cap_kill
  exits 1
  secpolicy domain destroy job7
  exits 0
  [[ -z $output && $stderr == "secpolicy: domain destroy: done" ]]
  [[ -z $(domain_id job7) ]]
}

@test "a load leaves what was created, and a boot does not" {
  secpolicy domain create --check-access job7
  secpolicy capability grant job7 cap_kill
  secpolicy load
  exits 0
  secpolicy domain show job7
  exits 0
  shows "State: 8 RefCount: 0 WorldRefCount: 0 defaultDom: 3"
  shows "-c cap_kill grant"
  boot
  [[ -z $(domain_id job7) ]]
}

@test "what cannot be created is refused, with what to do" {
  secpolicy domain create sshDom
  fails create "Failed to create domain:sshDom :File exists. There is a domain of this name, with the number $(domain_id sshDom): 'secpolicy --root $root domain show sshDom' shows it"
  local long name
  long=$(printf 'x%.0s' {1..64})
  for name in "$long" "" 'a b' a/b ../a .a; do
    secpolicy domain create "$name"
    wrong_usage "domain create" "NAME: '$name' is no name: letters, digits and '_', '-', '.' behind the first, 63 at most"
  done
  secpolicy domain create 8
  wrong_usage "domain create" "NAME: '8' is no name: it would be taken for a number"
  secpolicy domain create "${long:1}"
  exits 0
}

@test "when all domains are in use, what to do is said" {
  sqlite3 "$root/run/secpolicy/host.db" \
    "WITH RECURSIVE id(n) AS (SELECT 10 UNION ALL SELECT n + 1 FROM id WHERE n < 511)
     INSERT INTO domain SELECT n, 'job' || n, 'enforcing', 0, 1 FROM id;
     UPDATE state SET domain_version = domain_version + 1"
  secpolicy domain create another
  fails create "Failed to create domain:another :No space left on device. All domains are in use: 'secpolicy --root $root domain leaked' lists those that nothing refers to, and 'secpolicy --root $root domain destroy' destroys one"
  secpolicy domain leaked
  exits 0
  [[ $stderr == "secpolicy: domain leaked: 502 domains" ]]
  secpolicy domain destroy job300
  secpolicy domain create another
  answers 0 300
}

@test "what cannot be destroyed is refused, with the cause" {
  secpolicy domain destroy hostDom
  fails destroy "Failed to destroy domain: Operation not permitted. hostDom is built in, and every process begins there"
  secpolicy domain destroy globalVMDom
  fails destroy "Failed to destroy domain: Device or resource busy. globalVMDom is one of the domains that every host needs"
  secpolicy domain create job7
  place $$ 10
  secpolicy domain destroy job7
  fails destroy "Failed to destroy domain: Device or resource busy. In job7 runs $$: end it first"
  place "$PPID" 10
  secpolicy domain destroy job7
  [[ $stderr == *". In job7 runs "*" and "*": end them first" ]]
}

# place PID ID: the process is in the domain, as a service would have placed it. There is no /proc below
# this root, so nobody knows when it was started.
place() {
  sqlite3 "$root/run/secpolicy/host.db" "INSERT OR REPLACE INTO world VALUES ($1, 0, $2, '')"
}

@test "a domain of a policy file comes back with the next load" {
  local rules
  rules=$("$SECPOLICY" --root "$root" domain show sshDom 2>/dev/null | grep -c '^-')
  secpolicy domain destroy sshDom
  exits 0
  [[ -z $(domain_id sshDom) && $("$SECPOLICY" --root "$root" display 2>/dev/null) != *" sshDom "* ]]
  secpolicy load
  exits 0
  secpolicy domain show sshDom
  [[ $(grep -c '^-' <<<"$output") -eq $rules ]]
}

@test "a domain is named by its name or its number, and what is unknown by the nearest" {
  secpolicy domain show "$(domain_id sshDom)"
  exits 0
  [[ $output == *"Domain Name: sshDom "* ]]
  : >"$policy/domains/8"
  secpolicy load
  secpolicy domain show 8
  [[ $output == *"Domain Name: 8 Domain ID :10 "* ]]
  for verb in show destroy "add-service"; do
    secpolicy domain "$verb" sshDmo service
    exits 2
  done
  secpolicy domain show sshDmo
  wrong_usage "domain show" "domain show: there is no domain 'sshDmo'; did you mean 'sshDom'?"
  secpolicy domain destroy 511
  exits 2
  [[ $stderr == "secpolicy: domain destroy: there is no domain '511'; there are hostDom, "* ]]
}

@test "list and leaked tell the domains as text and as JSON" {
  secpolicy domain create job7
  secpolicy domain create job8
  place $$ 11
  secpolicy domain list
  answers 0 \
    "  0  hostDom             permissive" \
    "  2  bootDom             enforcing" \
    "  3  appDom              enforcing" \
    "  4  daemonFrameworkDom  enforcing" \
    "  5  globalVMDom         enforcing" \
    "  6  ioFilterDom         enforcing" \
    "  7  monitorDom          enforcing" \
    "  8  sshDom              enforcing" \
    "  9  plugin-cache        enforcing" \
    " 10  job7                enforcing   created at run time" \
    " 11  job8                enforcing   created at run time, 1 world"
  [[ $stderr == "secpolicy: domain list: 11 domains" ]]
  secpolicy domain leaked
  answers 0 " 10  job7  enforcing  created at run time"
  [[ $stderr == "secpolicy: domain leaked: 1 domain" ]]
  secpolicy domain leaked --format json
  exits 0
  fits_schema domains
  jq -e '[.domains[] | .name, .id, .state, .worldReferences] == ["job7", 10, 8, 0]' <<<"$output"
  secpolicy domain list --format json
  exits 0
  fits_schema domains
  [[ $(jq '.domains | length' <<<"$output") -eq 11 ]]
  jq -e '.domains[] | select(.name == "job8") | .worldReferences == 1' <<<"$output"
}

@test "show tells a domain as JSON as display does" {
  secpolicy domain show sshDom --format json
  exits 0
  fits_schema domain
  local shown=$output
  secpolicy display --format json
  diff <(jq 'del(.schema)' <<<"$shown") <(jq '.domains[] | select(.name == "sshDom")' <<<"$output")
}

@test "of prints the domain of a process, and of its children" {
  secpolicy domain create job7
  secpolicy domain of $$
  answers 0 hostDom
  place $$ 10
  secpolicy domain of $$
  answers 0 job7
  [[ $stderr == "secpolicy: domain of: done" ]]
  mkdir -p "$root/proc/$BASHPID"
  printf 'Name:\tbash\nPPid:\t%s\n' $$ >"$root/proc/$BASHPID/status"
  secpolicy domain of "$BASHPID"
  answers 0 job7
  place "$BASHPID" 0
  secpolicy domain of "$BASHPID"
  answers 0 hostDom
}

@test "of refuses what is no process" {
  secpolicy domain of 4194305
  fails of "Unable to get domain ID: No such process"
  for word in 0 -- -1 sshd 1x 99999999999; do
    [[ $word != -- ]] || continue
    secpolicy domain of -- "$word"
    wrong_usage "domain of" "domain of: '$word' is not the number of a process"
  done
}

@test "a service is attached to a domain, once" {
  secpolicy domain add-service sshDom /vm/clipboard
  exits 0
  [[ -z $output && $stderr == "secpolicy: domain add-service: done" ]]
  secpolicy domain add-service "$(domain_id sshDom)" /vm/clipboard
  exits 0
  [[ $(sqlite3 "$root/run/secpolicy/host.db" 'SELECT name, service FROM guest_service JOIN domain ON id = domain_id') == "sshDom|/vm/clipboard" ]]
  secpolicy domain add-service sshDom ""
  fails add-service "Must specify service string"
  local long
  long=$(printf 'x%.0s' {1..256})
  secpolicy domain add-service sshDom "$long"
  fails add-service "guest-communication service '$long' is too long: 256 bytes, at most 255"
}

@test "the verbs of the runtime interface refuse where nothing is installed, and make nothing" {
  root=$BATS_TEST_TMPDIR/empty
  mkdir -p "$root/run"
  for verb in "domain create x" "domain list" "domain of 1" "file-policy list x" "capability grant x cap_kill" \
    "param-check set x bind_port 1 grant" "file-policy replace /a /b"; do
    # shellcheck disable=SC2086
    secpolicy $verb
    exits 1
    local words
    read -ra words <<<"$verb"
    [[ $stderr == "secpolicy: ${words[0]} ${words[1]}: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first." ]]
  done
  [[ -z $(ls "$root/run") ]]
}

@test "an ordinary user enters a domain that was created and given rules" {
  needs_landlock
  [[ $(id -u) -eq 0 ]] || skip "plans are made by root"
  secpolicy domain create job7
  [[ -f $(echo "$root"/run/secpolicy/plans/*job7*) ]]
  local before
  before=$(cat "$root"/run/secpolicy/plans/*job7*)
  secpolicy file-policy add job7 rx /usr
  exits 0
  [[ $(cat "$root"/run/secpolicy/plans/*job7* | tr -d '\0') != "$before" ]]
  secpolicy domain destroy job7
  [[ ! -e $(echo "$root"/run/secpolicy/plans/*job7*) ]]
}
