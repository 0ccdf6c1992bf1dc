#!/usr/bin/env bash
# report_test.sh BUILD: a report of one round has all tables and a well-formed plot.
set -euo pipefail
build=$1
to=$build/bench/report
rm -rf "$to"
"$(dirname "${BASH_SOURCE[0]}")/report.py" "$build" --rounds 1 --to "$to"

# has FILE TEXT...
has() {
  local file=$to/$1 text
  shift
  for text in "$@"; do
    grep -qF -- "$text" "$file" || { echo "$file: no '$text'" >&2 && exit 1; }
  done
}

cases=('echo reply' 'chat request, 100 bytes' 'chat request, 40,000 bytes' 'chat reply, 1 entry'
  'chat reply, 50 entries' 'page, 500 messages' 'room, 500 members')
columns=('this library' 'generated classes' 'by hand' 'Protocol Buffers 3.21' protobuf-c nanopb)
tables=('ns a call (ratio' 'instructions a call' 'through qel-message.h' 'blocks allocated a call'
  library loading 'calls at once' 'ns a call, by allocator' 'ns that the recorder takes' 'a chat request of 100 bytes' 'threshold (ratios')
has README.md "${tables[@]/#/| }" "${cases[@]/#/| }" "${columns[@]}" 'relocations' 'in all' 'jemalloc'
has benchmark.svg "${columns[@]}" 'page of messages' '</svg>'
python3 -c 'import sys, xml.dom.minidom; xml.dom.minidom.parse(sys.argv[1])' "$to/benchmark.svg"
python3 -c 'import json, sys; json.load(open(sys.argv[1]))' "$to/results.json"
