#!/usr/bin/env bash
# dev_test.sh CASE SOURCE: what ./dev says when the machine lets it down. It runs from a copy in a
# scratch folder, with commands of the machine replaced by others.
set -euo pipefail
scratch=$(mktemp -d /tmp/dev-test-XXXXXX) # whatever TMPDIR: the path must have no blank
trap 'rm -rf "$scratch"' EXIT
mkdir "$scratch/checkout" "$scratch/bin"
cp "$2/dev" "$scratch/checkout/dev"
archive=protobuf2_2.6.1.orig.tar.gz

# replace COMMAND BODY
replace() {
  printf '#!/bin/bash\n%s\n' "$2" >"$scratch/bin/$1"
  chmod +x "$scratch/bin/$1"
}

# run FOLDER [VARIABLE=VALUE...]: './dev setup', or $dev_command, must fail; its last line, but for
# where the log is, goes to $last.
run() {
  local folder=$1 status=0
  shift
  # shellcheck disable=SC2086 # words
  env PATH="$scratch/bin:$PATH" QEL_PROTOBUF_ROOT= "$@" "$folder/dev" ${dev_command:-setup} >"$scratch/out" 2>&1 ||
    status=$?
  last=$(grep -v '^dev: whole log: ' "$scratch/out" | tail -n 1)
  [ "$status" -eq "${expected_status:-1}" ] || refuse "exit status $status"
}

refuse() {
  printf '%s\n' "$*" >&2
  cat "$scratch/out" >&2
  exit 1
}

# expect PATTERN: what the last line looks like.
# shellcheck disable=SC2053
expect() { [[ $last == $1 ]] || refuse "expected as the last line: $1"; }

all_installed() { replace dpkg-query 'echo installed'; }

# An archive that passes for the right one and cannot be unpacked.
broken_archive() {
  mkdir "$scratch/checkout/.deps"
  echo broken >"$scratch/checkout/.deps/$archive"
  replace sha256sum "echo 'dbbd7bdd2381633995404de65a945ff1a7610b0da14593051b4738c90c6dd164  $archive'"
}

