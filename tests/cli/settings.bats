# secpolicy settings and restore: what was stored is read back and applied, and to nothing else.

load helper

@test "a stored level is read back" {
  secpolicy settings enforcement appDom permissive
  exits 0
  [[ -z $output && $stderr == "secpolicy: settings: done" ]]
  secpolicy settings enforcement appDom
  exits 0
  [[ $output == permissive && $stderr == "secpolicy: settings: done" ]]
}

@test "restore gives a domain its stored level, and leaves the others" {
  boot
  secpolicy settings enforcement appDom permissive
  secpolicy restore
  exits 0
  [[ $output == "appDom: enforcing -> permissive" && $stderr == "secpolicy: restore: done (1 level changed)" ]]
  secpolicy display
  shows "Domain Name: appDom Domain ID :$(domain_id appDom) Enforcement Level: permissive"
  shows "Domain Name: sshDom Domain ID :$(domain_id sshDom) Enforcement Level: enforcing"
}

# nothing_is_stored OF WHAT: there is none for it, and how WHAT is stored is said.
nothing_is_stored() {
  # shellcheck disable=SC2086
  secpolicy settings $1
  exits 1
  [[ $stderr == "secpolicy: settings: nothing is stored for $1. Store something with 'secpolicy --root $root settings $1 $2'." ]]
}

@test "a level that the host does not know is refused" {
  secpolicy settings enforcement appDom sometimes
  wrong_usage "settings enforcement" "LEVEL: there is no level 'sometimes': enforcing, permissive or disabled"
  nothing_is_stored "enforcement appDom" LEVEL
}

@test "what is not stored is said so" {
  nothing_is_stored "enforcement appDom" LEVEL
  nothing_is_stored "option /UserVars/CheckAccessTemplateEnabled" VALUE
}

@test "the template option makes load create the template domain" {
  boot
  [[ -z $(domain_id checkAccessTemplateDom) ]]
  secpolicy settings option /UserVars/CheckAccessTemplateEnabled 1
  exits 0
  secpolicy settings option /UserVars/CheckAccessTemplateEnabled
  [[ $output == 1 ]]
  secpolicy load
  exits 0
  [[ -n $(domain_id checkAccessTemplateDom) ]]
}

@test "a text option is read back as it was stored" {
  secpolicy settings option /Net/HostName "a b"
  exits 0
  secpolicy settings option /Net/HostName
  [[ $output == "a b" ]]
}

@test "restore fails although the library returns normally" {
  boot
  secpolicy settings enforcement appDom permissive
  echo broken >"$root/var/lib/secpolicy/config.db"
  secpolicy restore
  exits 1
  [[ $stderr == "Error: "* ]]
  ends_with "secpolicy: restore: failed (1 error above)"
}

# kept_number LABEL: the number that display shows.
kept_number() { "$SECPOLICY" --root "$root" display 2>/dev/null | sed -n "s/^$1 (\([0-9]*\))\$/\1/p"; }

@test "a label has the same number after a boot, and one that came later has a new one" {
  echo firstLabel >"$policy/objects/more"
  boot
  local first program
  first=$(kept_number firstLabel)
  program=$(kept_number sshProgram)
  rm "$policy/objects/more"
  secpolicy load
  exits 0
  [[ -n $first && -z $(kept_number firstLabel) ]]
  # A machine that starts has no state.
  rm -r "$root/run/secpolicy"
  echo secondLabel >"$policy/objects/aaa"
  boot
  [[ $(kept_number sshProgram) -eq $program && $(kept_number secondLabel) -gt $first ]]
  echo firstLabel >"$policy/objects/more"
  secpolicy load
  exits 0
  [[ $(kept_number firstLabel) -eq $first ]]
}

@test "settings that were lost are told of by the next load, and no number is used again" {
  boot
  local highest
  highest=$("$SECPOLICY" --root "$root" display 2>/dev/null | sed -n 's/^[[:alnum:]]* (\([0-9]*\))$/\1/p' | sort -n | tail -1)
  rm -r "$root/var/lib/secpolicy"
  echo newLabel >"$policy/objects/more"
  secpolicy load
  exits 0
  says "secpolicy: load: /var/lib/secpolicy/config.db did not know the numbers of the labels in use, so they were written into it again; new ones begin above $highest"
  [[ $(kept_number newLabel) -eq $((highest + 1)) ]]
  secpolicy load
  exits 0
  [[ $stderr != *"did not know"* ]]
}

@test "damaged settings stop a load that has a new label, and say what to do" {
  boot
  echo broken >"$root/var/lib/secpolicy/config.db"
  echo newLabel >"$policy/objects/more"
  secpolicy load
  exits 1
  [[ $stderr == *"Unable to use the configuration /var/lib/secpolicy/config.db: it is damaged or no such thing (file is not a database). Move the file away and store the wanted settings again"* ]]
  [[ -z $(kept_number newLabel) ]]
}

