#!/usr/bin/env bats
# The packages that './dev package' has made for the machine of the build folder: whether they can be
# installed beside this machine's, used, debugged and removed.
# shellcheck disable=SC2030,SC2031 # a test has variables of its own
load build

made=${QEL_PACKAGES:-$SOURCE/build/packages}
root=$BATS_FILE_TMPDIR/root # where they are installed
libraries=$root/usr/$LIBDIR
native=$(dpkg --print-architecture)
runtime=("libqel-message-protosvc$FIRST" qel-message-protosvc-workstation)
installed=("${runtime[@]/%/:$native}"
  {libqel-message-protosvc-dev,qel-message-testkit,qel-trace,qel-wire}:"$native")
if [ -n "$TOOLCHAIN" ]; then
  runtime=(qel-message-protosvc-emulator)
  installed+=({qel-message-protosvc-emulator,libqel-message-protosvc-dev,qel-trace}:"$ARCHITECTURE")
fi

setup_file() {
  make_root
  local package debs=()
  for package in "${installed[@]}" "${runtime[@]/%/-dbgsym:$ARCHITECTURE}"; do
    debs+=("$(deb "${package%:*}" "${package#*:}")")
  done
  in_root --install "${debs[@]}"
}

# deb PACKAGE [ARCHITECTURE]: its file.
deb() { echo "$made/$1"_*"_${2:-$ARCHITECTURE}.deb"; }

# Makes $root, where dpkg knows no more than base libraries, for this machine and for the other one.
make_root() {
  mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
  printf '%s\n' "$native" armhf armel >"$root/var/lib/dpkg/arch"
  local name architecture
  for name in libc6 libgcc-s1 libstdc++6 libnettle8 libpcap0.8 libutf8proc2; do
    for architecture in $(printf '%s\n' "$native" "$ARCHITECTURE" | sort -u); do
      dpkg-query -W -f="Package: $name\nArchitecture: $architecture\nMulti-Arch: same\nMaintainer: nobody
Status: install ok installed\nVersion: \${Version}\nDescription: \${binary:Summary}\n\n" "$name"
    done
  done >"$root/var/lib/dpkg/status"
}

# in_root OPTION...: dpkg, as the administrator of $root calls it.
in_root() { PATH=$PATH:/usr/sbin:/sbin fakeroot dpkg --root="$root" --log=/dev/null "$@"; }

# run_installed PROGRAM [ARGUMENT...]: where the loader knows the folder of the packages' libraries.
run_installed() {
  if [ -n "$TOOLCHAIN" ]; then
    qemu-arm -L "/usr/$TRIPLE" -E LD_LIBRARY_PATH="$libraries" "$@"
  else
    LD_LIBRARY_PATH=$libraries "$@"
  fi
}

# compile SOURCE [MODULE]: a program in C of the installed packages, which finds its library as a device's
# does.
compile() {
  local flags
  flags_of "$root/usr" "${2:-qel-message-protosvc}"
  "$CC" -std=c99 -Wall -Wextra -Werror -g -no-pie "$1" "${flags[@]}" -o program
}

@test "lintian finds nothing without a reason" {
  lintian --allow-root --tag-display-limit 0 --fail-on error,warning "$made"/*_{"$ARCHITECTURE",all}.deb \
    "$made"/*.dsc
}

@test "nothing in packages names the build" {
  for file in "$made"/*_{"$ARCHITECTURE",all}.deb; do [ ! -e "$file" ] || dpkg-deb -R "$file" "${file##*/}"; done
  find . -name '*.gz' -exec gunzip {} +
  find . -name '*.debug' -exec "${NM%nm}objcopy" --decompress-debug-sections {} ';'
  grep -rlF -e "$SOURCE" -e "$PROTOBUF" -e release-work . | none
}

@test "README.md names the files to install" {
  [ -z "$TOOLCHAIN" ] || skip "this machine's"
  read -r _ _ _ files < <(grep '^sudo apt install ' "$SOURCE/README.md")
  ln -s "$made" packages
  mkdir build
  ln -s "$made" build/packages
  eval "ls -d $files"
}

@test "a plug-in in C runs" {
  compile "$SOURCE/tests/consumers/c/plugin.c"
  DLOG_STANDIN_PRIORITY=S run -0 run_installed ./program
  [ "$output" = 'probe 7, answer of 2 bytes' ]
}

@test "the recorder records a plug-in in C" {
  compile "$SOURCE/tests/consumers/c/plugin.c"
  local preload=LD_PRELOAD=libqel-trace.so
  [ -z "$TOOLCHAIN" ] || preload=QEMU_SET_ENV=$preload
  (export "${preload?}" QEL_TRACE_FILE=session DLOG_STANDIN_PRIORITY=S && run_installed ./program)
  "$SOURCE/qel-trace/tests/session.py" session >found
  diff <(cut -d ' ' -f 2-4 found) - <<'TXT'
received done client_echo_deserialize
sent done client_echo_reply_serialize
TXT
}

@test "the library is found by its name without a number, with what runs it alone" {
  mkdir alone
  for package in "${runtime[@]}"; do dpkg-deb -x "$(deb "$package")" alone; done
  libraries=$PWD/alone/usr/$LIBDIR
  run_installed "$BUILD/tests/load_library" libqel-message-protosvc.so
}

@test "the library's package needs its runtime, where that is another one" {
  [ -n "$TOOLCHAIN" ] || dpkg-deb -f "$(deb "${runtime[0]}")" Depends | grep -q 'protosvc-workstation (>= '
}

@test "the package of symbols tells since when there is a function" {
  [ -n "$TOOLCHAIN" ] || dpkg-deb -I "$(deb "${runtime[0]}")" symbols | grep -x ' client_echo_deserialize@Base 1.0.0'
}

@test "a package for ARM without the device's log service is for an emulator, and says so" {
  [ -n "$TOOLCHAIN" ] || skip 'of ARM'
  [ ! -e "$(deb "libqel-message-protosvc$FIRST")" ]
  dpkg-deb -f "$(deb "${runtime[0]}")" Description | grep 'This package is not for a device'
}

@test "a debugger shows the lines of a crash, in a core file of ARM too" {
  compile "$SOURCE/tests/consumers/c/crash.c"
  local gdb=(gdb-multiarch -batch -nx -ex "set debug-file-directory $root/usr/lib/debug")
  if [ -n "$TOOLCHAIN" ]; then
    ulimit -c unlimited
    run run_installed ./program # the emulator writes the core file
    gdb+=(-ex "set sysroot /usr/$TRIPLE" -ex "set solib-search-path $libraries:/usr/$TRIPLE/lib"
      -ex 'file program' -ex "core-file $(echo qemu_program*.core)")
  else
    gdb+=(-ex "set environment LD_LIBRARY_PATH=$libraries" -ex 'file program' -ex run)
  fi
  run -0 "${gdb[@]}" -ex backtrace
  says 'client_echo_deserialize (data='
  [[ $output =~ proto-lib/[a-z._-]+:[0-9]+.*'main () at '.*'crash.c:'[0-9]+ ]]
}

@test "the tool runs, and has a man page" {
  [ -z "$TOOLCHAIN" ] || skip 'it is for workstations'
  run -0 run_installed "$root/usr/bin/qel-wire" --version
  [ "$output" = "qel-wire $VERSION" ]
  zgrep 'broken at offset\|explain' "$root/usr/share/man/man1/qel-wire.1.gz"
}

@test "the first test of docs/testing.md is good, and needs a C compiler alone" {
  [ -z "$TOOLCHAIN" ] || skip 'it is for workstations'
  take_examples
  compile first.c qel-message-testkit
  DLOG_STANDIN_PRIORITY=S run -0 run_installed ./program
  [ "$output" = good ]
}

@test "the test kit's program plays a scenario of its package" {
  [ -z "$TOOLCHAIN" ] || skip 'it is for workstations'
  take_examples
  run_installed "$root/usr/bin/qel-testkit" \
    --scenario "$root/usr/share/qel-message-protosvc/scenarios/connection.scenario" <lines >said
  diff answers said
}

@test "nothing is left where the packages are removed" {
  in_root --remove "${installed[@]}" "${runtime[@]/%/-dbgsym:$ARCHITECTURE}"
  find "$root" -path "$root/var/lib/dpkg" -prune -o \
    '(' -name '*qel*' -o -name 'libprotobuf*' -o -name 'libdlog*' ')' -print | none
}
