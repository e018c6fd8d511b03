# secpolicy load and load-early: what is installed and what is removed, how each failure is told and
# counted, and loads that are killed.

load helper

@test "load installs the policy again" {
  boot
  secpolicy load
  exits 0
  [[ -z $output ]]
  is_done load
}

@test "load installs what was added to a file" {
  boot
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  secpolicy load
  exits 0
  secpolicy display "$(domain_id appDom)"
  shows "-c cap_net_raw grant"
}

@test "load of another directory takes objects, domains and labels from there" {
  boot
  cp -r "$policy" "$root/new-policy"
  echo "extraObject" >"$root/new-policy/objects/extra"
  echo "-c cap_chown grant" >"$root/new-policy/domains/extraDom"
  secpolicy load /new-policy
  exits 0
  secpolicy display
  shows "-c cap_chown grant"
  [[ $output == *$'\n'"extraObject ("* ]]
}

@test "a bad line is reported as the library says it, and the rest is loaded" {
  boot
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  echo "-c cap_net_raw grant" >>"$policy/domains/sshDom"
  secpolicy load
  exits 1
  local line
  line=$(wc -l <"$policy/domains/appDom")
  says "Error: Error in parsing policy for domain: appDom: $line : unknown system call 'no_such_call'"
  says "Error: Error in parsing the policy for some domains"
  says "Error: Failure in domain policy"
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (1 problem above)"
  secpolicy display "$(domain_id sshDom)"
  shows "-c cap_net_raw grant"
}

@test "an error that the library only reports is a failure all the same" {
  boot
  mkdir "$root/tardisks/lost+found"
  secpolicy load
  exits 1
  says "Error: Skipping directory lost+found"
  ends_with "secpolicy: load: failed (1 error above)"
}

@test "load stops when a domain that every host needs is missing" {
  cp -r "$root" "$BATS_TEST_TMPDIR/other"
  root=$BATS_TEST_TMPDIR/other
  rm "$root/etc/zorvan/secpolicy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$root/etc/zorvan/secpolicy/domains/"*Dom
  secpolicy load
  exits 3
  says "Error: Failed to fetch domainID for IOFilter domain"
  ends_with "secpolicy: load: stopped: there is no domain ioFilterDom, so nothing was installed. Put a policy file named ioFilterDom into /etc/zorvan/secpolicy/domains and run it again."
}

@test "load of a directory that is not there changes nothing and says what to do" {
  secpolicy load /no/such
  exits 1
  [[ $stderr == "secpolicy: load: there is no directory /no/such below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR)." ]]
  [[ ! -e $root/run/secpolicy ]]
}

@test "load in a root without a policy says what to do" {
  rm -r "$policy"
  secpolicy load
  exits 1
  ends_with "secpolicy: load: there is no directory /etc/zorvan/secpolicy below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR). 'secpolicy --root $root init' writes a first policy."
}

@test "-v shows the progress on standard error, before and after the verb" {
  boot
  secpolicy -v load
  exits 0
  says "Using policy dir /etc/zorvan/secpolicy"
  says "Domain policies set"
  says "System security policy has been set successfully"
  ends_done load
  secpolicy load -v
  says "Using policy dir /etc/zorvan/secpolicy"
}

@test "-v leaves the log of the host as it is" {
  boot
  [[ ! -e $root/dev/kmsg ]] || skip "the root has a kernel log device"
  rm "$root/run/secpolicy/kernel.log"
  secpolicy load
  mv "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
  secpolicy -v load
  cmp "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
  grep -q "System security policy has been set successfully" "$BATS_TEST_TMPDIR/quiet.log"
}

@test "load-early installs the early domains, and no others" {
  secpolicy load-early
  [[ -n $(domain_id bootDom) && -z $(domain_id sshDom) ]]
}

@test "load-early after a boot ends well" {
  boot
  secpolicy load-early
  exits 0
  is_done load-early
}

