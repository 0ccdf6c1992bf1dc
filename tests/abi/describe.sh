#!/usr/bin/env bash
# describe.sh LIBRARY: the binary form of its C interface, a line for each function and each record. It has
# nothing that changes from one machine and one edit to the next, nor whether a record has a name of its own
# or that of its typedef alone. The library must have debug information.
set -euo pipefail
abidw --suppressions "$(dirname "${BASH_SOURCE[0]}")/c_interface.suppr" --exported-interfaces-only \
  --no-corpus-path --no-comp-dir-path --no-show-locs --no-parameter-names --no-elf-needed "$1" |
  sed "s|path='[^']*/|path='|; s| naming-typedef-id='[^']*'||" |
  awk '
    /^ *<(function|class)-decl [^>]*[^\/]>$/ { whole = $0; next }
    whole == "" { print; next }
    { sub(/^ +/, ""); whole = whole $0 }
    /^<\/(function|class)-decl>$/ { print whole; whole = "" }'
