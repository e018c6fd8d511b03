# What Ansible asks of a collection: its own sanity tests, all that it runs by default, and that its
# documentation can be shown and it can be packed.

bats_require_minimum_version 1.5.0
load ../cli/helper

setup() {
  local package
  for package in ansible-core pylint pycodestyle python3-voluptuous shellcheck yamllint; do
    dpkg-query --show --showformat='${db:Status-Status}' "$package" 2>/dev/null | grep -qx installed ||
      skip "$package is not installed"
  done
  export HOME=$BATS_TEST_TMPDIR LC_ALL=C.UTF-8 PATH=/usr/bin:/bin PYTHONDONTWRITEBYTECODE=1
  collection=$BATS_TEST_TMPDIR/ansible_collections/secpolicy/secpolicy
  mkdir -p "${collection%/*}"
  cp -r "$SOURCE/packaging/ansible" "$collection"
  cd "$collection" || return
}

sanity() { run python3 "$BATS_TEST_DIRNAME/sanity.py" sanity --local --python 3.11 --color no "$@"; }

@test "the collection passes ansible-test sanity" {
  sanity
  exits 0
  local name
  for name in validate-modules pylint import pep8 ansible-doc yamllint; do
    [[ $output == *"Running sanity test \"$name\""* ]]
  done
}

@test "sanity tests find an option without a word about it" {
  sed -i 's/^  recurse:/  other:/' plugins/modules/secpolicy_label.py
  sanity --test validate-modules
  exits 1
  [[ $output == *"secpolicy_label.py"*"'recurse'"* ]]
}

@test "it is packed with all that belongs to it, and nothing else" {
  ansible-galaxy collection build --output-path "$BATS_TEST_TMPDIR" >/dev/null
  diff <(tar -tf "$BATS_TEST_TMPDIR/secpolicy-secpolicy-1.0.0.tar.gz" | grep -v '/$\|^\(MANIFEST\|FILES\)\.json$' | sort) \
    <(find . -type f ! -name galaxy.yml -printf '%P\n' | sort)
}
