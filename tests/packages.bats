#!/usr/bin/env bats
# What 'cmake --install' and 'cpack' make, and whether it can be installed, used and removed.
# shellcheck disable=SC2030,SC2031 # a test has variables of its own
load build

library=libqel-message-protosvc$FIRST
development=libqel-message-protosvc-dev
workstation=qel-message-protosvc-workstation
binary=("$library" "$workstation")
[ -n "$TOOLCHAIN" ] || binary+=(qel-wire)

made=$BATS_FILE_TMPDIR/packages
archive=$made/qel-message-protosvc-$VERSION-$TRIPLE.tar.gz
root=$BATS_FILE_TMPDIR/root # where the packages are installed
tree="$BATS_FILE_TMPDIR/a prefix" # where the archive is unpacked; users' have a blank, too
[ -z "$TOOLCHAIN" ] || tree=$BATS_FILE_TMPDIR/sysroot/usr

setup_file() {
  umask 077 # whatever it is, they are for all to read
  cpack --config "$BUILD/CPackConfig.cmake" -B "$made"
  if [ -n "$TOOLCHAIN" ]; then make_sysroot "${tree%/usr}"; else mkdir "$tree"; fi
  tar -xzf "$archive" -C "$tree" --strip-components=1
  make_root
  local part debs=()
  for part in "$development" "${binary[@]}"; do debs+=("$(deb "$part")"); done
  in_root --install "${debs[@]}"
}

deb() { echo "$made/$1_${VERSION}_$ARCHITECTURE.deb"; }

# Makes $root, where dpkg knows no more than base libraries: this machine's, or those of the other
# one as its cross compiler brings them.
make_root() {
  mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
  local name of='' base=(libc6 libgcc-s1 libstdc++6)
  if [ -n "$TOOLCHAIN" ]; then
    make_sysroot "$root"
    printf '%s\n' "$(dpkg --print-architecture)" "$ARCHITECTURE" >"$root/var/lib/dpkg/arch"
    of=-$ARCHITECTURE-cross
  else
    base+=(libnettle8) # for the tool
  fi
  for name in "${base[@]}"; do
    dpkg-query -W -f="Package: $name
Status: install ok installed
Maintainer: nobody
Architecture: $ARCHITECTURE
Version: \${Version}
Description: \${binary:Summary}\n\n" "$name$of"
  done >"$root/var/lib/dpkg/status"
}

# in_root OPTION...: dpkg, as the administrator of $root calls it.
in_root() { PATH=$PATH:/usr/sbin:/sbin fakeroot dpkg --root="$root" --log=/dev/null "$@"; }

# At the end of a pipe: these modes, as tar prints them, let all read.
for_all_to_read() {
  local modes
  modes=$(cut -c -10 | sort -u | xargs)
  [[ $modes =~ ^-rw-r--r--( -rwxr-xr-x)?' drwxr-xr-x lrwxrwxrwx'$ ]] || fail "$modes"
}

@test "all that is installed can be read, whatever the umask" {
  umask 077
  mkdir private
  cmake --install "$BUILD" --prefix "$PWD/private/opt/qel"
  find private -mindepth 1 -printf '%M\n' | for_all_to_read
  [ "$(stat -c %a private)" = 700 ] # a folder that was there stays as it was
}

@test "all in packages and archive can be read" {
  {
    gunzip -c "$archive" | tar -tv
    for file in "$made"/*.deb; do dpkg-deb --fsys-tarfile "$file" | tar -tv; done
  } | for_all_to_read
}

@test "nothing in packages and archive names the build" {
  for file in "$made"/*.deb; do dpkg-deb -R "$file" "${file##*/}"; done
  grep -rlF -e "$SOURCE" -e "$BUILD" -e "$PROTOBUF" . "$tree" | none
}

# has PACKAGE FILE...: these files and links and no others in /usr, but for the API reference.
has() {
  diff <(printf '%s\n' "${@:2}" | sort) <(dpkg-deb --fsys-tarfile "$(deb "$1")" | tar -t |
    sed -nE 's|^\./usr/(.*[^/])$|\1|p' | grep -Ev '^share/(doc/.*/html|man/man3)/' | sort)
}

@test "packages have their files" {
  local so=$LIBDIR/libqel-message-protosvc.so licence
  has "$library" "$so.$FIRST" "$so.$VERSION"
  has "$development" "$so" \
    include/qel-message-protosvc/{msgspec_frontend.pb,qel-message-serialize}.h \
    "$LIBDIR"/cmake/qel-message-protosvc/qel-message-protosvc-config{,-version}.cmake \
    "$LIBDIR"/pkgconfig/qel-message-protosvc{,-classes}.pc \
    share/qel-message-protosvc/{contract.json,contract.schema.json,msgspec_frontend.proto} \
    share/qel-message-protosvc/valgrind.supp
  licence=share/doc/$workstation/LICENSE.protobuf
  [ -e "$PROTOBUF/share/doc/protobuf/LICENSE" ] || licence='' # of others' there may be none
  has "$workstation" "$LIBDIR/libdlog-standin.so" "$LIBDIR/libprotobuf.so.9" \
    ${licence:+"$licence"} "$LIBDIR/$(basename "$(realpath "$PROTOBUF/lib/libprotobuf.so.9")")"
  [ -n "$TOOLCHAIN" ] || has qel-wire bin/qel-wire share/bash-completion/completions/qel-wire
}

