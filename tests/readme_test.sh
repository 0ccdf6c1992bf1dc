#!/usr/bin/env bash
# readme_test.sh SOURCE BUILD EMULATOR CC [FLAG...]: the first program in the README compiles as
# printed, with the command as printed, without a warning, and prints what the README says. EMULATOR
# may be empty.
set -euo pipefail
source=$1
build=$2
emulator=$3
compiler=$4
flags=("${@:5}")
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# block LANGUAGE: the blocks of that language.
block() { awk -v fence="\`\`\`$1" '/^```/ {on = $0 == fence; next} on' "$source/README.md"; }

# The README's build folder is this one's.
mkdir -p "$scratch/build"
ln -s "$source/proto-lib" "$scratch/proto-lib"
ln -s "$build" "$scratch/build/release"
block c >"$scratch/first.c"
block text >"$scratch/expected"
block sh | sed -n '/^cc first.c/,/[^\\]$/p' >"$scratch/command"
[ -s "$scratch/first.c" ] && [ -s "$scratch/expected" ] && [ -s "$scratch/command" ]

cc() { command "$compiler" "${flags[@]}" -std=c99 -pedantic -Wall -Wextra -Werror "$@"; }
cd "$scratch"
# shellcheck disable=SC1091
. "$scratch/command"
DLOG_STANDIN_PRIORITY=S ${emulator:+"$emulator"} ./first >printed
diff expected printed
