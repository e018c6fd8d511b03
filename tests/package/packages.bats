# The packages as a distribution and its users meet them: made of the optimised build, held to Debian's
# rules, installed into a clean Debian, used there, removed and purged. What needs that Debian is
# skipped where it cannot be made.

bats_require_minimum_version 1.5.0

SOURCE=$(cd "$BATS_TEST_DIRNAME/../.." && pwd)

setup_file() {
  export BUILD=${BUILD_DIR-$SOURCE/build/release}
  export PACKAGES=$BATS_FILE_TMPDIR/packages
  export DEBIAN=$BATS_FILE_TMPDIR/debian
  export DEB_BUILD_OPTIONS=noautodbgsym
  "$SOURCE/scripts/pack" "$BUILD" "$PACKAGES" >"$BATS_FILE_TMPDIR/pack.log" 2>&1 || {
    tail -n 40 "$BATS_FILE_TMPDIR/pack.log" >&2
    return 1
  }
  [[ $(id -u) -ne 0 ]] || make_debian
}

# sources: where this machine has its own Debian from.
sources() {
  # shellcheck disable=SC2016  # the words are apt's
  apt-get indextargets --format 'deb $(REPO_URI) $(RELEASE) $(COMPONENT)' \
    'Created-By: Packages' 'Origin: Debian' | sort -u
}

# download_debian PACKAGE,...: a clean Debian with these. What a network refuses once it may give later.
download_debian() {
  local try
  # Images of machines come without apt's lists.
  [[ -n $(sources) ]] || apt-get --quiet update >&2 || true
  for try in 1 2 3; do
    rm -rf "$DEBIAN"
    # shellcheck source=/dev/null
    sources | mmdebstrap --quiet --mode=root --variant=apt --format=directory --aptopt='Acquire::Retries "5"' \
      --include="$1" "$(. /etc/os-release && echo "$VERSION_CODENAME")" "$DEBIAN" - && return
    echo "# no clean Debian could be had, try $try of 3" >&3
    sleep $((10 * try))
  done
  rm -rf "$DEBIAN"
}

# A Debian without anything of ours but what our packages need of others, and then with them. None
# where it cannot be had.
make_debian() {
  local needed=libarchive13,libbpf1,libseccomp2,libsqlite3-0,libstdc++6,zlib1g
  download_debian "$needed,busybox-static,systemd"
  [[ -d $DEBIAN ]] || return 0
  files >"$BATS_FILE_TMPDIR/clean"
  mkdir "$DEBIAN/srv/packages"
  cp "$PACKAGES"/{lib,}secpolicy*.deb "$DEBIAN/srv/packages"
  inside sh -c 'apt-get --yes --quiet install /srv/packages/*.deb' >"$BATS_FILE_TMPDIR/install.log" 2>&1
}

needs_debian() {
  [[ $(id -u) -eq 0 ]] || skip "only root can install packages into a Debian of its own"
  [[ -d $DEBIAN ]] || skip "a clean Debian to install packages into could not be had"
}

# inside COMMAND...: runs it in that Debian. What it mounts and starts ends with it.
inside() {
  unshare --mount --pid --fork --kill-child --mount-proc="$DEBIAN/proc" \
    env --ignore-environment PATH=/usr/sbin:/usr/bin:/sbin:/bin DEBIAN_FRONTEND=noninteractive \
    chroot "$DEBIAN" "$@"
}

# The files of that Debian, but for the records of others.
files() {
  find "$DEBIAN" -xdev -printf '/%P\n' |
    grep -vE '^/(var/(lib/(dpkg|apt|systemd)|cache|log)|run/systemd|tmp)(/|$)' | LC_ALL=C sort
}

# listed FILE...: the files and links in these Debian packages.
listed() { for package; do dpkg-deb --fsys-tarfile "$package" | tar --list; done | grep -v '/$' | sort; }