@test "packages declare what they need and replace" {
  local part
  for part in "$library" "$development" "$workstation" "${binary[@]:2}"; do
    dpkg-deb -f "$(deb "$part")" Section Depends Suggests Conflicts Provides Replaces
  done >declared
  cat >expected <<TXT
Section: libs
Depends: libc6 (>= 2.14), libgcc-s1 (>= 3.5), libstdc++6 (>= 5.2), libprotobuf9 (>= 2.6), \
$workstation
Section: libdevel
Depends: $library (= $VERSION)
Suggests: libprotobuf-dev (>= 2.6.1), libprotobuf-dev (<< 2.7)
Section: libs
Depends: libc6 (>= 2.17), libgcc-s1 (>= 3.5), libstdc++6 (>= 11)
Conflicts: libprotobuf9
Provides: libprotobuf9 (= 2.6.1)
Replaces: libprotobuf9
Section: utils
Depends: libc6 (>= 2.34), libgcc-s1 (>= 3.5), libstdc++6 (>= 11), libprotobuf9 (>= 2.6), \
libnettle8, $library (= $VERSION)
TXT
  [ -z "$TOOLCHAIN" ] || sed -i '/utils/,$d' expected
  diff expected declared
}

@test "the library's package renews the loader's cache and tells its users what to need" {
  [ "$(dpkg-deb --info "$(deb "$library")" triggers)" = 'activate-noawait ldconfig' ]
  [ "$(dpkg-deb --info "$(deb "$library")" shlibs)" = \
    "libqel-message-protosvc $FIRST $library (>= $VERSION)" ]
}

# The names of the C library's and GCC's symbol versions tell what brought them. Of the C++
# library's, Debian's package tells; ARM's own, CXXABI_ARM, are older than all.
@test "the base libraries that packages ask for are new enough" {
  local part symbols name needed declared
  for part in "${binary[@]}"; do
    dpkg-deb -x "$(deb "$part")" "$part"
    find "$part" -type f '(' -name '*.so*' -o -path '*/bin/*' ')' -exec readelf -VW {} + |
      sed -En 's/.*  Name: ((GLIBC|GCC|GLIBCXX|CXXABI)_[0-9.]+) .*/\1/p' | sort -u >used
    [ -s used ]
    while read -r symbols; do
      case $symbols in
        GLIBC_*) name=libc6 needed=${symbols#*_} ;;
        GCC_*) name=libgcc-s1 needed=${symbols#*_} ;;
        *) name=libstdc++6 needed=$(dpkg-query --control-show libstdc++6 symbols |
          sed -n "s/^ $symbols@$symbols //p") ;;
      esac
      declared=$(dpkg-deb -f "$(deb "$part")" Depends | grep -oP "\Q$name\E \(>= \K[^)]+")
      [ -n "$needed" ] && dpkg --compare-versions "$declared" ge "$needed" ||
        fail "$part needs $name (>= $needed), because of $symbols"
    done <used
  done
}

@test "the library's SONAME has the first number, and it looks for others beside itself alone" {
  run -0 readelf -dW "$tree/$LIBDIR/libqel-message-protosvc.so"
  [[ $output == *SONAME*"[libqel-message-protosvc.so.$FIRST]"* ]]
  [ "$(sed -n 's/.*(R.*PATH).*\[\(.*\)\]/\1/p' <<<"$output")" = "\$ORIGIN" ]
}

@test "a plug-in in C runs where the archive is unpacked" { c_plugin_runs "$tree"; }

@test "a plug-in in C reads one header of the tree" {
  # The compiler's and the C library's lie elsewhere.
  compile_c "$tree" -o plugin -H 2>&1 | sed -n 's/^\.\.* //p' | xargs -d '\n' realpath |
    grep -v '^/usr/' | diff - <(echo "$tree/include/qel-message-protosvc/qel-message-serialize.h")
}

@test "a module in C++ runs where the archive is unpacked" {
  compile_with_cmake "$tree" cxx
  prints 'probe 7, answer of 2 bytes' "$tree" built/module
}

@test "the library is not installed without its runtime" {
  root=$PWD/root
  make_root
  refused 'depends on libprotobuf9 (>= 2.6)' in_root --install "$(deb "$library")"
}

@test "a plug-in in C runs where the packages are installed" { c_plugin_runs "$root/usr"; }

@test "a module that uses the classes runs where the packages are installed" {
  [ -z "$TOOLCHAIN" ] || cp -r "$PROTOBUF/include" "$root/usr" # as libprotobuf-dev would
  compile_with_cmake "$root/usr" classes
  prints 'ClientEcho 7' "$root/usr" built/module
}

@test "the tool runs where the packages are installed" {
  [ -z "$TOOLCHAIN" ] || skip 'it is for workstations'
  prints "qel-wire $VERSION" "$root/usr" "$root/usr/bin/qel-wire" --version
}

@test "nothing is left where the packages are removed" {
  in_root --remove "${binary[@]/%/:$ARCHITECTURE}" "$development:$ARCHITECTURE"
  find "$root" -path "$root/var/lib/dpkg" -prune -o \
    '(' -name '*qel*' -o -name 'libprotobuf*' -o -name 'libdlog*' ')' -print | none
}
