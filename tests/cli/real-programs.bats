# Programs of Debian, each watched, then confined by what was proposed: hunts for proposals by which a
# program does not do its work, or by which it does more. They run in a root with the programs of this
# machine, whose own root is neither labelled nor confined.

load helper
load small_root

setup_file() {
  copy_programs
}

setup() {
  needs_landlock
  started=()
  lay_out_root dev proc usr tmp run srv/{app,out} root
  has_places usr proc dev
  chmod 1777 "$root/tmp"
  ln -s usr/bin usr/lib usr/lib64 usr/sbin "$root"
  cp -r --dereference /etc/{ld.so.cache,nsswitch.conf,hosts,ssl/openssl.cnf} "$root/etc"
  mkdir "$root/etc/ssl"
  mv "$root/etc/openssl.cnf" "$root/etc/ssl"
  printf '%s\n' root:x:0:0::/root:/bin/bash nobody:x:65534:65534::/:/bin/sh >"$root/etc/passwd"
  echo /bin/bash >"$root/etc/shells"
  printf '%s\n' root:x:0: nogroup:x:65534: >"$root/etc/group"
  : >"$policy/domains/openDom"
  echo 'nobody has to know' >"$root/srv/secret"
}

teardown() {
  local process
  for process in "${started[@]}"; do
    kill -KILL "$process" && wait "$process" || true
  done 2>/dev/null
}

# ---- The root, and who works in it

# is_root, is_nobody: whose programs they are.
is_root() {
  [[ $(id -u) -eq 0 ]] || skip "this is what root does"
  works_as ""
  boots
}

is_nobody() {
  if [[ $(id -u) -eq 0 ]]; then works_as 65534; else works_as ""; fi
  boots
}

boots() {
  boot_root
  refuses_nothing openDom
}

# secpolicy VERB...: where the root has nothing of this machine in it: to boot is to label all that there
# is.
secpolicy() {
  run --separate-stderr "${as[@]}" "$programs/secpolicy" --root "$root" "$@"
}

# within_a_minute VERB...: the same with programs, processes and devices of this machine below the root,
# for verbs that label nothing.
within_a_minute() {
  inside timeout 60 "$programs/secpolicy" --root "$root" "$@"
}

# beside_programs VERB...: does that, and keeps $status, $output and $stderr.
beside_programs() {
  run --separate-stderr within_a_minute "$@"
}

# ---- From a run to a policy

# is_policy DOMAIN: what was proposed for it is one, and this kernel keeps to all of it.
is_policy() {
  beside_programs check --werror --disable unreachable-domain
  exits 0
  secpolicy load
  exits 0
  beside_programs features --for "$1"
  exits 0
}

# proposes DOMAIN CMD...: the command does its work while it is watched, and what is proposed becomes a
# domain.
proposes() {
  beside_programs observe --write "/etc/zorvan/secpolicy/domains/$1" -- "${@:2}"
  exits 0
  is_policy "$1"
}

# has_rule DOMAIN RULE: it was proposed, for whatever reason.
has_rule() {
  has_line "$(sed 's/   #.*//' "$policy/domains/$1")" "$2"
}

confined() { beside_programs run "$@"; }

# Refuses nothing, so that what else may fail is seen.
unconfined() { beside_programs run openDom -- "$@"; }

# ---- Bash

lay_out_bash() {
  cat >"$root/srv/count" <<'SCRIPT'
#!/bin/bash
set -e
sort /srv/words | uniq -c | while read -r count word; do echo "$word $count"; done >/srv/out/counts
draft=$(mktemp)
trap 'rm -f "$draft"' EXIT
{ cat /srv/out/counts; echo "of $(id -un)"; } >"$draft"
cp "$draft" /srv/out/report
rm "$draft"
[[ -z $1 ]] || echo "$(<"$1")"
SCRIPT
  chmod +x "$root/srv/count"
  printf '%s\n' one two one >"$root/srv/words"
}