@test "settings of the version before stay stored" {
  secpolicy settings enforcement appDom permissive
  sqlite3 "$root/var/lib/secpolicy/config.db" 'DROP TABLE label_number; PRAGMA user_version = 1'
  boot
  secpolicy settings enforcement appDom
  exits 0
  [[ $output == permissive ]]
  [[ $(sqlite3 "$root/var/lib/secpolicy/config.db" "SELECT id FROM label_number WHERE name = 'sshProgram'") -eq $(kept_number sshProgram) ]]
}

@test "what only looks gives no numbers" {
  boot
  local before
  before=$(sqlite3 "$root/var/lib/secpolicy/config.db" 'SELECT * FROM label_number')
  cp -r "$policy" "$root/new"
  echo newLabel >"$root/new/objects/more"
  secpolicy check /new
  secpolicy load --plan /new
  exits 0
  [[ $output == *newLabel* ]]
  secpolicy diff installed /new
  [[ $(sqlite3 "$root/var/lib/secpolicy/config.db" 'SELECT * FROM label_number') == "$before" ]]
}

@test "list prints what is stored as the words that store it" {
  secpolicy settings list
  exits 0
  [[ -z $output && $stderr == "secpolicy: settings list: done" ]]
  secpolicy settings option /Net/HostName "a b"
  secpolicy settings option /UserVars/CheckAccessTemplateEnabled 1
  secpolicy settings enforcement sshDom disabled
  secpolicy settings enforcement appDom permissive
  secpolicy settings list
  answers 0 "option /Net/HostName a b" "option /UserVars/CheckAccessTemplateEnabled 1" \
    "enforcement appDom permissive" "enforcement sshDom disabled"
  secpolicy settings list --format json
  exits 0
  fits_schema settings
  jq -e '.option == {"/Net/HostName": "a b", "/UserVars/CheckAccessTemplateEnabled": 1} and
    .enforcement == {appDom: "permissive", sshDom: "disabled"}' <<<"$output"
}

@test "unset forgets one setting, and says when there is none" {
  secpolicy settings option /Net/HostName name
  secpolicy settings enforcement appDom permissive
  secpolicy settings unset enforcement appDom
  exits 0
  secpolicy settings unset option /Net/HostName
  exits 0
  secpolicy settings list
  exits 0
  [[ -z $output ]]
  secpolicy settings unset enforcement appDom
  exits 1
  ends_with "secpolicy: settings unset: nothing is stored for enforcement appDom"
  secpolicy settings unset level appDom
  wrong_usage "settings unset" "KIND: 'level' is no kind of setting: option or enforcement"
}

@test "a level is stored for no domain that an installed policy lacks" {
  secpolicy settings enforcement notYet permissive
  exits 0
  boot
  secpolicy settings enforcement sshDmo permissive
  wrong_usage "settings enforcement" "settings enforcement: there is no domain 'sshDmo', so nothing was stored. Did you mean 'sshDom'?"
  secpolicy settings enforcement another permissive
  wrong_usage "settings enforcement" "settings enforcement: there is no domain 'another', so nothing was stored. 'secpolicy --root $root status' counts those that there are"
  secpolicy settings list
  answers 0 "enforcement notYet permissive"
}

@test "a domain that is installed can be named by its number" {
  boot
  secpolicy settings enforcement "$(domain_id appDom)" permissive
  exits 0
  secpolicy settings list
  answers 0 "enforcement appDom permissive"
  secpolicy settings enforcement "$(domain_id appDom)"
  answers 0 permissive
  secpolicy settings unset enforcement "$(domain_id appDom)"
  exits 0
  secpolicy settings list
  [[ -z $output ]]
  secpolicy settings enforcement 400 permissive
  wrong_usage "settings enforcement" "settings enforcement: there is no domain '400', so nothing was stored. 'secpolicy --root $root status' counts those that there are"
}

@test "an option that no load reads is stored, and that is told" {
  secpolicy settings option /UserVars/CheckAccesTemplateEnabled 1
  exits 0
  [[ $stderr == "secpolicy: settings: done; a load reads no option but /UserVars/CheckAccessTemplateEnabled" ]]
  secpolicy settings option UserVars/CheckAccessTemplateEnabled 1
  wrong_usage "settings option" "settings option: the path of an option begins with a slash, as /UserVars/CheckAccessTemplateEnabled"
  secpolicy settings list
  answers 0 "option /UserVars/CheckAccesTemplateEnabled 1"
}

@test "restore where nothing is installed says what to do" {
  secpolicy restore
  exits 1
  [[ $stderr == "secpolicy: restore: nothing is installed below this root. Name the root that was booted (--root DIR), or run 'secpolicy --root $root boot' first." ]]
  [[ ! -e $root/run/secpolicy ]]
}
