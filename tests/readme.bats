#!/usr/bin/env bats
# The first program in README.md, with this build for the README's.
load build

# block LANGUAGE: the blocks of that language.
block() { awk -v fence="\`\`\`$1" '/^```/ {on = $0 == fence; next} on' "$SOURCE/README.md"; }

@test "the first program compiles by its command and prints what README.md says" {
  mkdir build
  ln -s "$SOURCE/proto-lib" proto-lib
  ln -s "$BUILD" build/release
  block c >first.c
  block text >expected
  block sh | sed -n '/^cc first.c/,/[^\\]$/p' >built_by
  [ -s expected ] && [ -s built_by ]
  cc() { "$CC" "${C_FLAGS[@]}" -std=c99 -pedantic -Wall -Wextra -Werror "$@"; }
  # shellcheck disable=SC1091
  . ./built_by
  DLOG_STANDIN_PRIORITY=S ${EMULATOR:+"$EMULATOR"} ./first >printed
  diff expected printed
}
