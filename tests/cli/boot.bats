# secpolicy boot

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
  for attribute in security.zorvan user.zorvan.security; do
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
  [[ $stderr == "secpolicy: boot: there is no directory /tardisks/ below this root, so nothing was changed. Put the tardisks there, or name the root that they are in (--root DIR)." ]]
  [[ ! -e $root/run/secpolicy ]]
}

@test "boot stops at a tardisk that is no archive and names it" {
  echo "this is no archive" >"$root/tardisks/aaa.tgz"
  secpolicy boot
  exits 1
  [[ ${stderr##*$'\n'} == "secpolicy: boot: Unable to unpack tardisk aaa.tgz: "* ]]
}

@test "boot without a policy is stopped and says where to put one" {
  rm -r "$root/etc/zorvan/secpolicy"
  secpolicy boot
  exits 3
  says "Error: Failed to fetch domainID for global VM Domain"
  ends_with "secpolicy: boot: stopped: there is no domain globalVMDom, so the load ended before tardisks and file labels. Put a policy file named globalVMDom into /etc/zorvan/secpolicy/domains and run it again."
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
  [[ $stderr =~ ^"Error: Unable to open policy directory /etc/zorvan/secpolicy/early/domains
/etc/zorvan/secpolicy/early/domains: 1 error
'secpolicy check /etc/zorvan/secpolicy' shows the lines, and what may be meant
installed now: "[0-9]+" domains, "[0-9]+" rules, "[0-9]+" objects
secpolicy: boot: failed (1 error above)"$ ]]
}

@test "--timing prints each phase of a boot to standard output" {
  secpolicy boot --timing
  exits 0
  is_done boot
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
all" ]]
}

@test "a file of the early policy that fails is told from one of the full policy" {
  echo "-s no_such_call grant" >>"$policy/early/domains/hostDom"
  echo "-s no_such_call grant" >>"$policy/domains/hostDom"
  secpolicy boot
  exits 1
  says "/etc/zorvan/secpolicy/early/domains/hostDom: 1 error"
  says "/etc/zorvan/secpolicy/domains/hostDom: 1 error"
}
