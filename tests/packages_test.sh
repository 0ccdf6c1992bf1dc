#!/usr/bin/env bash
# packages_test.sh CASE SOURCE BUILD VERSION LIBDIR PROTOBUF-ROOT CC CXX [TOOLCHAIN]: what 'cpack'
# makes, and whether it can be installed and used. The case set_up, which calls it, goes before the
# others. With TOOLCHAIN, CMake's, it is for another machine.
set -euo pipefail
export LC_ALL=C
# shellcheck source=SCRIPTDIR/installed.sh
. "$(dirname "$0")/installed.sh"
name_arguments "$@"
packages=$build/package-test

native=$(dpkg --print-architecture)
case $triple in
  arm-linux-gnueabihf) architecture=armhf ;;
  arm-linux-gnueabi) architecture=armel ;;
  *) architecture=$native ;;
esac
library=$packages/libqel-message-protosvc${first}_${version}_$architecture.deb
development=$packages/libqel-message-protosvc-dev_${version}_$architecture.deb
workstation=$packages/qel-message-protosvc-workstation_${version}_$architecture.deb
tool=$packages/qel-wire_${version}_$architecture.deb
archive=$packages/qel-message-protosvc-$version-$triple.tar.gz

# declares PACKAGE: its control fields but for those that its contents make, as on standard input.
declares() { diff - <(dpkg-deb -f "$1" | grep -Ev '^( |$|Description|Installed-Size|Maintainer)' | sort) >&2; }

# has PACKAGE: its files and links, as on standard input, but for the API reference.
has() {
  diff <(sort) <(dpkg-deb --fsys-tarfile "$1" | tar -t |
    grep -Ev '/$|^\./usr/share/(doc/qel-message-protosvc/html|man/man3)/' | sort) >&2
}

# enough PACKAGE NAME: of the package NAME a version is declared that has the symbol versions which are
# linked with, as on standard input, each with the version of NAME that brought it.
enough() {
  local declared symbols needed
  declared=$(dpkg-deb -f "$1" Depends | tr ',' '\n' | sed -n "s/^ *$2 (>= \(.*\))$/\1/p")
  while read -r symbols needed; do
    dpkg --compare-versions "$declared" ge "$needed" ||
      fail "$2 (>= $declared) is declared, but $symbols came with $needed"
  done
}

# symbol_versions PACKAGE PATTERN: those that its libraries and programs are linked with.
symbol_versions() {
  dpkg-deb -x "$1" "$scratch/unpacked"
  find "$scratch/unpacked" -type f '(' -name '*.so*' -o -path '*/bin/*' ')' -exec readelf -VW {} + |
    sed -En "s/.*  Name: ($2[0-9.]+) .*/\1/p" | sort -u | grep .
}

# The names of the C library's and GCC's versions tell what brought them. Of the C++ library's, Debian's
# package tells; ARM's own, CXXABI_ARM, are older than all.
libc_is_new_enough() { symbol_versions "$1" GLIBC_ | sed 's/\(.*_\)\(.*\)/\1\2 \2/' | enough "$1" libc6; }
libgcc_is_new_enough() { symbol_versions "$1" GCC_ | sed 's/\(.*_\)\(.*\)/\1\2 \2/' | enough "$1" libgcc-s1; }
libstdcxx_is_new_enough() {
  symbol_versions "$1" '(GLIBCXX|CXXABI)_' >"$scratch/used"
  dpkg-query --control-show libstdc++6 symbols | sed -En 's/^ ([A-Z0-9_.]+)@\1 (.*)/\1 \2/p' | sort >"$scratch/known"
  [ -z "$(join -v 1 "$scratch/used" "$scratch/known")" ] || fail "newer than this machine's libstdc++6"
  join "$scratch/used" "$scratch/known" | enough "$1" libstdc++6
}

# make_root [LIBRARY...]: $root, with dpkg's database, which knows the base libraries of this machine,
# and those named, or the base libraries of the other one as its cross compiler brings them.
make_root() {
  local name of=''
  root=$scratch/root
  mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
  if [ -n "$toolchain" ]; then
    make_sysroot "$triple" "$root"
    printf '%s\n' "$native" "$architecture" >"$root/var/lib/dpkg/arch"
    of=-$architecture-cross
  fi
  for name in libc6 libgcc-s1 libstdc++6 "$@"; do
    dpkg-query -W -f="Package: $name
Status: install ok installed
Maintainer: nobody
Architecture: $architecture
Version: \${Version}
Description: \${binary:Summary}\n\n" "$name$of"
  done >"$root/var/lib/dpkg/status"
}

