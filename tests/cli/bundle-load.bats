# Bundles that become the policy of a host, whole or not at all.

load helper

setup_file() {
  cd "$BATS_FILE_TMPDIR" || return
  make_keys_and_policy
  local serial
  for serial in 1 2 3; do
    echo "newLabel$serial" >>web/objects/base
    echo "-s @start grant" >web/domains/plugins/partner$serial
    rm -f web/domains/plugins/partner$((serial - 1))
    pack "$serial" --serial "$serial" --key key.pem
  done
  pack foreign --serial 4 --key other.pem
  SOURCE_DATE_EPOCH=1700000000 pack expired --serial 4 --key key.pem --expires 1
  SOURCE_DATE_EPOCH=4000000000 pack future --serial 4 --key key.pem
  pack same-serial --serial 3 --key key.pem --expires 9
  pack db --serial 9 --key key.pem --name db
  python3 "$BATS_TEST_DIRNAME/forge_bundle.py" 3.bundle key.pem other.pem
  cc -shared -fPIC -o break.so "$BATS_TEST_DIRNAME/break_exchange.c"
}

# pack NAME OPTION...: the bundle NAME.bundle of the policy web.
pack() { "$SECPOLICY" bundle create web -o "$1.bundle" "${@:2}" 2>/dev/null; }

setup() {
  make_root
  boot
  keys=$root/etc/secpolicy/bundle-keys
  mkdir -p "$keys"
  cp "$BATS_FILE_TMPDIR/public.pem" "$keys"
  cp "$BATS_FILE_TMPDIR"/*.bundle "$root"
}

# takes NAME OPTION...: loads NAME.bundle, and keeps $status, $output and $stderr.
takes() { secpolicy load --bundle "/$1.bundle" "${@:2}"; }

# has NAME: the policy directory holds what NAME.bundle does, and it is what is installed.
has() {
  rm -rf "$BATS_TEST_TMPDIR/wanted"
  mkdir "$BATS_TEST_TMPDIR/wanted"
  tar -xf "$BATS_FILE_TMPDIR/$1.bundle" -C "$BATS_TEST_TMPDIR/wanted" --transform 's|^policy/||'
  diff -r --exclude=tardisks "$BATS_TEST_TMPDIR/wanted" "$policy" || return
  secpolicy load --plan
  [[ $status -eq 0 && -z $output ]] || return
  secpolicy words objects
  shows "newLabel$1" || return
  [[ $(domain_id "plugin-partner$1") =~ ^[0-9]+$ ]]
}

# everything: the files and what is installed, numbers and labels included.
everything() {
  (cd "$root/etc/zorvan" && find . ! -name .secpolicy.lock -printf '%p %m %u %i %l\n' -type f -exec sha256sum {} \; | sort)
  "$SECPOLICY" --root "$root" display 2>&1 || true
}

# refused WHY: the load of a bundle was, in this one line, and has changed nothing.
refused() {
  exits 1
  [[ -z $output && $stderr == "secpolicy: load: "$1 ]] || { printf 'not: %s\nbut: %s\n' "$1" "$stderr"; return 1; }
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

remember() { everything >"$BATS_TEST_TMPDIR/before"; }

@test "three bundles in order become the policy of the host, partner domains and all" {
  cp -r "$policy" "$BATS_TEST_TMPDIR/first"
  takes 1
  exits 0
  [[ -z $output && $stderr == "secpolicy: load: done ("*")
secpolicy: load: the policy in /etc/zorvan/secpolicy comes from no bundle. It is kept in /etc/zorvan/secpolicy.previous
secpolicy: load: web, serial 1, is in place; /etc/zorvan/secpolicy.previous has what was there before" ]]
  has 1
  diff -r "$BATS_TEST_TMPDIR/first" "$policy.previous"
  takes 2
  exits 0
  has 2
  [[ $stderr != *edited* && $(jq .serial "$policy.previous/manifest.json") == 1 ]]
  takes 3
  exits 0
  has 3
  [[ $(jq .serial "$policy.previous/manifest.json") == 2 && ! -e $policy.new ]]
  [[ $(find "$policy" ! -path '*/tardisks*' -printf '%U %m\n' | sort -u) == "$(id -u) 644
$(id -u) 755" ]]
}

@test "the policy of tardisks stays what they have brought" {
  local before
  before=$(stat -c %i "$policy/tardisks/"*)
  takes 1
  takes 2
  [[ $(stat -c %i "$policy/tardisks/"*) == "$before" ]]
  secpolicy boot
  exits 0
  has 2
}

