# secpolicy load --all-or-nothing

load helper

setup() {
  root=$BATS_TEST_TMPDIR/root
  policy=$root/new
  "$SOURCE/scripts/pack-example" "$root"
  boot
  cp -r "$root/etc/zorvan/secpolicy" "$policy"
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

# break_labels HOW PATH [CALL]: from now on the kernel's answer to the second label of PATH, or to
# the one that CALL counts to, is HOW: "fail", "die", or the name of a signal that then comes to the
# command; PATH "*" is any file. A rehearsal gives no labels, so it does not notice.
break_labels() {
  cat >"$BATS_TEST_TMPDIR/break.c" <<'END'
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <signal.h>
#include <string.h>
#include <stdlib.h>
#include <sys/types.h>
#include <unistd.h>
int setxattr(const char* path, const char* name, const void* value, size_t size, int flags) {
  static int calls = 0;
  const char* wanted = getenv("BREAK_PATH");
  const int isWanted = strcmp(wanted, "*") == 0 || strcmp(path, wanted) == 0;
  if (isWanted && ++calls == atoi(getenv("BREAK_CALL"))) {
    const int signal = atoi(getenv("BREAK_SIGNAL"));
    if (signal != 0) {
      kill(getppid(), signal);
      usleep(100000);
      return 0;
    }
    if (strcmp(getenv("BREAK_HOW"), "die") == 0) {
      kill(getppid(), SIGINT);
      kill(getpid(), SIGKILL);
    }
    errno = EIO;
    return -1;
  }
  int (*really)(const char*, const char*, const void*, size_t, int) = dlsym(RTLD_NEXT, "setxattr");
  return really(path, name, value, size, flags);
}
END
  cc -shared -fPIC -o "$BATS_TEST_TMPDIR/break.so" "$BATS_TEST_TMPDIR/break.c"
  breakage=(env "LD_PRELOAD=$BATS_TEST_TMPDIR/break.so" "BREAK_HOW=$1" "BREAK_PATH=$2"
    "BREAK_CALL=${3:-2}" "BREAK_SIGNAL=$(kill -l "$1" 2>/dev/null || true)"
    ASAN_OPTIONS=detect_leaks=0:verify_asan_link_order=0)
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
  ends_with "secpolicy: load: nothing was changed: this was the rehearsal. Without --all-or-nothing, a load installs what has no errors."
  everything | diff "$BATS_TEST_TMPDIR/before" -
  local rehearsed=${stderr%$'\n'*}
  secpolicy load /new
  [[ $rehearsed == "$(grep -v '^installed now: ' <<<"$stderr")" ]]
}

@test "a load that would be stopped changes nothing" {
  rm "$root/run/secpolicy/"* "$policy/domains/ioFilterDom"
  sed -i '/ioFilterDom/d' "$policy/domains/"*Dom
  load_whole
  exits 3
  says "Error: Failed to fetch domainID for IOFilter domain"
  [[ ! -e $root/run/secpolicy/host.db ]]
}

@test "a load that fails on the way is undone, labels and numbers included" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels fail /var/lib/vms/demo/settings
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 1
  says "Error: /new/fileLabels/zz:3 : Unable to set file label (newObject) for file /var/lib/vms/demo/settings: Input/output error"
  ends_with "secpolicy: load: failed on the way, so everything was put back as it was (the state, and 2 file labels)"
  everything | diff "$BATS_TEST_TMPDIR/before" -
  # The same failure leaves a plain load half done.
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load /new
  exits 1
  everything >"$BATS_TEST_TMPDIR/half"
  run diff -q "$BATS_TEST_TMPDIR/before" "$BATS_TEST_TMPDIR/half"
  exits 1
}

