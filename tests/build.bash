# What the shell tests share: the settings of the build folder that they look at, which CMake has
# written there, and the use of what is installed. By hand, of the release build or of another:
#
#   bats -f 'some words of names' tests/exports.bats
#   QEL_BUILD=$PWD/build/armhf bats tests/exports.bats
#
# shellcheck shell=bats disable=SC2034,SC2154 # variables of the tests and of bats
bats_require_minimum_version 1.5.0
BATS_PRINT_OUTPUT_ON_FAILURE=1 # of 'run'
export LC_ALL=C
unset QEL_PLAIN_PROTOBUF_ROOT QEL_BENCH QEL_DOCS # presets read them, and here they are of the build around the tests
# shellcheck source=/dev/null
. "${QEL_BUILD:-${BASH_SOURCE[0]%/*}/../build/release}/tests/build.bash"
MODULE=${QEL_MODULE:-$MODULE} # another object of it, as mutation makes them
LIBRARY=${QEL_LIBRARY:-$LIBRARY} # as "./dev contract" takes it
FIRST=${VERSION%%.*} # the SONAME's number
case $TRIPLE in
  arm-linux-gnueabihf) ARCHITECTURE=armhf ;;
  arm-linux-gnueabi) ARCHITECTURE=armel ;;
  *) ARCHITECTURE=$(dpkg --print-architecture) ;;
esac

# functions [FILE]: those that the public header, or another source, has, in its order.
functions() {
  sed -nE 's/^(int|void) ([a-z_]+_(de)?serialize)\(.*/\2/p' \
    "${1:-$SOURCE/proto-lib/qel-message-serialize.h}"
}

# Each test has a folder for its files.
setup() { cd "$BATS_TEST_TMPDIR" || exit; }

fail() {
  printf '%s\n' "$@" >&2
  return 1
}

# At the end of a pipe: there are no lines. Those that there are stand in the report.
none() { ! grep . >&2; }

# says TEXT: what the last command of 'run' has said, however its lines are broken.
says() { [[ $(tr -s ' \n' ' ' <<<"$output") == *"$1"* ]] || fail "expected: $1"; }

# refused TEXT COMMAND...: the command fails and says that.
refused() {
  run ! "${@:2}"
  says "$1"
}

# make_sysroot FOLDER: a root folder of Debian's files for the machine that is built for.
make_sysroot() {
  mkdir -p "$1/usr"
  cp -rs "/usr/$TRIPLE/lib" "/usr/$TRIPLE/include" "$1/usr"
  ln -s usr/lib "$1/lib"
  ln -s "/usr/$TRIPLE" "$1/usr/$TRIPLE" # by which libc.so names what it is made of
}

# What follows takes an installed tree: for this machine it lies anywhere, for another it is the
# folder usr of a root.

# flags_of TREE MODULE: pkg-config's go to the array flags. It quotes for a shell.
flags_of() {
  local said
  said=$(PKG_CONFIG_LIBDIR=$1/$LIBDIR/pkgconfig PKG_CONFIG_SYSROOT_DIR=${TOOLCHAIN:+${1%/usr}} \
    pkg-config --cflags --libs "$2")
  eval "flags=($said)"
}

# compile_c TREE OPTION...: the plug-in in C, with the compiler and pkg-config alone. It names the
# folder of the library itself, which finds the rest.
compile_c() {
  local flags folder=$1/$LIBDIR
  flags_of "$1" qel-message-protosvc
  [ -z "$TOOLCHAIN" ] || folder=/usr/$LIBDIR flags+=(--sysroot="${1%/usr}")
  "$CC" -std=c99 -pedantic -Wall -Wextra -Werror "$SOURCE/tests/consumers/c/plugin.c" \
    "${flags[@]}" -Wl,-rpath,"$folder" "${@:2}"
}

# compile_with_cmake TREE CONSUMER OPTION...: the module in C++, which goes to the folder built.
compile_with_cmake() {
  local settings=(-DCMAKE_PREFIX_PATH="$1;$PROTOBUF")
  [ -z "$TOOLCHAIN" ] ||
    settings=(-DCMAKE_TOOLCHAIN_FILE="$TOOLCHAIN" -DCMAKE_SYSROOT="${1%/usr}")
  cmake -S "$SOURCE/tests/consumers/$2" -B built -G Ninja \
    -DCMAKE_C_COMPILER="$CC" -DCMAKE_CXX_COMPILER="$CXX" "${settings[@]}" "${@:3}"
  cmake --build built
}

# take_examples: writes what docs/testing.md has to files: first.c, what is said of its mistake, the lines
# that qel-testkit reads, and its answers.
take_examples() {
  awk '/^```/ { on = !on; block += on; next }
    on && block == 1 { print >"first.c" }
    on && block == 3 { print >"mistake" }
    on && sub(/^< /, "") { print >"lines" }
    on && sub(/^> /, "") { print >"answers" }' "$SOURCE/docs/testing.md"
}

# prints TEXT TREE PROGRAM [ARGUMENT...]: what the program prints.
prints() {
  local emulator=()
  [ -z "$TOOLCHAIN" ] || emulator=(qemu-arm -L "${2%/usr}")
  DLOG_STANDIN_PRIORITY=S run -0 "${emulator[@]}" "${@:3}"
  [ "$output" = "$1" ] || fail "expected: $1"
}

# c_plugin_runs TREE
c_plugin_runs() {
  compile_c "$1" -o plugin
  prints 'probe 7, answer of 2 bytes' "$1" ./plugin
}
