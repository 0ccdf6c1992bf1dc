#!/usr/bin/env bash
# install_test.sh CASE SOURCE BUILD VERSION LIBDIR PROTOBUF-ROOT CC CXX [TOOLCHAIN]: what 'cmake
# --install' makes, and whether others can build with it. The case set_up goes before the others: it
# installs into a folder, which is then moved. With TOOLCHAIN, CMake's, it is for another machine.
set -euo pipefail
export LC_ALL=C
# shellcheck source=SCRIPTDIR/installed.sh
. "$(dirname "$0")/installed.sh"
name_arguments "$@"
moved="$build/install-test/a prefix/moved" # as users' prefixes may have a blank, too
tree=$moved
[ -z "$toolchain" ] || tree=$build/install-test/sysroot/usr

# install_component COMPONENT: into $scratch/tree, whose files and links go to $files.
install_component() {
  cmake --install "$build" --prefix "$scratch/tree" --component "$1" >"$scratch/messages"
  files=$(cd "$scratch/tree" && find . ! -type d | sort)
}

# refused LINES OPTION...: CMake refuses a project of these lines; what it says goes to $messages.
refused() {
  printf '%s\n' 'cmake_minimum_required(VERSION 3.25)' 'project(consumer C)' "$1" >"$scratch/CMakeLists.txt"
  shift
  ! cmake -S "$scratch" -B "$scratch/built" -G Ninja "$@" >"$scratch/messages" 2>&1 ||
    fail 'was not refused'
  messages=$(tr -s ' \n' '  ' <"$scratch/messages")
}

expect() { [[ $messages == *"$1"* ]] || fail "expected: $1"$'\n'"said: $messages"; }

