#!/usr/bin/env bats
# What ./dev says when the machine or the caller lets it down. It runs from a copy in a scratch folder,
# with commands of the machine replaced by others.
bats_require_minimum_version 1.5.0
archive=protobuf2_2.6.1.orig.tar.gz
sha256=dbbd7bdd2381633995404de65a945ff1a7610b0da14593051b4738c90c6dd164

setup() {
  scratch=$(mktemp -d /tmp/dev-test-XXXXXX) # whatever TMPDIR: the path must have no blank
  checkout=$scratch/checkout
  mkdir -p "$scratch/bin" "$checkout/runtime" "$checkout/tools"
  cd "$BATS_TEST_DIRNAME/.." || exit
  cp dev "$checkout"
  cp runtime/get "$checkout/runtime"
  cp tools/*.sh "$checkout/tools"
  replace dpkg-query 'echo installed'
  PATH=$scratch/bin:$PATH
  unset QEL_PROTOBUF_ROOT QEL_PROTOC QEL_DLOG_LIBRARY CC CXX
}

teardown() { rm -rf "$scratch"; }

# replace COMMAND BODY
replace() {
  printf '#!/bin/bash\n%s\n' "$2" >"$scratch/bin/$1"
  chmod +x "$scratch/bin/$1"
}

# An archive that passes for the right one and cannot be unpacked.
broken_archive() {
  mkdir "$checkout/.deps"
  echo broken >"$checkout/.deps/$archive"
  replace sha256sum "echo '$sha256  $archive'"
}

# ends PATTERN: what was run ends with a line like this, but for where the log is.
ends() {
  local last
  last=$(grep -v '^dev: whole log: ' <<<"$output" | tail -n 1)
  # shellcheck disable=SC2053
  [[ $last == $1 ]] || { printf 'expected as the last line: %s\nsaid: %s\n' "$1" "$output" && return 1; }
}

@test "without a mirror for packages, apt's reason and advice are shown" {
  replace dpkg-query 'exit 1'
  replace apt-get 'echo "E: cannot resolve the mirror"; exit 100'
  replace sudo '"$@"'
  run -1 "$checkout/dev" setup
  ends 'E: cannot resolve the mirror'
  [[ $output == *'dev: install '*': failed; check that '* ]]
}

@test "neither root nor sudo: the command for root is shown" {
  replace dpkg-query 'exit 1'
  replace id 'echo 1000'
  # Only what ./dev needs until then, and no sudo.
  for command in bash dirname mkdir flock cat grep; do
    ln -s "$(command -v "$command")" "$scratch/bin/$command"
  done
  PATH=$scratch/bin run -1 "$checkout/dev" setup
  PATH=${PATH#*:}
  ends "dev: packages are missing, and this is neither root nor is there sudo: run as root 'apt-get install g++ *'"
}

@test "without a mirror for sources, apt's reason is shown" {
  replace apt-get 'echo "E: cannot resolve the mirror"; exit 100'
  run -1 "$checkout/dev" setup
  ends 'E: cannot resolve the mirror'
}

@test "an archive with a wrong checksum is removed" {
  replace apt-get "case \$* in *source*) echo wrong >$archive ;; esac"
  run -1 "$checkout/dev" setup
  ends "dev: $archive has the SHA-256 * instead of $sha256 and was removed: call ./dev again, *"
  [ ! -e "$checkout/.deps/$archive" ]
}

@test "a compiler that is missing is named" {
  CXX=no-such-compiler run -1 "$checkout/dev" setup
  ends "dev: no compiler: 'no-such-compiler' is not a command; install g++ *"
}

@test "a path with a blank is refused" {
  mv "$checkout" "$scratch/check out"
  run -1 "$scratch/check out/dev" setup
  ends "dev: the Protocol Buffers build cannot take the path '$scratch/check out': move the checkout *"
}

@test "a broken build of the runtime shows its reason and does not count as done" {
  broken_archive
  run -1 "$checkout/dev" setup
  [[ $output == *'gzip: stdin: not in gzip format'* ]]
  [ ! -e "$checkout/.deps/protobuf-2.6.1/complete" ]
}

@test "a finished runtime is used again without a word" {
  prefix=$checkout/.deps/protobuf-2.6.1
  recipe=$(sed -nE 's/^recipe=([0-9]+).*/\1/p' "$checkout/runtime/get")
  mkdir -p "$prefix"
  echo "recipe $recipe, $sha256, $prefix" >"$prefix/complete"
  replace apt-get 'exit 100'
  run -0 "$checkout/dev" setup
  [ -z "$output" ]
}

