# secpolicy boot: what it unpacks, replaces and refuses, and what is left when it fails.

load helper

@test "boot of the example ends well" {
  secpolicy boot
  exits 0
  [[ -z $output ]]
  is_done boot
}

@test "boot unpacks the tardisks into the root" {
  boot
  [[ -x $root/usr/sbin/sshd && -f $root/opt/monitor/etc/agent.conf ]]
}

@test "boot installs the early and the full policy" {
  boot
  [[ -n $(domain_id bootDom) && -n $(domain_id sshDom) && -n $(domain_id plugin-cache) ]]
}

@test "boot again starts from an empty state" {
  boot
  local first
  first=$("$SECPOLICY" --root "$root" display 2>/dev/null)
  rm "$policy/domains/plugins/cache"
  boot
  [[ -z $(domain_id plugin-cache) ]]
  "$SOURCE/scripts/pack-example" "$root"
  boot
  [[ $("$SECPOLICY" --root "$root" display 2>/dev/null) == "$first" ]]
}

@test "files carry the labels that display shows" {
  boot
  local id hex attribute
  id=$("$SECPOLICY" --root "$root" display 2>/dev/null | sed -n 's/^sshProgram (\([0-9]*\))$/\1/p')
  [[ -n $id ]]
  hex=$(printf '%02x%02x%02x%02x' $((id & 255)) $((id >> 8 & 255)) $((id >> 16 & 255)) $((id >> 24)))
  for attribute in security.bpf.zorvan user.zorvan.security; do
    if run getfattr --absolute-names --name "$attribute" --encoding hex "$root/usr/sbin/sshd"; then
      [[ $output == *"$attribute=0x$hex"* ]] && return 0
    fi
  done
  return 1
}

@test "boot without tardisks changes nothing and says what to do" {
  rm -r "$root/tardisks"
  secpolicy boot
  exits 1
  [[ $stderr == "secpolicy: boot: there is no directory /tardisks/ below this root, so nothing was changed. Put the tardisks there, or make it empty for a host without any." ]]
  rm -r "$root/etc/zorvan/secpolicy"
  secpolicy boot
  exits 1
  [[ $stderr == "secpolicy: boot: there is no directory /tardisks/ below this root, so nothing was changed. Put the tardisks there, or name the root that they are in (--root DIR). 'secpolicy --root $root init' writes a first policy, for a host without any." ]]
  [[ ! -e $root/run/secpolicy ]]
}

@test "boot stops at a tardisk that is no archive and names it" {
  echo "this is no archive" >"$root/tardisks/aaa.tgz"
  secpolicy boot
  exits 1
  ends_with "secpolicy: boot: Unable to unpack tardisk aaa.tgz: Unrecognized archive format"
}

@test "boot without a policy is stopped and says where to put one" {
  rm -r "$root/etc/zorvan/secpolicy"
  secpolicy boot
  exits 3
  says "Error: Failed to fetch domainID for global VM Domain"
  ends_with "secpolicy: boot: stopped: there are no domains globalVMDom, ioFilterDom, appDom and daemonFrameworkDom, so nothing was installed. Put policy files of these names into /etc/zorvan/secpolicy/domains and run it again."
}

@test "boot of a root without an early policy ends well and tells it under -v" {
  rm -r "$policy/early"
  secpolicy -v boot
  exits 0
  says "No early policy: there is no directory /etc/zorvan/secpolicy/early"
  ends_done boot
  [[ -n $(domain_id sshDom) ]]
}

@test "boot of a root whose early policy has no domains fails" {
  rm -r "$policy/early/domains"
  secpolicy boot
  exits 1
  diff - <(sed '/^installed now: /s/[0-9]\+/N/g' <<<"$stderr") <<END
Error: Unable to open policy directory /etc/zorvan/secpolicy/early/domains
$policy/early/domains: 1 error
'secpolicy --root $root check /etc/zorvan/secpolicy' shows the lines, and what may be meant
installed now: N domains, N rules, N objects
secpolicy: boot: failed (1 problem above)
END
}

