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
  [[ $stderr == "secpolicy: restore: done" ]]
  secpolicy display
  shows "Domain Name: appDom Domain ID :$(domain_id appDom) Enforcement Level: permissive"
  shows "Domain Name: sshDom Domain ID :$(domain_id sshDom) Enforcement Level: enforcing"
}

# nothing_is_stored OF WHAT: there is none for it, and how WHAT is stored is said.
nothing_is_stored() {
  # shellcheck disable=SC2086
  secpolicy settings $1
  exits 1
  [[ $stderr == "secpolicy: settings: nothing is stored for $1. Store something with 'secpolicy settings $1 $2'." ]]
}

@test "a level that the host does not know is refused" {
  secpolicy settings enforcement appDom sometimes
  exits 1
  [[ $stderr == "secpolicy: settings: Unknown enforcement level sometimes: use enforcing, permissive or disabled" ]]
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
