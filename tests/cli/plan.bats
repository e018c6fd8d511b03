# secpolicy load --plan: what it shows is what the load then does, and showing it changes nothing.

load helper

# Every test plans a load of a changed copy of the booted example.
setup() {
  boot_beside_copy
  rm -r "$policy/tardisks"
}

# Every file of the root, with when it was last changed in any way, labels included.
fingerprint() { (cd "$root" && find . -type f -printf '%p %i %s %m %C@\n' | sort); }

plan() { secpolicy load --plan /new "$@"; }

@test "nothing would change after a boot" {
  secpolicy load --plan
  exits 0
  [[ -z $output && $stderr == "secpolicy: load: nothing would change" ]]
}

@test "every kind of change is shown" {
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  sed -i '/listen/d; s/^\(-c cap_net_bind_service\) grant/\1 revoke/; s|^\(-r /etc/ssh *\)r$|\1rw|' \
    "$policy/domains/sshDom"
  echo "-r /srv rw" >"$policy/domains/newDom"
  sed -i '/monitorSocket/d' "$policy/domains/monitorDom" "$policy/objects/monitor"
  rm "$policy/early/domains/bootDom"
  echo "newObject" >>"$policy/objects/base"
  echo "/etc/services.conf newObject" >"$policy/fileLabels/zz"
  plan
  exits 0
  diff - <(printf '%s\n' "$output") <<'END'
domains to create (1):
  newDom
objects to add (1):
  newObject
objects to remove (1):
  monitorSocket
rules to add (2):
  appDom: -c cap_net_raw grant
  newDom: -r /srv rw
rules to change (2):
  sshDom: -c cap_net_bind_service grant -> revoke
  sshDom: -r /etc/ssh r -> rw
rules to remove (2):
  monitorDom: -u monitorSocket stream grant
  sshDom: -s listen grant
files to label anew (1):
  /etc/services.conf: hostConfig -> newObject
END
  [[ $stderr == "secpolicy: load: this was a plan: nothing was changed" ]]
}

@test "the plan is what the load then does" {
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  echo "newObject" >>"$policy/objects/base"
  echo "/etc/services.conf newObject" >"$policy/fileLabels/zz"
  plan
  [[ -n $output ]]
  secpolicy load /new
  exits 0
  plan
  exits 0
  [[ -z $output && $stderr == "secpolicy: load: nothing would change" ]]
}

@test "a domain that no file defines is to be removed, and its rules" {
  echo "-s read grant" >"$policy/domains/newDom"
  secpolicy load /new
  rm "$policy/domains/newDom"
  plan
  exits 0
  answers 0 "domains to remove (1):" "  newDom" "rules to remove (1):" "  newDom: -s read grant"
  plan --format json
  jq -e '.domains == {create: [], remove: ["newDom"], stay: []}' <<<"$output"
  secpolicy load /new
  [[ $stderr == *", 1 domain and 1 rule removed that no file has" ]]
  plan
  [[ -z $output && $stderr == "secpolicy: load: nothing would change" ]]
}

