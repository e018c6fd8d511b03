# The way in: from nothing to a policy of one's own, by the command alone.

load helper

setup() {
  root=$BATS_TEST_TMPDIR/root
  policy=$root/etc/zorvan/secpolicy
  mkdir "$root"
}

@test "from nothing to an answer: init, check, boot, why, an edit, load --plan, load" {
  secpolicy init
  exits 0
  shows "$policy/domains/hostDom"
  [[ $(wc -l <<<"$output") -eq $(find "$policy" -type f | wc -l) ]]
  ends_with "secpolicy: init: done (8 files). 'secpolicy --root $root boot' installs them"
  secpolicy check
  exits 0
  ends_with "secpolicy: check: no problems; checked as after a boot, since nothing is installed"
  secpolicy boot
  exits 0
  [[ -z $output && $stderr == "secpolicy: boot: done (5 domains, "*" rules, 3 objects)" ]]
  secpolicy new domain webDom
  exits 0
  shows "$policy/domains/webDom"
  echo "-r /srv/www r" >>"$policy/domains/webDom"
  secpolicy load --plan
  exits 0
  [[ $output == *"+ domain webDom"* || $output == *webDom* ]]
  secpolicy load
  exits 0
  secpolicy why webDom read /srv/www/index.html
  exits 0
  [[ $output == *"-r /srv/www r"* ]]
  secpolicy why webDom write /srv/www/index.html
  exits 1
}

@test "init writes into nothing that is there, and below a root only what belongs there" {
  mkdir -p "$policy"
  secpolicy init
  exits 0
  [[ $(cd "$root" && find . -maxdepth 1 | sort | tr '\n' ' ') == ". ./etc ./tardisks " ]]
  echo "# mine" >>"$policy/objects/base"
  secpolicy init
  exits 1
  [[ -z $output && $stderr == "secpolicy: init: $policy is not empty, so nothing was written. 'secpolicy --root $root check /etc/zorvan/secpolicy' reads what is there." ]]
  grep -q '^# mine$' "$policy/objects/base"
}

@test "init of another directory writes the files alone" {
  secpolicy init /mine
  exits 0
  ends_with "secpolicy: init: done (8 files). 'secpolicy --root $root check --fresh /mine' reads them"
  [[ ! -e $root/tardisks && ! -e $root/etc ]]
}

# words_of PATHS: those of the comments in the files, but for what paths have in them.
words_of() { grep -rhoE '#.*' "$@" | sed 's, "\?/[^ ]*,,g' | grep -oE '[[:alpha:]]+' | sort -fu; }

@test "the comments of new files are made of the words of the documents" {
  secpolicy init
  secpolicy new domain webDom
  [[ $(words_of "$policy" | wc -l) -gt 100 ]]
  run grep -vixFf <(grep -rIhoE '[[:alpha:]]+' "$SOURCE"/{README.md,docs,packaging}; echo webDom) <(words_of "$policy")
  exits 1
}

@test "init where nothing can be written says so" {
  [[ $EUID -eq 0 ]] || skip "only root can give the rights of another user"
  chmod 755 "$root" "$BATS_TEST_TMPDIR" "$(dirname "$BATS_TEST_TMPDIR")" "$BATS_RUN_TMPDIR"
  mkdir "$root/theirs"
  run --separate-stderr setpriv --reuid 65534 --clear-groups "$SECPOLICY" init "$root/theirs/policy"
  exits 1
  [[ -z $output && $stderr == "secpolicy: init: "*"Permission denied"* ]]
}

@test "new domain overwrites nothing, and takes no name that is none" {
  secpolicy init
  secpolicy new domain appDom
  exits 1
  ends_with "secpolicy: new domain: there is a domain appDom already: $policy/domains/appDom defines it. Nothing was written."
  for name in ../appDom -x .x 'a b' "$(printf 'x%.0s' {1..64})" ''; do
    secpolicy new domain -- "$name"
    exits 2
    [[ $stderr == *"'$name' is no name: letters, digits and '_', '-', '.' behind the first, 63 at most"* ]]
  done
  secpolicy new domain A-dom_1.x
  exits 0
  secpolicy new domain --policy /no/such x
  exits 1
  [[ $stderr == "secpolicy: new domain: there is no directory /no/such below this root"* ]]
}

@test "the file of a new domain tells how it is entered, and lets a program start" {
  secpolicy init
  secpolicy new domain webDom
  ends_with "secpolicy: new domain: done. Write into the file what it may do, and into that of hostDom who gets there; 'secpolicy --root $root check' reads both."
  grep -qF -- '-d LABEL webDom exec grant' "$policy/domains/webDom"
  secpolicy check --fresh --format json
  [[ $(jq -c '[.problems[].code]' <<<"$output") == '["unreachable-domain"]' ]]
}

@test "all domains that are missing are named at once" {
  secpolicy init
  mkdir "$root/run"
  rm "$policy/domains/ioFilterDom" "$policy/domains/appDom"
  secpolicy load
  exits 3
  ends_with "secpolicy: load: stopped: there are no domains ioFilterDom and appDom, so nothing was installed. Put policy files of these names into /etc/zorvan/secpolicy/domains and run it again."
  rm "$policy/domains/globalVMDom"
  secpolicy load
  exits 3
  [[ $stderr == *"there are no domains globalVMDom, ioFilterDom and appDom, so"* ]]
}

@test "explain prints the page of every problem, and only that" {
  secpolicy explain
  exits 0
  local codes
  codes=$(cut -d' ' -f1 <<<"$output")
  [[ $(wc -w <<<"$codes") -eq $(grep -c '^### `' "$SOURCE/docs/diagnostics.md") ]]
  for code in $codes; do
    secpolicy explain "$code"
    exits 0
    [[ -n $output && $output != *'###'* ]]
    grep -qxF -- "${output%%$'\n'*}" "$SOURCE/docs/diagnostics.md"
  done
  secpolicy explain unknown-wrod
  wrong_usage explain "CODE: there is no problem 'unknown-wrod'; did you mean 'unknown-word'?"
  secpolicy explain zzzzzz
  wrong_usage explain "CODE: there is no problem 'zzzzzz'; 'secpolicy explain' lists all"
}
