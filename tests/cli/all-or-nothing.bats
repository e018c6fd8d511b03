# secpolicy load --all-or-nothing: a load that fails, is killed or asked to end leaves all or nothing,
# labels and their numbers included.

load helper

setup() {
  boot_beside_copy
  # A load that changes a bit of everything, the labels of three files at last.
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  touch "$policy/domains/newDom"
  sed -i '/monitorSocket/d' "$policy/domains/monitorDom" "$policy/objects/monitor"
  echo "newObject" >>"$policy/objects/base"
  printf '%s newObject\n' /etc/services.conf /usr/bin/supervise /var/lib/vms/demo/settings >\
    "$policy/fileLabels/zz"
}

load_whole() { secpolicy load --all-or-nothing /new; }

# The attribute of every file, and everything that display shows, numbers included.
everything() {
  python3 - "$root" <<'END'
import os, sys
for directory, _, files in sorted(os.walk(sys.argv[1])):
    for path in [directory] + [os.path.join(directory, name) for name in sorted(files)]:
        print(path, [(name, os.getxattr(path, name).hex()) for name in os.listxattr(path)])
END
  "$SECPOLICY" --root "$root" display 2>&1
}

# break_labels HOW NAME: the command's label for a file of this name fails ("fail"), or kills it
# ("die"); with a signal, that comes to it meanwhile. What is only noted notices nothing.
break_labels() {
  cat >"$BATS_TEST_TMPDIR/break.c" <<'END'
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <signal.h>
#include <stdlib.h>
#include <string.h>
#include <sys/types.h>
#include <unistd.h>
typedef int (*Set)(const char*, const char*, const void*, size_t, int);
static int Break(const char* call, const char* path, const char* name, const void* value,
                 size_t size, int flags) {
  const char* slash = strrchr(path, '/');
  const char* base = slash != NULL ? slash + 1 : path;
  // With both flags a label is only tried out.
  if (flags != 3 && strcmp(base, getenv("BREAK_NAME")) == 0) {
    const int number = atoi(getenv("BREAK_SIGNAL"));
    if (number != 0) {
      kill(getpid(), number);
    } else if (strcmp(getenv("BREAK_HOW"), "die") == 0) {
      kill(getpid(), SIGKILL);
    } else if (memcmp(value, "\0\0\0\0", size) != 0 && getenv("BROKEN") == NULL) {
      setenv("BROKEN", "1", 1);
      errno = EIO;
      return -1;
    }
  }
  return ((Set)dlsym(RTLD_NEXT, call))(path, name, value, size, flags);
}
int setxattr(const char* p, const char* n, const void* v, size_t s, int f) {
  return Break("setxattr", p, n, v, s, f);
}
int lsetxattr(const char* p, const char* n, const void* v, size_t s, int f) {
  return Break("lsetxattr", p, n, v, s, f);
}
END
  cc -shared -fPIC -o "$BATS_TEST_TMPDIR/break.so" "$BATS_TEST_TMPDIR/break.c"
  breakage=(env "LD_PRELOAD=$BATS_TEST_TMPDIR/break.so" "BREAK_HOW=$1" "BREAK_NAME=$2"
    "BREAK_SIGNAL=$(kill -l "$1" 2>/dev/null || true)"
    ASAN_OPTIONS=detect_leaks=0:verify_asan_link_order=0)
}

load_broken() {
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
}

@test "a load that can be done is done" {
  load_whole
  exits 0
  [[ -z $output ]]
  is_done load
  secpolicy diff /new installed
  exits 0
  secpolicy load --plan /new
  [[ -z $output && $stderr == "secpolicy: load: nothing would change" ]]
}

@test "it does what a load does" {
  load_whole
  everything | sed "s|^$root||" >"$BATS_TEST_TMPDIR/whole"
  local whole=$root
  root=$BATS_TEST_TMPDIR/other
  "$SOURCE/scripts/pack-example" "$root"
  boot
  cp -r "$whole/new" "$root/new"
  secpolicy load /new
  everything | sed "s|^$root||" | diff "$BATS_TEST_TMPDIR/whole" -
}

@test "a load with errors changes nothing, and tells them as a load does" {
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  everything >"$BATS_TEST_TMPDIR/before"
  load_whole
  exits 1
  ends_with "secpolicy: load: There were some problems encountered in setting the policy (1 problem above); nothing was installed"
  everything | diff "$BATS_TEST_TMPDIR/before" -
  local told=${stderr%$'\n'*}
  secpolicy load /new
  [[ $told == "$(grep -v '^installed now: ' <<<"${stderr%$'\n'*}")" ]]
}

@test "a load that would be stopped changes nothing" {
  rm -r "$root/run/secpolicy/"* "$policy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$policy/domains/"*Dom
  load_whole
  exits 3
  says "Error: Failed to fetch domainID for IOFilter domain"
  [[ ! -e $root/run/secpolicy/host.db ]]
}

@test "a load that cannot give a label is undone, labels and numbers included" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels fail settings
  load_broken
  exits 1
  says "Error: Unable to label /var/lib/vms/demo/settings: Input/output error"
  ends_with "secpolicy: load: failed (1 problem above); nothing was installed"
  everything | diff "$BATS_TEST_TMPDIR/before" -
  # The same failure leaves a plain load without that label alone.
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load /new
  exits 1
  says "Error: Unable to label /var/lib/vms/demo/settings: Input/output error"
  secpolicy display
  [[ $output == *newDom* ]]
  secpolicy status
  exits 1
  [[ $output == *": failed, 1 error"* ]]
}

