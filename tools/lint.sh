#!/usr/bin/env bash
# lint.sh PRESET...: shellcheck looks at all scripts, clang-tidy at all sources: at each as the first
# preset compiles it that has it.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."

files() { git ls-files -co --exclude-standard -- "$@"; }

files dev .ci/run runtime/get '*.sh' '*.bats' '*.bash' | xargs shellcheck

# Each source once, though several programs have it, and without GCC's precompiled headers, which clang
# cannot read.
commands() {
  python3 -c '
import json, re, sys
commands = {}
for entry in json.load(sys.stdin):
    entry["command"] = re.sub(r" -Winvalid-pch -include \S*cmake_pch\.hxx ", " ", entry["command"])
    commands.setdefault(entry["file"], entry)
json.dump(list(commands.values()), sys.stdout, indent=1)'
}

# tidy FOLDER FILE: of what tests others alone the form is looked at. The rest takes most of the time, and
# the sanitizers run those paths.
tidy() {
  local checks=''
  case $2 in
    tests/* | */tests/* | bench/* | fuzz/* | qel-wire/fuzz_target.cc)
      checks='-clang-analyzer-*,-bugprone-*,-misc-*,-performance-*'
      ;;
  esac
  clang-tidy -p "$1" --quiet "--checks=$checks" "$2"
}
export -f tidy

left=$(files '*.c' '*.cc' ':!proto-lib/whole-library.cc') # which has only includes
for preset in "$@"; do
  folder=build/$preset/lint
  mkdir -p "$folder"
  commands <"build/$preset/compile_commands.json" >"$folder/compile_commands.json"
  compiled=$(sed -nE "s#^ *\"file\": \"$PWD/(.*)\",?\$#\1#p" "$folder/compile_commands.json")
  { grep -xF "$compiled" <<<"$left" || true; } |
    xargs -r -P "$(nproc)" -n 1 bash -c 'tidy "$@"' tidy "$folder" \
    2> >(grep -v ' warnings generated' >&2) # in the headers of others
  left=$(grep -vxF "$compiled" <<<"$left" || true)
done
if [ -n "$left" ]; then
  printf 'none of the presets compiles this, so clang-tidy cannot look at it: %s\n' "$left" >&2
  exit 1
fi