@test "the same bundle again changes nothing, and keeps the copy of before" {
  takes 1
  takes 2
  remember
  takes 2
  exits 0
  is_done load
  everything | diff "$BATS_TEST_TMPDIR/before" -
  takes 2 --plan
  [[ $stderr == "secpolicy: load: nothing would change" ]]
}

@test "an older bundle, another one with its serial, and another policy are taken only when that is wanted" {
  takes 3
  remember
  takes 2
  refused "/2.bundle: it is older than what is installed: its serial is 2, and that of what is installed 3. --allow-older takes it all the same."
  takes 2 --plan
  refused "/2.bundle: it is older than what is installed: "*
  takes same-serial
  refused "/same-serial.bundle: it has the serial of what is installed, 3, and is another. --allow-older takes it all the same."
  takes db
  refused "/db.bundle: it is db, serial 9, and web, serial 3 is installed: of two policies none is newer. --allow-older takes it all the same."
  takes 2 --allow-older
  exits 0
  has 2
  takes db --allow-older
  exits 0
  [[ $(jq -r .name "$policy/manifest.json") == db ]]
}

@test "what was changed, has expired, comes from the future or from somebody else is refused" {
  remember
  takes file
  refused "/file.bundle: domains/appDom was changed after it was signed"
  takes expired
  refused "/expired.bundle: it has expired at 2023-11-15 22:13:20 UTC, and this clock says "*
  takes future
  refused "/future.bundle: it is not yet valid: it was made at 2096-10-02 07:06:40 UTC, and this clock says "*
  takes foreign
  refused "/foreign.bundle: it says that the key "*" has signed it, which is not "*
  takes nowhere
  refused "cannot read /nowhere.bundle: No such file or directory"
}

@test "the keys are those of the host, or those that are named" {
  cp "$BATS_FILE_TMPDIR/other-public.pem" "$root"
  remember
  takes 1 --key /other-public.pem
  refused "/1.bundle: it says that the key "*" has signed it, which is not "*
  takes foreign --key /etc/secpolicy/bundle-keys/public.pem --key /other-public.pem
  exits 0
  rm -r "$root/etc/secpolicy"
  remember
  local none="there is no key to verify a bundle with. Put the public key of who signs them into /etc/secpolicy/bundle-keys, as NAME.pem, or name it: --key FILE."
  takes 1
  refused "$none"
  mkdir -p "$keys"
  cp "$BATS_FILE_TMPDIR/public.pem" "$keys/public.txt"
  takes 1
  refused "$none"
}

@test "keys that others can put in place are not believed" {
  remember
  local place
  for place in /etc/secpolicy/bundle-keys/public.pem /etc/secpolicy/bundle-keys /etc/secpolicy /etc; do
    chmod g+w "$root$place"
    takes 1
    refused "others may change $place, so no key is taken from there. It has to belong to root, and 'chmod go-w' keeps others from it."
    chmod g-w "$root$place"
  done
  if [[ $(id -u) -eq 0 ]]; then
    chown 65534 "$keys/public.pem"
    takes 1 --key /etc/secpolicy/bundle-keys/public.pem
    refused "others may change /etc/secpolicy/bundle-keys/public.pem, so no key is taken from there. "*
    chown 0 "$keys/public.pem"
  fi
  echo nothing >"$keys/public.pem"
  takes 1
  refused "/etc/secpolicy/bundle-keys/public.pem is no public Ed25519 key in PEM "*
}

@test "edits since the bundle before are told and kept" {
  takes 1
  echo mineLabel >>"$policy/objects/base"
  echo "-s @start grant" >"$policy/domains/mineDom"
  rm "$policy/domains/plugins/partner1"
  echo note >"$policy/README"
  takes 2 --plan
  says "secpolicy: load: the policy was edited since web, serial 1, was put in place: domains/mineDom, domains/plugins/partner1 and objects/base. It would be kept in /etc/zorvan/secpolicy.previous"
  cp -r "$policy" "$BATS_TEST_TMPDIR/edited"
  takes 2
  exits 0
  says "secpolicy: load: the policy was edited since web, serial 1, was put in place: domains/mineDom, domains/plugins/partner1 and objects/base. It is kept in /etc/zorvan/secpolicy.previous"
  has 2
  diff -r "$BATS_TEST_TMPDIR/edited" "$policy.previous"
  # The same bundle takes them back too.
  echo mineLabel >>"$policy/objects/base"
  takes 2
  has 2
  grep -q mineLabel "$policy.previous/objects/base"
}

