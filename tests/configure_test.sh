#!/usr/bin/env bash
# configure_test.sh CASE SOURCE PROTOBUF-ROOT LIBRARY CXX: what the build says and refuses when it is
# configured. LIBRARY stands for a device's dlog.
set -euo pipefail
source=$2
protobuf=$3
library=$4
cxx=$5
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# configure OPTION...: its messages, as one line, go to $messages.
configure() {
  local status=0
  cmake -S "$source" -B "$scratch/build" -G Ninja -DCMAKE_CXX_COMPILER="$cxx" -DBUILD_TESTING=OFF \
    "$@" >"$scratch/messages" 2>&1 || status=$?
  messages=$(tr -s ' \n' '  ' <"$scratch/messages")
  return "$status"
}

expect() {
  [[ $messages == *"$1"* ]] && return
  printf 'expected: %s\nsaid: %s\n' "$1" "$messages" >&2
  exit 1
}

refused() {
  ! configure "$@" && return
  echo 'was not refused' >&2
  exit 1
}

# headers NUMBER: an installation of that version, which has nothing else, in $scratch/other.
headers() {
  mkdir -p "$scratch/other/include/google/protobuf/stubs"
  echo "#define GOOGLE_PROTOBUF_VERSION $1" >"$scratch/other/include/google/protobuf/stubs/common.h"
}

# compiler VERSION: one that says so and does nothing, $scratch/protoc.
compiler() {
  printf '#!/bin/sh\necho libprotoc %s\n' "$1" >"$scratch/protoc"
  chmod +x "$scratch/protoc"
}

case $1 in
  another_series_of_headers)
    headers 3021012
    refused -DQEL_PROTOBUF_ROOT="$scratch/other"
    expect "This library needs Protocol Buffers 2.6.1, but $scratch/other has 3.21.12."
    ;;
  older_headers)
    headers 2006000
    refused -DQEL_PROTOBUF_ROOT="$scratch/other"
    expect "This library needs Protocol Buffers 2.6.1, but $scratch/other has 2.6.0."
    ;;
  another_series_of_compiler)
    compiler 3.21.12
    refused -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_PROTOC="$scratch/protoc"
    expect "This library needs the compiler of Protocol Buffers 2.6.1, but $scratch/protoc is of 3.21.12."
    ;;
  older_compiler)
    compiler 2.6.0
    refused -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_PROTOC="$scratch/protoc"
    expect "This library needs the compiler of Protocol Buffers 2.6.1, but $scratch/protoc is of 2.6.0."
    ;;
  no_runtime)
    refused -DQEL_PROTOBUF_ROOT="$scratch/nowhere"
    expect "No Protocol Buffers in $scratch/nowhere: let QEL_PROTOBUF_ROOT name an installation's folder, or leave it out and run './dev setup'."
    ;;
  compiler_that_does_not_run)
    refused -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_PROTOC="$scratch/nowhere"
    expect "The schema's compiler $scratch/nowhere does not run here: let QEL_PROTOC name a protoc 2.6.1 of this machine."
    ;;
  folder_of_libraries_that_is_named)
    configure -DQEL_PROTOBUF_ROOT="$protobuf" -DCMAKE_INSTALL_LIBDIR=lib
    # shellcheck disable=SC2016 # pkg-config's variables
    grep -qx 'prefix=${pcfiledir}/../..' "$scratch/build/packaging/qel-message-protosvc.pc"
    # shellcheck disable=SC2016
    grep -qx 'libdir=${prefix}/lib' "$scratch/build/packaging/qel-message-protosvc.pc"
    ;;
  device_log_that_is_named)
    configure -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_DLOG_LIBRARY="$library"
    expect "log service $library "
    ;;
  device_log_that_is_found)
    mkdir "$scratch/lib"
    cp "$library" "$scratch/lib/libdlog.so"
    configure -DQEL_PROTOBUF_ROOT="$protobuf" -DCMAKE_LIBRARY_PATH="$scratch/lib"
    expect "log service $scratch/lib/libdlog.so "
    ;;
  device_log_that_is_missing)
    refused -DQEL_PROTOBUF_ROOT="$protobuf" -DQEL_DLOG_LIBRARY="$scratch/nowhere.so"
    expect "QEL_DLOG_LIBRARY names $scratch/nowhere.so, which does not exist."
    ;;
  no_device_log)
    configure -DQEL_PROTOBUF_ROOT="$protobuf"
    expect 'log service workstation stand-in (platform/dlog)'
    ;;
  build_types_keep_assertions)
    for type in Release RelWithDebInfo MinSizeRel; do
      rm -rf "$scratch/build"
      configure -DQEL_PROTOBUF_ROOT="$protobuf" -DCMAKE_BUILD_TYPE="$type"
      if grep 'NDEBUG' "$scratch/build/build.ninja"; then
        exit 1
      fi
    done
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