@test "load-early fails although the library returns normally" {
  boot
  rm -r "$policy/early/domains"
  secpolicy load-early
  exits 1
  [[ $stderr =~ ^"Error: Unable to open policy directory /etc/zorvan/secpolicy/early/domains
$policy/early/domains: 1 error
'secpolicy --root $root check /etc/zorvan/secpolicy' shows the lines, and what may be meant
installed now: "[0-9]+" domains, "[0-9]+" rules, "[0-9]+" objects
secpolicy: load-early: failed (1 problem above); nothing was removed: 1 domain and "[0-9]+" rules found in no file"$ ]]
}

@test "two loads at once both end well" {
  boot
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/one" &
  local other=$!
  "$SECPOLICY" --root "$root" load 2>"$BATS_TEST_TMPDIR/two"
  wait "$other"
  stderr=$(cat "$BATS_TEST_TMPDIR/one")
  is_done load
  stderr=$(cat "$BATS_TEST_TMPDIR/two")
  is_done load
}

@test "the summary counts what display shows" {
  boot
  secpolicy load
  local counted=$stderr domains rules objects
  secpolicy display
  domains=$(grep -c '^Domain Name: ' <<<"$output")
  rules=$(grep -c '^-[a-z] ' <<<"$output")
  objects=$(sed -n '/^Objects Defined/,/^Tardisk Path/p' <<<"$output" | grep -c '^[A-Za-z]* ([0-9]*)$')
  [[ $counted == "secpolicy: load: done ($domains domains, $rules rules, $objects objects)" ]]
}

@test "after a failed load each file that failed is counted, and what is installed" {
  boot
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  echo "-c no_such_capability grant" >>"$policy/domains/plugins/cache"
  echo "two words" >>"$policy/objects/base"
  echo "/etc/lonely" >>"$policy/fileLabels/base"
  echo "/no/such hostConfig" >>"$policy/fileLabels/monitor"
  echo "/no/such/either hostConfig" >>"$policy/fileLabels/monitor"
  secpolicy load
  exits 1
  [[ $(grep -e '^/' -e '^installed' <<<"$stderr") =~ ^"$(cat <<END
$policy/domains/appDom: 1 error
$policy/domains/plugins/cache: 1 error
$policy/fileLabels/base: 1 error
$policy/fileLabels/monitor: 2 errors
$policy/objects/base: 1 error
END
)"$'\n'"installed now: "[0-9]+" domains, "[0-9]+" rules, "[0-9]+" objects"$ ]]
}

@test "the files of a tardisk's policy and of two conflicting rules are counted too" {
  boot
  printf '%s\n' "-p bind_port 1 100 grant" "-p bind_port 50 revoke" >>"$policy/domains/appDom"
  cp "$policy/tardisks/monitor" "$policy/tardisks/other"
  secpolicy load
  exits 1
  says "$policy/domains/appDom: 1 error"
  says "$policy/tardisks/other: 1 error"
}

# Whoever owns the state needs no plans.
plans=
[[ $(id -u) -ne 0 ]] || plans=$'\nplans'

@test "--timing prints each phase of a load to standard output" {
  boot
  secpolicy load --timing
  exits 0
  is_done load
  [[ $(sed 's/  *[0-9.]* s$//' <<<"$output") == "objects
domains
partner domains
tardisks
file labels$plans
all" ]]
  secpolicy load-early --timing
  exits 0
  [[ $(sed 's/  *[0-9.]* s$//' <<<"$output") == "objects
domains
file labels$plans
all" ]]
}

@test "--timing of a load that fails shows the phases all the same" {
  boot
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  echo "/no/such hostConfig" >>"$policy/fileLabels/base"
  secpolicy load --timing
  exits 1
  [[ $(sed 's/  *[0-9.]* s$//' <<<"$output") == "objects
domains
partner domains
tardisks
file labels$plans
all" ]]
}

@test "--timing does not keep the log of the host from its lines" {
  boot
  [[ ! -e $root/dev/kmsg ]] || skip "the root has a kernel log device"
  rm "$root/run/secpolicy/kernel.log"
  secpolicy load
  mv "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
  secpolicy load --timing
  cmp "$root/run/secpolicy/kernel.log" "$BATS_TEST_TMPDIR/quiet.log"
}

@test "a policy directory is recorded by its whole name, however it is typed" {
  boot
  cp -r "$policy" "$root/other"
  rm "$root"/other/fileLabels/*
  ln -s etc/zorvan "$root/link"
  local typed
  for typed in other/ ./other //other/. etc/../other///; do
    secpolicy load "$typed"
    exits 0
    secpolicy status --format json
    [[ $(jq -r .latestLoad.directory <<<"$output") == /other ]]
    secpolicy why sshDom call listen
    [[ $output == *$'\n'"$root/other/domains/sshDom:"* ]]
  done
  secpolicy load link/../zorvan/secpolicy/
  secpolicy why sshDom call listen
  [[ $output == *$'\n'"$root/link/../zorvan/secpolicy//domains/sshDom:"* ]]
}

# without_memory STATEMENT: sets `breakage`, below which no memory is left when the state is asked this.
without_memory() {
  cat >"$BATS_TEST_TMPDIR/memory.cpp" <<'END'
#include <dlfcn.h>
#include <cstdlib>
#include <cstring>
#include <new>
struct sqlite3;
struct sqlite3_stmt;
extern "C" int sqlite3_prepare_v3(sqlite3* database, const char* text, int size, unsigned flags,
                                  sqlite3_stmt** statement, const char** rest) {
  if (std::strstr(text, std::getenv("WITHOUT_MEMORY"))) throw std::bad_alloc();
  using Prepare = decltype(&sqlite3_prepare_v3);
  static const auto prepare = reinterpret_cast<Prepare>(dlsym(RTLD_NEXT, "sqlite3_prepare_v3"));
  return prepare(database, text, size, flags, statement, rest);
}
END
  ${CXX:-c++} -std=c++20 -shared -fPIC -o "$BATS_TEST_TMPDIR/memory.so" "$BATS_TEST_TMPDIR/memory.cpp"
  breakage=(env "WITHOUT_MEMORY=$1" "LD_PRELOAD=$BATS_TEST_TMPDIR/memory.so"
    ASAN_OPTIONS=detect_leaks=0:verify_asan_link_order=0)
}

@test "a load that cannot be recorded ends with its summary all the same" {
  boot
  without_memory "INTO rule_origin"
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load
  exits 0
  [[ $stderr == "secpolicy: load: this load cannot be recorded for the verbs that explain it: "*$'\n'* ]]
  ends_done load
  rm "$policy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$policy/domains/"*Dom
  rm -r "$root/run/secpolicy/"*
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load
  exits 3
  ends_with "secpolicy: load: stopped: there is no domain ioFilterDom, so nothing was installed. Put a policy file named ioFilterDom into /etc/zorvan/secpolicy/domains and run it again."
}

@test "a load after which nothing can be counted is done all the same" {
  boot
  without_memory "count(*) FROM domain)"
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load
  exits 0
  says "secpolicy: load: what is installed cannot be counted: std::bad_alloc"
  ends_with "secpolicy: load: done"
}

@test "a load removes what no file has any more, and says so" {
  boot
  sed -i '/-s listen/d; /-s accept4/d' "$policy/domains/sshDom"
  secpolicy load
  exits 0
  [[ $stderr =~ ^"secpolicy: load: done ("[0-9]+" domains, "[0-9]+" rules, "[0-9]+" objects), 2 rules removed that no file has"$ ]]
  secpolicy why sshDom call listen
  exits 1
  secpolicy load
  is_done load
}

@test "--keep keeps what no file has any more" {
  boot
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  secpolicy load --keep
  exits 0
  [[ $stderr == *", 1 rule kept that no file has" ]]
  secpolicy why sshDom call listen
  exits 0
  secpolicy load
  [[ $stderr == *", 1 rule removed that no file has" ]]
}

@test "after an error in the files nothing is removed" {
  boot
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  secpolicy load
  exits 1
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (1 problem above); nothing was removed: 1 rule found in no file"
  secpolicy load --keep
  exits 1
  [[ $stderr == *"(1 problem above); nothing was removed: 1 rule found in no file" ]]
  secpolicy why sshDom call listen
  exits 0
}

# The file has them, behind the line that ends its reading.
@test "rules behind an error are not said to be in no file" {
  boot
  sed -i '1i -s no_such_call grant' "$policy/domains/sshDom"
  secpolicy load
  exits 1
  [[ $stderr =~ "; nothing was removed: "[0-9]+" rules found in no file"$ ]]
  secpolicy load --plan
  exits 1
  [[ $output =~ ^"rules that stay installed although found in no file ("[0-9]+"):" ]]
  secpolicy status
  [[ $output =~ "left over    "[0-9]+" rules" ]]
}

@test "a load that fails names domains without rules, too, that it has not removed" {
  boot
  touch "$policy/domains/newDom"
  secpolicy load
  rm "$policy/domains/newDom"
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  secpolicy load
  exits 1
  [[ $stderr == *"(1 problem above); nothing was removed: 1 domain found in no file" ]]
}

@test "a load that is stopped leaves what was installed" {
  boot
  secpolicy display
  local before=$output
  rm "$policy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$policy/domains/"*Dom
  echo "-s ptrace grant" >>"$policy/domains/appDom"
  secpolicy load
  exits 3
  secpolicy display
  [[ $output == "$before" ]]
}

@test "a full load leaves the early policy, and an early load the full one" {
  boot
  sed -i '/-s init_module/d' "$policy/early/domains/bootDom"
  secpolicy load
  is_done load
  secpolicy why bootDom call init_module
  exits 0
  sed -i '/-s listen/d' "$policy/domains/sshDom"
  secpolicy load-early
  [[ $stderr == *", 1 rule removed that no file has" ]]
  secpolicy why bootDom call init_module
  exits 1
  secpolicy why sshDom call listen
  exits 0
}

@test "what a service has made outlives a load" {
  boot
  SECPOLICY_HOST_STATE=$root/run/secpolicy/host.db "$RUNTIME_EXAMPLE" >/dev/null || true
  sqlite3 "$root/run/secpolicy/host.db" "INSERT INTO rule (domain_id, kind, word1, word2, word3, granted, line, load)
    SELECT id, 'capability', 'cap_kill', '', '', 1, 0, 0 FROM domain WHERE name = 'sshDom'"
  secpolicy load
  is_done load
  secpolicy why sshDom use cap_kill
  exits 0
}

@test "a load that is killed has installed nothing, or all of it" {
  boot
  secpolicy save before
  secpolicy display
  local before=$output after
  sed -i 's/^\(-c .*\) grant/\1 revoke/' "$policy/domains/"*Dom
  secpolicy load
  exits 0
  secpolicy display
  after=$output
  [[ $before != "$after" ]]
  local delay
  for delay in 0.002 0.004 0.006 0.008 0.01 0.012; do
    secpolicy rollback before
    timeout --signal=KILL "$delay" "$SECPOLICY" --root "$root" load >/dev/null 2>&1 || true
    secpolicy display
    [[ $output == "$before" || $output == "$after" ]]
  done
}

# What lies beside the state comes and goes with each load.
@test "a load labels the files of the host, too" {
  boot
  echo "/run/* hostConfig" >"$policy/fileLabels/run"
  local option
  for option in "" "" --all-or-nothing; do
    # shellcheck disable=SC2086
    secpolicy load $option
    exits 0
    is_done load
  done
  secpolicy label get /run/secpolicy/host.db
  answers 0 "/run/secpolicy/host.db: hostConfig"
}

@test "domains that are to go have their slots until the end of a load" {
  boot
  local number
  for number in {1..300}; do touch "$policy/domains/old$number"; done
  secpolicy load
  exits 0
  rm "$policy/domains/"old*
  for number in {1..300}; do touch "$policy/domains/new$number"; done
  secpolicy load
  exits 1
  [[ $stderr == *"all 511 domains are in use"*"; nothing was removed: 300 domains and "*" rules found in no file" ]]
  mkdir "$root/aside"
  mv "$policy/domains/"new* "$root/aside"
  secpolicy load
  exits 0
  mv "$root/aside/"* "$policy/domains"
  secpolicy load
  exits 0
  is_done load
}
