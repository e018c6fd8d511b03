# Programs that are confined and start others in another domain by the broker that is kept for them:
# what they get, and what they are told where they get nothing. Hunts for a way to more than the -d
# rules of the domain that asks.
#
# ESCAPE_AS is the number of an ordinary user whose programs ask, when root starts this.

load helper
load small_root

setup_file() {
  copy_programs "$PROBE"
}

# /t/public is what askDom reads; /t/secret is what takes secretDom, which /t/secret/program enters.
setup() {
  needs_landlock
  works_as "$ESCAPE_AS"
  lay_out_root
  lay_out_two_places
  cp "$programs/secpolicy-run" "$root/ask"
  domain askDom "${asking[@]}" '-d secret secretDom exec grant'
  domain secretDom "${calls[@]}" '-r /t/secret rwx'
}

calls=('-s @start grant' '-s @file grant' '-s @io grant' '-s @process grant' '-s @signal grant' '-s @clock grant')
asking=("${calls[@]}" '-s sendmsg grant' '-r /ask rx' '-r /probe rx' '-r /t/public rx')

# domain NAME RULE...
domain() {
  printf '%s\n' "${@:2}" >"$policy/domains/$1"
}

secpolicy() {
  run --separate-stderr "${as[@]}" "$programs/secpolicy" --root "$root" "$@"
}

# asks WORD...: from within askDom.
asks() {
  secpolicy run askDom -- /ask --ask -- "$@"
}

@test "a program enters the domain that its label leads to, from within another" {
  boot_root
  secpolicy run askDom -- /probe read=/t/secret/file run=/t/secret/program read=/t/public/file
  answers 0 'read=/t/secret/file EACCES' 'run=/t/secret/program EACCES' 'read=/t/public/file ok'
  asks /t/secret/program read=/t/secret/file read=/t/public/file write=/t/secret/file
  answers 0 'read=/t/secret/file ok' 'read=/t/public/file EACCES' 'write=/t/secret/file ok'
}

@test "a script is started by its interpreter, with its arguments" {
  # shellcheck disable=SC2016
  printf '#!/t/secret/program read=/t/secret/file\n' >"$root/t/secret/script"
  chmod +x "$root/t/secret/script"
  ln -s secret/script "$root/t/link"
  boot_root
  asks /t/link read=/t/public/file
  answers 0 'read=/t/secret/file ok' '/t/secret/script is no operation' 'read=/t/public/file EACCES'
}

@test "a program is found by PATH, from the working directory, and gets its name" {
  boot_root
  local who=("${as[@]}")
  as=("${who[@]}" env PATH=/t/public:/t/secret)
  asks program read=/t/secret/file
  exits 126
  [[ $stderr == *"no rule leads from askDom to another domain by /t/public/program, and what stays in the domain needs no broker; nothing was started" ]]
  as=("${who[@]}" env PATH=/nowhere:/t/secret)
  asks program read=/t/secret/file
  answers 0 'read=/t/secret/file ok'
  as=("${who[@]}")
  asks t/secret/program read=t/secret/file
  answers 0 'read=t/secret/file ok'
  run -127 --separate-stderr "${as[@]}" "$programs/secpolicy" --root "$root" run askDom -- /ask --ask -- /nowhere/program
  [[ $stderr == "secpolicy-run: there is no program /nowhere/program" ]]
}

# waits: somebody has to do with a program that waits for ever.
waits() {
  grep -qsaF wait-for=/t/secret/never /proc/[0-9]*/cmdline
}

# is_permissive DOMAIN
is_permissive() {
  secpolicy settings enforcement "$1" permissive
  exits 0
  secpolicy restore
  exits 0
}

# ends_by SIGNAL...: who asks is sent it, and ends as the program does, which ends, too.
ends_by() {
  local signal process status
  for signal; do
    "${as[@]}" "$programs/secpolicy" --root "$root" run askDom -- /ask --ask -- \
      /t/secret/program getppid wait-for=/t/secret/never >"$BATS_TEST_TMPDIR/$signal" 3>&- &
    process=$!
    until_true '[[ $(cat "$BATS_TEST_TMPDIR/$signal") == getppid* ]]'
    waits
    kill -s "$signal" "$process"
    status=0
    wait "$process" || status=$?
    [[ $status -eq $((128 + $(kill -l "$signal"))) ]]
    until_true '! waits'
  done
}