@test "a plan touches nothing, and tells what the load would do" {
  takes 1
  remember
  takes 2 --plan --format json
  exits 0
  fits_schema plan
  [[ $(jq -c '[.directory, .ending, .domains.create, .domains.remove, .objects.add, .bundle.name, .bundle.serial, .bundle.edited]' <<<"$output") == \
    '["/etc/zorvan/secpolicy","done",["plugin-partner2"],["plugin-partner1"],["newLabel2"],"web",2,[]]' ]]
  local digest
  digest=$(jq -r .bundle.digest <<<"$output")
  everything | diff "$BATS_TEST_TMPDIR/before" -
  takes 2
  [[ $(sha256sum <"$policy/manifest.json") == "$digest  -" ]]
}

@test "a load that fails puts all back, and its plan says so" {
  takes 1
  takes 2
  mv "$root/tardisks" "$root/no-tardisks"
  remember
  takes 3 --plan --format json
  exits 1
  [[ $(jq -c '[.ending, .changesNothing, .errors]' <<<"$output") == '["failed",true,["Could not open tardisk dir /tardisks/"]]' ]]
  takes 3
  exits 1
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (1 error above); nothing was installed"
  everything | diff "$BATS_TEST_TMPDIR/before" -
  mv "$root/no-tardisks" "$root/tardisks"
  takes 3
  exits 0
  has 3
}

