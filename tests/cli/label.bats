# secpolicy label: what it gets, sets, verifies and gives again agrees with what a load labels, and no
# link leads it astray.

load helper

labels=/etc/zorvan/secpolicy/fileLabels

# the_label PATH: the label that the command says a file has.
the_label() {
  "$SECPOLICY" --root "$root" label get "$1" 2>/dev/null | sed "s|^$1: ||"
}

# unlabel PATH...: takes the labels off the files themselves.
unlabel() {
  python3 -c '
import os, sys
for path in sys.argv[1:]:
    for name in os.listxattr(path):
        if name in ("security.bpf.zorvan", "user.zorvan.security"):
            os.removexattr(path, name)' "${@/#/$root}"
}

# on_a_terminal ARGUMENT...: the command on a terminal of its own; $output is what that shows, with
# every return of the carriage as a line.
on_a_terminal() {
  run script -qec "'$SECPOLICY' --root '$root' $*" /dev/null
  output=$(tr -s '\r' '\n' <<<"$output")
}

@test "get prints the label of each file" {
  boot
  secpolicy label get /usr/sbin/sshd /etc/ssh/host_key /opt
  exits 0
  [[ $output == "/usr/sbin/sshd: sshProgram
/etc/ssh/host_key: sshKey
/opt: unlabeled" ]]
  [[ $stderr == "secpolicy: label get: done" ]]
}

@test "get -R prints a tree in order of name, without its links and sockets" {
  boot
  ln -s host_key "$root/etc/ssh/alias"
  python3 -c 'import socket, sys; socket.socket(socket.AF_UNIX).bind(sys.argv[1])' "$root/etc/ssh/socket"
  secpolicy label get -R /etc/ssh /usr/sbin/sshd
  exits 0
  [[ $output == "/etc/ssh: hostConfig
/etc/ssh/host_key: sshKey
/usr/sbin/sshd: sshProgram" ]]
}

@test "get -R prints many files in order of name, whatever order their directory has" {
  boot
  touch "$root/etc/ssh/"{z..a}
  secpolicy label get -R /etc/ssh
  exits 0
  [[ $(wc -l <<<"$output") -eq 28 ]]
  cut -d: -f1 <<<"$output" | LC_ALL=C sort --check
}

@test "get of what has no label, and of what is not there, fails and shows the rest" {
  boot
  unlabel / /etc
  touch "$root/etc/new"
  secpolicy label get /etc/new /no/such /opt
  exits 1
  [[ $output == "/opt: unlabeled" ]]
  [[ $stderr == "Error: /etc/new: has no label; 'secpolicy --root $root boot' gives every file of the root's file system its first one
Error: /no/such: No such file or directory
secpolicy: label get: failed (2 errors above)" ]]
}

@test "a file that was made or saved anew inherits the label of its directory" {
  boot
  touch "$root/etc/new"
  mkdir -p "$root/opt/monitor/etc/deep/er"
  touch "$root/opt/monitor/etc/deep/er/file"
  cp "$root/etc/ssh/host_key" "$root/etc/ssh/saved" && mv "$root/etc/ssh/saved" "$root/etc/ssh/host_key"
  secpolicy label get /etc/new /opt/monitor/etc/deep/er/file /etc/ssh/host_key /etc/ssh
  answers 0 "/etc/new: hostConfig (inherited)" \
    "/opt/monitor/etc/deep/er/file: monitorConfig (inherited)" \
    "/etc/ssh/host_key: hostConfig (inherited)" \
    "/etc/ssh: hostConfig"
  secpolicy label verify /etc/new
  exits 0
  secpolicy label verify
  answers 1 "/etc/ssh/host_key: has hostConfig (inherited), the policy says sshKey ($labels/base:$(grep -n /etc/ssh/host_key "$policy/fileLabels/base" | cut -d: -f1))"
  secpolicy load
  exits 0
  ends_done load
  secpolicy label get /etc/new /opt/monitor/etc/deep/er/file /etc/ssh/host_key
  answers 0 "/etc/new: hostConfig" "/opt/monitor/etc/deep/er/file: monitorConfig" "/etc/ssh/host_key: sshKey"
}

@test "set and relabel give a file that inherits a label of its own" {
  boot
  touch "$root/opt/new" "$root/opt/other"
  mv "$root/opt/monitor/bin/agent" "$root/opt/monitor/bin/aside"
  cp "$root/opt/monitor/bin/aside" "$root/opt/monitor/bin/agent"
  secpolicy label set sshKey /opt/new
  exits 0
  secpolicy label get /opt/new /opt/other
  answers 0 "/opt/new: sshKey" "/opt/other: unlabeled (inherited)"
  secpolicy label set unlabeled /opt/monitor/bin
  unlabel /opt/monitor/bin/agent
  secpolicy label relabel --dry-run /opt/monitor/bin/agent
  exits 0
  [[ $output == "/opt/monitor/bin/agent: unlabeled (inherited) -> monitorProgram ("* ]]
  secpolicy label relabel /opt/monitor/bin/agent
  exits 0
  [[ $(the_label /opt/monitor/bin/agent) == monitorProgram ]]
}

@test "get of a label that the policy has dropped says so" {
  boot
  sed -i /hostConfig/d "$policy/objects/base" "$policy/fileLabels/base" "$policy/domains/"*Dom
  secpolicy load
  secpolicy label get /etc/services.conf
  exits 1
  [[ $stderr =~ ^"Error: /etc/services.conf: has a label that is gone ("[0-9]+")" ]]
}

@test "a control character in a name does not reach the terminal" {
  boot
  touch "$root/etc/a"$'\n'"b"
  secpolicy boot
  secpolicy label get -R /etc
  shows '/etc/a^Jb: hostConfig'
}

@test "set gives files a label, and with -R trees" {
  boot
  secpolicy label set sshKey /etc/services.conf /etc/ssh
  exits 0
  [[ $stderr == "secpolicy: label set: done" ]]
  [[ $(the_label /etc/services.conf) == sshKey && $(the_label /etc/ssh) == sshKey ]]
  secpolicy label set -R vmDisk /opt
  exits 0
  secpolicy label get -R /opt
  [[ $output != *unlabeled* && $(grep -c ': vmDisk$' <<<"$output") -eq $(find "$root/opt" | wc -l) ]]
}

@test "set of a label that there is not changes nothing and says what was meant" {
  boot
  secpolicy label set sshKye /etc
  wrong_usage "label set" "label set: there is no object label 'sshKye'. Did you mean 'sshKey'?"
  secpolicy label set entirelyDifferent /etc
  wrong_usage "label set" "label set: there is no object label 'entirelyDifferent'. 'secpolicy --root $root words objects' lists all labels"
  secpolicy label set /etc sshKey
  wrong_usage "label set" "label set: there is no object label '/etc'. The label comes first: secpolicy label set sshKey /etc"
  [[ $(the_label /etc) == hostConfig ]]
}

@test "set does the other files when one fails" {
  boot
  unlabel / /etc
  touch "$root/etc/new"
  secpolicy label set sshKey /etc/new /no/such /opt
  exits 1
  [[ $stderr == "Error: Unable to set file label (sshKey) for file /etc/new: No data available: it has no label; 'secpolicy --root $root boot' gives every file of the root's file system its first one
Error: Unable to set file label (sshKey) for file /no/such: No such file or directory
secpolicy: label set: failed (2 errors above)" ]]
  [[ $(the_label /opt) == sshKey ]]
}

@test "verify after a boot finds no difference" {
  boot
  secpolicy label verify
  exits 0
  [[ -z $output ]]
  [[ $stderr =~ ^"secpolicy: label verify: done ("[1-9][0-9]*" files, all as the policy says)"$ ]]
}

@test "verify prints each difference with the line that decides, and changes nothing" {
  boot
  secpolicy label set hostConfig /etc/ssh/host_key
  secpolicy label set vmDisk /opt/monitor/bin/agent
  unlabel / /opt /opt/monitor /opt/monitor/etc
  touch "$root/opt/monitor/etc/new"
  local line
  line=$(grep -n /etc/ssh/host_key "$policy/fileLabels/base" | cut -d: -f1)
  local bin etc
  bin=$(grep -n /opt/monitor/bin "$policy/fileLabels/monitor" | cut -d: -f1)
  etc=$(grep -n /opt/monitor/etc "$policy/fileLabels/monitor" | cut -d: -f1)
  secpolicy label verify
  exits 1
  [[ $(sort <<<"$output") == "/etc/ssh/host_key: has hostConfig, the policy says sshKey ($labels/base:$line)
/opt/monitor/bin/agent: has vmDisk, the policy says monitorProgram ($labels/monitor:$bin)
/opt/monitor/etc/new: has no label, the policy says monitorConfig ($labels/monitor:$etc)
/opt/monitor/etc: has no label, the policy says monitorConfig ($labels/monitor:$etc)" ]]
  [[ $stderr =~ ^"secpolicy: label verify: 4 of "[0-9]+" files differ from the policy. 'secpolicy --root $root label relabel' gives the policy's labels again"$ ]]
  [[ $(the_label /etc/ssh/host_key) == hostConfig ]]
}

@test "verify of paths looks at what is at or below them" {
  boot
  secpolicy label set hostConfig /etc/ssh/host_key
  secpolicy label set vmDisk /opt/monitor/bin/agent
  secpolicy label verify /opt /etc/services.conf
  exits 1
  [[ $output == "/opt/monitor/bin/agent: has vmDisk, "* ]]
  [[ $(wc -l <<<"$output") -eq 1 ]]
  secpolicy label verify /etc/services.conf
  exits 0
  [[ $stderr == "secpolicy: label verify: done (1 file, all as the policy says)" ]]
  secpolicy label verify /tardisks
  exits 0
  [[ $stderr == "secpolicy: label verify: done (the policy names no file there)" ]]
  secpolicy label verify /no/such
  exits 1
  [[ $stderr == "Error: /no/such: No such file or directory
secpolicy: label verify: failed (1 error above)" ]]
}

@test "where files without a label are all that differs, verify sends the user to boot" {
  boot
  unlabel / /etc
  touch "$root/etc/new"
  secpolicy label verify /etc/new
  exits 1
  ends_with "secpolicy: label verify: 1 of 1 file differs from the policy. 'secpolicy --root $root boot' gives every file of the root's file system its first label"
}

@test "verify, relabel and load agree on trees, later lines, hard links and links" {
  mkdir -p "$root/data/deep/er" "$root/elsewhere"
  touch "$root/data/one" "$root/data/deep/two" "$root/data/deep/er/three" "$root/elsewhere/four"
  ln "$root/data/one" "$root/elsewhere/one"
  ln -s ../elsewhere "$root/data/link"
  ln -s data "$root/alias"
  cat >"$policy/fileLabels/order" <<'END'
/data/deep/two sshKey
/data/* hostConfig
/alias/deep/er vmDisk
/elsewhere/one sshProgram
/data/deep/er/* hostProgram
/alias/deep/er/three monitorConfig
END
  boot
  secpolicy label verify
  exits 0
  local loaded
  loaded=$("$SECPOLICY" --root "$root" label get -R /data /elsewhere 2>/dev/null)
  [[ $loaded == "/data: hostConfig
/data/deep: hostConfig
/data/deep/er: hostProgram
/data/deep/er/three: monitorConfig
/data/deep/two: hostConfig
/data/one: sshProgram
/elsewhere: unlabeled
/elsewhere/four: unlabeled
/elsewhere/one: sshProgram" ]]
  secpolicy label set -R vmDisk /data
  secpolicy label relabel
  exits 0
  [[ $("$SECPOLICY" --root "$root" label get -R /data /elsewhere 2>/dev/null) == "$loaded" ]]
}

@test "relabel gives the labels again and counts by label" {
  boot
  secpolicy label set unlabeled /opt/monitor/bin/agent /etc/ssh/host_key /opt
  secpolicy label relabel
  exits 0
  shows "monitorProgram: 1 of 2 files relabelled"
  shows "sshKey: 1 of 1 file relabelled"
  shows "sshProgram: 0 of 1 file relabelled"
  [[ $stderr =~ ^"secpolicy: label relabel: done (2 of "[0-9]+" files relabelled)"$ ]]
  [[ $(the_label /opt/monitor/bin/agent) == monitorProgram && $(the_label /opt) == unlabeled ]]
  secpolicy label verify
  exits 0
}

@test "relabel of a path leaves the others alone" {
  boot
  secpolicy label set unlabeled /opt/monitor/bin/agent /etc/ssh/host_key
  secpolicy label relabel /etc/ssh
  exits 0
  [[ $output == "hostConfig: 0 of 1 file relabelled
sshKey: 1 of 1 file relabelled" ]]
  [[ $(the_label /opt/monitor/bin/agent) == unlabeled ]]
}

@test "relabel --dry-run prints what would change, and changes nothing" {
  boot
  secpolicy label set unlabeled /opt/monitor/bin/agent
  secpolicy label relabel --dry-run /opt/monitor/bin
  exits 0
  local line
  line=$(grep -n /opt/monitor/bin "$policy/fileLabels/monitor" | cut -d: -f1)
  [[ $output == "/opt/monitor/bin/agent: unlabeled -> monitorProgram ($labels/monitor:$line)
monitorProgram: 1 of 2 files would be relabelled" ]]
  [[ $stderr == "secpolicy: label relabel: done (1 of 2 files would be relabelled)" ]]
  [[ $(the_label /opt/monitor/bin/agent) == unlabeled ]]
}

@test "relabel reports what fails and does the rest" {
  cat >>"$policy/fileLabels/monitor" <<'END'
/no/such hostConfig
/etc/services.conf/* hostConfig
/* hostConfig
/etc appDom
/etc noSuchLabel
END
  boot || true
  touch "$root/opt/monitor/bin/a-new-one"
  unlabel / /opt /opt/monitor /opt/monitor/bin
  secpolicy label set unlabeled /opt/monitor/bin/agent
  local last
  last=$(wc -l <"$policy/fileLabels/monitor")
  secpolicy label relabel
  exits 1
  says "Error: Error parsing file $labels/monitor"
  [[ $stderr == *"'noSuchLabel'"* ]]
  says "Error: $labels/monitor:$((last - 4)) : /no/such: No such file or directory"
  says "Error: $labels/monitor:$((last - 3)) : /etc/services.conf: Not a directory"
  says "Error: $labels/monitor:$((last - 2)) : : No such file or directory"
  says "Error: $labels/monitor:$((last - 1)) : Invalid label (appDom) for file /etc"
  says "Error: /opt/monitor/bin: has no label; 'secpolicy --root $root boot' gives every file of the root's file system its first one"
  says "Error: /opt/monitor/bin/a-new-one: has no label; 'secpolicy --root $root boot' gives every file of the root's file system its first one"
  ends_with "secpolicy: label relabel: failed (8 errors above)"
  [[ $(the_label /opt/monitor/bin/agent) == monitorProgram ]]
}

@test "relabel does not follow links that are planted meanwhile" {
  # The files come between the listing of the directory and its last entries.
  mkdir -p "$root/var/lib/vms/y" "$root/secret"
  touch "$root/var/lib/vms/"{1..2000} "$root/var/lib/vms/y/file" "$root/var/lib/vms/z" "$root/secret/file"
  boot
  python3 - "$root" <<'END' &
import os, sys, time
os.chdir(sys.argv[1] + "/var/lib/vms")
os.symlink("/secret", "link-y")
os.symlink("/secret/file", "link-z")
while True:
    for name in "y", "z":
        os.rename(name, "aside")
        os.rename("link-" + name, name)
        time.sleep(0.002)
        os.rename(name, "link-" + name)
        os.rename("aside", name)
END
  local swapper=$!
  for _ in {1..20}; do
    "$SECPOLICY" --root "$root" label relabel >/dev/null 2>&1 || true
  done
  kill "$swapper"
  secpolicy label get -R /secret
  [[ $output == "/secret: unlabeled
/secret/file: unlabeled" ]]
}

@test "relabel needs few open files in a tree of any depth" {
  boot
  python3 - "$root/var/lib/vms" <<'END'
import os, sys
os.chdir(sys.argv[1])
for _ in range(3000):
    os.mkdir("d")
    os.chdir("d")
END
  # The load that ends the boot does not get to the bottom.
  boot || true
  run --separate-stderr bash -c "ulimit -n 32; '$SECPOLICY' --root '$root' label relabel /var/lib/vms"
  exits 0
  [[ $output =~ "vmDisk: "[0-9]+" of "([0-9]+)" files relabelled" && ${BASH_REMATCH[1]} -gt 3000 ]]
  secpolicy label verify /var/lib/vms
  exits 0
}

@test "another policy directory is taken with --policy" {
  boot
  mkdir -p "$root/other/fileLabels"
  echo "/opt/* vmDisk" >"$root/other/fileLabels/all"
  secpolicy label relabel --policy /other
  exits 0
  [[ $(the_label /opt/monitor) == vmDisk && $(the_label /etc) == hostConfig ]]
  secpolicy label verify --policy /no/such
  exits 1
  ends_with "secpolicy: label verify: Unable to open policy directory /no/such/fileLabels"
}

@test "the progress shows on a terminal, and its line is gone at the end" {
  boot
  secpolicy label set unlabeled /etc/ssh/host_key
  on_a_terminal label relabel
  [[ $status -eq 0 ]]
  [[ $output =~ $'\n'"relabelling [................] 0/"([0-9]+)" files, 0 files/s"$'\n' ]]
  local total=${BASH_REMATCH[1]}
  [[ $output =~ $'\n'"relabelling [################] $total/$total files, "[0-9]+" files/s, 0:00 left" ]]
  shows "sshKey: 1 of 1 file relabelled"
}

@test "no progress shows elsewhere" {
  boot
  secpolicy label relabel
  [[ $(wc -l <<<"$stderr") -eq 1 ]]
  run script -qec "'$SECPOLICY' --root '$root' label relabel 2>'$BATS_TEST_TMPDIR/errors'" /dev/null
  [[ $output != *"["* && $(wc -l <"$BATS_TEST_TMPDIR/errors") -eq 1 ]]
}

@test "a root that was not booted has no labels" {
  for kind in "get /etc" "set sshKey /etc" verify relabel; do
    secpolicy label $kind
    exits 1
    [[ $stderr == "secpolicy: label ${kind%% *}: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first." ]]
  done
  [[ ! -e $root/run/secpolicy ]]
}

@test "label without a kind, a file or a label is wrong usage" {
  local kinds="get, set, verify, relabel" arguments command message
  while IFS='|' read -r arguments command message; do
    # shellcheck disable=SC2086
    secpolicy label $arguments
    wrong_usage "$command" "$message"
  done <<END
|label|one of $kinds is required
gte /etc|label|there is no 'label gte'; did you mean 'get'?
lod /etc|label|there is no 'label lod'; there are $kinds
get|label get|PATH is required
set|label set|LABEL is required
set sshKey|label set|PATH is required
END
  secpolicy label get --help
  exits 0
  [[ $output == *"Examples:"*"secpolicy label get -R /etc"* ]]
}

# index: which index of labels lies beside the state, by device and inode.
index() { stat --format='%d:%i' "$root/run/secpolicy/labels.index"; }

@test "the index of labels is made anew when labels change, and only then" {
  boot
  local first second third
  [[ $(stat --format='%a %u' "$root/run/secpolicy/labels.index") == "600 $EUID" ]]
  # A file of its own name keeps its inode from being used again.
  ln "$root/run/secpolicy/labels.index" "$BATS_TEST_TMPDIR/first"
  first=$(index)
  secpolicy load
  exits 0
  secpolicy load-early
  secpolicy load --plan
  secpolicy load --all-or-nothing
  exits 0
  secpolicy label relabel --dry-run
  secpolicy label get -R /etc
  [[ $(index) == "$first" ]]
  secpolicy label set unlabeled /etc/ssh/host_key
  exits 0
  ln "$root/run/secpolicy/labels.index" "$BATS_TEST_TMPDIR/second"
  second=$(index)
  [[ $second != "$first" ]]
  secpolicy label relabel
  exits 0
  ln "$root/run/secpolicy/labels.index" "$BATS_TEST_TMPDIR/third"
  third=$(index)
  [[ $third != "$second" ]]
  cmp "$BATS_TEST_TMPDIR/second" "$root/run/secpolicy/labels.index" && return 1
  echo "/usr/sbin/sshd unlabeled" >>"$policy/fileLabels/zzz"
  secpolicy load --all-or-nothing
  exits 0
  [[ $(index) != "$third" ]]
}

@test "an index of labels that is gone or damaged is made by the next load" {
  boot
  rm "$root/run/secpolicy/labels.index"
  secpolicy load
  exits 0
  [[ -s $root/run/secpolicy/labels.index ]]
  echo broken >"$root/run/secpolicy/labels.index"
  secpolicy load
  exits 0
  [[ $(head --bytes=7 "$root/run/secpolicy/labels.index") == ZorvLab ]]
}

@test "a load says that the index of labels cannot be written, and has installed the policy" {
  boot
  rm "$root/run/secpolicy/labels.index"
  mkdir "$root/run/secpolicy/labels.index"
  secpolicy load
  exits 1
  says "Error: Unable to write the label index /run/secpolicy/labels.index: Is a directory"
  ends_with "secpolicy: load: failed (1 error above)"
  rmdir "$root/run/secpolicy/labels.index"
  secpolicy load
  exits 0
}

@test "get, verify and relabel tell the same as JSON" {
  boot
  touch "$root/etc/new"
  secpolicy label get /etc/new /usr/sbin/sshd /nowhere --format json
  exits 1
  says "Error: /nowhere: No such file or directory"
  fits_schema labels
  jq -e '.files == [{path: "/etc/new", label: "hostConfig", inherited: true},
    {path: "/usr/sbin/sshd", label: "sshProgram", inherited: false}]' <<<"$output"

  secpolicy label verify --format json
  exits 0
  fits_schema label-verify
  jq -e '.files > 10 and .differences == []' <<<"$output"
  secpolicy label set vmDisk /etc/ssh/host_key
  local line
  line=$(grep -n /etc/ssh/host_key "$policy/fileLabels/base" | cut -d: -f1)
  secpolicy label verify --format json /etc/ssh
  exits 1
  fits_schema label-verify
  jq -e --argjson line "$line" '.differences == [{path: "/etc/ssh/host_key", label: "vmDisk", inherited: false,
    policy: "sshKey", file: "/etc/zorvan/secpolicy/fileLabels/base", line: $line}]' <<<"$output"
  unlabel / /etc /etc/ssh /etc/ssh/host_key
  secpolicy label verify --format json /etc/ssh/host_key
  jq -e '.differences[0].label == null' <<<"$output"
  boot

  secpolicy label set vmDisk /etc/ssh/host_key
  secpolicy label relabel --dry-run --format json /etc/ssh
  exits 0
  fits_schema label-relabel
  jq -e '.dryRun and (.labels | any(. == {label: "sshKey", files: 1, changed: 1})) and
    (.changes[0] | .before == "vmDisk" and .after == "sshKey" and .line > 0)' <<<"$output"
  secpolicy label relabel --format json /etc/ssh
  exits 0
  fits_schema label-relabel
  jq -e '(.dryRun | not) and .changes == []' <<<"$output"
  [[ $(the_label /etc/ssh/host_key) == sshKey ]]
}

@test "a label can be given by its number" {
  boot
  local number
  number=$("$SECPOLICY" --root "$root" display 2>/dev/null | sed -n 's/^sshKey (\([0-9]*\))$/\1/p')
  secpolicy label set "$number" /etc/services.conf
  exits 0
  [[ $(the_label /etc/services.conf) == sshKey ]]
  secpolicy label set 4000 /etc/services.conf
  wrong_usage "label set" "label set: there is no object label '4000'. 'secpolicy --root $root words objects' lists all labels"
}

@test "no boot labels another file system that is mounted below a labelled tree" {
  boot
  mkdir "$root/etc/mounted"
  run --separate-stderr unshare --mount bash -c 'mount -t tmpfs mounted "$1/etc/mounted" || exit 77
    touch "$1/etc/mounted/file"; "$SECPOLICY" --root "$1" boot; "$SECPOLICY" --root "$1" label get /etc/mounted/file' - "$root"
  [[ $status -ne 77 && $stderr != *"unshare failed"* ]] || skip "no mounts here"
  exits 1
  says "Error: /etc/zorvan/secpolicy/fileLabels/base:$(grep -n '^/etc/\*' "$policy/fileLabels/base" | cut -d: -f1) : Unable to set file label (hostConfig) for file /etc/mounted: No data available"
  says "Error: /etc/mounted/file: has no label; 'secpolicy --root $root boot' gives every file of the root's file system its first one"
}