@test "lintian finds no error and no warning" {
  run lintian --allow-root --fail-on error,warning "$PACKAGES"/*.deb
  [[ $status -eq 0 && -z $output ]]
}

@test "everything that is installed is in exactly one package" {
  diff <(listed "$PACKAGES"/*.deb | uniq -d) /dev/null
  local tree=$BATS_TEST_TMPDIR/tree
  DESTDIR=$tree cmake --install "$BUILD" >/dev/null
  (cd "$tree" && find . ! -type d ! -name LICENSE) | sed 's#/usr/lib/systemd/system/#/lib/systemd/system/#' |
    sort >"$BATS_TEST_TMPDIR/installed"
  # Debian's own, and what Debian wants compressed.
  listed "$PACKAGES"/*.deb | sed 's/\.gz$//' | grep -vE '/(copyright|changelog)$|/lintian/' |
    sort | diff "$BATS_TEST_TMPDIR/installed" -
}

@test "another folder, time zone and umask make the same bytes" {
  (umask 077 && TZ=Asia/Tokyo "$SOURCE/scripts/pack" "$BUILD" "$BATS_TEST_TMPDIR/again") >/dev/null 2>&1
  [[ $(find "$PACKAGES" -name '*.deb' | wc -l) -eq 5 ]]
  for package in "$PACKAGES"/*.deb; do
    cmp "$package" "$BATS_TEST_TMPDIR/again/${package##*/}"
  done
}

