#!/usr/bin/env bats
# A release is the same wherever, whenever and by whom it is made: compares the one that './dev release' has
# made with what its source archive makes, in another folder, by another user, at another time.
# QEL_ARCHITECTURES names those that are made again, otherwise all are.
bats_require_minimum_version 1.5.0

root=$(cd "$BATS_TEST_DIRNAME/.." && pwd -P)

setup() {
  folder=$(mktemp -d /tmp/a-folder-with-another-name-XXXXXX)
  user=(setpriv --reuid=65534 --regid=65534 --clear-groups)
  [ "$(id -u)" -eq 0 ] || user=(sudo "${user[@]}")
  chmod 777 "$folder"
  cd "$BATS_TEST_TMPDIR" || exit
}

teardown() { "${user[@]}" find "$folder" -mindepth 1 -delete && rmdir "$folder"; }

as_another_user() {
  "${user[@]}" env --chdir="$folder" -u QEL_DEV_LOCK -u QEL_BUILD HOME="$folder" USER=nobody \
    faketime -f '+400d' "$@"
}

@test "what the source archive makes elsewhere, by another user at another time, is the same, and signed" {
  cp "$root"/build/dist/*.orig.tar.gz "$root"/.deps/protobuf2_*.tar.gz "$folder"
  chmod a+r "$folder"/*.gz
  as_another_user bash -c 'umask 027 && tar -xzf qel-*.orig.tar.gz && cd qel-*/ && mkdir .deps'
  as_another_user bash -c 'cp protobuf2_*.tar.gz qel-*/.deps' # the runtime is built anew
  tree=$(echo "$folder"/qel-*/)
  as_another_user env --chdir="$tree" sha256sum --check --quiet SHA256SUMS
  # The schema's compiler makes no difference, so the other one is used where it can be and only ARM is built for.
  compiler=$root/.deps/protobuf-2.6.1/bin/protoc
  [[ ${QEL_ARCHITECTURES:-} == arm* ]] && as_another_user "$compiler" --version || compiler=''
  as_another_user gpg --batch --quiet --passphrase '' --quick-generate-key tester
  # shellcheck disable=SC2086,SC2016 # words, and the other shell's variables
  as_another_user env TZ=Pacific/Kiritimati LC_ALL=POSIX QEL_RELEASE_KEY=tester QEL_PROTOC="$compiler" \
    bash -c 'umask 027 && exec "$1/dev" release "${@:2}"' release "$tree" ${QEL_ARCHITECTURES:-}

  dist=${tree}build/dist
  as_another_user gpg --verify "$dist"/SHA256SUMS{.asc,}
  as_another_user env --chdir="$dist" sha256sum --check --quiet SHA256SUMS
  as_another_user cat "$dist/SHA256SUMS" >again
  [ -n "${QEL_ARCHITECTURES:-}" ] || diff <(cut -c67- again) <(cut -c67- "$root/build/dist/SHA256SUMS")
  while read -r sum file; do
    [ "$sum" = "$(sha256sum "$root/build/dist/$file" | cut -d' ' -f1)" ] ||
      as_another_user diffoscope "$root/build/dist/$file" "$dist/$file" >&2 || different=1
  done <again
  [ -z "${different:-}" ]
}
