#!/usr/bin/env bash
# hardening_test.sh CASE FILE...: how the built library, or its object files, are made.
set -euo pipefail
library=$2

has() { grep -Eq "$1" <<<"$2"; }

case $1 in
  relocations_are_read_only)
    has 'GNU_RELRO' "$(readelf -lW "$library")"
    ;;
  symbols_are_bound_at_load_time)
    has 'BIND_NOW|FLAGS_1.*NOW' "$(readelf -dW "$library")"
    ;;
  stack_is_not_executable)
    has 'GNU_STACK .* RW +0x' "$(readelf -lW "$library")"
    ;;
  stacks_are_protected) # in every object file
    for object in "${@:2}"; do
      has '__stack_chk_fail' "$(readelf --syms -W "$object")" || { echo "not in $object" && exit 1; }
    done
    ;;
  text_has_no_relocations)
    ! has 'TEXTREL' "$(readelf -dW "$library")"
    ;;
  every_symbol_is_found) # by the libraries that it names
    out=$(ldd -r "$library" 2>&1)
    ! has 'undefined symbol|not found' "$out"
    ;;
  runtime_is_linked_dynamically)
    has 'NEEDED.*libprotobuf\.so' "$(readelf -dW "$library")"
    ;;
  assertions_are_compiled_in)
    has '__assert_fail' "$(readelf --dyn-syms -W "$library")"
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