@test "--timing prints each phase of a boot to standard output" {
  secpolicy boot --timing
  exits 0
  is_done boot
  local plans=
  # Whoever owns the state needs none.
  [[ $(id -u) -ne 0 ]] || plans=$'\nplans'
  [[ $(sed 's/  *[0-9.]* s$//' <<<"$output") == "unpacking
first labels
early objects
early domains
early file labels
objects
domains
partner domains
tardisks
file labels
label index$plans
all" ]]
}

@test "a file of the early policy that fails is told from one of the full policy" {
  echo "-s no_such_call grant" >>"$policy/early/domains/hostDom"
  echo "-s no_such_call grant" >>"$policy/domains/hostDom"
  secpolicy boot
  exits 1
  says "$policy/early/domains/hostDom: 1 error"
  says "$policy/domains/hostDom: 1 error"
}

# ---- What a boot does to files

# add_tardisk NAME DIR: packs DIR as the tardisk NAME.
add_tardisk() {
  tar --directory "$2" --create --owner=0 --group=0 --mode=go-w --gzip --file "$root/tardisks/$1" .
}

@test "boot refuses a tardisk that was cut off, and leaves what was there" {
  boot
  local before
  before=$("$SECPOLICY" --root "$root" display 2>/dev/null)
  rm "$root/usr/sbin/sshd"
  gzip -dc "$root/tardisks/monitor.tgz" | head -c -4096 >"$root/tardisks/monitor.tar"
  rm "$root/tardisks/monitor.tgz"
  secpolicy boot
  exits 1
  ends_with "secpolicy: boot: Unable to unpack tardisk monitor.tar: It lacks the two blocks of zeros at its end, so it was cut off"
  [[ ! -e $root/usr/sbin/sshd ]]
  [[ $("$SECPOLICY" --root "$root" display 2>/dev/null | grep -v 'tardisks/') == "$(grep -v 'tardisks/' <<<"$before")" ]]
}

@test "only a tardisk that is named brings the policy" {
  mkdir -p "$BATS_TEST_TMPDIR/addon/etc/zorvan/secpolicy/domains"
  echo "-c cap_sys_module grant" >"$BATS_TEST_TMPDIR/addon/etc/zorvan/secpolicy/domains/addonDom"
  add_tardisk addon.tgz "$BATS_TEST_TMPDIR/addon"
  secpolicy boot
  exits 1
  ends_with "secpolicy: boot: Unable to unpack tardisk addon.tgz: ./etc/zorvan/secpolicy/domains/: It belongs to the policy, which a tardisk brings only when it is named by --policy-from"
  local refusal=$stderr
  secpolicy boot --policy-from base.tgz
  exits 1
  [[ $stderr == "$refusal" ]]
  secpolicy boot --policy-from base.tgz --policy-from addon.tgz
  exits 0
  is_done boot
  [[ -n $(domain_id addonDom) ]]
}

@test "boot --policy-from needs a tardisk of that name" {
  secpolicy boot --policy-from addon.tgz
  exits 1
  says "secpolicy: boot: There is no tardisk addon.tgz in /tardisks"
  [[ ! -e $root/usr/sbin/sshd ]]
}

@test "boot names the edited files that it has replaced" {
  boot
  echo "edited" >>"$root/etc/services.conf"
  sed -i 's/./x/' "$root/opt/monitor/etc/agent.conf" # a new file under the old name
  touch "$root/usr/bin/supervise"                    # with what the tardisk has in it
  secpolicy boot
  exits 0
  says "edited files that were replaced (2):"
  says "  /etc/services.conf"
  says "  /opt/monitor/etc/agent.conf"
  ends_done boot
  secpolicy boot
  exits 0
  is_done boot
}

@test "boot compares with the tardisk where no record is left" {
  boot
  echo "edited" >>"$root/etc/services.conf"
  rm -r "$root/run/secpolicy"
  secpolicy boot
  exits 0
  [[ $stderr == "edited files that were replaced (1):
  /etc/services.conf
"* ]]
}

@test "a new version of a tardisk replaces what nobody has edited without a word" {
  boot
  mkdir "$BATS_TEST_TMPDIR/base"
  tar --directory "$BATS_TEST_TMPDIR/base" --extract --file "$root/tardisks/base.tgz"
  echo "new" >>"$BATS_TEST_TMPDIR/base/etc/services.conf"
  add_tardisk base.tgz "$BATS_TEST_TMPDIR/base"
  secpolicy boot
  exits 0
  is_done boot
  [[ $(tail -n 1 "$root/etc/services.conf") == new ]]
}

@test "boot names ten edited files, and all with -v" {
  boot
  mkdir -p "$BATS_TEST_TMPDIR/many/srv"
  local index
  for index in {10..21}; do echo "$index" >"$BATS_TEST_TMPDIR/many/srv/$index"; done
  add_tardisk many.tgz "$BATS_TEST_TMPDIR/many"
  boot
  for index in {10..21}; do echo "edited" >>"$root/srv/$index"; done
  secpolicy boot --plan
  exits 0
  shows "edited files to replace (12):"
  shows "  ... and 2 more; -v shows all"
  secpolicy -v boot
  exits 0
  says "  /srv/21"
  for index in {10..21}; do echo "edited" >>"$root/srv/$index"; done
  secpolicy boot
  exits 0
  says "edited files that were replaced (12):"
  says "  /srv/19"
  says "  ... and 2 more; -v shows all"
}

# What is in the root, but for what a reader of a database leaves beside it.
describe_root() {
  (cd "$root" && find . -path ./run/secpolicy -prune -o -printf '%p %y %m %i %T@ %C@\n' | LC_ALL=C sort)
}

@test "boot --plan shows what a boot would do, and changes nothing" {
  local before
  before=$(describe_root)
  secpolicy boot --plan
  exits 0
  [[ $(describe_root) == "$before" && ! -e $root/run/secpolicy ]]
  shows "  /etc/services.conf (base.tgz)"
  shows "files to unpack again as they are: 0"
  ends_with "secpolicy: boot: this was a plan: nothing was changed"
  [[ $output != *"to replace"* ]]
  boot
  echo "edited" >>"$root/etc/services.conf"
  before=$(describe_root)
  secpolicy boot --plan
  exits 0
  [[ $(describe_root) == "$before" ]]
  [[ $output == "edited files to replace (1):
  /etc/services.conf (base.tgz)
files to unpack again as they are: "[0-9]*"
files to get their first label: "[0-9]* ]]
}

@test "boot --plan names the directories that an archive needs and does not hold" {
  mkdir -p "$root/srv" "$BATS_TEST_TMPDIR/late/srv/new/deep"
  touch "$BATS_TEST_TMPDIR/late/srv/new/deep/file"
  rm "$root/tardisks/"*
  tar --directory "$BATS_TEST_TMPDIR/late" --create --file "$root/tardisks/late.tar" srv/new/deep/file
  secpolicy boot --plan
  exits 0
  [[ $output == "files to add (3):
  /srv/new (late.tar)
  /srv/new/deep (late.tar)
  /srv/new/deep/file (late.tar)
"* ]]
}

@test "boot --plan counts the files that get a label" {
  secpolicy boot --plan --format json
  exits 0
  fits_schema boot-plan
  local planned
  planned=$(jq .firstLabels <<<"$output")
  secpolicy boot --plan
  shows "files to get their first label: $planned"
  boot
  local labelled
  labelled=$(find "$root" -path "$root/run" -prune -o -print0 |
    xargs -0 getfattr --absolute-names --no-dereference --match '^(user\.zorvan\.security|security\.bpf\.zorvan)$' 2>/dev/null |
    grep -c '^# file:')
  [[ $planned -eq $labelled ]]
}

@test "boot --plan --format json tells edited files from others" {
  boot
  mkdir "$BATS_TEST_TMPDIR/base"
  tar --directory "$BATS_TEST_TMPDIR/base" --extract --file "$root/tardisks/base.tgz"
  echo "new" >>"$BATS_TEST_TMPDIR/base/etc/services.conf"
  echo "new" >>"$BATS_TEST_TMPDIR/base/etc/ssh/host_key"
  ln -s services.conf "$BATS_TEST_TMPDIR/base/etc/link"
  add_tardisk base.tgz "$BATS_TEST_TMPDIR/base"
  echo "edited" >>"$root/etc/ssh/host_key"
  secpolicy boot --plan --format json
  exits 0
  fits_schema boot-plan
  jq -e '.tardisks == ["base.tgz", "monitor.tgz"]
    and .add == [{path: "/etc/link", tardisk: "base.tgz", type: "link"}]
    and .replace == [
      {path: "/etc/services.conf", tardisk: "base.tgz", type: "file", edited: false},
      {path: "/etc/ssh/host_key", tardisk: "base.tgz", type: "file", edited: true}]' <<<"$output"
}

@test "boot --plan names what a boot would refuse" {
  echo "this is no archive" >"$root/tardisks/aaa.tgz"
  secpolicy boot --plan
  exits 1
  [[ -z $output && $stderr == "secpolicy: boot: Unable to unpack tardisk aaa.tgz: Unrecognized archive format" ]]
}