@test "the exit status is that of the program, and it gets the signals of who asked" {
  cp "$programs/secpolicy-run" "$root/t/secret/run"
  boot_root
  asks /t/secret/run --plan nothing -- true
  exits 126
  [[ $stderr == "secpolicy-run: cannot open the plan nothing: "* ]]
  asks /t/secret/program wait-for=/t/secret/file read=/t/secret/file
  answers 0 'wait-for=/t/secret/file ok' 'read=/t/secret/file ok'
  ends_by TERM KILL
}

@test "so it is where the domain that is entered is permissive" {
  boot_root
  is_permissive secretDom
  asks /t/secret/program wait-for=/t/secret/file read=/t/public/file
  answers 0 'wait-for=/t/secret/file ok' 'read=/t/public/file ok'
  says "secpolicy: exec: secretDom would be refused: read /t/public/file"
  ends_by TERM KILL
}

@test "the program has the environment of who entered the first domain, but for the terminal" {
  cp /bin/busybox "$root/t/public"
  cp /bin/busybox "$root/t/secret"
  boot_root
  as+=(env -i "PATH=$PATH" TERM=outside HELLO=outside SECPOLICY_BROKER=7)
  secpolicy run askDom -- /t/public/busybox env TERM=inside LANG=/etc LC_ALL=C HELLO=inside LD_PRELOAD=/t/public/file \
    SECPOLICY_HOST_STATE=/t/public/state PATH=/t/public BASH_ENV=/t/public/file /ask --ask -- /t/secret/busybox env
  exits 0
  output=$(sort <<<"$output")
  answers 0 HELLO=outside LC_ALL=C "PATH=$PATH" TERM=inside
}

@test "so it has in a permissive domain, where nothing is refused" {
  cp /bin/busybox "$root/t/public"
  cp /bin/busybox "$root/t/secret"
  boot_root
  is_permissive secretDom
  as+=(env -i "PATH=$PATH" TERM=outside HELLO=outside SECPOLICY_BROKER=7)
  secpolicy run askDom -- /t/public/busybox env TERM=inside HELLO=inside LD_PRELOAD=/t/public/file /ask --ask -- /t/secret/busybox env
  exits 0
  output=$(sort <<<"$output")
  answers 0 HELLO=outside "PATH=$PATH" TERM=inside
}

# Attacks by who may say to the broker what it likes are in tests/enforce/broker_test.cpp.
@test "another program in its place while it is asked for" {
  # Of shells, what runs beside them reads this.
  mkdir "$root/dev"
  : >"$root/dev/null"
  cp /bin/busybox "$root/t/public"
  cp "$root/ask" "$root/t/secret/version"
  domain askDom "${asking[@]}" '-r /t/public rwx' '-r /dev/null r' '-d secret secretDom exec grant'
  domain secretDom "${calls[@]}" '-r /t rx'
  boot_root
  # It may make links in /t/public, to what leads to the other domain and to what does not.
  # shellcheck disable=SC2016
  secpolicy run askDom -- /t/public/busybox sh -c '
    cd /t/public
    ( while :; do ln -sf /t/secret/version link; ln -sf /t/public/program link; done ) 2>&- &
    for tens in 0 1 2; do
      for _ in 0 1 2 3 4 5 6 7 8 9; do /ask --ask -- ./link --version; done
    done
    kill $!'
  # The probe would say that this is no operation.
  [[ $output == *"secpolicy-run "* && $output != *"no operation"* ]]
  [[ $stderr == *"no rule leads from askDom to another domain by /t/public/program"* ]]
}

