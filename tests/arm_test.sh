#!/usr/bin/env bash
# arm_test.sh CASE SOURCE PRESET TRIPLE LIBRARY PROTOBUF-ROOT PROTOC LOAD_LIBRARY: what the build for
# ARM makes, and of what.
set -euo pipefail
export LC_ALL=C
source=$2
preset=$3
triple=$4
library=$5
protobuf=$6
protoc=$7
load_library=$8
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
# shellcheck source=SCRIPTDIR/installed.sh
. "$(dirname "$0")/installed.sh"

# has PATTERN OPTION: readelf says so about the library.
has() {
  local said
  said=$(readelf -W "$2" "$library")
  grep -Eq "$1" <<<"$said" || fail "readelf $2 says something else than '$1': $said"
}

case $1 in
  library_is_for_32_bit_arm)
    has 'Class: +ELF32' -h
    has 'Machine: +ARM' -h
    ;;
  library_is_for_armv7) has 'Tag_CPU_arch: v7' -A ;;
  library_has_the_abi_of_its_name)
    case $triple in
      *hf) has 'Flags:.* hard-float ABI' -h ;;
      *) has 'Flags:.* soft-float ABI' -h ;;
    esac
    ;;
  device_sdk_is_used)
    # An SDK of Debian's files, whose compilers have names of their own.
    sdk=$scratch/sdk
    mkdir -p "$sdk/bin"
    ln -s "$(command -v "$triple-gcc")" "$sdk/bin/device-gcc"
    ln -s "$(command -v "$triple-g++")" "$sdk/bin/device-g++"
    make_sysroot "$triple" "$sdk/sysroot"
    cp -r "$protobuf/lib" "$protobuf/include" "$sdk/sysroot/usr"
    "$sdk/bin/device-gcc" --sysroot="$sdk/sysroot" -shared -fPIC "$source/platform/dlog/dlog_standin.c" \
      -Wl,-soname,libdlog.so.0 -o "$sdk/sysroot/usr/lib/libdlog.so.0"
    ln -s libdlog.so.0 "$sdk/sysroot/usr/lib/libdlog.so"

    # As in README.md, but for what would take longer.
    (
      cd "$source"
      cmake --preset "$preset" -B "$scratch/build" -DCMAKE_SYSROOT="$sdk/sysroot" \
        -DCMAKE_C_COMPILER="$sdk/bin/device-gcc" -DCMAKE_CXX_COMPILER="$sdk/bin/device-g++" \
        -DQEL_PROTOBUF_ROOT="$sdk/sysroot/usr" -DQEL_PROTOC="$protoc" \
        -DBUILD_TESTING=OFF -DCMAKE_CXX_FLAGS_RELEASE=-O0 &&
        cmake --build "$scratch/build" --target qel-message-protosvc &&
        ctest --test-dir "$scratch/build" -j 2 --output-on-failure
    ) >"$scratch/messages" 2>&1 || fail "$(cat "$scratch/messages")"
    grep -q "log service  *$sdk/sysroot/usr/lib/libdlog.so$" "$scratch/messages" ||
      fail "another dlog: $(cat "$scratch/messages")"
    for compiler in gcc g++; do
      grep -q "$sdk/bin/device-$compiler .*--sysroot=$sdk/sysroot " \
        "$scratch/build/compile_commands.json" || fail "device-$compiler is not used"
    done
    library=$scratch/build/proto-lib/libqel-message-protosvc.so
    has 'NEEDED.*\[libdlog\.so\.0\]' -d
    has 'NEEDED.*\[libprotobuf\.so\.9\]' -d
    qemu-arm -L "$sdk/sysroot" "$load_library" "$library"

    # Installed, it leaves the search for them to the device, whose folder of libraries is its own.
    cmake --install "$scratch/build" --prefix "$scratch/installed" --component runtime >"$scratch/messages"
    library=$scratch/installed/lib/libqel-message-protosvc.so.1
    has 'SONAME' -d
    [[ $(readelf -dW "$library") != *PATH* ]] || fail 'it has a path to look for libraries'
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