# install_packages PACKAGE...: in $root, as a machine's administrator does.
install_packages() {
  PATH=$PATH:/usr/sbin:/sbin fakeroot dpkg --root="$root" --log=/dev/null --install "$@" >"$scratch/messages" 2>&1
}

case $1 in
  set_up)
    rm -rf "$packages"
    umask 077 # whatever it is, all_can_be_read
    cpack --config "$build/CPackConfig.cmake" -B "$packages"
    ;;
  library_has_the_shared_object)
    has "$library" <<TXT
./usr/$libdir/libqel-message-protosvc.so.$first
./usr/$libdir/libqel-message-protosvc.so.$version
TXT
    ;;
  development_has_headers_and_what_finds_them)
    has "$development" <<TXT
./usr/include/qel-message-protosvc/msgspec_frontend.pb.h
./usr/include/qel-message-protosvc/qel-message-serialize.h
./usr/$libdir/cmake/qel-message-protosvc/qel-message-protosvc-config-version.cmake
./usr/$libdir/cmake/qel-message-protosvc/qel-message-protosvc-config.cmake
./usr/$libdir/libqel-message-protosvc.so
./usr/$libdir/pkgconfig/qel-message-protosvc-classes.pc
./usr/$libdir/pkgconfig/qel-message-protosvc.pc
./usr/share/qel-message-protosvc/msgspec_frontend.proto
./usr/share/qel-message-protosvc/valgrind.supp
TXT
    ;;
  workstation_has_runtime_and_log_service)
    licence=usr/share/doc/qel-message-protosvc-workstation/LICENSE.protobuf
    [ -e "$protobuf/share/doc/protobuf/LICENSE" ] || licence='' # an installation of others may have none
    has "$workstation" <<TXT
./usr/$libdir/libdlog-standin.so
./usr/$libdir/libprotobuf.so.9
./usr/$libdir/$(basename "$(realpath "$protobuf/lib/libprotobuf.so.9")")${licence:+
./$licence}
TXT
    ;;
  tool_has_program_and_completion)
    has "$tool" <<TXT
./usr/bin/qel-wire
./usr/share/bash-completion/completions/qel-wire
TXT
    ;;
  library_declares_what_it_needs)
    declares "$library" <<TXT
Architecture: $architecture
Depends: libc6 (>= 2.14), libgcc-s1 (>= 3.5), libstdc++6 (>= 5.2), libprotobuf9 (>= 2.6), qel-message-protosvc-workstation
Package: libqel-message-protosvc$first
Priority: optional
Section: libs
Version: $version
TXT
    ;;
  development_declares_its_library)
    declares "$development" <<TXT
Architecture: $architecture
Depends: libqel-message-protosvc$first (= $version)
Package: libqel-message-protosvc-dev
Priority: optional
Section: libdevel
Suggests: libprotobuf-dev (>= 2.6.1), libprotobuf-dev (<< 2.7)
Version: $version
TXT
    ;;
  workstation_declares_its_runtime)
    declares "$workstation" <<TXT
Architecture: $architecture
Conflicts: libprotobuf9
Depends: libc6 (>= 2.17), libgcc-s1 (>= 3.5), libstdc++6 (>= 11)
Package: qel-message-protosvc-workstation
Priority: optional
Provides: libprotobuf9 (= 2.6.1)
Replaces: libprotobuf9
Section: libs
Version: $version
TXT
    ;;
  tool_declares_what_it_needs)
    declares "$tool" <<TXT
