#!/usr/bin/env bash
# security_test.sh CASE SOURCE: what SECURITY.md names is in the tree.
# shellcheck disable=SC2016 # backticks of Markdown
set -euo pipefail
source=$2

# quoted PATTERN: the names in backticks that it matches whole.
quoted() { grep -oE '`[^`]+`' "$source/SECURITY.md" | tr -d '`' | grep -xE "$1" | sort -u; }

# Suite.Case of each test in the sources.
program_tests() {
  cat "$source"/tests/*.cc | tr '\n' ' ' | grep -oE '\bTEST(_F|_P)?\([A-Za-z0-9]+, *[A-Za-z0-9_]+\)' |
    sed -E 's/.*\((.*), *(.*)\)/\1.\2/'
}

# Suite.Case of the scripts' tests; whatever else stands beside them comes along.
script_tests() {
  awk '/^ *qel_script_tests\(/ {sub(/.*\(/, ""); suite = $1}
    suite {for (i = 1; i <= NF; i++) print suite "." $i}
    /\)$/ {suite = ""}' "$source/tests/CMakeLists.txt"
  # Of cases that depend on the build, and of tests by name.
  grep -oE 'set\(demo_log_cases .*\)|list\(APPEND demo_log_cases .*\)' "$source/tests/CMakeLists.txt" |
    tr -d ')' | xargs -n 1 printf 'Demo.%s\n'
  sed -nE 's/^ *foreach\(case (.*)\)$/\1/p' "$source/tests/CMakeLists.txt" | xargs -n 1 printf 'Hardening.%s\n'
}

# all_in LIST: each name on standard input is in it.
all_in() {
  local names missing
  names=$(cat)
  missing=$(comm -23 <(sort -u <<<"$names") <(sort -u "$1"))
  [ -n "$names" ] && [ -z "$missing" ] && return
  printf 'SECURITY.md names what is not there: %s\n' "$missing" >&2
  return 1
}

case $1 in
  named_tests_exist)
    quoted '[A-Z][A-Za-z0-9]+\.[A-Za-z0-9_]+' | all_in <(program_tests && script_tests)
    ;;
  named_functions_exist)
    quoted '[a-z_]+_(de)?serialize' |
      all_in <(sed -nE 's/^(int|void) ([a-z_]+)\(.*/\2/p' "$source/proto-lib/qel-message-serialize.h")
    ;;
  named_commands_exist)
    quoted '\./dev [a-z]+' | cut -d ' ' -f 2 | all_in <(sed -nE 's/^  ([a-z]+)( .*)?$/\1/p' "$source/dev")
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
