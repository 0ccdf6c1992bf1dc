#!/usr/bin/env bats
# How others find the installed library, link with it and look for leaks.
# shellcheck disable=SC2030,SC2031,SC2153 # a test has variables of its own; VERSION is the build's
load build

setup_file() { cmake --install "$BUILD" --prefix "$BATS_FILE_TMPDIR/tree"; }

tree=$BATS_FILE_TMPDIR/tree

# configure LINES OPTION...: a project of these lines.
configure() {
  printf '%s\n' 'cmake_minimum_required(VERSION 3.25)' 'project(consumer C)' "$1" >CMakeLists.txt
  cmake -S . -B built -G Ninja "${@:2}"
}

@test "the commands that README.md shows for an installed library work" {
  # In their order, with another prefix and this build. packages.bats installs the packages.
  [ "$TRIPLE" = x86_64-linux-gnu ] || skip "they name x86-64's folder"
  sed -n '/^## Installing/,/^## Working/p' "$SOURCE/README.md" |
    awk '/^```/ {on = $0 == "```sh"; next} on' | sed "/^sudo apt/d; s#/opt/qel#$PWD/qel#g" >commands
  [ -s commands ]
  mkdir build
  ln -s "$BUILD" build/release
  cp "$SOURCE/tests/consumers/c/plugin.c" .
  cp plugin.c client.c
  run -0 bash -euo pipefail commands
  says 'ERROR SUMMARY: 0 errors'
  readelf -dW plugin.so | grep "NEEDED.*\[libqel-message-protosvc\.so\.$FIRST\]"
}

@test "all that is installed can be read, whatever the umask" {
  umask 077
  mkdir private
  cmake --install "$BUILD" --prefix "$PWD/private/opt/qel"
  modes=$(find private -mindepth 1 -printf '%M\n' | sort -u | xargs)
  [ "$modes" = '-rw-r--r-- -rwxr-xr-x drwxr-xr-x lrwxrwxrwx' ] || fail "$modes"
  [ "$(stat -c %a private)" = 700 ] # a folder that was there stays as it was
}

@test "the SONAME has the first number, and the library looks for others beside itself alone" {
  run -0 readelf -dW "$tree/$LIBDIR/libqel-message-protosvc.so"
  [[ $output == *SONAME*"[libqel-message-protosvc.so.$FIRST]"* ]]
  [ "$(sed -n 's/.*(R.*PATH).*\[\(.*\)\]/\1/p' <<<"$output")" = "\$ORIGIN" ]
}

@test "a plug-in in C runs, and reads two headers of the tree" {
  cp -r "$tree" 'a prefix' # users' have a blank, too
  compile_c "$PWD/a prefix" -o plugin
  prints 'probe 7, answer of 2 bytes' "$tree" ./plugin
  # The compiler's and the C library's lie elsewhere.
  compile_c "$tree" -o plugin -H 2>&1 | sed -n 's/^\.\.* //p' | xargs -d '\n' realpath |
    grep -v '^/usr/' |
    diff - <(printf '%s\n' "$tree"/include/qel-message-protosvc/qel-message{,-serialize}.h)
}

@test "a module in C++ runs by the CMake package" {
  compile_with_cmake "$tree" cxx
  prints 'probe 7, answer of 2 bytes' "$tree" built/module
}

@test "a module that uses the classes compiles by pkg-config" {
  # The runtime in a path with a blank, which its own build leaves as it is.
  ln -s "$PROTOBUF" 'a runtime'
  sed "s#^prefix=.*#prefix=$PWD/a\\\\ runtime#" "$PROTOBUF/lib/pkgconfig/protobuf.pc" >protobuf.pc
  PKG_CONFIG_PATH=$PWD flags_of "$tree" qel-message-protosvc-classes
  "$CXX" "$SOURCE/tests/consumers/classes/module.cc" "${flags[@]}" \
    -Wl,-rpath,"$tree/$LIBDIR" -o module
  prints 'ClientEcho 7' "$tree" ./module
}

@test "linkers are told where the library's own libraries lie" {
  # Where the library does not look beside itself, as a device's does not.
  cp -r "$tree" moved
  # shellcheck disable=SC2016 # the loader's variable
  sed -i 's#$ORIGIN#/absent#' "moved/$LIBDIR/libqel-message-protosvc.so.$VERSION"
  flags_of "$PWD/moved" qel-message-protosvc
  "$CC" "$SOURCE/tests/consumers/c/plugin.c" "${flags[@]}" -o plugin
  compile_with_cmake "$PWD/moved" cxx -DCMAKE_SKIP_RPATH=ON
  export LD_LIBRARY_PATH=$PWD/moved/$LIBDIR
  prints 'probe 7, answer of 2 bytes' "$tree" ./plugin
  prints 'probe 7, answer of 2 bytes' "$tree" built/module
}

