#!/usr/bin/env bats
# What the build says and refuses when it is configured.
load build

configure() {
  cmake -S "$SOURCE" -B build -G Ninja -DCMAKE_CXX_COMPILER="$CXX" -DBUILD_TESTING=OFF \
    -DQEL_PROTOBUF_ROOT="$PROTOBUF" "$@"
}

@test "headers of another version are refused" {
  mkdir -p other/include/google/protobuf/stubs
  while read -r number version; do
    echo "#define GOOGLE_PROTOBUF_VERSION $number" >other/include/google/protobuf/stubs/common.h
    refused "This library needs Protocol Buffers 2.6.1, but $PWD/other has $version." \
      configure -DQEL_PROTOBUF_ROOT="$PWD/other"
  done <<<$'2006000 2.6.0\n3021012 3.21.12'
}

@test "a schema compiler of another version is refused" {
  for version in 2.6.0 3.21.12; do
    printf '#!/bin/sh\necho libprotoc %s\n' "$version" >protoc
    chmod +x protoc
    refused "needs the compiler of Protocol Buffers 2.6.1, but $PWD/protoc is of $version." \
      configure -DQEL_PROTOC="$PWD/protoc"
  done
}

@test "what is named and not there is refused" {
  refused "No Protocol Buffers in /absent: let QEL_PROTOBUF_ROOT name an installation's folder, or \
leave it out and run './dev setup'." configure -DQEL_PROTOBUF_ROOT=/absent
  refused "The schema's compiler /absent does not run here: let QEL_PROTOC name a protoc 2.6.1 of \
this machine." configure --fresh -DQEL_PROTOC=/absent
  refused 'QEL_DLOG_LIBRARY names /absent, which does not exist.' \
    configure --fresh -DQEL_DLOG_LIBRARY=/absent
}

@test "the device's log service is the one that is named, the one that is found, or the stand-in" {
  run -0 configure -DQEL_DLOG_LIBRARY="$DLOG"
  says "log service $DLOG "
  mkdir lib
  cp "$DLOG" lib/libdlog.so
  run -0 configure --fresh -DCMAKE_LIBRARY_PATH="$PWD/lib"
  says "log service $PWD/lib/libdlog.so "
  [ "$DLOG_STANDIN" = 1 ] || skip 'CMake finds one on this machine'
  run -0 configure --fresh
  says 'log service workstation stand-in (platform/dlog)'
}

@test "a folder of libraries that is named is that of the pkg-config file" {
  configure -DCMAKE_INSTALL_LIBDIR=lib
  # shellcheck disable=SC2016 # pkg-config's variables
  diff <(printf '%s\n' 'prefix=${pcfiledir}/../..' 'libdir=${prefix}/lib') \
    <(grep -E '^(prefix|libdir)=' build/packaging/qel-message-protosvc.pc)
}

@test "every type of build keeps assertions" {
  for type in Release RelWithDebInfo MinSizeRel; do
    configure --fresh -DCMAKE_BUILD_TYPE="$type"
    grep 'NDEBUG' build/build.ninja | none
  done
}