@test "a bundle with a fault is put back, and the fault is told by its name in there" {
  takes 1
  remember
  takes signed-fault --plan
  exits 1
  local planned=$stderr
  takes signed-fault
  exits 1
  [[ $planned == "$stderr
secpolicy: load: nothing would change" ]]
  says "/signed-fault.bundle: domains/appDom: 1 error"
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (2 problems above); nothing was installed"
  says "/signed-fault.bundle: fileLabels/base: 1 error"
  [[ $stderr == *"Error: /etc/zorvan/secpolicy/fileLabels/base:"* ]]
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a bundle without a domain that every host needs is put back" {
  takes 1
  remember
  takes signed-stop
  exits 3
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a bundle with the policy of a tardisk is for hosts with that tardisk" {
  cp "$BATS_FILE_TMPDIR/key.pem" "$root"
  secpolicy bundle create /etc/zorvan/secpolicy -o /own.bundle --key /key.pem
  exits 0
  takes own
  exits 0
  remember
  local file
  file=$(basename "$policy"/tardisks/*)
  echo "# newer" >>"$policy/tardisks/$file"
  remember
  takes own --allow-older
  refused "/own.bundle: its tardisks/$file is not that of this host. Only a tardisk can bring it: sign the policy without."
}

@test "status tells which bundle the files came from, and whether they are what is installed" {
  secpolicy status --format json
  [[ $(jq .bundle <<<"$output") == null ]]
  takes 1
  local key
  key=$(jq -r .key "$policy/manifest.json")
  secpolicy status
  exits 0
  shows "bundle       web, serial 1, signed by $key"
  echo mineLabel >>"$policy/objects/base"
  secpolicy load
  secpolicy status --format json
  fits_schema status
  [[ $(jq -c '[.bundle | .name, .serial, .key, .edited, .installed, .digest]' <<<"$output") == \
    "[\"web\",1,\"$key\",[\"objects/base\"],true,\"$(sha256sum <"$policy/manifest.json" | cut -d' ' -f1)\"]" ]]
  secpolicy save good
  secpolicy rollback good
  secpolicy status
  shows "bundle       web, serial 1, signed by $key, edited since: objects/base; not what is installed"
  secpolicy status --format prometheus
  shows 'secpolicy_bundle_serial 1'
  shows 'secpolicy_bundle_installed 0'
  shows 'secpolicy_bundle_edited_files 1'
  echo '{' >"$policy/manifest.json"
  secpolicy status --format json
  fits_schema status
  [[ $(jq -r .bundle.problem <<<"$output") == "/etc/zorvan/secpolicy/manifest.json does not tell which bundle is installed: its manifest is no JSON: "* ]]
  remember
  takes 2
  refused "/etc/zorvan/secpolicy/manifest.json does not tell which bundle is installed: its manifest is no JSON: "*
}

@test "a host that was never booted is told to boot, also by a plan" {
  rm -r "$root/run/secpolicy"
  for plan in "" --plan; do
    takes 1 $plan
    exits 1
    [[ $stderr == "secpolicy: load: nothing is installed below this root. Name the root that was booted "* ]]
  done
  [[ ! -e $root/run/secpolicy && ! -e $policy.new ]]
}

@test "an image that has the bundle unpacked is a host that took it" {
  local booted=$root
  root=$BATS_TEST_TMPDIR/image
  policy=$root/etc/zorvan/secpolicy
  lay_out_example "$root"
  cp -r "$booted/etc/secpolicy" "$root/etc"
  cp "$BATS_FILE_TMPDIR"/*.bundle "$root"
  rm -r "$policy"
  mkdir "$policy"
  tar -xf "$root/2.bundle" -C "$policy" --transform 's|^policy/||'
  boot
  has 2
  secpolicy status
  [[ $output == *"
bundle       web, serial 2, signed by "* && $output != *edited* && $output != *"not what is installed"* ]]
  remember
  takes 1
  refused "/1.bundle: it is older than what is installed: "*
}

# break NAME CALL AT [ERROR]: loads NAME.bundle; this call of it fails with the error, TERM or STOP comes to it
# then, or it is killed. It does what $after says in between, once its files are in place.
break_load() {
  exec env "LD_PRELOAD=$BATS_FILE_TMPDIR/break.so" "AFTER_EXCHANGE=${after-true}" "BREAK_CALL=$2" "BREAK_AT=$3" \
    ${4:+"BREAK_ERROR=$4"} "$SECPOLICY" --root "$root" load --bundle "/$1.bundle"
}

# broken CALL AT [ERROR]: the same of 3.bundle, and keeps $status, $output and $stderr.
broken() { run --separate-stderr break_load 3 "$@"; }

@test "whenever it is killed, the policy is a whole one, and the next load mends the rest" {
  takes 1
  takes 2
  local point serial previous
  for point in "syncfs 1 2" "renameat2 1 2" "renameat2 2 2" "fsync 1 3" "unlinkat 1 3"; do
    # shellcheck disable=SC2086
    set -- $point
    previous=$(jq .serial "$policy.previous/manifest.json")
    broken "$1" "$2"
    exits 137
    serial=$3
    [[ $(jq .serial "$policy/manifest.json") == "$serial" && -e $policy.new ]]
    secpolicy status --format json
    [[ $(jq -c '[.bundle.edited, .bundle.installed]' <<<"$output") == "[[],$([[ $1 == fsync ]] && echo false || echo true)]" ]]
    secpolicy load
    exits 0
    has "$serial"
    # Whatever it is called, this one puts the copy of before back first.
    takes 1
    exits 1
    [[ $(jq .serial "$policy.previous/manifest.json") == "$([[ $serial == 3 ]] && echo 2 || echo "$previous")" && ! -e $policy.new ]]
    takes 3
    exits 0
    has 3
    takes 2 --allow-older
    exits 0
    has 2
    [[ ! -e $policy.new ]]
  done
}

@test "a bundle that cannot be loaded comes to no place where a boot would find it" {
  takes 1
  remember
  local name
  for name in signed-fault signed-stop; do
    run --separate-stderr break_load "$name" renameat2 1
    [[ $status -eq 1 || $status -eq 3 ]]
    [[ $stderr == *"nothing was installed"* || $status -eq 3 ]]
    everything | diff "$BATS_TEST_TMPDIR/before" -
  done
}

@test "what goes wrong only when the files are in place takes them back, and a kill then leaves one that can be loaded" {
  takes 1
  takes 2
  remember
  local after="mv /tardisks /no-tardisks"
  broken none 1
  exits 1
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (1 error above); nothing was installed"
  mv "$root/no-tardisks" "$root/tardisks"
  everything | diff "$BATS_TEST_TMPDIR/before" -
  broken renameat2 3
  exits 137
  mv "$root/no-tardisks" "$root/tardisks"
  secpolicy status
  [[ $output == *"
bundle       web, serial 3, "*"; not what is installed"* ]]
  secpolicy boot
  exits 0
  has 3
}

@test "a load that comes while the files are taken back finds those of before" {
  takes 1
  takes 2
  local after="mv /tardisks /no-tardisks" tries
  break_load 3 renameat2 3 STOP 2>/dev/null 3>&- &
  local broken=$!
  for ((tries = 0; tries < 100; ++tries)); do
    [[ $(cut -d' ' -f3 "/proc/$broken/stat") == T ]] && break
    sleep 0.05
  done
  [[ $(jq .serial "$policy/manifest.json") == 3 ]] || { kill -KILL "$broken"; return 1; }
  mv "$root/no-tardisks" "$root/tardisks"
  "$SECPOLICY" --root "$root" load 2>/dev/null 3>&- &
  local load=$!
  # It waits, and takes a fraction of this where it does not.
  sleep 1
  kill -CONT "$broken"
  ! wait "$broken" || return 1
  wait "$load"
  has 2
  secpolicy status
  [[ $output == *"
bundle       web, serial 2, "* && $output != *"not what is installed"* ]]
}

@test "what fails behind the load is told, and so is that the bundle is in place" {
  takes 1
  rm -f "$root/run/secpolicy/labels.index"
  mkdir -p "$root/run/secpolicy/labels.index/full"
  takes 2
  exits 1
  [[ $stderr == *"installed now: "* ]]
  ends_with "secpolicy: load: web, serial 2, is in place; /etc/zorvan/secpolicy.previous has what was there before"
  secpolicy status --format json
  [[ $(jq -c '[.bundle.serial, .bundle.installed, .bundle.edited]' <<<"$output") == '[2,true,[]]' ]]
  rm -r "$root/run/secpolicy/labels.index"
  has 2
}

@test "what was put back by hand is not what is installed" {
  takes 1
  takes 2
  rm -r "$policy"
  mv "$policy.previous" "$policy"
  secpolicy status
  [[ $output == *"
bundle       web, serial 1, "*"; not what is installed"* ]]
  secpolicy load-early
  secpolicy status
  [[ $output == *"; not what is installed"* ]]
  secpolicy load
  has 1
  secpolicy status
  [[ $output != *"not what is installed"* ]]
}

@test "where the directories cannot be exchanged, nothing is changed" {
  takes 1
  takes 2
  remember
  broken flock 1 37
  refused "cannot replace /etc/zorvan/secpolicy: No locks available"
  broken syncfs 1 5
  refused "cannot write /etc/zorvan/secpolicy.new: Input/output error; nothing was installed"
  broken renameat2 1 18
  refused "cannot replace /etc/zorvan/secpolicy.previous: Invalid cross-device link; nothing was installed"
  broken renameat2 2 16
  refused "cannot replace /etc/zorvan/secpolicy: Device or resource busy; nothing was installed"
}

@test "who asks it to end waits until it is done" {
  takes 2
  broken fsync 1 TERM
  exits 143
  ends_with "secpolicy: load: web, serial 3, is in place; /etc/zorvan/secpolicy.previous has what was there before"
  has 3
  [[ ! -e $policy.new ]]
}

@test "two do not get into each other's way" {
  takes 1
  exec 9>"$root/etc/zorvan/.secpolicy.lock"
  flock -n 9
  remember
  takes 2 9>&-
  refused "another bundle is being loaded, so nothing was changed. Try it again."
  exec 9>&-
  takes 2
  exits 0
}

# as_user ARGUMENT...: runs the command below $root as an ordinary user, and keeps what it says.
as_user() {
  run --separate-stderr setpriv --reuid 65534 --regid 65534 --clear-groups \
    "$BATS_FILE_TMPDIR/bin/secpolicy" --root "$root" "$@"
}

@test "an ordinary user is told whose the directory is, and takes bundles below a root that is its own" {
  [[ $(id -u) -eq 0 ]] || skip "only root can become another user"
  chmod 755 "$BATS_RUN_TMPDIR" "$BATS_FILE_TMPDIR" "$BATS_TEST_TMPDIR"
  mkdir -p "$BATS_FILE_TMPDIR/bin" "$BATS_FILE_TMPDIR/lib"
  cp "$SECPOLICY" "$BATS_FILE_TMPDIR/bin"
  cp -P "$BUILD_DIR"/lib/libsecpolicy{-signature,host-archive}.so.* "$BATS_FILE_TMPDIR/lib"
  remember
  as_user load --bundle /1.bundle
  refused "cannot replace /etc/zorvan/secpolicy: Permission denied. This root is another user's: run it as that user, or as root."
  local keys=$root/etc/secpolicy
  root=$BATS_TEST_TMPDIR/own
  lay_out_example "$root"
  cp -r "$keys" "$root/etc"
  cp "$BATS_FILE_TMPDIR/1.bundle" "$root"
  chown -R 65534:65534 "$root"
  as_user boot
  exits 0
  as_user load --bundle /1.bundle
  exits 0
  [[ $(stat -c %u "$root/etc/zorvan/secpolicy/manifest.json") == 65534 ]]
}

@test "a bundle goes with no directory, and its options with nothing else" {
  secpolicy load --bundle /1.bundle /new
  wrong_usage load "DIR excludes --bundle"
  secpolicy load --key /key.pem
  wrong_usage load "--key requires --bundle"
  secpolicy load --allow-older
  wrong_usage load "--allow-older requires --bundle"
}
