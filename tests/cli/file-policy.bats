# secpolicy file-policy: policies come, change and go as display and why see them, all of a call or none.

load helper

setup() {
  make_root
  boot
  secpolicy domain create job7
}

fails() { fails_with "file-policy $1" "$2"; }

# policies LINE...: these are all that there are.
policies() {
  secpolicy file-policy list job7
  answers 0 "$@"
}

@test "policies are added, changed and removed" {
  secpolicy file-policy add job7 rw /srv/a /srv/b
  exits 0
  [[ -z $output && $stderr == "secpolicy: file-policy add: done" ]]
  secpolicy file-policy add 10 none /srv/a/secret
  exits 0
  policies "-r /srv/a rw" "-r /srv/b rw" "-r /srv/a/secret "
  [[ $stderr == "secpolicy: file-policy list: 3 file policies" ]]
  secpolicy why job7 write /srv/a/file
  exits 0
  secpolicy why job7 read /srv/a/secret/file
  exits 1
  secpolicy file-policy update job7 x /srv/a
  exits 0
  [[ $stderr == "secpolicy: file-policy update: done" ]]
  secpolicy file-policy remove job7 /srv/b
  exits 0
  [[ $stderr == "secpolicy: file-policy remove: done" ]]
  policies "-r /srv/a x" "-r /srv/a/secret "
  secpolicy file-policy list job7 --format json
  exits 0
  fits_schema file-policies
  jq -e '.domain == "job7" and .id == 10 and
    .policies == [{path: "/srv/a", permissions: "x"}, {path: "/srv/a/secret", permissions: ""}]' <<<"$output"
  secpolicy file-policy remove job7 /srv/a/secret
  policies "-r /srv/a x"
  [[ $stderr == "secpolicy: file-policy list: 1 file policy" ]]
}

@test "an empty list is one" {
  secpolicy file-policy list job7
  exits 0
  [[ -z $output && $stderr == "secpolicy: file-policy list: 0 file policies" ]]
  secpolicy file-policy list job7 --format json
  fits_schema file-policies
  jq -e '.policies == []' <<<"$output"
}

@test "a policy of a process is its own, and a path of such policies is replaced" {
  secpolicy file-policy add job7 rw --world $$ /vm/1 /vm/2
  exits 0
  secpolicy file-policy add job7 r /vm/1
  policies "-r /vm/1 rw" "-r /vm/2 rw" "-r /vm/1 r"
  secpolicy file-policy remove job7 /vm/2
  fails remove "Failed to remove file policy from domain :10 : world id :0:No such file or directory. 'secpolicy --root $root file-policy list job7' lists those of job7; one that was added for a process is removed with --world"
  secpolicy file-policy replace /vm/1 /vm/3
  exits 0
  [[ $stderr == "secpolicy: file-policy replace: done" ]]
  policies "-r /vm/3 rw" "-r /vm/2 rw" "-r /vm/1 r"
  secpolicy file-policy replace /vm/1 /vm/4
  fails replace "Failed to replace file policy: /vm/1 to: /vm/4: No such file or directory. It is about policies of single processes, which 'secpolicy --root $root file-policy add --world' makes"
  secpolicy file-policy update job7 x /vm/3
  secpolicy file-policy remove job7 --world $$ /vm/2
  policies "-r /vm/3 x" "-r /vm/1 r"
  secpolicy display
  [[ $output == *"-r /vm/1 r"* && $output != *"/vm/3"* ]]
}

@test "what cannot be added adds nothing" {
  secpolicy file-policy add job7 r --world 4194305 /srv/a
  fails add "Failed to add file policies to domain :10: world ID :4194305:No such process"
  policies ""
  for permissions in rwq rr R "" nothing; do
    secpolicy file-policy add job7 "$permissions" /srv/a
    wrong_usage "file-policy add" "file-policy add: '$permissions' are no permissions: letters of \"rwx\", each at most once, or none"
  done
  secpolicy file-policy add job7 r /srv/a srv/b
  wrong_usage "file-policy add" "file-policy add: 'srv/b' is no path from the root on: it begins with a slash"
  secpolicy file-policy add job7 r /srv/a/
  wrong_usage "file-policy add" "file-policy add: '/srv/a/' ends in a slash, so it is the path of no file"
  local long path
  for path in /srv/../a /srv/./a /srv//a /..; do
    secpolicy file-policy add job7 r "$path"
    wrong_usage "file-policy add" "file-policy add: '$path' is the path of no file: it holds '.', '..' or two slashes"
  done
  long=/$(printf 'x%.0s' {1..1981})
  secpolicy file-policy add job7 r "${long}abc"
  wrong_usage "file-policy add" "file-policy add: the path of a file policy has at most 1983 bytes, and not 1985"
  secpolicy file-policy add job7 r --world none /srv/a
  wrong_usage "file-policy add" "file-policy add: 'none' is not the number of a process"
  secpolicy file-policy add job77 r /srv/a
  wrong_usage "file-policy add" "file-policy add: there is no domain 'job77'; did you mean 'job7'?"
  policies ""
  secpolicy file-policy add job7 r "${long}a" /
  exits 0
  policies "-r ${long}a r" "-r / r"
}

@test "what is not there cannot be changed or removed" {
  secpolicy file-policy update job7 r /srv/a
  fails update "Failed to update file policy: /srv/a:No such file or directory. 'secpolicy --root $root file-policy list job7' lists those of job7"
  secpolicy file-policy remove job7 /srv/a
  fails remove "Failed to remove file policy from domain :10 : world id :0:No such file or directory. 'secpolicy --root $root file-policy list job7' lists those of job7; one that was added for a process is removed with --world"
}

@test "a path that is a link is told of" {
  ln -s monitor "$root/opt/link"
  secpolicy file-policy add job7 r /opt/link /opt/monitor
  exits 0
  [[ $stderr == "secpolicy: file-policy add: /opt/link leads to /opt/monitor, which has to be added by that path to count
secpolicy: file-policy add: done" ]]
}

@test "what a policy file says comes back with the next load, and what was added stays" {
  secpolicy file-policy list sshDom
  local before=$output
  shows "-r /etc/ssh r"
  secpolicy file-policy update sshDom rw /etc/ssh
  secpolicy file-policy add sshDom r /srv/a
  secpolicy load
  exits 0
  secpolicy file-policy list sshDom
  diff <(sort <<<"$before"$'\n'"-r /srv/a r") <(sort <<<"$output")
  secpolicy file-policy remove sshDom /etc/ssh
  secpolicy load
  secpolicy file-policy list sshDom
  diff <(sort <<<"$before"$'\n'"-r /srv/a r") <(sort <<<"$output")
}
