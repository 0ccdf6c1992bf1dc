#!/usr/bin/env bash
# wire_format_test.sh CASE SOURCE BUILD: docs/wire-format.md is what its examples do.
set -euo pipefail
export LC_ALL=C.UTF-8
source=$2
build=$3
page=$source/docs/wire-format.md

case $1 in
  page_is_what_runs_say)
    /usr/bin/python3 "$source/tools/wire_format.py" "$build" | diff "$page" - >&2 || {
      echo './dev docs writes the page anew' >&2
      exit 1
    }
    ;;
  page_has_each_family)
    # Those of the interface's sequences, in their order, each with a message sent and one received.
    diff <(sed -n '/^## Sequences/,$ s/^### //p' "$source/docs/interface.md") \
      <(sed -n 's/^## //p' "$page") >&2
    families=$(grep -c '^## ' "$page")
    [ "$(grep -c '^The plug-in sends it:$' "$page")" -eq "$families" ]
    [ "$(grep -c '^The plug-in receives it as ' "$page")" -eq "$families" ]
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
