# secpolicy check: each kind of problem is told with its place, a mark and a hint, as a load tells it,
# and looking changes nothing.

load helper

# Every test but those of the real root checks the booted example, changed in one way.
setup() {
  make_root
  boot
  inside=/etc/zorvan/secpolicy
  shown=$root$inside
}

# add FILE LINE...: appends the lines to the policy file, and keeps the number of the last one.
add() {
  local file=$policy/$1
  shift
  printf '%s\n' "$@" >>"$file"
  number=$(wc -l <"$file")
}

# finds LINE: the check ended with an error, and showed this line.
finds() {
  secpolicy check
  exits 1
  shows "$1"
}

# warns LINE: the check found this, and nothing that is an error.
warns() {
  secpolicy check
  exits 0
  shows "$1"
}

@test "the example has no problems, booted or not yet installed" {
  secpolicy check --werror
  exits 0
  [[ -z $output && $stderr == "secpolicy: check: no problems" ]]
  secpolicy check --werror --fresh
  exits 0
  [[ $stderr == "secpolicy: check: no problems" ]]
}

@test "check changes nothing, logs nothing and leaves nothing behind" {
  add domains/appDom "-s no_such_call grant"
  add objects/base "newObject"
  (cd "$root" && find . -type f -exec sha256sum {} + | sort) >"$BATS_TEST_TMPDIR/before"
  (cd "$root" && find . | sort) >>"$BATS_TEST_TMPDIR/before"
  secpolicy check
  exits 1
  (cd "$root" && find . -type f -exec sha256sum {} + | sort) >"$BATS_TEST_TMPDIR/after"
  (cd "$root" && find . | sort) >>"$BATS_TEST_TMPDIR/after"
  cmp "$BATS_TEST_TMPDIR/before" "$BATS_TEST_TMPDIR/after"
}