# expect_leaks LOST COMMAND...: the checker reports blocks of these sizes and no others.
expect_leaks() {
  local lost=$1 reported
  shift
  DLOG_STANDIN_PRIORITY=S "$@" >"$scratch/messages" 2>&1 || [ -n "$lost" ] ||
    fail "$(cat "$scratch/messages")"
  reported=$(sed -nE "s/.* ([0-9]+) (\([^)]*\) )?bytes in .* lost in loss record.*/\1/p
    s/.* leak of ([0-9]+) byte\(s\) in .*/\1/p" "$scratch/messages" | sort -n | xargs)
  [ "$reported" = "$lost" ] ||
    fail "lost are '$lost', reported '$reported'"$'\n'"$(cat "$scratch/messages")"
}

# leaks_alone_are_reported SANITIZER COMMAND...: of plug-ins in C and in C++, with the library as it
# is and stripped. COMMAND runs the client, and is the checker where SANITIZER is empty.
leaks_alone_are_reported() {
  local sanitize=${1:+-fsanitize=$1} library language compiler flags
  shift
  cp -r "$tree" "$scratch/stripped"
  strip --strip-unneeded "$scratch/stripped/$libdir/libqel-message-protosvc.so.$version"
  "$cc" ${sanitize:+"$sanitize"} "$source/tests/consumers/leaks/client.c" -ldl -o "$scratch/client"
  for library in "$tree" "$scratch/stripped"; do
    flags_of "$library" qel-message-protosvc
    for language in c c++; do
      compiler=$cc
      [ "$language" = c ] || compiler=$cxx
      "$compiler" ${sanitize:+"$sanitize"} -shared -fPIC -x "$language" \
        "$source/tests/consumers/leaks/plugin.c" -x none "${flags[@]}" \
        -Wl,-rpath,"$library/$libdir" -o "$scratch/plugin.so"
      expect_leaks '' "$@" "$scratch/client" "$scratch/plugin.so"
      expect_leaks '2 3 8 77 256' "$@" "$scratch/client" "$scratch/plugin.so" forgetful
    done
  done
}

case $1 in
  set_up)
    rm -rf "$build/install-test"
    cmake --install "$build" --prefix "$build/install-test/made"
    mkdir "${moved%/*}"
    mv "$build/install-test/made" "$moved"
    if [ -n "$toolchain" ]; then # with what the classes need of others
      make_sysroot "$triple" "${tree%/usr}"
      cp -r "$moved/." "$protobuf/include" "$tree"
    fi
    ;;
  commands_of_the_readme_work)
    # In their order, with another prefix and this build. packages_test.sh installs the packages.
    sed -n '/^## Installing/,/^## Working/p' "$source/README.md" |
      awk '/^```/ {on = $0 == "```sh"; next} on' |
      sed "/^sudo apt/d; s#/opt/qel#$scratch/qel#g" >"$scratch/commands"
    mkdir -p "$scratch/build"
    ln -s "$build" "$scratch/build/release"
    cp "$source/tests/consumers/c/plugin.c" "$scratch"
    cp "$source/tests/consumers/c/plugin.c" "$scratch/client.c"
    [ -s "$scratch/commands" ] || fail 'no commands'
    cd "$scratch"
    bash -euo pipefail "$scratch/commands" >"$scratch/messages" 2>&1 || fail "$(cat "$scratch/messages")"
    readelf -dW plugin.so | grep -q "NEEDED.*\[libqel-message-protosvc\.so\.$first\]" || fail 'not linked with it'
    grep -q 'ERROR SUMMARY: 0 errors' "$scratch/messages" || fail "$(cat "$scratch/messages")"
    ;;
  runtime_is_the_shared_object_alone)
    install_component runtime
    diff <(printf '%s\n' "./$libdir/libqel-message-protosvc.so.$first" \
      "./$libdir/libqel-message-protosvc.so.$version") - <<<"$files" >&2
    ;;
  development_has_no_shared_object)
    install_component development
    ! grep -F '.so.' <<<"$files" >&2 || exit 1
    ;;
  all_can_be_read_whatever_the_umask)
    umask 077
    mkdir "$scratch/private"
    cmake --install "$build" --prefix "$scratch/private/opt/qel" >"$scratch/messages"
    modes=$(find "$scratch/private" -mindepth 1 -printf '%M\n' | sort -u | xargs)
    [[ $modes =~ ^-rw-r--r--( -rwxr-xr-x)?' drwxr-xr-x lrwxrwxrwx'$ ]] || fail "$modes"
    [ "$(stat -c %a "$scratch/private")" = 700 ] || fail 'a folder that was there has changed'
    ;;
  soname_has_the_first_number)
    dynamic=$(readelf -dW "$moved/$libdir/libqel-message-protosvc.so")
    grep -q "SONAME.*\[libqel-message-protosvc\.so\.$first\]" <<<"$dynamic" || fail "$dynamic"
    ;;
  library_looks_for_others_beside_itself_alone)
    dynamic=$(readelf -dW "$moved/$libdir/libqel-message-protosvc.so")
    [ "$(sed -n 's/.*(R.*PATH).*\[\(.*\)\]/\1/p' <<<"$dynamic")" = "\$ORIGIN" ] || fail "$dynamic"
    ;;
  no_file_names_the_build)
    # But for debug information, which is of the sources.
    cp -r "$moved" "$scratch/tree"
    find "$scratch/tree" -type f '(' -name '*.so*' -o -path '*/bin/*' ')' \
      -exec "$("$cc" -print-prog-name=objcopy)" --strip-debug {} ';'
    ! grep -rlF -e "$source" -e "$build" -e "$protobuf" "$scratch/tree" >&2 || exit 1
    ;;
  c_plugin_runs) c_plugin_runs "$tree" ;;
  c_plugin_reads_one_header_of_the_tree)
    # The compiler's and the C library's lie elsewhere.
    read_headers=$(compile_c "$tree" -fsyntax-only -H 2>&1 | sed -n 's/^\.\.* //p' |
      xargs -d '\n' realpath)
    others=$(grep -v '^/usr/' <<<"$read_headers")
    [ "$others" = "$tree/include/qel-message-protosvc/qel-message-serialize.h" ] || fail "$others"
    ;;
  cxx_module_runs)
    compile_with_cmake "$tree" cxx
    prints 'probe 7, answer of 2 bytes' "$tree" "$scratch/built/module"
    ;;
  classes_module_runs)
    compile_with_cmake "$tree" classes
    prints 'ClientEcho 7' "$tree" "$scratch/built/module"
    ;;
  leaks_alone_are_reported_by_valgrind)
    leaks_alone_are_reported '' valgrind --leak-check=full --show-leak-kinds=definite,indirect \
      --errors-for-leak-kinds=definite,indirect \
      --suppressions="$tree/share/qel-message-protosvc/valgrind.supp"
    ;;
  leaks_alone_are_reported_by_leak_sanitizer) leaks_alone_are_reported leak ;;
  leaks_alone_are_reported_by_address_sanitizer) leaks_alone_are_reported address ;;
  tool_runs) prints "qel-wire $version" "$tree" "$tree/bin/qel-wire" --version ;;
  classes_module_compiles_with_pkg_config)
    # The runtime in a path with a blank, which its own build leaves as it is.
    ln -s "$protobuf" "$scratch/a runtime"
    sed "s#^prefix=.*#prefix=$scratch/a\\\\ runtime#" "$protobuf/lib/pkgconfig/protobuf.pc" \
      >"$scratch/protobuf.pc"
    export PKG_CONFIG_PATH=$tree/$libdir/pkgconfig:$scratch
    eval "flags=($(pkg-config --cflags --libs qel-message-protosvc-classes))"
    "$cxx" "$source/tests/consumers/classes/module.cc" "${flags[@]}" -Wl,-rpath,"$tree/$libdir" \
      -o "$scratch/module"
    prints 'ClientEcho 7' "$tree" "$scratch/module"
    ;;
  linkers_are_told_where_others_lie)
    # Where the library does not look beside itself, as a device's does not.
    cp -r "$tree" "$scratch/tree"
    # shellcheck disable=SC2016 # the loader's variable
    sed -i 's#$ORIGIN#/absent#' "$scratch/tree/$libdir/libqel-message-protosvc.so.$version"
    flags_of "$scratch/tree" qel-message-protosvc
    "$cc" "$source/tests/consumers/c/plugin.c" "${flags[@]}" -o "$scratch/plugin"
    compile_with_cmake "$scratch/tree" cxx -DCMAKE_SKIP_RPATH=ON
    export LD_LIBRARY_PATH=$scratch/tree/$libdir
    prints 'probe 7, answer of 2 bytes' "$scratch/tree" "$scratch/plugin"
    prints 'probe 7, answer of 2 bytes' "$scratch/tree" "$scratch/built/module"
    ;;
  pkg_config_takes_classes_of_one_series_and_version)
    export PKG_CONFIG_PATH=$scratch
    while read -r runtime library answer; do
      sed "s/^Version:.*/Version: $runtime/" "$protobuf/lib/pkgconfig/protobuf.pc" \
        >"$scratch/protobuf.pc"
      cp "$tree/$libdir/pkgconfig/"*.pc "$scratch"
      sed -i "s/^Version:.*/Version: $library/" "$scratch/qel-message-protosvc.pc"
      said=$(pkg-config --print-errors --exists qel-message-protosvc-classes 2>&1) && said=taken
      [[ $said == *"$answer"* ]] ||
        fail "runtime $runtime, library $library: expected '$answer', said '$said'"
    done <<TXT
