#!/usr/bin/env bats
# The packages that './dev package' makes with a device SDK: here one of Debian's files, with compilers of
# other names, for the hard-float ABI of ARM.
# shellcheck disable=SC2034 # what build.bash reads
export QEL_BUILD=${QEL_BUILD:-$BATS_TEST_DIRNAME/../build/armhf}
load build
LIBDIR=lib # the SDK's

sdk=$BATS_FILE_TMPDIR/sdk
sysroot=$sdk/sysroot
made=$SOURCE/build/packages
library=$made/libqel-message-protosvc$FIRST

setup_file() {
  mkdir -p "$sdk/bin"
  ln -s "$(command -v "$TRIPLE-gcc")" "$sdk/bin/device-gcc"
  ln -s "$(command -v "$TRIPLE-g++")" "$sdk/bin/device-g++"
  make_sysroot "$sysroot"
  cp -r "$PROTOBUF/lib" "$PROTOBUF/include" "$sysroot/usr"
  "$sdk/bin/device-gcc" --sysroot="$sysroot" -shared -fPIC "$SOURCE/platform/dlog/dlog_standin.c" \
    -Wl,-soname,libdlog.so.0 -o "$sysroot/usr/lib/libdlog.so.0"
  ln -s libdlog.so.0 "$sysroot/usr/lib/libdlog.so"
  CC=$sdk/bin/device-gcc CXX=$sdk/bin/device-g++ CMAKE_SYSROOT=$sysroot QEL_PROTOBUF_ROOT=$sysroot/usr \
    QEL_DLOG_LIBRARY=$sysroot/usr/lib/libdlog.so QEL_DLOG_PACKAGE=device-log "$SOURCE/dev" package "$ARCHITECTURE"
  # As README.md builds by hand.
  cmake -S "$SOURCE" --preset "$ARCHITECTURE" -B "$sdk/configured" -DCMAKE_SYSROOT="$sysroot" \
    -DCMAKE_C_COMPILER="$sdk/bin/device-gcc" -DCMAKE_CXX_COMPILER="$sdk/bin/device-g++" \
    -DQEL_PROTOBUF_ROOT="$sysroot/usr" -DQEL_PROTOC="$PROTOC" \
    -DQEL_DLOG_LIBRARY="$sysroot/usr/lib/libdlog.so" -DBUILD_TESTING=OFF >"$sdk/says"
  cp -r "$sysroot" "$sdk/rpm" # where RPMs are installed
  dpkg-deb -x "$library"_*.deb "$sysroot"
  dpkg-deb -x "$made"/libqel-message-protosvc-dev_*.deb "$sysroot"
}

@test "the library's package needs the device's own and nothing of ours" {
  dpkg-deb -f "$library"_*.deb Depends >needed
  diff needed - <<<'libc6 (>= 2.36), libgcc-s1 (>= 3.5), libstdc++6, device-log, libprotobuf9 (>= 2.6.1)'
  printf '%s\n' "$made"/* | grep -E 'emulator|workstation|qel-wire' | none
}

@test "the library needs the device's log service and runtime, and leaves the search to the device" {
  run -0 readelf -dW "$sysroot/usr/lib/libqel-message-protosvc.so"
  [[ $output == *'[libdlog.so.0]'* && $output == *'[libprotobuf.so.9]'* && $output != *PATH* ]]
  qemu-arm -L "$sysroot" "$BUILD/tests/load_library" libqel-message-protosvc.so
}

@test "a plug-in in C is built with what is in the sysroot" {
  compile_c "$sysroot/usr" -o plugin
  prints 'probe 7, answer of 2 bytes' "$sysroot/usr" ./plugin
}

@test "a module that uses the classes is built with what is in the sysroot" {
  compile_with_cmake "$sysroot/usr" classes
  prints 'ClientEcho 7' "$sysroot/usr" built/module
}

@test "the RPM needs the device's own and nothing of ours" {
  rpm -qp --requires "$made"/qel-message-protosvc-[0-9]*.rpm | grep '^lib[a-z]*\.so\.[0-9]*' |
    sed 's/(.*//' | sort -u >needed
  [ "$(grep -E 'libdlog|libprotobuf' needed | xargs)" = 'libdlog.so.0 libprotobuf.so.9' ]
  grep -Ev '^lib(dlog|protobuf|stdc\+\+|gcc_s|m|c)\.so' needed | none
}

@test "the recorder's packages have the same file, and need the C library alone" {
  mkdir deb
  dpkg-deb -x "$made"/qel-trace_*.deb deb
  dpkg-deb -f "$made"/qel-trace_*.deb Depends | grep -x 'libc6 ([^,]*), libgcc-s1 ([^,]*)'
  rpm -qpl "$made"/qel-message-protosvc-trace-*.rpm | diff - <(cd deb && find /usr/lib ./usr/lib -name 'libqel-trace.so' | sed 's/^\.//')
}

@test "a plug-in in C is built and run with what the RPMs install" {
  fakeroot rpm --root "$sdk/rpm" --dbpath /var/lib/rpm --nodeps --ignorearch --ignoreos -i \
    "$made"/qel-message-protosvc-{[0-9]*,devel*}.rpm
  [ -e "$sdk/rpm/usr/lib/libqel-message-protosvc.so" ]
  compile_c "$sdk/rpm/usr" -o plugin
  prints 'probe 7, answer of 2 bytes' "$sdk/rpm/usr" ./plugin
}

# has_lines LIBRARY DEBUG-FILES: they are of this library, and tell the line of a function.
has_lines() {
  local id address
  id=$("$READELF" -nW "$1" | sed -n 's/.*Build ID: //p')
  address=$("$NM" -D "$1" | sed -n 's/ T client_echo_deserialize$//p')
  "${NM%nm}addr2line" -e "$2/usr/lib/debug/.build-id/${id:0:2}/${id:2}.debug" "0x$address" |
    grep -E '^(\./)*proto-lib/qel-message-serialize\.cc:[0-9]+'
}

@test "the packages of debug symbols tell the lines" {
  mkdir deb rpm
  dpkg-deb -x "$library"-dbgsym_*.deb deb
  has_lines "$sysroot/usr/lib/libqel-message-protosvc.so" deb
  fakeroot rpm --root "$PWD/rpm" --nodeps --ignorearch --ignoreos -i "$made"/qel-message-protosvc-debuginfo-*.rpm
  has_lines "$sdk/rpm/usr/lib/libqel-message-protosvc.so" rpm
}

@test "by hand, CMake takes what the SDK brings" {
  grep "log service *$sysroot/usr/lib/libdlog.so" "$sdk/says"
  for compiler in gcc g++; do
    grep -q "$sdk/bin/device-$compiler .*--sysroot=$sysroot " "$sdk/configured/compile_commands.json"
  done
}
