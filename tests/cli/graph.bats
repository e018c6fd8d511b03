# secpolicy graph: the same picture for the same policy, odd names escaped, long lists cut.

load helper

@test "the graph of the example is the one in the documentation" {
  boot
  secpolicy graph
  exits 0
  [[ -z $stderr ]]
  diff "$SOURCE/docs/graph.dot" - <<<"$output"
}

@test "the picture in the documentation shows what its graph says" {
  # Graphviz names what it draws: "sshDom", "hostDom&#45;&gt;sshDom".
  diff <(grep -o '<title>.*</title>' "$SOURCE/docs/graph.svg" |
    sed 's|</*title>||g; s/&#45;/-/g; s/&gt;/>/; 1d' | sort) \
    <(sed -n 's/^  "\([^"]*\)" -> "\([^"]*\)".*/\1->\2/p; t; s/^  "\([^"]*\)".*/\1/p' "$SOURCE/docs/graph.dot" | sort)
}

@test "the same policy gives the same graph, however often it is loaded" {
  boot
  "$SECPOLICY" --root "$root" load 2>/dev/null
  "$SECPOLICY" --root "$root" load-early 2>/dev/null
  secpolicy graph
  diff "$SOURCE/docs/graph.dot" - <<<"$output"
  secpolicy graph --domain hostDom
  local before=$output
  "$SECPOLICY" --root "$root" load 2>/dev/null
  secpolicy graph --domain hostDom
  [[ $output == "$before" ]]
}

@test "a transition that is revoked is no arrow, and a level shows" {
  echo "-d hostProgram sshDom exec revoke" >>"$policy/domains/appDom"
  boot
  "$SECPOLICY" --root "$root" settings enforcement sshDom disabled
  "$SECPOLICY" --root "$root" settings enforcement hostDom enforcing
  "$SECPOLICY" --root "$root" restore 2>/dev/null
  secpolicy graph
  [[ $output != *'"appDom" ->'* ]]
  shows '  "sshDom" [label="sshDom\n(disabled)", style="rounded,dotted"]'
  shows '  "hostDom"'
}

@test "--domain draws one domain with what it may reach" {
  boot
  secpolicy graph --domain sshDom
  answers 0 'digraph secpolicy {' \
    '  rankdir=LR' \
    '  node [shape=box, style=rounded, fontname="sans-serif"]' \
    '  edge [fontname="sans-serif", fontsize=10]' \
    '  "all capabilities" [label="capabilities\ncap_net_bind_service\ncap_setgid\ncap_setuid\ncap_sys_chroot", shape="note", style="solid"]' \
    '  "all parameter checks" [label="parameter checks\nbind_port 0\nbind_port 22", shape="note", style="solid"]' \
    '  "all system calls" [label="system calls\n@file\n@io\n@process\n@signal\n@start\naccept\naccept4\nbind\nlisten\nsocket", shape="note", style="solid"]' \
    '  "all unix sockets" [label="unix sockets\nsshSocket seqpacket", shape="note", style="solid"]' \
    '  "hostDom" [label="hostDom\n(permissive)", style="rounded,dashed"]' \
    '  "object sshKey" [label="sshKey", shape="ellipse", style="solid"]' \
    '  "object sshProgram" [label="sshProgram", shape="ellipse", style="solid"]' \
    '  "path /bin" [label="/bin", shape="folder", style="solid"]' \
    '  "path /etc/ssh" [label="/etc/ssh", shape="folder", style="solid"]' \
    '  "path /usr/sbin/sshd" [label="/usr/sbin/sshd", shape="folder", style="solid"]' \
    '  "sshDom"' \
    '  "sshDom" -> "all capabilities"' \
    '  "sshDom" -> "all parameter checks"' \
    '  "sshDom" -> "all system calls"' \
    '  "sshDom" -> "all unix sockets"' \
    '  "sshDom" -> "hostDom" [label="hostProgram, exec"]' \
    '  "sshDom" -> "object sshKey" [label="read"]' \
    '  "sshDom" -> "object sshProgram" [label="execute"]' \
    '  "sshDom" -> "path /bin" [label="rx"]' \
    '  "sshDom" -> "path /etc/ssh" [label="r"]' \
    '  "sshDom" -> "path /usr/sbin/sshd" [label="rx"]' \
    '}'
}

@test "of a long list the first are drawn" {
  printf -- '-s %s grant\n' bind listen accept4 dup dup2 dup3 pipe pipe2 kill chdir >>"$policy/domains/appDom"
  boot
  secpolicy graph --domain appDom
  [[ $output == *'[label="system calls\n@file\n@io\n@start\naccept4\nbind\nchdir\nconnect\ndup\ndup2\ndup3\nkill\nlisten\nand 3 more"'* ]]
}

@test "a path of any letters is escaped, and one without permissions is not reached" {
  printf -- '-r /odd"\\\033ü r\n-r /never\n' >>"$policy/domains/appDom"
  boot
  secpolicy graph --domain appDom
  exits 0
  shows '  "path /odd\"\\^[ü" [label="/odd\"\\^[ü", shape="folder", style="solid"]'
  [[ $output != *never* ]]
  secpolicy graph --domain appDom --format svg
  exits 0
}

@test "--format svg draws with the Graphviz of the system, also below a root" {
  boot
  secpolicy graph --format svg
  exits 0
  [[ $output == *"<svg "*"</svg>" ]]
  [[ $output == *"<title>sshDom</title>"* ]]
  [[ ! -e $root/usr/bin/dot ]]
}

@test "without Graphviz, and with one that fails, the message says what to do" {
  boot
  mkdir "$BATS_TEST_TMPDIR/bin"
  run --separate-stderr env PATH="$BATS_TEST_TMPDIR/bin" "$SECPOLICY" --root "$root" graph --format svg
  exits 1
  [[ $stderr == "secpolicy: graph: Graphviz, which draws the picture, is not installed: apt-get install graphviz. 'secpolicy graph' without --format svg needs no Graphviz" ]]
  printf '#!/bin/sh\nexit 3\n' >"$BATS_TEST_TMPDIR/bin/dot"
  chmod +x "$BATS_TEST_TMPDIR/bin/dot"
  run --separate-stderr env PATH="$BATS_TEST_TMPDIR/bin" "$SECPOLICY" --root "$root" graph --format svg
  exits 1
  [[ $stderr == "secpolicy: graph: Graphviz could not draw the picture" ]]
}

@test "an unknown domain and an unknown format are wrong usage" {
  boot
  secpolicy graph --domain sshdom
  wrong_usage graph "graph: there is no domain 'sshdom'; did you mean 'sshDom'?"
  secpolicy graph --format png
  wrong_usage graph "--format: there is no 'png'; there are dot and svg"
}

@test "a domain is drawn by its number as by its name" {
  boot
  secpolicy graph --domain sshDom
  exits 0
  local by_name=$output
  secpolicy graph --domain "$(domain_id sshDom)"
  [[ $output == "$by_name" && $output == *sshDom* ]]
}