2.6.1 $version taken
2.6.0 $version 'protobuf >= 2.6.1'
2.7.0 $version 'protobuf < 2.7'
2.6.1 $version.1 'qel-message-protosvc = $version'
TXT
    ;;
  versions_of_one_first_number_are_compatible)
    cp -r "$tree" "$scratch/tree"
    sed -i "s/$version/1.2.3/g" \
      "$scratch/tree/$libdir/cmake/qel-message-protosvc/qel-message-protosvc-config-version.cmake"
    cat >"$scratch/CMakeLists.txt" <<'TXT'
cmake_minimum_required(VERSION 3.25)
project(consumer C)
foreach(asked 0.9 1 1.0 1.2.3 1.2.4 1.3 2.0 "1.2.3;EXACT" "1.2.2;EXACT")
  find_package(qel-message-protosvc ${asked} QUIET)
  if(qel-message-protosvc_FOUND)
    message("taken for: ${asked}")
  endif()
  unset(qel-message-protosvc_DIR CACHE)
endforeach()
TXT
    cmake -S "$scratch" -B "$scratch/built" -G Ninja -DCMAKE_PREFIX_PATH="$scratch/tree" \
      2>"$scratch/messages"
    diff <(printf 'taken for: %s\n' 1 1.0 1.2.3 '1.2.3;EXACT') "$scratch/messages" >&2
    ;;
  projects_of_old_policies_find_it)
    printf '%s\n' 'cmake_minimum_required(VERSION 2.8.12)' 'project(consumer C)' \
      'find_package(qel-message-protosvc REQUIRED)' >"$scratch/CMakeLists.txt"
    cmake -S "$scratch" -B "$scratch/built" -G Ninja -DCMAKE_PREFIX_PATH="$tree" >"$scratch/messages" 2>&1 ||
      fail "$(cat "$scratch/messages")"
    ;;
  development_alone_is_refused)
    install_component development
    refused 'find_package(qel-message-protosvc REQUIRED)' -DCMAKE_PREFIX_PATH="$scratch/tree"
    expect "No libqel-message-protosvc.so.$version in $scratch/tree/$libdir: install the library itself too."
    ;;
  classes_without_headers_are_refused)
    refused "set(CMAKE_FIND_USE_CMAKE_SYSTEM_PATH OFF)
      set(CMAKE_FIND_USE_SYSTEM_ENVIRONMENT_PATH OFF)
      find_package(qel-message-protosvc REQUIRED COMPONENTS classes)" -DCMAKE_PREFIX_PATH="$tree"
    expect "The component 'classes' needs Protocol Buffers 2.6.1, but CMake finds no headers of it: let CMAKE_PREFIX_PATH name an installation."
    ;;
  classes_of_another_series_are_refused)
    mkdir -p "$scratch/other/include/google/protobuf/stubs"
    echo '#define GOOGLE_PROTOBUF_VERSION 3021012' >"$scratch/other/include/google/protobuf/stubs/common.h"
    refused 'find_package(qel-message-protosvc REQUIRED COMPONENTS classes)' \
      -DCMAKE_PREFIX_PATH="$tree;$scratch/other"
    expect "needs Protocol Buffers 2.6.1, but CMake finds headers of 3.21.12 in $scratch/other/include:"
    ;;
  classes_of_an_older_runtime_are_refused)
    mkdir -p "$scratch/other/include/google/protobuf/stubs"
    echo '#define GOOGLE_PROTOBUF_VERSION 2006000' >"$scratch/other/include/google/protobuf/stubs/common.h"
    refused 'find_package(qel-message-protosvc REQUIRED COMPONENTS classes)' \
      -DCMAKE_PREFIX_PATH="$tree;$scratch/other"
    expect "needs Protocol Buffers 2.6.1, but CMake finds headers of 2.6.0 in $scratch/other/include:"
    ;;
  classes_without_runtime_are_refused)
    install_component development
    install_component runtime
    cp -r "$protobuf/include/google" "$scratch/tree/include"
    refused 'find_package(qel-message-protosvc REQUIRED COMPONENTS classes)' \
      -DCMAKE_PREFIX_PATH="$scratch/tree"
    expect "needs Protocol Buffers 2.6.1, but CMake finds no libprotobuf.so.9:"
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
