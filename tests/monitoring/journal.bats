# What the journal is told of loads, levels, saved states, drift and permissive domains: a field that is
# missing or broken by what is in it, an entry without explanation, and entries where nobody has asked.

load ../cli/helper

setup() {
  make_root
  boot
  entries=$BATS_TEST_TMPDIR/entries
  "$BATS_TEST_DIRNAME/listen" "$root/run/systemd/journal/socket" "$entries" 3>&- &
  listener=$!
  until_true '[[ -S $root/run/systemd/journal/socket && -e $entries ]]'
}

teardown() { kill "$listener" 2>/dev/null || true; }

# as_unit ARGUMENT...: runs the command with its errors in the journal, as units are started.
as_unit() {
  local errors=$BATS_TEST_TMPDIR/errors
  : >>"$errors"
  JOURNAL_STREAM=$(stat --format %d:%i "$errors") timeout 60 "$SECPOLICY" --root "$root" "$@" 2>>"$errors" || true
}

# told FILTER: an entry that has come is as the filter of jq says.
told() {
  until_true "jq --slurp --exit-status 'any($1)' $entries >/dev/null" && return
  cat "$entries"
  return 1
}

# is_told NAME FILTER: the entry is there, and explained under the subject NAME.
is_told() {
  told "$2" || return
  local id
  id=$(jq --raw-output --slurp "map(select($2))[0].MESSAGE_ID" "$entries")
  grep -A 1 -x -e "-- $id" "$SOURCE/packaging/systemd/secpolicy.catalog" | grep -qx "Subject: $1"
}

@test "a load that ends well is told" {
  as_unit load
  is_told "The security policy was installed" '.MESSAGE == "load from /etc/zorvan/secpolicy: done" and
    .PRIORITY == "6" and .SYSLOG_IDENTIFIER == "secpolicy" and .SECPOLICY_VERB == "load" and
    .SECPOLICY_DIRECTORY == "/etc/zorvan/secpolicy" and .SECPOLICY_PROBLEMS == "0"'
  as_unit boot
  told '.SECPOLICY_VERB == "boot" and .PRIORITY == "6"'
}

@test "the problems of a load are told with file, line and domain, and how it ended" {
  echo "-s reed grant" >>"$policy/domains/plugins/cache"
  echo "/etc/services.conf nosuch" >>"$policy/fileLabels/base"
  as_unit load
  is_told "A line of the security policy cannot be used" ".SECPOLICY_DOMAIN == \"plugin-cache\" and .PRIORITY == \"3\" and
    .SECPOLICY_FILE == \"/etc/zorvan/secpolicy/domains/plugins/cache\" and
    .SECPOLICY_LINE == \"$(wc -l <"$policy/domains/plugins/cache")\" and (.MESSAGE | contains(\"reed\"))"
  told '.SECPOLICY_FILE == "/etc/zorvan/secpolicy/fileLabels/base" and (has("SECPOLICY_DOMAIN") | not)'
  is_told "The security policy has problems" '.SECPOLICY_VERB == "load" and .SECPOLICY_PROBLEMS == "2" and
    .MESSAGE == "load from /etc/zorvan/secpolicy: There were some problems encountered in setting the policy"'
}

@test "a load that is stopped is told" {
  rm "$policy/domains/ioFilterDom"
  find "$policy/domains" -type f -exec sed -i /ioFilterDom/d {} +
  as_unit boot
  is_told "The installation of the security policy was stopped" '.SECPOLICY_VERB == "boot" and .PRIORITY == "2" and
    (.MESSAGE | startswith("boot from /etc/zorvan/secpolicy: stopped: there is no domain ioFilterDom"))'
}

@test "other levels, a rollback and drift are told" {
  as_unit save good
  as_unit settings enforcement sshDom permissive
  [[ $(as_unit restore) == "sshDom: enforcing -> permissive" ]]
  is_told "A security domain has another enforcement level" '.SECPOLICY_DOMAIN == "sshDom" and
    .SECPOLICY_LEVEL_BEFORE == "enforcing" and .SECPOLICY_LEVEL == "permissive"'
  as_unit drift >/dev/null
  is_told "The host has drifted from its security policy" '.SECPOLICY_FILES == "0" and .SECPOLICY_DOMAINS == "1" and
    .SECPOLICY_OBJECTS == "0" and .PRIORITY == "4"'
  as_unit rollback good
  is_told "A saved security policy was put back" '.SECPOLICY_SAVED_STATE == "good"'
}

@test "what a permissive domain would be refused is told" {
  needs_landlock
  as_unit settings enforcement monitorDom permissive
  as_unit restore >/dev/null
  as_unit run monitorDom -- /bin/cat /var/lib/vms/demo/disk >/dev/null
  is_told "A permissive security domain would be refused something" '.SECPOLICY_DOMAIN == "monitorDom" and
    .SECPOLICY_QUESTION == "read /var/lib/vms/demo/disk"'
}

@test "a value with the end of a line stays one value" {
  echo "-x" >"$policy/domains/"$'two\nlines'
  as_unit load
  told '.SECPOLICY_FILE == "/etc/zorvan/secpolicy/domains/two\nlines" and (.MESSAGE | contains("two\nlines:1: ")) and
    .SECPOLICY_VERB == "load" and .SECPOLICY_DOMAIN == "two\nlines"'
}

@test "nothing is told but of a run whose errors go to the journal, and no plan of a load" {
  JOURNAL_STREAM=1:2 "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy load
  as_unit load --plan >/dev/null
  as_unit rollback nosuch
  # Only this comes.
  as_unit save good
  as_unit rollback good
  told '.SECPOLICY_SAVED_STATE == "good"'
  [[ $(wc -l <"$entries") -eq 1 ]]
}

@test "a journal that takes nothing keeps nobody waiting" {
  kill -STOP "$listener"
  local number
  for number in {1..700}; do echo "-x" >"$policy/domains/bad$number"; done
  as_unit load
  [[ $(tail -n 1 "$BATS_TEST_TMPDIR/errors") == "secpolicy: load: "* ]]
  kill -CONT "$listener"
}

@test "each kind of entry is explained, and the catalogue is taken" {
  local ids
  mapfile -t ids < <(grep -oE '"[0-9a-f]{32}"' "$SOURCE/tools/secpolicy/monitor/journal.cpp" | tr -d '"' | sort)
  [[ ${#ids[@]} -eq 10 ]]
  diff <(printf '%s\n' "${ids[@]}") <(sed -n 's/^-- //p' "$SOURCE/packaging/systemd/secpolicy.catalog" | sort)
  command -v journalctl >/dev/null || skip "journalctl, which takes catalogues, is not installed"
  local host=$BATS_TEST_TMPDIR/host
  mkdir -p "$host"/{usr,var}/lib/systemd/catalog
  cp "$SOURCE/packaging/systemd/secpolicy.catalog" "$host/usr/lib/systemd/catalog"
  journalctl --update-catalog --root="$host"
  diff <(printf '%s\n' "${ids[@]}") <(journalctl --list-catalog --root="$host" | grep -oE '^[0-9a-f]{32}' | sort)
}
