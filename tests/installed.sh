# To be sourced: what the tests of installed trees, of packages and of a device SDK share. The functions
# take the variables that name_arguments sets, or a caller's own of the same names.
# shellcheck shell=bash disable=SC2034 # they are used there

# name_arguments CASE SOURCE BUILD VERSION LIBDIR PROTOBUF-ROOT CC CXX [TOOLCHAIN]
name_arguments() {
  source=$2
  build=$3
  version=$4
  first=${version%%.*} # the SONAME's number
  libdir=$5            # folder of libraries in a prefix: lib/TRIPLE
  triple=${libdir##*/}
  protobuf=$6 # an installation of Protocol Buffers 2.6
  cc=$7
  cxx=$8
  toolchain=${9:-} # CMake's for another machine; empty for this one
  scratch=$(mktemp -d)
  trap 'rm -rf "$scratch"' EXIT
}

fail() {
  printf '%s\n' "$*" >&2
  exit 1
}

# make_sysroot TRIPLE FOLDER: a root folder of Debian's files for that machine.
make_sysroot() {
  mkdir -p "$2/usr"
  cp -rs "/usr/$1/lib" "/usr/$1/include" "$2/usr"
  ln -s usr/lib "$2/lib"
  ln -s "/usr/$1" "$2/usr/$1" # by which libc.so names what it is made of
}

# For this machine a tree lies anywhere, for another it is the folder usr of a root.
root_of() { dirname "$1"; }

# pkg_config TREE OPTION...
pkg_config() {
  local tree=$1
  shift
  if [ -n "$toolchain" ]; then
    PKG_CONFIG_SYSROOT_DIR=$(root_of "$tree") PKG_CONFIG_LIBDIR=$tree/$libdir/pkgconfig pkg-config "$@"
  else
    PKG_CONFIG_PATH=$tree/$libdir/pkgconfig pkg-config "$@"
  fi
}

# flags_of TREE MODULE: pkg-config's go to the array flags. It quotes for a shell.
flags_of() { eval "flags=($(pkg_config "$1" --cflags --libs "$2"))"; }

# compile_c TREE OPTION...: the plug-in in C, with the compiler and pkg-config alone. It names the
# folder of the library itself, which finds the rest.
compile_c() {
  local tree=$1 flags folder=$1/$libdir
  shift
  if [ -n "$toolchain" ]; then
    set -- --sysroot="$(root_of "$tree")" "$@"
    folder=/usr/$libdir
  fi
  flags_of "$tree" qel-message-protosvc
  "$cc" -std=c99 -pedantic -Wall -Wextra -Werror "$source/tests/consumers/c/plugin.c" "${flags[@]}" \
    -Wl,-rpath,"$folder" "$@"
}

# compile_with_cmake TREE CONSUMER OPTION...: the module in C++, which goes to $scratch/built.
compile_with_cmake() {
  local tree=$1 consumer=$2
  shift 2
  if [ -n "$toolchain" ]; then
    set -- -DCMAKE_TOOLCHAIN_FILE="$toolchain" -DCMAKE_SYSROOT="$(root_of "$tree")" "$@"
  else
    set -- -DCMAKE_PREFIX_PATH="$tree;$protobuf" "$@"
  fi
  {
    cmake -S "$source/tests/consumers/$consumer" -B "$scratch/built" -G Ninja \
      -DCMAKE_C_COMPILER="$cc" -DCMAKE_CXX_COMPILER="$cxx" "$@" && cmake --build "$scratch/built"
  } >"$scratch/messages" 2>&1 || fail "$(cat "$scratch/messages")"
}

# prints TEXT TREE PROGRAM [ARGUMENT...]: what the program prints.
prints() {
  local text=$1 tree=$2 printed
  shift 2
  [ -z "$toolchain" ] || set -- qemu-arm -L "$(root_of "$tree")" "$@"
  printed=$(DLOG_STANDIN_PRIORITY=S "$@")
  [ "$printed" = "$text" ] || fail "expected '$text', printed '$printed'"
}

# c_plugin_runs TREE
c_plugin_runs() {
  compile_c "$1" -o "$scratch/plugin"
  prints 'probe 7, answer of 2 bytes' "$1" "$scratch/plugin"
}
