# What the pages of the documentation show is what their commands show.

load helper
load pages

# Who reads a page has the command, and a checkout of the sources around.
setup() {
  needs_landlock
  unset -f secpolicy
  mkdir "$BATS_TEST_TMPDIR/bin" "$BATS_TEST_TMPDIR/checkout"
  ln -s "$SECPOLICY" "$BATS_TEST_TMPDIR/bin/secpolicy"
  PATH=$BATS_TEST_TMPDIR/bin:$PATH
  cd "$BATS_TEST_TMPDIR/checkout" || return
  ln -s "$SOURCE/scripts" "$SOURCE/examples" .
}

@test "the README" { runs_as_written "$SOURCE/README.md"; }

@test "getting started" { runs_as_written "$SOURCE/docs/getting-started.md"; }

@test "confine a service" { runs_as_written "$SOURCE/docs/confine-a-service.md"; }

@test "add a tardisk" { runs_as_written "$SOURCE/docs/add-a-tardisk.md"; }

@test "why is it refused" { runs_as_written "$SOURCE/docs/why-refused.md"; }

@test "what check finds" { runs_as_written "$SOURCE/docs/diagnostics.md"; }

@test "a fleet of hosts" { runs_as_written "$SOURCE/docs/fleet.md"; }

# The pages about what is installed begin on the example host.
boot_example() {
  scripts/pack-example r
  secpolicy --root r boot
}

@test "asking the policy" {
  boot_example
  runs_as_written "$SOURCE/docs/queries.md"
}

@test "a policy in the browser" {
  boot_example
  runs_as_written "$SOURCE/docs/report.md"
}

@test "changing a running system" {
  boot_example
  runs_as_written "$SOURCE/docs/runtime.md"
}

@test "a page that shows something else is found, and one that shows nothing" {
  cat >page <<'EOF'
The file `f`:

```
one
two*
three
```

```console
$ cat f
one
[...]
three
$ echo "$(
> cat f)" | tail -n 2
two*
three
```
EOF
  runs_as_written page
  [[ $commands -eq 2 ]]
  for wrong in 11s/one/on/ 12d 13s/three/four/ '16s/\*/?/' 17d 9s/console// 10,17d; do
    sed "$wrong" page >wrong
    run runs_as_written wrong
    [[ $status -ne 0 ]]
  done
}