@test "of a load that is killed on the way the next one takes the labels back" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels die settings
  load_broken
  exits 137
  [[ -e $root/run/secpolicy/labels.undo ]]
  secpolicy display
  [[ $output != *newDom* ]]
  secpolicy status
  exits 1
  ends_with "secpolicy: status: a load still gives labels to files, or was killed meanwhile. 'secpolicy --root $root load' puts them back first"
  echo "-x" >>"$policy/domains/appDom"
  load_whole
  exits 1
  [[ $stderr =~ "secpolicy: load: a load before this one was killed, so "[0-9]+" file labels were put back first" ]]
  [[ ! -e $root/run/secpolicy/labels.undo ]]
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a label that cannot be taken back of a load that was killed is told" {
  break_labels die settings
  load_broken
  exits 137
  break_labels fail services.conf
  load_broken
  says "Error: Unable to put the label back of /etc/services.conf: Input/output error"
}

@test "a plain load that is killed while it gives labels has not ended well" {
  break_labels die settings
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load /new
  exits 137
  secpolicy display
  [[ $output == *newDom* ]]
  secpolicy status
  exits 1
  shows "             Not all files have their labels: the load still gives them, or was killed"
  ends_with "secpolicy: status: the latest load did not end well. 'secpolicy --root $root check' shows every problem of the files"
  secpolicy load /new
  is_done load
  secpolicy status
  exits 0
}

@test "a label that is no identifier is put back too" {
  python3 - "$root/etc/services.conf" <<'END'
import os, sys
for name in os.listxattr(sys.argv[1]):
    if "zorvan" in name:
        os.setxattr(sys.argv[1], name, b"a\0 label of its own")
END
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels fail settings
  load_broken
  exits 1
  ends_with "secpolicy: load: failed (1 problem above); nothing was installed"
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a load whose messages nobody reads is undone" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels fail settings
  # The message about the label meets a pipe that nobody reads.
  run python3 - "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new <<'END'
import os, signal, subprocess, sys
reader, writer = os.pipe()
os.close(reader)
sys.exit(abs(subprocess.run(sys.argv[1:], stderr=writer).returncode))
END
  [[ $status -ne 0 ]]
  # Takes the journals of the databases away.
  secpolicy status
  secpolicy settings option /None
  # The next load makes the index of labels anew.
  everything | diff <(grep -vE '/(labels.index|plans/.current) ' "$BATS_TEST_TMPDIR/before") -
}

@test "a load that cannot be written takes its labels back" {
  # More than the state may grow by.
  local number
  for number in {1..2000}; do echo "-p bind_port $number grant"; done >>"$policy/domains/newDom"
  everything >"$BATS_TEST_TMPDIR/before"
  run --separate-stderr bash -c "trap '' XFSZ; ulimit -f 64; exec \"\$@\"" limited \
    "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 1
  ends_with "secpolicy: load: Unable to use the host state /run/secpolicy/host.db: disk I/O error (1 error above); nothing was installed"
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a load that is asked to end while it gives labels ends whole" {
  local signal
  for signal in HUP INT QUIT TERM; do
    break_labels "$signal" settings
    run --separate-stderr python3 - "${breakage[@]}" "$SECPOLICY" --root "$root" \
      load --all-or-nothing /new <<'PYTHON'
import resource, subprocess, sys
resource.setrlimit(resource.RLIMIT_CORE, (0, 0))
sys.exit(subprocess.run(sys.argv[1:]).returncode != 0)
PYTHON
    exits 1
    [[ ! -e $root/run/secpolicy/labels.undo ]]
    secpolicy load --plan /new
    [[ -z $output && $stderr == "secpolicy: load: nothing would change" ]]
    secpolicy load
  done
}

@test "a load labels the place that it works in" {
  mkdir -p "$root/tmp"
  touch "$root/tmp/file"
  boot
  echo "/tmp/* hostConfig" >>"$policy/fileLabels/zz"
  run --separate-stderr env TMPDIR=/tmp "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 0
  [[ $(ls -A "$root/tmp") == file ]]
}

@test "where nothing was installed, nothing is afterwards" {
  # The log of the kernel tells what was tried, and stays.
  everything >"$BATS_TEST_TMPDIR/labels"
  # What the host remembers of tardisks goes with the state.
  rm -r "$root/run/secpolicy/"* "$root/etc/zorvan/secpolicy/tardisks/"*
  (cd "$root" && find . ! -name kernel.log | sort) >"$BATS_TEST_TMPDIR/before"
  break_labels fail settings
  load_broken
  exits 1
  says "Error: Unable to label /var/lib/vms/demo/settings: Input/output error"
  (cd "$root" && find . ! -name kernel.log | sort) | diff "$BATS_TEST_TMPDIR/before" -
  local labelled="^$root/(usr|var)/.*zorvan"
  grep -cE "$labelled" "$BATS_TEST_TMPDIR/labels"
  diff <(grep -E "$labelled" "$BATS_TEST_TMPDIR/labels") <(everything | grep -E "$labelled")
}

@test "it does not go with --plan, nor without a directory" {
  secpolicy load --plan --all-or-nothing
  wrong_usage load "--plan excludes --all-or-nothing"
  secpolicy load --all-or-nothing /no/such
  exits 1
  [[ $stderr == "secpolicy: load: there is no directory /no/such below this root, so nothing was changed. Name the directory of the policy, or the root that it is in (--root DIR)." ]]
}
