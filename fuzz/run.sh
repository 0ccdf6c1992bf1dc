#!/usr/bin/env bash
# run.sh PROGRAMS CORPUS LIMIT [TARGET...]: runs the targets (all of them if none is named) from the
# folder PROGRAMS. Each replays its seeds, its regressions and what CORPUS/TARGET holds from earlier
# runs, and then makes up inputs until LIMIT, an option of libFuzzer's such as -runs=1000 or
# -max_total_time=60. New inputs that reach new code go into CORPUS; nothing is written here.
set -euo pipefail
programs=$1 corpus=$2 limit=$3
shift 3
here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd -P)

run_target() {
  local target=$1 log=$corpus/$1.log folders inputs artifact
  mkdir -p "$corpus/$target"
  folders=("$corpus/$target" "$programs/seeds/$target")
  [ ! -d "$here/regressions/$target" ] || folders+=("$here/regressions/$target")
  inputs=$(find "${folders[@]}" -type f | wc -l)
  if ! "$programs/$target" "$limit" -print_final_stats=1 -rss_limit_mb=1024 -timeout=10 \
    -artifact_prefix="$corpus/$target-" "${folders[@]}" >"$log" 2>&1; then
    tail -n 60 "$log"
    artifact=$(sed -nE 's/.*Test unit written to (.*-(crash|leak|oom|timeout)-[0-9a-f]+)$/\1/p' "$log")
    if [ -n "$artifact" ]; then
      echo "$target: a finding. To see it again: $programs/$target $artifact"
      echo "When it is mended, keep the file in fuzz/regressions/$target. Whole log: $log"
    else
      echo "$target failed to run. Whole log: $log"
    fi
    return 1
  fi
  awk -v target="$target" -v inputs="$inputs" '
    /^#[0-9]+.* cov: / { for (i = 1; i < NF; i++) if ($i == "cov:") edges = $(i + 1) }
    /^stat::number_of_executed_units:/ { runs = $2 }
    END { printf "%-42s %4d replayed, %9d runs, %5d edges\n", target, inputs, runs, edges }' "$log"
}

[ $# -gt 0 ] || mapfile -t targets < <(ls "$programs/seeds")
[ $# -eq 0 ] || targets=("$@")
mkdir -p "$corpus"
export programs corpus limit here
export -f run_target
# shellcheck disable=SC2016 # for the inner shell
printf '%s\n' "${targets[@]}" | xargs -P "$(nproc)" -n 1 bash -euo pipefail -c 'run_target "$1"' run_target
