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
# threads, messages of no function, and the example's programs.
check_armel() {
  for_arm armel run_tests -E '^(Contract\.threads|ReferenceEncoder|examples_tests)'
}

check_bench_and_docs() { QEL_DOCS=ON for_bench run_tests -R '^(Bench|reference\.)'; }

check_threads() {
  setup
  run_tests threads
}

# The packages for this machine and for the device's ABI, which are tested beside this machine's. ./dev release
# makes those of armel in the same way.
check_release() {
  local preset
  make_release "$(dpkg --print-architecture)" armhf
  for preset in release armhf; do
    QEL_PACKAGES=$root/build/dist QEL_BUILD=$root/build/$preset bats tests/packages.bats
  done
  QEL_BUILD=$root/build/armhf bats tests/device_packages.bats
}

# Those for this machine alone, with the documents: 'bats tests/reproducible.bats' compares all.
check_reproducible() {
  is_committed || { say "not compared: there are changes that are not committed" && return; }
  QEL_ARCHITECTURES=$(dpkg --print-architecture) bats tests/reproducible.bats
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
    "${fuzz_packages[@]}" "${bench_packages[@]}" "${release_packages[@]}" "${release_test_packages[@]}"
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
  stage small armhf small_tests
  stage release armhf check_release
  stage reproducible release check_reproducible
  stage fuzz sanitizers check_fuzz
  stage coverage 'demo packages' do_coverage
  stage bench-and-docs coverage check_bench_and_docs # after what else builds the preset release
  stage lint 'bench-and-docs sanitizers' check_lint
  run_stages
}
