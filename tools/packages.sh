# shellcheck shell=bash disable=SC2034 # whose users are in ./dev
# The Debian packages that the commands of ./dev need. Needs tools/step.sh.

build_packages=(g++ make cmake ninja-build libgtest-dev protobuf-compiler abigail-tools bats
  libcli11-dev libpcap0.8-dev libutf8proc-dev nettle-dev nlohmann-json3-dev jq tshark zsh fish
  python3-protobuf python3-yaml
  python3-jsonschema python3-kconfiglib bsdutils pkgconf fakeroot valgrind)
arm_packages=(g++-arm-linux-gnueabihf g++-arm-linux-gnueabi qemu-user googletest python3)
lint_packages=(clang-format clang-tidy shellcheck)
coverage_packages=(gcovr python3)
bench_packages=(libbenchmark-dev python3 gnuplot-nox libprotobuf-dev libprotobuf-c-dev
  protobuf-c-compiler nanopb libnanopb-dev libjemalloc2)
docs_packages=(doxygen doxygen-awesome-css graphviz plantuml fonts-dejavu-core python3)
fuzz_packages=(clang libclang-rt-dev)

as_root() {
  if [ "$(id -u)" -eq 0 ]; then
    "$@"
  else
    sudo "$@"
  fi
}

install_packages() {
  # A failed update is not the end: the package lists may be there already.
  as_root apt-get update || true
  as_root env DEBIAN_FRONTEND=noninteractive apt-get -o DPkg::Lock::Timeout=300 \
    install -y --no-install-recommends "$@"
}

# need_packages PACKAGE...: installs those that are missing.
need_packages() {
  local missing=() package
  command -v dpkg-query >/dev/null || fail "this is no Debian machine (no dpkg-query): use Debian 12 or later"
  for package in "$@"; do
    dpkg-query -W -f='${db:Status-Status}\n' "$package" 2>/dev/null | grep -qx installed || missing+=("$package")
  done
  [ ${#missing[@]} -gt 0 ] || return 0
  if [ "$(id -u)" -ne 0 ] && ! command -v sudo >/dev/null; then
    fail "packages are missing, and this is neither root nor is there sudo: run as root 'apt-get install ${missing[*]}'"
  fi
  as_root true || fail "packages are missing, and sudo refuses: run as root 'apt-get install ${missing[*]}'"
  step "install Debian packages: ${missing[*]}" \
    "check that the machine reaches a Debian mirror (/etc/apt/sources.list*), or install them yourself, and call ./dev again" \
    install_packages "${missing[@]}"
}

need_compiler() {
  local compiler
  for compiler in "${CC:-cc}" "${CXX:-c++}"; do
    command -v "${compiler%% *}" >/dev/null ||
      fail "no compiler: '${compiler%% *}' is not a command; install g++ (apt-get install g++) or let CC and CXX name one"
  done
}
