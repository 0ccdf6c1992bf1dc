#!/usr/bin/env bats
# How the library is compiled and linked, as the built file says, and the build's commands.
load build

# has OPTION PATTERN: readelf says so about the library.
has() {
  run -0 "$READELF" -W "$1" "$LIBRARY"
  grep -Eq "$2" <<<"$output"
}

@test "relocations are read-only" { has -l GNU_RELRO; }
@test "symbols are bound when it is loaded" { has -d 'FLAGS_1.*NOW'; }
@test "the stack is not executable" { has -l 'GNU_STACK .* RW +0x'; }
@test "the text has no relocations" { has -d SONAME && [[ $output != *TEXTREL* ]]; }
@test "stacks are protected" { has --dyn-syms 'UND __stack_chk_fail'; }
@test "assertions are compiled in" { has --dyn-syms 'UND __assert_fail'; }

@test "it is for the machine, the processor and the calls that are built for" {
  case $ARCHITECTURE in
    armhf) has -h 'Flags:.* hard-float ABI' ;;
    armel) has -h 'Flags:.* soft-float ABI' ;;
    *) skip "this machine's" ;;
  esac
  has -h 'Machine: +ARM'
  has -A 'Tag_CPU_arch: v7'
}

@test "every symbol is found when it is loaded" {
  ${EMULATOR:+"$EMULATOR"} "$BUILD/tests/load_library" "$LIBRARY"
}

# compiled_with SOURCES FLAG...: the build compiles all these with the flags. SOURCES is a regular
# expression of their paths in the repository.
compiled_with() {
  local flag
  grep -P " -c \Q$SOURCE\E/$1\"" "$BUILD/compile_commands.json" >commands
  for flag in "${@:2}"; do
    grep -vF -e " $flag " commands | none
  done
}

@test "own code is compiled with warnings" {
  compiled_with '(?!build/).*' -Wall -Wextra -Wconversion -Werror
}

@test "the library checks its buffers" {
  compiled_with 'proto-lib/[^/]*' -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2
}

@test "the library is compiled for speed" {
  local plt=()
  [ "$TRIPLE" != x86_64-linux-gnu ] || plt=(-fno-plt)
  compiled_with 'proto-lib/whole-library.cc' -fno-semantic-interposition "${plt[@]}"
}

@test "the library is not linked with undefined symbols" {
  [ -z "${QEL_LIBRARY:-}" ] || skip 'it was linked elsewhere'
  [ -e "$BUILD/build.ninja" ] || skip "Ninja's commands are read"
  # By its own command, but without the log service.
  link=$(ninja -C "$BUILD" -t commands "${LIBRARY#"$BUILD/"}" | tail -n 1 |
    sed -E "s#-o [^ ]+ #-o $PWD/library #; s#[^ ]*/${DLOG##*/} # #")
  cd "$BUILD"
  run ! bash -c "$link"
  says "undefined reference to \`__dlog_print'"
}
