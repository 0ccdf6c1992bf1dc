#!/usr/bin/env bash
# build_flags_test.sh CASE SOURCE BUILD LIBRARY DLOG: how the build compiles and links, as its files
# say; and what the linker makes of it.
set -euo pipefail
source=$2
build=$3
library=${4#"$build/"}
dlog=$5

# compiled: each source with its command.
compiled() {
  awk -F '"' '$2 == "command" {command = $0} $2 == "file" {print $4 "\t" command}' "$build/compile_commands.json"
}

# without FLAG...: the sources among those on standard input that lack one; there must be some input.
without() {
  awk -F '\t' -v flags="$*" '
    BEGIN {count = split(flags, flag, " ")}
    {for (i = 1; i <= count; ++i) if (!index($0 " ", " " flag[i] " ")) print $1 ": no " flag[i]}
    END {if (!NR) print "no sources"}'
}

none() { ! grep . >&2; }

case $1 in
  own_code_is_compiled_with_warnings)
    compiled | awk -F '\t' -v own="$source/" -v built="$build/" 'index($1, own) == 1 && index($1, built) != 1' |
      without -Wall -Wextra -Wconversion -Werror | none
    ;;
  library_checks_its_buffers)
    compiled | awk -F '\t' '$1 ~ "/proto-lib/[^/]*$"' | without -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2 |
      none
    ;;
  library_is_compiled_for_speed)
    flags=(-fno-semantic-interposition)
    case $(readelf -h "$build/$library") in *X86-64*) flags+=(-fno-plt) ;; esac
    compiled | awk -F '\t' '$1 ~ "/proto-lib/whole-library.cc$"' | without "${flags[@]}" | none
    ;;
  library_is_not_linked_with_undefined_symbols)
    # Its own command, but without the log service.
    scratch=$(mktemp -d)
    trap 'rm -rf "$scratch"' EXIT
    link=$(ninja -C "$build" -t commands "$library" | tail -n 1 |
      sed -E "s#-o $library #-o $scratch/library #; s#[^ ]*/$(basename "$dlog") # #")
    if (cd "$build" && bash -c "$link") >"$scratch/out" 2>&1; then
      echo 'linked all the same' >&2
      exit 1
    fi
    grep -q "undefined reference to [\`']__dlog_print'" "$scratch/out" || { cat "$scratch/out" >&2 && exit 1; }
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
