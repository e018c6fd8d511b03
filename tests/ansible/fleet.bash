# Hosts for Ansible, each a root of its own on this machine. Whoever loads this says in $fleet where they are.

# needs_ansible: skips the test where it is not installed.
needs_ansible() { command -v ansible-playbook >/dev/null || skip "ansible-core is not installed"; }

# lay_out_fleet COUNT: in $fleet, booted roots h01, h02 and so on, an inventory, and a configuration. A file h01.command
# takes the place of the command of that host.
# shellcheck disable=SC2154
lay_out_fleet() {
  local number root
  mkdir -p "$fleet/collections/ansible_collections/secpolicy" "$fleet/bin" "$fleet/host_vars"
  ln -s "$SOURCE/packaging/ansible" "$fleet/collections/ansible_collections/secpolicy/secpolicy"
  cat >"$fleet/bin/secpolicy" <<END
#!/bin/sh
[ ! -e "\$2.command" ] || exec "\$2.command" "\$@"
exec "$SECPOLICY" "\$@"
END
  chmod +x "$fleet/bin/secpolicy"
  root=$fleet/h01
  mkdir "$root"
  "$SECPOLICY" --root "$root" init 2>/dev/null >&2
  "$SECPOLICY" --root "$root" boot 2>/dev/null
  for number in $(seq -f %02g 1 "$1"); do
    [[ $number == 01 ]] || cp -a "$root" "$fleet/h$number"
    echo "h$number root=$fleet/h$number"
  done >"$fleet/hosts"
  cat >>"$fleet/hosts" <<END
[all:vars]
ansible_connection=local
ansible_python_interpreter=/usr/bin/python3
secpolicy_rollout_root="{{ root }}"
END
  cat >"$fleet/ansible.cfg" <<END
[defaults]
collections_path = $fleet/collections
inventory = $fleet/hosts
local_tmp = $fleet/tmp
remote_tmp = $fleet/tmp
forks = 2
gathering = explicit
nocows = True
callbacks_enabled = tree
[callback_tree]
directory = $fleet/results
[connection]
pipelining = True
END
}

# play FILE ARGUMENT...: runs the playbook, keeps $status and $output, and the last result of each host
# as JSON in $fleet/results.
play() {
  rm -rf "$fleet/results"
  run env ANSIBLE_CONFIG="$fleet/ansible.cfg" PATH="$fleet/bin:$PATH" HOME="$fleet" PYTHONDONTWRITEBYTECODE=1 \
    ansible-playbook "$@"
}

# result HOST FILTER: what jq finds in the last result of the host.
result() { jq -c "$2" "$fleet/results/$1"; }

# recap WORD HOST...: the play told this of these hosts, such as changed=1, and of no other.
recap() {
  # shellcheck disable=SC2154
  diff <(printf '%s\n' "${@:2}") <(sed -n "s/^\(h[0-9]*\) .*[ :]$1 .*/\1/p" <<<"$output" | sort) && return
  printf '%s\n' "$output"
  return 1
}

# everything HOST: the files of its policies, its labels and its state, byte for byte, but for the mark by which
# others see that somebody has tried to write.
everything() {
  local root=$fleet/$1
  (cd "$root" && find etc \( -type f -exec sha256sum {} + \) -o -printf '%p %M\n' | sort)
  (cd "$root" && getfattr --recursive --absolute-names --dump --match=- etc | sort)
  sqlite3 "$root/run/secpolicy/host.db" .dump | sed '/^INSERT INTO state /s/,[0-9]*);$//'
}