@test "a problem is shown with its line, a mark and a hint" {
  printf '%s\n' '-s read grnt' '-s @start grant' >"$policy/domains/appDom"
  secpolicy check
  exits 1
  [[ $output == *"$shown/domains/appDom:1:9: error: invalid keyword grnt [grant-word]
    -s read grnt
            ^~~~
    hint: did you mean 'grant'?"* ]]
  [[ $stderr == "secpolicy: check: 1 error, 0 warnings" ]]
}

@test "every bad line of every file is told, in the order of a load" {
  printf '%s\n' '-x' '-s read grant' '-s reed grant' >"$policy/domains/appDom"
  printf '%s\n' 'a b' 'hostProgram' 'c d' >"$policy/objects/zz"
  printf '%s\n' '/etc' '/etc/*x hostConfig' '/etc nolabel' >"$policy/fileLabels/zz"
  secpolicy check --disable duplicate-object
  exits 1
  [[ $(grep -o "^[^ ]*: error:.*\[.*\]" <<<"$output" | sed "s|^$shown/\([^:]*:[0-9]*\):.*\[|\1 [|") == \
    "objects/zz:1 [argument-count]
objects/zz:3 [argument-count]
domains/appDom:1 [rule-type]
domains/appDom:3 [unknown-word]
fileLabels/zz:1 [argument-count]
fileLabels/zz:2 [tree-marker]
fileLabels/zz:3 [unknown-word]" ]]
}

@test "the messages are those of a load" {
  add domains/appDom "-c cap_net_ray grant"
  secpolicy load
  local message=${stderr#*"domain: appDom: $number : "}
  finds "$shown/domains/appDom:$number:4: error: ${message%%$'\n'*} [unknown-word]"
  shows "    hint: did you mean 'cap_net_raw'?"
}

@test "argument-count" {
  add domains/appDom "-s read"
  finds "$shown/domains/appDom:$number:1: error: incorrect number of arguments for this rule type [argument-count]"
  shows "    hint: write: -s SYSCALL grant"
}

@test "bad-name" {
  local name
  name=$(printf 'x%.0s' {1..64})
  touch "$policy/domains/$name"
  finds "$shown/domains/$name: error: domain name '$name' is too long: 64 bytes, at most 63 [bad-name]"
}

@test "bad-name, where there is no room for more domains" {
  (cd "$policy/domains" && seq -f 'x%04.0f' 3000 | xargs touch)
  secpolicy check
  exits 1
  [[ $(grep -c '\[bad-name\]' <<<"$output") -eq 1 ]]
  shows "$shown/domains/x0503: error: cannot create domain 'x0503': all 511 domains are in use [bad-name]"
  shows "    hint: neither is there room for 2497 files after this one"
}

@test "bad-name, of an object" {
  local name
  name=$(printf 'x%.0s' {1..256})
  add objects/base "$name"
  finds "$shown/objects/base:$number:1: error: label '$name' is too long: 256 bytes, at most 255 [bad-name]"
}

@test "bad-permissions" {
  add domains/appDom "-r /etc rr"
  finds "$shown/domains/appDom:$number:9: error: Read access already specified. [bad-permissions]"
}

@test "missing-domain" {
  rm "$policy/domains/ioFilterDom"
  secpolicy check --fresh
  exits 1
  shows "$shown/domains: error: there is no domain 'ioFilterDom', which every host needs: a load stops without it, before tardisks and file labels [missing-domain]"
  shows "    hint: an empty file $shown/domains/ioFilterDom defines it"
}

@test "parameter-conflict, of every pair" {
  add domains/appDom "-p set_uid 1 10 grant" "-p set_uid 5 revoke" "-p set_uid 20 grant" \
    "-p set_uid 7 revoke" "-p set_gid nobody grant"
  finds "$shown/domains/appDom:$((number - 3)):1: error: parameter check 'set_uid': grant of 1 to 10 in line $((number - 4)) conflicts with revoke of 5 in line $((number - 3)) [parameter-conflict]"
  shows "$shown/domains/appDom:$((number - 1)):1: error: parameter check 'set_uid': grant of 1 to 10 in line $((number - 4)) conflicts with revoke of 7 in line $((number - 1)) [parameter-conflict]"
  shows "$shown/domains/appDom:$number:12: error: parameter 'nobody' is not an unsigned number [parameter-conflict]"
  [[ $stderr == "secpolicy: check: 3 errors, 0 warnings" ]]
}

@test "rule-type" {
  add domains/appDom "-S read grant"
  finds "$shown/domains/appDom:$number:1: error: invalid policy rule type (-S) [rule-type]"
}

@test "second-rule, and rules of other kinds, of a tardisk policy" {
  add tardisks/monitor "-E hostProgram appDom" "-F x"
  finds "$shown/tardisks/monitor:$((number - 1)):1: error: Only one rule of this type is allowed [second-rule]"
  shows "$shown/tardisks/monitor:$number:1: error: invalid tardisk policy rule type (-F) [rule-type]"
}

@test "tree-marker" {
  add fileLabels/base "/etc/*.conf hostConfig"
  finds "$shown/fileLabels/base:$number:1: error: Unrecognized format for file/dir specification [tree-marker]"
}

@test "unknown-domain" {
  add domains/appDom "-d hostProgram sshDon exec grant"
  finds "$shown/domains/appDom:$number:16: error: Failed to fetch domain id for: sshDon [unknown-domain]"
  shows "    hint: did you mean 'sshDom'?"
}

@test "unknown-word, for a label that is a domain, where only an object will do" {
  add fileLabels/base "/etc/services.conf sshDom"
  secpolicy check
  exits 1
  shows "$shown/fileLabels/base:$number:20: error: Invalid label (sshDom) for file /etc/services.conf [unknown-word]"
}

@test "unreadable" {
  rm -r "$policy/fileLabels"
  finds "$shown/fileLabels: error: Unable to open policy directory $inside/fileLabels [unreadable]"
}

@test "unreadable, of a file in place of a directory, and of a directory that may not be opened" {
  rm -r "$policy/fileLabels"
  touch "$policy/fileLabels"
  finds "$shown/fileLabels: error: Unable to open policy directory $inside/fileLabels [unreadable]"
  chmod 000 "$policy/objects"
  # With all its rights the superuser may open any directory.
  local bound=()
  [[ $EUID -ne 0 ]] || bound=(setpriv "--bounding-set=-dac_override,-dac_read_search" --inh-caps=-all)
  run --separate-stderr "${bound[@]}" "$SECPOLICY" --root "$root" check
  exits 1
  shows "$shown/objects: error: Unable to open policy directory $inside/objects [unreadable]"
}

@test "carriage-return" {
  add domains/appDom $'-s bind grant\r'
  finds "$shown/domains/appDom:$number:14: warning: this carriage return is part of a word: lines end with a line feed alone [carriage-return]"
  shows "    -s bind grant^M"
  shows "                 ^^"
}

@test "contradicting-rule" {
  add domains/appDom "-s bind grant" "-s bind revoke"
  warns "$shown/domains/appDom:$number:1: warning: this rule replaces the one in line $((number - 1)), which says otherwise [contradicting-rule]"
}

@test "duplicate-object" {
  local first
  first=$(grep -n '^sshKey\b' "$policy/objects/base" | cut -d: -f1)
  add objects/base "sshKey"
  warns "$shown/objects/base:$number:1: warning: 'sshKey' is declared in line $first of $inside/objects/base already [duplicate-object]"
}

@test "duplicate-rule, the letters of paths in any order" {
  add domains/appDom "-r /etc rw" "-r /etc wr"
  warns "$shown/domains/appDom:$number:1: warning: this rule is in line $((number - 1)) already [duplicate-rule]"
}

# early NAME: the domain is installed by the early policy, and no file defines it any more.
early() {
  mkdir -p "$policy/early/domains"
  touch "$policy/early/domains/$1"
  "$SECPOLICY" --root "$root" boot 2>"$BATS_TEST_TMPDIR/boot.err"
  rm "$policy/early/domains/$1" "$policy/domains/$1"
}

@test "installed-only" {
  early globalVMDom
  secpolicy check
  exits 0
  shows "$shown/domains: warning: no file defines the domain 'globalVMDom', which every host needs; it is installed since an earlier load, and the next boot will lack it [installed-only]"
}

@test "a domain that only an earlier load has defined counts no more, as in a load" {
  rm "$policy/domains/globalVMDom"
  secpolicy load
  exits 3
  finds "$shown/domains: error: there is no domain 'globalVMDom', which every host needs: a load stops without it, before tardisks and file labels [missing-domain]"
}

@test "long-line" {
  printf -- '-s bind grant %1100s\n-x\n' '' >>"$policy/domains/appDom"
  number=$(($(wc -l <"$policy/domains/appDom") - 1))
  warns "$shown/domains/appDom:$number:1024: warning: this line has more than 1023 characters: the rest of it and all lines below it are not read [long-line]"
}

@test "missing-path, of rules and of labels" {
  add domains/appDom "-r /no/such r"
  warns "$shown/domains/appDom:$number:4: warning: there is nothing at /no/such under this root [missing-path]"
  add fileLabels/base "/no/such/* hostConfig"
  secpolicy check --fresh
  exits 0
  shows "$shown/fileLabels/base:$number:1: warning: there is nothing at /no/such under this root [missing-path]"
}

# cannot_label LINE PATH: a load fails to label PATH for this line, and check says so in its words.
cannot_label() {
  add fileLabels/base "$1"
  secpolicy load
  exits 1
  local message=${stderr#*"fileLabels/base:$number : "}
  finds "$shown/fileLabels/base:$number:1: error: ${message%%$'\n'*} [cannot-label]"
  [[ $output == *"for file $2: "* || $output == *"directory $2 "* ]]
}

@test "cannot-label, of a path that is not there" {
  cannot_label "/no/such hostConfig" /no/such
  shows "    hint: there is nothing at /no/such under this root"
}

@test "cannot-label, of a name that is too long" {
  local name
  name=$(printf 'x%.0s' {1..256})
  cannot_label "/$name hostConfig" "/$name"
}

@test "cannot-label, of a tree that is too deep" {
  python3 -c '
import os, sys
os.chdir(sys.argv[1])
for _ in range(2100):
    os.mkdir("d")
    os.chdir("d")' "$root/etc"
  "$SECPOLICY" --root "$root" boot 2>/dev/null || true
  add fileLabels/base "/etc/* hostConfig"
  secpolicy load
  exits 1
  secpolicy check
  exits 1
  [[ $output == *": error: Unable to "*" [cannot-label]"* ]]
}

@test "cannot-label, of a tree that is none" {
  cannot_label "/etc/services.conf/* hostConfig" /etc/services.conf
  shows "    hint: /* stands behind something that is no directory"
}

@test "relative-path, of rules and of labels" {
  add domains/appDom "-r etc r"
  warns "$shown/domains/appDom:$number:4: warning: this path is looked up from where a load is started [relative-path]"
  add fileLabels/base "etc/services.conf hostConfig"
  secpolicy check
  shows "$shown/fileLabels/base:$number:1: warning: this path is looked up from where a load is started [relative-path]"
}

@test "byte-order-mark" {
  sed -i '1s/^/\xef\xbb\xbf/' "$policy/domains/appDom"
  finds "$shown/domains/appDom:1:1: warning: a byte order mark is part of the first word [byte-order-mark]"
  shows "$shown/domains/appDom:1:1: error: invalid policy rule type (<U+FEFF>) [rule-type]"
}

@test "editor-copy, of every kind" {
  local name
  for name in appDom~ .appDom.swp '#appDom#' appDom.dpkg-old appDom.rpmsave appDom.bak; do
    cp "$policy/domains/appDom" "$policy/domains/$name"
    warns "$shown/domains/$name: warning: this looks like a copy that was left behind: a load reads it as policy [editor-copy]"
    rm "$policy/domains/$name"
  done
  cp "$policy/domains/appDom" "$policy/domains/swp"
  secpolicy check
  [[ $output != *editor-copy* ]]
}

@test "untyped-entries" {
  [[ ${SANITIZER:-} != *address* ]] || skip "the sanitizer wants to be loaded first"
  # A file system without the types of entries is rare: this is what a listing on it looks like.
  "${CC:-cc}" -shared -fPIC -o "$BATS_TEST_TMPDIR/untyped.so" -x c - -ldl <<'END'
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
static void *next(const char *name) { return dlsym(RTLD_NEXT, name); }
struct dirent *readdir(DIR *directory) {
  struct dirent *entry = ((struct dirent * (*)(DIR *)) next("readdir"))(directory);
  if (entry) entry->d_type = DT_UNKNOWN;
  return entry;
}
struct dirent64 *readdir64(DIR *directory) {
  struct dirent64 *entry = ((struct dirent64 * (*)(DIR *)) next("readdir64"))(directory);
  if (entry) entry->d_type = DT_UNKNOWN;
  return entry;
}
END
  run --separate-stderr env LD_PRELOAD="$BATS_TEST_TMPDIR/untyped.so" "$SECPOLICY" --root "$root" check
  shows "$shown/objects: warning: this file system does not tell which of its entries are files: to a load the directory looks empty [untyped-entries]"
  shows "$shown/domains: warning: this file system does not tell which of its entries are files: to a load the directory looks empty [untyped-entries]"
}

@test "no-tardisk" {
  echo "-E monitorImage monitorDom" >"$policy/tardisks/late"
  finds "$shown/tardisks/late: error: No backing tardisk for policy file $inside/tardisks/late [no-tardisk]"
  secpolicy load
  exits 1
  says "Error: No backing tardisk for policy file $inside/tardisks/late"
}

@test "tardisk-entry, among the policies and among the tardisks" {
  mkdir "$policy/tardisks/inner" "$root/tardisks/inner"
  finds "$shown/tardisks/inner: error: this is a directory: a load skips it [tardisk-entry]"
  shows "$root/tardisks/inner: error: this is a directory: a load skips it [tardisk-entry]"
  secpolicy load
  exits 1
  says "Error: Skipping directory inner"
}

@test "where tardisk policies come from counts in the policy root only" {
  cp -r "$policy" "$root/copy"
  echo "-E monitorImage monitorDom" >"$root/copy/tardisks/late"
  mkdir "$root/copy/tardisks/inner"
  secpolicy check /copy
  exits 0
  shows "$root/copy/tardisks/inner: warning: this is a directory: a load skips it [skipped-entry]"
}

@test "a policy of its own may be in a directory of any name" {
  cp -r "$policy" "$root/early"
  secpolicy check --werror /early/domains/appDom
  exits 0
  [[ -z $output && $stderr == "secpolicy: check: no problems" ]]
}

@test "nul-byte" {
  printf -- '-s bind grant \0 x\n' >>"$policy/domains/appDom"
  number=$(wc -l <"$policy/domains/appDom")
  warns "$shown/domains/appDom:$number:15: warning: a NUL byte ends this line; what follows it is not read [nul-byte]"
}

@test "second-policy" {
  mkdir -p "$BATS_TEST_TMPDIR/disk/etc/zorvan/secpolicy/tardisks"
  echo "-E monitorImage monitorDom" | tee "$BATS_TEST_TMPDIR/disk/etc/zorvan/secpolicy/tardisks/"{one,two} >/dev/null
  tar -C "$BATS_TEST_TMPDIR/disk" -czf "$root/tardisks/twice.tgz" etc
  "$SECPOLICY" --root "$root" boot 2>"$BATS_TEST_TMPDIR/boot.err" || true
  finds "$shown/tardisks/two: error: More than one exception specification for tardisk /tardisks/twice.tgz [second-policy]"
}

@test "skipped-entry, but for the directory of partner domains" {
  ln -s appDom "$policy/domains/linkDom"
  mkdir "$policy/objects/more"
  warns "$shown/domains/linkDom: warning: this is a symbolic link: a load skips it [skipped-entry]"
  shows "$shown/objects/more: warning: this is a directory: a load skips it [skipped-entry]"
  [[ $stderr == "secpolicy: check: 0 errors, 2 warnings" ]]
}

@test "star-in-path, where /* is no tree" {
  add domains/appDom "-r /etc/* r"
  warns "$shown/domains/appDom:$number:4: warning: a -r rule has no patterns: this one is about a file whose name has a star [star-in-path]"
  add fileLabels/base "/* hostConfig" "/etc/services.conf/* hostConfig" "/etc/s*.conf hostConfig"
  secpolicy check --fresh
  exits 0
  shows "$shown/fileLabels/base:$((number - 2)):1: warning: there is no directory before the /* [star-in-path]"
  shows "$shown/fileLabels/base:$((number - 1)):1: warning: /* stands behind something that is no directory [star-in-path]"
  shows "$shown/fileLabels/base:$number:1: warning: there are no patterns: this is a file whose name has a star [star-in-path]"
}

@test "tab" {
  add domains/appDom "-s"$'\t'"bind grant"
  secpolicy check
  exits 1
  shows "$shown/domains/appDom:$number:3: warning: this tab is part of a word: only spaces separate words [tab]"
}

@test "two-labels: one path, two names of one file, and a tree below" {
  ln "$root/etc/services.conf" "$root/etc/other.conf"
  echo "/etc/services.conf sshKey" >"$policy/fileLabels/one"
  echo "/etc/services.conf vmDisk" >"$policy/fileLabels/two"
  echo "/etc/other.conf sshKey" >"$policy/fileLabels/x"
  warns "$shown/fileLabels/two:1:20: warning: this label replaces 'sshKey' of line 1 of $inside/fileLabels/one [two-labels]"
  shows "$shown/fileLabels/x:1:17: warning: this label replaces 'vmDisk' of line 1 of $inside/fileLabels/two: /etc/services.conf is the same file [two-labels]"
  echo "/etc/* hostConfig" >"$policy/fileLabels/y"
  warns "$shown/fileLabels/x:1:17: warning: this label does not stay: line 1 of $inside/fileLabels/y gives the whole tree 'hostConfig' [two-labels]"
}

@test "unknown-port" {
  add domains/sshDom "-p bind_port 65535 grant" "-p ioctl_request 65536 grant" "-p bind_port 60000 65536 grant"
  warns "$shown/domains/sshDom:$number:20: warning: there is no port 65536: the last is 65535 [unknown-port]"
  [[ $(grep -c unknown-port <<<"$output") -eq 1 ]]
}

@test "unreachable-domain, also of domains that enter each other" {
  echo "-d hostProgram twoDom exec grant" >"$policy/domains/oneDom"
  echo "-d hostProgram oneDom exec grant" >"$policy/domains/twoDom"
  warns "$shown/domains/oneDom: warning: nothing enters the domain 'oneDom': no -d rule of a domain in use leads to it [unreachable-domain]"
  shows "$shown/domains/twoDom: warning: nothing enters the domain 'twoDom': no -d rule of a domain in use leads to it [unreachable-domain]"
}

@test "unused-object" {
  add objects/base "lonelyObject"
  warns "$shown/objects/base:$number:1: warning: no rule and no file label uses 'lonelyObject' [unused-object]"
}

@test "--werror ends with 1 for a warning" {
  add objects/base "lonelyObject"
  secpolicy check --werror
  exits 1
  [[ $stderr == "secpolicy: check: 0 errors, 1 warning" ]]
}

@test "--disable leaves a warning out, and can be repeated" {
  add objects/base "lonelyObject" "sshKey"
  secpolicy check --werror --disable unused-object --disable duplicate-object
  exits 0
  [[ -z $output ]]
}

@test "--disable of an error and of no code is wrong usage" {
  secpolicy check --disable rule-type
  wrong_usage check "--disable: 'rule-type' is an error: a load does not end well with it"
  secpolicy check --disable no-such-code
  wrong_usage check "--disable: there is no problem 'no-such-code'; 'secpolicy explain' lists all"
}

@test "--format json" {
  add domains/appDom "-s reed grant"
  add objects/base "lonelyObject"
  secpolicy check --format json
  exits 1
  fits_schema check
  jq -e --arg policy "$policy" --argjson line "$(wc -l <"$policy/domains/appDom")" '
    .schema == "secpolicy.check/1" and .errors == 1 and .warnings == 1 and (.problems | length) == 2 and
    .problems[0] == {file: ($policy + "/domains/appDom"), line: $line, column: 4,
      length: 4, source: "-s reed grant", severity: "error", code: "unknown-word",
      message: "unknown system call '"'reed'"'", hint: "did you mean '"'read'"'?"}' <<<"$output"
}

@test "--format json of a policy without problems, and of bytes that are no text" {
  secpolicy check --format json
  exits 0
  fits_schema check
  jq -e '.problems == [] and .errors == 0' <<<"$output"
  printf -- '-s \xff\xfe grant\n' >>"$policy/domains/appDom"
  secpolicy check --format json
  exits 1
  jq -e '.errors == 1' <<<"$output"
}

@test "--format sarif has what its schema requires" {
  add domains/appDom "-s reed grant"
  touch "$policy/domains/odd name%"
  secpolicy check --format sarif
  exits 1
  jq -e '.version == "2.1.0" and (.["$schema"] | type) == "string" and (.runs | length) == 1' <<<"$output"
  jq -e '.runs[0].tool.driver | .name == "secpolicy" and (.rules | map(.id) | length > 0 and length == (unique | length))' <<<"$output"
  # Every result names a rule by its place, has a level, a text and a place.
  jq -e '.runs[0] as $run | $run.results | length == 2 and all(
    $run.tool.driver.rules[.ruleIndex].id == .ruleId and
    (.level | IN("error", "warning")) and (.message.text | length > 0) and
    (.locations | length == 1) and (.locations[0].physicalLocation.artifactLocation.uri | startswith("file:///")))' <<<"$output"
  jq -e --argjson line "$number" '.runs[0].results[] | select(.ruleId == "unknown-word") |
    .locations[0].physicalLocation.region |
    .startLine == $line and .startColumn == 4 and .endColumn == 8' <<<"$output"
  jq -e --arg policy "$policy" '.runs[0].results |
    map(.locations[0].physicalLocation.artifactLocation.uri) |
    index("file://" + $policy + "/domains/odd%20name%25") != null' <<<"$output"
}

@test "control characters of a file do not reach the terminal" {
  printf -- '-s \033[2J grant\n' >>"$policy/domains/appDom"
  secpolicy check
  exits 1
  [[ $output != *$'\033'* && $output == *'-s ^[[2J grant'* ]]
}

@test "neither do other characters that command a terminal, or bytes that are none" {
  # U+009B, a byte that is no character, U+202E, U+2066, and a long form of an escape.
  printf -- '-s \xc2\x9b31m\x9b\xe2\x80\xae\xe2\x81\xa6\xc0\x9b grant\n' >>"$policy/domains/appDom"
  secpolicy check
  exits 1
  [[ $output == *'-s <U+009B>31m<9B><U+202E><U+2066><C0><9B> grant
       ^^^^^^^^~~~~~~~~~~~~~~~~~~~~~~~~~~~~~~~' ]]
}

@test "letters of any language are shown as they are, and columns count them" {
  printf -- '-s gr\xc3\xbc\xc3\x9fe grnt\n' >>"$policy/domains/appDom"
  number=$(wc -l <"$policy/domains/appDom")
  finds "$shown/domains/appDom:$number:10: error: invalid keyword grnt [grant-word]"
  shows '    -s grüße grnt'
}

@test "thousands of misspelt words beside thousands of objects take seconds" {
  seq -f 'thing%.0f' 20000 >"$policy/objects/things"
  seq -f '-a thimg%.0f read grant' 2000 >>"$policy/domains/appDom"
  run --separate-stderr timeout 60 "$SECPOLICY" --root "$root" check --disable unused-object
  exits 1
  shows "    hint: did you mean 'thing1999'?"
  [[ $stderr == "secpolicy: check: 2000 errors, 0 warnings" ]]
}

@test "many thousands of domain files take seconds" {
  local count=20000
  [[ -z ${SECPOLICY_LONG_TESTS-} ]] || count=100000
  seq -f "$policy/domains/a%.0f" "$count" | xargs touch
  run --separate-stderr timeout 60 "$SECPOLICY" --root "$root" check
  exits 1
  [[ $output == *": error: cannot create domain 'a"*"': all 511 domains are in use [bad-name]"* ]]
  run --separate-stderr timeout 60 "$SECPOLICY" --root "$root" load
  exits 1
  [[ $stderr == *"all 511 domains are in use"* ]]
}

@test "a hint is the nearest word, the first of several, and none for what is far" {
  add objects/base webSite webSiteOld abcdefghijklmnopqrstuvwxyz
  add domains/appDom "-a wbeSite read grant" "-a WEBSITES read grant" "-a webSideOlt read grant" \
    "-a abcdefghijklmnopqrst read grant" "-a bacedfghijklmnopqrstuvwxw read grant"
  secpolicy check --disable unused-object
  exits 1
  diff <(printf '    hint: %s\n' "did you mean 'webSite'?" "did you mean 'webSite'?" "did you mean 'webSiteOld'?" \
    "labels are declared in objects/" "did you mean 'abcdefghijklmnopqrstuvwxyz'?") <(grep hint: <<<"$output")
}

@test "of a file without line ends, no more is read than a load reads" {
  truncate -s 8G "$policy/domains/hugeDom"
  local limit=2000000
  # Sanitizers take all addresses there are.
  [[ -z ${SANITIZER-} ]] || limit=unlimited
  run --separate-stderr bash -c "ulimit -v $limit"'; exec timeout 60 "$@"' - "$SECPOLICY" --root "$root" check
  shows "$shown/domains/hugeDom:1:1024: warning: this line has more than 1023 characters: the rest of it and all lines below it are not read [long-line]"
}

@test "what is installed counts, but not with --fresh" {
  add domains/appDom "-d hostProgram sshDom exec grant"
  early sshDom
  sed -i '/sshDom/d' "$policy/domains/hostDom" "$policy/domains/daemonFrameworkDom"
  secpolicy check --disable unused-object
  exits 0
  secpolicy check --fresh
  exits 1
  [[ $output == *"Failed to fetch domain id for: sshDom [unknown-domain]"* ]]
}

@test "a state that this user may not read is said, and the policy is checked as after a boot" {
  [[ $EUID -eq 0 ]] || skip "only root can become somebody else"
  setpriv --reuid=65534 --clear-groups test -x "$SECPOLICY" -a -r "$SOURCE" ||
    skip "others may not read this place"
  chmod 700 "$root/run/secpolicy"
  export SECPOLICY_HOST_STATE=$root/run/secpolicy/host.db
  run --separate-stderr setpriv --reuid=65534 --clear-groups "$SECPOLICY" check "$SOURCE/examples/host/etc/zorvan/secpolicy"
  [[ $stderr == *"; checked as after a boot, since this user may not read the installed state" ]]
  run --separate-stderr setpriv --reuid=65534 --clear-groups "$SECPOLICY" check --format json "$SOURCE/examples/host/etc/zorvan/secpolicy"
  fits_schema check
  [[ $(jq -r .against <<<"$output") == boot ]]
}

@test "where nothing is installed, the policy is checked as after a boot" {
  rm -r "$root/run/secpolicy"
  secpolicy check
  ends_with "secpolicy: check: no problems; checked as after a boot, since nothing is installed"
  secpolicy check --fresh
  ends_with "secpolicy: check: no problems"
  [[ ! -e $root/run/secpolicy ]]
}

@test "a state that others may have written, or that is damaged, is not checked against" {
  secpolicy check --format json
  fits_schema check
  [[ $(jq -r .against <<<"$output") == installed ]]
  local state=$root/run/secpolicy/host.db
  chmod 666 "$state"
  secpolicy check
  exits 1
  [[ $stderr == "secpolicy: check: Refusing the host state: other users may write /run/secpolicy/host.db. Take that right from them (chmod go-w), and make it anew" ]]
  rm "$state"
  mkfifo -m 600 "$state"
  run --separate-stderr timeout 10 "$SECPOLICY" --root "$root" check
  exits 1
  [[ $stderr == "secpolicy: check: Refusing the host state: /run/secpolicy/host.db is not a regular file. Remove it, and make it anew" ]]
  rm "$state"
  echo garbage >"$state"
  chmod 600 "$state"
  secpolicy check
  exits 1
  [[ $stderr == "secpolicy: check: Unable to copy the host state /run/secpolicy/host.db: file is not a database" ]]
  [[ $(cat "$state") == garbage ]]
}

@test "settings that others may have written, or that are damaged, end a check as they end a load" {
  secpolicy settings enforcement appDom permissive
  local settings=$root/var/lib/secpolicy/config.db
  chmod 666 "$settings"
  secpolicy check
  exits 1
  [[ $stderr == "secpolicy: check: Refusing the configuration: other users may write /var/lib/secpolicy/config.db. Take that right from them (chmod go-w), and make it anew" ]]
  secpolicy check --fresh
  exits 0
  chmod 600 "$settings"
  echo garbage >"$settings"
  secpolicy check
  exits 1
  [[ $stderr == "secpolicy: check: Unable to copy the configuration /var/lib/secpolicy/config.db: file is not a database" ]]
  secpolicy load
  exits 1
  rm "$settings"
  secpolicy check
  exits 0
}

@test "a directory that is not there" {
  secpolicy check /no/such
  exits 1
  [[ $stderr == "secpolicy: check: there is no policy at /no/such below this root. Name the directory of the policy or a file in it, or the root that it is in (--root DIR)." ]]
}

@test "the mistake of the broken example shows from the output alone" {
  run --separate-stderr "$SECPOLICY" check --fresh "$SOURCE/examples/broken"
  exits 1
  [[ $output == "$SOURCE/examples/broken/domains/webDom:4:4: error: unknown label 'webContnet' [unknown-word]
    -a webContnet read    grant
       ^~~~~~~~~~
    hint: did you mean 'webContent'?" ]]
  cp -r "$SOURCE/examples/broken" "$BATS_TEST_TMPDIR/mended"
  sed -i s/webContnet/webContent/ "$BATS_TEST_TMPDIR/mended/domains/webDom"
  run --separate-stderr "$SECPOLICY" check --werror --fresh "$BATS_TEST_TMPDIR/mended"
  exits 0
}

@test "every code has its page in the documentation, and no other has" {
  secpolicy check --format sarif
  diff <(jq -r '.runs[0].tool.driver.rules[].id' <<<"$output" | sort) \
    <(sed -n 's/^### `\(.*\)`$/\1/p' "$SOURCE/docs/diagnostics.md" | sort)
}

@test "cannot-start, of a domain with rules that lacks a call of @start" {
  printf '%s\n' '-s @start grant' '-s mmap revoke' >"$policy/domains/appDom"
  : >"$policy/domains/ioFilterDom"
  secpolicy check
  warns "$shown/domains/appDom: warning: no dynamically linked program can start in the domain 'appDom': it may not make 1 system call of @start [cannot-start]"
  shows "    hint: write: -s @start grant"
  [[ $output != *ioFilterDom* ]]
  sed -i /mmap/d "$policy/domains/appDom"
  secpolicy check
  [[ $output != *cannot-start* ]]
}

# many_problems: a policy with eleven problems, two of them errors, in two files.
many_problems() {
  add fileLabels/base "/one sshKey" "/two sshKey" "/three sshKey" "/four sshKey" "/five sshKey"
  add domains/sshDom "-r /six r" "-r /seven r" "-r /eight r" "-r /nine r" "-s opne grant" "-s raed grant"
}

@test "errors come before warnings, either in the order of a load, and a long list ends with a tally" {
  many_problems
  secpolicy check --fresh
  exits 1
  [[ $(grep -oE '^/[^ ]* (error|warning): ' <<<"$output" | cut -d' ' -f2 | uniq) == $'error:\nwarning:' ]]
  [[ $output == *$'\n\n     2 error   unknown-word '* ]]
  local summary=${stderr##*$'\n'}
  secpolicy check --fresh --disable missing-path
  exits 1
  [[ $output != *"error   unknown-word"* && $output != *missing-path* ]]
  [[ $summary == *" warnings" ]]
}

@test "--errors-only, --only and --max choose what is shown, and all counts" {
  many_problems
  secpolicy check --fresh --errors-only
  exits 1
  [[ $(grep -c '^/.*\[unknown-word\]$' <<<"$output") -eq 2 && $output != *'[missing-path]'* ]]
  local summary=${stderr##*$'\n'}
  [[ $summary == "secpolicy: check: 2 errors, "*" warnings; 2 shown" ]]
  secpolicy check --fresh --only missing-path --max 3
  exits 1
  [[ $(grep -c '^/.*\[missing-path\]$' <<<"$output") -eq 3 && $output != *'[unknown-word]'* ]]
  ends_with "${summary/; 2/; 3}"
  secpolicy check --fresh --max 0 --format json
  exits 1
  [[ $(jq -c '[.errors, .tally["unknown-word"], .problems]' <<<"$output") == '[2,2,[]]' ]]
  fits_schema check
}

@test "a wrong --max, --only or --stdin is wrong usage, and told" {
  secpolicy check --max many
  wrong_usage check "--max: 'many' is not a number"
  secpolicy check --only nothing
  wrong_usage check "--only: there is no problem 'nothing'; 'secpolicy explain' lists all"
  secpolicy check --only unkown-word
  wrong_usage check "--only: there is no problem 'unkown-word'; did you mean 'unknown-word'?"
  secpolicy check --stdin
  exits 1
  ends_with "secpolicy: check: name the file that standard input holds the content of."
}

@test "one file is checked beside the others, and only its problems count" {
  add domains/sshDom "-s opne grant"
  add domains/hostDom "-s raed grant"
  secpolicy check "$inside/domains/sshDom"
  exits 1
  shows "$shown/domains/sshDom:$(wc -l <"$policy/domains/sshDom"):4: error: unknown system call 'opne' [unknown-word]"
  ends_with "secpolicy: check: 1 error, 0 warnings"
  secpolicy check "$inside/objects/base"
  exits 0
  ends_with "secpolicy: check: no problems"
}

@test "a file of early boot is checked with the whole policy" {
  local file
  file=$(find "$policy/early/domains" -type f | head -n 1)
  echo "-s opne grant" >>"$file"
  secpolicy check "$inside/early/domains/${file##*/}"
  exits 1
  ends_with "secpolicy: check: 1 error, 0 warnings"
}

@test "what standard input holds takes the place of the file, and the file stays as it is" {
  local before
  before=$(sha256sum "$policy/domains/sshDom")
  run --separate-stderr "$SECPOLICY" --root "$root" check --stdin "$inside/domains/sshDom" <<<"-s opne grant"
  exits 1
  shows "$shown/domains/sshDom:1:4: error: unknown system call 'opne' [unknown-word]"
  [[ $(sha256sum "$policy/domains/sshDom") == "$before" ]]
}

@test "a file that no load reads, and one that is in no policy, are refused" {
  touch "$policy/README" "$root/alone"
  secpolicy check "$inside/README"
  exits 1
  ends_with "secpolicy: check: a load does not read $inside/README: it is in none of the directories of a policy."
  secpolicy check /alone
  exits 1
  ends_with "secpolicy: check: there is no policy at /alone below this root. Name the directory of the policy or a file in it, or the root that it is in (--root DIR)."
}

@test "ranges that are written otherwise and capabilities without their prefix get a hint" {
  add domains/sshDom "-p bind_port 8000-9000 grant" "-c net_raw grant" "-p bind_port 9000 8000 grant"
  secpolicy check
  exits 1
  shows "    hint: a range is two words: 8000 9000"
  shows "    hint: did you mean 'cap_net_raw'?"
  shows "    hint: the smaller number comes first: 8000 9000"
}
