#!/usr/bin/env bash
# interface_test.sh CASE SOURCE: the module, the docs and the README against the public header, which
# declares the functions in the interface's order.
# shellcheck disable=SC2016 # backticks of Markdown
set -euo pipefail
source=$2

functions() { grep -oE '^(int|void) [a-z_]+_(de)?serialize\(' "$1" | sed -E 's/^(int|void) //; s/\(//'; }

# same: the list on standard input is the header's.
same() { diff <(functions "$source/proto-lib/qel-message-serialize.h") - >&2; }

# But for those that do nothing.
working() { grep -v '^forward_stored_message_'; }

case $1 in
  header_declares_34_functions)
    [ "$(functions "$source/proto-lib/qel-message-serialize.h" | sort -u | wc -l)" -eq 34 ]
    ;;
  module_keeps_the_order) functions "$source/proto-lib/qel-message-serialize.cc" | same ;;
  docs_have_a_row_for_each)
    sed -nE 's/^\| `([a-z_]+serialize)` \|.*/\1/p' "$source/docs/interface.md" | same
    ;;
  diagrams_show_each)
    # In any order, and as the exchanges need it.
    diff <(functions "$source/proto-lib/qel-message-serialize.h" | working | sort) \
      <(sed -nE 's/^ *P->>L: ([a-z_]+serialize).*/\1/p' "$source/docs/interface.md" | sort -u) >&2
    ;;
  readme_shows_each)
    diff <(functions "$source/proto-lib/qel-message-serialize.h" | sort) \
      <(grep '^|' "$source/README.md" | grep -oE '`[a-z_]+serialize`' | tr -d '`' | sort) >&2
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
