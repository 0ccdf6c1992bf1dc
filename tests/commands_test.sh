#!/usr/bin/env bash
# commands_test.sh CASE SOURCE BUILD: the commands of the README and the docs against the list of what
# runs them, documented_commands.txt, and that against what there is to run them.
set -euo pipefail
source=$2
build=$3
list=$source/tests/documented_commands.txt

entries() { grep -v '^#' "$list" | grep .; }

# field N: of each entry.
field() { entries | awk -F ' => ' -v n="$1" '{ print $n }'; }

documented() {
  (cd "$source" && find README.md CONTRIBUTING.md SECURITY.md docs fuzz/README.md qel-wire/README.md -maxdepth 1 -name '*.md' \
    -exec awk -f tests/commands.awk {} +) | sort -u
}

runners() { field 3 | sed 's/, /\n/g' | sort -u; }

# none_but LIST TEXT: each line of standard input is in LIST, which a message about the others names.
none_but() {
  local unknown
  unknown=$(comm -23 <(sort -u) <(sort -u <<<"$1"))
  [ -z "$unknown" ] || { printf '%s:\n%s\n' "$2" "$unknown" >&2 && exit 1; }
}

# The lines of ./dev check, those of steps by their names.
stages() {
  sed -n '/^run_check() {/,/^}/p' "$source/dev" | sed -E '1d; $d; s/ +#.*//; s/^ +//; s/^step "([^"]*)".*/\1/'
}

tests() { ctest --test-dir "$build" -N | sed -nE 's/^ *Test +#[0-9]+: (.*)/\1/p'; }

case $1 in
  each_is_in_the_list)
    commands=$(documented)
    [ -n "$commands" ]
    none_but "$(field 1)" "No line of $list says what runs these (COMMAND => WHOLE => BY)" <<<"$commands"
    ;;
  each_of_the_list_is_documented)
    none_but "$(documented)" "No page has these commands of $list any more" < <(field 1)
    ;;
  each_has_one_entry)
    twice=$(field 1 | sort | uniq -d)
    [ -z "$twice" ] || { printf 'More than once in %s:\n%s\n' "$list" "$twice" >&2 && exit 1; }
    ;;
  entries_are_well_formed)
    wrong=$(entries | awk -F ' => ' 'NF != 3 || $2 !~ /^(whole$|part: .)/ || $3 !~ /^[^, ].*[^, ]$/')
    [ -z "$wrong" ] || { printf 'Not COMMAND => WHOLE => BY in %s:\n%s\n' "$list" "$wrong" >&2 && exit 1; }
    ;;
  named_stages_are_of_the_check)
    none_but "$(stages)" './dev check has no such line or step' < <(runners | sed -n 's/^check: //p')
    ;;
  named_tests_exist)
    none_but "$(tests)" "No such test in $build" < <(runners | grep -v ': ')
    ;;
  named_presets_are_looked_at)
    # By the case below, in their folders.
    none_but $'check\ncoverage\narmhf' "No test sees whether tests of these presets exist" \
      < <(runners | sed -n 's/: .*//p')
    ;;
  named_tests_of_this_preset_exist)
    none_but "$(tests)" "No such test in $build" < <(runners | sed -n "s/^$(basename "$build"): //p")
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