@test "the runtime that QEL_PROTOBUF_ROOT names is used instead" {
  replace apt-get 'exit 100'
  QEL_PROTOBUF_ROOT=/opt run -0 "$checkout/dev" setup
}

@test "of a step that fails the first error is the reason" {
  replace cmake "printf '%s\n' 'checking for strerror: yes' 'a.cc:1:1: error: x' '  1 | its line' other 'b.cc:1:1: error: y'; exit 1"
  QEL_PROTOBUF_ROOT=/opt run -1 "$checkout/dev" test
  ends '  1 | its line'
}

@test "a full disk is the reason whatever else went wrong" {
  replace cmake "printf '%s\n' 'a.cc:1:1: error: x' 'as: cannot write a.o: No space left on device'; exit 1"
  QEL_PROTOBUF_ROOT=/opt run -1 "$checkout/dev" test
  ends 'the disk is full: as: cannot write a.o: No space left on device'
}

@test "a checkout that cannot be written is named" {
  replace mkdir "echo 'mkdir: cannot create directory: Read-only file system' >&2; exit 1"
  run -1 "$checkout/dev" setup
  ends "dev: cannot write to .deps and build in $checkout: Read-only file system"
}

@test "a test name that no test has is refused" {
  replace cmake 'mkdir -p build/release'
  replace ctest 'echo; echo "Total Tests: 0"'
  QEL_PROTOBUF_ROOT=/opt run -1 "$checkout/dev" test frobnicate
  ends "dev: no test of release has a name like 'frobnicate'"
}

@test "an unknown command is refused and leaves nothing behind" {
  run -2 "$checkout/dev" frobnicate
  ends 'dev: unknown command frobnicate: *'
  [ ! -e "$checkout/.deps" ]
}

@test "unknown arguments are refused" {
  for command in 'fuzz frobnicate' 'bench --rounds many' 'test --frob' 'arm NAME -j'; do
    # shellcheck disable=SC2086 # words
    run -2 "$checkout/dev" $command
    ends "dev: ${command%% *} does not understand '*"
  done
}

# stages_of LINE...: a job of these stages, named by a word each.
stages_of() {
  printf '%s\n' 'set -euo pipefail' ". $checkout/tools/step.sh" ". $checkout/tools/stages.sh" \
    "stage_folder=$scratch/said" "cd $scratch" "$@" run_stages >"$scratch/job"
}

@test "stages show what they say in their order, and wait for those they come after" {
  stages_of 'last() { [ -e made ] && echo "said last"; }' 'made() { sleep 0.3; touch made; }' \
    'stage slow "" made' 'stage quick "" echo said quick' 'stage last slow last'
  run -0 bash "$scratch/job"
  [[ $(grep -v begin: <<<"$output" | xargs) == \
    'dev: slow: passed in '*' s dev: quick: passed in '*' s said quick dev: last: passed in '*' s said last' ]]
}

@test "a stage that fails is named with its reason, and stops the others" {
  stages_of 'broken() { echo the reason; false; echo not reached; }' \
    'stage long "" sleep 300' 'stage broken "" broken' 'stage after broken touch after'
  run -1 bash "$scratch/job"
  [[ $output == *$'dev: broken: failed\nthe reason\ndev: broken has failed; '* ]]
  [ ! -e "$scratch/after" ]
}

@test "stages end with the job that is interrupted" {
  # shellcheck disable=SC2016
  stages_of 'long() { sleep 300 & echo $! >"child-$1"; wait; }' 'stage one "" long 1' 'stage two "" long 2'
  bash "$scratch/job" 3>&- &
  until [ -s "$scratch/child-1" ] && [ -s "$scratch/child-2" ]; do sleep 0.1; done
  kill -TERM $!
  wait $! || ended=$?
  [ "$ended" -eq 130 ]
  for _ in {1..50}; do # until they are gone
    kill -0 "$(cat "$scratch/child-1")" || kill -0 "$(cat "$scratch/child-2")" || return 0
    sleep 0.1
  done 2>/dev/null
  return 1
}