@test "what is to be kept is shown, and changes nothing" {
  sed -i '/cap_sys_chroot/d' "$policy/domains/sshDom"
  plan --keep
  exits 0
  [[ $output == "rules that stay installed although found in no file (1):
  sshDom: -c cap_sys_chroot grant" ]]
  [[ $stderr == "secpolicy: load: nothing would change" ]]
}

@test "a plan changes no file, no label, no state and no setting, and logs nothing" {
  secpolicy settings option /UserVars/CheckAccessTemplateEnabled 1
  echo "-x" >>"$policy/domains/appDom"
  echo "newObject" >>"$policy/objects/base"
  echo "/etc/* newObject" >"$policy/fileLabels/zz"
  fingerprint >"$BATS_TEST_TMPDIR/before"
  plan
  exits 1
  shows "  checkAccessTemplateDom"
  fingerprint | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a plan needs no place in the root directory" {
  mkdir -p "$root/tmp"
  local place
  for place in "-u TMPDIR" TMPDIR=; do
    touch -d @1000000000 "$root"
    run env $place "$SECPOLICY" --root "$root" load --plan
    exits 0
    [[ $(stat -c %Y "$root") -eq 1000000000 ]]
  done
}

@test "a plan labels the place that it works in" {
  mkdir -p "$root/tmp"
  touch "$root/tmp/file"
  boot
  echo "/tmp/* hostConfig" >"$policy/fileLabels/zz"
  run --separate-stderr env TMPDIR=/tmp/ "$SECPOLICY" --root "$root" load --plan /new
  exits 0
  [[ $output == "files to label anew (2):
  /tmp: unlabeled -> hostConfig
  /tmp/file: unlabeled -> hostConfig" ]]
}

@test "a plan that is killed leaves no process behind, and its copies to nobody else" {
  # The process that tries the load out waits where it tries out a label.
  cc -shared -fPIC -o "$BATS_TEST_TMPDIR/wait.so" -x c - <<'END'
#include <fcntl.h>
#include <stdio.h>
#include <unistd.h>
int setxattr(const char* path, const char* name, const void* value, size_t size, int flags) {
  dprintf(open("/child", O_CREAT | O_WRONLY, 0600), "%d\n", getpid());
  for (;;) pause();
}
int lsetxattr(const char* path, const char* name, const void* value, size_t size, int flags) {
  return setxattr(path, name, value, size, flags);
}
END
  mkdir "$root/tmp"
  echo "/etc/services.conf sshKey" >"$policy/fileLabels/zz"
  env LD_PRELOAD="$BATS_TEST_TMPDIR/wait.so" ASAN_OPTIONS=detect_leaks=0:verify_asan_link_order=0 TMPDIR=/tmp \
    "$SECPOLICY" --root "$root" load --plan /new >/dev/null 2>&1 3>&- &
  local plan=$! child
  until_true "[[ -s $root/child ]]"
  child=$(cat "$root/child")
  [[ $child -ne $plan && -e /proc/$child/exe ]]
  kill -KILL "$plan"
  wait "$plan" || true
  # A process that has ended but is not waited for runs no program.
  until_true "[[ ! -e /proc/$child/exe ]]"
  [[ $(stat -c %a "$root"/tmp/secpolicy.*) == 700 ]]
}

@test "the problems of the load are told as the load tells them" {
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  echo "/no/such hostConfig" >"$policy/fileLabels/zz"
  plan
  exits 1
  local planned=$stderr
  secpolicy load /new
  exits 1
  [[ $planned == "$(grep -v '^installed now: ' <<<"$stderr")
secpolicy: load: nothing would change" ]]
  [[ $stderr == *no_such_call* && $stderr == *"/no/such: No such file"* ]]
}

@test "a load that would be stopped would do nothing" {
  rm -r "$root/run/secpolicy/"*
  rm "$policy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$policy/domains/"*Dom
  plan
  exits 3
  says "Error: Failed to fetch domainID for IOFilter domain"
  ends_with "secpolicy: load: nothing would change"
  [[ -z $output ]]
  [[ ! -e $root/run/secpolicy/host.db ]]
}

@test "many files are counted, and all shown with -v" {
  local number
  mkdir "$root/many"
  for number in {10..40}; do touch "$root/many/$number"; done
  boot
  echo "/many/* hostConfig" >"$policy/fileLabels/zz"
  plan
  exits 0
  [[ $output == "files to label anew (32):
  /many: unlabeled -> hostConfig
  /many/10: unlabeled -> hostConfig"*"
  /many/28: unlabeled -> hostConfig
  ... and 12 more; -v shows all" ]]
  plan -v
  [[ $(wc -l <<<"$output") -eq 33 ]]
  shows "  /many/40: unlabeled -> hostConfig"
}

@test "a label whose object is gone shows as its number" {
  local id
  echo "oldObject" >"$policy/objects/old"
  echo "/etc/services.conf oldObject" >"$policy/fileLabels/zz"
  secpolicy load /new
  secpolicy display
  id=$(sed -n 's/^oldObject (\(.*\))$/\1/p' <<<"$output")
  rm "$policy/objects/old" "$policy/fileLabels/zz"
  sed -i '/hostConfig/d' "$policy/fileLabels/base"
  secpolicy load /new
  echo "/etc/services.conf hostConfig" >"$policy/fileLabels/zz"
  plan
  shows "  /etc/services.conf: #$id -> hostConfig"
}

@test "--format json" {
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  sed -i '/listen/d; s/^\(-c cap_net_bind_service\) grant/\1 revoke/' "$policy/domains/sshDom"
  echo "/etc/services.conf sshKey" >"$policy/fileLabels/zz"
  plan --format json
  exits 0
  fits_schema plan
  jq -e '. == {schema: "secpolicy.plan/1", directory: "/new", ending: "done", errors: [],
    changesNothing: false,
    domains: {create: [], remove: [], stay: []}, objects: {add: [], remove: []},
    rules: {
      add: [{domain: "appDom", rule: "-c cap_net_raw grant"}],
      change: [{domain: "sshDom", before: "-c cap_net_bind_service grant", after: "-c cap_net_bind_service revoke"}],
      remove: [{domain: "sshDom", rule: "-s listen grant"}], stay: []},
    labels: [{path: "/etc/services.conf", before: "hostConfig", after: "sshKey"}]}' <<<"$output"
  echo "-x" >>"$policy/domains/appDom"
  plan --format json
  exits 1
  jq -e '.ending == "failed" and (.errors | length) == 3 and
    .errors[2] == "Failure in domain policy"' <<<"$output"
}

@test "--format needs --plan, and knows what it writes" {
  secpolicy load --format json
  wrong_usage load "--format requires --plan"
  plan --format xml
  wrong_usage load "--format: there is no 'xml'; there are text and json"
}

@test "a state that cannot be read, and a directory that is not there" {
  echo garbage >"$root/run/secpolicy/host.db"
  plan
  exits 1
  [[ $stderr == "secpolicy: load: Unable to copy the host state /run/secpolicy/host.db: file is not a database" ]]
  [[ $(cat "$root/run/secpolicy/host.db") == garbage ]]
  secpolicy load --plan /no/such
  exits 1
  [[ $stderr == "secpolicy: load: there is no directory /no/such below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR)." ]]
}
