#!/usr/bin/env bash
# interface_test.sh CASE SOURCE: the public header, the module, the docs, the README and the fuzz
# targets against the list of the exported functions, which has them in the interface's order.
# shellcheck disable=SC2016 # backticks of Markdown
set -euo pipefail
source=$2
list=$source/proto-lib/exported-functions.txt

functions() { grep -oE '^(int|void) [a-z_]+_(de)?serialize\(' "$1" | sed -E 's/^(int|void) //; s/\(//'; }

# same: what comes on standard input is the list.
same() { diff "$list" - >&2; }

# But for those that do nothing.
working() { grep -v '^forward_stored_message_' "$list"; }

case $1 in
  list_has_34_functions) [ "$(sort -u "$list" | wc -l)" -eq 34 ] ;;
  header_keeps_the_order) functions "$source/proto-lib/qel-message-serialize.h" | same ;;
  module_keeps_the_order) functions "$source/proto-lib/qel-message-serialize.cc" | same ;;
  docs_have_a_row_for_each)
    sed -nE 's/^\| `([a-z_]+serialize)` \|.*/\1/p' "$source/docs/interface.md" | same
    ;;
  diagrams_show_each)
    # In any order, and as the exchanges need it.
    diff <(working | sort) \
      <(sed -nE 's/^ *P->>L: ([a-z_]+serialize).*/\1/p' "$source/docs/interface.md" | sort -u) >&2
    ;;
  readme_shows_each)
    diff <(sort "$list") \
      <(grep '^|' "$source/README.md" | grep -oE '`[a-z_]+serialize`' | tr -d '`' | sort) >&2
    ;;
  fuzz_targets_are_the_deserializers)
    # Each target is named by its folder of seeds; three are for all functions, for all messages and for
    # the tool.
    diff <({ working | grep '_deserialize$' && printf '%s\n' qel_wire round_trip serializers; } | sort) \
      <(find "$source/fuzz/seeds" -mindepth 1 -maxdepth 1 -printf '%f\n' | sort) >&2
    ;;
  fuzzing_calls_each_serializer)
    diff <(working | grep -v '_deserialize$' | sort) \
      <(grep -oE '\<[a-z_]+_serialize\>' "$source/fuzz/serializers.cc" | sort -u) >&2
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
