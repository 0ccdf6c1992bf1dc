# shellcheck shell=bash disable=SC2154 # what ./dev sets
# The stages of './dev check'. Needs the functions of ./dev.
# shellcheck source=SCRIPTDIR/stages.sh
. "$root/tools/stages.sh"

# What is committed, and a number of new inputs; the corpus of longer runs is left alone.
check_fuzz() {
  rm -rf build/fuzz/check
  fuzz/run.sh build/sanitizers/fuzz build/fuzz/check -runs=2000
  # As one replays a finding.
  build/sanitizers/fuzz/invite_reply_deserialize build/sanitizers/fuzz/seeds/invite_reply_deserialize/*
  do_fuzz invite_reply_deserialize 1
}

# armhf tests what is the same whatever registers floating-point numbers are handed over in: calls in
# threads, messages of no function, the example's programs, and the build with an SDK.
check_armel() {
  for_arm armel run_tests -E '^(Contract\.threads|ReferenceEncoder|examples_tests|device_sdk)'
}

check_bench_and_docs() { QEL_DOCS=ON for_bench run_tests -R '^(Bench|reference\.)'; }

check_threads() {
  setup
  run_tests threads
}

check_format() {
  step "check formatting" "./dev format mends it" clang_format --dry-run --Werror
  do_format # which finds nothing left to do
}

check_lint() { step "lint" '' tools/lint.sh release sanitizers; }

check_demo() {
  do_demo
  do_demo --log
}

check_packages() {
  need_packages "${arm_packages[@]}" "${lint_packages[@]}" "${coverage_packages[@]}" \
    "${fuzz_packages[@]}" "${bench_packages[@]}" "${docs_packages[@]}"
}

# The tests begin first, as a user would run them. What needs nothing that they build is done beside them;
# the other stages wait until they have passed, and long ones come before short ones.
do_check() {
  stage_folder=$root/build/check
  need_packages "${build_packages[@]}"
  stage tests '' do_test
  stage packages '' check_packages
  stage runtime-armhf packages runtime/get arm-linux-gnueabihf
  stage runtime-armel packages runtime/get arm-linux-gnueabi
  stage format packages check_format
  stage threads packages check_threads
  stage demo tests check_demo
  stage armhf 'tests runtime-armhf' armhf_tests
  stage sanitizers 'tests packages' run_tests sanitizers
  stage armel 'tests runtime-armel' check_armel
  stage fuzz sanitizers check_fuzz
  stage coverage 'demo packages' do_coverage
  stage bench-and-docs coverage check_bench_and_docs # after what else builds the preset release
  stage lint 'bench-and-docs sanitizers' check_lint
  run_stages
}