@test "what is not to be entered is refused" {
  domain otherDom "${calls[@]}"
  printf '%s\n' '-d secret secretDom exec grant' >>"$policy/domains/otherDom"
  domain revokingDom "${asking[@]}" '-d secret secretDom exec grant' '-a secret execute revoke'
  boot_root
  asks /probe
  exits 126
  [[ $stderr == *"no rule leads from askDom to another domain by /probe, "*"nothing was started" ]]
  asks /t/secret/file
  exits 126
  [[ $stderr == *"cannot execute /t/secret/file"* ]]
  secpolicy run revokingDom -- /ask --ask -- /t/secret/program read=/t/secret/file
  exits 126
  [[ $stderr == *"revokingDom may not execute /t/secret/program: $policy/domains/revokingDom:"* ]]
  # It may say the same of a file that 'why' does.
  secpolicy why revokingDom exec /t/secret/program
  exits 1
  secpolicy why askDom exec /t/secret/program
  exits 0
  secpolicy why askDom enter secretDom
  exits 0
}

@test "without the calls that it takes, and where nothing is confined, there is no broker" {
  domain dumbDom "${calls[@]}" '-r /ask rx' '-d secret secretDom exec grant'
  domain openDom "${asking[@]}" '-d secret secretDom exec grant'
  domain staysDom "${asking[@]}"
  boot_root
  secpolicy settings enforcement openDom disabled
  secpolicy restore
  local name
  for name in dumbDom openDom staysDom; do
    secpolicy run "$name" -- /ask --ask -- /t/secret/program read=/t/secret/file
    exits 126
    [[ -z $output && $stderr == "secpolicy-run: there is no broker to ask: "* ]]
  done
  secpolicy features --for dumbDom
  [[ $output == *"-d secret secretDom exec grant (only by \"secpolicy exec\" from outside of the domain, as asking from within takes -s pipe2 and sendmsg)"* ]]
  secpolicy features --for askDom
  [[ $output == *"-d secret secretDom exec grant (only by \"secpolicy exec\")"* ]]
}

@test "the new program is a world of its own domain, and so are those that it asks for" {
  domain secretDom "${asking[@]}" '-r /t/secret rx' '-r /t/public/program rx' '-d public publicDom exec grant'
  domain publicDom "${calls[@]}" '-r /t/public rx'
  boot_root
  asks /ask --ask
  exits 126
  cp "$root/ask" "$root/t/secret/ask"
  asks /t/secret/ask --ask -- /t/public/program read=/t/public/file read=/t/secret/file
  answers 0 'read=/t/public/file ok' 'read=/t/secret/file EACCES'
  # By a way that askDom itself does not have.
  asks /t/public/program read=/t/public/file
  exits 126
}

@test "the command asks, too, where its domain may run it" {
  [[ -z $SANITIZER ]] || skip "the runtime of the sanitizers makes calls of its own"
  local file
  mkdir -p "$root"/{proc,opt}
  cp "$programs/secpolicy" "$programs/secpolicy-run" "$root/opt"
  for file in $(ldd "$SECPOLICY" | grep -o '/[^ ]*'); do install -D "$file" "$root$file"; done
  domain askDom "${asking[@]}" '-s @memory grant' '-d secret secretDom exec grant' \
    '-r /opt rx' '-r /lib rx' '-r /lib64 rx' '-r /proc r'
  boot_root
  # It looks for the launcher beside itself.
  has_places proc
  secpolicy() { run --separate-stderr inside "$programs/secpolicy" --root "$root" "$@"; }
  secpolicy run askDom -- /opt/secpolicy exec -- /t/secret/program read=/t/secret/file read=/t/public/file
  answers 0 'read=/t/secret/file ok' 'read=/t/public/file EACCES'
  secpolicy run askDom -- /opt/secpolicy exec -- /probe getppid
  exits 126
  [[ $stderr == *"no rule leads from askDom to another domain by /probe, "* ]]
  rm "$root/opt/secpolicy-run"
  secpolicy run askDom -- /opt/secpolicy exec -- /t/secret/program getppid
  exits 126
  [[ $stderr == "secpolicy: exec: secpolicy-run, which confines programs, is neither beside "*"; nothing was started" ]]
}
