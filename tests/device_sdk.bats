#!/usr/bin/env bats
# The build for a device as README.md shows it, but for what would take longer: with an SDK of
# Debian's files, whose compilers have names of their own.
load build

@test "the library is built with what an SDK brings" {
  sdk=$PWD/sdk
  mkdir -p "$sdk/bin"
  ln -s "$(command -v "$TRIPLE-gcc")" "$sdk/bin/device-gcc"
  ln -s "$(command -v "$TRIPLE-g++")" "$sdk/bin/device-g++"
  make_sysroot "$sdk/sysroot"
  cp -r "$PROTOBUF/lib" "$PROTOBUF/include" "$sdk/sysroot/usr"
  "$sdk/bin/device-gcc" --sysroot="$sdk/sysroot" -shared -fPIC \
    "$SOURCE/platform/dlog/dlog_standin.c" \
    -Wl,-soname,libdlog.so.0 -o "$sdk/sysroot/usr/lib/libdlog.so.0"
  ln -s libdlog.so.0 "$sdk/sysroot/usr/lib/libdlog.so"
  folder=$PWD/build
  cd "$SOURCE"
  run -0 cmake --preset "$ARCHITECTURE" -B "$folder" -DCMAKE_SYSROOT="$sdk/sysroot" \
    -DCMAKE_C_COMPILER="$sdk/bin/device-gcc" -DCMAKE_CXX_COMPILER="$sdk/bin/device-g++" \
    -DQEL_PROTOBUF_ROOT="$sdk/sysroot/usr" -DQEL_PROTOC="$PROTOC" \
    -DBUILD_TESTING=OFF -DCMAKE_CXX_FLAGS_RELEASE=-O0
  says "log service $sdk/sysroot/usr/lib/libdlog.so "
  cmake --build "$folder" --target qel-message-protosvc
  ctest --test-dir "$folder" -j 2 --output-on-failure
  for compiler in gcc g++; do
    grep -q "$sdk/bin/device-$compiler .*--sysroot=$sdk/sysroot " "$folder/compile_commands.json"
  done
  library=$folder/proto-lib/libqel-message-protosvc.so
  readelf -dW "$library" | grep 'NEEDED.*\[libdlog\.so\.0\]'
  readelf -dW "$library" | grep 'NEEDED.*\[libprotobuf\.so\.9\]'
  qemu-arm -L "$sdk/sysroot" "$BUILD/tests/load_library" "$library"

  # Installed, it leaves the search for them to the device, whose folder of libraries is its own.
  cmake --install "$folder" --prefix "$folder/installed" --component runtime
  run -0 readelf -dW "$folder/installed/lib/libqel-message-protosvc.so.$FIRST"
  [[ $output != *PATH* ]]
}