@test "no file tells where it was built" {
  for package in "$PACKAGES"/*.deb; do dpkg-deb --extract "$package" "$BATS_TEST_TMPDIR/files"; done
  [[ -x $BATS_TEST_TMPDIR/files/usr/bin/secpolicy ]]
  run grep -rlF "$SOURCE" "$BATS_TEST_TMPDIR/files"
  [[ $status -eq 1 && -z $output ]]
  # The number of a build is made from all that was linked, also from what a package leaves out.
  run -1 bash -c "readelf -d '$BUILD'/lib/lib*.so.*.*.* '$BUILD'/bin/secpolicy | grep 'RUNPATH.*[:[]/'"
}

# rpm_files COMPONENT: the files and links of its RPM package, but for what rpm adds for debuggers.
rpm_files() {
  rpm --query --package --list --verbose "$BATS_TEST_TMPDIR/rpm/$1"-[0-9]*.rpm | grep -v '^d' |
    sed -E 's# -> .*##; s#.* /#/#' | grep -v '/\.build-id/' | sort
}

@test "RPM packages hold the components, and no directory of the system" {
  (cd "$BUILD" && cpack -G RPM -B "$BATS_TEST_TMPDIR/rpm") >"$BATS_TEST_TMPDIR/cpack.log" 2>&1
  for component in libsecpolicy1 libsecpolicyhost1 libsecpolicy-dev secpolicy; do
    local tree=$BATS_TEST_TMPDIR/$component
    DESTDIR=$tree cmake --install "$BUILD" --component "$component" >/dev/null
    (cd "$tree" && find . ! -type d) | sed 's/^.//' | sort | diff - <(rpm_files "$component")
  done
  run -1 bash -c "rpm --query --package --list --verbose '$BATS_TEST_TMPDIR'/rpm/*.rpm | grep ^d |
    grep -v 'secpolicy\|build-id'"
  rpm --query --package --requires "$BATS_TEST_TMPDIR"/rpm/libsecpolicy-dev-*.rpm | grep -q '^libsecpolicyhost1 = '
  rpm --query --package --requires "$BATS_TEST_TMPDIR"/rpm/libsecpolicy1-*.rpm |
    grep -q '^libsecpolicyhost.so.1(SECPOLICYHOST_1)'
}

@test "the units can be verified, expose little, and none is enabled" {
  needs_debian
  local unit
  for unit in boot load module restore metrics drift log; do
    run inside systemd-analyze verify --man=no "secpolicy-$unit.service"
    [[ $status -eq 0 && -z $output ]]
    inside systemd-analyze security --offline=true --threshold=40 --no-pager \
      "/lib/systemd/system/secpolicy-$unit.service"
  done
  inside systemd-analyze verify --man=no secpolicy-metrics.timer secpolicy-drift.timer
  [[ $(inside journalctl --list-catalog) == *" secpolicy: The host has drifted from its security policy"* ]]
  run -1 bash -c "find '$DEBIAN/etc/systemd' -name 'secpolicy*' | grep ."
}

@test "the example boots from installed files, and a program of it is confined" {
  needs_debian
  inside /usr/share/doc/secpolicy/examples/pack-example /srv/host
  inside secpolicy --root /srv/host boot
  run --separate-stderr inside secpolicy --root /srv/host run monitorDom -- /bin/cat /opt/monitor/etc/agent.conf
  [[ $status -eq 0 && $output == *collector.example.org* ]]
  run --separate-stderr inside secpolicy --root /srv/host run monitorDom -- /bin/cat /var/lib/vms/demo/disk
  # shellcheck disable=SC2154  # bats sets it
  [[ $status -ne 0 && $stderr == *"Permission denied"* ]]
}

@test "a program builds with the development package, and runs" {
  needs_debian
  local libraries=$DEBIAN/usr/lib/x86_64-linux-gnu
  # shellcheck disable=SC2046
  PKG_CONFIG_LIBDIR=$libraries/pkgconfig ${CXX:-c++} -std=c++20 \
    "$DEBIAN/usr/share/doc/libsecpolicy-dev/examples/runtime.cpp" -o "$DEBIAN/srv/runtime" \
    $(PKG_CONFIG_LIBDIR=$libraries/pkgconfig pkg-config --cflags --libs secpolicy)
  run inside env SECPOLICY_HOST_STATE=/srv/state/host.db /srv/runtime
  [[ $status -eq 0 && $output == *"job7: /usr/bin/convert 0x11"* ]]
}

# Not in that Debian, which would need Python for it.
@test "the package for Python holds a module that works, and says what it needs" {
  local package=("$PACKAGES"/python3-secpolicy_*.deb)
  dpkg-deb --extract "${package[0]}" "$BATS_TEST_TMPDIR"
  [[ $(dpkg-deb --field "${package[0]}" Depends) == *"python3 (>= 3."*libsqlite3-0* ]]
  cd "$BATS_TEST_TMPDIR/usr/lib/python3/dist-packages"
  run --separate-stderr /usr/bin/python3 -B -c '
import secpolicy, sys
report = secpolicy.check(sys.argv[1], fresh=True)
print(report.errors[0].code, report.errors[0].line)' "$SOURCE/examples/broken"
  [[ $output == "unknown-word 4" && -z $stderr ]]
}

# Runs /started.sh of a copy of that Debian under systemd, and shows what it writes.
under_systemd() {
  timeout --signal=KILL 300 unshare --mount --pid --cgroup --uts --ipc --net --fork --kill-child \
    "$BATS_TEST_DIRNAME/systemd_in" "$1" >"$BATS_TEST_TMPDIR/systemd.log" 2>&1 || true
  cat "$1/started.out"
}

# plans_of DIRECTORY: what published plans name, which have numbers of their own each time.
plans_of() {
  local plan
  for plan in "$1"/*; do strings -n 4 "$plan" | grep -E '^/[a-z]{3}' | sed "s#^#${plan##*/} #"; done
}

