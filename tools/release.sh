# shellcheck shell=bash disable=SC2154,SC2034 # what ./dev sets, and tools/check.sh uses
# The source archive, and the packages that are made of it. Needs the functions of ./dev.

release_packages=(build-essential debhelper rpm debugedit elfutils "${docs_packages[@]}")
release_test_packages=(lintian gdb-multiarch faketime diffoscope-minimal gnupg)
work=$root/build/release-work

# copy_tree FOLDER: the files of this tree, with Debian's changelog and a list of their checksums. The tree is
# a checkout, with what is in no commit yet, or an unpacked source archive.
copy_tree() {
  local seconds changed=changed
  mkdir -p "$1"
  if [ -e .git ]; then
    comm -23 <(git ls-files -co --exclude-standard --deduplicate | sort) <(git ls-files -d | sort)
    seconds=$(git log -1 --format=%ct)
  else
    sed 's/^[0-9a-f]*  //' SHA256SUMS
    seconds=$(dpkg-parsechangelog -l packaging/debian/changelog -S Timestamp)
  fi >"$work/files"
  tar -c --mode=u=rwX,go=rX -T "$work/files" | tar -x -C "$1" # whatever the checkout's umask was
  ! is_committed || changed=''
  packaging/debian_changelog.py "$seconds" $changed >"$1/packaging/debian/changelog"
  (cd "$1" && list_checksums)
}

# list_checksums: of all files in this folder, in its file SHA256SUMS.
list_checksums() {
  find . -type f ! -name SHA256SUMS -printf '%P\n' | sort | xargs -d '\n' sha256sum >"$work/SHA256SUMS"
  mv "$work/SHA256SUMS" .
}

# release_says FIELD: of the newest entry of Debian's changelog: Version, without Debian's own number, or
# Timestamp.
release_says() {
  dpkg-parsechangelog -l "$work/source/packaging/debian/changelog" -S "$1" | sed 's/-1$//'
}

# make_source: the source archive, and Debian's source package around it.
make_source() {
  local name version
  umask 022
  copy_tree "$work/source"
  version=$(release_says Version)
  name=qel-message-protosvc-$version
  SOURCE_DATE_EPOCH=$(release_says Timestamp)
  export SOURCE_DATE_EPOCH
  tar -c -C "$work/source" --transform="s|^[.]|$name|" --sort=name --format=gnu \
    --mtime="@$SOURCE_DATE_EPOCH" --owner=0 --group=0 --numeric-owner . |
    gzip -9n >"$work/qel-message-protosvc_$version.orig.tar.gz"
  cp -r "$work/source/packaging/debian" "$work/source/debian"
  (cd "$work" && dpkg-source -b source)
}

# fill_in FILE: with the version, and the checksum of the source archive.
fill_in() {
  local version sum
  version=$(release_says Version)
  read -r sum _ < <(sha256sum "$work/qel-message-protosvc_$version.orig.tar.gz")
  sed "s/@VERSION@/$version/; s/@SHA256@/$sum/" "$1"
}

# triple_of ARCHITECTURE: as compilers name another one than this machine's.
triple_of() {
  [ "$1" = "$(dpkg --print-architecture)" ] || dpkg-architecture -a "$1" -q DEB_HOST_GNU_TYPE 2>/dev/null
}

# use_settings ARCHITECTURE: sets what the build reads from the environment. A device SDK is for its own
# architecture, and what else is named for this machine.
use_settings() {
  local triple compilers=${QEL_PROTOBUF_ROOT:-$deps/protobuf-2.6.1}
  triple=$(triple_of "$1")
  if [ -n "$triple" ] && [ -z "${QEL_DLOG_LIBRARY:-}" ]; then
    unset CC CXX QEL_PROTOBUF_ROOT
  elif [ -n "$triple" ]; then
    compilers=$deps/protobuf-2.6.1
  fi
  export QEL_PROTOC=${QEL_PROTOC:-$compilers/bin/protoc}
  [ "$QEL_PROTOC" != "$deps/protobuf-2.6.1/bin/protoc" ] || runtime/get
  [ -n "${QEL_PROTOBUF_ROOT:-}" ] || runtime/get ${triple:+"$triple"}
  export QEL_PROTOBUF_ROOT=${QEL_PROTOBUF_ROOT:-$deps/protobuf-2.6.1${triple:+-$triple}}
  SOURCE_DATE_EPOCH=$(release_says Timestamp)
  export SOURCE_DATE_EPOCH
  unset CFLAGS CXXFLAGS CPPFLAGS LDFLAGS CPATH
}

