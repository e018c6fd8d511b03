# The rules and the dashboard that are shipped: metrics that no host gives, a rule that is silent when it
# should not be or fires on a good host, a panel that stays empty, and pages that leave a metric out.

load ../cli/helper

MONITORING=$SOURCE/packaging/monitoring

setup() { :; }

needs_promtool() {
  command -v promtool >/dev/null || skip "promtool, which tries rules and queries, is not installed"
}

# measure: writes the metrics of a booted host whose policy came from a bundle to $drift and $status.
measure() {
  make_root
  boot
  jq -n '{schema: "secpolicy.bundle/1", name: "web", serial: 7, created: "2026-11-21", expires: null, key: "key", files: []}' \
    >"$policy/manifest.json"
  drift=$root/drift.prom
  status=$root/status.prom
  "$SECPOLICY" --root "$root" drift -o /drift.prom 2>/dev/null
  "$SECPOLICY" --root "$root" status --format prometheus -o /status.prom 2>/dev/null
}

@test "the rules fire for what they say, and for nothing on a good host" {
  needs_promtool
  cp "$MONITORING/alerts.yaml" "$BATS_TEST_DIRNAME"/*alerts_test.yaml "$BATS_TEST_TMPDIR"
  cd "$BATS_TEST_TMPDIR"
  promtool check rules alerts.yaml
  promtool test rules alerts_test.yaml late_alerts_test.yaml
  # Each is tried.
  diff <(sed -n 's/.*- alert: //p' alerts.yaml | sort) <(grep -oh 'alertname: [A-Za-z]*' ./*_test.yaml | cut -d ' ' -f 2 | sort -u)
}

@test "every panel of the dashboard shows something of a host" {
  needs_promtool
  measure
  "$BATS_TEST_DIRNAME/panel_tests.py" "$MONITORING/grafana-dashboard.json" "$drift" "$status" >"$BATS_TEST_TMPDIR/panels.yaml"
  promtool test rules "$BATS_TEST_TMPDIR/panels.yaml"
  # What would show nothing is told.
  sed 's/sum by (level) (secpolicy_worlds{/&kind=\\"x\\",/' "$MONITORING/grafana-dashboard.json" >"$BATS_TEST_TMPDIR/empty.json"
  "$BATS_TEST_DIRNAME/panel_tests.py" "$BATS_TEST_TMPDIR/empty.json" "$drift" "$status" >"$BATS_TEST_TMPDIR/panels.yaml"
  run ! promtool test rules "$BATS_TEST_TMPDIR/panels.yaml"
}

# named FILE...: the metrics that these speak of, without the names of files and units.
named() { grep -ohE '\bsecpolicy_[a-z]+(_[a-z]+)*' "$@" | sort -u; }

@test "rules name metrics that a host gives, and the page names each" {
  measure
  # Those of the kernel are given on the machine's own root alone.
  {
    sed -n 's/^# TYPE \([^ ]*\) gauge$/\1/p' "$drift" "$status"
    grep -oE '"secpolicy_module_[a-z_]+"' "$SOURCE/tools/secpolicy/status/status_metrics.cpp" | tr -d '"'
  } | sort >"$BATS_TEST_TMPDIR/given"
  [[ $(wc -l <"$BATS_TEST_TMPDIR/given") -gt 20 ]]
  [[ -z $(named "$MONITORING/alerts.yaml" | comm -23 - "$BATS_TEST_TMPDIR/given") ]]
  diff <(grep -oE '^\| `secpolicy_[a-z_]+' "$SOURCE/docs/monitoring.md" | cut -c 4- | sort) "$BATS_TEST_TMPDIR/given"
}

@test "the page names each rule and each kind of entry" {
  local text
  while IFS= read -r text; do
    grep -qF "$text" "$SOURCE/docs/monitoring.md" || {
      printf 'docs/monitoring.md leaves out: %s\n' "$text"
      return 1
    }
  done < <(sed -n 's/.*- alert: //p' "$MONITORING/alerts.yaml"; sed -n 's/^-- //p' "$SOURCE/packaging/systemd/secpolicy.catalog")
}
