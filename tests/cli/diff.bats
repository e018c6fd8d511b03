# secpolicy diff: each kind of difference between directories, saved states and what is installed, and
# what cannot be compared.

load helper

setup() { boot_beside_copy; }

left_out="secpolicy: diff: file labels and the transitions of tardisks are left out: a directory has the labels only, and a state the transitions"

@test "what was booted is what the directory says" {
  secpolicy diff /etc/zorvan/secpolicy installed
  exits 0
  [[ -z $output && $stderr == "$left_out
secpolicy: diff: the same" ]]
  secpolicy diff installed installed
  exits 0
  [[ -z $output && $stderr == "secpolicy: diff: the same" ]]
}

@test "two directories, every kind of difference" {
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  sed -i '/listen/d; s/^\(-c cap_net_bind_service\) grant/\1 revoke/; s|^\(-r /etc/ssh *\)r$|\1rw|' \
    "$policy/domains/sshDom"
  echo "-r /srv rw" >"$policy/domains/newDom"
  sed -i '/monitorSocket/d' "$policy/domains/monitorDom" "$policy/objects/monitor"
  sed -i '/^-a hostConfig/d' "$policy/early/domains/bootDom"
  mv "$policy/domains/plugins/cache" "$policy/domains/plugins/disk"
  sed -i '/^-r/d; /^-[as]/d' "$policy/domains/plugins/disk"
  echo "newObject" >>"$policy/objects/base"
  sed -i '/host_key/d; s|^\(/var/lib/vms/\*\) .*|\1 vmProgram|' "$policy/fileLabels/base"
  echo "/etc/services.conf newObject" >"$policy/fileLabels/zz"
  secpolicy diff /etc/zorvan/secpolicy /new
  exits 1
  diff - <(printf '%s\n' "$output") <<'END'
--- /etc/zorvan/secpolicy
+++ /new
@@ domain appDom
+ -c cap_net_raw grant
@@ domain bootDom
- -a hostConfig read grant
@@ domain monitorDom
- -u monitorSocket stream grant
@@ domain newDom (only in /new)
+ level enforcing
+ -r /srv rw
@@ domain plugin-cache (only in /etc/zorvan/secpolicy)
- level enforcing
- -a filterCache read grant
- -a filterCache write grant
- -a filterProgram execute grant
- -r /bin rx
- -r /usr/lib/io-filters/cache rx
- -r /var/cache/io-filters rw
- -s @file grant
- -s @io grant
- -s @process grant
- -s @signal grant
- -s @start grant
@@ domain plugin-disk (only in /new)
+ level enforcing
@@ domain sshDom
- -c cap_net_bind_service grant
+ -c cap_net_bind_service revoke
- -r /etc/ssh r
+ -r /etc/ssh rw
- -s listen grant
@@ objects
- monitorSocket
+ newObject
@@ file labels
+ /etc/services.conf newObject
- /etc/ssh/host_key sshKey
- /var/lib/vms/* vmDisk
+ /var/lib/vms/* vmProgram
END
  [[ $stderr == "secpolicy: diff: different" ]]
}

@test "order, comments and spaces make no difference" {
  sort -r "$root/etc/zorvan/secpolicy/domains/sshDom" | sed 's/ /   /g' >"$policy/domains/sshDom"
  secpolicy diff /etc/zorvan/secpolicy /new
  exits 0
  [[ -z $output ]]
}

@test "an enforcement level, and what another load left" {
  secpolicy settings enforcement appDom permissive
  secpolicy restore
  echo "-c cap_net_raw grant" >>"$policy/domains/sshDom"
  secpolicy load /new
  secpolicy diff /etc/zorvan/secpolicy installed
  exits 1
  [[ $output == "--- /etc/zorvan/secpolicy
+++ installed
@@ domain appDom
- level enforcing
+ level permissive
@@ domain sshDom
+ -c cap_net_raw grant" ]]
}

@test "diff changes no file and no state, and logs nothing" {
  (cd "$root" && find . -type f -printf '%p %i %s %m %C@\n' | sort) >"$BATS_TEST_TMPDIR/before"
  echo "newObject" >>"$policy/objects/base"
  secpolicy diff installed /new
  exits 1
  (cd "$root" && find . -type f ! -path './new/objects/base' -printf '%p %i %s %m %C@\n' | sort) |
    diff <(grep -v '/new/objects/base ' "$BATS_TEST_TMPDIR/before") -
}

@test "--format json" {
  sed -i '/listen/d; s/^\(-c cap_net_bind_service\) grant/\1 revoke/' "$policy/domains/sshDom"
  touch "$policy/domains/newDom"
  echo "newObject" >>"$policy/objects/base"
  echo "/etc/services.conf newObject" >"$policy/fileLabels/zz"
  secpolicy diff --format json /etc/zorvan/secpolicy /new
  exits 1
  fits_schema diff
  jq -e '. == {schema: "secpolicy.diff/1", before: "/etc/zorvan/secpolicy", after: "/new", same: false,
    domains: [
      {name: "newDom", level: {before: null, after: "enforcing"}, rules: {removed: [], added: [], changed: []}},
      {name: "sshDom", level: {before: "enforcing", after: "enforcing"},
       rules: {removed: ["-s listen grant"], added: [],
         changed: [{before: "-c cap_net_bind_service grant", after: "-c cap_net_bind_service revoke"}]}}],
    objects: {removed: [], added: ["newObject"]},
    labels: [{path: "/etc/services.conf", before: null, after: "newObject"}]}' <<<"$output"
  secpolicy diff --format json installed /etc/zorvan/secpolicy
  exits 0
  fits_schema diff
  jq -e '.same and .labels == null and .domains == []' <<<"$output"
}

@test "a policy with errors is not compared" {
  echo "-s no_such_call grant" >>"$policy/domains/appDom"
  secpolicy diff /etc/zorvan/secpolicy /new
  exits 2
  [[ -z $output ]]
  says "Error: Error in parsing policy for domain: appDom: $(wc -l <"$policy/domains/appDom") : unknown system call 'no_such_call'"
  ends_with "secpolicy: diff: the policy in /new has errors (above), so it was not compared. 'secpolicy --root $root check /new' shows every one with its place."
}

@test "what there is not" {
  secpolicy diff /no/such installed
  exits 2
  [[ $stderr == "secpolicy: diff: there is no directory /no/such below this root. Name a policy directory, a saved state, or 'installed'." ]]
  secpolicy diff nosuch installed
  exits 2
  [[ $stderr == "secpolicy: diff: there is no saved state 'nosuch', and no such directory. 'secpolicy --root $root history' lists what is saved; 'installed' is what is installed now." ]]
  secpolicy diff instaled /new
  exits 2
  [[ $stderr == "secpolicy: diff: there is no saved state 'instaled', and no such directory. Did you mean 'installed'?" ]]
  rm -r "$root/run/secpolicy/"*
  secpolicy diff installed /new
  exits 2
  [[ $stderr == "secpolicy: diff: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first." ]]
  [[ ! -e $root/run/secpolicy/host.db ]]
}

@test "a directory named without a slash is one, whatever else it could mean" {
  secpolicy diff new etc/zorvan/secpolicy
  exits 0
  mkdir "$root/installed"
  secpolicy diff installed ./installed
  exits 2
  says "Error: Unable to open policy directory ./installed/objects"
}

@test "one word is not enough" {
  secpolicy diff installed
  wrong_usage diff "B is required"
}

@test "--stat counts what differs" {
  secpolicy diff --stat /etc/zorvan/secpolicy /new
  exits 0
  [[ -z $output ]]
  echo "-c cap_net_raw grant" >>"$policy/domains/appDom"
  echo "-c cap_net_admin grant" >>"$policy/domains/appDom"
  sed -i '/listen/d; s/^\(-c cap_net_bind_service\) grant/\1 revoke/' "$policy/domains/sshDom"
  echo "-r /srv rw" >"$policy/domains/newDom"
  : >"$policy/domains/emptyDom"
  echo "newObject" >>"$policy/objects/base"
  sed -i '/host_key/d; s|^\(/var/lib/vms/\*\) .*|\1 vmProgram|' "$policy/fileLabels/base"
  secpolicy diff --stat /etc/zorvan/secpolicy /new
  answers 1 \
    "domain appDom: 2 rules added" \
    "domain emptyDom (only in /new)" \
    "domain newDom (only in /new): 1 rule added" \
    "domain sshDom: 1 rule removed, 1 rule changed" \
    "objects: 1 object added" \
    "file labels: 1 line removed, 1 line changed"
  [[ $stderr == "secpolicy: diff: different" ]]
  secpolicy save good
  secpolicy settings enforcement appDom permissive
  secpolicy restore
  secpolicy capability grant appDom cap_net_raw
  secpolicy diff --stat good installed
  answers 1 "domain appDom: level enforcing -> permissive, 1 rule added"
  secpolicy diff --stat --format json good installed
  wrong_usage diff "--format excludes --stat"
}