@test "a load that is killed on the way is undone, also when the command is interrupted" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels die /usr/bin/supervise
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 1
  # The command passes the interrupt on, and may be the first to reach the load.
  [[ $stderr =~ ^"secpolicy: load: the load died: "(Killed|Interrupt)"
secpolicy: load: failed on the way, so everything was put back as it was (the state, and 1 file label)"$ ]]
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a load that is killed between two labels of one file is undone" {
  everything >"$BATS_TEST_TMPDIR/before"
  local call
  for call in 6 12 20; do
    break_labels die "*" "$call"
    run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing
    exits 1
    [[ $stderr =~ "the load died: "(Killed|Interrupt) ]]
    everything | diff "$BATS_TEST_TMPDIR/before" -
  done
}

@test "a label that is no identifier is put back too" {
  python3 - "$root/etc/services.conf" <<'END'
import os, sys
for name in os.listxattr(sys.argv[1]):
    if "zorvan" in name:
        os.setxattr(sys.argv[1], name, b"a\0 label of its own")
END
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels die /usr/bin/supervise
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 1
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a load whose messages nobody reads is undone" {
  everything >"$BATS_TEST_TMPDIR/before"
  break_labels fail /var/lib/vms/demo/settings
  # The message about the label meets a pipe that nobody reads.
  run python3 - "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new <<'END'
import os, subprocess, sys
reader, writer = os.pipe()
os.close(reader)
sys.exit(subprocess.run(sys.argv[1:], stderr=writer).returncode)
END
  exits 1
  everything | diff "$BATS_TEST_TMPDIR/before" -
}

@test "a load is undone when the command alone is asked to end" {
  everything >"$BATS_TEST_TMPDIR/before"
  local signal
  for signal in HUP INT QUIT TERM; do
    break_labels "$signal" /var/lib/vms/demo/settings
    run --separate-stderr python3 - "${breakage[@]}" "$SECPOLICY" --root "$root" \
      load --all-or-nothing /new <<'PYTHON'
import resource, subprocess, sys
resource.setrlimit(resource.RLIMIT_CORE, (0, 0))
sys.exit(subprocess.run(sys.argv[1:]).returncode)
PYTHON
    exits 1
    ends_with "secpolicy: load: failed on the way, so everything was put back as it was (the state, and 2 file labels)"
    everything | diff "$BATS_TEST_TMPDIR/before" -
  done
}

@test "what the command ignores does not end the load" {
  break_labels HUP /var/lib/vms/demo/settings
  run --separate-stderr nohup "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 0
}

@test "what has changed after the rehearsal is not undone" {
  cp -r "$root/etc/zorvan/secpolicy" "$root/other"
  touch "$root/other/domains/betweenDom"
  cat >"$BATS_TEST_TMPDIR/pause.c" <<'END'
#define _GNU_SOURCE
#include <dlfcn.h>
#include <stdlib.h>
#include <sys/types.h>
#include <unistd.h>
// Tells when the first child, the rehearsal, has ended, and waits for an answer.
pid_t waitpid(pid_t child, int* status, int options) {
  static int calls = 0;
  pid_t (*really)(pid_t, int*, int) = dlsym(RTLD_NEXT, "waitpid");
  const pid_t result = really(child, status, options);
  char answer = 0;
  if (++calls == 1 && (write(atoi(getenv("PAUSE_TELL")), "x", 1) != 1 ||
                       read(atoi(getenv("PAUSE_WAIT")), &answer, 1) != 1)) abort();
  return result;
}
END
  cc -shared -fPIC -o "$BATS_TEST_TMPDIR/pause.so" "$BATS_TEST_TMPDIR/pause.c"
  break_labels fail /var/lib/vms/demo/settings
  breakage[1]+=:$BATS_TEST_TMPDIR/pause.so
  run --separate-stderr python3 - "$SECPOLICY" "$root" "${breakage[@]}" <<'END'
import os, subprocess, sys
command, root, *breakage = sys.argv[1:]
told, tell = os.pipe()
wait, go = os.pipe()
load = subprocess.Popen(
    breakage + [f"PAUSE_TELL={tell}", f"PAUSE_WAIT={wait}", command, "--root", root, "load",
                "--all-or-nothing", "/new"], pass_fds=(tell, wait))
os.read(told, 1)
subprocess.run([command, "--root", root, "load", "/other"], check=True)
os.write(go, b"x")
sys.exit(load.wait())
END
  exits 1
  [[ $stderr == *"everything was put back as it was"* ]]
  secpolicy display
  [[ $output == *"Domain Name: betweenDom "* && $output != *newDom* ]]
}

@test "a load labels the place that it works in" {
  mkdir -p "$root/tmp"
  touch "$root/tmp/file"
  boot
  echo "/tmp/* hostConfig" >>"$policy/fileLabels/zz"
  run --separate-stderr env TMPDIR=/tmp "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 0
  [[ -z $(ls -A "$root/tmp" | grep -v '^file$') ]]
}

@test "where nothing was installed, nothing is afterwards" {
  # The log of the kernel tells what was tried, and stays.
  everything >"$BATS_TEST_TMPDIR/labels"
  # What the host remembers of tardisks goes with the state.
  rm "$root/run/secpolicy/"* "$root/etc/zorvan/secpolicy/tardisks/"*
  (cd "$root" && find . ! -name kernel.log | sort) >"$BATS_TEST_TMPDIR/before"
  break_labels fail /var/lib/vms/demo/settings
  run --separate-stderr "${breakage[@]}" "$SECPOLICY" --root "$root" load --all-or-nothing /new
  exits 1
  [[ ${stderr##*$'\n'} == *" everything was put back as it was (the state, and "* ]]
  (cd "$root" && find . ! -name kernel.log | sort) | diff "$BATS_TEST_TMPDIR/before" -
  local labelled="^$root/(usr|var)/.*zorvan"
  grep -cE "$labelled" "$BATS_TEST_TMPDIR/labels"
  diff <(grep -E "$labelled" "$BATS_TEST_TMPDIR/labels") <(everything | grep -E "$labelled")
}

@test "it does not go with --plan, nor without a directory" {
  secpolicy load --plan --all-or-nothing
  exits 2
  secpolicy load --all-or-nothing /no/such
  exits 1
  [[ $stderr == "secpolicy: load: there is no directory /no/such below this root, so nothing was changed. "* ]]
}
