# What is installed can be used: by other builds, and as a command.

load helper
load pages

# Installs once for all tests of this file.
setup_file() {
  export PREFIX=$BATS_FILE_TMPDIR/prefix
  cmake --install "$BUILD_DIR" --prefix "$PREFIX" >"$BATS_FILE_TMPDIR/install.log"
  # shellcheck disable=SC2155
  export PKG_CONFIG_PATH=$(dirname "$(find "$PREFIX" -name secpolicy.pc)")
}

# runs_as_service PROGRAM: the program is the runtime example, and works. It needs both libraries: it
# calls the one, and makes the connection that it hands to it from the other.
runs_as_service() {
  SECPOLICY_HOST_STATE=$BATS_TEST_TMPDIR/state/host.db LD_LIBRARY_PATH=$(dirname "$PKG_CONFIG_PATH") \
    run --separate-stderr "$1"
  exits 0
  shows "job7: /usr/bin/convert 0x11"
  shows "-c cap_net_bind_service grant"
  shows "-p bind_port 80 grant"
}

@test "a program builds with pkg-config against what is installed, as the page on it shows" {
  # A program links the sanitizers when the library does.
  # shellcheck disable=SC2086
  c++() { command "${CXX:-c++}" $SANITIZER "$@"; }
  export LD_LIBRARY_PATH
  LD_LIBRARY_PATH=$(dirname "$PKG_CONFIG_PATH")
  cd "$BATS_TEST_TMPDIR"
  ln -s "$SOURCE/examples" .
  runs_as_written "$SOURCE/docs/embed.md"
}

@test "a program builds with find_package against what is installed" {
  cat >"$BATS_TEST_TMPDIR/CMakeLists.txt" <<EOF
cmake_minimum_required(VERSION 3.25)
project(service LANGUAGES CXX)
find_package(secpolicy 1 REQUIRED)
add_executable(runtime "$SOURCE/examples/runtime.cpp")
target_link_libraries(runtime PRIVATE secpolicy::secpolicy)
EOF
  CXXFLAGS=$SANITIZER cmake -G Ninja -S "$BATS_TEST_TMPDIR" -B "$BATS_TEST_TMPDIR/build" \
    -DCMAKE_PREFIX_PATH="$PREFIX"
  cmake --build "$BATS_TEST_TMPDIR/build"
  runs_as_service "$BATS_TEST_TMPDIR/build/runtime"
}

# All of it takes a minute.
@test "a program builds with this project as a part of its own" {
  cat >"$BATS_TEST_TMPDIR/CMakeLists.txt" <<EOF
cmake_minimum_required(VERSION 3.25)
project(service LANGUAGES CXX)
include(FetchContent)
FetchContent_Declare(secpolicy SOURCE_DIR "$SOURCE")
FetchContent_MakeAvailable(secpolicy)
add_executable(runtime "$SOURCE/examples/runtime.cpp")
target_link_libraries(runtime PRIVATE secpolicy::secpolicy)
EOF
  CXXFLAGS=$SANITIZER cmake -G Ninja -S "$BATS_TEST_TMPDIR" -B "$BATS_TEST_TMPDIR/build"
  local targets
  targets=$(cmake --build "$BATS_TEST_TMPDIR/build" --target help)
  [[ $targets != *test* && $targets != *secpolicy_cli* && $targets != *CLI11* ]]
  if [[ -z ${SECPOLICY_LONG_TESTS-} ]]; then
    cmake --build "$BATS_TEST_TMPDIR/build" --target CMakeFiles/runtime.dir/"${SOURCE#/}"/examples/runtime.cpp.o
    return
  fi
  cmake --build "$BATS_TEST_TMPDIR/build"
  runs_as_service "$BATS_TEST_TMPDIR/build/runtime"
}

@test "the installed command finds its libraries" {
  export SECPOLICY=$PREFIX/bin/secpolicy
  boot
  secpolicy display
  exits 0
  shows "/tardisks/monitor.tgz (monitorImage)"
}

@test "a boot names the library that is missing, and nothing else misses it" {
  boot
  cp -r "$PREFIX" "$BATS_TEST_TMPDIR/prefix"
  find "$BATS_TEST_TMPDIR/prefix" -name 'libsecpolicyhost-archive.so*' -delete
  export SECPOLICY=$BATS_TEST_TMPDIR/prefix/bin/secpolicy
  secpolicy boot
  exits 1
  [[ $stderr == "secpolicy: boot: Unable to load what unpacks tardisks: libsecpolicyhost-archive.so.1: "*". It is installed with this command: install secpolicy again" ]]
  secpolicy load
  exits 0
}

@test "manual pages, completions and units are installed" {
  [[ -f $PREFIX/share/man/man5/secpolicy.5 && -f $PREFIX/share/man/man8/secpolicy.8 ]]
  [[ -f $PREFIX/share/bash-completion/completions/secpolicy ]]
  [[ -f $PREFIX/share/zsh/vendor-completions/_secpolicy ]]
  [[ -f $PREFIX/share/fish/vendor_completions.d/secpolicy.fish ]]
  for unit in boot restore load; do
    grep -q "^ExecStart=/.*/secpolicy $unit$" "$PREFIX/lib/systemd/system/secpolicy-$unit.service"
  done
  grep -q "^ExecStart=/.*/secpolicy module start$" "$PREFIX/lib/systemd/system/secpolicy-module.service"
  for unit in metrics drift; do
    [[ -f $PREFIX/lib/systemd/system/secpolicy-$unit.service && -f $PREFIX/lib/systemd/system/secpolicy-$unit.timer ]]
  done
  [[ ! -e $BUILD_DIR/bin/secpolicy-log ]] || {
    [[ -x $PREFIX/bin/secpolicy-log && -f $PREFIX/share/man/man8/secpolicy-log.8 ]]
    [[ -f $PREFIX/share/bash-completion/completions/secpolicy-log && -f $PREFIX/share/zsh/vendor-completions/_secpolicy-log ]]
    [[ -f $PREFIX/share/fish/vendor_completions.d/secpolicy-log.fish ]]
    grep -q '^ExecStart=/.*/secpolicy-log$' "$PREFIX/lib/systemd/system/secpolicy-log.service"
  }
  [[ -f $PREFIX/lib/systemd/catalog/secpolicy.catalog && -f $PREFIX/share/doc/secpolicy/examples/monitoring/alerts.yaml ]]
}

@test "links between the installed documents lead on" {
  local page target count=0
  while IFS=: read -r page target; do
    [[ -e $(dirname "$page")/$target ]] || { echo "$page: $target" && return 1; }
    ((++count))
  done < <(grep --recursive --only-matching --perl-regexp '\]\(\K[^):# ]+(?=[)#])' \
    --include='*.md' "$PREFIX/share/doc")
  ((count > 50))
  # What is not installed is named all the same.
  grep --quiet CONTRIBUTING "$PREFIX/share/doc/secpolicy/README.md"
}

@test "installed headers stand alone" {
  while read -r header; do
    ${CXX:-c++} -std=c++20 -fsyntax-only -I "$PREFIX/include/libsecpolicy" -x c++ "$header"
  done < <(find "$PREFIX/include/libsecpolicy" -name '*.h')
}
