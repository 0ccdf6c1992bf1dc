#!/usr/bin/env bats
# The binary form of the C interface, against the baseline of the processor that is built for.
load build

@test "the C interface has the binary form of the baseline" {
  "$SOURCE/tests/abi/describe.sh" "$LIBRARY" >now.abi
  run abidiff --harmless "$SOURCE/tests/abi/${TRIPLE%%-*}.abi" now.abi
  [ "$status$output" = 0 ] || fail 'Programs that were built earlier may break.' \
    "If the change is wanted, './dev abi' writes the new baseline."
}