@test "pkg-config takes classes of one series and one version" {
  while read -r runtime library answer; do
    sed "s/^Version:.*/Version: $runtime/" "$PROTOBUF/lib/pkgconfig/protobuf.pc" >protobuf.pc
    cp "$tree/$LIBDIR/pkgconfig/"*.pc .
    sed -i "s/^Version:.*/Version: $library/" qel-message-protosvc.pc
    PKG_CONFIG_PATH=$PWD run pkg-config --print-errors --exists qel-message-protosvc-classes
    says "${answer:-}"
    [ "$status" -eq 0 ] || [ -n "$answer" ]
  done <<TXT
2.6.1 $VERSION
2.6.0 $VERSION 'protobuf >= 2.6.1'
2.7.0 $VERSION 'protobuf < 2.7'
2.6.1 $VERSION.1 'qel-message-protosvc = $VERSION'
TXT
}

@test "CMake takes versions of the same first number, up to the installed one" {
  cp -r "$tree" moved
  sed -i "s/$VERSION/1.2.3/g" "moved/$LIBDIR"/cmake/qel-message-protosvc/*-version.cmake
  # shellcheck disable=SC2016 # CMake's variables
  run -0 configure 'foreach(asked 0.9 1 1.2.3 1.3 2.0)
    find_package(qel-message-protosvc ${asked} QUIET)
    message("${asked}: ${qel-message-protosvc_FOUND}")
    unset(qel-message-protosvc_DIR CACHE)
  endforeach()' -DCMAKE_PREFIX_PATH="$PWD/moved"
  says '0.9: 0 1: 1 1.2.3: 1 1.3: 0 2.0: 0'
}

@test "CMake finds it in projects of old policies" {
  configure 'cmake_minimum_required(VERSION 2.8.12)
    find_package(qel-message-protosvc REQUIRED)' -DCMAKE_PREFIX_PATH="$tree"
}

classes='find_package(qel-message-protosvc REQUIRED COMPONENTS classes)'

@test "CMake refuses the development files without the library" {
  cmake --install "$BUILD" --prefix "$PWD/part" --component development
  refused "No libqel-message-protosvc.so.$VERSION in $PWD/part/$LIBDIR: install the library itself \
too." configure 'find_package(qel-message-protosvc REQUIRED)' -DCMAKE_PREFIX_PATH="$PWD/part"
}

@test "CMake refuses the classes without the runtime's headers" {
  refused "The component 'classes' needs Protocol Buffers 2.6.1, but CMake finds no headers of it: \
let CMAKE_PREFIX_PATH name an installation." configure "set(CMAKE_FIND_USE_CMAKE_SYSTEM_PATH OFF)
    set(CMAKE_FIND_USE_SYSTEM_ENVIRONMENT_PATH OFF)
    $classes" -DCMAKE_PREFIX_PATH="$tree"
}

@test "CMake refuses the classes with headers of another version" {
  mkdir -p other/include/google/protobuf/stubs
  while read -r number version; do
    echo "#define GOOGLE_PROTOBUF_VERSION $number" >other/include/google/protobuf/stubs/common.h
    refused "needs Protocol Buffers 2.6.1, but CMake finds headers of $version in $PWD/other/" \
      configure "$classes" -DCMAKE_PREFIX_PATH="$tree;$PWD/other"
  done <<<$'2006000 2.6.0\n3021012 3.21.12'
}

@test "CMake refuses the classes without the runtime's library" {
  cp -r "$tree" moved
  rm "moved/$LIBDIR/libprotobuf.so.9"
  cp -r "$PROTOBUF/include/google" moved/include
  refused 'needs Protocol Buffers 2.6.1, but CMake finds no libprotobuf.so.9:' \
    configure "$classes" -DCMAKE_PREFIX_PATH="$PWD/moved"
}

# expect_leaks SIZES COMMAND...: the leak checker reports lost blocks of these sizes and no others.
expect_leaks() {
  DLOG_STANDIN_PRIORITY=S run "${@:2}"
  [ "$status" -eq 0 ] || [ -n "$1" ]
  sed -nE "s/.* ([0-9]+) (\([^)]*\) )?bytes in .* lost in loss record.*/\1/p
    s/.* leak of ([0-9]+) byte\(s\) in .*/\1/p" <<<"$output" | sort -n | xargs >lost
  diff <(echo "$1") lost
}

# leaks_alone_are_reported SANITIZER COMMAND...: of plug-ins in C and in C++, with the library as it
# is and stripped. COMMAND runs the client, and is the checker where SANITIZER is empty.
leaks_alone_are_reported() {
  local sanitize=(${1:+-fsanitize="$1"}) library language compiler flags
  cp -r "$tree" stripped
  strip --strip-unneeded "stripped/$LIBDIR/libqel-message-protosvc.so.$VERSION"
  "$CC" "${sanitize[@]}" "$SOURCE/tests/consumers/leaks/client.c" -ldl -o client
  for library in "$tree" "$PWD/stripped"; do
    flags_of "$library" qel-message-protosvc
    for language in c c++; do
      compiler=$CC
      [ "$language" = c ] || compiler=$CXX
      "$compiler" "${sanitize[@]}" -shared -fPIC \
        -x "$language" "$SOURCE/tests/consumers/leaks/plugin.c" -x none \
        "${flags[@]}" -Wl,-rpath,"$library/$LIBDIR" -o plugin.so
      expect_leaks '2 3 8 77 256' "${@:2}" ./client ./plugin.so forgetful
    done
  done
  expect_leaks '' "${@:2}" ./client ./plugin.so
}