Architecture: $architecture
Depends: libc6 (>= 2.34), libgcc-s1 (>= 3.5), libstdc++6 (>= 11), libprotobuf9 (>= 2.6), libnettle8, libqel-message-protosvc$first (= $version)
Package: qel-wire
Priority: optional
Section: utils
Version: $version
TXT
    ;;
  library_renews_the_loader_cache)
    [ "$(dpkg-deb --info "$library" triggers)" = 'activate-noawait ldconfig' ]
    ;;
  library_tells_who_links_with_it_what_to_need)
    [ "$(dpkg-deb --info "$library" shlibs)" = \
      "libqel-message-protosvc $first libqel-message-protosvc$first (>= $version)" ]
    ;;
  c_library_is_new_enough_for_the_library) libc_is_new_enough "$library" ;;
  c_library_is_new_enough_for_the_workstation) libc_is_new_enough "$workstation" ;;
  c_library_is_new_enough_for_the_tool) libc_is_new_enough "$tool" ;;
  gcc_library_is_new_enough_for_the_library) libgcc_is_new_enough "$library" ;;
  gcc_library_is_new_enough_for_the_workstation) libgcc_is_new_enough "$workstation" ;;
  gcc_library_is_new_enough_for_the_tool) libgcc_is_new_enough "$tool" ;;
  cxx_library_is_new_enough_for_the_library) libstdcxx_is_new_enough "$library" ;;
  cxx_library_is_new_enough_for_the_workstation) libstdcxx_is_new_enough "$workstation" ;;
  cxx_library_is_new_enough_for_the_tool) libstdcxx_is_new_enough "$tool" ;;
  nothing_names_the_build)
    for package in "$packages"/*.deb; do
      dpkg-deb -R "$package" "$scratch/$(basename "$package")"
    done
    mkdir "$scratch/archive"
    tar -xzf "$archive" -C "$scratch/archive"
    ! grep -rlF -e "$source" -e "$build" -e "$protobuf" "$scratch" >&2 || exit 1
    ;;
  all_can_be_read)
    modes=$({ gunzip -c "$archive" | tar -tv && for package in "$packages"/*.deb; do
      dpkg-deb --fsys-tarfile "$package" | tar -tv
    done; } | cut -d ' ' -f 1 | sort -u | xargs)
    [[ $modes =~ ^-rw-r--r--( -rwxr-xr-x)?' drwxr-xr-x lrwxrwxrwx'$ ]] || fail "$modes"
    ;;
  library_is_not_installed_without_its_runtime)
    make_root
    ! install_packages "$library" || fail 'was installed'
    grep -q 'depends on libprotobuf9 (>= 2\.6)' "$scratch/messages" || fail "$(cat "$scratch/messages")"
    ;;
  c_plugin_runs_where_they_are_installed)
    make_root
    install_packages "$library" "$development" "$workstation" || fail "$(cat "$scratch/messages")"
    c_plugin_runs "$root/usr"
    ;;
  nothing_is_left_where_they_are_removed)
    make_root
    install_packages "$library" "$development" "$workstation" || fail "$(cat "$scratch/messages")"
    PATH=$PATH:/usr/sbin:/sbin fakeroot dpkg --root="$root" --log=/dev/null --remove \
      "libqel-message-protosvc$first:$architecture" "libqel-message-protosvc-dev:$architecture" \
      "qel-message-protosvc-workstation:$architecture" >"$scratch/messages" 2>&1 ||
      fail "$(cat "$scratch/messages")"
    left=$(find "$root" -path "$root/var/lib/dpkg" -prune -o \
      '(' -name '*qel*' -o -name 'libprotobuf*' -o -name 'libdlog*' ')' -print)
    [ -z "$left" ] || fail "$left"
    ;;
  classes_module_runs_where_they_are_installed)
    make_root
    install_packages "$library" "$development" "$workstation" || fail "$(cat "$scratch/messages")"
    [ -z "$toolchain" ] || cp -r "$protobuf/include" "$root/usr" # as libprotobuf-dev would
    compile_with_cmake "$root/usr" classes
    prints 'ClientEcho 7' "$root/usr" "$scratch/built/module"
    ;;
  tool_runs_where_they_are_installed)
    make_root libnettle8
    install_packages "$library" "$workstation" "$tool" || fail "$(cat "$scratch/messages")"
    prints "qel-wire $version" "$root/usr" "$root/usr/bin/qel-wire" --version
    ;;
  c_plugin_runs_where_the_archive_is_unpacked)
    mkdir "$scratch/root"
    [ -z "$toolchain" ] || make_sysroot "$triple" "$scratch/root"
    mkdir -p "$scratch/root/usr"
    tar -xzf "$archive" -C "$scratch/root/usr" --strip-components=1
    c_plugin_runs "$scratch/root/usr"
    ;;
  *)
    fail "no such case: $1"
    ;;
esac
