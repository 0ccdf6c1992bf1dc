#!/usr/bin/env bash
# debian_symbols.sh EXPORTS VERSION: prints the library's symbols file for dpkg-gensymbols, of the functions in
# the linker's list EXPORTS. A function is there since the first release whose baseline of the binary form
# has it, or since VERSION. Users of the classes need the VERSION that they were built with: the size of a
# class is compiled into them.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."
version=$2
functions=$(sed -nE 's/^ +([a-z_]+serialize);$/\1/p' "$1")
mapfile -t releases < <(printf '%s\n' tests/abi/*.*.*/ | xargs -n 1 basename | sort -V)

echo "libqel-message-protosvc.so.${version%%.*} #PACKAGE# #MINVER#"
for name in $functions; do
  since=$version
  for release in "${releases[@]}"; do
    if grep -q "elf-symbol name='$name'" "tests/abi/$release/"*; then
      since=$release
      break
    fi
  done
  echo " $name@Base $since"
done
echo " (regex)\"^_Z.*@Base\$\" $version"
