#!/usr/bin/env bash
# lint.sh PRESET...: shellcheck looks at all scripts, clang-tidy at all sources: at each as the first
# preset compiles it that has it.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."

files() { git ls-files -co --exclude-standard -- "$@"; }

files dev .ci/run runtime/get '*.sh' '*.bats' '*.bash' | xargs shellcheck

left=$(files '*.c' '*.cc')
for preset in "$@"; do
  folder=build/$preset/lint
  mkdir -p "$folder"
  # Without GCC's precompiled headers, which clang cannot read.
  sed -E 's/ -Winvalid-pch -include [^ ]*cmake_pch\.hxx / /' "build/$preset/compile_commands.json" \
    >"$folder/compile_commands.json"
  compiled=$(sed -nE "s#^ *\"file\": \"$PWD/(.*)\",?\$#\1#p" "$folder/compile_commands.json")
  { grep -xF "$compiled" <<<"$left" || true; } |
    xargs -r -P "$(nproc)" -n 1 clang-tidy -p "$folder" --quiet \
    2> >(grep -v ' warnings generated' >&2) # in the headers of others
  left=$(grep -vxF "$compiled" <<<"$left" || true)
done
if [ -n "$left" ]; then
  printf 'none of the presets compiles this, so clang-tidy cannot look at it: %s\n' "$left" >&2
  exit 1
fi
