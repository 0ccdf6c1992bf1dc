#!/usr/bin/env bash
# abi.sh write BASELINE LIBRARY: describes the C interface's binary form in the baseline.
# abi.sh compare BASELINE LIBRARY: fails if the library's differs in anything, additions included.
# The library must have debug information.
set -euo pipefail
command=$1
baseline=$2
library=$3

# Without what changes from one machine and one edit to the next.
describe() {
  abidw --suppressions "$(dirname "${BASH_SOURCE[0]}")/c_interface.suppr" --exported-interfaces-only \
    --no-corpus-path --no-comp-dir-path --no-show-locs --no-parameter-names --no-elf-needed "$library" |
    sed "s|path='[^']*/|path='|"
}

case $command in
  write) describe >"$baseline" ;;
  compare)
    if [ ! -e "$baseline" ]; then
      printf '%s\n' "There is no baseline $baseline: './dev abi' writes it." >&2
      exit 1
    fi
    scratch=$(mktemp -d)
    trap 'rm -rf "$scratch"' EXIT
    describe >"$scratch/now.abi"
    status=0
    difference=$(abidiff --harmless "$baseline" "$scratch/now.abi" 2>&1) || status=$?
    if [ "$status" -ne 0 ] || [ -n "$difference" ]; then
      printf '%s\n' "$difference" 'The binary form of the C interface has changed: programs built earlier may break.' \
        "If that is wanted, './dev abi' writes the new baseline." >&2
      exit 1
    fi
    ;;
  *)
    echo "no such command: $command" >&2
    exit 2
    ;;
esac
