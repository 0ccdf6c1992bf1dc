#!/usr/bin/env bash
# readme_test.sh README HEADER-FOLDER LIBRARY CC [FLAG...]: the first program in the README compiles
# as printed, without a warning, and prints what the README says.
set -euo pipefail
readme=$1
headers=$2
library=$3
compiler=$4
shift 4
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

# block LANGUAGE: the first block of that language.
block() { awk -v fence="\`\`\`$1" '$0 == fence {on = 1; next} on && /^```/ {exit} on' "$readme"; }

block c >"$scratch/first.c"
block text >"$scratch/expected"
[ -s "$scratch/first.c" ] && [ -s "$scratch/expected" ]
"$compiler" "$@" -std=c99 -pedantic -Wall -Wextra -Werror -I "$headers" "$scratch/first.c" "$library" \
  -Wl,-rpath,"$(dirname "$library")" -o "$scratch/first"
DLOG_STANDIN_PRIORITY=S "$scratch/first" >"$scratch/printed"
diff "$scratch/expected" "$scratch/printed"
