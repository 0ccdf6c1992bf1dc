#!/usr/bin/env bash
# dev_steps_test.sh CASE SOURCE: what a command of ./dev starts, in order. It runs from a copy in a
# scratch folder; what it starts says how it was called, without cmake's settings, and does nothing.
set -euo pipefail
scratch=$(mktemp -d /tmp/dev-steps-XXXXXX) # whatever TMPDIR: the path must have no blank
trap 'rm -rf "$scratch"' EXIT
checkout=$scratch/checkout
mkdir -p "$checkout/.deps" "$scratch/bin"
cp "$2/dev" "$checkout/dev"

# stand_in PATH...
stand_in() {
  local path
  for path in "$@"; do
    mkdir -p "$(dirname "$path")"
    cat >"$path" <<'SH'
#!/bin/bash
case ${0##*/} in
  git) printf '%s/source.c\n' proto-lib fuzz bench && exit ;;
  dpkg-query) echo installed && exit ;;
esac
said=
for argument in "$@"; do
  case $argument in -D*) printf '%s\n' "$argument" >>"$STEPS.settings" ;; *) said+=" $argument" ;; esac
done
printf '%s\n' "${0##*/}$said" >>"$STEPS"
[ "${0##*/}" != make_seeds.sh ] || { mkdir -p "${1%/*}" && cp -r fuzz/seeds "$1"; }
[ "${0##*/} $1" != 'cmake --preset' ] || echo '[]' >"build/$2/compile_commands.json"
SH
    chmod +x "$path"
  done
}

for command in git dpkg-query apt-get sudo cmake ctest cpack clang-format clang-tidy shellcheck dot; do
  stand_in "$scratch/bin/$command"
done
for script in examples/run_demo.sh tools/coverage.py tools/mutate.py tools/wire_format.py \
  bench/report.py fuzz/run.sh fuzz/make_seeds.sh build/fuzz/fuzz/invite_reply_deserialize; do
  stand_in "$checkout/$script"
done
mkdir -p "$checkout/fuzz/seeds/invite_reply_deserialize" "$checkout/build/coverage" "$checkout/docs"
echo "$checkout, CC=, CXX=" >"$checkout/build/fuzz/bound-to" # which keeps the target there

# Every runtime is there.
recipe=$(sed -n 's/^readonly pb_recipe=\([0-9]*\).*/\1/p' "$2/dev")
sum=$(sed -n 's/^readonly pb_sha256=//p' "$2/dev")
for triple in '' -arm-linux-gnueabihf -arm-linux-gnueabi; do
  for kind in '' -plain; do
    prefix=$checkout/.deps/protobuf-2.6.1$triple$kind
    mkdir -p "$prefix"
    echo "recipe $recipe, $sum, $prefix" >"$prefix/complete"
  done
done

# dev [VARIABLE=VALUE...] [ARGUMENT...]: './dev ARGUMENT...' with these settings alone must succeed.
dev() {
  local settings=()
  while [[ ${1:-} == *=* ]]; do
    settings+=("$1")
    shift
  done
  : >"$scratch/steps"
  env -u QEL_PROTOBUF_ROOT -u QEL_PROTOC -u QEL_DLOG_LIBRARY -u CC -u CXX PATH="$scratch/bin:$PATH" \
    STEPS="$scratch/steps" "${settings[@]}" "$checkout/dev" "$@" >"$scratch/out" 2>&1 ||
    { cat "$scratch/out" "$checkout/build/dev.log" >&2 && exit 1; }
}

# starts [VARIABLE=VALUE...] [ARGUMENT...]: it does the steps on standard input.
starts() {
  dev "$@"
  diff - "$scratch/steps" >&2
}

# sets SETTING...: cmake was given these.
sets() {
  local setting
  for setting in "$@"; do
    grep -qxF -- "$setting" "$scratch/steps.settings" || { echo "$setting is not set" >&2 && exit 1; }
  done
}

case $1 in
  help)
    starts help </dev/null
    grep -q '^usage: ./dev COMMAND' "$scratch/out"
    ;;
  setup) starts setup </dev/null ;;
  demo)
    starts demo <<TXT
cmake --preset release
cmake --build --preset release --target plugin_session front_end
run_demo.sh build/release/examples
TXT
    ;;
  demo_with_log)
    starts demo --log <<TXT
cmake --preset release
cmake --build --preset release --target plugin_session front_end
run_demo.sh build/release/examples --log
TXT
    ;;
  test)
    starts test NAME -j 4 <<TXT