case $1 in
  no_mirror_for_packages)
    replace dpkg-query 'exit 1'
    replace apt-get 'echo "E: cannot resolve the mirror"; exit 100'
    replace sudo '"$@"'
    run "$scratch/checkout"
    expect 'E: cannot resolve the mirror'
    grep -q '^dev: install .*: failed; check that ' "$scratch/out" || refuse 'no advice'
    ;;
  neither_root_nor_sudo)
    replace dpkg-query 'exit 1'
    replace id 'echo 1000'
    # Only what the script needs until then, and no sudo.
    for command in bash dirname mkdir flock cat grep; do
      ln -s "$(command -v "$command")" "$scratch/bin/$command"
    done
    run "$scratch/checkout" PATH="$scratch/bin"
    expect "dev: packages are missing, and this is neither root nor is there sudo: run as root 'apt-get install g++ *'"
    ;;
  no_mirror_for_sources)
    all_installed
    replace apt-get 'echo "E: cannot resolve the mirror"; exit 100'
    run "$scratch/checkout"
    expect 'E: cannot resolve the mirror'
    ;;
  wrong_checksum)
    all_installed
    replace apt-get "case \$* in *source*) echo wrong >$archive ;; esac"
    run "$scratch/checkout"
    expect "dev: $archive has the SHA-256 * instead of dbbd7bdd* and was removed: call ./dev again, *"
    [ ! -e "$scratch/checkout/.deps/$archive" ] || refuse 'the wrong archive is still there'
    ;;
  no_compiler)
    all_installed
    run "$scratch/checkout" CXX=no-such-compiler
    expect "dev: no compiler: 'no-such-compiler' is not a command; install g++ *"
    ;;
  path_with_a_blank)
    all_installed
    mv "$scratch/checkout" "$scratch/check out"
    run "$scratch/check out"
    expect "dev: the Protocol Buffers build cannot take the path '$scratch/check out': move the checkout *"
    ;;
  broken_build_of_the_runtime)
    all_installed
    broken_archive
    run "$scratch/checkout"
    [ ! -e "$scratch/checkout/.deps/protobuf-2.6.1/complete" ] || refuse 'the half-done build counts as done'
    ;;
  broken_build_of_the_runtime_for_arm)
    all_installed
    broken_archive
    dev_command=arm
    run "$scratch/checkout" QEL_PROTOBUF_ROOT=/opt
    [ ! -e "$scratch/checkout/.deps/protobuf-2.6.1-arm-linux-gnueabihf/complete" ] ||
      refuse 'the half-done build counts as done'
    ;;
  finished_runtime_is_used_again)
    all_installed
    prefix=$scratch/checkout/.deps/protobuf-2.6.1
    mkdir -p "$prefix"
    recipe=$(sed -n 's/^readonly pb_recipe=\([0-9]*\).*/\1/p' "$2/dev")
    echo "recipe $recipe, dbbd7bdd2381633995404de65a945ff1a7610b0da14593051b4738c90c6dd164, $prefix" >"$prefix/complete"
    replace apt-get 'exit 100'
    PATH="$scratch/bin:$PATH" QEL_PROTOBUF_ROOT='' "$scratch/checkout/dev" setup >"$scratch/out" 2>&1 ||
      refuse 'did something all the same'
    [ ! -s "$scratch/out" ] || refuse 'said something'
    ;;
  named_runtime_is_used_instead)
    all_installed
    replace apt-get 'exit 100'
    PATH="$scratch/bin:$PATH" QEL_PROTOBUF_ROOT=/opt "$scratch/checkout/dev" setup >"$scratch/out" 2>&1 ||
      refuse 'did something all the same'
    ;;
  configured_by_hand_is_configured_anew)
    all_installed
    replace ctest ''
    # A cmake that says how it was called, and whose configuration never changes.
    replace cmake 'echo "$*"; [ -e build/release/CMakeCache.txt ] || touch build/release/CMakeCache.txt'
    configure() { # by './dev test'
      PATH="$scratch/bin:$PATH" QEL_PROTOBUF_ROOT=/opt "$scratch/checkout/dev" test >"$scratch/out" 2>&1 ||
        refuse 'it failed'
      called=$(grep -- '^--preset release ' "$scratch/checkout/build/dev.log") || refuse 'it configured nothing'
    }
    configure
    [[ $called != *--fresh* ]] || refuse 'what was not there was configured anew'
    configure
    [[ $called != *--fresh* ]] || refuse 'what had not changed was configured anew'
    touch "$scratch/checkout/build/release/CMakeCache.txt"
    configure
    [[ $called == *--fresh* ]] || refuse 'what had been changed was kept'
    configure
    [[ $called != *--fresh* ]] || refuse 'what had not changed since was configured anew'
    ;;
  full_disk_is_the_reason | first_error_is_the_reason | missing_library_is_the_reason)
    all_installed
    message=another
    reason='  1 | its line'
    if [ "$1" = full_disk_is_the_reason ]; then
      message='as: cannot write a.o: No space left on device'
      reason="the disk is full: $message"
    fi
    said="'checking for strerror: yes' 'a.cc:1:1: error: x' '  1 | its line' '$message' 'b.cc:1:1: error: y' stopped"
    if [ "$1" = missing_library_is_the_reason ]; then
      reason='ld: cannot find -la'
      said="'$reason' 'collect2: error: ld returned 1 exit status'"
    fi
    replace cmake "printf '%s\n' $said; exit 1"
    dev_command='test'
    run "$scratch/checkout" QEL_PROTOBUF_ROOT=/opt
    expect "$reason"
    ;;
  read_only_checkout)
    replace mkdir "echo 'mkdir: cannot create directory: Read-only file system' >&2; exit 1"
    run "$scratch/checkout"
    expect "dev: cannot write to .deps and build in $scratch/checkout: Read-only file system"
    ;;
  passed_tests_are_not_listed)
    all_installed
    replace cmake ''
    mkdir "$scratch/tests"
    printf 'add_test(%s)\n' 'a_name true' 'another sh -c "echo the output; false"' \
      >"$scratch/tests/CTestTestfile.cmake"
    replace ctest "exec $(command -v ctest) --test-dir $scratch/tests --output-on-failure"
    dev_command='test'
    expected_status=8
    run "$scratch/checkout" QEL_PROTOBUF_ROOT=/opt
    ! grep a_name "$scratch/out" || refuse 'the test that passed is there'
    grep -qx 'the output' "$scratch/out" || refuse 'the output of what failed is missing'
    grep -q '^50% tests passed, 1 tests failed out of 2' "$scratch/out" || refuse 'no summary'
    ;;
  no_test_of_that_name)
    all_installed
    replace cmake ''
    replace ctest 'echo; echo "Total Tests: 0"'
    dev_command='test frobnicate'
    run "$scratch/checkout" QEL_PROTOBUF_ROOT=/opt
    expect "dev: no test of release has a name like 'frobnicate'"
    ;;
  unknown_command)
    dev_command=frobnicate
    expected_status=2
    run "$scratch/checkout"
    expect 'dev: unknown command frobnicate: *'
    [ ! -e "$scratch/checkout/.deps" ] || refuse 'left something behind'
    ;;
  unknown_arguments)
    expected_status=2
    for dev_command in 'fuzz frobnicate' 'bench --rounds many' 'test --frob' 'arm NAME -j'; do
      run "$scratch/checkout"
      expect "dev: ${dev_command%% *} does not understand '*"
    done
    ;;
  *)
    refuse "no such case: $1"
    ;;
esac