@test "valgrind reports leaks alone" {
  leaks_alone_are_reported '' valgrind --leak-check=full --show-leak-kinds=definite,indirect \
    --errors-for-leak-kinds=definite,indirect \
    --suppressions="$tree/share/qel-message-protosvc/valgrind.supp"
}

@test "LeakSanitizer reports leaks alone" { leaks_alone_are_reported leak; }
@test "AddressSanitizer reports leaks alone" { leaks_alone_are_reported address; }

# The kit, and what it needs of the rest.
install_testkit() {
  for component in runtime workstation development testkit; do
    cmake --install "$BUILD" --prefix "$PWD/tree" --component "$component"
  done
  flags_of "$PWD/tree" "$1"
  flags+=(-std=c99 -pedantic -Wall -Wextra -Werror "-Wl,-rpath,$PWD/tree/$LIBDIR")
}

@test "the first test of docs/testing.md is good, and finds the mistake that the page makes" {
  install_testkit qel-message-testkit
  take_examples
  "$CC" first.c "${flags[@]}" -o first
  prints good tree ./first
  sed 's/echo\.requestId/1/' first.c >second.c
  "$CC" second.c "${flags[@]}" -o second
  DLOG_STANDIN_PRIORITY=S run -1 ./second
  diff mistake - <<<"$output"
}

@test "a test of a plug-in compiles by the CMake package" {
  install_testkit qel-message-testkit
  take_examples
  configure 'find_package(qel-message-protosvc REQUIRED COMPONENTS testkit)
    add_executable(first first.c)
    target_link_libraries(first PRIVATE qel-message-protosvc::testkit)' -DCMAKE_PREFIX_PATH="$PWD/tree"
  cmake --build built
  prints good tree built/first
}

@test "CMake refuses the test kit where it is not installed" {
  cp -r "$tree" moved
  rm "moved/$LIBDIR/libqel-message-testkit.so"
  refused "The component 'testkit' is not in $PWD/moved/$LIBDIR: install qel-message-testkit too." configure \
    'find_package(qel-message-protosvc REQUIRED COMPONENTS testkit)' -DCMAKE_PREFIX_PATH="$PWD/moved"
}

@test "a test of a plug-in needs a C compiler, and nothing of Protocol Buffers" {
  install_testkit qel-message-testkit
  take_examples
  "$CC" -H first.c "${flags[@]}" -o first 2>&1 | sed -n 's/^\.\.* //p' | xargs -d '\n' realpath |
    grep -v '^/usr/' | sed 's/.*\///' |
    diff - <(printf '%s\n' qel-message.h qel-message-serialize.h qel-testkit.h)
  "$NM" -D --defined-only "tree/$LIBDIR/libqel-message-testkit.so" | sed 's/.* //' | sort |
    diff - <(grep -oE '\<qel_testkit_[a-z_]+\(' "$SOURCE/testkit/qel-testkit.h" | tr -d '(' | sort -u)
}

@test "the test kit reads and writes nothing, starts no thread and looks at no clock" {
  install_testkit qel-message-testkit
  "$NM" -D --undefined-only "tree/$LIBDIR/libqel-message-testkit.so" | sed -E 's/^ *[Uw] //; s/@.*//' >taken
  grep -qx memcpy taken
  grep -vxE '_.*|mem[a-z]+|str[a-z]+|is[a-z]+|to(low|upp)er|malloc|free|abort' taken | none
  grep -E '_(open|read|write|time|clock)|fstream|filebuf|4c(out|err)E|chrono|thread|mutex' taken | none
}

@test "log lines are collected by what is installed" {
  install_testkit qel-message-testlog
  cat >log.c <<'TXT'
#include <stdio.h>
#include "qel-message.h"
#include "qel-testlog.h"
int main(void) {
  QEL_SCOPED(client_echo, echo);
  const unsigned char broken[] = {8};
  printf("%d ", qel_client_echo_read(&echo, broken, 1) == QEL_OK);
  printf("%s\n", qel_testlog_count("client_echo_deserialize") > 0 ? "collected" : "not collected");
  qel_testlog_clear();
  return 0;
}
TXT
  "$CC" log.c "${flags[@]}" -o log
  prints '0 collected' tree ./log
}

@test "the scenarios and the program are installed" {
  install_testkit qel-message-testkit
  diff <(ls "$SOURCE/testkit/scenarios") <(ls tree/share/qel-message-protosvc/scenarios)
  take_examples
  tree/bin/qel-testkit --scenario tree/share/qel-message-protosvc/scenarios/connection.scenario <lines >said
  diff answers said
}