cmake --preset release
cmake --build --preset release
ctest --preset release -N -R NAME
ctest --preset release -R NAME -j 4
TXT
    ;;
  test_of_a_device_runtime)
    starts QEL_PROTOBUF_ROOT=/opt/sdk/usr QEL_DLOG_LIBRARY=/opt/sdk/usr/lib/libdlog.so test <<TXT
cmake --preset release
cmake --build --preset release
ctest --preset release
TXT
    sets -DQEL_PROTOBUF_ROOT=/opt/sdk/usr -DQEL_DLOG_LIBRARY=/opt/sdk/usr/lib/libdlog.so
    ;;
  test_of_another_compiler_is_built_anew)
    mkdir "$checkout/build/release"
    touch "$checkout/build/release/of_another_compiler"
    starts CC=true CXX=true test <<TXT
cmake --preset release
cmake --build --preset release
ctest --preset release
TXT
    [ ! -e "$checkout/build/release/of_another_compiler" ]
    ;;
  arm)
    starts arm -j4 -R NAME --rerun-failed <<TXT
cmake --preset armhf
cmake --build --preset armhf
ctest --preset armhf -j4 -R NAME --rerun-failed
cmake --preset armel
cmake --build --preset armel
ctest --preset armel -j4 -R NAME --rerun-failed
TXT
    ;;
  abi)
    starts abi <<TXT
cmake --preset release
cmake --build --preset release --target abi_baseline
cmake --preset armhf
cmake --build --preset armhf --target abi_baseline
cmake --preset armel
cmake --build --preset armel --target abi_baseline
TXT
    ;;
  coverage)
    starts coverage <<TXT
cmake --preset coverage
cmake --build --preset coverage
ctest --preset coverage
coverage.py build/coverage
TXT
    ;;
  mutate)
    starts mutate typing_updated <<TXT
cmake --preset coverage
cmake --build --preset coverage
mutate.py build/coverage typing_updated
TXT
    ;;
  bench)
    starts bench <<TXT
cmake --preset bench
cmake --build --preset bench
cmake --preset armhf
cmake --build --preset armhf --target bench/all
cmake --preset armel
cmake --build --preset armel --target bench/all
report.py build/bench build/armhf build/armel
TXT
    ;;
  fuzz)
    # One target in this checkout, which has as many seconds as there are processors to share them.
    starts fuzz 3600 <<TXT
cmake --preset fuzz
cmake --build --preset fuzz
run.sh build/fuzz/fuzz build/fuzz/corpus -max_total_time=$((3600 * $(nproc) + 1)) invite_reply_deserialize
TXT
    ;;
  fuzz_of_one_target)
    starts fuzz invite_reply_deserialize 600 <<TXT
cmake --preset fuzz
cmake --build --preset fuzz
run.sh build/fuzz/fuzz build/fuzz/corpus -max_total_time=600 invite_reply_deserialize
TXT
    ;;
  package)
    mkdir -p "$checkout/build/packages/_CPack_Packages" # which cpack leaves
    touch "$checkout/build/packages/of_another_version"
    starts package <<TXT
cmake --preset release
cmake --build --preset release --target packaged
cpack --preset release
cmake --preset armhf
cmake --build --preset armhf --target packaged
cpack --preset armhf
cmake --preset armel
cmake --build --preset armel --target packaged
cpack --preset armel
TXT
    [ ! -e "$checkout/build/packages/of_another_version" ]
    ;;
  docs)
    starts docs <<TXT
cmake --preset release
cmake --build --preset release --target wire_format qel-wire
dot -Tsvg docs/architecture.dot -o docs/architecture.svg
wire_format.py build/release
cmake --preset release
cmake --build --preset release --target docs
TXT
    sets -DQEL_DOCS=ON
    ;;
  format)
    starts format <<TXT
clang-format -i proto-lib/source.c fuzz/source.c bench/source.c
TXT
    ;;
  check_tests_every_preset)
    # That coverage stands for debug is its definition; fuzz has no tests.
    dev check
    diff <(sed -n '/"testPresets"/,/^  \]/s/.*"name": "\([a-z]*\)".*/\1/p' "$2/CMakePresets.json" |
      grep -vx 'base\|debug' | sort) <(sed -nE 's/^ctest --preset ([a-z]+).*/\1/p' "$scratch/steps" | sort -u) >&2
    ;;
  *)
    echo "no such case: $1" >&2
    exit 1
    ;;
esac
