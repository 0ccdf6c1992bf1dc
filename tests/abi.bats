#!/usr/bin/env bats
# The binary form of the C interface, against the last release's, for the processor that is built for.
load build

compare=$SOURCE/tests/abi/compare.sh
now=${TRIPLE%%-*}.abi

@test "plug-ins that were built with the last release run, or the version says that they do not" {
  "$SOURCE/tests/abi/describe.sh" "$LIBRARY" >"$now"
  "$compare" "$SOURCE/tests/abi" "$now" "$VERSION+" # what comes after a release of this version
}

# Baselines of two releases that differ in a function, of which the later has it.
invite="/<function-decl name='invite_reply_deserialize'/d
  /elf-symbol name='invite_reply_deserialize'/d"
setup() {
  cd "$BATS_TEST_TMPDIR" || exit
  mkdir -p 1.4.2 1.10.0
  cp "$SOURCE/tests/abi/1.0.0/$now" 1.10.0
  sed "$invite" "1.10.0/$now" >"1.4.2/$now"
}

@test "the release before is the one to compare with" {
  cp "1.10.0/$now" .
  run -0 "$compare" . "$now" 1.10.0
  says 'built with 1.4.2 runs as it is. One that calls a new function needs 1.10.0 or later: invite_reply'
  run -0 "$compare" . "$now" 1.10.0+20300101
  says 'built with 1.10.0 runs as it is. Modules'
  run -0 "$compare" . "$now" 1.4.2
  says 'There is no release before.'
}

@test "a new function needs a new second number" {
  rm -r 1.10.0
  cp "$SOURCE/tests/abi/1.0.0/$now" .
  refused 'raise its second number' "$compare" . "$now" 1.4.3
}

@test "a function that is gone or has changed needs a new first number" {
  for script in "$invite" "/qel_message_inboxentry_t. size-in-bits/s/size-in-bits='[0-9]*/size-in-bits='1024/"; do
    sed "$script" "1.10.0/$now" >"$now"
    refused 'has to be compiled anew' "$compare" . "$now" 1.11.0
    says 'raise its first number'
    run -0 "$compare" . "$now" 2.0.0
  done
}

@test "another SONAME has plug-ins compiled anew" {
  sed "s/soname='[^']*/soname='libqel-message-protosvc.so.2/" "1.10.0/$now" >"$now"
  run -0 "$compare" . "$now" 2.0.0
  says 'built with 1.10.0 has to be compiled anew'
  refused 'is not known' "$compare" . "$now" 1.11.0
}
