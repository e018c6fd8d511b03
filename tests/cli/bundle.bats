# Policies that are signed for many hosts.

load helper

setup_file() {
  cd "$BATS_FILE_TMPDIR" || return
  make_keys_and_policy
  "$SECPOLICY" bundle create web -o good.bundle --key key.pem --expires 90 2>/dev/null
  python3 "$BATS_TEST_DIRNAME/forge_bundle.py" good.bundle key.pem other.pem
}

setup() { cd "$BATS_FILE_TMPDIR" || return; }

bundle() { run --separate-stderr "$SECPOLICY" bundle "$@"; }

# refused NAME WHY: verifying NAME.bundle fails, and this alone is said.
refused() {
  bundle verify "$1.bundle" --key public.pem
  exits 1 || return
  [[ -z $output && $stderr == "secpolicy: bundle verify: $1.bundle: "$2 ]] && return
  printf 'not: %s\nbut: %s\n' "$2" "$stderr"
  return 1
}

@test "a bundle holds what a load reads and nothing else, and its bytes tell nothing else" {
  cp -r web plain
  echo notes >plain/README
  ln -s appDom plain/domains/linkDom
  mkdir -p plain/tardisks
  SOURCE_DATE_EPOCH=1700000000 bundle create plain/ -o one.bundle --key key.pem --name web --serial 7
  exits 0
  touch plain/domains/*
  chmod 600 plain/objects/*
  SOURCE_DATE_EPOCH=1700000000 bundle create ./plain -o two.bundle --key key.pem --name web --serial 7
  exits 0
  cmp one.bundle two.bundle
  diff <(tar tf one.bundle) <(printf '%s\n' manifest.json manifest.sig
    cd web && find . -type f | sed 's|^\.|policy|' | LC_ALL=C sort)
  mkdir unpacked
  tar xf one.bundle -C unpacked
  diff -r web unpacked/policy
  openssl pkeyutl -verify -pubin -inkey public.pem -rawin -in unpacked/manifest.json -sigfile unpacked/manifest.sig
  diff <(jq -r '.files[] | .sha256 + "  policy/" + .path' unpacked/manifest.json) \
    <(cd unpacked && find policy -type f | LC_ALL=C sort | xargs sha256sum)
}

@test "verify tells who signed it, and until when it can be used" {
  bundle verify good.bundle --key public.pem
  exits 0
  [[ -z $output && $stderr == "secpolicy: bundle verify: well (web, serial "*", until "*" UTC, 14 files, signed by "* ]]
  # OpenSSL has signed the other.
  cmp good.bundle same.bundle
}

@test "show tells what a bundle claims, and whether that was verified" {
  bundle show good.bundle
  exits 0
  shows "name     web"
  shows "  $(sha256sum <web/domains/appDom | cut -d' ' -f1)  domains/appDom"
  ends_with "secpolicy: bundle show: this is what it claims: it was not verified, which --key does"
  "$SECPOLICY" bundle show good.bundle >both 2>&1
  [[ $(tail -n 1 both) == "secpolicy: bundle show: "* ]]
  bundle show good.bundle --key public.pem --format json
  exits 0
  fits_schema bundle-show
  [[ $(jq -r '.verified, .manifest.name, (.manifest.files | length)' <<<"$output" | xargs) == "true web 14" ]]
  bundle show good.bundle --key other-public.pem
  exits 1
  [[ -z $output ]]
}

@test "what was changed after it was signed is refused" {
  refused file "domains/appDom was changed after it was signed"
  refused name "its manifest was changed after it was signed"
  head -c 9000 good.bundle >bad.bundle
  refused bad "it is cut short"
  head -c -512 good.bundle >bad.bundle
  refused bad "it is cut short"
  { cat good.bundle; echo more; } >bad.bundle
  refused bad "there is something behind its end"
}

@test "what another key has signed is refused" {
  bundle verify good.bundle --key other-public.pem
  exits 1
  [[ $stderr == "secpolicy: bundle verify: good.bundle: it says that the key "*" has signed it, which is not "* ]]
  # With the name of the wanted key.
  refused other "its manifest was changed after it was signed"
}

@test "a bundle is valid from its making to its expiry" {
  SOURCE_DATE_EPOCH=1700000000 bundle create web -o bad.bundle --key key.pem --expires 2023-11-16
  bundle verify bad.bundle --key public.pem
  exits 1
  [[ $stderr == *": it has expired at 2023-11-16 00:00:00 UTC, and this clock says "* ]]
  SOURCE_DATE_EPOCH=4000000000 bundle create web -o bad.bundle --key key.pem
  bundle verify bad.bundle --key public.pem
  exits 1
  [[ $stderr == *": it is not yet valid: it was made at 2096-10-02 07:06:40 UTC, and this clock says "* ]]
}

@test "a manifest of another version, or that is none, is refused although it is signed" {
  refused signed-version "its format is secpolicy.bundle/2, and this command knows secpolicy.bundle/1. A newer secpolicy may know it."
  refused signed-another "its manifest is that of no bundle"
  refused signed-no-serial "its manifest has no serial"
  refused signed-far-serial "its serial is greater than 9007199254740992"
  bundle verify signed-no-json.bundle --key public.pem
  exits 1
  [[ $stderr == *"signed-no-json.bundle: its manifest is no JSON: "* ]]
}

@test "entries that are not those of the manifest, or not as they are written, are refused" {
  refused extra "it has objects/zzz, which its manifest does not name"
  refused missing "it lacks objects/monitor, which its manifest names"
  refused order "its entry policy/domains/aaa is not in its place"
  refused parent "its entry policy/objects/../zzz is no file of a policy"
  refused absolute "its entry /etc/zzz is no file of a policy"
  refused elsewhere "its entry policy/zzz/zzz is no file of a policy"
  refused link "its entry policy/objects/zzz is no regular file"
  refused mode "its entry policy/objects/monitor is not as 'bundle create' writes it"
  refused no-manifest "it does not begin with a manifest and its signature"
}

@test "what is no bundle is refused" {
  head -c 2000 /dev/urandom | tr '\0' x >bad.bundle
  refused bad "it is no bundle"
  rm bad.bundle
  truncate -s $((64 * 1024 * 1024 + 1)) bad.bundle
  bundle verify bad.bundle --key public.pem
  exits 1
  [[ $stderr == "secpolicy: bundle verify: bad.bundle is too large: at most 67108864 bytes are read" ]]
  rm bad.bundle
  bundle verify web --key public.pem
  exits 1
  [[ $stderr == "secpolicy: bundle verify: web is no regular file" ]]
}

@test "only an Ed25519 key that nobody else can read signs" {
  chmod 640 other.pem
  bundle create web -o new.bundle --key other.pem
  exits 1
  [[ $stderr == "secpolicy: bundle create: others may use the private key other.pem, so it is not used. 'chmod 600' keeps it to its owner." ]]
  chmod 600 other.pem
  openssl genpkey -algorithm x25519 -out x.pem
  openssl pkey -in key.pem -aes128 -passout pass:secret -out closed.pem
  chmod 600 x.pem closed.pem
  for key in x.pem closed.pem public.pem; do
    chmod 600 "$key"
    bundle create web -o new.bundle --key "$key" </dev/null
    exits 1
    [[ $stderr == "secpolicy: bundle create: $key is no private Ed25519 key in PEM without a passphrase. 'openssl genpkey -algorithm ed25519' makes a key, and 'openssl pkey -pubout' writes its public half." ]]
  done
  bundle verify good.bundle --key key.pem
  exits 1
  [[ $stderr == "secpolicy: bundle verify: key.pem is no public "* ]]
  [[ ! -e new.bundle ]]
}

@test "a policy with errors or left-over copies is not packed" {
  cp -r web broken
  echo "-r /srv rwq" >>broken/domains/appDom
  bundle create broken -o new.bundle --key key.pem
  exits 1
  [[ -z $output && $stderr == "secpolicy: bundle create: the policy in broken has 1 error, so no bundle was made. 'secpolicy check --fresh broken' shows every one with its place." ]]
  cp web/domains/appDom broken/domains
  cp web/objects/base broken/objects/base~
  bundle create broken -o new.bundle --key key.pem
  exits 1
  [[ $stderr == "secpolicy: bundle create: broken/objects/base~ looks like a copy that was left behind, so no bundle was made. Move it out of the directory." ]]
  mv broken/objects/base~ "broken/objects/two words"
  bundle create broken -o new.bundle --key key.pem
  exits 1
  [[ $stderr == "secpolicy: bundle create: a bundle cannot hold broken/objects/two words: "* ]]
  bundle create nowhere -o new.bundle --key key.pem
  exits 1
  [[ $stderr == "secpolicy: bundle create: there is no directory nowhere below this root"* && ! -e new.bundle ]]
}

@test "times and serials that cannot be are wrong usage" {
  bundle create web -o new.bundle --key key.pem --expires soon
  wrong_usage "bundle create" "--expires: 'soon' is neither a day such as 2027-01-31 nor a number of days from 1 to 36500"
  bundle create web -o new.bundle --key key.pem --expires 2027-02-30
  exits 2
  bundle create web -o new.bundle --key key.pem --serial -1
  exits 2
  bundle create web -o new.bundle --key key.pem --serial 9007199254740993
  wrong_usage "bundle create" "--serial: '9007199254740993' is greater than 9007199254740992"
  bundle create web -o new.bundle --key key.pem --expires 2020-01-01
  exits 2
  [[ $stderr == *"cannot expire at 2020-01-01 00:00:00 UTC"* ]]
  SOURCE_DATE_EPOCH=253402300799 bundle create web -o new.bundle --key key.pem --expires 1
  exits 2
  [[ $stderr == *"a bundle of 9999-12-31 23:59:59 UTC cannot expire at "* ]]
  SOURCE_DATE_EPOCH=today bundle create web -o new.bundle --key key.pem
  exits 2
  [[ $stderr == *"SOURCE_DATE_EPOCH is 'today', which is no number of seconds"* && ! -e new.bundle ]]
}

@test "files are named as seen from the root" {
  run "$SECPOLICY" --root "$PWD" bundle create /web -o /below.bundle --key /key.pem
  [[ $status -eq 0 ]]
  run "$SECPOLICY" --root "$PWD" bundle verify /below.bundle --key /public.pem
  [[ $status -eq 0 ]]
}

@test "without the library that signs, it is said what to install" {
  mkdir -p alone/bin
  cp "$SECPOLICY" alone/bin
  run --separate-stderr alone/bin/secpolicy bundle show good.bundle
  exits 1
  [[ $stderr == "secpolicy: bundle show: Unable to load what signs bundles: "*". It is installed with this command: install secpolicy again" ]]
}
