# secpolicy display

load helper

@test "display shows domains with all eight kinds of rule" {
  boot
  secpolicy display
  exits 0
  [[ $stderr == "secpolicy: display: done" ]]
  shows "Policy set in the kernel"
  for kind in a c d f p r s u; do
    grep -q "^-$kind " <<<"$output"
  done
  shows "-d vmProgram globalVMDom exec grant"
  shows "-p connect_port 1024 65535 grant"
  shows "-r /usr/sbin/sshd rx"
}

@test "display shows objects with their identifiers and tardisks with their labels" {
  boot
  secpolicy display
  shows "Objects Defined: Name (Kernel Id)"
  grep -qE '^sshProgram \([0-9]+\)$' <<<"$output"
  shows "Tardisk Path (label)"
  shows "/tardisks/base.tgz (tardiskDefault)"
  shows "/tardisks/monitor.tgz (monitorImage)"
}

@test "display of one domain shows only that one" {
  boot
  secpolicy display "$(domain_id sshDom)"
  exits 0
  [[ $(grep -c '^Domain Name: ' <<<"$output") -eq 1 ]]
  [[ $output == *"Domain Name: sshDom "* ]]
}

@test "display of an empty slot shows no domain" {
  boot
  secpolicy display 400
  exits 0
  ! grep -q '^Domain Name: ' <<<"$output"
  shows "Policy set in the kernel"
}

@test "a domain is named by its number" {
  boot
  for word in 3x 0x3 -3 +3 " 3" "" 4294967296; do
    secpolicy display "$word"
    exits 2
  done
  secpolicy display 4294967295
  [[ $status -ne 2 ]]
  secpolicy display sshDom
  exits 2
  [[ $stderr == *"'sshDom' is not the number of a domain; 'secpolicy display' shows the numbers"* ]]
}

@test "display where nothing was booted says what to do" {
  rm -r "$root/tardisks"
  secpolicy display
  exits 1
  ends_with "secpolicy: display: Could not open tardisk dir /tardisks/. There is no directory /tardisks/ below this root: name the root that was booted (--root DIR), or run 'secpolicy boot' first."
}

@test "a tardisk whose label cannot be read fails the display" {
  boot
  echo new >"$root/tardisks/late.tgz"
  secpolicy display
  exits 1
  [[ $stderr == *"Error: Error in reading tardisk label: (/tardisks/late.tgz): "* ]]
  ends_with "secpolicy: display: failed (1 error above)"
}