# make_debs ARCHITECTURE: the packages, of the source package.
make_debs() {
  local options=(-b) profiles=()
  [ -z "$(triple_of "$1")" ] || options=(-B -d -a "$1") profiles=(cross)
  if [ -n "${QEL_DLOG_LIBRARY:-}" ]; then
    profiles+=(pkg.qel-message-protosvc.device)
  elif [ ${#profiles[@]} -gt 0 ]; then
    profiles+=(pkg.qel-message-protosvc.emulator)
  fi
  cd "$work" || exit
  dpkg-source --no-check -x ./*.dsc "$1"
  cd "$1" || exit
  DEB_BUILD_OPTIONS="nocheck parallel=$(nproc)" DEB_BUILD_PROFILES=${profiles[*]} \
    dpkg-buildpackage --no-sign "${options[@]}"
}

# make_rpms ARCHITECTURE: the RPMs for the device with whose SDK is built.
make_rpms() {
  local spec=$work/qel-message-protosvc.spec processor=$1
  case $1 in armhf) processor=armv7hl ;; armel) processor=armv7l ;; amd64) processor=x86_64 ;; esac
  umask 022
  fill_in packaging/rpm/qel-message-protosvc.spec >"$spec"
  rpmbuild -bb --nodeps --target "$processor-linux" -D "_topdir $work/rpm" -D "_sourcedir $work" \
    -D "_rpmdir $work" -D '_buildhost localhost' \
    -D '_rpmfilename %%{NAME}-%%{VERSION}-%%{RELEASE}.%%{ARCH}.rpm' \
    -D 'use_source_date_epoch_as_buildtime 1' -D 'clamp_mtime_to_source_date_epoch 1' "$spec"
}

# make_packages FOLDER [ARCHITECTURE...]: the source package and all others, in the folder.
make_packages() {
  local made=$1 architecture
  shift
  setup "${arm_packages[@]}" "${release_packages[@]}"
  [ $# -gt 0 ] || set -- "$(dpkg --print-architecture)" armhf armel
  if [ -n "${CMAKE_SYSROOT:-}${QEL_DLOG_LIBRARY:-}" ]; then
    [ -n "${QEL_DLOG_LIBRARY:-}" ] || fail "let QEL_DLOG_LIBRARY name the dlog library of the device SDK"
    [ $# -eq 1 ] || fail "a device SDK is for one architecture: name it"
  fi
  rm -rf "$work" "$made"
  mkdir -p "$work" "$made"
  step "pack the sources" '' make_source
  for architecture in "$@"; do
    (
      use_settings "$architecture"
      step "package for $architecture" '' make_debs "$architecture"
      [ -z "${QEL_DLOG_LIBRARY:-}" ] || step "package for $architecture as RPM" '' make_rpms "$architecture"
    )
  done
  find "$work" -maxdepth 1 -regex '.*\.\(deb\|dsc\|rpm\|tar\..z\)' -exec cp {} "$made" ';'
  list_tools >"$made/tools.txt"
}

# list_tools: the settings, the packages that the build needs, and what they need, with their versions.
list_tools() {
  local names setting
  for setting in CC CXX QEL_PROTOBUF_ROOT QEL_PROTOC QEL_DLOG_LIBRARY CMAKE_SYSROOT CMAKE_BUILD_TYPE; do
    [ -z "${!setting:-}" ] || echo "$setting=${!setting}"
  done
  names=$(apt-cache depends --recurse --installed \
    --no-{recommends,suggests,conflicts,breaks,replaces,enhances} \
    "${build_packages[@]}" "${arm_packages[@]}" "${release_packages[@]}" \
    bash coreutils dpkg-dev gzip sed tar xz-utils | grep '^[a-z]')
  # Of alternatives not all are installed.
  # shellcheck disable=SC2086 # words
  { dpkg-query -W -f='${db:Status-Status} ${binary:Package} ${Version}\n' $names 2>/dev/null || true; } |
    sed -n 's/^installed //p' | sort -u
}

# write_documents FOLDER: about the packages in it: what is in them, what the author of a plug-in has to do
# after the last release, and the recipes of image builders.
write_documents() {
  local version library now=$work/x86_64.abi file
  version=$(release_says Version)
  shopt -s nullglob
  packaging/documents.py "$version" "$(release_says Timestamp)" "$1" \
    "$work"/*/build/debian/docs/html/jquery.js
  library=$(printf '%s\n' "$work"/*/build/debian/proto-lib/libqel-message-protosvc.so | tail -n 1)
  [[ $library != */arm*/build/* ]] || now=$work/arm.abi
  tests/abi/describe.sh "$library" >"$now"
  tests/abi/compare.sh tests/abi "$now" "$version" >"$1/binary-compatibility.txt"
  fill_in packaging/rpm/qel-message-protosvc.spec >"$1/qel-message-protosvc.spec"
  fill_in packaging/yocto/qel-message-protosvc.bb >"$1/qel-message-protosvc_$version.bb"
  mkdir "$1/buildroot"
  for file in Config.in qel-message-protosvc.mk qel-message-protosvc.hash; do
    fill_in "packaging/buildroot/$file" >"$1/buildroot/$file"
  done
}

# is_committed: nothing has changed since the last commit, or since the source archive was made.
is_committed() {
  if [ -e .git ]; then
    [ -z "$(git status --porcelain --untracked-files=normal)" ]
  else
    sha256sum --check --status SHA256SUMS
  fi
}

# make_release [ARCHITECTURE...]: the packages, and what belongs to them.
make_release() {
  local made=$root/build/dist
  [ -z "${QEL_RELEASE_KEY:-}" ] || gpg --list-secret-keys "$QEL_RELEASE_KEY" >/dev/null 2>&1 ||
    fail "gpg has no secret key '$QEL_RELEASE_KEY', which QEL_RELEASE_KEY names"
  make_packages "$made" "$@"
  step "write what is in it, and which weaknesses reach it" '' write_documents "$made"
  (cd "$made" && list_checksums)
  if [ -n "${QEL_RELEASE_KEY:-}" ]; then
    step "sign SHA256SUMS" '' \
      gpg --batch --yes --local-user "$QEL_RELEASE_KEY" --armor --detach-sign "$made/SHA256SUMS"
  else
    say "not signed: QEL_RELEASE_KEY names no key"
  fi
  say "release: $made"
}
