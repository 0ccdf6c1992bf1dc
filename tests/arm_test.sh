#!/usr/bin/env bash
# arm_test.sh CASE SOURCE TRIPLE LIBRARY PROTOBUF-ROOT PROTOC DLOG: what the build for ARM makes, and of
# what. DLOG stands for a device's dlog.
set -euo pipefail
export LC_ALL=C
source=$2
triple=$3
library=$4
protobuf=$5
protoc=$6
dlog=$7
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

fail() {
  printf '%s\n' "$*" >&2
  exit 1
}

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
    mkdir -p "$sdk/bin" "$sdk/sysroot/usr"
    ln -s "$(command -v "$triple-gcc")" "$sdk/bin/device-gcc"
    ln -s "$(command -v "$triple-g++")" "$sdk/bin/device-g++"
    cp -rs "/usr/$triple/lib" "/usr/$triple/include" "$sdk/sysroot/usr"
    ln -s usr/lib "$sdk/sysroot/lib"
    ln -s "/usr/$triple" "$sdk/sysroot/usr/$triple" # by which libc.so names what it is made of
    cp "$dlog" "$sdk/sysroot/usr/lib/libdlog.so"
    cmake -S "$source" -B "$scratch/build" -G Ninja -DBUILD_TESTING=OFF \
      --toolchain "$source/cmake/toolchain-$triple.cmake" -DCMAKE_SYSROOT="$sdk/sysroot" \
      -DCMAKE_C_COMPILER="$sdk/bin/device-gcc" -DCMAKE_CXX_COMPILER="$sdk/bin/device-g++" \
      -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_PROTOC="$protoc" >"$scratch/messages" 2>&1 ||
      fail "$(cat "$scratch/messages")"
    grep -q "log service  *$sdk/sysroot/usr/lib/libdlog.so$" "$scratch/messages" ||
      fail "another dlog: $(cat "$scratch/messages")"
    for compiler in gcc g++; do
      grep -q "$sdk/bin/device-$compiler .*--sysroot=$sdk/sysroot " \
        "$scratch/build/compile_commands.json" || fail "device-$compiler is not used"
    done
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
