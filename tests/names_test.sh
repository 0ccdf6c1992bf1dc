#!/usr/bin/env bash
# names_test.sh CASE PAGE SOURCE BUILD: what a page of the docs names is there.
# shellcheck disable=SC2016 # backticks of Markdown
set -euo pipefail
page=$2
source=$3

# quoted PATTERN: the names in backticks that it matches whole.
quoted() { grep -oE '`[^`]+`' "$source/$page" | tr -d '`' | grep -xE "$1" | sort -u; }

# all_in LIST: each name on standard input is in it.
all_in() {
  local names missing
  names=$(cat)
  missing=$(comm -23 <(sort -u <<<"$names") <(sort -u "$1"))
  [ -n "$names" ] && [ -z "$missing" ] && return
  printf '%s names what is not there: %s\n' "$page" "$missing" >&2
  return 1
}

case $1 in
  named_tests_exist)
    # Longer than a file's ending. Of a test with parameters the name without them. One that another preset has is not looked for.
    quoted '[A-Z][A-Za-z0-9]+\.[A-Za-z0-9_]{5,}' |
      grep -vxF "$(sed -nE 's/.*`([^`]+)` in the preset.*/\1/p' "$source/$page")" |
      all_in <(ctest --test-dir "$4" -N | sed -nE 's/^ *Test +#[0-9]+: ([^/]*\/)?([^/]*).*/\2/p')
    ;;
  named_functions_exist)
    quoted '[a-z_]+_(de)?serialize' |
      all_in <(sed -nE 's/^(int|void) ([a-z_]+)\(.*/\2/p' "$source/proto-lib/qel-message-serialize.h")
    ;;
  named_commands_exist)
    quoted '\./dev [a-z]+' | cut -d ' ' -f 2 | all_in <(sed -nE 's/^  ([a-z]+)( .*)?$/\1/p' "$source/dev")
    ;;
  named_files_exist)
    quoted '[A-Za-z0-9_.-]*(/[A-Za-z0-9_.-]*)+|[A-Za-z0-9_-]+\.[a-z]{1,4}|\.clang-[a-z]+' |
      while read -r file; do
        [ -e "$source/$file" ] || { echo "$page names what is not there: $file" >&2 && exit 1; }
      done
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
