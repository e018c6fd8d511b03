# secpolicy settings and secpolicy restore

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
  [[ $output == *"Domain Name: appDom Domain ID :"*" Enforcement Level: permissive"* ]]
  grep -q "^Domain Name: sshDom .* Enforcement Level: enforcing" <<<"$output"
}

@test "a level that the host does not know is refused" {
  secpolicy settings enforcement appDom sometimes
  exits 1
  [[ $stderr == "secpolicy: settings: "*sometimes* ]]
  secpolicy settings enforcement appDom
  exits 1
}

@test "what is not stored is said so" {
  secpolicy settings enforcement appDom
  exits 1
  [[ $stderr == "secpolicy: settings: nothing is stored for enforcement appDom. Store something with 'secpolicy settings enforcement appDom LEVEL'." ]]
  secpolicy settings option /UserVars/CheckAccessTemplateEnabled
  exits 1
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