@test "under systemd the hardened units do all that the command does without them" {
  needs_debian
  unshare --mount --cgroup sh -ec 'mount -t tmpfs tmpfs /mnt; mkdir /mnt/groups; mount -t cgroup2 cgroup2 /mnt/groups' ||
    skip "systemd needs control groups of its own, which this machine does not give"
  local host=$BATS_TEST_TMPDIR/host
  cp -a "$DEBIAN" "$host"
  cp -a "$host/srv/host/tardisks" "$host/"
  cp -a "$host/srv/host/etc/zorvan" "$host/etc/"
  chroot "$host" systemctl --quiet enable secpolicy-boot secpolicy-restore secpolicy-metrics.timer secpolicy-drift.timer
  cat >"$host/started.sh" <<'END'
systemctl is-active secpolicy-boot secpolicy-restore
cp -r /run/secpolicy/plans /srv/by-boot
touch /opt/monitor/etc/new # which has the label of its directory
systemctl start secpolicy-load && echo loaded
cp -r /run/secpolicy/plans /srv/by-load
secpolicy load
cp -r /run/secpolicy/plans /srv/without
systemctl is-active secpolicy-metrics.timer secpolicy-drift.timer
mkdir -p /var/lib/prometheus/node-exporter
touch /opt/monitor/etc/newer
systemctl start secpolicy-metrics secpolicy-drift
cp -r /var/lib/prometheus/node-exporter /srv/metrics
secpolicy settings enforcement sshDom permissive
systemctl restart secpolicy-restore
secpolicy status
systemctl start secpolicy-drift
systemctl is-failed secpolicy-drift
journalctl --sync
journalctl --no-pager -x SECPOLICY_DOMAIN=sshDom >/srv/journal
END
  run under_systemd "$host"
  echo "$output"
  [[ $output == active$'\n'active$'\nloaded\n'* && $output == *"2 permissive (hostDom sshDom)"* ]]

  # Who is told less of the kernel publishes other plans, or none.
  plans_of "$host/srv/without" | grep -qx 'monitorDom /opt/monitor/bin'
  diff <(plans_of "$host/srv/by-boot") <(plans_of "$host/srv/without")
  diff <(plans_of "$host/srv/by-load") <(plans_of "$host/srv/without")

  # Metrics tell of the host, drift is seen, and the journal has and explains the fields.
  [[ $output == *$'\nactive\nactive\n'* && ${output##*$'\n'} == failed ]]
  grep -qx 'secpolicy_policy_loaded 1' "$host/srv/metrics/secpolicy.prom"
  grep -qx 'secpolicy_drift_check_success 1' "$host/srv/metrics/secpolicy-drift.prom"
  run ! grep -E '^secpolicy_drift_(files|domains|objects).* [^0]' "$host/srv/metrics/secpolicy-drift.prom"
  grep -qx 'secpolicy_drift_domains 1' "$host/var/lib/prometheus/node-exporter/secpolicy-drift.prom"
  grep -q 'secpolicy\[[0-9]*\]: sshDom: enforcing -> permissive$' "$host/srv/journal"
  grep -q 'Subject: A security domain has another enforcement level$' "$host/srv/journal"
}

@test "removal leaves what was kept, and purging leaves nothing but the policy" {
  needs_debian
  rm -r "$DEBIAN"/srv/*
  inside sh -c 'secpolicy init && secpolicy boot && secpolicy settings enforcement appDom permissive' 2>/dev/null
  [[ -f $DEBIAN/run/secpolicy/host.db && -f $DEBIAN/var/lib/secpolicy/config.db ]]

  inside apt-get --yes --quiet remove secpolicy libsecpolicy1 libsecpolicyhost1 libsecpolicy-dev >/dev/null
  [[ ! -e $DEBIAN/usr/bin/secpolicy ]]
  [[ -f $DEBIAN/run/secpolicy/host.db && -f $DEBIAN/var/lib/secpolicy/config.db ]]

  [[ $(inside journalctl --list-catalog) != *" secpolicy: "* ]]

  mkdir -p "$DEBIAN/var/lib/prometheus/node-exporter"
  touch "$DEBIAN/var/lib/prometheus/node-exporter/secpolicy.prom" "$DEBIAN/var/lib/prometheus/node-exporter/secpolicy-drift.prom"
  inside dpkg --purge secpolicy >/dev/null
  rmdir -p "$DEBIAN/var/lib/prometheus/node-exporter" 2>/dev/null || true
  [[ -f $DEBIAN/etc/zorvan/secpolicy/domains/hostDom ]]
  rm -r "$DEBIAN/etc/zorvan"
  files | diff "$BATS_FILE_TMPDIR/clean" -
}