# bash_keeps_to_its_rules USER: the script does its work in its domain, and reads nothing else.
bash_keeps_to_its_rules() {
  proposes countDom /srv/count
  rm "$root"/srv/out/*
  confined countDom -- /srv/count
  exits 0
  [[ $(<"$root/srv/out/report") == "one 2"$'\n'"two 1"$'\n'"of $1" && -z $(ls "$root/tmp") ]]
  confined countDom -- /srv/count /srv/secret
  exits 1
  [[ -z $output && $stderr == *"/srv/secret: Permission denied" ]]
  unconfined /srv/count /srv/secret
  exits 0
  [[ $output == "nobody has to know" ]]
}

@test "bash, as root" {
  lay_out_bash
  is_root
  # Which takes a capability that nobody sees.
  chown 65534:65534 "$root/srv/words"
  chmod 600 "$root/srv/words"
  bash_keeps_to_its_rules root
  has_rule countDom '-c cap_dac_read_search grant'
}

@test "bash, as an ordinary user" {
  lay_out_bash
  is_nobody
  bash_keeps_to_its_rules nobody
  run ! grep -q '^-c' "$policy/domains/countDom"
}

# ---- Python

lay_out_python() {
  cat >"$root/srv/app/convert" <<'SCRIPT'
#!/usr/bin/python3
import hashlib, json, os, ssl, sys, tempfile

facts = json.load(open("/srv/facts"))
facts["tls"] = ssl.create_default_context().check_hostname
facts["sum"] = hashlib.sha256(json.dumps(facts).encode()).hexdigest()[:4]
with tempfile.NamedTemporaryFile("w", dir="/srv/out", delete=False) as draft:
    json.dump(facts, draft)
os.replace(draft.name, "/srv/out/facts")
for name in sys.argv[1:]:
    print(open(name).read(), end="")
SCRIPT
  chmod +x "$root/srv/app/convert"
  echo '{"lines": 3}' >"$root/srv/facts"
}

python_keeps_to_its_rules() {
  proposes convertDom /srv/app/convert
  rm "$root"/srv/out/*
  confined convertDom -- /srv/app/convert
  exits 0
  [[ $(jq -c '[.lines, .tls]' "$root/srv/out/facts") == "[3,true]" && $(ls "$root/srv/out") == facts ]]
  confined convertDom -- /srv/app/convert /srv/secret
  exits 1
  [[ -z $output && $stderr == *"PermissionError: [Errno 13] Permission denied: '/srv/secret'" ]]
  unconfined /srv/app/convert /srv/secret
  exits 0
  [[ $output == "nobody has to know" ]]
}

@test "python, as root" {
  lay_out_python
  is_root
  python_keeps_to_its_rules
}

@test "python, as an ordinary user" {
  lay_out_python
  is_nobody
  python_keeps_to_its_rules
}

# ---- curl

# serve: a server below which $port and $another answer.
serve() {
  port=$((20000 + BASHPID % 20000))
  another=$((port + 1))
  mkdir "$BATS_TEST_TMPDIR/pages"
  echo 'a page' >"$BATS_TEST_TMPDIR/pages/page"
  local each
  for each in "$port" "$another"; do
    python3 -m http.server --bind 127.0.0.1 --directory "$BATS_TEST_TMPDIR/pages" "$each" >/dev/null 2>&1 3>&- &
    started+=("$!")
    until_true "curl --silent --output /dev/null http://127.0.0.1:$each/"
  done
}

fetch=(curl --silent --show-error --output /srv/out/page)

curl_keeps_to_its_rules() {
  proposes fetchDom "${fetch[@]}" "http://127.0.0.1:$port/page"
  has_rule fetchDom "-p connect_port $port grant"
  rm "$root/srv/out/page"
  confined fetchDom -- "${fetch[@]}" "http://127.0.0.1:$port/page"
  exits 0
  [[ $(<"$root/srv/out/page") == "a page" ]]
  confined fetchDom -- "${fetch[@]}" "http://127.0.0.1:$another/page"
  exits 7
  unconfined "${fetch[@]}" "http://127.0.0.1:$another/page"
  exits 0
  confined fetchDom -- "${fetch[@]}" file:///srv/secret
  exits 37
  unconfined "${fetch[@]}" file:///srv/secret
  exits 0
  [[ $(<"$root/srv/out/page") == "nobody has to know" ]]
}

@test "curl, as root" {
  serve
  is_root
  curl_keeps_to_its_rules
}

@test "curl, as an ordinary user" {
  serve
  is_nobody
  curl_keeps_to_its_rules
}

# ---- A daemon: a server of secure shells

lay_out_sshd() {
  port=$((20000 + BASHPID % 20000))
  another=$((port + 1))
  dropbearkey -t ed25519 -f "$root/etc/host_key" >/dev/null 2>&1
  mkdir -m 700 "$root/root/.ssh"
  dropbearkey -t ed25519 -f "$BATS_TEST_TMPDIR/key" 2>/dev/null | grep ^ssh- >"$root/root/.ssh/authorized_keys"
  echo 'to be read' >"$root/srv/note"
}

sshd=(/usr/sbin/dropbear -F -E -s -r /etc/host_key -P /run/sshd.pid)

# starts WORD...: the server, by these words of the command, until it waits at $port.
starts() {
  rm -f "$root/run/sshd.pid"
  within_a_minute "$@" -- "${sshd[@]}" -p "127.0.0.1:$port" \
    >"$BATS_TEST_TMPDIR/told" 2>&1 3>&- &
  server=$!
  started+=("$server")
  until_true '[[ -s $root/run/sshd.pid ]]'
}

# ends: the server is asked to.
ends() {
  kill "$(<"$root/run/sshd.pid")"
  wait "$server" || true
}

# in_session COMMAND: what becomes of it there.
in_session() {
  run --separate-stderr env HOME="$BATS_TEST_TMPDIR" timeout 60 \
    dbclient -T -y -y -i "$BATS_TEST_TMPDIR/key" -p "$port" root@127.0.0.1 "$1"
}

@test "a server of secure shells, as root" {
  is_root
  lay_out_sshd
  work='read -r note </srv/note; echo "$note, and read" | cat >/srv/out/note'
  starts observe --write /etc/zorvan/secpolicy/domains/sshDom
  in_session "$work"
  exits 0
  ends
  is_policy sshDom
  has_rule sshDom "-p bind_port $port grant"

  rm "$root/srv/out/note"
  starts run sshDom
  in_session "$work"
  exits 0
  [[ $(<"$root/srv/out/note") == "to be read, and read" ]]
  in_session 'cat /srv/secret'
  exits 1
  [[ -z $output && $stderr == *"/srv/secret: Permission denied"* ]]
  ends
  confined sshDom -- "${sshd[@]}" -p "127.0.0.1:$another"
  exits 1
  [[ $stderr == *"Permission denied"* ]]

  starts run openDom
  in_session 'cat /srv/secret'
  exits 0
  [[ $output == "nobody has to know" ]]
  ends
}
