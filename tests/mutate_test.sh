#!/usr/bin/env bash
# mutate_test.sh CASE SOURCE BUILD: which mutants ./dev mutate takes.
set -euo pipefail
source=$2
build=$3

list() { "$source/tools/mutate.py" "$build" --list "$@"; }

case $1 in
  pattern_goes_with_list)
    listed=$(list '^typing_updated')
    [ -n "$listed" ]
    ! grep -v '^typing_updated' <<<"$listed" >&2 || exit 1
    ;;
  pattern_that_no_mutant_has)
    ! said=$(list 'no such mutant' 2>&1) || exit 1
    grep -q "no mutant's name has 'no such mutant'" <<<"$said"
    ;;
  every_function_has_mutants)
    listed=$(list)
    while read -r function; do
      grep -q "^$function |" <<<"$listed" || { echo "none of $function" >&2 && exit 1; }
    done < <(grep -v '^forward_stored_message_' "$source/proto-lib/exported-functions.txt") # with nothing to change
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
