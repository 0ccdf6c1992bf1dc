#!/usr/bin/env bash
# configure.sh PROCESSOR FOLDER OPTION...: configures a build of which packages are made, in the folder, by the
# preset of the processor, which is Debian's or RPM's name. README.md says what the settings from the
# environment mean.
set -euo pipefail
case $1 in
  armhf | armv7hl | armv7hnl) preset=armhf ;;
  armel | armv7l) preset=armel ;;
  "$(uname -m)" | "$(dpkg --print-architecture 2>/dev/null)") preset=release ;;
  *) echo "configure.sh: no preset builds for $1 on this machine" >&2 && exit 1 ;;
esac
settings=()
for name in QEL_PROTOBUF_ROOT QEL_PROTOC QEL_DLOG_LIBRARY CMAKE_SYSROOT CMAKE_BUILD_TYPE CMAKE_C_FLAGS \
  CMAKE_CXX_FLAGS; do
  [ -z "${!name:-}" ] || settings+=("-D$name=${!name}")
done
# The loader of a device, or of a package's user, knows where libraries are.
exec cmake --preset "$preset" -B "$2" -DCMAKE_SKIP_RPATH=ON -DBUILD_TESTING=OFF "${settings[@]}" "${@:3}"
