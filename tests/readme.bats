#!/usr/bin/env bats
# The code in README.md and in docs/migration.md, with this build for theirs.
load build

# block LANGUAGE [PAGE]: the page's blocks of that language.
block() { awk -v fence="\`\`\`$1" '/^```/ {on = $0 == fence; next} on' "$SOURCE/${2:-README.md}"; }

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

@test "the code of docs/migration.md compiles" {
  block c docs/migration.md >code.c
  [ -s code.c ]
  "$CC" "${C_FLAGS[@]}" -std=c99 -pedantic -Wall -Wextra -Werror -I "$SOURCE/proto-lib" -c code.c
}
