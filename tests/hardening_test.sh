#!/usr/bin/env bash
# hardening_test.sh CASE FILE...: how the built library, or its object files, are made.
set -euo pipefail
export LC_ALL=C

# has PATTERN COMMAND FILE: what the command prints about the file has the pattern. Ends the test if
# the command fails.
has() {
  local out
  # shellcheck disable=SC2086 # a command with its options
  out=$($2 "$3" 2>&1) || { echo "$out" >&2 && exit 2; }
  grep -Eq "$1" <<<"$out"
}

lacks() { ! has "$@"; }

# Every object file refers to the symbol.
all_refer_to() {
  local symbol=$1 object
  shift
  for object in "$@"; do
    has "UND $symbol" 'readelf --syms -W' "$object" || { echo "not in $object" >&2 && exit 1; }
  done
}

case $1 in
  relocations_are_read_only) has 'GNU_RELRO' 'readelf -lW' "$2" ;;
  symbols_are_bound_at_load_time) has 'FLAGS_1.*NOW' 'readelf -dW' "$2" ;;
  stack_is_not_executable) has 'GNU_STACK .* RW +0x' 'readelf -lW' "$2" ;;
  text_has_no_relocations) lacks 'TEXTREL' 'readelf -dW' "$2" ;;
  runtime_is_linked_dynamically) has 'NEEDED.*libprotobuf\.so' 'readelf -dW' "$2" ;;
  stacks_are_protected) all_refer_to __stack_chk_fail "${@:2}" ;;
  assertions_are_compiled_in) all_refer_to __assert_fail "${@:2}" ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
